#include "walk.h"

#include <google/protobuf/wire_format_lite.h>

#include <algorithm>

#include "schema.h"
#include "text.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::internal::WireFormatLite;

constexpr size_t kLongestVarint = 10;

std::string name_of(const Piece& piece) {
  return "field " + std::to_string(piece.number);
}

// What it is, is followed by the field's name if it ends in a blank.
std::string described(const Piece& piece, std::string_view what) {
  return std::string(what) + (what.back() == ' ' ? name_of(piece) : "");
}

WireFormatLite::WireType wire_type_of(const FieldDescriptor& field) {
  return WireFormatLite::WireTypeForFieldType(static_cast<WireFormatLite::FieldType>(field.type()));
}

bool walk_level(Reader* reader, Level* level, Visitor* visitor) {
  for (Piece piece; reader->next(level, &piece);) {
    visitor->begin(piece);
    if (!piece.is_container()) {
      continue;
    }
    Level content(piece, *level);
    if (!walk_level(reader, &content, visitor)) {
      return false;
    }
    reader->close(&piece);
    visitor->end(piece);
  }
  return !reader->problem().has_value();
}

}  // namespace

bool Piece::is_no_member() const {
  return is_known && kind == kVarint && field->type() == FieldDescriptor::TYPE_ENUM &&
         field->enum_type()->FindValueByNumber(low_32_bits()) == nullptr;
}

bool Piece::is_doubtful() const {
  if (!is_known || (kind != kVarint && kind != kBytes)) {
    return false;
  }
  switch (field->type()) {
    case FieldDescriptor::TYPE_STRING:
      return !is_utf8(bytes);
    case FieldDescriptor::TYPE_ENUM:
      return static_cast<int64_t>(value) != low_32_bits() || is_no_member();
    case FieldDescriptor::TYPE_INT32:
      return static_cast<int64_t>(value) != low_32_bits();
    case FieldDescriptor::TYPE_BOOL:
      return value > 1;
    default:
      return false;
  }
}

bool Piece::is_odd() const {
  return oddities != 0 || earlier.has_value() || is_late || kind == kPacked || number == 0 ||
         is_short();
}

Level::Level(const Descriptor* type, size_t end, int depth)
    : type_(type), end_(end), depth_(depth) {}

Level::Level(const Piece& container, const Level& around)
    : type_(container.kind == Piece::kMessage ? container.field->message_type() : nullptr),
      end_(container.kind == Piece::kGroup ? around.end_ : container.end),
      depth_(around.depth_ + 1),
      kind_(container.kind),
      number_(container.number),
      field_(container.field),
      group_(around.group_) {
  if (kind_ == Piece::kGroup && !group_.has_value()) {
    group_ = container.offset;
  }
}

void Level::note(Piece* piece) {
  // No message of the schema has more fields than there are bits.
  const auto index = static_cast<size_t>(piece->field->index());
  const uint64_t bit = uint64_t{1} << index;
  if ((seen_ & bit) != 0 && !piece->field->is_repeated()) {
    piece->earlier = offsets_[index];
  }
  piece->is_late = piece->number < highest_;
  seen_ |= bit;
  offsets_[index] = static_cast<uint32_t>(piece->offset);
}

bool Reader::fail(const Level& level, const Piece& piece, size_t offset,
                  const std::string& reason) {
  problem_ =
      Problem{offset, piece.offset, at_, piece.depth, reason, level.group_.value_or(piece.offset)};
  return false;
}

// Names what ends at that offset.
std::string Reader::ender(size_t end) const {
  return end == bytes_.size() ? "the input ends" : "the message around it ends";
}

