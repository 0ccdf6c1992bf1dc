/*
 * The functions of the library without qel-message.h, as a plug-in uses them that needs one or two:
 * reads a reply to a chat message, and writes the answer to an echo probe.
 */
#include <stdio.h>
#include <stdlib.h>

#include "qel-message-serialize.h"

/* The service uses it neither as an id nor as a code. */
enum { NOT_WRITTEN = -1 };

/* Whether the bytes are a reply. All outputs are set before the call, as some are not written. */
static bool print_chat_reply(const unsigned char* data, int size) {
  int64_t request_id = NOT_WRITTEN, chatroom = 0;
  int code = NOT_WRITTEN, count = 0, i;
  char* text = NULL;
  int64_t *ids = NULL, *times = NULL;

  chat_reply_deserialize(data, size, &request_id, &chatroom, &code, &text, &count, &ids, &times);
  if (request_id == NOT_WRITTEN) {
    return false;
  }
  printf("reply to %lld: %s\n", (long long)request_id, text != NULL ? text : "no text");
  for (i = 0; i < count; ++i) {
    printf("message %lld recorded at %lld\n", (long long)ids[i], (long long)times[i]);
  }
  free(text);
  free(ids);
  free(times);
  return true;
}

/* Whether the answer could be written. */
static bool print_echo_reply(int64_t request_id) {
  unsigned char* message = NULL;
  int size = 0, i;

  if (client_echo_reply_serialize(request_id, &message, &size) != 0) {
    return false;
  }
  printf("answer of %d bytes:", size);
  for (i = 0; i < size; ++i) {
    printf(" %02x", (unsigned)message[i]);
  }
  printf("\n");
  free(message);
  return true;
}

int main(void) {
  /* requestId 7, chatroomId 42, result { code 0, msg "ok" },
     processedMessageEntries { msgId 9, sentTime 5 } */
  static const unsigned char reply[] = {0x58, 0x07, 0x60, 0x2a, 0x6a, 0x06, 0x08, 0x00, 0x12,
                                        0x02, 'o',  'k',  0x72, 0x04, 0x08, 0x09, 0x10, 0x05};
  return print_chat_reply(reply, (int)sizeof reply) && print_echo_reply(7) ? 0 : 1;
}
