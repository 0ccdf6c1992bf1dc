#ifndef QEL_WIRE_EXPLAIN_H
#define QEL_WIRE_EXPLAIN_H

#include <google/protobuf/descriptor.h>

#include <ostream>
#include <string_view>

#include "text.h"

namespace qel_wire {

struct ExplainOptions {
  Colours colours{false};
  bool show_token = false;
  bool show_all = false;  // of long fields too
};

// Writes a row for each field of the bytes as those of a message of the type: offset, bytes, and
// what they mean; for broken bytes at last where and why. False if they are broken.
bool explain(std::string_view bytes, const google::protobuf::Descriptor& type,
             const ExplainOptions& options, std::ostream* out);

}  // namespace qel_wire

#endif
