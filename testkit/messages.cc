#include "messages.h"

#include <algorithm>

namespace testkit {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::DescriptorPool;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::MessageFactory;

constexpr char kReply[] = "Reply";
constexpr char kRequest[] = "Request";
constexpr char kDeserialize[] = "_deserialize";

bool ends_with(const std::string& text, const std::string& end) {
  return text.size() >= end.size() && text.compare(text.size() - end.size(), end.size(), end) == 0;
}

}  // namespace

const Descriptor* message_type(const std::string& name) {
  const Descriptor* type = DescriptorPool::generated_pool()->FindMessageTypeByName(name);
  return type != nullptr && type->file()->package().empty() ? type : nullptr;
}

std::unique_ptr<Message> new_message(const Descriptor& type) {
  return std::unique_ptr<Message>(MessageFactory::generated_factory()->GetPrototype(&type)->New());
}

std::unique_ptr<Message> copy_of(const Message& message) {
  std::unique_ptr<Message> copy(message.New());
  copy->CopyFrom(message);
  return copy;
}

Messages copies_of(const Messages& messages) {
  Messages copies;
  for (const auto& message : messages) {
    copies.push_back(copy_of(*message));
  }
  return copies;
}

bool has(const Message& message, const char* name) {
  const FieldDescriptor* field = message.GetDescriptor()->FindFieldByName(name);
  return field != nullptr && message.GetReflection()->HasField(message, field);
}

int64_t number_in(const Message& message, const char* name) {
  const FieldDescriptor* field = message.GetDescriptor()->FindFieldByName(name);
  return field == nullptr ? 0 : message.GetReflection()->GetInt64(message, field);
}

void set_number(Message* message, const char* name, int64_t number) {
  const FieldDescriptor* field = message->GetDescriptor()->FindFieldByName(name);
  if (field != nullptr) {
    message->GetReflection()->SetInt64(message, field, number);
  }
}

const std::map<std::string, std::string>& messages_of_functions() {
  static const auto* const kMessages = new std::map<std::string, std::string>{
#include "functions.inc"
  };
  return *kMessages;
}

bool is_reply(const Descriptor& type) {
  return ends_with(type.name(), kReply);
}

const Descriptor* reply_type(const Descriptor& type) {
  std::string name = type.name();
  if (ends_with(name, kRequest)) {
    name.resize(name.size() - (sizeof kRequest - 1));
  }
  return message_type(name + kReply);
}

bool is_push(const Descriptor& type) {
  const auto& functions = messages_of_functions();
  return !is_reply(type) &&
         std::any_of(functions.begin(), functions.end(), [&type](const auto& function) {
           return function.second == type.name() && ends_with(function.first, kDeserialize);
         });
}

bool is_from_plugin(const Descriptor& type) {
  if (is_reply(type)) {
    const std::string& name = type.name();
    const Descriptor* push = message_type(name.substr(0, name.size() - (sizeof kReply - 1)));
    return push != nullptr && is_push(*push);
  }
  return &type == IsTyping::descriptor() || (reply_type(type) != nullptr && !is_push(type));
}

}  // namespace testkit
