#include "encode.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/io/tokenizer.h>
#include <google/protobuf/io/zero_copy_stream_impl_lite.h>
#include <google/protobuf/unknown_field_set.h>

#include <limits>
#include <nlohmann/json.hpp>
#include <optional>
#include <vector>

#include "failure.h"
#include "misread.h"
#include "notation.h"
#include "scan.h"
#include "schema.h"
#include "token.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::EnumValueDescriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::Reflection;
using google::protobuf::UnknownFieldSet;
using google::protobuf::io::Tokenizer;

// ---- A message's fields. Each of these says why the field does not take the value, or nothing.

using Reason = std::string;

std::string no_field(const Message& message, const std::string& name) {
  const auto& type = *message.GetDescriptor();
  return type.name() + " has no field '" + name + "'" + did_you_mean(name, field_names(type));
}

bool is_filled(const Message& message, const FieldDescriptor& field) {
  return !field.is_repeated() && message.GetReflection()->HasField(message, &field);
}

Message* add_message(Message* message, const FieldDescriptor& field) {
  const Reflection& fields = *message->GetReflection();
  return field.is_repeated() ? fields.AddMessage(message, &field)
                             : fields.MutableMessage(message, &field);
}

Reason wrong_kind(const FieldDescriptor& field) {
  const char* what = field.cpp_type() == FieldDescriptor::CPPTYPE_MESSAGE ? "a message"
                     : field.cpp_type() == FieldDescriptor::CPPTYPE_ENUM  ? "an enumeration"
                                                                          : field.cpp_type_name();
  return std::string("the field is ") + what;
}

void set_member(Message* message, const FieldDescriptor& field, int number) {
  const Reflection& fields = *message->GetReflection();
  const EnumValueDescriptor* member = field.enum_type()->FindValueByNumber(number);
  if (member == nullptr) {
    fields.MutableUnknownFields(message)->AddVarint(field.number(),
                                                    static_cast<uint64_t>(int64_t{number}));
  } else if (field.is_repeated()) {
    fields.AddEnum(message, &field, member);
  } else {
    fields.SetEnum(message, &field, member);
  }
}

Reason set_number(Message* message, const FieldDescriptor& field, int64_t number) {
  const Reflection& fields = *message->GetReflection();
  const bool is_repeated = field.is_repeated();
  const auto narrow = static_cast<int32_t>(number);
  switch (field.cpp_type()) {
    case FieldDescriptor::CPPTYPE_INT64:
      is_repeated ? fields.AddInt64(message, &field, number)
                  : fields.SetInt64(message, &field, number);
      return "";
    case FieldDescriptor::CPPTYPE_INT32:
    case FieldDescriptor::CPPTYPE_ENUM:
      if (narrow != number) {
        return "the number has more than 32 bits";
      }
      break;
    default:
      return wrong_kind(field);
  }
  if (field.cpp_type() == FieldDescriptor::CPPTYPE_ENUM) {
    set_member(message, field, narrow);
  } else {
    is_repeated ? fields.AddInt32(message, &field, narrow)
                : fields.SetInt32(message, &field, narrow);
  }
  return "";
}

Reason set_bool(Message* message, const FieldDescriptor& field, bool value) {
  if (field.cpp_type() != FieldDescriptor::CPPTYPE_BOOL) {
    return wrong_kind(field);
  }
  const Reflection& fields = *message->GetReflection();
  field.is_repeated() ? fields.AddBool(message, &field, value)
                      : fields.SetBool(message, &field, value);
  return "";
}

Reason hidden_in(const std::string& text) {
  return text != kNotShown ? ""
                           : "the field has " + std::string(kNotShown) +
                                 " for what was hidden: decode the bytes with --show-token";
}

Reason set_text(Message* message, const FieldDescriptor& field, const std::string& text) {
  if (field.cpp_type() != FieldDescriptor::CPPTYPE_STRING) {
    return wrong_kind(field);
  }
  const Reflection& fields = *message->GetReflection();
  field.is_repeated() ? fields.AddString(message, &field, text)
                      : fields.SetString(message, &field, text);
  return hidden_in(text);
}

