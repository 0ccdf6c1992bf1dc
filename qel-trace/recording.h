/*
 * A session file that is written in place, as a ring: when it is full, the oldest records go. It
 * is a mapping, so a record costs no call into the kernel, and what was written stays if the
 * process is killed. docs/session-file.md has the format.
 *
 * A recording is used by one thread at a time.
 */
#ifndef QEL_TRACE_RECORDING_H
#define QEL_TRACE_RECORDING_H

#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>

/* Readers of pcapng take no block of more than 16 MiB, and there are two halves. */
enum { LEAST_SIZE = 64 << 10, MOST_SIZE = 32 << 20 };

typedef enum direction { SENT = 1, RECEIVED = 2 } direction_t;

/* How a call has ended. */
typedef enum outcome { NOT_ENDED = 0, DONE = 1, REFUSED = 2, UNTOLD = 3 } outcome_t;

/* Bytes that are not written, but asterisks in their place, wherever they are in a message. */
typedef struct secret {
  const char* bytes;
  size_t size; /* at least 1 */
} secret_t;

typedef struct record {
  direction_t direction;
  outcome_t outcome;
  uint64_t time;             /* in nanoseconds since 1970 */
  const char* function;      /* its name */
  const unsigned char* data; /* the message; NULL if there is none */
  size_t size;               /* of it */
  const secret_t* secrets;
  size_t secret_count;
} record_t;

/* A half of the file, and a section of it. */
typedef struct half {
  unsigned char* begin;
  size_t used;           /* what is behind it are blocks that readers skip */
  uint32_t first_number; /* that its records have or will have */
} half_t;

/* Begins zeroed, without a file. */
typedef struct recording {
  half_t halves[2];
  int current;      /* the half that is being filled */
  size_t half_size; /* 0: there is no file */
  size_t head_size; /* of what each half begins with */
  uint32_t last_number;
  unsigned file_number; /* of all files that the process, or a parent of it, has made */
} recording_t;

/* Where a record is, to add its outcome. Zeroed, there is none. */
typedef struct record_place {
  unsigned char* outcome;
  uint32_t number;
  int half;
  unsigned file_number;
} record_place_t;

/*
 * Makes the file, of that many bytes, all of which it reserves at once: no later call can run out
 * of space. A file of that name is renamed first, with ".old" behind its name. The writer is a
 * text about who writes it. Returns 0, or an errno; then there is no recording.
 */
int recording_create(recording_t* recording, const char* file, size_t size, const char* writer);

/* Forgets the file, which stays. */
void recording_leave(recording_t* recording);

/* Adds a record. A message that is longer than half of the file is cut. */
record_place_t recording_add(recording_t* recording, const record_t* record);

/* Adds the outcome, unless the record has gone meanwhile. */
void recording_end(recording_t* recording, const record_place_t* place, outcome_t outcome);

#endif
