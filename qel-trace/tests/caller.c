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

static bool log_in(const char* token) {
  QEL_SCOPED(buffer, buffer);
  return qel_channel_auth_request_write(&buffer, 1, 2, 3, token, token) == QEL_OK;
}

/* A message of the plug-in and one of the service with the text. */
static bool say(const char* text) {
  unsigned char reply[256] = {0x12, 0, 0x12, 0};
  const size_t size = strlen(text);
  QEL_SCOPED(buffer, buffer);
  QEL_SCOPED(reply, read);
  reply[1] = (unsigned char)(size + 2);
  reply[3] = (unsigned char)size;
  memcpy(reply + 4, text, size);
  return qel_chat_request_write(&buffer, 2, 42, 9, QEL_MSG_TYPE_TEXT, text, 0) == QEL_OK &&
         qel_channel_auth_reply_read(&read, reply, (int)size + 4) == QEL_OK &&
         strcmp(read.resultMsg, text) == 0;
}

/* Two users log in, one after the other, and what is said later has the tokens of both. */
static bool use_tokens(const char* token) {
  return log_in(token) && log_in("another-secret-token") && log_in("short") && say(token) &&
         say("another-secret-token") && say("short");
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
  read_message_reply_deserialize(bytes, 2, &id, &id, NULL, NULL); /* no chatroom comes last */
  return id == 0 && change_chatroom_meta_request_serialize(1, 42, NULL, NULL, NULL, NULL) == -1;
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

/* Children that call, of a process whose threads call. */
static bool fork_among_threads(const char* ignored) {
  static int firsts[] = {1, 2};
  bool is_done = true;
  pthread_t thread;
  (void)ignored;
  pthread_create(&thread, NULL, answer_for_ever, &firsts[0]);
  pthread_create(&thread, NULL, answer_for_ever, &firsts[1]);
  for (int i = 0; i < 50; ++i) {
    const pid_t child = fork();
    int status = 1;
    if (child == 0) {
      _exit(answer(1) ? 0 : 1);
    }
    is_done = waitpid(child, &status, 0) == child && status == 0 && is_done;
  }
  return is_done;
}

static pthread_mutex_t own_lock = PTHREAD_MUTEX_INITIALIZER;
static void lock_own(void) {
  pthread_mutex_lock(&own_lock);
}
static void unlock_own(void) {
  pthread_mutex_unlock(&own_lock);
}
static void unlock_own_and_answer(void) {
  pthread_mutex_unlock(&own_lock);
  answer(1);
}

static void* answer_locked_for_ever(void* ignored) {
  bool is_done = true;
  while (is_done) {
    lock_own();
    is_done = answer(1);
    unlock_own();
  }
  return ignored;
}

/* Of a plug-in that calls with a lock of its own held, which its handlers take. */
static bool fork_with_handlers(const char* ignored) {
  bool is_done = answer(1);
  pthread_t thread;
  (void)ignored;
  pthread_atfork(lock_own, unlock_own, unlock_own_and_answer);
  pthread_create(&thread, NULL, answer_locked_for_ever, NULL);
  for (int i = 0; i < 50; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      _exit(0);
    }
    is_done = waitpid(child, NULL, 0) == child && is_done;
  }
  return is_done;
}

static void* answer_cancelled(void* ignored) {
  pthread_cancel(pthread_self());
  answer(1);
  return ignored;
}

/* The first call of all is that of a thread which is to end at the next moment that waits. */
static bool cancel_the_first(const char* ignored) {
  pthread_t thread;
  (void)ignored;
  pthread_create(&thread, NULL, answer_cancelled, NULL);
  pthread_join(thread, NULL);
  return answer(2);
}

static bool keep_errno(const char* ignored) {
  (void)ignored;
  errno = ECHILD;
  if (!answer(1) || errno != ECHILD) {
    return false;
  }
  errno = ECHILD;
  return say("text") && errno == ECHILD;
}

static const struct {
  const char* name;
  bool (*act)(const char* argument);
} acts[] = {
    {"many", answer_many},
    {"tokens", use_tokens},
    {"ends", end_in_all_ways},
    {"fork", answer_around_a_fork},
    {"threads", answer_in_threads_for_ever},
    {"forks", fork_among_threads},
    {"handlers", fork_with_handlers},
    {"cancel", cancel_the_first},
    {"errno", keep_errno},
};

int main(int argc, char** argv) {
  alarm(60); /* if it hangs */
  for (size_t i = 0; argc > 1 && i < sizeof acts / sizeof acts[0]; ++i) {
    if (strcmp(argv[1], acts[i].name) == 0) {
      return acts[i].act(argv[argc - 1]) ? 0 : 1;
    }
  }
  return 2;
}