Reason set_name(Message* message, const FieldDescriptor& field, const std::string& name) {
  if (field.cpp_type() != FieldDescriptor::CPPTYPE_ENUM) {
    return wrong_kind(field);
  }
  const auto& type = *field.enum_type();
  const EnumValueDescriptor* member = member_named(type, name);
  if (member == nullptr) {
    return type.name() + " has no '" + name + "'" + did_you_mean(name, member_names(type));
  }
  set_member(message, field, member->number());
  return "";
}

// ---- The text form

class TextParser : private google::protobuf::io::ErrorCollector {
 public:
  explicit TextParser(const std::string& text)
      : input_(text.data(), static_cast<int>(text.size())), tokens_(&input_, this) {
    tokens_.set_comment_style(Tokenizer::SH_COMMENT_STYLE);
    advance();
  }

  void parse(Message* message) { fields(message, ""); }

 private:
  void AddError(int line, int column, const std::string& reason) override {
    throw Misread{static_cast<size_t>(line) + 1, static_cast<size_t>(column) + 1, reason};
  }

  const Tokenizer::Token& token() { return tokens_.current(); }
  bool is_at(Tokenizer::TokenType type) { return token().type == type; }
  bool is_at(const char* symbol) { return token().text == symbol; }
  void advance() { tokens_.Next(); }

  bool take(const char* symbol) {
    const bool is_there = is_at(symbol);
    if (is_there) {
      advance();
    }
    return is_there;
  }

  // A token has a copy of its text, which may be long.
  struct Place {
    int line;
    int column;
  };
  Place place() { return {token().line, token().column}; }

  [[noreturn]] void fail(const std::string& reason) { fail(place(), reason); }

  [[noreturn]] static void fail(const Place& where, const std::string& reason) {
    throw Misread{static_cast<size_t>(where.line) + 1, static_cast<size_t>(where.column) + 1,
                  reason};
  }

  static void expect(const Place& where, const Reason& reason) {
    if (!reason.empty()) {
      fail(where, reason);
    }
  }

  // The fields up to the closing bracket, or to the end of the text if there is none.
  void fields(Message* message, const std::string& closing) {
    while (!is_end(closing)) {
      if (is_at(Tokenizer::TYPE_INTEGER)) {
        unknown(message->GetReflection()->MutableUnknownFields(message));
      } else {
        known(message);
      }
      take(",") || take(";");
    }
  }

  bool is_end(const std::string& closing) {
    if (is_at(Tokenizer::TYPE_END)) {
      if (!closing.empty()) {
        fail("the text ends before '" + closing + "'");
      }
      return true;
    }
    return !closing.empty() && take(closing.c_str());
  }

  // What opens a message, and then what closes it.
  std::string closing() {
    const bool is_angle = take("<");
    if (!is_angle && !take("{")) {
      fail("'{' is missing");
    }
    if (++depth_ > kDeepest) {
      fail(too_deep());
    }
    return is_angle ? ">" : "}";
  }

  void known(Message* message) {
    const Tokenizer::Token name = token();
    if (name.type != Tokenizer::TYPE_IDENTIFIER) {
      fail("the name or the number of a field is missing");
    }
    const FieldDescriptor* field = field_named(*message->GetDescriptor(), name.text);
    if (field == nullptr) {
      fail(no_field(*message, name.text));
    }
    if (is_filled(*message, *field)) {
      fail("the field is there twice");
    }
    advance();
    const bool has_colon = take(":");
    if (field->is_repeated() && take("[")) {
      list(message, *field);
    } else if (field->message_type() != nullptr || has_colon) {
      value(message, *field);
    } else {
      fail("':' is missing");
    }
  }

  void list(Message* message, const FieldDescriptor& field) {
    if (take("]")) {
      return;
    }
    do {
      value(message, field);
    } while (take(","));
    if (!take("]")) {
      fail("']' is missing");
    }
  }

