// The messages of files as they are found: one or many, written in some notation, cut out of
// streams, and of captures of packets.
#ifndef QEL_WIRE_INPUT_H
#define QEL_WIRE_INPUT_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "cli.h"
#include "schema.h"

namespace qel_wire {

struct Found {
  std::string_view bytes;
  std::string name;  // as its frame has it, or empty
  // If there are more: its number, from 1, and where it was.
  size_t number = 0;
  std::string place;
  // Of captures of packets.
  Use use = Use::kNone;         // whether the plug-in has sent or received it
  size_t connection = 0;        // from 1
  std::optional<int64_t> time;  // in milliseconds since 1970
};

std::string read_file(const std::string& name);

// Lets take have each message that the call names, and returns the worst of the statuses that it
// returns and of that of the input itself. What is wrong with the input is said on standard error.
int for_each_message(const Call& call, const std::function<int(const Found&)>& take);

// On standard error, fit for a terminal.
void complain(const std::string& text);

}  // namespace qel_wire

#endif
