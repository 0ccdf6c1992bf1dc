// Bytes of messages, written by hand: an encoder of the tests' own.
#ifndef TESTS_SUPPORT_FIELDS_H
#define TESTS_SUPPORT_FIELDS_H

#include <cstdint>
#include <cstdio>
#include <sstream>
#include <string>
#include <utility>

namespace support {

// The bytes that a text such as "08 96 01" spells in hexadecimal, and the other way round.
inline std::string hex(const std::string& text) {
  std::istringstream digits(text);
  std::string bytes;
  for (unsigned byte = 0; digits >> std::hex >> byte;) {
    bytes += static_cast<char>(byte);
  }
  return bytes;
}
inline std::string to_hex(const std::string& bytes) {
  std::string text;
  for (const char byte : bytes) {
    char digits[4];
    std::snprintf(digits, sizeof digits, " %02x", static_cast<unsigned char>(byte));
    text += digits;
  }
  return text.empty() ? text : text.substr(1);
}

// A message's fields, one after the other.
class Fields {
 public:
  Fields() = default;
  explicit Fields(std::string bytes) : bytes_(std::move(bytes)) {}

  // int32, int64, bool, enumerations
  Fields& number(int field, int64_t value) {
    varint(static_cast<uint64_t>(field) << 3);
    varint(static_cast<uint64_t>(value));
    return *this;
  }
  // string, bytes
  Fields& text(int field, const std::string& value) {
    varint(static_cast<uint64_t>(field) << 3 | 2);
    varint(value.size());
    bytes_ += value;
    return *this;
  }
  Fields& message(int field, const Fields& value) { return text(field, value.bytes_); }

  const std::string& bytes() const { return bytes_; }

 private:
  void varint(uint64_t value) {
    for (; value >= 0x80; value >>= 7) {
      bytes_ += static_cast<char>(value | 0x80);
    }
    bytes_ += static_cast<char>(value);
  }

  std::string bytes_;
};

// A call of a function that takes the message's bytes first.
template <typename Function, typename... Others>
auto read(Function function, const Fields& message, Others... others) {
  const std::string& bytes = message.bytes();
  return function(reinterpret_cast<const unsigned char*>(bytes.data()),
                  static_cast<int>(bytes.size()), others...);
}

}  // namespace support

#endif
