#include "print.h"

#include <cstdio>
#include <nlohmann/json.hpp>
#include <sstream>
#include <utility>
#include <vector>

#include "merged.h"
#include "schema.h"

namespace qel_wire {
namespace {

using google::protobuf::EnumValueDescriptor;
using google::protobuf::FieldDescriptor;

std::string in_hex(uint64_t number, int digits) {
  char text[24];
  std::snprintf(text, sizeof text, "0x%0*llx", digits, static_cast<unsigned long long>(number));
  return text;
}

std::string known_number(const Piece& piece) {
  switch (piece.field->type()) {
    case FieldDescriptor::TYPE_INT32:
      return std::to_string(piece.low_32_bits());
    case FieldDescriptor::TYPE_ENUM: {
      const EnumValueDescriptor* member =
          piece.field->enum_type()->FindValueByNumber(piece.low_32_bits());
      return member != nullptr ? member->name() : std::to_string(piece.low_32_bits());
    }
    case FieldDescriptor::TYPE_BOOL:
      return piece.value != 0 ? "true" : "false";
    default:
      return std::to_string(static_cast<int64_t>(piece.value));
  }
}

std::string number_in_text(const Piece& piece) {
  switch (piece.kind) {
    case Piece::kFixed32:
      return in_hex(piece.value, 8);
    case Piece::kFixed64:
      return in_hex(piece.value, 16);
    default:
      return piece.is_known ? known_number(piece) : std::to_string(piece.value);
  }
}

class TextPrinter : public Visitor {
 public:
  TextPrinter(BytesForm form, const Colours& colours, std::ostream* out)
      : form_(form), colours_(colours), out_(*out) {}

  void begin(const Piece& piece) override {
    out_ << std::string(2 * static_cast<size_t>(piece.depth), ' ') << colours_.name;
    if (piece.is_known) {
      out_ << piece.field->name();
    } else {
      out_ << piece.number;
    }
    out_ << colours_.end;
    if (piece.is_container()) {
      out_ << " {\n";
      return;
    }
    out_ << ": " << colours_.value;
    write_in_text(piece, form_, &out_);
    out_ << colours_.end;
    const std::string time = time_of(piece);
    if (!time.empty()) {
      out_ << "  " << colours_.quiet << "# " << time << colours_.end;
    }
    out_ << '\n';
  }

  void end(const Piece& piece) override {
    out_ << std::string(2 * static_cast<size_t>(piece.depth), ' ') << "}\n";
  }

 private:
  BytesForm form_;
  const Colours& colours_;
  std::ostream& out_;
};

class JsonPrinter : public Visitor {
 public:
  JsonPrinter(BytesForm form, const Colours& colours, std::ostream* out)
      : form_(form), colours_(colours), out_(*out), objects_(1) {
    out_ << '{';
  }

  void begin(const Piece& piece) override {
    if (!piece.is_known) {
      lost_.unknown += unknown_groups_ == 0 ? 1 : 0;
      unknown_groups_ += piece.kind == Piece::kGroup ? 1 : 0;
    } else {
      begin_value(*piece.field);
      if (piece.kind == Piece::kMessage) {
        objects_.push_back(nullptr);
        out_ << '{';
      } else {
        const bool is_text =
            piece.kind == Piece::kBytes && piece.field->type() == FieldDescriptor::TYPE_STRING;
        lost_.replaced += is_text && !is_utf8(piece.bytes) ? 1 : 0;
        out_ << (piece.kind == Piece::kBytes ? quoted(text_in_json(piece, form_))
                                             : number_in_json(piece));
      }
    }
  }

  void end(const Piece& piece) override {
    if (piece.is_known) {
      end_object();
    } else {
      --unknown_groups_;
    }
  }

  NotInJson finish() {
    end_object();
    out_ << '\n';
    return lost_;
  }

 private:
  // Characters outside ASCII are escaped, as most printers of JSON do; what is no UTF-8 is
  // replaced.
  static std::string quoted(std::string text) {
    return nlohmann::json(std::move(text))
        .dump(-1, ' ', true, nlohmann::json::error_handler_t::replace);
  }

  void begin_value(const FieldDescriptor& field) {
    const FieldDescriptor*& last = objects_.back();
    if (last == &field) {  // the next of a list
      out_ << ',';
      new_line();
      return;
    }
    end_list();
    if (last != nullptr) {
      out_ << ',';
    }
    new_line();
    out_ << colours_.name << '"' << field.name() << '"' << colours_.end << ": ";
    last = &field;
    if (field.is_repeated()) {
      out_ << '[';
      ++lists_;
      new_line();
    }
  }

  void end_list() {
    const FieldDescriptor* last = objects_.back();
    if (last != nullptr && last->is_repeated()) {
      --lists_;
      new_line();
      out_ << ']';
    }
  }

  void end_object() {
    end_list();
    const bool is_empty = objects_.back() == nullptr;
    objects_.pop_back();
    if (!is_empty) {
      new_line();
    }
    out_ << '}';
  }

  void new_line() { out_ << '\n' << std::string(2 * (objects_.size() + lists_), ' '); }

  BytesForm form_;
  const Colours& colours_;
  std::ostream& out_;
  // The objects around the next value: of each the field whose value was the last.
  std::vector<const FieldDescriptor*> objects_;
  size_t lists_ = 0;  // the same
  NotInJson lost_;
  size_t unknown_groups_ = 0;  // around the next value
};

}  // namespace

Notation notation_in_json(BytesForm form) {
  return form == BytesForm::kHex ? Notation::kHex : Notation::kBase64;
}

void write_in_text(const Piece& piece, BytesForm form, std::ostream* out) {
  if (piece.kind != Piece::kBytes) {
    *out << number_in_text(piece);
    return;
  }
  // Not taken apart: a text that is no message looks like one often enough.
  const bool in_hex_form =
      form == BytesForm::kHex && !piece.is_hidden && (piece.is_of_bytes() || !is_utf8(piece.bytes));
  in_hex_form ? write_hex_escapes(piece.bytes, out) : write_in_quotes(piece.bytes, out);
}

std::string value_in_text(const Piece& piece, BytesForm form) {
  if (piece.kind != Piece::kBytes) {  // far faster
    return number_in_text(piece);
  }
  std::ostringstream text;
  write_in_text(piece, form, &text);
  return text.str();
}

std::string number_in_json(const Piece& piece) {
  const auto type = piece.field->type();
  const bool is_text = type == FieldDescriptor::TYPE_INT64 || type == FieldDescriptor::TYPE_ENUM;
  return is_text ? '"' + known_number(piece) + '"' : known_number(piece);
}

std::string text_in_json(const Piece& piece, BytesForm form) {
  return piece.is_of_bytes() && !piece.is_hidden ? to_notation(piece.bytes, notation_in_json(form))
                                                 : std::string(piece.bytes);
}

std::string time_of(const Piece& piece) {
  const auto time = static_cast<int64_t>(piece.value);
  return piece.is_known && is_time(*piece.field) && is_plausible_time(time) ? utc(time) : "";
}

void print_text(std::string_view bytes, const google::protobuf::Descriptor& type,
                const Hidden& hidden, BytesForm form, const Colours& colours, std::ostream* out) {
  TextPrinter printer(form, colours, out);
  walk_merged(bytes, type, hidden, &printer);
}

NotInJson print_json(std::string_view bytes, const google::protobuf::Descriptor& type,
                     const Hidden& hidden, BytesForm form, const Colours& colours,
                     std::ostream* out) {
  JsonPrinter printer(form, colours, out);
  walk_merged(bytes, type, hidden, &printer);
  return printer.finish();
}

}  // namespace qel_wire
