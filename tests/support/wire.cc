#include "support/wire.h"

#include <stdexcept>

namespace support {

std::string hex(const std::string& text) {
  const std::string digits = "0123456789abcdef";
  std::string bytes;
  size_t high = std::string::npos;
  for (const char c : text) {
    if (c == ' ') {
      continue;
    }
    const size_t digit = digits.find(c);
    if (digit == std::string::npos) {
      throw std::invalid_argument("not hexadecimal: " + text);
    }
    if (high == std::string::npos) {
      high = digit;
    } else {
      bytes += static_cast<char>(high * 16 + digit);
      high = std::string::npos;
    }
  }
  if (high != std::string::npos) {
    throw std::invalid_argument("half a byte: " + text);
  }
  return bytes;
}

std::string to_hex(const std::string& bytes) {
  const char* digits = "0123456789abcdef";
  std::string text;
  for (const char c : bytes) {
    const auto byte = static_cast<unsigned char>(c);
    text += text.empty() ? "" : " ";
    text += digits[byte / 16];
    text += digits[byte % 16];
  }
  return text;
}

std::string to_hex(const unsigned char* bytes, int size) {
  return to_hex(std::string(reinterpret_cast<const char*>(bytes), static_cast<size_t>(size)));
}

void Wire::varint(uint64_t value) {
  for (; value >= 0x80; value >>= 7) {
    bytes_ += static_cast<char>(value | 0x80);
  }
  bytes_ += static_cast<char>(value);
}

void Wire::tag(int field, unsigned wire_type) {
  varint(static_cast<uint64_t>(field) << 3 | wire_type);
}

Wire& Wire::number(int field, int64_t value) {
  tag(field, 0);
  varint(static_cast<uint64_t>(value));
  return *this;
}

Wire& Wire::text(int field, const std::string& value) {
  tag(field, 2);
  varint(value.size());
  bytes_ += value;
  return *this;
}

Wire& Wire::message(int field, const Wire& value) {
  return text(field, value.bytes());
}

}  // namespace support
