// The inputs of the calls and the expected outputs, written byte by byte, without any of the
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

// A text of length bytes.
std::string text_of(int length);

// The encodings that the serializers hand out.
std::string echo_reply_bytes();
std::string chat_request_bytes(const std::string& text);

// The inputs of the parsers, with a number of entries, of messages with a text of 100 bytes, or of
// members with a read mark and a delivery mark each.
Received chat_reply_of(int entries);
Received message_page_of(int messages);
Received chatroom_entry_of(int members);
Received echo_received();
Received end_of_chats_received();

#endif
