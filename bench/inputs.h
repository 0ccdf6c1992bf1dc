// What the calls are given, and what has to come out: written byte by byte, by none of the
// implementations.
#ifndef BENCH_INPUTS_H
#define BENCH_INPUTS_H

#include <cstdint>
#include <string>

#include "calls.h"

// Received bytes, and the digest of their values.
struct Received {
  std::string bytes;
  struct digest digest;
};

// A text of so many bytes.
std::string text_of(int length);

// The encodings that the serializers hand out.
std::string echo_reply_bytes();
std::string chat_request_bytes(const std::string& text);

// What the parsers are given: with so many entries, messages of 100 bytes, or members with a read
// and a delivery mark each.
Received chat_reply_of(int entries);
Received message_page_of(int messages);
Received chatroom_entry_of(int members);

#endif
