/*
 * Where the functions of the library are, which the functions of the same names here call. The
 * library is not linked: what is preloaded into every program must not bring it along.
 */
#ifndef QEL_TRACE_LIBRARY_H
#define QEL_TRACE_LIBRARY_H

#include <stddef.h>

/* A function of calls.c, and the one behind it. */
typedef struct traced_function {
  const char* name;
  void* address;
  void* behind; /* NULL until it is looked up */
} traced_function_t;

extern traced_function_t traced_functions[];
extern const size_t traced_function_count;

/* What comes behind the function, whatever scope it was loaded into. Ends the process if nothing
   does. */
void* function_behind(traced_function_t* function);

typedef int (*log_function_t)(int log_id, int priority, const char* tag, const char* format, ...);

/* The log service that the library uses, or NULL. */
log_function_t library_log(void);

#endif
