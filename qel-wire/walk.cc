#include "walk.h"

#include <google/protobuf/wire_format_lite.h>

#include <algorithm>
#include <array>

#include "text.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::internal::WireFormatLite;

constexpr size_t kLongestVarint = 10;
constexpr int kDeepest = 100;

// The known fields that a message had so far.
class Seen {
 public:
  void add(Piece* piece) {
    // No message of the schema has more fields than there are bits.
    const auto index = static_cast<size_t>(piece->field->index());
    const uint64_t bit = uint64_t{1} << index;
    if ((fields_ & bit) != 0 && !piece->field->is_repeated()) {
      piece->earlier = offsets_.at(index);
    }
    piece->is_late = piece->field->number() < highest_;
    fields_ |= bit;
    offsets_.at(index) = piece->offset;
    highest_ = std::max(highest_, piece->field->number());
  }

 private:
  uint64_t fields_ = 0;             // a bit each, by its index
  std::array<size_t, 64> offsets_;  // where it was last, if its bit is set
  int highest_ = 0;                 // number
};

class Walk {
 public:
  Walk(std::string_view bytes, Visitor* visitor) : bytes_(bytes), visitor_(visitor) {}

  // Reads the fields of a message up to the end.
  bool fields(const Descriptor& type, size_t end, int depth) {
    Seen seen;
    while (at_ < end) {
      Piece piece;
      piece.offset = at_;
      piece.depth = depth;
      const std::optional<uint64_t> tag = varint(piece, end, "a tag");
      if (!tag.has_value()) {
        return false;
      }
      if (!field(piece, static_cast<uint32_t>(*tag), &type, &seen, end)) {
        return false;
      }
    }
    return true;
  }

  std::optional<Problem> problem() const { return problem_; }

 private:
  bool fail(const Piece& piece, size_t offset, const std::string& reason) {
    problem_ = Problem{offset, piece.offset, at_, piece.depth, reason};
    return false;
  }

  static std::string name_of(const Piece& piece) { return "field " + std::to_string(piece.number); }

  static std::string described(const Piece& piece, std::string_view what) {
    return std::string(what) + (what.back() == ' ' ? name_of(piece) : "");
  }

  // What ends there.
  std::string ender(size_t end) const {
    return end == bytes_.size() ? "the input ends" : "the message around it ends";
  }

  // What it is, is followed by the field's name if it ends in a blank.
  std::optional<uint64_t> varint(const Piece& piece, size_t end, std::string_view what) {
    const size_t begin = at_;
    uint64_t value = 0;
    for (size_t i = 0; i < kLongestVarint; ++i) {
      if (at_ == end) {
        fail(piece, begin, ender(end) + " within " + described(piece, what));
        return std::nullopt;
      }
      const auto byte = static_cast<unsigned char>(bytes_[at_++]);
      value |= static_cast<uint64_t>(byte & 0x7fU) << (7 * i);
      if (byte < 0x80) {
        return value;
      }
    }
    fail(piece, begin, described(piece, what) + " has more than 10 bytes");
    return std::nullopt;
  }

  // The rest of a field, behind its tag. In a group, whose fields nobody knows, type and seen are
  // null.
  bool field(Piece piece, uint32_t tag, const Descriptor* type, Seen* seen, size_t end) {
    const auto number = static_cast<uint32_t>(WireFormatLite::GetTagFieldNumber(tag));
    const auto wire_type = WireFormatLite::GetTagWireType(tag);
    piece.number = number;
    piece.field = type == nullptr ? nullptr : type->FindFieldByNumber(static_cast<int>(number));
    if (tag == 0) {
      return fail(piece, piece.offset, "a tag of 0 is no field");
    }
    if (piece.field != nullptr) {
      // Repeated numbers are taken packed too.
      const bool is_packed =
          piece.field->is_packable() && wire_type == WireFormatLite::WIRETYPE_LENGTH_DELIMITED;
      piece.is_known = is_packed || wire_type == wire_type_of(*piece.field);
      if (piece.is_known) {
        seen->add(&piece);
      }
      if (is_packed) {
        return packed(piece, end);
      }
    }
    switch (wire_type) {
      case WireFormatLite::WIRETYPE_VARINT:
        return number_at(piece, end, "the number of ");
      case WireFormatLite::WIRETYPE_FIXED64:
        return fixed(piece, Piece::kFixed64, 8, end);
      case WireFormatLite::WIRETYPE_FIXED32:
        return fixed(piece, Piece::kFixed32, 4, end);
      case WireFormatLite::WIRETYPE_LENGTH_DELIMITED:
        if (piece.is_known && piece.field != nullptr && piece.field->message_type() != nullptr) {
          return message(piece, end);
        }
        return text(piece, end);
      case WireFormatLite::WIRETYPE_START_GROUP:
        return group(piece, end);
      case WireFormatLite::WIRETYPE_END_GROUP:
        return fail(piece, piece.offset,
                    "the end of a group, " + name_of(piece) + ", that did not begin");
      default:
        return fail(piece, piece.offset,
                    name_of(piece) + " has the wire type " + std::to_string(wire_type) +
                        ", which there is not");
    }
  }

  static WireFormatLite::WireType wire_type_of(const FieldDescriptor& field) {
    return WireFormatLite::WireTypeForFieldType(
        static_cast<WireFormatLite::FieldType>(field.type()));
  }

  bool number_at(Piece piece, size_t end, const char* what) {
    piece.kind = Piece::kVarint;
    piece.value_offset = at_;
    const std::optional<uint64_t> value = varint(piece, end, what);
    if (!value.has_value()) {
      return false;
    }
    piece.value = *value;
    piece.end = at_;
    visitor_->begin(piece);
    return true;
  }

