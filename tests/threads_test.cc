// All functions in many threads at once. ThreadSanitizer watches it in a preset of its own; in the
// others each thread's results tell.

#include "support/threads.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <set>

#include "support/function_calls.h"

namespace {

using support::FunctionCall;
using support::Line;
using support::LogCall;
using support::Own;
using support::Values;

constexpr size_t kThreads = 8;
constexpr int kRounds = 40;

// No two calls have the same, and no two threads texts of the same length.
Own own_values(size_t thread, int number) {
  const std::string name = "call " + std::to_string(number) + " of " + std::to_string(thread);
  return {static_cast<int64_t>(thread) * 100'000'000'000 + number * 100,
          name + std::string(thread * 7, '.')};
}

// Which function a thread's call of that number is about. In the first round all threads begin with
// the same, later each with another.
const FunctionCall& function_call(size_t thread, int number) {
  const auto& calls = support::function_calls();
  const size_t round = static_cast<size_t>(number) / calls.size();
  return calls[(static_cast<size_t>(number) + round * thread * 5) % calls.size()];
}

int calls_each() {
  return kRounds * static_cast<int>(support::function_calls().size());
}

bool is_log_of(const std::vector<LogCall>& logged, const std::string& function,
               const std::vector<Line>& lines) {
  return std::equal(logged.begin(), logged.end(), lines.begin(), lines.end(),
                    [&](const LogCall& call, const Line& line) {
                      return support::is_line(call, function, line);
                    });
}

TEST(Threads, HaveCallsOfAllFunctions) {
  std::set<std::string> functions;
  for (const FunctionCall& call : support::function_calls()) {
    functions.insert(call.function);
  }
  EXPECT_EQ(functions.size(), 34u);
}

TEST(Threads, WhenEightCallEverything_EachGetsItsOwnResults) {
  EXPECT_EQ(support::wrong_calls_of_threads(kThreads, calls_each(),
                                            [](size_t thread, int number) {
                                              const support::ThreadLog log;
                                              const FunctionCall& function =
                                                  function_call(thread, number);
                                              const Own own = own_values(thread, number);
                                              const Values got = function.call(own);
                                              const Values expected = function.expected(own);
                                              EXPECT_EQ(got, expected) << function.function << ", "
                                                                       << function.situation;
                                              return got == expected;
                                            }),
            0);
}

TEST(Threads, WhenEightCallEverything_EachLogsItsOwnLines) {
  EXPECT_EQ(support::wrong_calls_of_threads(
                kThreads, calls_each(),
                [](size_t thread, int number) {
                  const support::ThreadLog log;
                  const FunctionCall& function = function_call(thread, number);
                  const Own own = own_values(thread, number);
                  function.call(own);
                  const bool right = is_log_of(log.calls(), function.function, function.lines(own));
                  EXPECT_TRUE(right) << function.function << ", " << function.situation;
                  return right;
                }),
            0);
}

}  // namespace
