/*
 * Where the functions of the library are, which the functions of the same names here call. The
 * library is not linked: what is preloaded into every program must not bring it along.
 */
#ifndef QEL_TRACE_LIBRARY_H
#define QEL_TRACE_LIBRARY_H

#include <stddef.h>

/* The library's, whatever scope it was loaded into. Ends the process if there is none. */
void* library_function(size_t index);

typedef int (*log_function_t)(int log_id, int priority, const char* tag, const char* format, ...);

/* The log service that the library uses, or NULL. */
log_function_t library_log(void);

/* The functions of calls.c, in its order. */
typedef struct traced_function {
  const char* name;
  void* address;
} traced_function_t;

enum { TRACED_FUNCTIONS = 32 };
extern const traced_function_t traced_functions[TRACED_FUNCTIONS];

#endif
