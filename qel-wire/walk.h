// Reads the bytes of a message one field at a time, and takes exactly what the protocol runtime
// takes, its leniencies included; so it can say where each field lies, and where and why the
// runtime gives up.
#ifndef QEL_WIRE_WALK_H
#define QEL_WIRE_WALK_H

#include <google/protobuf/descriptor.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace qel_wire {

// No call takes more.
constexpr size_t kMostBytes = size_t{64} << 20;

struct Piece {
  enum Kind { kVarint, kFixed64, kFixed32, kBytes, kMessage, kGroup, kPacked };

  Kind kind = kVarint;
  int depth = 0;  // 0 for the message's own fields
  uint32_t number = 0;
  // Null if the message has no such number.
  const google::protobuf::FieldDescriptor* field = nullptr;
  // Whether the wire type is the field's. Where it is not, or there is no such field, the runtime
  // keeps the piece as an unknown field.
  bool is_known = false;
  // Of a known field that is not repeated and was there before: the offset where. The runtime keeps
  // the later value; embedded messages are merged.
  std::optional<size_t> earlier;
  // Whether a known field with a higher number came before it, which no encoder writes.
  bool is_late = false;

  // Tag and length, then the value. The elements of a packed field have no tag.
  size_t offset = 0;
  size_t value_offset = 0;
  size_t end = 0;
  size_t end_tag = 0;  // of kGroup, once it is over: the last bytes before its end

  uint64_t value = 0;      // of a number, as it stands on the wire
  std::string_view bytes;  // the value of kBytes
  // The length that kMessage and kPacked give themselves. Where it reaches behind the end of what
  // they lie in, the runtime takes what is there.
  uint32_t length = 0;

  // Whether other pieces lie in it.
  bool is_container() const { return kind == kMessage || kind == kGroup || kind == kPacked; }
  // Whether it ends before its length says so.
  bool is_short() const { return is_container() && length > end - value_offset; }
  // Of a packed list: it has no tag.
  bool is_element() const { return offset == value_offset; }
  // Of a number: what the runtime keeps for an int32 or an enumeration.
  int32_t low_32_bits() const { return static_cast<int32_t>(static_cast<uint32_t>(value)); }
  // Whether a known number or text is none that its field has: more than 32 bits, outside its
  // enumeration, neither 0 nor 1, no UTF-8.
  bool is_doubtful() const;
};

// Where and why reading ended.
struct Problem {
  size_t offset = 0;  // of the tag, number, length, text or group that cannot be read
  // The bytes that show it, from the field's tag on. A text's are never among them.
  size_t begin = 0;
  size_t end = 0;
  int depth = 0;
  std::string reason;
};

class Visitor {
 public:
  virtual ~Visitor() = default;
  // Of a container before what it contains; the end of a group is not known yet, and 0.
  virtual void begin(const Piece& /*piece*/) {}
  // Of a container, behind what it contains.
  virtual void end(const Piece& /*piece*/) {}
};

// Shows the visitor each field of the bytes as those of a message of the type. Nothing if they are
// read whole.
std::optional<Problem> walk(std::string_view bytes, const google::protobuf::Descriptor& type,
                            Visitor* visitor);

}  // namespace qel_wire

#endif
