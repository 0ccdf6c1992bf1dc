// A scenario: what a test expects of the plug-in, and what the service says instead of its own.
#ifndef TESTKIT_SCENARIO_H
#define TESTKIT_SCENARIO_H

#include <cstdint>
#include <set>
#include <string>
#include <variant>
#include <vector>

#include "notation.h"
#include "world.pb.h"

namespace testkit {

// What happens to a message on its way to the plug-in.
struct Faults {
  std::string where;  // of the statement: "line 3"
  int64_t after = 0;  // milliseconds
  bool is_dropped = false;
  bool is_twice = false;
  bool is_swapped = false;  // with the next
  int cut_at = -1;          // so many bytes are left, if it is not negative
  int corrupt_byte = -1;    // this byte is another one, if it is not negative
  std::string name;         // another message's, if it is not empty
};

// For ever.
constexpr int64_t kNoLimit = -1;

struct Expect {
  Pattern pattern;
  int64_t within = kNoLimit;  // milliseconds
  int number = 0;             // of this expectation, from 1
};

struct Answer {
  int request = 0;  // the number of its expectation
  Pattern pattern;  // the fields of another message, or without any
  bool is_another;  // whether it is that message, rather than the service's with its fields
  Faults faults;
};

struct Push {
  Pattern pattern;
  Faults faults;
};

struct AtMost {
  int count = 0;
  Pattern pattern;
  int64_t within = kNoLimit;
};

struct Always {
  Pattern pattern;
};

struct Strict {};

struct Statement;
using Script = std::vector<Statement>;

// Each begins with an expectation, and has no other.
struct AnyOrder {
  std::vector<Script> scripts;
};

struct Statement {
  std::string where;  // "line 3"
  std::variant<Expect, Answer, Push, AtMost, Always, Strict, AnyOrder> what;
};

struct Scenario {
  World world;
  Script script;
  std::set<int> answered;  // the numbers of expectations that a statement answers
};

// Adds what the text says; what it says of the world replaces what was there. Throws Misread.
void parse_scenario(const std::string& text, Scenario* scenario);

}  // namespace testkit

#endif
