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

enum { DEFAULT_SIZE = 4 << 20, LONGEST_TOKEN = 4096, ERROR_PRIORITY = 6 };

static pthread_mutex_t lock = PTHREAD_MUTEX_INITIALIZER;
/* All of it is used with the lock held. */
static struct {
  enum { UNDECIDED, RECORDING, SILENT } state;
  bool is_forked;
  recording_t recording;
  char token[LONGEST_TOKEN];
  size_t token_size;
} recorder;

static uint64_t now(void) {
  struct timespec time;
  clock_gettime(CLOCK_REALTIME, &time);
  return (uint64_t)time.tv_sec * 1000000000 + (uint64_t)time.tv_nsec;
}

/* ---- Beginning */

static void say(const char* text) {
  const log_function_t log = library_log();
  if (log != NULL) {
    log(0, ERROR_PRIORITY, "QEL_TRACE", "%s", text);
  } else {
    fprintf(stderr, "QEL_TRACE: %s\n", text);
  }
}

static void say_trouble(const char* what, const char* why) {
  char text[PATH_MAX + 256];
  snprintf(text, sizeof text, "nothing is recorded: %s: %s", what, why);
  say(text);
}

/* A number of bytes, of KiB or of MiB: "65536", "64K", "4M". 0 if the text is none that is allowed. */
static size_t size_in(const char* text) {
  char* end = NULL;
  const unsigned long long number = strtoull(text, &end, 10);
  const unsigned long long unit = *end == 'K' ? 1 << 10 : *end == 'M' ? 1 << 20 : 1;
  const bool is_number = text[0] >= '0' && text[0] <= '9' && end[unit > 1 ? 1 : 0] == '\0';
  const bool is_allowed = is_number && number <= MOST_SIZE && number * unit >= LEAST_SIZE &&
                          number * unit <= MOST_SIZE;
  return is_allowed ? (size_t)(number * unit) : 0;
}

/* With the process's number for "%p". A child of a fork has a file of its own in any case. */
static bool name_file(const char* pattern, char* name, size_t size) {
  const char* const mark = strstr(pattern, "%p");
  const int process = (int)getpid();
  const int length =
      mark != NULL ? snprintf(name, size, "%.*s%d%s", (int)(mark - pattern), pattern, process, mark + 2)
      : recorder.is_forked ? snprintf(name, size, "%s.%d", pattern, process)
                           : snprintf(name, size, "%s", pattern);
  return (size_t)length < size;
}

static bool begin_in(const char* pattern) {
  char file[PATH_MAX];
  char writer[128];
  const char* const size_text = secure_getenv("QEL_TRACE_SIZE");
  const size_t size = size_text != NULL ? size_in(size_text) : DEFAULT_SIZE;
  if (size == 0) {
    say_trouble("QEL_TRACE_SIZE", "64K to 32M");
    return false;
  }
  snprintf(writer, sizeof writer, "qel-trace in %s, process %d", program_invocation_short_name,
           (int)getpid());
  const int error = name_file(pattern, file, sizeof file)
                        ? recording_create(&recorder.recording, file, size, writer)
                        : ENAMETOOLONG;
  if (error != 0) {
    say_trouble(pattern, strerror(error));
  }
  return error == 0;
}

static void before_fork(void) {
  pthread_mutex_lock(&lock);
}

static void after_fork(void) {
  pthread_mutex_unlock(&lock);
}

/* The mapping is the parent's, too, so the child leaves it. */
static void in_child(void) {
  recording_leave(&recorder.recording);
  if (recorder.state == RECORDING) {
    recorder.state = UNDECIDED;
    recorder.is_forked = true;
  }
  pthread_mutex_unlock(&lock);
}

/* With the lock held. */
static bool is_recording(void) {
  if (recorder.state == UNDECIDED) {
    const char* const file = secure_getenv("QEL_TRACE_FILE");
    if (file == NULL) {
      say("nothing is recorded: QEL_TRACE_FILE names no file");
    }
    recorder.state = file != NULL && file[0] != '\0' && begin_in(file) ? RECORDING : SILENT;
    if (recorder.state == RECORDING && !recorder.is_forked) {
      pthread_atfork(before_fork, after_fork, in_child);
    }
  }
  return recorder.state == RECORDING;
}

/* ---- Calls */

static void remember(const char* token) {
  const size_t size = strlen(token);
  recorder.token_size = size < LONGEST_TOKEN ? size : 0;
  memcpy(recorder.token, token, recorder.token_size);
}

static record_place_t add(const char* function, direction_t direction, outcome_t outcome,
                          const unsigned char* data, int size, uint64_t time, secret_t secret) {
  const record_t record = {
      .direction = direction,
      .outcome = outcome,
      .time = time,
      .function = function,
      .data = data,
      .size = data != NULL && size > 0 ? (size_t)size : 0,
      .secret = secret,
  };
  return recording_add(&recorder.recording, &record);
}

static secret_t known_token(void) {
  const secret_t secret = {recorder.token, recorder.token_size};
  return secret;
}

void trace_sent(const char* function, unsigned char* const* message, const int* size,
                const char* token) {
  const int error = errno;
  const unsigned char* const data = message != NULL ? *message : NULL;
  pthread_mutex_lock(&lock);
  if (is_recording()) {
    secret_t secret = known_token();
    if (token != NULL && data != NULL) {
      remember(token);
      secret.bytes = token;
      secret.size = strlen(token);
    }
    add(function, SENT, data != NULL ? DONE : REFUSED, data, data != NULL ? *size : 0, now(),
        secret);
  }
  pthread_mutex_unlock(&lock);
  errno = error;
}

void trace_received(received_t* call, const char* function, const unsigned char* data, int size,
                    int64_t* request_id) {
  const int error = errno;
  memset(call, 0, sizeof *call);
  call->request_id = request_id;
  pthread_mutex_lock(&lock);
  if (is_recording()) {
    const uint64_t time = now();
    call->place = add(function, RECEIVED, NOT_ENDED, data, size, time, known_token());
    if (request_id != NULL) {
      /* A number that nobody can foresee, and so send. */
      call->unwritten = (int64_t)(time * UINT64_C(0x9e3779b97f4a7c15));
      call->own = call->unwritten;
      call->of_caller = request_id;
      call->request_id = &call->own;
    }
  }
  pthread_mutex_unlock(&lock);
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
                  is_taken ? DONE : call->of_caller != NULL ? REFUSED : UNTOLD);
    pthread_mutex_unlock(&lock);
  }
}
