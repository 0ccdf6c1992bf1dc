#ifndef QEL_WIRE_DECODE_H
#define QEL_WIRE_DECODE_H

#include <google/protobuf/descriptor.h>

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "text.h"
#include "walk.h"

namespace qel_wire {

struct DecodeOptions {
  Colours colours{false};
  bool as_json = false;
  bool show_token = false;
};

struct Decoded {
  std::string text;                // of the message, in the text form or as JSON
  std::vector<std::string> notes;  // what that does not tell
  std::optional<Problem> problem;  // of broken bytes, which have neither
};

Decoded decode(std::string_view bytes, const google::protobuf::Descriptor& type,
               const DecodeOptions& options);

}  // namespace qel_wire

#endif
