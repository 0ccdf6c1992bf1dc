// Any bytes into qel-wire, as a message of the schema that the first byte chooses: what it reads
// from them is what the message's class reads, and what it prints is fit for a terminal.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>
#include <google/protobuf/unknown_field_set.h>

#include <memory>
#include <sstream>
#include <vector>

#include "decode.h"
#include "explain.h"
#include "forms.h"
#include "guess.h"
#include "target.h"
#include "text.h"
#include "walk.h"

namespace fuzz {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::EnumValueDescriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::Reflection;
using google::protobuf::UnknownFieldSet;
using qel_wire::Notation;
using qel_wire::Piece;

// Makes a message of the pieces that are found.
class Assembly : public qel_wire::Visitor {
 public:
  explicit Assembly(Message* message) { enter(message); }

  void begin(const Piece& piece) override {
    if (!piece.is_known) {
      add_unknown(piece);
      return;
    }
    switch (piece.kind) {
      case Piece::kVarint:
        add_number(piece);
        return;
      case Piece::kBytes:
        add_text(piece);
        return;
      case Piece::kMessage:
        enter(sub_message(*piece.field));
        return;
      default:  // packed: its elements come next
        levels_.push_back(levels_.back());
        levels_.back().is_packed = true;
    }
  }

  void end(const Piece& /*piece*/) override { levels_.pop_back(); }

 private:
  struct Level {
    Message* message;  // null in a group
    UnknownFieldSet* unknown;
    bool is_packed = false;
  };

  void enter(Message* message) {
    levels_.push_back({message, message->GetReflection()->MutableUnknownFields(message)});
  }

  Message* sub_message(const FieldDescriptor& field) {
    Message* message = levels_.back().message;
    const Reflection& fields = *message->GetReflection();
    return field.is_repeated() ? fields.AddMessage(message, &field)
                               : fields.MutableMessage(message, &field);
  }

  void add_unknown(const Piece& piece) {
    UnknownFieldSet* unknown = levels_.back().unknown;
    const auto number = static_cast<int>(piece.number);
    switch (piece.kind) {
      case Piece::kVarint:
        unknown->AddVarint(number, piece.value);
        return;
      case Piece::kFixed64:
        unknown->AddFixed64(number, piece.value);
        return;
      case Piece::kFixed32:
        unknown->AddFixed32(number, static_cast<uint32_t>(piece.value));
        return;
      case Piece::kGroup:
        levels_.push_back({nullptr, unknown->AddGroup(number)});
        return;
      default:
        unknown->AddLengthDelimited(number)->assign(piece.bytes);
    }
  }

  void add_text(const Piece& piece) {
    Message* message = levels_.back().message;
    const Reflection& fields = *message->GetReflection();
    const std::string text(piece.bytes);
    if (piece.field->is_repeated()) {
      fields.AddString(message, piece.field, text);
    } else {
      fields.SetString(message, piece.field, text);
    }
  }

  void add_number(const Piece& piece) {
    Message* message = levels_.back().message;
    const FieldDescriptor* field = piece.field;
    const Reflection& fields = *message->GetReflection();
    const auto wide = static_cast<int64_t>(piece.value);
    const int32_t narrow = piece.low_32_bits();
    const bool repeated = field->is_repeated();
    switch (field->cpp_type()) {
      case FieldDescriptor::CPPTYPE_INT64:
        repeated ? fields.AddInt64(message, field, wide) : fields.SetInt64(message, field, wide);
        return;
      case FieldDescriptor::CPPTYPE_INT32:
        repeated ? fields.AddInt32(message, field, narrow)
                 : fields.SetInt32(message, field, narrow);
        return;
      case FieldDescriptor::CPPTYPE_BOOL:
        repeated ? fields.AddBool(message, field, wide != 0)
                 : fields.SetBool(message, field, wide != 0);
        return;
      case FieldDescriptor::CPPTYPE_ENUM: {
        const EnumValueDescriptor* member = field->enum_type()->FindValueByNumber(narrow);
        if (member != nullptr) {
          repeated ? fields.AddEnum(message, field, member)
                   : fields.SetEnum(message, field, member);
        } else if (!levels_.back().is_packed) {  // from packed lists the runtime drops them
          levels_.back().unknown->AddVarint(field->number(),
                                            static_cast<uint64_t>(int64_t{narrow}));
        }
        return;
      }
      default:
        fail("a number for " + field->full_name());
    }
  }

  std::vector<Level> levels_;
};

// Nothing that a terminal obeys or cannot show, but the ends of lines.
void expect_fit_for_terminals(const std::string& text) {
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    if (qel_wire::readable(line) != line) {
      fail("not fit for a terminal: " + qel_wire::readable(line));
    }
  }
}

// Bytes that are written so are read again, and anything else is refused or read.
void check_notation(const std::string& input, Notation notation) {
  if (qel_wire::from_notation(qel_wire::to_notation(input, notation), notation) != input) {
    fail("hex or base64 is read as other bytes than those that were written");
  }
  qel_wire::from_notation(input, notation);
}

}  // namespace

void check_qel_wire(const std::string& input) {
  if (input.empty()) {
    return;
  }
  check_notation(input, Notation::kHex);
  check_notation(input, Notation::kBase64);
  const auto read = new_message(static_cast<unsigned char>(input[0]));
  const Descriptor& type = *read->GetDescriptor();
  const std::string bytes = input.substr(1);
  const std::unique_ptr<Message> from_text(read->New());
  if (const auto complaint = qel_wire::parse_text(bytes, from_text.get())) {
    expect_fit_for_terminals(qel_wire::readable(*complaint));
  }

  std::ostringstream explanation;
  const bool is_read = qel_wire::explain(bytes, type, {}, &explanation);
  expect_fit_for_terminals(explanation.str());
  qel_wire::ExplainOptions whole;
  whole.show_token = true;
  whole.show_all = true;
  std::ostringstream whole_explanation;
  qel_wire::explain(bytes, type, whole, &whole_explanation);
  expect_fit_for_terminals(whole_explanation.str());
  if (is_read != read->ParseFromString(bytes)) {
    fail("the class takes it otherwise than:\n" + explanation.str());
  }

  bool is_first_whole = false;
  for (const qel_wire::Fit& fit : qel_wire::guess(bytes)) {
    is_first_whole = is_first_whole || (fit.rank == 1 && !fit.is_broken);
  }
  if (is_read && !is_first_whole) {
    fail("a message that does not take it is guessed first");
  }
  if (!is_read) {
    return;
  }

  const std::unique_ptr<Message> assembled(read->New());
  Assembly assembly(assembled.get());
  qel_wire::walk(bytes, type, &assembly);
  if (assembled->SerializeAsString() != read->SerializeAsString()) {
    fail("the pieces make:\n" + assembled->DebugString() + "instead of:\n" + read->DebugString());
  }

  for (const bool as_json : {false, true}) {
    qel_wire::DecodeOptions options;
    options.as_json = as_json;
    expect_fit_for_terminals(qel_wire::decode(bytes, type, options).text);
  }
  read->DiscardUnknownFields();
  const std::string text = qel_wire::text_form(*read);
  const std::unique_ptr<Message> again(read->New());
  if (qel_wire::parse_text(text, again.get()).has_value() ||
      again->SerializeAsString() != read->SerializeAsString()) {
    fail("the text form is not taken back:\n" + text);
  }
}

}  // namespace fuzz
