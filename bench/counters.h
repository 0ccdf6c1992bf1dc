/* Counters of a program. Each is NULL unless the program is linked with the file that has it. */
#ifndef BENCH_COUNTERS_H
#define BENCH_COUNTERS_H

#ifdef __cplusplus
extern "C" {
#endif

/* Lines that the calling thread has logged (counting_log.c). */
long log_lines(void) __attribute__((weak));

/* Blocks taken from the heap, and those that have not been released (counting_heap.c). */
struct allocations {
  long made;
  long kept;
};
struct allocations allocations(void) __attribute__((weak));

#ifdef __cplusplus
}
#endif

#endif
