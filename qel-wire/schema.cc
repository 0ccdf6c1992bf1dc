#include "schema.h"

#include <set>
#include <utility>

#include "msgspec_frontend.pb.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::EnumDescriptor;
using google::protobuf::FileDescriptor;
using google::protobuf::Message;
using google::protobuf::MessageFactory;

const FileDescriptor& file() {
  return *ChannelAuthRequest::descriptor()->file();
}

// With all that it contains, but for what was shown before.
std::string definition(const Descriptor& message, std::set<std::string>* shown) {
  std::string text = message.DebugString();
  for (int i = 0; i < message.field_count(); ++i) {
    const Descriptor* record = message.field(i)->message_type();
    if (record != nullptr && shown->insert(record->name()).second) {
      text += "\n" + definition(*record, shown);
    }
    const EnumDescriptor* enumeration = message.field(i)->enum_type();
    if (enumeration != nullptr && shown->insert(enumeration->name()).second) {
      text += "\n" + enumeration->DebugString();
    }
  }
  return text;
}

// The name before the number of a field or a member.
std::pair<size_t, size_t> find_name(const std::string& line) {
  const size_t end = line.find(" = ");
  return end != std::string::npos ? std::pair(line.rfind(' ', end - 1) + 1, end)
                                  : std::pair<size_t, size_t>(0, 0);
}

}  // namespace

const Descriptor* message_named(const std::string& name) {
  return file().FindMessageTypeByName(name);
}

std::unique_ptr<Message> new_message(const Descriptor& type) {
  return std::unique_ptr<Message>(MessageFactory::generated_factory()->GetPrototype(&type)->New());
}

std::string schema_names() {
  std::string names;
  for (int i = 0; i < file().message_type_count(); ++i) {
    names += file().message_type(i)->name() + "\n";
  }
  for (int i = 0; i < file().enum_type_count(); ++i) {
    names += file().enum_type(i)->name() + "\n";
  }
  return names;
}

std::string schema_of(const std::string& name, const Colours& colours) {
  std::set<std::string> shown{name};
  if (const Descriptor* message = message_named(name)) {
    return with_coloured_names(definition(*message, &shown), colours, find_name);
  }
  const EnumDescriptor* enumeration = file().FindEnumTypeByName(name);
  return enumeration != nullptr
             ? with_coloured_names(enumeration->DebugString(), colours, find_name)
             : "";
}

}  // namespace qel_wire
