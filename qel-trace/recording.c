#define _GNU_SOURCE /* memmem, O_CLOEXEC, O_NOFOLLOW, posix_fallocate */
#include "recording.h"

#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <stdio.h>
#include <string.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

/* Blocks of pcapng: their types, and the bytes of one without its content. */
enum { SECTION = 0x0a0d0d0a, INTERFACE = 1, PACKET = 6, BLOCK_SIZE = 12 };
#define UNUSED UINT32_C(0x80000000) /* for local use */

enum { PACKET_HEAD = 20, RECORD_HEAD = 12 };

static size_t padded(size_t size) {
  return (size + 3) & ~(size_t)3;
}

/* ---- Blocks */

static unsigned char* put(unsigned char* to, const void* bytes, size_t size) {
  memcpy(to, bytes, size);
  return to + size;
}

static unsigned char* put16(unsigned char* to, unsigned number) {
  const uint16_t value = (uint16_t)number;
  return put(to, &value, sizeof value);
}

static unsigned char* put32(unsigned char* to, uint32_t number) {
  return put(to, &number, sizeof number);
}

/* The two are seen in this order, whatever the compiler and the processor do with others. */
static void publish32(unsigned char* to, uint32_t number) {
  __atomic_store_n((uint32_t*)(void*)to, number, __ATOMIC_RELEASE);
}

static unsigned char* put_option(unsigned char* to, unsigned code, const void* value, size_t size) {
  static const char padding[4];
  to = put16(put16(to, code), (unsigned)size);
  return put(put(to, value, size), padding, padded(size) - size);
}

/* Behind the content of a block: the end of its options, and the lengths at both ends. */
static unsigned char* finish_block(unsigned char* block, unsigned char* to) {
  const uint32_t size = (uint32_t)(to + 8 - block);
  to = put32(put32(to, 0), size);
  put32(block + 4, size);
  return to;
}

/* What each section begins with. */
static size_t write_head(unsigned char* begin, size_t half_size, const char* writer) {
  enum { USER_APPLICATION = 4, TIME_RESOLUTION = 9 };
  static const char nanoseconds[] = {9};
  const uint64_t unknown_length = UINT64_MAX;
  unsigned char* block = begin;
  unsigned char* to = put32(put32(block, SECTION), 0);
  to = put16(put16(put32(to, 0x1a2b3c4d), 1), 0); /* byte order, version */
  to = put(to, &unknown_length, sizeof unknown_length);
  to = put_option(to, USER_APPLICATION, writer, strlen(writer));
  block = finish_block(block, to);

  enum { LINKTYPE_USER0 = 147 };
  to = put32(put32(block, INTERFACE), 0);
  to = put32(put16(put16(to, LINKTYPE_USER0), 0), (uint32_t)half_size);
  to = put_option(to, TIME_RESOLUTION, nanoseconds, sizeof nanoseconds);
  return (size_t)(finish_block(block, to) - begin);
}

/* Makes one unused block of all behind the head. */
static void empty(recording_t* recording, half_t* half) {
  const uint32_t size = (uint32_t)(recording->half_size - recording->head_size);
  unsigned char* const block = half->begin + recording->head_size;
  publish32(block, UNUSED);
  publish32(half->begin + recording->half_size - 4, size);
  publish32(block + 4, size);
  half->used = recording->head_size;
  half->first_number = recording->last_number + 1;
}

/* ---- The file */

static int move_away(const char* file) {
  struct stat status;
  char old[PATH_MAX];
  if (lstat(file, &status) != 0) {
    return errno == ENOENT ? 0 : errno;
  }
  if (!S_ISREG(status.st_mode)) {
    return EEXIST;
  }
  if ((size_t)snprintf(old, sizeof old, "%s.old", file) >= sizeof old) {
    return ENAMETOOLONG;
  }
  return rename(file, old) == 0 ? 0 : errno;
}

/* More than the limit would end the process by a signal. */
static bool is_within_limit(size_t size) {
  struct rlimit limit;
  return getrlimit(RLIMIT_FSIZE, &limit) != 0 || limit.rlim_cur >= size;
}

