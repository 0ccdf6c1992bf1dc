// The contract's cases in many threads at once. ThreadSanitizer watches it in a preset of its own;
// in the others each thread's results and lines tell.

#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "cases.h"
#include "run.h"

namespace {

using contract::CaseRun;
using contract::Json;

constexpr size_t kThreads = 8;

std::vector<const Json*> cases_that_return() {
  std::vector<const Json*> returning;
  for (const Json& contract_case : contract::cases()) {
    if (!contract_case.contains("aborts") && !contract_case.contains("faults")) {
      returning.push_back(&contract_case);
    }
  }
  return returning;
}

// Each thread makes half of the calls, and begins with another one, so that all sorts of calls
// meet.
TEST(Threads, WhenEightCallAtOnce_EachHasItsOwnResultsAndLines) {
  const std::vector<const Json*> cases = cases_that_return();
  ASSERT_FALSE(cases.empty());
  std::atomic<size_t> waiting = kThreads;
  std::vector<std::string> problems(kThreads);
  std::vector<std::thread> threads;
  for (size_t thread = 0; thread < kThreads; ++thread) {
    threads.emplace_back([&, thread] {
      --waiting;
      while (waiting > 0) {
      }
      for (size_t i = 0; i < cases.size() / 2 && problems[thread].empty(); ++i) {
        const Json& contract_case = *cases[(i + thread * cases.size() / kThreads) % cases.size()];
        CaseRun run(contract_case, contract::course_of(contract_case));
        run.execute();
        for (const std::string& problem : run.problems()) {
          problems[thread] += contract_case["case"].get<std::string>() + ": " + problem + "\n";
        }
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  for (const std::string& problem : problems) {
    EXPECT_EQ(problem, "");
  }
}

}  // namespace
