// All functions in many threads at once. ThreadSanitizer watches it in a preset of its own; in the
// others each thread's results tell.

#include "support/threads.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "support/exported_functions.h"
#include "support/function_calls.h"

namespace {

using support::FunctionCall;
using support::Line;
using support::LogCall;
using support::Own;
using support::Values;

constexpr size_t kThreads = 8;
constexpr int kCallsOfOneFunction = 80;
constexpr int kRounds = 20;

// No two calls have the same, and no two threads texts of the same length.
Own own_values(size_t thread, int64_t number) {
  const std::string name = "call " + std::to_string(number) + " of " + std::to_string(thread);
  return {static_cast<int64_t>(thread) * 100'000'000'000 + number * 100,
          name + std::string(thread * 7, '.')};
}

bool gets_its_own_results(const FunctionCall& function, const Own& own) {
  const support::ThreadLog log;
  const Values got = function.call(own);
  const Values expected = function.expected(own);
  EXPECT_EQ(got, expected) << function.function << ", " << function.situation;
  return got == expected;
}

bool logs_its_own_lines(const FunctionCall& function, const Own& own) {
  const support::ThreadLog log;
  function.call(own);
  const std::vector<Line> expected = function.lines(own);
  const bool right = std::equal(log.calls().begin(), log.calls().end(), expected.begin(),
                                expected.end(), [&](const LogCall& call, const Line& line) {
                                  return support::is_line(call, function.function, line);
                                });
  EXPECT_TRUE(right) << function.function << ", " << function.situation;
  return right;
}

// Eight threads call each function often, each beginning with another one.
int wrong_calls_of_all(bool (*is_right)(const FunctionCall&, const Own&)) {
  const auto& functions = support::function_calls();
  const int calls = kRounds * static_cast<int>(functions.size());
  return support::wrong_calls_of_threads(kThreads, calls, [&](size_t thread, int number) {
    const size_t place = static_cast<size_t>(number) + thread * 9;
    return is_right(functions[place % functions.size()], own_values(thread, number));
  });
}

TEST(Threads, HaveCallsOfAllFunctions) {
  EXPECT_EQ(support::names_in(support::function_calls(), &FunctionCall::function),
            support::exported_functions());
}

TEST(Threads, WhenEightCallOneFunction_EachGetsItsOwnResults) {
  for (const FunctionCall& function : support::function_calls()) {
    EXPECT_EQ(support::wrong_calls_of_threads(kThreads, kCallsOfOneFunction,
                                              [&](size_t thread, int number) {
                                                return gets_its_own_results(
                                                    function, own_values(thread, number));
                                              }),
              0);
  }
}

TEST(Threads, WhenEightCallEverything_EachGetsItsOwnResults) {
  EXPECT_EQ(wrong_calls_of_all(gets_its_own_results), 0);
}

TEST(Threads, WhenEightCallEverything_EachLogsItsOwnLines) {
  EXPECT_EQ(wrong_calls_of_all(logs_its_own_lines), 0);
}

}  // namespace
