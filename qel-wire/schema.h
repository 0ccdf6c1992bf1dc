#ifndef QEL_WIRE_SCHEMA_H
#define QEL_WIRE_SCHEMA_H

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>

#include <memory>
#include <string>

#include "text.h"

namespace qel_wire {

// Null if there is none.
const google::protobuf::Descriptor* message_named(const std::string& name);

// An empty one.
std::unique_ptr<google::protobuf::Message> new_message(const google::protobuf::Descriptor& type);

// The names of all messages, and then of all enumerations, a line each, in the order of the schema.
std::string schema_names();

// The definition of the message or the enumeration, and of all that a message contains; empty if
// there is none of that name.
std::string schema_of(const std::string& name, const Colours& colours = Colours(false));

}  // namespace qel_wire

#endif
