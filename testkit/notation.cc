#include "notation.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/io/coded_stream.h>
#include <google/protobuf/text_format.h>
#include <google/protobuf/unknown_field_set.h>
#include <google/protobuf/wire_format.h>

#include <algorithm>
#include <limits>

#include "messages.h"

namespace testkit {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::Reflection;
using google::protobuf::TextFormat;
using google::protobuf::UnknownField;
using google::protobuf::UnknownFieldSet;
using google::protobuf::io::Tokenizer;

constexpr int kDeepest = 50;

bool is_filled(const Message& message, const FieldDescriptor& field) {
  const Reflection& fields = *message.GetReflection();
  return field.is_repeated() ? fields.FieldSize(message, &field) > 0
                             : fields.HasField(message, &field);
}

std::string bytes_of(const UnknownFieldSet& fields) {
  std::string bytes;
  {
    google::protobuf::io::StringOutputStream output(&bytes);
    google::protobuf::io::CodedOutputStream stream(&output);
    google::protobuf::internal::WireFormat::SerializeUnknownFields(fields, &stream);
  }  // which write the rest
  return bytes;
}

// ---- Parsing

// Why the last value was refused.
class LastError : public google::protobuf::io::ErrorCollector {
 public:
  void AddError(int /*line*/, int /*column*/, const std::string& reason) override {
    reason_ = reason;
  }
  const std::string& reason() const { return reason_; }

 private:
  std::string reason_;
};

class PatternParser {
 public:
  PatternParser(Tokens* tokens, Pattern* pattern) : tokens_(*tokens), pattern_(*pattern) {}

  // Up to the closing brace.
  void fields(Message* message) {
    tokens_.expect("{");
    while (!tokens_.take("}")) {
      if (tokens_.take("!")) {
        const Place place = tokens_.place();
        const FieldDescriptor& field = field_of(*message);
        require_new(*message, field, place);
        pattern_.absent.emplace(message, &field);
      } else if (tokens_.is_at(Tokenizer::TYPE_INTEGER)) {
        unknown(message->GetDescriptor(), message->GetReflection()->MutableUnknownFields(message));
      } else {
        known(message);
      }
      if (!tokens_.take(",")) {
        tokens_.take(";");
      }
    }
  }

 private:
  const FieldDescriptor& field_of(const Message& message) {
    const Descriptor& type = *message.GetDescriptor();
    const Place place = tokens_.place();
    const std::string name = tokens_.name("expected the name of a field, or '}'");
    const FieldDescriptor* field = type.FindFieldByName(name);
    if (field == nullptr) {
      const std::set<std::string> words{"always", "answer", "at",     "expect", "in",
                                        "never",  "push",   "strict", "world"};
      throw Misread{place,
                    type.name() + " has no field '" + name + "'" +
                        (words.count(name) > 0 ? ". Is there a '}' missing before it?" : "")};
    }
    return *field;
  }

  void require_new(const Message& message, const FieldDescriptor& field, const Place& place) const {
    const Pattern::Field key{&message, &field};
    if (is_filled(message, field) || pattern_.present.count(key) > 0 ||
        pattern_.absent.count(key) > 0) {
      throw Misread{place, "the field '" + field.name() + "' is there twice"};
    }
  }

  void known(Message* message) {
    const Place place = tokens_.place();
    const FieldDescriptor& field = field_of(*message);
    if (!field.is_repeated() || !is_filled(*message, field)) {
      require_new(*message, field, place);
    }
    const bool has_colon = tokens_.take(":");
    if (!has_colon && !tokens_.is_at("{")) {
      pattern_.present.emplace(message, &field);
    } else if (field.is_repeated() && tokens_.take("[")) {
      list(message, field, place);
    } else {
      value(message, field);
    }
  }

  // An empty one is a field that is not there.
  void list(Message* message, const FieldDescriptor& field, const Place& place) {
    if (tokens_.take("]")) {
      require_new(*message, field, place);
      pattern_.absent.emplace(message, &field);
      return;
    }
    do {
      value(message, field);
      tokens_.take(",");
    } while (!tokens_.take("]"));
  }

