#ifndef QEL_WIRE_DECODE_H
#define QEL_WIRE_DECODE_H

#include <google/protobuf/descriptor.h>

#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include "print.h"
#include "text.h"
#include "walk.h"

namespace qel_wire {

struct DecodeOptions {
  Colours colours{false};
  BytesForm bytes_form = BytesForm::kUsual;
  bool as_json = false;
  bool show_token = false;
  bool is_partial = false;  // of broken bytes: the fields before the place
};

struct Decoded {
  std::vector<std::string> notes;  // what the output does not tell
  std::optional<Problem> problem;  // of broken bytes
};

// Says why the bytes are broken, if they are. The notes are on what no form of the message tells:
// fields that are there again, and those that are left out because they are hidden.
std::optional<Problem> check(std::string_view bytes, const google::protobuf::Descriptor& type,
                             const Hidden& hidden, std::vector<std::string>* notes);

// Writes the message in the text form or as JSON; nothing of broken bytes, unless it is partial.
Decoded decode(std::string_view bytes, const google::protobuf::Descriptor& type,
               const DecodeOptions& options, std::ostream* out);

}  // namespace qel_wire

#endif
