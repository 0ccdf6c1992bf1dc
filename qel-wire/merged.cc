#include "merged.h"

#include <array>
#include <functional>
#include <optional>

#include "schema.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;

struct Range {
  uint32_t begin;
  uint32_t end;
};

// Where the fields of a message lie: in one place, or, of one that comes again, in each piece of
// the message around it that is of that field.
struct Fields {
  const Descriptor* type;
  int depth;
  Range range;
  const Fields* around;
  const FieldDescriptor* field;
};

Range content_of(const Piece& message) {
  return {static_cast<uint32_t>(message.value_offset), static_cast<uint32_t>(message.end)};
}

// Which fields there are.
struct Present {
  uint64_t known = 0;          // a bit each, by its index
  uint64_t again = 0;          // those that are there more than once
  std::array<Range, 64> last;  // of each the last piece
  bool unknown = false;
};

class Merging {
 public:
  Merging(std::string_view bytes, const Hidden& hidden, Visitor* visitor)
      : bytes_(bytes), hidden_(hidden), visitor_(*visitor) {}

  void message(const Fields& fields) {
    const Present present = present_in(fields);
    for (const FieldDescriptor* field : fields_by_number(*fields.type)) {
      if (field == nullptr) {
        continue;
      }
      const auto index = static_cast<size_t>(field->index());
      const uint64_t bit = uint64_t{1} << index;
      if ((present.known & bit) == 0) {
        continue;
      }
      if (field->is_repeated()) {
        all_of(fields, *field);
      } else if ((present.again & bit) != 0 && field->message_type() != nullptr) {
        together(fields, *field);
      } else {
        all_of({fields.type, fields.depth, present.last.at(index), nullptr, nullptr}, *field);
      }
    }
    if (present.unknown) {
      unknown(fields);
    }
  }

 private:
  using Take = std::function<void(Piece* piece, const Level& level, Reader* reader)>;

  // For each field of the message.
  void for_each(const Fields& fields, const Take& take) {
    if (fields.around != nullptr) {
      for_each(*fields.around, [&](Piece* piece, const Level& /*level*/, Reader* /*reader*/) {
        if (piece->field == fields.field && piece->is_known) {
          for_each_in(content_of(*piece), fields, take);
        }
      });
    } else {
      for_each_in(fields.range, fields, take);
    }
  }

  void for_each_in(const Range& range, const Fields& fields, const Take& take) {
    Reader reader(bytes_, range.begin);
    Level level(fields.type, range.end, fields.depth);
    for (Piece piece; reader.next(&level, &piece); reader.skip(&piece, level)) {
      take(&piece, level, &reader);
    }
  }

  Present present_in(const Fields& fields) {
    Present present;
    for_each(fields, [&](Piece* piece, const Level& level, Reader* reader) {
      if (!piece->is_known || piece->is_no_member()) {
        present.unknown = true;
        return;
      }
      if (piece->kind != Piece::kBytes && !piece->is_container() && hidden_.hides(*piece)) {
        return;
      }
      const auto index = static_cast<size_t>(piece->field->index());
      const uint64_t bit = uint64_t{1} << index;
      present.again |= present.known & bit;
      present.known |= bit;
      reader->skip(piece, level);
      present.last.at(index) = {static_cast<uint32_t>(piece->offset),
                                static_cast<uint32_t>(piece->end)};
    });
    return present;
  }

  // The values of one field.
  void all_of(const Fields& fields, const FieldDescriptor& field) {
    for_each(fields, [&](Piece* piece, const Level& level, Reader* reader) {
      if (piece->field != &field || !piece->is_known || piece->is_no_member()) {
        return;
      }
      if (piece->kind == Piece::kMessage) {
        visitor_.begin(*piece);
        message({field.message_type(), piece->depth + 1, content_of(*piece), nullptr, nullptr});
        visitor_.end(*piece);
      } else if (piece->kind == Piece::kPacked) {
        elements(*piece, level, reader);
      } else {
        value(piece);
      }
    });
  }

  // Numbers of a packed list that are not in their enumeration are lost.
  void elements(const Piece& list, const Level& level, Reader* reader) {
    Level content(list, level);
    for (Piece element; reader->next(&content, &element);) {
      if (!element.is_no_member()) {
        value(&element);
      }
    }
  }

  // An embedded message that comes again: its pieces are read as one message.
  void together(const Fields& fields, const FieldDescriptor& field) {
    std::optional<Piece> first;
    for_each(fields, [&](Piece* piece, const Level& /*level*/, Reader* /*reader*/) {
      if (piece->field == &field && piece->is_known && !first.has_value()) {
        first = *piece;
      }
    });
    visitor_.begin(*first);
    message({field.message_type(), fields.depth + 1, {}, &fields, &field});
    visitor_.end(*first);
  }

  void unknown(const Fields& fields) {
    for_each(fields, [&](Piece* piece, const Level& level, Reader* reader) {
      if (piece->is_no_member()) {
        piece->is_known = false;
        piece->value = static_cast<uint64_t>(int64_t{piece->low_32_bits()});
      }
      if (piece->is_known) {
        return;
      }
      if (piece->kind == Piece::kGroup) {
        group(piece, level, reader);
      } else {
        value(piece);
      }
    });
  }

  void group(Piece* piece, const Level& around, Reader* reader) {
    if (hidden_.hides(*piece)) {
      reader->skip(piece, around);
      return;
    }
    visitor_.begin(*piece);
    Level content(*piece, around);
    for (Piece inner; reader->next(&content, &inner);) {
      if (inner.kind == Piece::kGroup) {
        group(&inner, content, reader);
      } else {
        value(&inner);
      }
    }
    reader->close(piece);
    visitor_.end(*piece);
  }

  // A text, or a number.
  void value(Piece* piece) {
    if (hidden_.hides(*piece)) {
      if (piece->kind != Piece::kBytes) {
        return;
      }
      hide_text(piece);
    }
    visitor_.begin(*piece);
  }

  std::string_view bytes_;
  const Hidden& hidden_;
  Visitor& visitor_;
};

}  // namespace

void walk_merged(std::string_view bytes, const Descriptor& type, const Hidden& hidden,
                 Visitor* visitor) {
  const Range whole{0, static_cast<uint32_t>(bytes.size())};
  Merging(bytes, hidden, visitor).message({&type, 0, whole, nullptr, nullptr});
}

}  // namespace qel_wire
