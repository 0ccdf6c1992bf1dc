// Any bytes into any deserializer and any arguments into any serializer, by the contract's
// adapters.

#include <google/protobuf/io/coded_stream.h>
#include <sanitizer/allocator_interface.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <limits>

#include "adapters.h"
#include "cases.h"
#include "target.h"

namespace fuzz {
namespace {

using contract::Json;
using contract::Kind;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::Reflection;

// NOLINTNEXTLINE(bugprone-exception-escape): what the JSON library declares of its values
struct Outcome {
  std::optional<int> status;
  Json outputs;
  std::vector<std::string> lines;    // as they would be printed
  std::vector<std::string> formats;  // of the lines, without the frame that all share
};

Outcome* outcome_of_call = nullptr;

// The input stream of the call: its first block of that size. It is kept on purpose, but here it is
// released, as libFuzzer would look for leaks after each input otherwise.
const volatile void* stream = nullptr;
bool is_stream_kept = false;

void note_malloc(const volatile void* block, size_t size) {
  if (outcome_of_call != nullptr && stream == nullptr &&
      size == sizeof(google::protobuf::io::CodedInputStream)) {
    stream = block;
    is_stream_kept = true;
  }
}

void note_free(const volatile void* block) {
  is_stream_kept = is_stream_kept && block != stream;
}

bool is_deserializer(const std::string& function) {
  return contract::parameters_of(function)[0].kind == Kind::kReceived;
}

// The functions that take received bytes, or those that do not, but for those that do nothing.
std::vector<std::string> functions_that(bool take_bytes) {
  std::vector<std::string> functions;
  for (const auto& [function, message] : contract::messages().items()) {
    if (is_deserializer(function) == take_bytes) {
      functions.push_back(function);
    }
  }
  return functions;
}

Outcome call(const std::string& function, const Json& given, const std::string& bytes) {
  contract::Call arguments(given, bytes);
  const contract::Invocation invocation = contract::invocation_of(function, &arguments);
  [[maybe_unused]] static const int installed =
      __sanitizer_install_malloc_and_free_hooks(note_malloc, note_free);
  Outcome outcome;
  stream = is_deserializer(function) ? nullptr : &outcome;
  outcome_of_call = &outcome;
  outcome.status = invocation();
  outcome_of_call = nullptr;
  if (is_stream_kept) {
    is_stream_kept = false;
    operator delete(const_cast<void*>(stream));
  }
  contract::Reader reader([](const void* block) -> std::optional<size_t> {
    return __sanitizer_get_ownership(block) != 0
               ? std::optional<size_t>(__sanitizer_get_allocated_size(block))
               : std::nullopt;
  });
  outcome.outputs = arguments.outputs(&reader);
  for (const void* block : reader.seen()) {
    std::free(const_cast<void*>(block));
  }
  return outcome;
}

// ---- Deserializers

const char kMergeError[] = "merge error : Could not parse the received data!";
const char kStreamError[] = "ConsumedEntireMessage error :Could not parse the received data";

// The formats that the contract's cases of the function begin with, before anything is parsed.
std::vector<std::string> entry_of(const std::string& function) {
  std::vector<std::string> formats;
  for (const Json& contract_case : contract::cases()) {
    if (contract_case["call"] != function) {
      continue;
    }
    for (const Json& step : contract_case["does"]) {
      const Json& what = step.begin().value();
      if (step.contains("parse")) {
        return formats;
      }
      formats.push_back(what.is_array() ? what[0] : what);
    }
  }
  return formats;
}

// What a function makes of bytes depends on the message in them alone, and it makes nothing of
// bytes that its message's class does not take whole.
void check_deserializer(const std::string& function, std::vector<std::string> expected,
                        const Json& given, const std::string& bytes) {
  const auto message = new_message(contract::messages().at(function).get<std::string>());
  google::protobuf::io::CodedInputStream stream(
      reinterpret_cast<const unsigned char*>(bytes.data()), static_cast<int>(bytes.size()));
  const bool parses = message->ParseFromCodedStream(&stream);
  const bool ends_cleanly = stream.ConsumedEntireMessage();
  const Outcome got = call(function, given, bytes);

  if (parses && ends_cleanly) {
    const Outcome again = call(function, given, message->SerializeAsString());
    if (got.outputs != again.outputs || got.lines != again.lines) {
      fail("the same message in other bytes has another outcome:\n" + got.outputs.dump() + "\n" +
           again.outputs.dump());
    }
    if (got.formats.size() < expected.size() ||
        !std::equal(expected.begin(), expected.end(), got.formats.begin()) ||
        std::count(got.formats.begin(), got.formats.end(), kMergeError) > 0 ||
        std::count(got.formats.begin(), got.formats.end(), kStreamError) > 0) {
      fail("other lines than a success's");
    }
    return;
  }
  if (got.outputs != Json::object()) {
    fail("outputs were written although the call failed: " + got.outputs.dump());
  }
  if (!parses) {
    expected.emplace_back(kMergeError);
  }
  if (!ends_cleanly) {
    expected.emplace_back(kStreamError);
  }
  if (got.formats != expected) {
    fail("other lines than a failure's");
  }
}

// ---- Serializers

// Takes arguments from the input; what it lacks is 0, false or NULL.
class Arguments {
 public:
  explicit Arguments(const std::string& input) : input_(input) {}