  void value(Message* message, const FieldDescriptor& field) {
    const Reflection& fields = *message->GetReflection();
    if (field.message_type() != nullptr) {
      this->fields(field.is_repeated() ? fields.AddMessage(message, &field)
                                       : fields.MutableMessage(message, &field));
      return;
    }
    const Place place = tokens_.place();
    const std::string sign = tokens_.take("-") ? "-" : "";
    const bool is_text = tokens_.is_at(Tokenizer::TYPE_STRING);
    std::string text;
    if (field.enum_type() != nullptr && tokens_.is_at(Tokenizer::TYPE_INTEGER)) {
      const int number = tokens_.number("expected a number") * (sign.empty() ? 1 : -1);
      if (field.enum_type()->FindValueByNumber(number) == nullptr) {
        fields.MutableUnknownFields(message)->AddVarint(field.number(),
                                                        static_cast<uint64_t>(int64_t{number}));
        return;
      }
      text = std::to_string(number);
    } else {
      text = sign + tokens_.take();
    }
    while (is_text && tokens_.is_at(Tokenizer::TYPE_STRING)) {  // those that follow belong to it
      text += " " + tokens_.take();
    }
    LastError error;
    TextFormat::Parser parser;
    parser.RecordErrorsTo(&error);
    if (!parser.ParseFieldValueFromString(text, &field, message)) {
      throw Misread{place,
                    "this is no value of the field '" + field.name() + "': " + error.reason()};
    }
  }

  // The type is that of the message around it, or null if the schema does not have that either.
  void unknown(const Descriptor* type, UnknownFieldSet* fields) {
    const Place place = tokens_.place();
    const int number = tokens_.number("expected the number of a field");
    const bool has_colon = tokens_.take(":");
    if (!has_colon && !tokens_.is_at("{")) {
      tokens_.fail("expected ':' or '{' behind the number of a field");
    }
    if (number < 1 || number > FieldDescriptor::kMaxNumber) {
      throw Misread{place, "fields have numbers from 1 to " +
                               std::to_string(int{FieldDescriptor::kMaxNumber})};
    }
    const FieldDescriptor* known = type == nullptr ? nullptr : type->FindFieldByNumber(number);
    if (known != nullptr) {
      throw Misread{place, "the field " + std::to_string(number) + " is known: write its name, '" +
                               known->name() + "'"};
    }
    if (!has_colon) {
      UnknownFieldSet inner;
      if (++depth_ > kDeepest) {
        tokens_.fail("too many messages in each other");
      }
      tokens_.expect("{");
      while (!tokens_.take("}")) {
        unknown(nullptr, &inner);
        tokens_.take(",");
      }
      --depth_;
      fields->AddLengthDelimited(number, bytes_of(inner));
    } else if (tokens_.is_at(Tokenizer::TYPE_STRING)) {
      Tokenizer::ParseString(tokens_.take(), fields->AddLengthDelimited(number));
    } else {
      google::protobuf::uint64 value = 0;
      const bool is_negative = tokens_.take("-");
      if (!tokens_.is_at(Tokenizer::TYPE_INTEGER) ||
          !Tokenizer::ParseInteger(tokens_.take(), std::numeric_limits<uint64_t>::max(), &value)) {
        throw Misread{place, "the value of the field " + std::to_string(number) +
                                 " is no number, no text and no message"};
      }
      fields->AddVarint(number, is_negative ? 0 - value : value);
    }
  }

