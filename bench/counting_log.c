/* A log service that only counts the lines of each thread. */

#include "counters.h"

static _Thread_local long lines;

/* The format and its arguments are not looked at. */
int __dlog_print(int log_id, int priority, const char* tag);

int __dlog_print(int log_id, int priority, const char* tag) {
  (void)log_id;
  (void)priority;
  (void)tag;
  return (int)++lines;
}

long log_lines(void) {
  return lines;
}
