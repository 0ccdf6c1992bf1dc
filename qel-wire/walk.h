// Reads the bytes of a message one field at a time, and takes exactly what the protocol runtime
// takes, its leniencies included; so it can say where each field lies, and where and why the
// runtime gives up.
#ifndef QEL_WIRE_WALK_H
#define QEL_WIRE_WALK_H

#include <google/protobuf/descriptor.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace qel_wire {

// No call takes more.
constexpr size_t kMostBytes = size_t{64} << 20;

// Nor more levels of messages and groups in each other.
constexpr int kDeepest = 100;
inline std::string too_deep() {
  return "more than " + std::to_string(kDeepest) + " levels of nesting";
}

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
  // Whether a field with a higher number came before this known one, which no encoder writes.
  bool is_late = false;
  // Of a known field that is not repeated and was there before: the offset where. The runtime keeps
  // the later value; embedded messages are merged.
  std::optional<size_t> earlier;

  // How the tag, the length and the number are written, where no encoder writes them so: with more
  // bytes than they need, or with bits that the runtime drops.
  enum Oddity : unsigned {
    kLongTag = 1,
    kCutTag = 2,
    kLongLength = 4,
    kCutLength = 8,
    kLongNumber = 16,
    kCutNumber = 32
  };
  unsigned oddities = 0;

  // Tag and length, then the value. The elements of a packed field have no tag.
  size_t offset = 0;
  size_t value_offset = 0;
  size_t end = 0;
  size_t end_tag = 0;  // of kGroup, once it is over: the last bytes before its end

  uint64_t value = 0;      // of a number, as it stands on the wire
  std::string_view bytes;  // the value of kBytes
  bool is_hidden = false;  // whether that is not the value, but says that it is not shown
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
  // Of kBytes: whether the field's type is bytes, rather than a text.
  bool is_of_bytes() const {
    return is_known && field->type() == google::protobuf::FieldDescriptor::TYPE_BYTES;
  }
  // Whether a known number or text is none that its field has: more than 32 bits, outside its
  // enumeration, neither 0 nor 1, no UTF-8.
  bool is_doubtful() const;
  // Whether it is a number outside its enumeration, which the runtime keeps as an unknown field.
  bool is_no_member() const;
  // Whether no encoder of this protocol writes it so, there, or at all.
  bool is_odd() const;
};

// Where and why reading ended.
struct Problem {
  size_t offset = 0;  // of the tag, number, length, text or group that cannot be read
  // The bytes that show it, from the field's tag on. A text's are never among them.
  size_t begin = 0;
  size_t end = 0;
  int depth = 0;
  std::string reason;
  size_t readable = 0;  // so many bytes from the first on are read whole if nothing follows them
};

// The fields of one message, of a group or of a packed list, as far as they were read.
class Level {
 public:
  // Without a type, nobody knows the fields.
  Level(const google::protobuf::Descriptor* type, size_t end, int depth);
  // What the container has in it, which was read last.
  Level(const Piece& container, const Level& around);

 private:
  friend class Reader;

  void note(Piece* piece);

  const google::protobuf::Descriptor* type_ = nullptr;  // of a message
  size_t end_ = 0;
  int depth_ = 0;
  // Of what the fields lie in.
  Piece::Kind kind_ = Piece::kMessage;
  uint32_t number_ = 0;                                       // of a group
  const google::protobuf::FieldDescriptor* field_ = nullptr;  // of a packed list
  std::optional<size_t> group_;  // where the outermost group around the fields begins
  // The known fields that were read.
  uint64_t seen_ = 0;                 // a bit each, by its index
  std::array<uint32_t, 64> offsets_;  // where it was last, if its bit is set
  uint32_t highest_ = 0;              // number of all that were read
};

class Reader {
 public:
  explicit Reader(std::string_view bytes, size_t at = 0) : bytes_(bytes), at_(at) {}

  // Reads the next field of the level; of a container what comes before its content, which is read
  // as a level of its own, or skipped, before the next call. False at the level's end, and where
  // the bytes are broken.
  bool next(Level* level, Piece* piece);
  // Goes to the end of the piece that was read last.
  void skip(Piece* piece, const Level& around);
  // To be called behind the last field of a group, whose end is known only then.
  void close(Piece* group) const;

  const std::optional<Problem>& problem() const { return problem_; }

 private:
  struct Varint {
    uint64_t value;
    unsigned oddities;  // the bits of Piece's for a tag
  };

  bool fail(const Level& level, const Piece& piece, size_t offset, const std::string& reason);
  std::string ender(size_t end) const;
  std::optional<Varint> varint(const Level& level, const Piece& piece, const char* what,
                               uint64_t most);
  bool field(Level* level, uint64_t tag, Piece* piece);
  bool number(const Level& level, const char* what, Piece* piece);
  bool fixed(const Level& level, Piece::Kind kind, size_t size, Piece* piece);
  bool length_delimited(const Level& level, Piece* piece);
  bool group(const Level& level, Piece* piece);
  bool may_nest(const Level& level, const Piece& piece);
  bool end_of_group(const Level& level, const Piece& piece);

  std::string_view bytes_;
  size_t at_;
  size_t last_ = 0;  // where the last field begins, or the end of a group
  std::optional<Problem> problem_;
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

// The same of what an embedded message or a packed list of a message has in it. False if it is
// broken.
bool walk_content(std::string_view bytes, const Piece& container, Visitor* visitor);

// The same without a visitor.
std::optional<Problem> problem_of(std::string_view bytes, const google::protobuf::Descriptor& type);

}  // namespace qel_wire

#endif