  Tokens& tokens_;
  Pattern& pattern_;
  int depth_ = 0;  // of unknown fields: those of the schema end by themselves
};

// ---- Comparing

// The beginning of a long text, without any token. It is hidden before a part of it is cut.
std::string shortened(const std::string& text, const Secrets& secrets) {
  constexpr size_t kMost = 100;
  std::string result = secrets.hidden_in(text);
  if (result.size() > kMost) {
    size_t end = kMost;
    while (end > 0 && (static_cast<unsigned char>(result[end]) & 0xc0U) == 0x80) {
      --end;
    }
    result = result.substr(0, end) + "...";
  }
  return result;
}

std::string quoted(const std::string& text, const Secrets& secrets) {
  Result of_text;  // the runtime prints values of fields alone
  of_text.set_msg(shortened(text, secrets));
  TextFormat::Printer printer;
  printer.SetUseUtf8StringEscaping(true);
  std::string result;
  printer.PrintFieldValueToString(of_text, Result::descriptor()->FindFieldByName("msg"), -1,
                                  &result);
  return result;
}

// A value as the text form has it. Texts of a login are not shown at all, as any of them may be the
// token.
std::string shown(const Message& message, const FieldDescriptor& field, int index,
                  const Secrets& secrets) {
  std::string text;
  if (field.cpp_type() != FieldDescriptor::CPPTYPE_STRING) {
    TextFormat::PrintFieldValueToString(message, &field, index, &text);
    return text;
  }
  if (message.GetDescriptor() == ChannelAuthRequest::descriptor()) {
    return Secrets::kHidden;
  }
  const Reflection& fields = *message.GetReflection();
  return quoted(field.is_repeated() ? fields.GetRepeatedString(message, &field, index)
                                    : fields.GetString(message, &field),
                secrets);
}

std::string shown(const UnknownField& field, const Secrets& secrets) {
  switch (field.type()) {
    case UnknownField::TYPE_VARINT:
      return std::to_string(static_cast<int64_t>(field.varint()));
    case UnknownField::TYPE_LENGTH_DELIMITED:
      return quoted(field.length_delimited(), secrets);
    default:
      return "of another kind";
  }
}

using UnknownFields = std::vector<UnknownField>;  // which are in a message

UnknownFields unknown_under(const Message& message, int number) {
  const UnknownFieldSet& fields = message.GetReflection()->GetUnknownFields(message);
  UnknownFields result;
  for (int i = 0; i < fields.field_count(); ++i) {
    if (fields.field(i).number() == number) {
      result.push_back(fields.field(i));
    }
  }
  return result;
}

std::string bytes_of(const UnknownFields& fields) {
  UnknownFieldSet set;
  for (const UnknownField& field : fields) {
    set.AddField(field);
  }
  return bytes_of(set);
}

// Those that the schema does not have.
std::set<int> unknown_numbers(const Message& message) {
  const UnknownFieldSet& fields = message.GetReflection()->GetUnknownFields(message);
  std::set<int> numbers;
  for (int i = 0; i < fields.field_count(); ++i) {
    if (message.GetDescriptor()->FindFieldByNumber(fields.field(i).number()) == nullptr) {
      numbers.insert(fields.field(i).number());
    }
  }
  return numbers;
}

class Comparison {
 public:
  Comparison(const Pattern& pattern, const Secrets& secrets, bool is_whole,
             const std::set<std::string>& ignored)
      : pattern_(pattern), secrets_(secrets), is_whole_(is_whole), ignored_(ignored) {}

  void compare(const Message& wanted, const Message& came, const std::string& path) {
    const Descriptor& type = *wanted.GetDescriptor();
    for (int i = 0; i < type.field_count(); ++i) {
      if (ignored_.count(type.field(i)->name()) == 0) {
        compare_field(wanted, came, *type.field(i), path + type.field(i)->name());
      }
    }
    const std::set<int> all_wanted = unknown_numbers(wanted);
    for (const int number : all_wanted) {
      compare_unknown(wanted, came, number, path + name_of(number));
    }
    for (const int number : unknown_numbers(came)) {
      if (is_whole_ && all_wanted.count(number) == 0) {
        found.push_back(path + name_of(number) + " should not be there");
      }
    }
  }

  std::vector<std::string> found;

 private:
  static std::string name_of(int unknown) { return "the unknown field " + std::to_string(unknown); }