  void value(Message* message, const FieldDescriptor& field) {
    if (field.message_type() != nullptr) {
      const std::string end = closing();
      fields(add_message(message, field), end);
      --depth_;
      return;
    }
    const Place where = place();
    if (is_at(Tokenizer::TYPE_STRING)) {
      expect(where, set_text(message, field, text()));
      return;
    }
    if (is_at(Tokenizer::TYPE_IDENTIFIER)) {
      const std::string word = token().text;
      advance();
      expect(where, field.cpp_type() == FieldDescriptor::CPPTYPE_BOOL
                        ? set_bool(message, field, truth(word, where))
                        : set_name(message, field, word));
      return;
    }
    const int64_t number = signed_number();
    if (field.cpp_type() != FieldDescriptor::CPPTYPE_BOOL) {
      expect(where, set_number(message, field, number));
    } else if (number == 0 || number == 1) {
      expect(where, set_bool(message, field, number == 1));
    } else {
      fail(where, "the field takes true or false");
    }
  }

  static bool truth(const std::string& word, const Place& where) {
    if (word != "true" && word != "false") {
      fail(where, "'true' or 'false' is missing");
    }
    return word == "true";
  }

  // Texts that follow each other are one.
  std::string text() {
    std::string result;
    while (is_at(Tokenizer::TYPE_STRING)) {
      Tokenizer::ParseStringAppend(token().text, &result);
      advance();
    }
    return result;
  }

  uint64_t number(uint64_t most) {
    google::protobuf::uint64 result = 0;
    if (!is_at(Tokenizer::TYPE_INTEGER) || !Tokenizer::ParseInteger(token().text, most, &result)) {
      fail(is_at(Tokenizer::TYPE_INTEGER) ? "the number is too large, or has a wrong digit"
                                          : "the value is missing, or is of another kind");
    }
    advance();
    return result;
  }

  int64_t signed_number() {
    constexpr uint64_t kMost = std::numeric_limits<int64_t>::max();
    if (take("-")) {
      return static_cast<int64_t>(0 - number(kMost + 1));
    }
    return static_cast<int64_t>(number(kMost));
  }

  // A field by its number: of 4 or 8 bytes if the value is hex of that many digits.
  void unknown(UnknownFieldSet* fields) {
    constexpr uint64_t kMostNumber = (uint64_t{1} << 29U) - 1;
    const Place name = place();
    const auto field = static_cast<int>(number(kMostNumber));
    if (!take(":")) {
      const std::string end = closing();
      UnknownFieldSet* group = fields->AddGroup(field);
      while (!is_end(end)) {
        unknown(group);
      }
      --depth_;
      return;
    }
    if (is_at(Tokenizer::TYPE_STRING)) {
      const Place where = place();
      const std::string bytes = text();
      expect(where, hidden_in(bytes));
      fields->AddLengthDelimited(field)->assign(bytes);
      return;
    }
    const std::string digits = token().text;
    const bool is_hex = digits.compare(0, 2, "0x") == 0;
    const uint64_t value = is_at("-")
                               ? static_cast<uint64_t>(signed_number())
                               : number(std::numeric_limits<google::protobuf::uint64>::max());
    if (is_hex && digits.size() == 10) {
      fields->AddFixed32(field, static_cast<uint32_t>(value));
    } else if (is_hex && digits.size() == 18) {
      fields->AddFixed64(field, value);
    } else if (field == 0) {
      fail(name, "a varint of the number 0 cannot be read");
    } else {
      fields->AddVarint(field, value);
    }
  }

  google::protobuf::io::ArrayInputStream input_;
  Tokenizer tokens_;
  int depth_ = 0;
};

// ---- JSON

// Takes the parts of a JSON text as they come, so that no copy of it is made.
class JsonParser : public nlohmann::json_sax<nlohmann::json> {
 public:
  JsonParser(const std::string& text, BytesForm form, Message* message)
      : text_(text), form_(form), root_(message) {}

  bool null() override {  // the same as nothing
    expect_field();
    return true;
  }

  bool boolean(bool value) override { return expect(set_bool(place(), field(), value)); }

  bool number_integer(int64_t value) override {
    return expect(set_number(place(), field(), value));
  }

