// Messages as people and programs read them.
#ifndef QEL_WIRE_PRINT_H
#define QEL_WIRE_PRINT_H

#include <google/protobuf/descriptor.h>

#include <ostream>
#include <string>
#include <string_view>

#include "notation.h"
#include "text.h"
#include "token.h"
#include "walk.h"

namespace qel_wire {

// How a value of type bytes is written, and a text that is no UTF-8: with octal escapes in the text
// form and in base64 in JSON, or in hex in both.
enum class BytesForm { kUsual, kHex };
// The form's notation in JSON.
Notation notation_in_json(BytesForm form);

// The text form of Protocol Buffers, with the time beside numbers that are times. Unknown fields
// stand behind the others, by their numbers: decimal for a varint, 0x and 8 or 16 digits for a
// number of 4 or 8 bytes.
void print_text(std::string_view bytes, const google::protobuf::Descriptor& type,
                const Hidden& hidden, BytesForm form, const Colours& colours, std::ostream* out);

// The JSON form of Protocol Buffers: names as in the schema, int64 and bytes as strings,
// enumerations by name.
struct NotInJson {
  size_t unknown = 0;   // fields that are left out, on all levels
  size_t replaced = 0;  // texts that are no UTF-8: what is wrong in them is replaced
};
NotInJson print_json(std::string_view bytes, const google::protobuf::Descriptor& type,
                     const Hidden& hidden, BytesForm form, const Colours& colours,
                     std::ostream* out);

// A number or a text as the text form has it.
void write_in_text(const Piece& piece, BytesForm form, std::ostream* out);
std::string value_in_text(const Piece& piece, BytesForm form);
// The same as JSON has it: a known field's number, and what stands between the quotes of a text
// before anything is escaped.
std::string number_in_json(const Piece& piece);
std::string text_in_json(const Piece& piece, BytesForm form);
// "2023-11-14 22:13:20.000 UTC" of a number that is a time, otherwise nothing.
std::string time_of(const Piece& piece);

}  // namespace qel_wire

#endif
