// Every message of the schema against the reference encoder, another implementation of Protocol
// Buffers (Debian's protoc): of the same values, our classes make the same bytes, and read the same
// values from them.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/io/coded_stream.h>
#include <google/protobuf/io/zero_copy_stream_impl_lite.h>
#include <google/protobuf/text_format.h>
#include <google/protobuf/unknown_field_set.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <limits>
#include <memory>
#include <numeric>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include "msgspec_frontend.pb.h"
#include "support/fields.h"

namespace {

using google::protobuf::Descriptor;
using google::protobuf::EnumDescriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::FileDescriptor;
using google::protobuf::Message;
using support::Fields;

const FileDescriptor& schema() {
  return *ChatRequest::descriptor()->file();
}

// ---- Messages in their text form

// How the fields of a message are set, and those of the messages in it.
struct Values {
  std::string name;
  std::vector<int64_t> numbers;  // each field takes the next
  std::string text;              // with its number behind it, if there are several numbers
  int elements = 2;              // of a list; one inside an element
  int fields = 0;                // 1: those with odd numbers alone, 2: with even ones
  bool is_later = false;         // with what only a later schema has
};

std::vector<int64_t> numbers_from(int64_t first, size_t count) {
  std::vector<int64_t> numbers(count);
  std::iota(numbers.begin(), numbers.end(), first);
  return numbers;
}

// The largest number of each length on the wire, and the smallest of the next.
std::vector<int64_t> ends_of_wire_lengths() {
  std::vector<int64_t> numbers = {-1};
  for (int bits = 7; bits < 63; bits += 7) {
    numbers.push_back((int64_t{1} << bits) - 1);
    numbers.push_back(int64_t{1} << bits);
  }
  return numbers;
}

std::vector<Values> all_values() {
  using Limits = std::numeric_limits<int64_t>;
  const auto distinct = numbers_from(1000, 499);
  const std::string odd_text("\"'\\\n\r\t\a\0\x7f{}# a\u00e9\u20ac\U0001f600", 23);
  return {{"Distinct", distinct, "text "},
          {"OddFields", distinct, "text ", 2, 1},
          {"EvenFields", distinct, "text ", 2, 2},
          {"Zeros", {0}, ""},
          {"Smallest", {Limits::min()}, odd_text},
          {"Largest", {Limits::max()}, std::string(20000, 'x')},
          {"EveryLength", ends_of_wire_lengths(), "text ", 300},
          {"Later", distinct, "text ", 2, 0, true}};
}

// The schema as a service might have it that is newer than the client: in every message further
// fields of each wire type, between the known ones and after them, with numbers that no message
// has; and in every enumeration further members.
const char kLaterFields[] =
    "optional uint64 laterNumber = 8; optional fixed64 laterLong = 9; optional bytes laterBytes = "
    "24;"
    "optional group LaterGroup = 26 { optional int32 number = 1; }"
    "optional fixed32 laterInt = 536870911;";
const char kLaterValues[] =
    "laterNumber: 18446744073709551615 laterLong: 72623859790382856 laterBytes: '\\377\\000' "
    "LaterGroup { number: -1 } laterInt: 16909060 ";
constexpr int kLaterFieldCount = 5;

class Writer {
 public:
  Writer(const Values& values, bool with_later) : values_(values), with_later_(with_later) {}

  std::string text(const Descriptor& type, bool in_list = false) {
    std::string text = with_later_ ? kLaterValues : "";
    for (int i = 0; i < type.field_count(); ++i) {
      const FieldDescriptor& field = *type.field(i);
      if (values_.fields != 0 && field.number() % 2 != values_.fields % 2) {
        continue;
      }
      const bool is_list = field.is_repeated();
      for (int left = is_list && !in_list ? values_.elements : 1; left > 0; --left) {
        text += value(field, in_list || is_list);
      }
    }
    return text;
  }