// The runtime keeps the bits that the largest number has.
std::optional<Reader::Varint> Reader::varint(const Level& level, const Piece& piece,
                                             const char* what, uint64_t most) {
  const size_t begin = at_;
  uint64_t value = 0;
  for (size_t i = 0; i < kLongestVarint; ++i) {
    if (at_ == level.end_) {
      fail(level, piece, begin, ender(level.end_) + " within " + described(piece, what));
      return std::nullopt;
    }
    const auto byte = static_cast<unsigned char>(bytes_[at_++]);
    value |= static_cast<uint64_t>(byte & 0x7fU) << (7 * i);
    if (byte < 0x80) {
      const bool is_long = byte == 0 && i > 0;
      const bool is_cut = (i + 1 == kLongestVarint && byte > 1) || value > most;
      return Varint{value, (is_long ? unsigned{Piece::kLongTag} : 0U) |
                               (is_cut ? unsigned{Piece::kCutTag} : 0U)};
    }
  }
  fail(level, piece, begin, described(piece, what) + " has more than 10 bytes");
  return std::nullopt;
}

bool Reader::next(Level* level, Piece* piece) {
  if (at_ == level->end_ && level->kind_ != Piece::kGroup) {
    return false;
  }
  *piece = Piece();
  piece->offset = last_ = at_;
  piece->depth = level->depth_;
  if (level->kind_ == Piece::kPacked) {
    piece->number = level->number_;
    piece->field = level->field_;
    piece->is_known = true;
    return number(*level, "a number of ", piece);
  }
  if (at_ == level->end_) {
    piece->depth = level->depth_ - 1;
    return fail(*level, *piece, at_,
                ender(at_) + " within the group of field " + std::to_string(level->number_));
  }
  const std::optional<Varint> tag = varint(*level, *piece, "a tag", UINT32_MAX);
  if (!tag.has_value()) {
    return false;
  }
  piece->oddities = tag->oddities;
  return field(level, tag->value, piece);
}

// The rest of a field, behind its tag.
bool Reader::field(Level* level, uint64_t tag, Piece* piece) {
  const auto kept_tag = static_cast<uint32_t>(tag);
  const auto wire_type = WireFormatLite::GetTagWireType(kept_tag);
  piece->number = static_cast<uint32_t>(WireFormatLite::GetTagFieldNumber(kept_tag));
  if (kept_tag == 0) {
    return fail(*level, *piece, piece->offset, "a tag of 0 is no field");
  }
  if (level->type_ != nullptr && piece->number < fields_by_number(*level->type_).size()) {
    piece->field = fields_by_number(*level->type_)[piece->number];
  }
  if (piece->field != nullptr) {
    // Repeated numbers are taken packed too.
    const bool is_packed =
        piece->field->is_packable() && wire_type == WireFormatLite::WIRETYPE_LENGTH_DELIMITED;
    piece->is_known = is_packed || wire_type == wire_type_of(*piece->field);
    if (piece->is_known) {
      level->note(piece);
    }
  }
  level->highest_ = std::max(level->highest_, piece->number);
  switch (wire_type) {
    case WireFormatLite::WIRETYPE_VARINT:
      return number(*level, "the number of ", piece);
    case WireFormatLite::WIRETYPE_FIXED64:
      return fixed(*level, Piece::kFixed64, 8, piece);
    case WireFormatLite::WIRETYPE_FIXED32:
      return fixed(*level, Piece::kFixed32, 4, piece);
    case WireFormatLite::WIRETYPE_LENGTH_DELIMITED:
      return length_delimited(*level, piece);
    case WireFormatLite::WIRETYPE_START_GROUP:
      return group(*level, piece);
    case WireFormatLite::WIRETYPE_END_GROUP:
      return end_of_group(*level, *piece);
    default:
      return fail(*level, *piece, piece->offset,
                  name_of(*piece) + " has the wire type " + std::to_string(wire_type) +
                      ", which there is not");
  }
}

bool Reader::number(const Level& level, const char* what, Piece* piece) {
  piece->kind = Piece::kVarint;
  piece->value_offset = at_;
  const std::optional<Varint> value = varint(level, *piece, what, UINT64_MAX);
  if (!value.has_value()) {
    return false;
  }
  piece->oddities |= value->oddities << 4U;  // from a tag's bits to a number's
  piece->value = value->value;
  piece->end = at_;
  return true;
}

