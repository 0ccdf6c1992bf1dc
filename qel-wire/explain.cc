#include "explain.h"

#include <algorithm>
#include <cstdio>
#include <string>
#include <utility>

#include "token.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::EnumValueDescriptor;
using google::protobuf::FieldDescriptor;

constexpr size_t kBytesInRow = 8;
constexpr size_t kMostShown = 4 * kBytesInRow;  // of a field's bytes, and of a text's

std::string printed(const char* format, uint64_t number) {
  char text[32];
  std::snprintf(text, sizeof text, format, static_cast<unsigned long long>(number));
  return text;
}

std::string known_number(const Piece& piece) {
  switch (piece.field->type()) {
    case FieldDescriptor::TYPE_INT32:
      return std::to_string(piece.low_32_bits());
    case FieldDescriptor::TYPE_ENUM: {
      const int number = piece.low_32_bits();
      const EnumValueDescriptor* member = piece.field->enum_type()->FindValueByNumber(number);
      return member != nullptr ? member->name() + " (" + std::to_string(number) + ")"
                               : std::to_string(number);
    }
    case FieldDescriptor::TYPE_BOOL:
      return piece.value != 0 ? "true" : "false";
    default:
      return std::to_string(static_cast<int64_t>(piece.value));
  }
}

// What is to be said against a piece that is doubtful.
std::string doubt_about(const Piece& piece) {
  switch (piece.field->type()) {
    case FieldDescriptor::TYPE_INT32:
      return "more than 32 bits: " + std::to_string(static_cast<int64_t>(piece.value));
    case FieldDescriptor::TYPE_ENUM:
      return "not in " + piece.field->enum_type()->name() + ", reads as absent";
    case FieldDescriptor::TYPE_BOOL:
      return "neither 0 nor 1";
    default:
      return "not UTF-8";
  }
}

const char* wire_type_name(Piece::Kind kind) {
  switch (kind) {
    case Piece::kVarint:
      return "varint";
    case Piece::kFixed64:
      return "8 bytes";
    case Piece::kFixed32:
      return "4 bytes";
    case Piece::kGroup:
      return "group";
    default:
      return "length-delimited";
  }
}

std::string type_name(const FieldDescriptor& field) {
  if (field.message_type() != nullptr) {
    return field.message_type()->name();
  }
  return field.enum_type() != nullptr ? field.enum_type()->name() : field.type_name();
}

class Explanation : public Visitor {
 public:
  Explanation(std::string_view bytes, const Hidden& hidden, const ExplainOptions& options,
              std::ostream* out)
      : bytes_(bytes), hidden_(hidden), options_(options), colours_(options.colours), out_(*out) {}

  void begin(const Piece& piece) override {
    const bool is_text = piece.kind == Piece::kBytes;
    const bool is_hidden_text = is_text && hidden_.hides_text(piece);
    const size_t end = piece.is_container() || is_hidden_text ? piece.value_offset : piece.end;
    if (!is_text && hidden_.hides_field(piece)) {
      leave_out(piece.offset, end, piece.depth);
      return;
    }
    row(piece.offset, end, piece.depth,
        name_of(piece) + type_of(piece) +
            (is_hidden_text ? not_shown(piece.bytes.size()) : value_of(piece)) + doubts_of(piece));
  }

  void end(const Piece& piece) override {
    if (piece.kind != Piece::kGroup) {  // others have no bytes at their end
      return;
    }
    if (hidden_.hides_end(piece)) {
      leave_out(piece.end_tag, piece.end, piece.depth);
    } else {
      row(piece.end_tag, piece.end, piece.depth, std::to_string(piece.number) + " end of group");
    }
  }

  // What is left to be written, behind all pieces.
  void finish(const std::optional<Problem>& problem) {
    write_left_out();
    if (problem.has_value()) {
      row(problem->begin, problem->end, problem->depth,
          colours_.wrong + "broken at offset " + std::to_string(problem->offset) + ": " +
              problem->reason + colours_.end);
    }
  }

 private:
  std::string doubt(const std::string& text) const {
    return text.empty() ? "" : "  " + colours_.doubt + "! " + text + colours_.end;
  }

  std::string name_of(const Piece& piece) const {
    const std::string name = piece.field != nullptr ? piece.field->name() : "?";
    return piece.is_element()
               ? ""
               : std::to_string(piece.number) + " " + colours_.name + name + colours_.end + " ";
  }

  static std::string type_of(const Piece& piece) {
    const bool is_packed = piece.kind == Piece::kPacked;
    return (piece.is_known ? type_name(*piece.field) : wire_type_name(piece.kind)) +
           std::string(is_packed ? ", packed" : "");
  }

  static std::string not_shown(size_t size) {
    return " = " + std::string(kNotShown) + ", " + counted(size, "byte");
  }

