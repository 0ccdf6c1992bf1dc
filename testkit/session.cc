#include "session.h"

#include <cstdint>
#include <cstring>
#include <map>

#include "messages.h"
#include "report.h"

namespace testkit {
namespace {

// Of pcapng.
constexpr uint32_t kSection = 0x0a0d0d0a;
constexpr uint32_t kByteOrder = 0x1a2b3c4d;
constexpr uint32_t kInterface = 1;
constexpr uint32_t kPacket = 6;
constexpr uint32_t kLinkType = 147;

// Of a record.
constexpr size_t kHead = 12;
enum Direction { kSent = 1, kReceived = 2 };
constexpr unsigned kRefused = 2;

uint32_t number(std::string_view bytes, size_t at, size_t size, bool is_big_endian) {
  uint32_t result = 0;
  for (size_t i = 0; i < size; ++i) {
    const size_t index = is_big_endian ? at + i : at + size - 1 - i;
    result = result << 8U | static_cast<unsigned char>(bytes[index]);
  }
  return result;
}

struct Record {
  unsigned direction;
  unsigned end;
  bool is_cut;
  std::string name;
  std::string_view bytes;
};

// The records by their numbers: a ring's file has them in another order.
class Reader {
 public:
  explicit Reader(std::string_view bytes) : rest_(bytes) {}

  std::map<uint32_t, Record> read() {
    if (rest_.size() < 12 || number(rest_, 0, 4, false) != kSection) {
      throw Unreadable{"it is no pcapng file"};
    }
    while (block()) {
    }
    return std::move(records_);
  }

 private:
  // False at the end, also of a file that is cut off.
  bool block() {
    if (rest_.size() < 12) {
      return false;
    }
    if (number(rest_, 0, 4, false) == kSection) {
      is_big_endian_ = number(rest_, 8, 4, false) != kByteOrder;
      if (number(rest_, 8, 4, is_big_endian_) != kByteOrder) {
        throw Unreadable{"it is no pcapng file"};
      }
    }
    const uint32_t type = word(0);
    const uint32_t length = word(4);
    if (length < 12 || length % 4 != 0) {
      throw Unreadable{"a block has a wrong length"};
    }
    if (length > rest_.size()) {
      return false;
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
    const std::string_view data = rest_.substr(28, captured);
    if (data.size() < kHead || data.substr(0, 4) != std::string_view("qel\1", 4)) {
      throw Unreadable{"a record is not of this format"};
    }
    const size_t name_end = kHead + number(data, 10, 2, false);
    if (name_end > data.size()) {
      throw Unreadable{"a record is shorter than its name"};
    }
    records_[number(data, 4, 4, false)] = {static_cast<unsigned char>(data[8]),
                                           static_cast<unsigned char>(data[9]), captured < word(24),
                                           std::string(data.substr(kHead, name_end - kHead)),
                                           data.substr(name_end)};
  }

  uint32_t word(size_t at) const { return number(rest_, at, 4, is_big_endian_); }

  std::string_view rest_;
  bool is_big_endian_ = false;
  std::map<uint32_t, Record> records_;
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

Step step_of(const Record& record, const std::string& where) {
  Step step{record.direction == kSent,
            where,
            &type_of(record.name, where),
            std::string(record.bytes),
            {}};
  if (record.is_cut) {
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

}  // namespace

std::vector<Step> read_session(std::string_view bytes) {
  std::vector<Step> steps;
  uint32_t last = 0;
  for (const auto& [number, record] : Reader(bytes).read()) {
    const std::string where = "record " + std::to_string(number);
    if (number != last + 1) {
      throw Unreadable{"the records before " + where + " are lost"};
    }
    last = number;
    if (record.direction != kSent && record.direction != kReceived) {
      throw Unreadable{where + " has no direction"};
    }
    const bool was_sent =
        record.direction == kReceived || (record.end != kRefused && !record.bytes.empty());
    if (was_sent) {
      steps.push_back(step_of(record, where));
    }
  }
  return steps;
}

}  // namespace testkit