 private:
  // The field, too; or nothing, where the member is one that the schema has not.
  std::string value(const FieldDescriptor& field, bool in_list) {
    const std::string name = field.name() + ": ";
    switch (field.type()) {
      case FieldDescriptor::TYPE_INT64:
        return name + std::to_string(next()) + " ";
      case FieldDescriptor::TYPE_INT32:
        return name + std::to_string(std::clamp<int64_t>(next(), INT32_MIN, INT32_MAX)) + " ";
      case FieldDescriptor::TYPE_BOOL:
        return name + (next() % 2 != 0 ? "true " : "false ");
      case FieldDescriptor::TYPE_STRING:
        return name + quoted(next_text());
      case FieldDescriptor::TYPE_BYTES:
        return name + quoted(next_text() + "\xff");
      case FieldDescriptor::TYPE_ENUM: {
        const EnumDescriptor& type = *field.enum_type();
        if (values_.is_later) {
          const std::string when = member_++ % 2 != 0 ? "EARLIER_" : "LATER_";
          return with_later_ ? name + when + type.name() + " " : "";
        }
        return name + type.value(member_++ % type.value_count())->name() + " ";
      }
      case FieldDescriptor::TYPE_MESSAGE:
        return field.name() + " { " + text(*field.message_type(), in_list) + "} ";
      default:
        throw std::logic_error(field.full_name() + ": no values for fields of its type");
    }
  }

  int64_t next() { return values_.numbers[turn_++ % values_.numbers.size()]; }
  std::string next_text() {
    const std::string number = std::to_string(next());
    return values_.text + (values_.numbers.size() > 1 ? number : "");
  }

  static std::string quoted(const std::string& bytes) {
    std::string text = "\"";
    for (const char c : bytes) {
      const auto byte = static_cast<unsigned char>(c);
      if (std::isalnum(byte) != 0) {
        text += c;
      } else {
        char octal[5];
        std::snprintf(octal, sizeof octal, "\\%03o", byte);
        text += octal;
      }
    }
    return text + "\" ";
  }

