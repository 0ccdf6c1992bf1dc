#define _GNU_SOURCE /* secure_getenv, program_invocation_short_name */
#include "recorder.h"

#include <errno.h>
#include <limits.h>
#include <pthread.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <time.h>
#include <unistd.h>

#include "library.h"

enum { DEFAULT_SIZE = 4 << 20, ERROR_PRIORITY = 6 };

/* Tokens that are kept out of later messages: so many, so much of each, and none that is so short
   that other fields have the same bytes. */
enum { TOKENS = 4, SHORTEST_TOKEN = 8, LONGEST_TOKEN = 4096 };

typedef enum state { OFF, READY, RECORDING } state_t; /* READY: the first call decides */

static pthread_mutex_t lock = PTHREAD_MUTEX_INITIALIZER;
/* The state is written with the lock held. */
static state_t state;
/* What is used with the lock held. */
static struct {
  char file[PATH_MAX]; /* "" if none was named */
  size_t size;         /* 0 if none is allowed */
  bool is_forked;
  char trouble[PATH_MAX + 256];
  recording_t recording;
  char tokens[TOKENS][LONGEST_TOKEN];
  secret_t secrets[TOKENS];
  size_t login_count;
} recorder;

static uint64_t now(void) {
  struct timespec time;
  clock_gettime(CLOCK_REALTIME, &time);
  return (uint64_t)time.tv_sec * 1000000000 + (uint64_t)time.tv_nsec;
}

/* ---- Loading */

/* A number of bytes, of KiB or of MiB: "65536", "64K", "4M". 0 if the text is none that is allowed.
 */
static size_t size_in(const char* text) {
  char* end = NULL;
  const unsigned long long number = strtoull(text, &end, 10);
  const unsigned long long unit = *end == 'K' ? 1 << 10 : *end == 'M' ? 1 << 20 : 1;
  const bool is_number = text[0] >= '0' && text[0] <= '9' && end[unit > 1 ? 1 : 0] == '\0';
  const bool is_allowed =
      is_number && number <= MOST_SIZE && number * unit >= LEAST_SIZE && number * unit <= MOST_SIZE;
  return is_allowed ? (size_t)(number * unit) : 0;
}

static void before_fork(void) {
  pthread_mutex_lock(&lock);
}

static void after_fork(void) {
  pthread_mutex_unlock(&lock);
}

/* The mapping is the parent's, too, so the child leaves it. */
static void in_child(void) {
  if (state == RECORDING) {
    recording_leave(&recorder.recording);
    recorder.is_forked = true;
    __atomic_store_n(&state, READY, __ATOMIC_RELAXED);
  }
  pthread_mutex_unlock(&lock);
}

/* The program may change its environment later. Handlers of forks that it adds later run before
   these, and after them in the child, so they may call the library. */
__attribute__((constructor)) static void read_settings(void) {
  const char* const file = secure_getenv("QEL_TRACE_FILE");
  const char* const size = secure_getenv("QEL_TRACE_SIZE");
  if (file != NULL && file[0] == '\0') {
    return;
  }
  snprintf(recorder.file, sizeof recorder.file, "%s", file != NULL ? file : "");
  recorder.size = size != NULL ? size_in(size) : DEFAULT_SIZE;
  pthread_atfork(before_fork, after_fork, in_child);
  __atomic_store_n(&state, READY, __ATOMIC_RELAXED);
}

/* ---- The first call */

/* With the process's number for "%p". A child of a fork has a file of its own in any case. */
static bool name_file(char* name, size_t size) {
  const char* const mark = strstr(recorder.file, "%p");
  const int process = (int)getpid();
  const int length = mark != NULL ? snprintf(name, size, "%.*s%d%s", (int)(mark - recorder.file),
                                             recorder.file, process, mark + 2)
                     : recorder.is_forked ? snprintf(name, size, "%s.%d", recorder.file, process)
                                          : snprintf(name, size, "%s", recorder.file);
  return (size_t)length < size;
}

/* Why nothing is recorded; NULL if it is. */
static const char* begin(void) {
  static char file[PATH_MAX]; /* the stack of the thread may be small */
  char writer[128];
  if (recorder.file[0] == '\0') {
    return "QEL_TRACE_FILE names no file";
  }
  if (recorder.size == 0) {
    return "QEL_TRACE_SIZE: 64K to 32M";
  }
  snprintf(writer, sizeof writer, "qel-trace in %s, process %d", program_invocation_short_name,
           (int)getpid());
  const int error = name_file(file, sizeof file)
                        ? recording_create(&recorder.recording, file, recorder.size, writer)
                        : ENAMETOOLONG;
  if (error == 0) {
    return NULL;
  }
  snprintf(recorder.trouble, sizeof recorder.trouble, "%s: %s", recorder.file, strerror(error));
  return recorder.trouble;
}

