#include "schema.h"

#include <strings.h>

#include <algorithm>
#include <map>
#include <set>
#include <sstream>
#include <string_view>
#include <utility>

#include "msgspec_frontend.pb.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::EnumDescriptor;
using google::protobuf::EnumValueDescriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::FileDescriptor;
using google::protobuf::Message;
using google::protobuf::MessageFactory;

// Of so many descriptors the one of that name, in any case of letters, or null.
template <typename At>
auto one_named(const std::string& name, int count, At at) -> decltype(at(0)) {
  for (int i = 0; i < count; ++i) {
    if (strcasecmp(at(i)->name().c_str(), name.c_str()) == 0) {
      return at(i);
    }
  }
  return nullptr;
}

template <typename At>
std::vector<std::string> names_of(int count, At at) {
  std::vector<std::string> names;
  for (int i = 0; i < count; ++i) {
    names.push_back(at(i)->name());
  }
  return names;
}

const EnumDescriptor* enumeration_named(const std::string& name) {
  return one_named(name, schema_file().enum_type_count(),
                   [](int i) { return schema_file().enum_type(i); });
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

// Colours the names before the numbers of fields and members.
std::string with_coloured_names(const std::string& text, const Colours& colours) {
  std::string result;
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    const size_t end = line.find(" = ");
    if (end != std::string::npos) {
      line.insert(end, colours.end).insert(line.rfind(' ', end - 1) + 1, colours.name);
    }
    result += line + "\n";
  }
  return result;
}

struct Function {
  std::string_view name;
  const char* message;

  Use use() const {
    constexpr std::string_view kSending = "_serialize";
    return name.substr(name.size() - kSending.size()) == kSending ? Use::kSends : Use::kReceives;
  }
};

constexpr Function kFunctions[] = {
#include "functions.inc"
};

struct Facts {
  bool is_record = false;
  Use use = Use::kNone;
  std::vector<const FieldDescriptor*> fields;  // by their numbers
};

std::vector<Facts> all_facts() {
  std::map<std::string, Use> uses;
  for (const Function& function : kFunctions) {
    uses[function.message] = function.use();
  }
  std::vector<Facts> facts(static_cast<size_t>(schema_file().message_type_count()));
  for (size_t m = 0; m < facts.size(); ++m) {
    const Descriptor& type = *schema_file().message_type(static_cast<int>(m));
    const auto use = uses.find(type.name());
    facts[m].use = use != uses.end() ? use->second : Use::kNone;
    for (int i = 0; i < type.field_count(); ++i) {
      const FieldDescriptor& field = *type.field(i);
      const auto number = static_cast<size_t>(field.number());
      facts[m].fields.resize(std::max(facts[m].fields.size(), number + 1));
      facts[m].fields[number] = &field;
      if (field.message_type() != nullptr) {
        facts[static_cast<size_t>(field.message_type()->index())].is_record = true;
      }
    }
  }
  return facts;
}

// They are asked for often.
const Facts& facts_about(const Descriptor& type) {
  static const std::vector<Facts> all = all_facts();
  return all[static_cast<size_t>(type.index())];
}

}  // namespace

const FileDescriptor& schema_file() {
  return *ChannelAuthRequest::descriptor()->file();
}

const Descriptor* message_named(const std::string& name) {
  return one_named(name, schema_file().message_type_count(),
                   [](int i) { return schema_file().message_type(i); });
}

const Descriptor* message_of_function(const std::string& name) {
  for (const Function& function : kFunctions) {
    if (name == function.name) {
      return schema_file().FindMessageTypeByName(function.message);
    }
  }
  return nullptr;
}

const FieldDescriptor* field_named(const Descriptor& type, const std::string& name) {
  return one_named(name, type.field_count(), [&](int i) { return type.field(i); });
}

const EnumValueDescriptor* member_named(const EnumDescriptor& enumeration,
                                        const std::string& name) {
  return one_named(name, enumeration.value_count(), [&](int i) { return enumeration.value(i); });
}

std::unique_ptr<Message> new_message(const Descriptor& type) {
  return std::unique_ptr<Message>(MessageFactory::generated_factory()->GetPrototype(&type)->New());
}

std::vector<std::string> message_names() {
  return names_of(schema_file().message_type_count(),
                  [](int i) { return schema_file().message_type(i); });
}

std::vector<std::string> all_names() {
  std::vector<std::string> names = message_names();
  for (int i = 0; i < schema_file().enum_type_count(); ++i) {
    names.push_back(schema_file().enum_type(i)->name());
  }
  return names;
}

std::vector<std::string> field_names(const Descriptor& type) {
  return names_of(type.field_count(), [&](int i) { return type.field(i); });
}

std::vector<std::string> member_names(const EnumDescriptor& enumeration) {
  return names_of(enumeration.value_count(), [&](int i) { return enumeration.value(i); });
}

std::string schema_of(const std::string& name, const Colours& colours) {
  if (const Descriptor* message = message_named(name)) {
    std::set<std::string> shown{message->name()};
    return with_coloured_names(definition(*message, &shown), colours);
  }
  const EnumDescriptor* enumeration = enumeration_named(name);
  return enumeration != nullptr ? with_coloured_names(enumeration->DebugString(), colours) : "";
}

bool is_time(const FieldDescriptor& field) {
  const std::string& name = field.name();
  const auto ends_in = [&](std::string_view end) {
    return name.size() >= end.size() &&
           name.compare(name.size() - end.size(), end.size(), end) == 0;
  };
  return field.type() == FieldDescriptor::TYPE_INT64 &&
         (ends_in("Time") || ends_in("TimeMillis") || ends_in("imestamp"));
}

bool may_be_request_id(uint32_t number) {
  return number == static_cast<uint32_t>(ChatRequest::kRequestIdFieldNumber) ||
         number == static_cast<uint32_t>(ClientEcho::kRequestIdFieldNumber);
}

const std::vector<const FieldDescriptor*>& fields_by_number(const Descriptor& type) {
  return facts_about(type).fields;
}

bool is_record(const Descriptor& type) {
  return facts_about(type).is_record;
}

Use use_of(const Descriptor& type) {
  return facts_about(type).use;
}

}  // namespace qel_wire
