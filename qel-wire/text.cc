#include "text.h"

#include <utf8proc.h>

#include <cstdio>
#include <ctime>

namespace qel_wire {
namespace {

struct Character {
  int32_t code = 0;
  size_t size = 0;  // 0: no UTF-8
};

Character first_character(std::string_view text) {
  const auto lead = static_cast<unsigned char>(text[0]);
  if (lead < 0x80) {
    return {lead, 1};
  }
  int32_t code = 0;
  const auto size = utf8proc_iterate(reinterpret_cast<const utf8proc_uint8_t*>(text.data()),
                                     static_cast<utf8proc_ssize_t>(text.size()), &code);
  return size > 0 ? Character{code, static_cast<size_t>(size)} : Character{};
}

// Control characters, ends of lines, and characters of format, which may turn the direction of
// writing; but those that join or part the letters around them do nothing else.
bool is_obeyed(int32_t code) {
  if (code < 0x80) {
    return code < 0x20 || code == 0x7f;
  }
  constexpr int32_t kZeroWidthNonJoiner = 0x200c;
  constexpr int32_t kZeroWidthJoiner = 0x200d;
  switch (utf8proc_category(code)) {
    case UTF8PROC_CATEGORY_CC:
    case UTF8PROC_CATEGORY_ZL:
    case UTF8PROC_CATEGORY_ZP:
      return true;
    case UTF8PROC_CATEGORY_CF:
      return code != kZeroWidthNonJoiner && code != kZeroWidthJoiner;
    default:
      return false;
  }
}

bool is_invisible(int32_t code) {
  if (code < 0x80) {
    return is_obeyed(code) && code != '\t' && code != '\n' && code != '\r';
  }
  return is_obeyed(code) || utf8proc_category(code) == UTF8PROC_CATEGORY_ZS ||
         utf8proc_get_property(code)->ignorable;
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

// Takes the text's first character away, or its first byte if it does not begin with a character.
void append_readable(std::string_view* text, std::string* to) {
  const Character character = first_character(*text);
  const std::string_view bytes = text->substr(0, character.size == 0 ? 1 : character.size);
  text->remove_prefix(bytes.size());
  if (character.size == 0 || is_obeyed(character.code)) {
    append_octal(bytes, to);
  } else {
    *to += bytes;
  }
}

// Escapes may be four times as long as their text, so that all of them would take much memory.
void write_if_long(std::string* part, std::ostream* out) {
  constexpr size_t kLong = 4096;
  if (part->size() > kLong) {
    *out << *part;
    part->clear();
  }
}

// With milliseconds behind the form.
std::string time_text(int64_t milliseconds, const char* form, const char* zone) {
  const std::time_t seconds = milliseconds / 1000;
  std::tm parts{};
  gmtime_r(&seconds, &parts);
  char date[32];
  char text[48];
  std::strftime(date, sizeof date, form, &parts);
  std::snprintf(text, sizeof text, "%s.%03d%s", date, static_cast<int>(milliseconds % 1000), zone);
  return text;
}

}  // namespace

std::string readable(std::string_view text) {
  std::string result;
  while (!text.empty()) {
    append_readable(&text, &result);
  }
  return result;
}

void write_in_quotes(std::string_view text, std::ostream* out) {
  std::string part = "\"";
  while (!text.empty()) {
    write_if_long(&part, out);
    const char first = text.front();
    if (first == '\n') {
      part += "\\n";
      text.remove_prefix(1);
      continue;
    }
    if (first == '"' || first == '\\') {
      part += '\\';
    }
    append_readable(&text, &part);
  }
  *out << part << '"';
}

void append_hex(char byte, std::string* to) {
  constexpr char kDigits[] = "0123456789abcdef";
  *to += kDigits[static_cast<unsigned char>(byte) >> 4U];
  *to += kDigits[static_cast<unsigned char>(byte) & 15U];
}

void write_hex_escapes(std::string_view bytes, std::ostream* out) {
  std::string part = "\"";
  for (const char byte : bytes) {
    write_if_long(&part, out);
    part += "\\x";
    append_hex(byte, &part);
  }
  *out << part << '"';
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

std::string invisible_characters(std::string_view text) {
  constexpr size_t kMostNamed = 3;
  std::string names;
  size_t count = 0;
  for (size_t at = 0; at < text.size();) {
    const Character character = first_character(text.substr(at));
    if (character.size > 0 && is_invisible(character.code) && count++ < kMostNamed) {
      char name[48];
      std::snprintf(name, sizeof name, "%sU+%04X at byte %zu", count > 1 ? ", " : "",
                    static_cast<unsigned>(character.code), at);
      names += name;
    }
    at += character.size == 0 ? 1 : character.size;
  }
  return count > kMostNamed ? names + " and " + std::to_string(count - kMostNamed) + " more"
                            : names;
}

std::string counted(size_t count, const std::string& what) {
  return std::to_string(count) + " " + what + (count == 1 ? "" : "s");
}

std::string too_long(size_t length, size_t there) {
  return counted(length, "byte") + ", of which " + std::to_string(there) +
         (there == 1 ? " is there" : " are there");
}

std::string utc(int64_t milliseconds) {
  return time_text(milliseconds, "%Y-%m-%d %H:%M:%S", " UTC");
}

std::string rfc3339(int64_t milliseconds) {
  return time_text(milliseconds, "%Y-%m-%dT%H:%M:%S", "Z");
}

bool is_plausible_time(int64_t milliseconds) {
  return milliseconds >= 946684800000 && milliseconds < 4102444800000;
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

}  // namespace qel_wire
