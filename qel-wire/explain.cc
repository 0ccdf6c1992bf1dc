#include "explain.h"

#include <algorithm>
#include <cstdio>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "token.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::FieldDescriptor;
using Doubts = std::vector<std::string>;

constexpr size_t kBytesInRow = 8;
constexpr size_t kMostShown = 4 * kBytesInRow;  // of a field's bytes, and of a text's

std::string offset_of(size_t number) {
  char text[24];
  std::snprintf(text, sizeof text, "%06zx", number);
  return text;
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

std::string type_of(const Piece& piece) {
  return piece.is_known ? type_name(*piece.field) : wire_type_name(piece.kind);
}

// ---- What is to be said against a piece

void doubt_field(const Piece& piece, Doubts* doubts) {
  if (piece.number == 0) {
    doubts->push_back("field number 0, which no message can have");
  } else if (piece.field == nullptr) {
    doubts->push_back("unknown field");
  } else if (!piece.is_known) {
    doubts->push_back("unknown field: " + piece.field->name() + " is " + type_name(*piece.field));
  }
}

std::string doubt_about_value(const Piece& piece) {
  if (piece.is_no_member()) {
    return "not in " + piece.field->enum_type()->name() + ", reads as absent";
  }
  switch (piece.field->type()) {
    case FieldDescriptor::TYPE_BOOL:
      return "neither 0 nor 1";
    case FieldDescriptor::TYPE_STRING:
      return "not UTF-8";
    default:
      return "more than 32 bits: " + std::to_string(static_cast<int64_t>(piece.value));
  }
}

void doubt_encoding(const Piece& piece, Doubts* doubts) {
  constexpr std::pair<Piece::Oddity, const char*> kOddities[] = {
      {Piece::kLongTag, "the tag has more bytes than it needs"},
      {Piece::kCutTag, "the tag has more than 32 bits, the others are dropped"},
      {Piece::kLongLength, "the length has more bytes than it needs"},
      {Piece::kCutLength, "the length has more than 32 bits, the others are dropped"},
      {Piece::kLongNumber, "the number has more bytes than it needs"},
      {Piece::kCutNumber, "the number has more than 64 bits, the others are dropped"},
  };
  for (const auto& [oddity, text] : kOddities) {
    if ((piece.oddities & oddity) != 0) {
      doubts->push_back(text);
    }
  }
}

void doubt_place(const Piece& piece, Doubts* doubts) {
  if (piece.kind == Piece::kPacked) {
    doubts->push_back("no encoder of this protocol packs");
  }
  if (piece.is_short()) {
    doubts->push_back("its length is " + std::to_string(piece.length) + ", more than there is");
  }
  if (piece.earlier.has_value()) {
    doubts->push_back((piece.kind == Piece::kMessage ? "again, merged with that at offset "
                                                     : "again, replaces that at offset ") +
                      std::to_string(*piece.earlier));
  } else if (piece.is_late) {
    doubts->push_back("behind a field with a higher number");
  }
}

// A hidden text's characters are not told.
Doubts doubts_of(const Piece& piece) {
  Doubts doubts;
  doubt_field(piece, &doubts);
  if (piece.is_doubtful()) {
    doubts.push_back(doubt_about_value(piece));
  }
  if (piece.is_known && piece.field->type() == FieldDescriptor::TYPE_STRING && !piece.is_hidden &&
      is_utf8(piece.bytes)) {
    const std::string invisible = invisible_characters(piece.bytes);
    if (!invisible.empty()) {
      doubts.push_back("invisible: " + invisible);
    }
  }
  doubt_encoding(piece, &doubts);
  doubt_place(piece, &doubts);
  return doubts;
}

// ---- Rows

struct Row {
  size_t offset = 0;
  size_t end = 0;        // of the bytes that belong to no other row
  size_t shown_end = 0;  // of those that are shown
  int depth = 0;
  const Piece* piece = nullptr;  // null for the others
  std::string meaning;           // of the others
  bool is_problem = false;
  Doubts doubts;
};

class Rows {
 public:
  virtual ~Rows() = default;
  virtual void begin(const Piece& /*container*/, bool /*is_hidden*/) {}
  virtual void end() {}
  virtual void write(const Row& row) = 0;
};

// For people.
class Table : public Rows {
 public:
  Table(std::string_view bytes, const Hidden& hidden, const ExplainOptions& options,
        std::ostream* out)
      : bytes_(bytes), hidden_(hidden), options_(options), colours_(options.colours), out_(*out) {}

  void write(const Row& row) override {
    const size_t size = row.shown_end - row.offset;
    const size_t shown = options_.show_all ? size : std::min(size, kMostShown);
    size_t at = 0;
    do {
      const size_t in_row = std::min(shown - at, kBytesInRow);
      out_ << colours_.quiet << offset_of(row.offset + at) << colours_.end << ' '
           << bytes_in_row(row.offset + at, in_row);
      if (at == 0) {
        const size_t indent = 2 * static_cast<size_t>(row.depth);
        out_ << std::string(3 * (kBytesInRow - in_row) + 2 + indent, ' ');
        write_meaning(row);
      }
      out_ << '\n';
      at += in_row;
    } while (at < shown);
    if (shown < size) {
      out_ << std::string(8, ' ') << "... " << counted(size - shown, "more byte") << '\n';
    }
  }

 private:
  std::string bytes_in_row(size_t offset, size_t size) const {
    std::string text;
    for (size_t at = offset; at < offset + size; ++at) {
      text += ' ';
      if (hidden_.at(at)) {
        text += "**";
      } else {
        append_hex(bytes_[at], &text);
      }
    }
    return text;
  }

  void write_meaning(const Row& row) {
    if (row.is_problem) {
      out_ << colours_.wrong << row.meaning << colours_.end;
      return;
    }
    out_ << row.meaning;
    if (row.piece != nullptr) {
      write_name(*row.piece);
      out_ << type_of(*row.piece);
      write_value(*row.piece);
    }
    for (size_t i = 0; i < row.doubts.size(); ++i) {
      out_ << (i == 0 ? "  " + colours_.doubt + "! " : "; ") << row.doubts[i];
    }
    out_ << (row.doubts.empty() ? "" : colours_.end);
  }

  void write_name(const Piece& piece) {
    if (!piece.is_element()) {
      out_ << piece.number << ' ' << colours_.name
           << (piece.field != nullptr ? piece.field->name() : "?") << colours_.end << ' ';
    }
  }

  void write_value(const Piece& piece) {
    switch (piece.kind) {
      case Piece::kVarint:
      case Piece::kFixed64:
      case Piece::kFixed32:
        write_number(piece);
        return;
      case Piece::kBytes:
        write_text(piece);
        return;
      case Piece::kGroup:
        return;
      default:
        out_ << (piece.kind == Piece::kPacked ? ", packed" : "");
        write_size(piece);
    }
  }

  void write_number(const Piece& piece) {
    out_ << " = " << colours_.value << value_in_text(piece, options_.bytes_form);
    if (piece.is_known && piece.field->enum_type() != nullptr && !piece.is_no_member()) {
      out_ << " (" << piece.low_32_bits() << ')';
    }
    out_ << colours_.end;
    const std::string time = time_of(piece);
    if (!time.empty()) {
      out_ << "  " << colours_.quiet << '(' << time << ')' << colours_.end;
    }
  }

  void write_text(const Piece& piece) {
    if (piece.is_hidden) {
      out_ << " = " << piece.bytes;
    } else {
      const size_t shown = options_.show_all ? piece.bytes.size() : kMostShown;
      Piece beginning = piece;
      beginning.bytes = piece.bytes.substr(0, whole_characters(piece.bytes, shown));
      out_ << " = " << colours_.value;
      write_in_text(beginning, options_.bytes_form, &out_);
      out_ << (piece.bytes.size() > shown ? "..." : "") << colours_.end;
    }
    write_size(piece);
  }

  void write_size(const Piece& piece) {
    out_ << ", " << counted(piece.end - piece.value_offset, "byte");
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

  std::string_view bytes_;
  const Hidden& hidden_;
  const ExplainOptions& options_;
  const Colours& colours_;
  std::ostream& out_;
};

// For programs.
class JsonLines : public Rows {
 public:
  JsonLines(const std::string& type, const ExplainOptions& options, std::ostream* out)
      : type_(type), form_(options.bytes_form), message_(options.message), out_(*out) {}

  void begin(const Piece& container, bool is_hidden) override {
    path_.push_back(is_hidden ? "?" : step(container));
  }
  void end() override { path_.pop_back(); }

  void write(const Row& row) override {
    nlohmann::ordered_json line;
    if (message_ > 0) {
      line["message"] = message_;
    }
    line["of"] = type_;
    line["offset"] = row.offset;
    line["end"] = row.end;
    if (row.piece != nullptr) {
      line["path"] = path_to(*row.piece);
      line["type"] = type_of(*row.piece) + (row.piece->kind == Piece::kPacked ? ", packed" : "");
      if (!row.piece->is_container()) {
        line["value"] = value_of(*row.piece);
      }
      if (has_no_text(*row.piece)) {
        line["bytes"] = to_notation(row.piece->bytes, notation_in_json(form_));
      }
    } else if (row.is_problem) {
      line["type"] = "broken";
    } else {
      line["type"] = row.meaning;
    }
    line["doubts"] = row.is_problem ? Doubts{row.meaning} : row.doubts;
    out_ << line.dump(-1, ' ', true, nlohmann::json::error_handler_t::replace) << '\n';
  }

 private:
  static std::string step(const Piece& piece) {
    return piece.is_known ? piece.field->name() : std::to_string(piece.number);
  }

  // Whether JSON cannot have the text as it is. Of what is of type bytes, the value is no text.
  static bool has_no_text(const Piece& piece) {
    return piece.kind == Piece::kBytes && !piece.is_of_bytes() && !is_utf8(piece.bytes);
  }

  std::string path_to(const Piece& piece) const {
    std::string path;
    for (const std::string& part : path_) {
      path += part + ".";
    }
    // An element stands in its list.
    return piece.is_element() ? path.substr(0, path.size() - 1) : path + step(piece);
  }

  nlohmann::json value_of(const Piece& piece) const {
    if (piece.kind == Piece::kBytes) {
      return text_in_json(piece, form_);
    }
    return piece.is_known ? nlohmann::json::parse(number_in_json(piece))
                          : nlohmann::json(value_in_text(piece, form_));
  }

  const std::string& type_;
  BytesForm form_;
  size_t message_;
  std::ostream& out_;
  std::vector<std::string> path_;
};

class Explanation : public Visitor {
 public:
  Explanation(const Hidden& hidden, Rows* rows) : hidden_(hidden), rows_(*rows) {}

  void begin(const Piece& piece) override {
    const size_t end = piece.is_container() ? piece.value_offset : piece.end;
    const bool is_left_out = piece.kind != Piece::kBytes && hidden_.hides(piece);
    if (is_left_out) {
      leave_out(piece.offset, end, piece.depth);
    } else {
      Piece shown = piece;
      if (hidden_.hides(piece)) {
        hide_text(&shown);
      }
      write({piece.offset, end, shown.is_hidden ? piece.value_offset : end, piece.depth, &shown, "",
             false, doubts_of(shown)});
    }
    if (piece.is_container()) {
      containers_left_out_.push_back(is_left_out);
      rows_.begin(piece, is_left_out);
    }
  }

  void end(const Piece& piece) override {
    rows_.end();
    const bool is_left_out = containers_left_out_.back();
    containers_left_out_.pop_back();
    if (piece.kind != Piece::kGroup) {  // others have no bytes at their end
      return;
    }
    if (is_left_out || hidden_.hides_end(piece)) {
      leave_out(piece.end_tag, piece.end, piece.depth);
    } else {
      write({piece.end_tag,
             piece.end,
             piece.end,
             piece.depth,
             nullptr,
             std::to_string(piece.number) + " end of group",
             false,
             {}});
    }
  }

  // What is left to be written, behind all pieces.
  void finish(const std::optional<Problem>& problem, size_t size) {
    write_left_out();
    if (problem.has_value()) {
      rows_.write({problem->begin,
                   size,
                   problem->end,
                   problem->depth,
                   nullptr,
                   "broken at offset " + std::to_string(problem->offset) + ": " + problem->reason,
                   true,
                   {}});
    }
  }

 private:
  // Pieces that are not shown have one row for those that follow each other.
  void leave_out(size_t offset, size_t end, int depth) {
    if (left_out_.offset == left_out_.end) {
      left_out_ = {offset, offset, offset, depth, nullptr, "", false, {}};
    }
    left_out_.end = end;
  }

  void write_left_out() {
    Row row = std::exchange(left_out_, {});
    if (row.offset != row.end) {
      row.meaning = "? = " + std::string(kNotShown) + ", " + counted(row.end - row.offset, "byte");
      rows_.write(row);
    }
  }

  void write(const Row& row) {
    write_left_out();
    rows_.write(row);
  }

  const Hidden& hidden_;
  Rows& rows_;
  Row left_out_;
  std::vector<bool> containers_left_out_;  // around the next piece, whether their beginnings are
};

}  // namespace

bool explain(std::string_view bytes, const google::protobuf::Descriptor& type,
             const ExplainOptions& options, std::ostream* out) {
  const Hidden hidden(bytes, type, options.show_token);
  Table table(bytes, hidden, options, out);
  JsonLines lines(type.name(), options, out);
  Explanation explanation(hidden, options.as_json ? static_cast<Rows*>(&lines) : &table);
  const std::optional<Problem> problem = walk(bytes, type, &explanation);
  explanation.finish(problem, bytes.size());
  return !problem.has_value();
}

}  // namespace qel_wire
