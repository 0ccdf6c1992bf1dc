// The messages of files as they are found: one or many, written in some notation, cut out of
// streams, and of captures of packets.
#ifndef QEL_WIRE_INPUT_H
#define QEL_WIRE_INPUT_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "cli.h"
#include "recording.h"
#include "schema.h"

namespace qel_wire {

struct Found {
  std::string_view bytes;
  std::string name;  // as its frame or its record has it, or empty
  // If there are more: its number, from 1, and where it was.
  size_t number = 0;
  std::string place;
  // Of captures of packets, and of session files.
  Use use = Use::kNone;                          // whether the plug-in has sent or received it
  size_t connection = 0;                         // from 1
  std::optional<std::chrono::nanoseconds> time;  // since 1970
  // Of session files.
  std::string function;  // that made it or took it, if one did
  std::optional<Outcome> outcome;
  size_t missing = 0;  // bytes behind it that were not recorded

  size_t size() const { return bytes.size() + missing; }
  int64_t milliseconds() const {
    return std::chrono::duration_cast<std::chrono::milliseconds>(*time).count();
  }
  // Whether the call that was to send it made no bytes.
  bool is_unsent() const {
    return use == Use::kSends && (outcome == Outcome::kNotEnded || outcome == Outcome::kRefused);
  }
};

std::string read_file(const std::string& name);

// Lets take have each message that the call names, and returns the worst of the statuses that it
// returns and of that of the input itself. What is wrong with the input is said on standard error.
int for_each_message(const Call& call, const std::function<int(const Found&)>& take);

// On standard error, fit for a terminal.
void complain(const std::string& text);

}  // namespace qel_wire

#endif
