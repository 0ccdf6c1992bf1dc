// Numbers and blocks, as files of captures have them.
#ifndef QEL_WIRE_TESTS_NUMBERS_H
#define QEL_WIRE_TESTS_NUMBERS_H

#include <cstddef>
#include <cstdint>
#include <string>

inline std::string little_endian(uint64_t number, size_t size) {
  std::string bytes;
  for (size_t i = 0; i < size; ++i) {
    bytes += static_cast<char>(number >> (8 * i));
  }
  return bytes;
}

inline std::string big_endian(uint64_t number, size_t size) {
  const std::string bytes = little_endian(number, size);
  return {bytes.rbegin(), bytes.rend()};
}

// Of pcapng.
inline std::string block(uint32_t type, std::string body) {
  body.resize((body.size() + 3) / 4 * 4);
  const std::string size = little_endian(body.size() + 12, 4);
  return little_endian(type, 4) + size + body + size;
}

#endif
