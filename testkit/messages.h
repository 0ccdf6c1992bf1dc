// The messages of the schema, and who sends them.
#ifndef TESTKIT_MESSAGES_H
#define TESTKIT_MESSAGES_H

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "msgspec_frontend.pb.h"

namespace testkit {

// Null if the schema has none of that name.
const google::protobuf::Descriptor* message_type(const std::string& name);

// An empty message. The type is one that is linked.
std::unique_ptr<google::protobuf::Message> new_message(const google::protobuf::Descriptor& type);

using Messages = std::vector<std::unique_ptr<google::protobuf::Message>>;

std::unique_ptr<google::protobuf::Message> copy_of(const google::protobuf::Message& message);
Messages copies_of(const Messages& messages);

// Hands the message to the function if it is of one of the types, and as that type.
template <typename... Types, typename Function>
void visit(const google::protobuf::Message& message, const Function& function) {
  const auto is_visited = [&message, &function](const auto* of_type) {
    of_type = dynamic_cast<decltype(of_type)>(&message);
    if (of_type != nullptr) {
      function(*of_type);
    }
    return of_type != nullptr;
  };
  static_cast<void>((is_visited(static_cast<const Types*>(nullptr)) || ...));
}

// A field of any message, by its name. Where there is none, nothing is there, or 0, or set.
bool has(const google::protobuf::Message& message, const char* name);
int64_t number_in(const google::protobuf::Message& message, const char* name);
void set_number(google::protobuf::Message* message, const char* name, int64_t number);

// The message of each function of the C interface.
const std::map<std::string, std::string>& messages_of_functions();

bool is_reply(const google::protobuf::Descriptor& type);

// The type of the message that answers one of this type, or null.
const google::protobuf::Descriptor* reply_type(const google::protobuf::Descriptor& type);

// Whether the service sends it of its own accord, and a plug-in takes it.
bool is_push(const google::protobuf::Descriptor& type);

// Whether a plug-in sends it: a request, or the answer to a push.
bool is_from_plugin(const google::protobuf::Descriptor& type);

}  // namespace testkit

#endif
