/*
 * What stands around a call: it records the message, and changes nothing that the caller sees, but
 * that a deserializer's requestId is written at the end of the call. Trouble with the file is told
 * once, and never reaches the call. Any thread may call these functions at any time.
 */
#ifndef QEL_TRACE_RECORDER_H
#define QEL_TRACE_RECORDER_H

#include <stdint.h>

#include "recording.h"

/* Behind a serializer's call, with its outputs; NULL if it failed, as it may not have written them.
   The token may be NULL. It is recorded neither here nor in any later message. */
void trace_sent(const char* function, unsigned char* const* message, const int* size,
                const char* token);

/* A deserializer's call. The library writes the requestId whenever it takes the bytes. So it gets
   another place for that, from which the caller's is set behind the call. */
typedef struct received {
  int64_t* request_id; /* for the library */
  int64_t* of_caller;  /* NULL: nobody can tell whether the bytes are taken */
  int64_t own, unwritten;
  record_place_t place;
} received_t;

/* Before the call. A requestId that is NULL, or that is another output too, is left alone. */
void trace_received(received_t* call, const char* function, const unsigned char* data, int size,
                    int64_t* request_id, bool is_shared);

/* Behind it, also if an exception ends it. */
void trace_received_end(received_t* call);

#endif
