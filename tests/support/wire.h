// Wire bytes written by hand.
#ifndef TESTS_SUPPORT_WIRE_H
#define TESTS_SUPPORT_WIRE_H

#include <cstdint>
#include <string>
#include <utility>

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
  Wire& group(int field, const Wire& value);
  Wire& fixed64(int field, uint64_t value);
  Wire& fixed32(int field, uint32_t value);
  const std::string& bytes() const { return bytes_; }

 private:
  void varint(uint64_t value);
  void tag(int field, unsigned wire_type);
  void fixed(uint64_t value, int size);
  std::string bytes_;
};

// Takes such bytes apart again, field by field.
class WireReader {
 public:
  explicit WireReader(std::string bytes) : bytes_(std::move(bytes)) {}
  bool at_end() const { return next_ == bytes_.size(); }
  std::string text();  // of a string, bytes or an embedded message, whatever its field

 private:
  uint64_t varint();
  std::string bytes_;
  size_t next_ = 0;
};

}  // namespace support

#endif