  const Values& values_;
  const bool with_later_;
  size_t turn_ = 0;
  int member_ = 0;  // another, so that the elements of a list have different members
};

// ---- The reference encoder

std::string content_of(const std::filesystem::path& file) {
  std::ostringstream content;
  content << std::ifstream(file, std::ios::binary).rdbuf();
  return content.str();
}

// Also a message that holds any number of all messages, so that a few calls do for all.
std::string later_schema() {
  std::istringstream lines(content_of(QEL_SCHEMA));
  std::ostringstream later;
  std::string kind;
  std::string name;
  for (std::string line; std::getline(lines, line); later << line << '\n') {
    if (line == "}" && kind == "enum") {
      later << "LATER_" << name << " = 1000; EARLIER_" << name << " = -2147483648;";
    } else if (line == "}") {
      later << kLaterFields;
    } else if (line.rfind("message ", 0) == 0 || line.rfind("enum ", 0) == 0) {
      std::istringstream(line) >> kind >> name;
    }
  }
  later << "message Batch { repeated Item item = 1; } message Item {";
  for (int i = 0; i < schema().message_type_count(); ++i) {
    const std::string& type = schema().message_type(i)->name();
    later << "optional ." << type << " " << type << " = " << i + 1 << ";";
  }
  later << "}";
  return later.str();
}

// What it makes of a batch: bytes of text, or text of bytes.
std::string reference(const std::string& mode, const std::string& batch) {
  std::string folder = testing::TempDir() + "reference-XXXXXX";
  if (mkdtemp(folder.data()) == nullptr) {
    throw std::runtime_error("no temporary folder " + folder);
  }
  std::ofstream(folder + "/later.proto") << later_schema();
  std::ofstream(folder + "/in", std::ios::binary) << batch;
  const std::string command = "cd '" + folder + "' && '" QEL_REFERENCE_PROTOC "' --" + mode +
                              "=Batch later.proto <in >out 2>messages";
  const int status = std::system(command.c_str());
  std::string output = content_of(folder + "/out");
  const std::string messages = content_of(folder + "/messages");
  std::filesystem::remove_all(folder);
  if (status != 0) {
    throw std::runtime_error(command + ": " + messages);
  }
  return output;
}

// ---- Every message with all values

struct Item {
  std::string name;
  bool is_later;
  std::unique_ptr<Message> message;  // without what only the later schema has
  std::string bytes;                 // the reference encoder's
};

std::string batch_of(const std::vector<Item>& items, std::string (*bytes_of)(const Item& item)) {
  std::string batch;
  for (const Item& item : items) {
    if (item.is_later) {
      const int field = item.message->GetDescriptor()->index() + 1;
      batch += Fields().message(1, Fields().text(field, bytes_of(item))).bytes();
    }
  }
  return batch;
}

std::vector<Item> make_items() {
  std::vector<Item> items;
  std::string batch;
  for (const Values& values : all_values()) {
    for (int i = 0; i < schema().message_type_count(); ++i) {
      const Descriptor& type = *schema().message_type(i);
      std::unique_ptr<Message> message(
          google::protobuf::MessageFactory::generated_factory()->GetPrototype(&type)->New());
      const std::string known = Writer(values, false).text(type);
      if (!google::protobuf::TextFormat::ParseFromString(known, message.get())) {
        throw std::runtime_error("not the text of a message: " + known);
      }
      batch +=
          "item { " + type.name() + " { " + Writer(values, values.is_later).text(type) + "} }\n";
      items.push_back({type.name() + ", " + values.name, values.is_later, std::move(message), ""});
    }
  }
  const std::string bytes = reference("encode", batch);
  google::protobuf::io::CodedInputStream in(reinterpret_cast<const uint8_t*>(bytes.data()),
                                            static_cast<int>(bytes.size()));
  for (Item& item : items) {
    uint32_t size = 0;
    for (int level = 0; level < 2; ++level) {
      in.ReadTag();
      in.ReadVarint32(&size);
    }
    in.ReadString(&item.bytes, static_cast<int>(size));
  }
  return items;
}

// Made once for all tests of the program.
const std::vector<Item>& every_item() {
  static const std::vector<Item> items = make_items();
  return items;
}

template <typename Check>
void for_each_item(bool is_later, Check check) {
  for (const Item& item : every_item()) {
    if (item.is_later == is_later) {
      SCOPED_TRACE(item.name);
      check(item);
    }
  }
}

// The first bytes that differ, as whole messages may be long.
std::string difference(const std::string& expected, const std::string& actual) {
  const size_t shorter = std::min(expected.size(), actual.size());
  size_t at = 0;
  while (at < shorter && expected[at] == actual[at]) {
    ++at;
  }
  if (at == expected.size() && at == actual.size()) {
    return "";
  }
  return "at " + std::to_string(at) + " " + testing::PrintToString(expected.substr(at, 40)) +
         " is expected, not " + testing::PrintToString(actual.substr(at, 40));
}

std::string text_of(const Message& message) {
  std::string text;
  google::protobuf::TextFormat::PrintToString(message, &text);
  return text;
}

std::unique_ptr<Message> parsed(const Item& item) {
  std::unique_ptr<Message> message(item.message->New());
  EXPECT_TRUE(message->ParseFromString(item.bytes));
  return message;
}

TEST(EveryMessage, WithDistinctValues_HasAllItsFields) {
  for_each_item(false, [](const Item& item) {
    if (item.name.find(", Distinct") != std::string::npos) {
      std::vector<const FieldDescriptor*> present;
      item.message->GetReflection()->ListFields(*item.message, &present);
      EXPECT_EQ(static_cast<int>(present.size()), item.message->GetDescriptor()->field_count());
    }
  });
}

// At once, and byte by byte.
TEST(EveryMessage, WhenSerialized_HasTheReferencesBytes) {
  for_each_item(false, [](const Item& item) {
    EXPECT_EQ(difference(item.bytes, item.message->SerializeAsString()), "");
    std::string bytes(item.bytes.size(), '\0');
    google::protobuf::io::ArrayOutputStream out(&bytes[0], static_cast<int>(bytes.size()), 1);
    EXPECT_TRUE(item.message->SerializeToZeroCopyStream(&out));
    EXPECT_EQ(difference(item.bytes, bytes), "");
  });
}

TEST(EveryMessage, WhenTheReferencesBytesAreParsed_HasTheValues) {
  for_each_item(false, [](const Item& item) {
    const std::string text = text_of(*item.message);
    EXPECT_EQ(difference(text, text_of(*parsed(item))), "");
    google::protobuf::io::ArrayInputStream in(item.bytes.data(),
                                              static_cast<int>(item.bytes.size()), 1);
    const std::unique_ptr<Message> message(item.message->New());
    EXPECT_TRUE(message->ParseFromZeroCopyStream(&in));
    EXPECT_EQ(difference(text, text_of(*message)), "");
  });
}

TEST(EveryMessage, OfALaterSchema_HasTheValuesThatAreKnown) {
  for_each_item(true, [](const Item& item) {
    const std::unique_ptr<Message> message = parsed(item);
    const auto& unknown = message->GetReflection()->GetUnknownFields(*message);
    EXPECT_GE(unknown.field_count(), kLaterFieldCount);
    message->DiscardUnknownFields();
    EXPECT_EQ(difference(text_of(*item.message), text_of(*message)), "");
  });
}

// In another order than the reference's, as what is unknown comes last in its message.
TEST(EveryMessage, OfALaterSchema_IsSentBackWhole) {
  const std::string received = batch_of(every_item(), [](const Item& item) { return item.bytes; });
  const std::string sent_back =
      batch_of(every_item(), [](const Item& item) { return parsed(item)->SerializeAsString(); });
  EXPECT_EQ(difference(reference("decode", received), reference("decode", sent_back)), "");
  EXPECT_EQ(received.size(), sent_back.size());
}

// ---- What is unknown, by hand

template <typename T>
std::string sent_back(const std::string& received) {
  T message;
  EXPECT_TRUE(message.ParseFromString(received));
  return support::to_hex(message.SerializeAsString());
}

TEST(UnknownFields, AmongKnownOnes_AreSentBackBehindThemInTheirOrder) {
  const std::string text = "4a 05 6c 61 74 65 72 ";                          // 9
  const std::string fixed = "d5 01 04 03 02 01 ";                            // 26
  const std::string group = "c3 01 08 ff ff ff ff ff ff ff ff ff 01 c4 01";  // 24
  EXPECT_EQ(
      sent_back<ProcessedMessageEntry>(support::hex(text + "08 05 " + fixed + "10 06 " + group)),
      "08 05 10 06 " + text + fixed + group);
}

TEST(UnknownFields, OfAnEmbeddedMessage_AreSentBackInsideIt) {
  EXPECT_EQ(sent_back<ChannelAuthReply>(support::hex("48 01 12 04 40 02 08 03 08 04")),
            "08 04 12 04 08 03 40 02 48 01");
}

TEST(EnumerationsNumbers, OfARepeatedFieldThatAreNoMembers_AreSentBackBehindTheMembers) {
  EXPECT_EQ(sent_back<ChannelAuthRequest>(support::hex("58 01 58 00 58 02 58 00")),
            "58 00 58 00 58 01 58 02");
}

TEST(EnumerationsNumbers, WithAMemberAndThenAnother_KeepTheMember) {
  EXPECT_EQ(sent_back<ChatMessageParam>(support::hex("10 01 10 07")), "10 01 10 07");
}

// As a later schema may have it that packs them.
TEST(PackedNumbers, OfARepeatedField_AreReadToo) {
  EXPECT_EQ(sent_back<ShutdownConnectionRequest>(support::hex("62 04 05 ac 02 00")),
            "60 05 60 ac 02 60 00");
}

TEST(PackedNumbers, OfARepeatedEnumeration_AreReadToo) {
  EXPECT_EQ(sent_back<ChannelAuthRequest>(support::hex("5a 02 00 00")), "58 00 58 00");
}

}  // namespace
