#ifndef QEL_WIRE_EXPLAIN_H
#define QEL_WIRE_EXPLAIN_H

#include <google/protobuf/descriptor.h>

#include <ostream>
#include <string_view>

#include "print.h"
#include "text.h"

namespace qel_wire {

struct ExplainOptions {
  Colours colours{false};
  BytesForm bytes_form = BytesForm::kUsual;
  bool show_token = false;
  bool show_all = false;  // of long fields too
  bool as_json = false;   // an object in a line for each row; the rows have each byte once
  size_t message = 0;     // in JSON: its number, where there are more
};

// Writes a row for each field of the bytes as those of a message of the type: offset, bytes, what
// they mean, and every doubt; for broken bytes at last where and why. False if they are broken.
bool explain(std::string_view bytes, const google::protobuf::Descriptor& type,
             const ExplainOptions& options, std::ostream* out);

}  // namespace qel_wire

#endif
