// A message as people and programs write it.
#ifndef QEL_WIRE_FORMS_H
#define QEL_WIRE_FORMS_H

#include <google/protobuf/message.h>

#include <optional>
#include <string>
#include <string_view>

#include "text.h"

namespace qel_wire {

// The text form of Protocol Buffers, which parse_text() takes back but for unknown fields: these
// stand behind the others, by their numbers.
std::string text_form(const google::protobuf::Message& message,
                      const Colours& colours = Colours(false));

// The JSON form of Protocol Buffers: names as in the schema, int64 and bytes (base64) as strings,
// enumerations by name. It has no unknown fields.
std::string json_form(const google::protobuf::Message& message,
                      const Colours& colours = Colours(false));

// How many fields the message does not know, on all levels.
int unknown_fields(const google::protobuf::Message& message);

// Whether a text of the message, on any level, is what stands for a text that is not shown.
bool lacks_hidden_text(const google::protobuf::Message& message);

// Fills the message. Nothing, or where and why the text is no such message.
std::optional<std::string> parse_text(const std::string& text, google::protobuf::Message* message);

// How bytes are written.
enum class Notation { kRaw, kHex, kBase64 };

// From hex with or without blanks, colons, commas, 0x and \x; from base64 of either alphabet,
// padded or not. Nothing if the text is neither.
std::optional<std::string> from_notation(std::string_view text, Notation notation);
std::string to_notation(std::string_view bytes, Notation notation);

}  // namespace qel_wire

#endif
