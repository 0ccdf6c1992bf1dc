#include "text.h"

#include <cstdint>
#include <sstream>

namespace qel_wire {
namespace {

struct Character {
  uint32_t code = 0;
  size_t size = 0;  // 0: no UTF-8
};

Character first_character(std::string_view text) {
  const auto lead = static_cast<unsigned char>(text[0]);
  if (lead < 0x80) {
    return {lead, 1};
  }
  // Of so many bytes the first has these bits, and the code is at least that.
  static constexpr struct {
    unsigned char mask, lead;
    uint32_t least;
  } kLengths[] = {{0xe0, 0xc0, 0x80}, {0xf0, 0xe0, 0x800}, {0xf8, 0xf0, 0x10000}};
  size_t size = 1;
  for (const auto& length : kLengths) {
    ++size;
    if ((lead & length.mask) != length.lead) {
      continue;
    }
    if (text.size() < size) {
      return {};
    }
    uint32_t code = lead & static_cast<unsigned char>(~length.mask);
    for (size_t i = 1; i < size; ++i) {
      const auto byte = static_cast<unsigned char>(text[i]);
      if ((byte & 0xc0U) != 0x80) {
        return {};
      }
      code = code << 6U | (byte & 0x3fU);
    }
    const bool is_surrogate = code >= 0xd800 && code <= 0xdfff;
    return code < length.least || code > 0x10ffff || is_surrogate ? Character{}
                                                                  : Character{code, size};
  }
  return {};
}

// Control characters, and those that turn the direction of writing.
bool is_obeyed(uint32_t code) {
  return code < 0x20 || (code >= 0x7f && code < 0xa0) || code == 0x61c || code == 0x200e ||
         code == 0x200f || (code >= 0x2028 && code <= 0x202e) ||
         (code >= 0x2066 && code <= 0x2069) || code == 0xfeff;
}

void append_octal(std::string_view bytes, std::string* to) {
  for (const char c : bytes) {
    const auto byte = static_cast<unsigned char>(c);
    *to += '\\';
    *to += static_cast<char>('0' + (byte >> 6U));
    *to += static_cast<char>('0' + (byte >> 3U & 7U));
    *to += static_cast<char>('0' + (byte & 7U));
  }
}

// The text's first character, or byte if that is none, which is taken away from it.
std::string take_readable(std::string_view* text) {
  const Character character = first_character(*text);
  const std::string_view bytes = text->substr(0, character.size == 0 ? 1 : character.size);
  text->remove_prefix(bytes.size());
  std::string result;
  if (character.size == 0 || is_obeyed(character.code)) {
    append_octal(bytes, &result);
  } else {
    result = bytes;
  }
  return result;
}

}  // namespace

std::string readable(std::string_view text) {
  std::string result;
  while (!text.empty()) {
    result += take_readable(&text);
  }
  return result;
}

std::string in_quotes(std::string_view text) {
  std::string result = "\"";
  while (!text.empty()) {
    const char first = text.front();
    const std::string character = take_readable(&text);
    if (first == '\n') {
      result += "\\n";
    } else if (first == '"' || first == '\\') {
      result.append("\\").append(character);
    } else {
      result += character;
    }
  }
  return result + '"';
}

size_t size_of_character(std::string_view text) {
  const Character character = text.empty() ? Character() : first_character(text);
  return is_obeyed(character.code) ? 0 : character.size;
}

bool is_utf8(std::string_view text) {
  while (!text.empty()) {
    const size_t size = first_character(text).size;
    if (size == 0) {
      return false;
    }
    text.remove_prefix(size);
  }
  return true;
}

std::string counted(size_t count, const std::string& what) {
  return std::to_string(count) + " " + what + (count == 1 ? "" : "s");
}

Colours::Colours(bool on) {
  if (on) {
    quiet = "\033[2m";
    name = "\033[36m";
    value = "\033[32m";
    doubt = "\033[33m";
    wrong = "\033[1;31m";
    end = "\033[0m";
  }
}

std::string with_coloured_names(const std::string& text, const Colours& colours,
                                std::pair<size_t, size_t> (*find_name)(const std::string& line)) {
  std::string result;
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    const auto [begin, end] = find_name(line);
    if (begin < end) {
      line.insert(end, colours.end).insert(begin, colours.name);
    }
    result += line + "\n";
  }
  return result;
}

}  // namespace qel_wire
