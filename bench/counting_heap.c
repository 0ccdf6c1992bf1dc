/* A heap that counts the blocks that the program, of one thread, takes from it and gives back. */
#include <stddef.h>

#include "counters.h"

/* glibc's own, under the names by which it lets others build on them. */
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

/* A block that grows is a new one in place of the old. */
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