static int map_file(int file, size_t size, unsigned char** mapping) {
  const int error = is_within_limit(size) ? posix_fallocate(file, 0, (off_t)size) : EFBIG;
  if (error != 0) {
    return error;
  }
  void* const memory = mmap(NULL, size, PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
  if (memory == MAP_FAILED) {
    return errno;
  }
  *mapping = memory;
  return 0;
}

int recording_create(recording_t* recording, const char* file, size_t size, const char* writer) {
  unsigned char* mapping = NULL;
  int error = move_away(file);
  if (error != 0) {
    return error;
  }
  const int opened = open(file, O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
  if (opened < 0) {
    return errno;
  }
  recording->half_size = size / 2 / 4096 * 4096;
  error = map_file(opened, 2 * recording->half_size, &mapping);
  close(opened);
  if (error != 0) {
    unlink(file);
    recording->half_size = 0;
    return error;
  }
  recording->last_number = 0;
  recording->current = 0;
  for (int i = 0; i < 2; ++i) {
    recording->halves[i].begin = mapping + (size_t)i * recording->half_size;
    recording->head_size = write_head(recording->halves[i].begin, recording->half_size, writer);
    empty(recording, &recording->halves[i]);
  }
  return 0;
}

void recording_leave(recording_t* recording) {
  if (recording->half_size > 0) {
    munmap(recording->halves[0].begin, 2 * recording->half_size);
    memset(recording, 0, sizeof *recording);
  }
}

/* ---- Records */

/* The secret is never written, not even for a moment. */
static void copy_without(secret_t secret, const unsigned char* from, size_t size,
                         unsigned char* to, size_t room) {
  size_t done = 0;
  while (done < size && done < room) {
    const unsigned char* const found =
        secret.size > 0 ? memmem(from + done, size - done, secret.bytes, secret.size) : NULL;
    const size_t end = found != NULL ? (size_t)(found - from) : size;
    const size_t hidden = found != NULL ? end + secret.size : size;
    memcpy(to + done, from + done, (end < room ? end : room) - done);
    if (end < room) {
      memset(to + end, '*', (hidden < room ? hidden : room) - end);
    }
    done = hidden;
  }
}

record_place_t recording_add(recording_t* recording, const record_t* record) {
  const size_t name_size = strlen(record->function);
  const size_t size = RECORD_HEAD + name_size + record->size;
  /* Behind it there must be room for an unused block. */
  const size_t most = recording->half_size - recording->head_size - 2 * BLOCK_SIZE - PACKET_HEAD - 4;
  const size_t captured = size < most ? size : most;
  const size_t block_size = BLOCK_SIZE + PACKET_HEAD + padded(captured);
  record_place_t place;
  half_t* half = &recording->halves[recording->current];

  if (half->used + block_size + BLOCK_SIZE > recording->half_size) {
    recording->current = 1 - recording->current;
    half = &recording->halves[recording->current];
    empty(recording, half);
  }
  ++recording->last_number;

  unsigned char* const block = half->begin + half->used;
  unsigned char* to = put32(block + 8, 0);
  to = put32(put32(to, (uint32_t)(record->time >> 32)), (uint32_t)record->time);
  to = put32(put32(to, (uint32_t)captured), (uint32_t)size);
  to = put(to, "qel\1", 4);
  to = put32(to, recording->last_number);
  *to++ = (unsigned char)record->direction;
  place.outcome = to;
  *to++ = (unsigned char)record->outcome;
  to = put(put16(to, (unsigned)name_size), record->function, name_size);
  copy_without(record->secret, record->data, record->size, to, captured - RECORD_HEAD - name_size);
  memset(to + captured - RECORD_HEAD - name_size, 0, padded(captured) - captured);
  put32(block + block_size - 4, (uint32_t)block_size);

  /* At each moment the half is a row of whole blocks, but for one between two of these lines. */
  const uint32_t rest = (uint32_t)(recording->half_size - half->used - block_size);
  put32(put32(block + block_size, UNUSED), rest);
  publish32(half->begin + recording->half_size - 4, rest);
  publish32(block + 4, (uint32_t)block_size);
  publish32(block, PACKET);
  half->used += block_size;

  place.number = recording->last_number;
  place.half = recording->current;
  return place;
}

void recording_end(recording_t* recording, const record_place_t* place, outcome_t outcome) {
  if (recording->half_size > 0 && place->number >= recording->halves[place->half].first_number) {
    *place->outcome = (unsigned char)outcome;
  }
}