  bool number_unsigned(uint64_t value) override {
    return value > static_cast<uint64_t>(std::numeric_limits<int64_t>::max())
               ? expect("the number is too large")
               : number_integer(static_cast<int64_t>(value));
  }

  bool number_float(double /*value*/, const std::string& /*digits*/) override {
    return expect("a number with a fraction, an exponent, or too many digits");
  }

  bool string(std::string& value) override {
    Message* message = place();
    switch (field().type()) {
      case FieldDescriptor::TYPE_BYTES:
        return expect(value == kNotShown ? set_text(message, field(), value)
                                         : set_bytes(message, value));
      case FieldDescriptor::TYPE_ENUM:
        return expect(set_name(message, field(), value));
      case FieldDescriptor::TYPE_INT32:
      case FieldDescriptor::TYPE_INT64:
        return expect(set_digits(message, value));
      default:
        return expect(set_text(message, field(), value));
    }
  }

  bool binary(nlohmann::json::binary_t& /*value*/) override { return false; }  // JSON has none

  bool start_object(std::size_t /*size*/) override {
    if (objects_.empty()) {
      objects_.push_back({root_, nullptr, false});
      return true;
    }
    Message* message = place();
    if (field().message_type() == nullptr) {
      return expect(wrong_kind(field()));
    }
    objects_.push_back({add_message(message, field()), nullptr, false});
    return true;
  }

  bool end_object() override {
    objects_.pop_back();
    return true;
  }

  bool key(std::string& name) override {
    Object& object = objects_.back();
    object.field = field_named(*object.message->GetDescriptor(), name);
    if (object.field == nullptr) {
      return expect(no_field(*object.message, name));
    }
    return expect(is_filled(*object.message, *object.field) ? "the field is there twice" : "");
  }

  bool start_array(std::size_t /*size*/) override {
    expect_field();
    Object& object = objects_.back();
    if (!object.field->is_repeated() || object.is_in_list) {
      return expect("the field is no list here");
    }
    object.is_in_list = true;
    return true;
  }

  bool end_array() override {
    objects_.back().is_in_list = false;
    return true;
  }

  bool parse_error(std::size_t position, const std::string& /*token*/,
                   const nlohmann::json::exception& /*error*/) override {
    throw misread_at(text_, position > 0 ? position - 1 : 0, "this is no JSON");
  }

 private:
  struct Object {
    Message* message;
    const FieldDescriptor* field;  // whose value comes next
    bool is_in_list;
  };

  void expect_field() {
    if (objects_.empty()) {
      expect("the message is no JSON object");
    }
  }

  const FieldDescriptor& field() const { return *objects_.back().field; }

  // Where the next value belongs.
  Message* place() {
    expect_field();
    const Object& object = objects_.back();
    if (object.field->is_repeated() && !object.is_in_list) {
      expect("the field is a list");
    }
    return object.message;
  }

  // Names the field rather than the line, which the library does not tell.
  bool expect(const Reason& reason) const {
    if (reason.empty()) {
      return true;
    }
    std::string path;
    for (const Object& object : objects_) {
      if (object.field != nullptr) {
        path += (path.empty() ? "" : ".") + object.field->name();
      }
    }
    throw Misread{0, 0, (path.empty() ? "" : path + ": ") + reason};
  }

  Reason set_bytes(Message* message, const std::string& value) {
    try {
      return set_text(message, field(), from_notation(value, notation_in_json(form_)));
    } catch (const Misread& misread) {
      return misread.reason;
    }
  }

  Reason set_digits(Message* message, const std::string& digits) {
    const auto value = number<int64_t>(digits);
    return value.has_value() ? set_number(message, field(), *value)
                             : "'" + digits + "' is no number";
  }

  const std::string& text_;
  BytesForm form_;
  Message* root_;
  std::vector<Object> objects_;  // around the next value
};

}  // namespace

void parse_text(const std::string& text, Message* message) {
  TextParser(text).parse(message);
}

void parse_json(const std::string& text, BytesForm form, Message* message) {
  JsonParser parser(text, form, message);
  nlohmann::json::sax_parse(text, &parser);
}

}  // namespace qel_wire