  Json of(const std::string& function) {
    Json given = Json::object();
    for (const auto& [name, kind] : contract::parameters_of(function)) {
      Json value = argument(name, kind, given);
      if (!value.is_null() && kind != Kind::kOutput) {
        given[name] = std::move(value);
      }
    }
    return given;
  }

 private:
  unsigned char byte() {
    return at_ < input_.size() ? static_cast<unsigned char>(input_[at_++]) : '\0';
  }
  bool coin() { return byte() % 2 == 1; }
  int one_of(const std::vector<int>& values) { return values[byte() % values.size()]; }

  // Of any magnitude: a byte says how many bytes of it follow.
  int64_t id() {
    uint64_t value = 0;
    for (int i = byte() % 9; i > 0; --i) {
      value = value << 8 | byte();
    }
    return static_cast<int64_t>(coin() ? value : ~value);
  }
  // Often one at the ends of a page's sizes.
  int number() {
    return coin() ? one_of({0, 1, -1, 500, 501, std::numeric_limits<int>::min()})
                  : static_cast<int>(id());
  }
  // A member of an enumeration, as others abort; or one that is refused.
  int number_of(const std::string& name, const Json& given) {
    if (name == "chatType") {
      return one_of({0, 1, 2, 3, 4});
    }
    if (name == "contentType") {
      return one_of({0, 1, 2, 3});
    }
    if (name == "msgType") {
      return one_of({0, 1, 2, 3, 4, 5, 6, 10, 30, 31, -1});
    }
    if (name == "receiversCount" || name == "count" || name == "invitingMembersCount") {
      for (const char* list : {"receivers", "entries", "invitingMembers"}) {
        if (given.contains(list) && coin()) {
          return static_cast<int>(given[list].size());
        }
      }
      return -static_cast<int>(byte() % 2);
    }
    return number();
  }
  // Short ones, and long ones about the longest that is accepted anywhere.
  Json text() {
    const unsigned char length = byte();
    std::string text(length == 255 ? 39999 + byte() % 3U : 0, 'x');
    for (unsigned char i = 0; length < 255 && i < length; ++i) {
      text.push_back(static_cast<char>(std::max<unsigned char>(byte(), 1)));
    }
    return contract::json_of_text(text);
  }
  Json list(Kind kind) {
    Json elements = Json::array();
    for (int i = byte() % 8; i >= 0; --i) {
      elements.push_back(kind == Kind::kIds
                             ? Json(id())
                             : Json({{"chatroomId", id()}, {"denyInvitation", byte()}}));
    }
    return elements;
  }

  Json argument(const std::string& name, Kind kind, const Json& given) {
    static const std::vector<std::string> kRequired = {"appId", "accessToken", "callId",
                                                       "callLogType"};
    const bool is_required = std::count(kRequired.begin(), kRequired.end(), name) > 0;
    switch (kind) {
      case Kind::kId:
        return id();
      case Kind::kNumber:
        return number_of(name, given);
      case Kind::kFlag:
        return coin();
      case Kind::kNumberPointer:
        return coin() ? Json(number_of(name, given)) : Json();
      case Kind::kFlagPointer:
        return coin() ? Json(byte()) : Json();
      case Kind::kText:
        return is_required || coin() ? text() : Json();
      case Kind::kTextPointer:
        return coin() ? text() : coin() ? Json({{"to", nullptr}}) : Json();
      case Kind::kIds:
      case Kind::kChats:
        return coin() ? list(kind) : Json();
      case Kind::kEntry:
        return coin() ? Json({{"msgId", id()},
                              {"msgType", number_of("msgType", given)},
                              {"sender", id()},
                              {"receiver", id()},
                              {"sentTime", id()},
                              {"chatroomId", id()},
                              {"chatType", number()},
                              {"msgTtl", number()}})
                      : Json();
      case Kind::kReceived:
      case Kind::kOutput:
        return {};
    }
    return {};
  }

