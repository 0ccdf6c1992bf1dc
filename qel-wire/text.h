// What people read: texts in quotes, amounts, colours.
#ifndef QEL_WIRE_TEXT_H
#define QEL_WIRE_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>

namespace qel_wire {

// With octal escapes for what is no UTF-8, and for characters that a terminal would obey instead of
// showing them.
std::string readable(std::string_view text);

// The same in quotes, as the text form has it.
std::string in_quotes(std::string_view text);

// The bytes of the text's first character, or 0 if that is none or one that a terminal would obey.
size_t size_of_character(std::string_view text);

// Whether all of it is UTF-8.
bool is_utf8(std::string_view text);

// "1 byte", "2 bytes"
std::string counted(size_t count, const std::string& what);

// Escapes of a terminal's colours, or empty texts where there is none.
struct Colours {
  explicit Colours(bool on);
  std::string quiet, name, value, doubt, wrong, end;
};

// The text with a name coloured in each line: find_name says from where to where it stands there,
// which is nowhere if both are the same.
std::string with_coloured_names(const std::string& text, const Colours& colours,
                                std::pair<size_t, size_t> (*find_name)(const std::string& line));

}  // namespace qel_wire

#endif
