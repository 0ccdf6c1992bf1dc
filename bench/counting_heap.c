/* A heap that counts the blocks that a program of one thread allocates and releases. */
#include <stddef.h>

#include "counters.h"

/* The functions of glibc that do the work, under the names that glibc exports for this. */
void* __libc_malloc(size_t size);
void* __libc_calloc(size_t count, size_t size);
void* __libc_realloc(void* block, size_t size);
void __libc_free(void* block);

static struct allocations counted;

static void* count(void* block) {
  if (block != NULL) {
    ++counted.made;
    ++counted.kept;
  }
  return block;
}

void* malloc(size_t size) {
  return count(__libc_malloc(size));
}

void* calloc(size_t elements, size_t size) {
  return count(__libc_calloc(elements, size));
}

/* Counts as a new block in place of the old one. */
void* realloc(void* block, size_t size) {
  if (block != NULL) {
    --counted.kept;
  }
  return count(__libc_realloc(block, size));
}

void free(void* block) {
  if (block != NULL) {
    --counted.kept;
  }
  __libc_free(block);
}

struct allocations allocations(void) {
  return counted;
}
