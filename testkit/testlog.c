#include <pthread.h>
#include <stdarg.h>
#include <stdbool.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "qel-testlog.h"

/* The platform's function. */
int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

enum { LINE_LENGTH = 4096 }; /* what is longer is cut off, as on the device */

typedef struct line {
  struct line* next;
  char text[];
} line_t;

static pthread_mutex_t lock = PTHREAD_MUTEX_INITIALIZER;
static line_t* first;
static line_t** end = &first;

static char letter_of(int priority) {
  static const char letters[] = "??VDIWEFS";
  const bool is_known = priority >= 0 && priority < (int)sizeof letters - 1;
  return letters[is_known ? priority : 0];
}

int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...) {
  const size_t head = strlen("E ") + strlen(tag) + strlen(": ");
  char text[LINE_LENGTH] = "";
  va_list arguments;
  line_t* line;

  (void)log_id;
  va_start(arguments, format);
  vsnprintf(text, sizeof text, format, arguments);
  va_end(arguments);
  text[strcspn(text, "\n")] = '\0';
  line = malloc(sizeof *line + head + strlen(text) + 1);
  if (line == NULL) {
    return -1;
  }
  line->next = NULL;
  snprintf(line->text, head + strlen(text) + 1, "%c %s: %s", letter_of(priority), tag, text);
  pthread_mutex_lock(&lock);
  *end = line;
  end = &line->next;
  pthread_mutex_unlock(&lock);
  return (int)strlen(text);
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