  bool fixed(Piece piece, Piece::Kind kind, size_t size, size_t end) {
    piece.kind = kind;
    piece.value_offset = at_;
    if (end - at_ < size) {
      at_ = end;
      return fail(piece, piece.value_offset,
                  ender(end) + " within the number of " + name_of(piece));
    }
    for (size_t i = 0; i < size; ++i) {
      piece.value |= static_cast<uint64_t>(static_cast<unsigned char>(bytes_[at_ + i])) << (8 * i);
    }
    at_ += size;
    piece.end = at_;
    visitor_->begin(piece);
    return true;
  }

  bool text(Piece piece, size_t end) {
    piece.kind = Piece::kBytes;
    const std::optional<uint64_t> length = varint(piece, end, "the length of ");
    if (!length.has_value()) {
      return false;
    }
    const auto size = static_cast<uint32_t>(*length);
    piece.value_offset = at_;
    if (size > end - at_) {
      return fail(piece, at_,
                  ender(end) + " within " + name_of(piece) + ": its length is " +
                      counted(size, "byte") + ", of which " + std::to_string(end - at_) +
                      (end - at_ == 1 ? " is there" : " are there"));
    }
    piece.bytes = bytes_.substr(at_, size);
    at_ += size;
    piece.end = at_;
    visitor_->begin(piece);
    return true;
  }

  // The length of what contains others, and the end that results, which is never behind the end of
  // what it lies in.
  std::optional<size_t> content(Piece* piece, size_t end) {
    const std::optional<uint64_t> length = varint(*piece, end, "the length of ");
    if (!length.has_value()) {
      return std::nullopt;
    }
    piece->length = static_cast<uint32_t>(*length);
    piece->value_offset = at_;
    piece->end = at_ + std::min<size_t>(end - at_, piece->length);
    return piece->end;
  }

  bool is_too_deep(const Piece& piece) {
    return piece.depth >= kDeepest &&
           !fail(piece, piece.offset,
                 "more than " + std::to_string(kDeepest) + " levels of nesting");
  }

  bool message(Piece piece, size_t end) {
    piece.kind = Piece::kMessage;
    const std::optional<size_t> own_end = content(&piece, end);
    if (!own_end.has_value() || is_too_deep(piece)) {
      return false;
    }
    visitor_->begin(piece);
    if (!fields(*piece.field->message_type(), *own_end, piece.depth + 1)) {
      return false;
    }
    visitor_->end(piece);
    return true;
  }

  bool packed(Piece piece, size_t end) {
    piece.kind = Piece::kPacked;
    const std::optional<size_t> own_end = content(&piece, end);
    if (!own_end.has_value()) {
      return false;
    }
    visitor_->begin(piece);
    while (at_ < *own_end) {
      Piece element;
      element.depth = piece.depth + 1;
      element.number = piece.number;
      element.field = piece.field;
      element.is_known = true;
      element.offset = at_;
      if (!number_at(element, *own_end, "a number of ")) {
        return false;
      }
    }
    visitor_->end(piece);
    return true;
  }

  // Nothing in the schema is one: nobody knows its fields.
  bool group(Piece piece, size_t end) {
    piece.kind = Piece::kGroup;
    piece.value_offset = at_;
    if (is_too_deep(piece)) {
      return false;
    }
    visitor_->begin(piece);
    while (at_ < end) {
      Piece inner;
      inner.offset = at_;
      inner.depth = piece.depth + 1;
      const std::optional<uint64_t> tag = varint(inner, end, "a tag");
      if (!tag.has_value()) {
        return false;
      }
      const auto number = static_cast<uint32_t>(*tag);
      if (WireFormatLite::GetTagWireType(number) != WireFormatLite::WIRETYPE_END_GROUP) {
        if (!field(inner, number, nullptr, nullptr, end)) {
          return false;
        }
      } else if (static_cast<uint32_t>(WireFormatLite::GetTagFieldNumber(number)) == piece.number) {
        piece.end_tag = inner.offset;
        piece.end = at_;
        visitor_->end(piece);
        return true;
      } else {
        return fail(inner, inner.offset, "the group of " + name_of(piece) + " ends as another one");
      }
    }
    const std::string reason = ender(end) + " within the group of " + name_of(piece);
    piece.offset = at_;  // what it contains was read
    return fail(piece, at_, reason);
  }

  std::string_view bytes_;
  Visitor* visitor_;
  size_t at_ = 0;
  std::optional<Problem> problem_;
};

}  // namespace

bool Piece::is_doubtful() const {
  if (!is_known || (kind != kVarint && kind != kBytes)) {
    return false;
  }
  switch (field->type()) {
    case FieldDescriptor::TYPE_STRING:
      return !is_utf8(bytes);
    case FieldDescriptor::TYPE_ENUM:
      return field->enum_type()->FindValueByNumber(low_32_bits()) == nullptr;
    case FieldDescriptor::TYPE_INT32:
      return static_cast<int64_t>(value) != low_32_bits();
    case FieldDescriptor::TYPE_BOOL:
      return value > 1;
    default:
      return false;
  }
}

std::optional<Problem> walk(std::string_view bytes, const Descriptor& type, Visitor* visitor) {
  if (bytes.size() > kMostBytes) {
    return Problem{kMostBytes, kMostBytes, kMostBytes, 0, "more than 64 MiB, which no call takes"};
  }
  Walk walk(bytes, visitor);
  walk.fields(type, bytes.size(), 0);
  return walk.problem();
}

}  // namespace qel_wire
