/* Two requests encoded without any library: the lowest cost that is possible. */

#include <stdlib.h>
#include <string.h>

#include "calls.h"

static int varint_length(uint64_t value) {
  int length = 1;
  for (; value >= 0x80; value >>= 7) {
    ++length;
  }
  return length;
}

static unsigned char* put_varint(unsigned char* out, uint64_t value) {
  for (; value >= 0x80; value >>= 7) {
    *out++ = (unsigned char)(value | 0x80);
  }
  *out++ = (unsigned char)value;
  return out;
}

static unsigned char* put_number(unsigned char* out, int field, int64_t value) {
  *out++ = (unsigned char)(field << 3);
  return put_varint(out, (uint64_t)value);
}

static unsigned char* block_of(int size) {
  unsigned char* block = calloc((size_t)size, 1);
  if (block == NULL) {
    abort();
  }
  return block;
}

static unsigned char* echo_reply(int64_t request_id, int* size) {
  unsigned char* block;
  *size = 1 + varint_length((uint64_t)request_id);
  block = block_of(*size);
  put_number(block, 1, request_id);
  return block;
}

static unsigned char* chat_request(const char* text, int* size) {
  const size_t length = strlen(text);
  const int param_size = 1 + varint_length((uint64_t)kMessageId) + 1 + varint_length(kMessageType) +
                         1 + varint_length(length) + (int)length + 1 + varint_length(kMessageTtl);
  unsigned char* block;
  unsigned char* out;
  *size = 1 + varint_length(kRequestId) + 1 + varint_length((uint64_t)kChatroomId) + 1 +
          varint_length((uint64_t)param_size) + param_size;
  block = block_of(*size);
  out = put_number(block, 11, kRequestId);
  out = put_number(out, 12, kChatroomId);
  *out++ = 13 << 3 | 2;
  out = put_varint(out, (uint64_t)param_size);
  out = put_number(out, 1, kMessageId);
  out = put_number(out, 2, kMessageType);
  *out++ = 3 << 3 | 2;
  out = put_varint(out, length);
  memcpy(out, text, length); /* NOLINT(bugprone-not-null-terminated-result): no NUL on the wire */
  put_number(out + length, 4, kMessageTtl);
  return block;
}

const struct implementation implementation = {"by hand", echo_reply, chat_request,
                                              NULL,      NULL,       NULL};