  std::string coloured(const std::string& value) const {
    return " = " + colours_.value + value + colours_.end;
  }

  std::string value_of(const Piece& piece) const {
    switch (piece.kind) {
      case Piece::kVarint:
        return coloured(piece.is_known ? known_number(piece)
                                       : std::to_string(static_cast<int64_t>(piece.value)));
      case Piece::kFixed64:
        return coloured(printed("0x%016llx", piece.value));
      case Piece::kFixed32:
        return coloured(printed("0x%08llx", piece.value));
      case Piece::kBytes: {
        const size_t shown = options_.show_all ? piece.bytes.size() : kMostShown;
        const bool is_cut = piece.bytes.size() > shown;
        return coloured(in_quotes(piece.bytes.substr(0, whole_characters(piece.bytes, shown))) +
                        (is_cut ? "..." : "")) +
               ", " + counted(piece.bytes.size(), "byte");
      }
      case Piece::kGroup:
        return "";
      default:
        return ", " + counted(piece.end - piece.value_offset, "byte");
    }
  }

  // Not in the middle of a character.
  static size_t whole_characters(std::string_view text, size_t size) {
    if (size >= text.size()) {
      return text.size();
    }
    size_t end = size;
    while (end > 0 && size - end < 4 && (static_cast<unsigned char>(text[end]) & 0xc0U) == 0x80) {
      --end;
    }
    return end;
  }

  std::string doubts_of(const Piece& piece) const {
    const std::string value = doubt_about_value(piece);
    const std::string place = doubt_about_place(piece);
    return doubt(value + (value.empty() || place.empty() ? "" : "; ") + place);
  }

  static std::string doubt_about_value(const Piece& piece) {
    if (piece.field == nullptr) {
      return "unknown field";
    }
    if (!piece.is_known) {
      return "unknown field: " + piece.field->name() + " is " + type_name(*piece.field);
    }
    if (piece.is_short()) {
      return "its length is " + std::to_string(piece.length) + ", more than there is";
    }
    return piece.is_doubtful() ? doubt_about(piece) : "";
  }

  static std::string doubt_about_place(const Piece& piece) {
    if (piece.earlier.has_value()) {
      return (piece.kind == Piece::kMessage ? "again, merged with that at offset "
                                            : "again, replaces that at offset ") +
             std::to_string(*piece.earlier);
    }
    return piece.is_late ? "behind a field with a higher number" : "";
  }

  // Pieces that are not shown have one row for those that follow each other.
  void leave_out(size_t offset, size_t end, int depth) {
    if (left_out_.begin == left_out_.end) {
      left_out_ = {offset, offset, depth};
    }
    left_out_.end = end;
  }

  void write_left_out() {
    const LeftOut range = std::exchange(left_out_, {});
    if (range.begin != range.end) {
      write_row(range.begin, range.begin, range.depth, "?" + not_shown(range.end - range.begin));
    }
  }

  void row(size_t offset, size_t end, int depth, const std::string& meaning) {
    write_left_out();
    write_row(offset, end, depth, meaning);
  }

  void write_row(size_t offset, size_t end, int depth, const std::string& meaning) {
    const size_t size = end - offset;
    const size_t shown = options_.show_all ? size : std::min(size, kMostShown);
    size_t at = 0;
    do {
      const size_t in_row = std::min(shown - at, kBytesInRow);
      out_ << colours_.quiet << printed("%06llx", offset + at) << colours_.end << ' ';
      for (size_t i = 0; i < in_row; ++i) {
        const size_t byte = offset + at + i;
        out_ << (hidden_.at(byte) ? " **"
                                  : printed(" %02llx", static_cast<unsigned char>(bytes_[byte])));
      }
      if (at == 0) {
        out_ << std::string(3 * (kBytesInRow - in_row) + 2 + 2 * static_cast<size_t>(depth), ' ')
             << meaning;
      }
      out_ << '\n';
      at += in_row;
    } while (at < shown);
    if (shown < size) {
      out_ << std::string(8, ' ') << "... " << counted(size - shown, "more byte") << '\n';
    }
  }

  struct LeftOut {
    size_t begin = 0;
    size_t end = 0;
    int depth = 0;
  };

  std::string_view bytes_;
  const Hidden& hidden_;
  const ExplainOptions& options_;
  const Colours& colours_;
  std::ostream& out_;
  LeftOut left_out_;
};

}  // namespace

bool explain(std::string_view bytes, const google::protobuf::Descriptor& type,
             const ExplainOptions& options, std::ostream* out) {
  const Hidden hidden = options.show_token ? Hidden() : Hidden(bytes, type);
  Explanation explanation(bytes, hidden, options, out);
  const std::optional<Problem> problem = walk(bytes, type, &explanation);
  explanation.finish(problem);
  return !problem.has_value();
}

}  // namespace qel_wire