/* Not with the lock held: the log service has locks of its own. */
static void say_trouble(const char* trouble) {
  static const char format[] = "nothing is recorded: %s";
  const log_function_t log = library_log();
  if (log != NULL) {
    log(0, ERROR_PRIORITY, "QEL_TRACE", format, trouble);
  } else {
    fprintf(stderr, "QEL_TRACE: ");
    fprintf(stderr, format, trouble);
    fprintf(stderr, "\n");
  }
}

/* Whether calls are recorded; then the lock is held. */
static bool lock_recording(void) {
  const char* trouble = NULL;
  bool is_recording = false;
  if (__atomic_load_n(&state, __ATOMIC_RELAXED) == OFF) {
    return false;
  }
  pthread_mutex_lock(&lock);
  if (state == READY) {
    int cancelled = 0;
    pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &cancelled); /* or the lock would stay held */
    trouble = begin();
    pthread_setcancelstate(cancelled, NULL);
    __atomic_store_n(&state, trouble == NULL ? RECORDING : OFF, __ATOMIC_RELAXED);
  }
  is_recording = state == RECORDING;
  if (!is_recording) {
    pthread_mutex_unlock(&lock);
  }
  if (trouble != NULL) {
    say_trouble(trouble);
  }
  return is_recording;
}

/* ---- Calls */

/* The tokens that are known, and the one of this message, if it is a login. */
enum { SECRETS = TOKENS + 1 };
static size_t secrets_of(const char* token, secret_t* secrets) {
  const size_t known = recorder.login_count < TOKENS ? recorder.login_count : TOKENS;
  const size_t size = token != NULL ? strlen(token) : 0;
  memcpy(secrets, recorder.secrets, known * sizeof *secrets);
  if (size == 0) {
    return known;
  }
  secrets[known].bytes = token;
  secrets[known].size = size;
  return known + 1;
}

static void remember(const char* token) {
  const size_t size = strnlen(token, LONGEST_TOKEN);
  const size_t place = recorder.login_count % TOKENS;
  bool is_known = size < SHORTEST_TOKEN;
  for (size_t i = 0; i < TOKENS && !is_known; ++i) {
    const secret_t known = recorder.secrets[i];
    is_known = known.size == size && memcmp(known.bytes, token, size) == 0;
  }
  if (!is_known) {
    memcpy(recorder.tokens[place], token, size);
    recorder.secrets[place].bytes = recorder.tokens[place];
    recorder.secrets[place].size = size;
    ++recorder.login_count;
  }
}

static record_place_t add(const char* function, direction_t direction, outcome_t outcome,
                          const unsigned char* data, int size, const char* token, uint64_t time) {
  secret_t secrets[SECRETS];
  record_t record;
  record.direction = direction;
  record.outcome = outcome;
  record.time = time;
  record.function = function;
  record.data = data;
  record.size = data != NULL && size > 0 ? (size_t)size : 0;
  record.secrets = secrets;
  record.secret_count = secrets_of(token, secrets);
  return recording_add(&recorder.recording, &record);
}

void trace_sent(const char* function, unsigned char* const* message, const int* size,
                const char* token) {
  const int error = errno;
  const unsigned char* const data = message != NULL ? *message : NULL;
  if (lock_recording()) {
    add(function, SENT, data != NULL ? DONE : REFUSED, data, data != NULL ? *size : 0, token,
        now());
    if (token != NULL) {
      remember(token);
    }
    pthread_mutex_unlock(&lock);
  }
  errno = error;
}

void trace_received(received_t* call, const char* function, const unsigned char* data, int size,
                    int64_t* request_id, bool is_shared) {
  const int error = errno;
  memset(call, 0, sizeof *call);
  call->request_id = request_id;
  if (lock_recording()) {
    const uint64_t time = now();
    call->place = add(function, RECEIVED, NOT_ENDED, data, size, NULL, time);
    pthread_mutex_unlock(&lock);
    if (request_id != NULL && !is_shared) {
      /* A number that nobody can foresee, and so send. */
      call->unwritten = (int64_t)(time * UINT64_C(0x9e3779b97f4a7c15));
      call->own = call->unwritten;
      call->of_caller = request_id;
      call->request_id = &call->own;
    }
  }
  errno = error;
}

void trace_received_end(received_t* call) {
  const bool is_taken = call->own != call->unwritten;
  if (is_taken) {
    *call->of_caller = call->own;
  }
  if (call->place.number > 0) {
    pthread_mutex_lock(&lock);
    recording_end(&recorder.recording, &call->place,
                  is_taken                  ? DONE
                  : call->of_caller != NULL ? REFUSED
                                            : UNTOLD);
    pthread_mutex_unlock(&lock);
  }
}
