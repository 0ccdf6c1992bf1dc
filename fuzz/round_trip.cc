// Any bytes into any of the schema's classes, which the first byte chooses: what is taken comes out
// again and stays the same from then on, with all that the class does not know.

#include <google/protobuf/message.h>
#include <google/protobuf/text_format.h>

#include <memory>

#include "target.h"

namespace fuzz {
namespace {

using google::protobuf::Message;
using google::protobuf::TextFormat;

std::string encoded(const Message& message) {
  std::string bytes = message.SerializeAsString();
  if (message.ByteSize() != static_cast<int>(bytes.size())) {
    fail("ByteSize is " + std::to_string(message.ByteSize()) + " for an encoding of " +
         std::to_string(bytes.size()) + " bytes");
  }
  return bytes;
}

void expect_same(const std::string& what, const std::string& got, const std::string& wanted) {
  if (got != wanted) {
    fail(what + " differs:\n" + got + "\ninstead of\n" + wanted);
  }
}

}  // namespace

void check_round_trip(const std::string& input) {
  if (input.empty()) {
    return;
  }
  const auto choice = static_cast<unsigned char>(input[0]);
  const std::string bytes = input.substr(1);
  const auto message = new_message(choice);
  if (!message->ParseFromString(bytes)) {
    return;
  }
  const std::string encoding = encoded(*message);

  const auto again = new_message(choice);
  if (!again->ParseFromString(encoding)) {
    fail("its own encoding does not parse: " + message->ShortDebugString());
  }
  expect_same("the second encoding", encoded(*again), encoding);
  expect_same("the text form", again->DebugString(), message->DebugString());

  const auto copy = new_message(choice);
  copy->CopyFrom(*message);
  expect_same("a copy's encoding", encoded(*copy), encoding);

  // Fields that no message has stand behind all others. (Behind the encoding, not behind the input:
  // an input may end within a record, whose length takes in whatever follows.)
  const std::string unknown = "\xc0\x3e\x07\xca\x3e\x01x";  // 1000: 7, 1001: "x"
  const auto with_unknown = new_message(choice);
  if (!with_unknown->ParseFromString(encoding + unknown)) {
    fail("unknown fields do not parse behind " + message->ShortDebugString());
  }
  expect_same("the encoding with unknown fields", encoded(*with_unknown), encoding + unknown);

  // The text form names known fields alone.
  message->DiscardUnknownFields();
  const auto from_text = new_message(choice);
  std::string text;
  if (!TextFormat::PrintToString(*message, &text) ||
      !TextFormat::ParseFromString(text, from_text.get())) {
    fail("its text form does not parse: " + text);
  }
  expect_same("the encoding of the text form", encoded(*from_text), encoded(*message));
}

}  // namespace fuzz