bool Reader::fixed(const Level& level, Piece::Kind kind, size_t size, Piece* piece) {
  piece->kind = kind;
  piece->value_offset = at_;
  if (level.end_ - at_ < size) {
    at_ = level.end_;
    return fail(level, *piece, piece->value_offset,
                ender(level.end_) + " within the number of " + name_of(*piece));
  }
  for (size_t i = 0; i < size; ++i) {
    piece->value |= static_cast<uint64_t>(static_cast<unsigned char>(bytes_[at_ + i])) << (8 * i);
  }
  at_ += size;
  piece->end = at_;
  return true;
}

bool Reader::length_delimited(const Level& level, Piece* piece) {
  const std::optional<Varint> length = varint(level, *piece, "the length of ", UINT32_MAX);
  if (!length.has_value()) {
    return false;
  }
  piece->oddities |= length->oddities << 2U;  // from a tag's bits to a length's
  piece->length = static_cast<uint32_t>(length->value);
  piece->value_offset = at_;
  const size_t left = level.end_ - at_;
  const FieldDescriptor* field = piece->is_known ? piece->field : nullptr;
  if (field != nullptr && wire_type_of(*field) != WireFormatLite::WIRETYPE_LENGTH_DELIMITED) {
    piece->kind = Piece::kPacked;
  } else if (field != nullptr && field->message_type() != nullptr) {
    piece->kind = Piece::kMessage;
    if (!may_nest(level, *piece)) {
      return false;
    }
  } else {
    piece->kind = Piece::kBytes;
    if (piece->length > left) {
      return fail(level, *piece, at_,
                  ender(level.end_) + " within " + name_of(*piece) + ": its length is " +
                      too_long(piece->length, left));
    }
    piece->bytes = bytes_.substr(at_, piece->length);
    at_ += piece->length;
    piece->end = at_;
    return true;
  }
  // What contains others never reaches behind the end of what it lies in.
  piece->end = at_ + std::min<size_t>(left, piece->length);
  return true;
}

// Nothing in the schema is one: nobody knows its fields.
bool Reader::group(const Level& level, Piece* piece) {
  piece->kind = Piece::kGroup;
  piece->value_offset = at_;
  return may_nest(level, *piece);
}

bool Reader::may_nest(const Level& level, const Piece& piece) {
  return piece.depth < kDeepest || fail(level, piece, piece.offset, too_deep());
}

// False in any case: the level is over, or broken.
bool Reader::end_of_group(const Level& level, const Piece& piece) {
  if (level.kind_ != Piece::kGroup) {
    return fail(level, piece, piece.offset,
                "the end of a group, " + name_of(piece) + ", that did not begin");
  }
  return level.number_ == piece.number
             ? false
             : fail(level, piece, piece.offset,
                    "the group of field " + std::to_string(level.number_) + " ends as another one");
}

void Reader::skip(Piece* piece, const Level& around) {
  if (piece->kind != Piece::kGroup || piece->end != 0) {
    at_ = piece->end;
    return;
  }
  Level content(*piece, around);
  for (Piece inner; next(&content, &inner);) {
    skip(&inner, content);
  }
  close(piece);
}

void Reader::close(Piece* group) const {
  if (group->kind == Piece::kGroup) {
    group->end_tag = last_;
    group->end = at_;
  }
}

std::optional<Problem> walk(std::string_view bytes, const Descriptor& type, Visitor* visitor) {
  if (bytes.size() > kMostBytes) {
    return Problem{kMostBytes, kMostBytes, kMostBytes, 0, "more than 64 MiB, which no call takes",
                   0};
  }
  Reader reader(bytes);
  Level level(&type, bytes.size(), 0);
  walk_level(&reader, &level, visitor);
  return reader.problem();
}

bool walk_content(std::string_view bytes, const Piece& container, Visitor* visitor) {
  Reader reader(bytes, container.value_offset);
  Level content(container, Level(container.field->containing_type(), bytes.size(), 0));
  return walk_level(&reader, &content, visitor);
}

std::optional<Problem> problem_of(std::string_view bytes, const Descriptor& type) {
  Visitor nobody;
  return walk(bytes, type, &nobody);
}

}  // namespace qel_wire
