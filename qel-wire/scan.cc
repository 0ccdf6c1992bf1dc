#include "scan.h"

namespace qel_wire {

std::string_view take_line(std::string_view* text) {
  std::string_view line = take(text->find('\n'), text);
  take(1, text);
  take_while(is_blank, &line);
  while (!line.empty() && is_blank(line.back())) {
    line.remove_suffix(1);
  }
  return line;
}

bool take_prefix(std::string_view prefix, std::string_view* text) {
  const bool has_it = text->substr(0, prefix.size()) == prefix;
  take(has_it ? prefix.size() : 0, text);
  return has_it;
}

void append_pairs(std::string_view digits, std::string* bytes) {
  if (digits.size() % 2 != 0) {
    throw Stop{digits.data(), "an odd number of hex digits: a byte has two"};
  }
  for (size_t i = 0; i < digits.size(); i += 2) {
    *bytes += static_cast<char>(*number(digits.substr(i, 2), 16));
  }
}

bool begins_with_pairs(std::string_view text) {
  const size_t digits = count_while(is_digit, text);
  return digits > 0 && digits % 2 == 0 && is_space(char_at(text, digits));
}

bool is_of_hex(std::string_view line) {
  const auto is_of_it = [](char c) { return is_digit(c) || is_in("xXhH,:-\\ \t", c); };
  return line.substr(0, 23) != "00 01 02 03 04 05 06 07" &&
         std::all_of(line.begin(), line.end(), is_of_it);
}

}  // namespace qel_wire
