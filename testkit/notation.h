// Messages as scenarios write them: the text form of Protocol Buffers, and in it
//   NAME           the field is there, whatever its value
//   !NAME          the field is not there; NAME: [] is the same of a list
//   NUMBER: VALUE  a field that the schema does not have; NUMBER { ... } if it is a message
// A number of an enumeration need not be one of its members.
#ifndef TESTKIT_NOTATION_H
#define TESTKIT_NOTATION_H

#include <google/protobuf/io/tokenizer.h>
#include <google/protobuf/io/zero_copy_stream_impl_lite.h>
#include <google/protobuf/message.h>

#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "report.h"

namespace testkit {

// In a text. Both count from 1.
struct Place {
  int line;
  int column;
};

// Thrown: why the text at that place is no scenario.
struct Misread {
  Place place;
  std::string reason;
};

// A message with some fields, and others of which only that much is known. Numbers outside their
// enumeration are unknown fields, as they are in a message that was received.
struct Pattern {
  // The message in fields, or one inside it, and its field.
  using Field =
      std::pair<const google::protobuf::Message*, const google::protobuf::FieldDescriptor*>;

  Pattern() = default;
  // Any message of that type.
  explicit Pattern(const google::protobuf::Descriptor& type);
  const google::protobuf::Descriptor& type() const { return *fields->GetDescriptor(); }

  std::unique_ptr<google::protobuf::Message> fields;
  std::set<Field> present;
  std::set<Field> absent;
};

// The words, numbers, texts and signs of a scenario.
class Tokens : private google::protobuf::io::ErrorCollector {
 public:
  // The text has to stay. It is not longer than an int can count.
  explicit Tokens(std::string_view text);

  bool is_at_end() { return is_at(google::protobuf::io::Tokenizer::TYPE_END); }
  bool is_at(google::protobuf::io::Tokenizer::TokenType type) { return token().type == type; }
  bool is_at(const std::string& text) { return token().text == text; }
  // Names of messages begin with a capital, as no word of a scenario does.
  bool is_at_capital() { return token().text[0] >= 'A' && token().text[0] <= 'Z'; }
  // The token's text; it is left behind.
  std::string take();
  // Whether it was there.
  bool take(const std::string& text);
  void expect(const std::string& text);
  std::string name(const char* what);
  int number(const char* what);
  Place place() { return {token().line + 1, token().column + 1}; }
  // Fails at this token, and names it.
  [[noreturn]] void fail(const std::string& reason);

 private:
  void AddError(int line, int column, const std::string& reason) override;
  const google::protobuf::io::Tokenizer::Token& token() { return tokens_.current(); }

  std::string_view text_;
  google::protobuf::io::ArrayInputStream input_;
  google::protobuf::io::Tokenizer tokens_;
};

// The fields of a message of that type in braces.
Pattern parse_pattern(const google::protobuf::Descriptor& type, Tokens* tokens);
// A pattern of all fields of a message that the library's classes can read.
Pattern pattern_of(const google::protobuf::Message& message);

// What of the message is not as the pattern has it, in words. Fields that the pattern does not have
// may be anything, unless it is whole: then they must not be there. Fields of the names in ignored
// are not compared.
std::vector<std::string> differences(const Pattern& pattern,
                                     const google::protobuf::Message& message,
                                     const Secrets& secrets, bool is_whole = false,
                                     const std::set<std::string>& ignored = {});

// Gives the message the fields of the pattern instead of its own: lists are replaced as a whole,
// messages field by field.
void put(const Pattern& pattern, google::protobuf::Message* message);

}  // namespace testkit

#endif
