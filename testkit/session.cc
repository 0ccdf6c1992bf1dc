#include "session.h"

#include <cstdint>
#include <map>

#include "messages.h"
#include "qel-trace/record.h"
#include "report.h"

namespace testkit {
namespace {

// Of pcapng.
constexpr uint32_t kSection = 0x0a0d0d0a;
constexpr uint32_t kByteOrder = 0x1a2b3c4d;
constexpr uint32_t kInterface = 1;
constexpr uint32_t kPacket = 6;
constexpr uint32_t kLinkType = 147;

using session_file::Direction;
using session_file::Outcome;

uint32_t number(std::string_view bytes, size_t at, size_t size, bool is_big_endian) {
  uint32_t result = 0;
  for (size_t i = 0; i < size; ++i) {
    const size_t index = is_big_endian ? at + i : at + size - 1 - i;
    result = result << 8U | static_cast<unsigned char>(bytes[index]);
  }
  return result;
}

bool has_order(std::string_view section, bool is_big_endian) {
  return section.size() >= 12 && number(section, 8, 4, is_big_endian) == kByteOrder;
}

bool is_section(std::string_view bytes) {
  return (has_order(bytes, false) || has_order(bytes, true)) &&
         number(bytes, 0, 4, false) == kSection;
}

struct Packet {
  session_file::Record record;
  bool is_cut;
};

// The records by their numbers: a ring's file has them in another order.
class Reader {
 public:
  explicit Reader(std::string_view bytes) : bytes_(bytes), rest_(bytes) {}

  std::map<uint32_t, Packet> read() {
    if (!is_section(rest_)) {
      throw Unreadable{"it is no pcapng file"};
    }
    while (block()) {
    }
    return std::move(packets_);
  }

 private:
  // False at the end, also of a file that is cut off.
  bool block() {
    if (rest_.size() < 12) {
      return false;
    }
    if (is_section(rest_)) {
      is_big_endian_ = has_order(rest_, true);
    }
    const uint32_t type = word(0);
    const uint32_t length = word(4);
    const bool is_cut_off = length > rest_.size() && !has_later_section();
    if (is_cut_off) {
      return false;
    }
    if (length < 12 || length % 4 != 0 || length > rest_.size()) {
      throw Unreadable{"the bytes from offset " + std::to_string(bytes_.size() - rest_.size()) +
                       " on cannot be read"};
    }
    if (type == kInterface && length >= 20 && number(rest_, 8, 2, is_big_endian_) != kLinkType) {
      throw Unreadable{"it is a capture of something else"};
    }
    if (type == kPacket && length >= 32) {
      packet(length);
    }
    rest_.remove_prefix(length);
    return true;
  }

  void packet(uint32_t block_length) {
    const uint32_t captured = word(20);
    if (captured > block_length - 32) {
      throw Unreadable{"a packet is longer than its block"};
    }
    const auto record = session_file::record_in(rest_.substr(28, captured));
    if (!record.has_value()) {
      throw Unreadable{"a packet is no record of this format"};
    }
    if (!packets_.emplace(record->number, Packet{*record, captured < word(24)}).second) {
      throw Unreadable{"there are two records " + std::to_string(record->number)};
    }
  }

  bool has_later_section() const {
    size_t at = 0;
    do {
      at = rest_.find("\n\r\r\n", at + 1);
    } while (at != std::string_view::npos && !is_section(rest_.substr(at)));
    return at != std::string_view::npos;
  }

  uint32_t word(size_t at) const { return number(rest_, at, 4, is_big_endian_); }

  std::string_view bytes_;
  std::string_view rest_;
  bool is_big_endian_ = false;
  std::map<uint32_t, Packet> packets_;
};

const google::protobuf::Descriptor& type_of(const std::string& name, const std::string& where) {
  const auto function = messages_of_functions().find(name);
  const auto* type =
      message_type(function == messages_of_functions().end() ? name : function->second);
  if (type == nullptr) {
    throw Unreadable{where + " has a name " + quoted_name(name) + ", which is that of no message"};
  }
  return *type;
}

Step step_of(const Packet& packet, const std::string& where) {
  const session_file::Record& record = packet.record;
  Step step{record.direction == Direction::kSent,
            where,
            &type_of(std::string(record.name), where),
            std::string(record.message),
            {}};
  if (packet.is_cut) {
    throw Unreadable{where + " has a message that was cut off"};
  }
  if (step.was_sent) {
    const auto message = new_message(*step.type);
    if (!message->ParseFromString(step.bytes)) {
      throw Unreadable{where + " has no " + step.type->name()};
    }
    step.message = pattern_of(*message);
  }
  return step;
}

// A refused request was not sent.
bool has_message(const session_file::Record& record) {
  return record.direction == Direction::kReceived ||
         (record.outcome != Outcome::kRefused && !record.message.empty());
}

}  // namespace

std::vector<Step> read_session(std::string_view bytes) {
  std::vector<Step> steps;
  uint32_t last = 0;
  for (const auto& [number, packet] : Reader(bytes).read()) {
    const std::string where = "record " + std::to_string(number);
    if (number != last + 1) {
      throw Unreadable{"the records before " + where + " are lost"};
    }
    last = number;
    if (has_message(packet.record)) {
      steps.push_back(step_of(packet, where));
    }
  }
  if (steps.empty()) {
    throw Unreadable{"it has no messages"};
  }
  return steps;
}

}  // namespace testkit