  const std::string& input_;
  size_t at_ = 0;
};

int64_t number_in(const Message& message, const FieldDescriptor& field) {
  const Reflection& reflection = *message.GetReflection();
  switch (field.cpp_type()) {
    case FieldDescriptor::CPPTYPE_INT64:
      return reflection.GetInt64(message, &field);
    case FieldDescriptor::CPPTYPE_INT32:
      return reflection.GetInt32(message, &field);
    case FieldDescriptor::CPPTYPE_ENUM:
      return reflection.GetEnum(message, &field)->number();
    case FieldDescriptor::CPPTYPE_BOOL:
      return reflection.GetBool(message, &field) ? 1 : 0;
    default:
      fail("a field of another type: " + field.name());
  }
}

// Whether the field, which is one of the message, is what an argument gives.
bool is_sent_as(const Message& message, const FieldDescriptor& field, const Json& value) {
  if (field.cpp_type() == FieldDescriptor::CPPTYPE_STRING) {
    return value == contract::json_of_text(message.GetReflection()->GetString(message, &field));
  }
  if (value.is_null()) {
    return false;
  }
  const int64_t sent = number_in(message, field);
  if (field.cpp_type() == FieldDescriptor::CPPTYPE_BOOL) {
    return (sent == 1) == (contract::byte_of(value) != 0);
  }
  const bool is_too_large = field.name() == "maxCount" && (value < 1 || value > 500);
  return sent == (is_too_large ? 500 : value.get<int64_t>());
}

// Every field is what the argument of its name gives; nothing else is sent.
void check_fields(const Message& message, const Json& given) {
  const Reflection& reflection = *message.GetReflection();
  std::vector<const FieldDescriptor*> fields;
  reflection.ListFields(message, &fields);
  for (const FieldDescriptor* field : fields) {
    const std::string& name = field->name();
    if (name == "chatMessageParams") {
      check_fields(reflection.GetRepeatedMessage(message, field, 0), given);
      continue;
    }
    const Json value = given.value(name == "endChatEntries" ? "entries" : name, Json());
    if (field->is_repeated()) {
      const int size = reflection.FieldSize(message, field);
      if (size != static_cast<int>(value.size())) {
        fail(name + " has another number of elements");
      }
      for (int i = 0; i < size; ++i) {
        if (field->cpp_type() == FieldDescriptor::CPPTYPE_MESSAGE) {
          check_fields(reflection.GetRepeatedMessage(message, field, i),
                       value[static_cast<size_t>(i)]);
        } else if (value[static_cast<size_t>(i)] !=
                   reflection.GetRepeatedInt64(message, field, i)) {
          fail(name + " has another element");
        }
      }
      continue;
    }
    if (field->cpp_type() == FieldDescriptor::CPPTYPE_MESSAGE) {
      check_fields(reflection.GetMessage(message, field), value);
      continue;
    }
    if (!is_sent_as(message, *field, value)) {
      fail(name + " is not " + value.dump() + " in " + message.ShortDebugString());
    }
  }
}

}  // namespace

std::vector<Target> deserializer_targets() {
  std::vector<Target> targets;
  for (const std::string& function : functions_that(true)) {
    const std::vector<std::string> entry = entry_of(function);
    targets.push_back(
        {function, [function, entry](const std::string& bytes) {
           check_deserializer(function, entry, Json::object(), bytes);
           for (const auto& [name, kind] : contract::parameters_of(function)) {
             if (name == "inboxEntry") {  // which callers may lack
               check_deserializer(function, entry, {{name, {{"to", nullptr}}}}, bytes);
             }
           }
         }});
  }
  return targets;
}

// The first byte chooses the function.
void check_serializers(const std::string& input) {
  static const std::vector<std::string> functions = functions_that(false);
  if (input.empty()) {
    return;
  }
  const std::string& function = functions[static_cast<unsigned char>(input[0]) % functions.size()];
  const std::string rest = input.substr(1);
  const Json given = Arguments(rest).of(function);
  const Outcome got = call(function, given, "");
  if (got.status == -1) {
    if (got.outputs != Json::object() || got.lines.size() < 2) {
      fail("a refusal writes outputs, or does not say why: " + got.outputs.dump());
    }
    return;
  }
  const std::string bytes = contract::bytes_of(got.outputs.at("serialized_data"));
  const auto message = new_message(contract::messages().at(function).get<std::string>());
  if (got.outputs["size"] != bytes.size() || !message->ParseFromString(bytes) ||
      message->SerializeAsString() != bytes) {
    fail(function + " makes no message: " + got.outputs.dump());
  }
  check_fields(*message, given);
}

}  // namespace fuzz

// In the program itself, so that the library finds it before any log service.
extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...) {
  if (fuzz::outcome_of_call == nullptr) {
    return -1;
  }
  char line[512];
  va_list arguments;
  va_start(arguments, format);
  const int length = std::vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  const std::string whole = format;
  const size_t text = whole.find("[%d]") + 4;
  const size_t end = whole.rfind("\033[0m");
  if (log_id != 0 || std::string(tag) != "MESSAGE_PLUGIN" || length < 0 ||
      length >= static_cast<int>(sizeof line) || end == std::string::npos) {
    fuzz::fail("an unexpected log line: " + whole);
  }
  fuzz::outcome_of_call->lines.push_back(std::to_string(priority) + line);
  fuzz::outcome_of_call->formats.push_back(whole.substr(text, end - text));
  return -1;
}
