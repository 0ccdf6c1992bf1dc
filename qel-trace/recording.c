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

/* What is not used is divided at these places, so that a block of it has both its lengths near the
   records, which change them: a copy of the file reads both at about the same time. */
enum { UNUSED_SIZE = 64 << 10 };

/* A secret is searched for by its first bytes, as a search prepares itself for all that it gets. */
enum { SEARCHED_SIZE = 32 };

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

/* Where an unused block ends that begins there. */
static size_t end_of_unused(size_t begin, size_t half_size) {
  const size_t end = (begin + BLOCK_SIZE + UNUSED_SIZE - 1) / UNUSED_SIZE * UNUSED_SIZE;
  return end < half_size ? end : half_size;
}

/* The two ends of an unused block are changed one after the other. But for the moment between them,
   which two stores take, each half is a row of whole blocks. */

/* Makes unused blocks of all behind the head: at first one, and then, in it, the others. */
static void empty(recording_t* recording, half_t* half) {
  const size_t size = recording->half_size;
  const size_t first_end = end_of_unused(recording->head_size, size);
  unsigned char* const first = half->begin + recording->head_size;
  size_t begin = first_end;
  uint32_t last_size = (uint32_t)(size - recording->head_size);

  publish32(first, UNUSED);
  publish32(half->begin + size - 4, last_size);
  publish32(first + 4, last_size);
  half->used = recording->head_size;
  half->first_number = recording->last_number + 1;

  if (first_end < size) {
    put32(half->begin + first_end - 4, (uint32_t)(first_end - recording->head_size));
  }
  while (begin < size) {
    const size_t end = end_of_unused(begin, size);
    last_size = (uint32_t)(end - begin);
    put32(put32(half->begin + begin, UNUSED), last_size);
    if (end < size) {
      put32(half->begin + end - 4, last_size);
    }
    begin = end;
  }
  publish32(half->begin + size - 4, last_size);
  publish32(first + 4, (uint32_t)(first_end - recording->head_size));
}

/* ---- The file */

static int move_away(const char* file) {
  struct stat status;
  static char old[PATH_MAX]; /* the stack of the thread may be small */
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

/* Null without memory or disk space, with the reason in errno. */
static unsigned char* map_file(int file, size_t size) {
  void* memory = MAP_FAILED;
  errno = EFBIG;
  if (is_within_limit(size)) {
    do {
      errno = posix_fallocate(file, 0, (off_t)size);
    } while (errno == EINTR);
    if (errno == 0) {
      memory = mmap(NULL, size, PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
    }
  }
  return memory == MAP_FAILED ? NULL : memory;
}

int recording_create(recording_t* recording, const char* file, size_t size, const char* writer) {
  const int error = move_away(file);
  if (error != 0) {
    return error;
  }
  const int opened = open(file, O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
  if (opened < 0) {
    return errno;
  }
  const size_t half_size = size / 2 / 4096 * 4096;
  unsigned char* const mapping = map_file(opened, 2 * half_size);
  const int map_error = errno;
  close(opened);
  if (mapping == NULL) {
    unlink(file);
    return map_error;
  }
  recording->half_size = half_size;
  ++recording->file_number;
  recording->last_number = 0;
  recording->current = 0;
  for (int i = 0; i < 2; ++i) {
    recording->halves[i].begin = mapping + (size_t)i * half_size;
    recording->head_size = write_head(recording->halves[i].begin, half_size, writer);
    empty(recording, &recording->halves[i]);
  }
  return 0;
}

void recording_leave(recording_t* recording) {
  if (recording->half_size > 0) {
    munmap(recording->halves[0].begin, 2 * recording->half_size);
    recording->half_size = 0;
  }
}

/* ---- Records */

/* Where the secret is, or NULL. */
static const unsigned char* find(secret_t secret, const unsigned char* from, size_t size) {
  const size_t searched = secret.size < SEARCHED_SIZE ? secret.size : SEARCHED_SIZE;
  const unsigned char* const end = from + size;
  const unsigned char* found = from;
  while ((found = memmem(found, (size_t)(end - found), secret.bytes, searched)) != NULL) {
    if ((size_t)(end - found) >= secret.size && memcmp(found, secret.bytes, secret.size) == 0) {
      return found;
    }
    ++found;
  }
  return NULL;
}

/* Copies as much as there is room for. No secret is written, not even for a moment. */
static void copy_without_secrets(const record_t* record, unsigned char* to, size_t room) {
  size_t done = 0;
  while (done < record->size && done < room) {
    size_t end = record->size;
    size_t hidden = 0;
    for (size_t i = 0; i < record->secret_count; ++i) {
      const secret_t secret = record->secrets[i];
      const size_t reach = end < room ? end : room;
      const size_t rest = record->size - done;
      const size_t most = reach - done + secret.size;
      const unsigned char* const found =
          find(secret, record->data + done, rest < most ? rest : most);
      if (found != NULL && (size_t)(found - record->data) < end) {
        end = (size_t)(found - record->data);
        hidden = secret.size;
      }
    }
    memcpy(to + done, record->data + done, (end < room ? end : room) - done);
    if (end < room) {
      memset(to + end, '*', (end + hidden < room ? end + hidden : room) - end);
    }
    done = end + hidden;
  }
}

record_place_t recording_add(recording_t* recording, const record_t* record) {
  const size_t name_size = strlen(record->function);
  const size_t size = RECORD_HEAD + name_size + record->size;
  /* Behind it there must be room for an unused block. */
  const size_t around = BLOCK_SIZE + PACKET_HEAD + BLOCK_SIZE + 3; /* with padding */
  const size_t most = recording->half_size - recording->head_size - around;
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
  const size_t rest_end = end_of_unused(half->used + block_size, recording->half_size);
  if (rest_end != end_of_unused(half->used, recording->half_size)) { /* it needs more blocks */
    const uint32_t room = (uint32_t)(rest_end - half->used);
    publish32(half->begin + rest_end - 4, room);
    publish32(block + 4, room);
  }

  unsigned char* to = put32(block + 8, 0);
  to = put32(put32(to, (uint32_t)(record->time >> 32)), (uint32_t)record->time);
  to = put32(put32(to, (uint32_t)captured), (uint32_t)size);
  to = put(to, "qel\1", 4);
  to = put32(to, recording->last_number);
  *to++ = (unsigned char)record->direction;
  place.outcome = to;
  *to++ = (unsigned char)record->outcome;
  to = put(put16(to, (unsigned)name_size), record->function, name_size);
  copy_without_secrets(record, to, captured - RECORD_HEAD - name_size);
  memset(to + captured - RECORD_HEAD - name_size, 0, padded(captured) - captured);
  put32(block + block_size - 4, (uint32_t)block_size);

  const uint32_t rest = (uint32_t)(rest_end - half->used - block_size);
  put32(put32(block + block_size, UNUSED), rest);
  publish32(half->begin + rest_end - 4, rest);
  publish32(block + 4, (uint32_t)block_size);
  publish32(block, PACKET);
  half->used += block_size;

  place.number = recording->last_number;
  place.half = recording->current;
  place.file_number = recording->file_number;
  return place;
}

void recording_end(recording_t* recording, const record_place_t* place, outcome_t outcome) {
  const bool is_there = recording->half_size > 0 && place->file_number == recording->file_number &&
                        place->number >= recording->halves[place->half].first_number;
  if (is_there) {
    *place->outcome = (unsigned char)outcome;
  }
}
