// Calls of all 34 functions, on their good paths and on their bad ones, each made of values of the
// caller's own, and what has to come of each.
#ifndef TESTS_SUPPORT_FUNCTION_CALLS_H
#define TESTS_SUPPORT_FUNCTION_CALLS_H

#include <cstdint>
#include <functional>
#include <ostream>
#include <string>
#include <vector>

#include "support/log_capture.h"

namespace support {

// What a call is made of. Every number it passes or receives comes from the id, every text is or
// contains the text.
struct Own {
  int64_t id;  // 0 or more, and small enough for what is added to it
  std::string text;
};

// The status and all outputs of a call, written out.
using Values = std::vector<std::string>;

struct FunctionCall {
  std::string function;
  std::string situation;
  std::function<Values(const Own&)> call;
  std::function<Values(const Own&)> expected;
  std::function<std::vector<Line>(const Own&)> lines;  // that it logs
};

inline void PrintTo(const FunctionCall& call, std::ostream* out) {
  *out << call.function << ", " << call.situation;
}

const std::vector<FunctionCall>& function_calls();

}  // namespace support

#endif
