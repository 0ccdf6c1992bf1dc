/* caller ACT [ARGUMENT]: makes calls of the library for the recorder to see. */
#include <errno.h>
#include <pthread.h>
#include <stdlib.h>
#include <string.h>
#include <sys/wait.h>
#include <unistd.h>

#include "qel-message.h"

static bool answer(int64_t request_id) {
  QEL_SCOPED(buffer, buffer);
  return qel_client_echo_reply_write(&buffer, request_id) == QEL_OK;
}

static bool answer_many(const char* calls) {
  const long count = strtol(calls, NULL, 10);
  bool is_done = true;
  for (long i = 1; i <= count; ++i) {
    is_done = answer(i) && is_done;
  }
  return is_done;
}

/* A login, and the token again in messages of both directions. */
static bool log_in(const char* token) {
  unsigned char reply[256] = {0x12, 0, 0x12, 0};
  const size_t size = strlen(token);
  QEL_SCOPED(buffer, buffer);
  QEL_SCOPED(reply, read);
  reply[1] = (unsigned char)(size + 2);
  reply[3] = (unsigned char)size;
  memcpy(reply + 4, token, size);
  return qel_channel_auth_request_write(&buffer, 1, 2, 3, token, token) == QEL_OK &&
         qel_chat_request_write(&buffer, 2, 42, 9, QEL_MSG_TYPE_TEXT, token, 0) == QEL_OK &&
         qel_channel_auth_reply_read(&read, reply, (int)size + 4) == QEL_OK &&
         strcmp(read.resultMsg, token) == 0;
}

/* Bytes that are taken, that are refused, and of which nobody can tell; and a refused request. */
static bool end_in_all_ways(const char* ignored) {
  const unsigned char bytes[] = {0x58, 7};
  int64_t id = -1;
  int count = -1;
  (void)ignored;
  chat_reply_deserialize(bytes, 2, &id, NULL, NULL, NULL, &count, NULL, NULL);
  chat_reply_deserialize(bytes, 1, &id, NULL, NULL, NULL, &count, NULL, NULL);
  chat_reply_deserialize(bytes, 2, NULL, NULL, NULL, NULL, &count, NULL, NULL);
  return id == 7 && change_chatroom_meta_request_serialize(1, 42, NULL, NULL, NULL, NULL) == -1;
}

static bool answer_around_a_fork(const char* ignored) {
  bool is_done = answer(1);
  const pid_t child = fork();
  (void)ignored;
  is_done = answer(child == 0 ? 2 : 3) && is_done;
  return is_done && (child == 0 || wait(NULL) == child);
}

static void* answer_for_ever(void* first) {
  for (int64_t i = *(const int*)first; answer(i); i += 4) {
  }
  return NULL;
}

static bool answer_in_threads_for_ever(const char* ignored) {
  static int firsts[] = {1, 2, 3, 4};
  pthread_t thread;
  (void)ignored;
  for (int i = 0; i < 4; ++i) {
    pthread_create(&thread, NULL, answer_for_ever, &firsts[i]);
  }
  return pause() == 0;
}

static bool keep_errno(const char* ignored) {
  (void)ignored;
  errno = ECHILD;
  return answer(1) && errno == ECHILD;
}

static const struct {
  const char* name;
  bool (*act)(const char* argument);
} acts[] = {
    {"many", answer_many},
    {"login", log_in},
    {"ends", end_in_all_ways},
    {"fork", answer_around_a_fork},
    {"threads", answer_in_threads_for_ever},
    {"errno", keep_errno},
};

int main(int argc, char** argv) {
  for (size_t i = 0; argc > 1 && i < sizeof acts / sizeof acts[0]; ++i) {
    if (strcmp(argv[1], acts[i].name) == 0) {
      return acts[i].act(argv[argc - 1]) ? 0 : 1;
    }
  }
  return 2;
}
