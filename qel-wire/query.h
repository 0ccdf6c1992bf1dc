// Questions about a message's fields, each named by its path: "result.code".
#ifndef QEL_WIRE_QUERY_H
#define QEL_WIRE_QUERY_H

#include <google/protobuf/descriptor.h>

#include <map>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include "text.h"
#include "token.h"

namespace qel_wire {

// What a message must have, written as one of
//
//   path              the field is there
//   !path             it is not
//   path=value        a value of it is that; also != < <= > >=
//   path~text         a text of it has that within
//
// Names are in any case of letters. Of repeated fields any value may do. Numbers are compared as
// numbers, texts by their bytes, enumerations by name or number, what is of type bytes in base64,
// as in JSON. An unknown field's path is its number. What is hidden is there, and has no value.
class Condition {
 public:
  // Throws Failure if there is no such path in the message, or in any message if type is null, or
  // if the value is none of the field's.
  Condition(const std::string& text, const google::protobuf::Descriptor* type);

  bool holds(std::string_view bytes, const google::protobuf::Descriptor& type,
             const Hidden& hidden) const;

 private:
  enum class Sign {
    kIsThere,
    kIsAbsent,
    kEqual,
    kDifferent,
    kLess,
    kLessOrEqual,
    kMore,
    kMoreOrEqual,
    kHasWithin
  };
  class Search;

  void parse(const std::string& text);

  std::string path_;
  Sign sign_ = Sign::kIsThere;
  std::string value_;
};

// A message, and what of it is not shown.
struct Side {
  std::string bytes;
  const google::protobuf::Descriptor* type;
  Hidden hidden;
};

// Writes a line for each field that one message has, or that has another value there: '-' and that
// of the first, '+' and that of the second. Of what is hidden, texts are not shown, and numbers and
// groups have no line. False if there is no difference, hidden or not.
bool diff(const Side& first, const Side& second, const Colours& colours, std::ostream* out);

}  // namespace qel_wire

#endif
