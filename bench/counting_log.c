/* A log service that counts each thread's lines and does nothing else. */

#include "counters.h"

static _Thread_local long lines;

/* What comes after these it does not take. */
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
