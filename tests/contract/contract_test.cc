// Every case of the contract: as it is, and with each block that it asks for refused in turn.

#include <gtest/gtest.h>

#include <cctype>
#include <functional>
#include <string>

#include "cases.h"
#include "run.h"

namespace {

using contract::Course;
using contract::Json;
using contract::Run;

class ContractTest : public ::testing::Test {
 public:
  explicit ContractTest(std::function<void()> body) : body_(std::move(body)) {}
  void TestBody() override { body_(); }

 private:
  std::function<void()> body_;
};

void expect_no_problems(const Run& run) {
  for (const std::string& problem : run.problems()) {
    ADD_FAILURE() << problem;
  }
}

bool ends_process(const Course& course) {
  return course.end.contains("aborts") || course.end.contains("faults");
}

void run(const Json& contract_case, const Course& course) {
  Run run(contract_case, course);
  if (ends_process(course)) {
    run.execute_in_child();
  } else {
    run.execute();
  }
  expect_no_problems(run);
}

void refuse_blocks(const Json& contract_case, const Course& course) {
  for (int n = 0; n < blocks_of(course); ++n) {
    SCOPED_TRACE("without block " + std::to_string(n));
    run(contract_case, course_without_block(course, n));
  }
}

void refuse_news(const Json& contract_case, const Course& course) {
  bool has_refused = true;
  for (int n = 1; has_refused; ++n) {
    SCOPED_TRACE("without block " + std::to_string(n) + " of operator new");
    Run run(contract_case, course, n);
    run.execute();
    expect_no_problems(run);
    has_refused = run.has_refused_new() && run.problems().empty();
  }
}

std::string identifier(std::string name) {
  for (char& c : name) {
    c = std::isalnum(static_cast<unsigned char>(c)) != 0 ? c : '_';
  }
  return name;
}

void add_test(const std::string& suite, const Json& contract_case,
              void (*body)(const Json&, const Course&)) {
  const auto test = [&contract_case, body] {
    body(contract_case, contract::course_of(contract_case));
  };
  ::testing::RegisterTest(suite.c_str(), identifier(contract_case.at("case")).c_str(), nullptr,
                          nullptr, __FILE__, __LINE__,
                          [=]() -> ContractTest* { return new ContractTest(test); });
}

}  // namespace

int main(int argc, char** argv) {
  ::testing::InitGoogleTest(&argc, argv);
  for (const Json& contract_case : contract::cases()) {
    const std::string function = contract_case.at("call");
    const Course course = contract::course_of(contract_case);
    add_test(function, contract_case, run);
    if (blocks_of(course) > 0) {
      add_test(function + "/each_block_refused", contract_case, refuse_blocks);
    }
    if (!ends_process(course) && !contract_case.contains("flags")) {
      add_test(function + "/each_new_refused", contract_case, refuse_news);
    }
  }
  return RUN_ALL_TESTS();
}