  // A number of no member of an enumeration is an unknown field, but it is there.
  void compare_field(const Message& wanted, const Message& came, const FieldDescriptor& field,
                     const std::string& name) {
    const bool is_odd = !unknown_under(came, field.number()).empty();
    const bool is_odd_wanted = !unknown_under(wanted, field.number()).empty();
    const bool is_there = is_odd || is_filled(came, field);
    const bool is_wanted = is_odd_wanted || is_filled(wanted, field);
    const bool is_any = pattern_.present.count({&wanted, &field}) > 0;
    const bool is_unwanted =
        pattern_.absent.count({&wanted, &field}) > 0 || (is_whole_ && !is_wanted && !is_any);
    if (is_there && is_unwanted) {
      found.push_back(name + " should not be there");
    } else if (!is_there && is_any) {
      found.push_back(name + " is missing");
    } else if (is_wanted && field.is_repeated()) {
      compare_list(wanted, came, field, name);
    } else if (is_wanted && field.message_type() != nullptr) {
      compare_message(wanted, came, field, name);
    } else if (is_wanted && (is_odd || is_odd_wanted)) {
      compare_unknown(wanted, came, field.number(), name);
    } else if (is_wanted && !is_there) {
      found.push_back(name + " is missing, which should be " + shown(wanted, field, -1, secrets_));
    } else if (is_wanted) {
      compare_value(wanted, came, field, -1, name);
    }
  }

  void compare_message(const Message& wanted, const Message& came, const FieldDescriptor& field,
                       const std::string& name) {
    if (is_filled(came, field)) {
      compare(message_in(wanted, field, -1), message_in(came, field, -1), name + ".");
    } else {
      found.push_back(name + " is missing");
    }
  }

  void compare_list(const Message& wanted, const Message& came, const FieldDescriptor& field,
                    const std::string& name) {
    const int wanted_count = wanted.GetReflection()->FieldSize(wanted, &field);
    const int count = came.GetReflection()->FieldSize(came, &field);
    if (count != wanted_count) {
      found.push_back(name + " has " + std::to_string(count) + " elements instead of " +
                      std::to_string(wanted_count));
    }
    for (int i = 0; i < std::min(count, wanted_count); ++i) {
      const std::string element = name + "[" + std::to_string(i) + "]";
      if (field.message_type() != nullptr) {
        compare(message_in(wanted, field, i), message_in(came, field, i), element + ".");
      } else {
        compare_value(wanted, came, field, i, element);
      }
    }
  }

  void compare_value(const Message& wanted, const Message& came, const FieldDescriptor& field,
                     int index, const std::string& name) {
    std::string wanted_value;
    std::string value;
    TextFormat::PrintFieldValueToString(wanted, &field, index, &wanted_value);
    TextFormat::PrintFieldValueToString(came, &field, index, &value);
    if (value != wanted_value) {
      found.push_back(name + " is " + shown(came, field, index, secrets_) + " instead of " +
                      shown(wanted, field, index, secrets_));
    }
  }

  static const Message& message_in(const Message& message, const FieldDescriptor& field,
                                   int index) {
    const Reflection& fields = *message.GetReflection();
    return index < 0 ? fields.GetMessage(message, &field)
                     : fields.GetRepeatedMessage(message, &field, index);
  }

  void compare_unknown(const Message& wanted, const Message& came, int number,
                       const std::string& name) {
    if (bytes_of(unknown_under(wanted, number)) == bytes_of(unknown_under(came, number))) {
      return;
    }
    const std::string values = all_shown(came, number);
    found.push_back(
        name +
        (values.empty() ? " is missing, which should be " : " is " + values + " instead of ") +
        all_shown(wanted, number));
  }

  // The values of that number, of its field and of those that the schema does not have.
  std::string all_shown(const Message& message, int number) const {
    std::string values;
    const FieldDescriptor* known = message.GetDescriptor()->FindFieldByNumber(number);
    if (known != nullptr && is_filled(message, *known)) {
      values = shown(message, *known, -1, secrets_);
    }
    for (const UnknownField& field : unknown_under(message, number)) {
      values += (values.empty() ? "" : ", ") + shown(field, secrets_);
    }
    return values;
  }

