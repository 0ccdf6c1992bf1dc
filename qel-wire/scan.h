// Takes a text apart from its beginning.
#ifndef QEL_WIRE_SCAN_H
#define QEL_WIRE_SCAN_H

#include <algorithm>
#include <cctype>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace qel_wire {

constexpr char kStray[] = "no hex digit, and nothing that may stand between bytes";
constexpr char kOrder[] = "the order of the bytes in these groups is not clear: print single bytes";

// Thrown: a place in the text, and why it cannot be read.
struct Stop {
  const char* at;
  std::string reason;
};

// Behind the end are empty lines.
inline char char_at(std::string_view text, size_t at) {
  return at < text.size() ? text[at] : '\n';
}

inline bool is_in(std::string_view set, char c) {
  return set.find(c) != std::string_view::npos;
}

inline bool is_blank(char c) {
  return c == ' ' || c == '\t' || c == '\r';
}

inline bool is_space(char c) {
  return is_blank(c) || c == '\n';
}

inline bool is_decimal(char c) {
  return c >= '0' && c <= '9';
}

inline bool is_digit(char c) {
  return std::isxdigit(static_cast<unsigned char>(c)) != 0;
}

// How many characters at the beginning are so.
template <typename Is>
size_t count_while(Is is, std::string_view text) {
  return static_cast<size_t>(std::find_if_not(text.begin(), text.end(), is) - text.begin());
}

// Each takes from the text what it returns.
inline std::string_view take(size_t most, std::string_view* text) {
  const std::string_view taken = text->substr(0, most);
  text->remove_prefix(taken.size());
  return taken;
}

template <typename Is>
std::string_view take_while(Is is, std::string_view* text) {
  return take(count_while(is, *text), text);
}

// Without blanks around it.
std::string_view take_line(std::string_view* text);

// Whether the text began with it.
bool take_prefix(std::string_view prefix, std::string_view* text);

// All of the digits, if they are such a number.
template <typename Number = uint64_t>
std::optional<Number> number(std::string_view digits, int base = 10) {
  Number value = 0;
  const char* const end = digits.data() + digits.size();
  const auto [stop, error] = std::from_chars(digits.data(), end, value, base);
  return error == std::errc() && stop == end ? std::optional(value) : std::nullopt;
}

void append_pairs(std::string_view digits, std::string* bytes);

// Whether pairs of digits come first, with nothing that sticks to them.
bool begins_with_pairs(std::string_view text);

// Whether all of the line may be bytes. What numbers the columns is none.
bool is_of_hex(std::string_view line);

}  // namespace qel_wire

#endif
