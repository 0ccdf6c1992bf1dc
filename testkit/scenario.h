// A scenario: what a test expects of the plug-in, and what the service says instead of its own.
#ifndef TESTKIT_SCENARIO_H
#define TESTKIT_SCENARIO_H

#include <google/protobuf/descriptor.h>

#include <cstdint>
#include <string>
#include <vector>

#include "notation.h"
#include "world.pb.h"

namespace testkit {

// What happens to a message on its way to the plug-in.
struct Faults {
  int64_t after = 0;  // milliseconds
  bool is_dropped = false;
  bool is_twice = false;
  bool is_swapped = false;  // with the next
  int cut_at = -1;          // so many bytes are left, if it is not negative
  int corrupt_byte = -1;    // this byte is another one, if it is not negative
  std::string name;         // another message's, if it is not empty
};

struct Statement {
  enum Kind { kExpect, kAnswer, kPush, kAtMost, kAlways, kStrict };

  Kind kind;
  std::string where;  // "line 3"; empty where nobody looks
  // Null of kStrict, and of an answer as the service gives it.
  const google::protobuf::Descriptor* type = nullptr;
  Pattern pattern;  // without fields, or of the type
  Faults faults;

  // Of an expectation: whether an answer comes behind it, rather than the service's at once.
  bool has_answer = false;
  // Of an expectation, and of kAtMost: for how many milliseconds, or negative if for ever.
  int64_t within = -1;
  int most = 0;  // of kAtMost
};

struct Scenario {
  World world;
  std::vector<Statement> statements;
};

// Adds what the text says; what it says of the world replaces what was there. Throws Misread.
void parse_scenario(const std::string& text, Scenario* scenario);

}  // namespace testkit

#endif