  const Pattern& pattern_;
  const Secrets& secrets_;
  bool is_whole_;
  const std::set<std::string>& ignored_;
};

// Removes what the pattern replaces or does not want, as far as merging would leave it.
void make_room(const Pattern& pattern, const Message& given, Message* message) {
  const Descriptor& type = *given.GetDescriptor();
  const Reflection& fields = *message->GetReflection();
  for (int i = 0; i < type.field_count(); ++i) {
    const FieldDescriptor& field = *type.field(i);
    const bool is_given = is_filled(given, field);
    if (pattern.absent.count({&given, &field}) > 0 || (is_given && field.is_repeated())) {
      fields.ClearField(message, &field);
    } else if (is_given && field.message_type() != nullptr) {
      make_room(pattern, fields.GetMessage(given, &field), fields.MutableMessage(message, &field));
    }
  }
}

}  // namespace

// ---- Tokens

namespace {

// Editors of some systems put a byte order mark before a text.
std::string_view without_mark(std::string_view text) {
  constexpr std::string_view kMark = "\xef\xbb\xbf";
  return text.substr(text.substr(0, kMark.size()) == kMark ? kMark.size() : 0);
}

}  // namespace

Tokens::Tokens(std::string_view text)
    : text_(without_mark(text)),
      input_(text_.data(), static_cast<int>(text_.size())),
      tokens_(&input_, this) {
  tokens_.set_comment_style(Tokenizer::SH_COMMENT_STYLE);
  tokens_.set_require_space_after_number(false);  // "5s"
  tokens_.Next();
}

std::string Tokens::take() {
  std::string text = token().text;
  tokens_.Next();
  return text;
}

bool Tokens::take(const std::string& text) {
  const bool is_there = is_at(text);
  if (is_there) {
    tokens_.Next();
  }
  return is_there;
}

void Tokens::expect(const std::string& text) {
  if (!take(text)) {
    fail("expected '" + text + "'");
  }
}

std::string Tokens::name(const char* what) {
  if (!is_at(Tokenizer::TYPE_IDENTIFIER)) {
    fail(what);
  }
  return take();
}

// Decimal, as 010 would be 8 otherwise.
int Tokens::number(const char* what) {
  const std::string& digits = token().text;
  google::protobuf::uint64 value = 0;
  if (!is_at(Tokenizer::TYPE_INTEGER) || (digits.size() > 1 && digits[0] == '0') ||
      !Tokenizer::ParseInteger(digits, std::numeric_limits<int>::max(), &value)) {
    fail(what);
  }
  tokens_.Next();
  return static_cast<int>(value);
}

void Tokens::fail(const std::string& reason) {
  const std::string found = is_at_end()                     ? "the text ends"
                            : is_at(Tokenizer::TYPE_STRING) ? "here is a text"
                                                            : "here is '" + token().text + "'";
  throw Misread{place(), reason + ", but " + found};
}

void Tokens::AddError(int line, int column, const std::string& reason) {
  throw Misread{{line + 1, column + 1}, reason};
}

// ---- Patterns

Pattern::Pattern(const Descriptor& type) : fields(new_message(type)) {}

Pattern parse_pattern(const Descriptor& type, Tokens* tokens) {
  Pattern pattern(type);
  PatternParser(tokens, &pattern).fields(pattern.fields.get());
  return pattern;
}

Pattern pattern_of(const Message& message) {
  Pattern pattern;
  pattern.fields.reset(message.New());
  pattern.fields->CopyFrom(message);
  return pattern;
}

std::vector<std::string> differences(const Pattern& pattern, const Message& message,
                                     const Secrets& secrets, bool is_whole,
                                     const std::set<std::string>& ignored) {
  Comparison comparison(pattern, secrets, is_whole, ignored);
  comparison.compare(*pattern.fields, message, "");
  return comparison.found;
}

void put(const Pattern& pattern, Message* message) {
  make_room(pattern, *pattern.fields, message);
  message->MergeFrom(*pattern.fields);
}

}  // namespace testkit
