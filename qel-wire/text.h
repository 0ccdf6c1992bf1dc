// What people read: texts in quotes, amounts, times, colours.
#ifndef QEL_WIRE_TEXT_H
#define QEL_WIRE_TEXT_H

#include <cstddef>
#include <cstdint>
#include <ostream>
#include <string>
#include <string_view>

namespace qel_wire {

// With octal escapes for what is no UTF-8, and for characters that a terminal would obey instead of
// showing them.
std::string readable(std::string_view text);

// The same in quotes, as the text form has it.
void write_in_quotes(std::string_view text, std::ostream* out);
// In quotes too, with every byte as \x and two digits.
void write_hex_escapes(std::string_view bytes, std::ostream* out);

// Two digits.
void append_hex(char byte, std::string* to);

// The bytes of the text's first character, or 0 if that is none or one that a terminal would obey.
size_t size_of_character(std::string_view text);

// Whether all of it is UTF-8.
bool is_utf8(std::string_view text);

// Which characters of the text nobody sees, or takes for a blank, and where: "U+200B at byte 3", or
// nothing. Ends of lines and tabs are none of them.
std::string invisible_characters(std::string_view text);

// "1 byte", "2 bytes"
std::string counted(size_t count, const std::string& what);

// Of a length that reaches too far: "2 bytes, of which 1 is there".
std::string too_long(size_t length, size_t there);

// "2023-11-14 22:13:20.000 UTC" of milliseconds since 1970.
std::string utc(int64_t milliseconds);

// The same as programs have it: "2023-11-14T22:13:20.000Z".
std::string rfc3339(int64_t milliseconds);

// Whether it may be such a time: of the years 2000 to 2099.
bool is_plausible_time(int64_t milliseconds);

// Escapes of a terminal's colours, or empty texts where there is none.
struct Colours {
  explicit Colours(bool on);
  std::string quiet, name, value, doubt, wrong, end;
};

}  // namespace qel_wire

#endif
