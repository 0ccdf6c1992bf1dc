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

Wire& Wire::group(int field, const Wire& value) {
  tag(field, 3);
  bytes_ += value.bytes();
  tag(field, 4);
  return *this;
}

void Wire::fixed(uint64_t value, int size) {
  for (int i = 0; i < size; ++i, value >>= 8) {
    bytes_ += static_cast<char>(value);
  }
}

Wire& Wire::fixed64(int field, uint64_t value) {
  tag(field, 1);
  fixed(value, 8);
  return *this;
}

Wire& Wire::fixed32(int field, uint32_t value) {
  tag(field, 5);
  fixed(value, 4);
  return *this;
}

uint64_t WireReader::varint() {
  uint64_t value = 0;
  for (int shift = 0;; shift += 7) {
    const auto byte = static_cast<unsigned char>(bytes_.at(next_++));
    value |= static_cast<uint64_t>(byte & 0x7f) << shift;
    if (byte < 0x80) {
      return value;
    }
  }
}

std::string WireReader::text() {
  const uint64_t tag = varint();
  if (tag % 8 != 2) {
    throw std::invalid_argument("no text or message: tag " + std::to_string(tag));
  }
  const auto size = static_cast<size_t>(varint());
  std::string value = bytes_.substr(next_, size);
  next_ += size;
  return value;
}

}  // namespace support
