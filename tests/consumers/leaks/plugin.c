/*
 * A plug-in, in C or in C++, that reads a reply and a broken one, and answers an echo probe. A
 * forgetful one loses five blocks, whose sizes differ: the received bytes, three outputs, and one
 * of its own.
 */
#include <stdlib.h>
#include <string.h>

#include "qel-message-serialize.h"

static const unsigned char reply[] = {
    0x58, 0x07, 0x60, 0x2a,                               /* requestId 7, chatroomId 42 */
    0x6a, 0x07, 0x08, 0xe9, 0x07, 0x12, 0x02, 0x6f, 0x6b, /* result { code 1001, msg "ok" } */
    0x72, 0x04, 0x08, 0x01, 0x10, 0x02                    /* an entry: msgId 1, sentTime 2 */
};

/* Uses the memory below that the pointers to the blocks were in, without gaps. */
__attribute__((no_sanitize("address"))) static void overwrite_stack(void) {
  volatile char used[8192];
  size_t i;
  for (i = 0; i < sizeof used; ++i) {
    used[i] = 0;
  }
}

static void session(int forgetful) {
  unsigned char* received = (unsigned char*)malloc(256);
  int64_t request_id = -1;
  int64_t chatroom_id = -1;
  int code = -1;
  char* text = NULL; /* 3 bytes */
  int count = 0;
  int64_t* ids = NULL; /* 8 bytes */
  int64_t* times = NULL;
  unsigned char* answer = NULL; /* 2 bytes */
  int size = 0;
#ifdef __cplusplus
  char* own = new char[77];
#else
  char* own = (char*)malloc(77);
#endif

  memcpy(received, reply, sizeof reply);
  chat_reply_deserialize(received, (int)sizeof reply, &request_id, &chatroom_id, &code, &text,
                         &count, &ids, &times);
  chat_reply_deserialize(received, 3, &request_id, &chatroom_id, &code, NULL, &count, NULL, NULL);
  client_echo_reply_serialize(request_id, &answer, &size);
  free(times);
  if (forgetful) {
    return;
  }
  free(received);
  free(text);
  free(ids);
  free(answer);
#ifdef __cplusplus
  delete[] own;
#else
  free(own);
#endif
}

#ifdef __cplusplus
extern "C"
#endif
    void
    run(int forgetful);

void run(int forgetful) {
  session(forgetful);
  overwrite_stack();
}
