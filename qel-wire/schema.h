#ifndef QEL_WIRE_SCHEMA_H
#define QEL_WIRE_SCHEMA_H

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>

#include <memory>
#include <string>
#include <vector>

#include "text.h"

namespace qel_wire {

const google::protobuf::FileDescriptor& schema_file();

// In any case of letters; null if there is none.
const google::protobuf::Descriptor* message_named(const std::string& name);
// Of the function of the C interface that makes it or takes it; null if there is no such function.
const google::protobuf::Descriptor* message_of_function(const std::string& name);
const google::protobuf::FieldDescriptor* field_named(const google::protobuf::Descriptor& type,
                                                     const std::string& name);
const google::protobuf::EnumValueDescriptor* member_named(
    const google::protobuf::EnumDescriptor& enumeration, const std::string& name);

// At the index of each number the field with it, or null. The descriptor's own table is far slower.
const std::vector<const google::protobuf::FieldDescriptor*>& fields_by_number(
    const google::protobuf::Descriptor& type);

// An empty one.
std::unique_ptr<google::protobuf::Message> new_message(const google::protobuf::Descriptor& type);

// In the order of the schema; all are the names of messages, and then of enumerations.
std::vector<std::string> message_names();
std::vector<std::string> all_names();
std::vector<std::string> field_names(const google::protobuf::Descriptor& type);
std::vector<std::string> member_names(const google::protobuf::EnumDescriptor& enumeration);

// The definition of the message or the enumeration, and of all that a message contains; empty if
// there is none of that name, in any case of letters.
std::string schema_of(const std::string& name, const Colours& colours);

// Whether the field's number is a time, in milliseconds since 1970.
bool is_time(const google::protobuf::FieldDescriptor& field);

// Whether it is a number of a requestId. Where a message has another field there, that is its
// userId.
bool may_be_request_id(uint32_t number);

// Whether the message is part of others, and never sent alone.
bool is_record(const google::protobuf::Descriptor& type);

// What a plug-in does with a message by the C interface.
enum class Use { kNone, kSends, kReceives };
Use use_of(const google::protobuf::Descriptor& type);

}  // namespace qel_wire

#endif
