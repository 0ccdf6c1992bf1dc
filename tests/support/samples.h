// Messages of every kind, filled field by field: as objects, through reflection, and in the text
// form that the peer reads and writes.
#ifndef TESTS_SUPPORT_SAMPLES_H
#define TESTS_SUPPORT_SAMPLES_H

#include <google/protobuf/message.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace support {

// Which member an enumeration's field holds.
enum class Member {
  kFirst,
  kLast,
  kInTurn,
  kLater,    // one that only the later schema knows
  kEarlier,  // another, whose number is negative
};

// Which fields of a message, and of those inside it, are set.
enum class Presence { kAll, kNone, kOddNumbers, kEvenNumbers };

// How all fields of a message and of those inside it are filled. From a list of several values,
// each field takes the next.
struct Filling {
  std::string name;
  std::vector<int64_t> longs;
  std::vector<int32_t> ints;
  std::vector<std::string> texts;
  std::vector<std::string> bytes;
  Member member = Member::kInTurn;
  int elements = 2;  // of a repeated field; one at most inside such an element
  Presence presence = Presence::kAll;
  bool filled_inside = true;      // false: embedded messages are set, but empty
  bool has_later_fields = false;  // those of the later schema are set too, on every level
};

// Of the schema that the library knows.
const std::vector<Filling>& fillings();
// With what only a later schema knows.
const std::vector<Filling>& later_fillings();
// With a reply's code: that of the result, and every other 32-bit number.
Filling filling_with_code(int32_t code);

struct Sample {
  std::string filling;
  std::unique_ptr<google::protobuf::Message> message;
  std::string text;  // exactly as the peer writes it

  const std::string& type() const { return message->GetDescriptor()->full_name(); }
};

// What only the later schema knows is in the text, and among the message's unknown fields.
Sample make_sample(const google::protobuf::Descriptor& type, const Filling& filling);

// The library's schema as a service might have it that is newer than the client: with further
// fields of each wire type in every message, between the known ones and after them, and further
// members in every enumeration.
std::string later_schema();

}  // namespace support

#endif
