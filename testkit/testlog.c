#include <pthread.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "qel-testlog.h"

/* The platform's function. */
int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

typedef struct line {
  struct line* next;
  char text[];
} line_t;

static pthread_mutex_t lock = PTHREAD_MUTEX_INITIALIZER;
static line_t* first;
static line_t** end = &first;

static char letter_of(int priority) {
  static const char letters[] = "??VDIWEFS";
  return priority < 0 || priority >= (int)sizeof letters - 1 ? '?' : letters[priority];
}

int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...) {
  const size_t head = strlen("E ") + strlen(tag) + strlen(": ");
  va_list arguments;
  line_t* line;
  int length;

  (void)log_id;
  va_start(arguments, format);
  length = vsnprintf(NULL, 0, format, arguments);
  va_end(arguments);
  line = length < 0 ? NULL : malloc(sizeof *line + head + (size_t)length + 1);
  if (line == NULL) {
    return -1;
  }
  line->next = NULL;
  snprintf(line->text, head + 1, "%c %s: ", letter_of(priority), tag);
  va_start(arguments, format);
  vsnprintf(line->text + head, (size_t)length + 1, format, arguments);
  va_end(arguments);
  if (length > 0 && line->text[head + (size_t)length - 1] == '\n') {
    line->text[head + (size_t)length - 1] = '\0';
  }
  pthread_mutex_lock(&lock);
  *end = line;
  end = &line->next;
  pthread_mutex_unlock(&lock);
  return length;
}

/* The first one from there on, or NULL. */
static const line_t* line_with(const char* text, const line_t* line) {
  while (line != NULL && text != NULL && strstr(line->text, text) == NULL) {
    line = line->next;
  }
  return line;
}

int qel_testlog_count(const char* text) {
  int count = 0;
  const line_t* line;
  for (line = line_with(text, first); line != NULL; line = line_with(text, line->next)) {
    ++count;
  }
  return count;
}

const char* qel_testlog_find(const char* text) {
  const line_t* line = line_with(text, first);
  return line != NULL ? line->text : NULL;
}

void qel_testlog_clear(void) {
  while (first != NULL) {
    line_t* line = first;
    first = line->next;
    free(line);
  }
  end = &first;
}
