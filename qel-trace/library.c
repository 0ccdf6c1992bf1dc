#define _GNU_SOURCE /* RTLD_NEXT, dlvsym */
#include "library.h"

#include <dlfcn.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

/* The C library's, which has this version since it is there. */
#if defined(__x86_64__)
#define OLDEST_DLSYM "GLIBC_2.2.5"
#elif defined(__arm__)
#define OLDEST_DLSYM "GLIBC_2.4"
#elif defined(__aarch64__)
#define OLDEST_DLSYM "GLIBC_2.17"
#else
#error "Which version does the C library's dlsym have on this processor?"
#endif

typedef void* (*lookup_t)(void* handle, const char* name);

static void* found_functions[TRACED_FUNCTIONS];

/* Names of functions are data to the C library. */
static lookup_t real_lookup(void) {
  static lookup_t real;
  lookup_t lookup = __atomic_load_n(&real, __ATOMIC_RELAXED);
  if (lookup == NULL) {
    void* const address = dlvsym(RTLD_NEXT, "dlsym", OLDEST_DLSYM);
    memcpy(&lookup, &address, sizeof lookup);
    __atomic_store_n(&real, lookup, __ATOMIC_RELAXED);
  }
  return lookup;
}

/* By its SONAME, which finds it in any scope. It stays loaded in any case. */
static void* loaded_library(void) {
  return dlopen(QEL_TRACED_LIBRARY, RTLD_LAZY | RTLD_NOLOAD);
}

static void* loaded_function(size_t index) {
  void* function = __atomic_load_n(&found_functions[index], __ATOMIC_RELAXED);
  void* const library = function == NULL ? loaded_library() : NULL;
  if (library != NULL) {
    function = real_lookup()(library, traced_functions[index].name);
    __atomic_store_n(&found_functions[index], function, __ATOMIC_RELAXED);
  }
  return function;
}

void* library_function(size_t index) {
  void* function = loaded_function(index);
  if (function == NULL && dlopen(QEL_TRACED_LIBRARY, RTLD_LAZY) != NULL) {
    function = loaded_function(index);
  }
  if (function == NULL) {
    fprintf(stderr, "QEL_TRACE: there is no %s of " QEL_TRACED_LIBRARY ": %s\n",
            traced_functions[index].name, dlerror());
    abort();
  }
  return function;
}

log_function_t library_log(void) {
  void* const library = loaded_library();
  void* const address = library != NULL ? real_lookup()(library, "__dlog_print") : NULL;
  log_function_t log = NULL;
  memcpy(&log, &address, sizeof log);
  return log;
}

/* Sanitizers look functions up before any of them may be called, and strcmp is one of theirs. */
static int is_same(const char* one, const char* other) {
  while (*one != '\0' && *one == *other) {
    ++one;
    ++other;
  }
  return *one == *other;
}

/* Programs may look the library's functions up in the library itself, and find these; without the
   library they find none. What RTLD_NEXT means depends on who calls, so other look-ups are tail
   calls: they return to the caller. */
void* dlsym(void* restrict handle, const char* restrict name) {
  const lookup_t real = real_lookup();
  size_t index = 0;
  while (index < TRACED_FUNCTIONS && !is_same(name, traced_functions[index].name)) {
    ++index;
  }
  if (index == TRACED_FUNCTIONS || handle == RTLD_NEXT) {
    return real(handle, name);
  }
  void* const found = real(handle, name);
  void* const address = traced_functions[index].address;
  void* const behind = loaded_function(index);
  if (behind == NULL) {
    return found == address ? NULL : found;
  }
  return found == behind ? address : found;
}
