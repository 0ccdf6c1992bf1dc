// Wire bytes written by hand.
#ifndef TESTS_SUPPORT_WIRE_H
#define TESTS_SUPPORT_WIRE_H

#include <cstdint>
#include <string>

namespace support {

// The bytes that a text such as "08 96 01" spells in hexadecimal. Blanks do not matter.
std::string hex(const std::string& text);

// The other way round, for comparing bytes with readable differences.
std::string to_hex(const std::string& bytes);
std::string to_hex(const unsigned char* bytes, int size);

// Builds a message field by field, with an encoder of its own.
class Wire {
 public:
  Wire& number(int field, int64_t value);           // int32, int64, bool, enumerations
  Wire& text(int field, const std::string& value);  // string, bytes
  Wire& message(int field, const Wire& value);      // an embedded message
  const std::string& bytes() const { return bytes_; }

 private:
  void varint(uint64_t value);
  void tag(int field, unsigned wire_type);
  std::string bytes_;
};

}  // namespace support

#endif
