#define _GNU_SOURCE /* RTLD_NEXT, dlvsym */
#include "library.h"

#include <dlfcn.h>
#include <errno.h>
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
#error \
    "Which version does the C library's dlsym have on this processor? -DQEL_TRACE=OFF builds the rest."
#endif

typedef void* (*lookup_t)(void* handle, const char* name);

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

/* All at once: a look-up waits for threads that are loading something, and is over then for good.
   In the global scope, others may stand between the library and this one. */
static void find_functions(void) {
  const lookup_t lookup = real_lookup();
  void* const library = loaded_library();
  for (size_t i = 0; i < traced_function_count; ++i) {
    traced_function_t* const function = &traced_functions[i];
    void* behind = __atomic_load_n(&function->behind, __ATOMIC_RELAXED);
    if (behind == NULL) {
      behind = lookup(RTLD_NEXT, function->name);
    }
    if (behind == NULL && library != NULL) {
      behind = lookup(library, function->name);
    }
    __atomic_store_n(&function->behind, behind, __ATOMIC_RELAXED);
  }
}

static void* found_behind(traced_function_t* function) {
  if (__atomic_load_n(&function->behind, __ATOMIC_RELAXED) == NULL) {
    find_functions();
  }
  return __atomic_load_n(&function->behind, __ATOMIC_RELAXED);
}

void* function_behind(traced_function_t* function) {
  const int error = errno;
  void* behind = found_behind(function);
  if (behind == NULL && dlopen(QEL_TRACED_LIBRARY, RTLD_LAZY) != NULL) {
    behind = found_behind(function);
  }
  if (behind == NULL) {
    fprintf(stderr, "QEL_TRACE: there is no %s of " QEL_TRACED_LIBRARY ": %s\n", function->name,
            dlerror());
    abort();
  }
  errno = error;
  return behind;
}

log_function_t library_log(void) {
  void* const library = loaded_library();
  void* const address = library != NULL ? real_lookup()(library, "__dlog_print") : NULL;
  log_function_t log = NULL;
  memcpy(&log, &address, sizeof log);
  return log;
}

/* ---- Programs that look functions up */

/* Sanitizers look functions up before any of them may be called, and strcmp is one of theirs. */
static int is_same(const char* one, const char* other) {
  while (*one != '\0' && *one == *other) {
    ++one;
    ++other;
  }
  return *one == *other;
}

static traced_function_t* function_named(const char* name) {
  for (size_t i = 0; i < traced_function_count; ++i) {
    if (is_same(name, traced_functions[i].name)) {
      return &traced_functions[i];
    }
  }
  return NULL;
}

/* Who looks a function up in the library itself finds the one here; without the library, none. What
   RTLD_NEXT means depends on who calls, so other look-ups are tail calls: they return to the
   caller. */
void* dlsym(void* restrict handle, const char* restrict name) {
  const lookup_t real = real_lookup();
  traced_function_t* const function = function_named(name);
  if (function == NULL || handle == RTLD_NEXT) {
    return real(handle, name);
  }
  void* const found = real(handle, name);
  if (found == NULL) {
    return NULL;
  }
  void* const behind = found_behind(function);
  if (behind == NULL && found == function->address) {
    real(RTLD_NEXT, name); /* finds none, and dlerror() says so */
    return NULL;
  }
  return found == behind ? function->address : found;
}
