// Messages from what people and programs write.
#ifndef QEL_WIRE_ENCODE_H
#define QEL_WIRE_ENCODE_H

#include <google/protobuf/message.h>

#include <string>

#include "print.h"

namespace qel_wire {

// Fill the message from its text form, unknown fields included, or from its JSON form. Enumerations
// are taken by name or by number, and a number outside the enumeration becomes an unknown field, as
// it does when the message is read. A value that says that it is not shown is refused. Throw
// Misread.
void parse_text(const std::string& text, google::protobuf::Message* message);
void parse_json(const std::string& text, BytesForm form, google::protobuf::Message* message);

}  // namespace qel_wire

#endif
