// A record of a session file, for those that read it: what its packet has.
#ifndef QEL_TRACE_RECORD_H
#define QEL_TRACE_RECORD_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

namespace session_file {

enum class Direction { kSent = 1, kReceived = 2 };

// How the call ended that made a message or took one.
enum class Outcome { kNotEnded, kDone, kRefused, kNotKnown };

struct Record {
  uint32_t number;
  Direction direction;
  Outcome outcome;
  std::string_view name;
  std::string_view message;
};

inline uint32_t number_in(std::string_view bytes, size_t offset, size_t size) {
  uint32_t number = 0;
  for (size_t i = size; i > 0; --i) {
    number = number << 8U | static_cast<unsigned char>(bytes[offset + i - 1]);
  }
  return number;
}

// Nothing if the packet is no record, or one whose name is cut. The record is in the packet.
inline std::optional<Record> record_in(std::string_view packet) {
  constexpr size_t kHead = 12;
  if (packet.size() < kHead || packet.substr(0, 4) != std::string_view("qel\1", 4)) {
    return std::nullopt;
  }
  const uint32_t number = number_in(packet, 4, 4);
  const uint32_t direction = number_in(packet, 8, 1);
  const uint32_t outcome = number_in(packet, 9, 1);
  const size_t name_end = kHead + number_in(packet, 10, 2);
  if (number == 0 || direction < 1 || direction > 2 || outcome > 3 || packet.size() < name_end) {
    return std::nullopt;
  }
  return Record{number, static_cast<Direction>(direction), static_cast<Outcome>(outcome),
                packet.substr(kHead, name_end - kHead), packet.substr(name_end)};
}

}  // namespace session_file

#endif
