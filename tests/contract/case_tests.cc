#include "case_tests.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <string>
#include <utility>

#include "support/address_sanitizer.h"

namespace contract {
namespace {

// Besides the log nothing is said, but by the runtime: of a check that failed, and that a text is
// no UTF-8, without the text.
class CaseTest : public ::testing::Test {
 public:
  CaseTest(const Json& contract_case, std::function<void()> body)
      : case_(contract_case), body_(std::move(body)) {}

  void TestBody() override {
    if (support::has_address_sanitizer()) {  // its report ends the process, and is to be seen
      body_();
      return;
    }
    ::testing::internal::CaptureStderr();
    body_();
    const std::string said = ::testing::internal::GetCapturedStderr();
    const Json flags = case_.value("flags", Json::array());
    const bool has_no_utf8 = std::find(flags.begin(), flags.end(), "no-utf8") != flags.end();
    const std::string expected = case_.value("throws", has_no_utf8 ? "invalid UTF-8" : "");
    EXPECT_TRUE(said.empty() || (!expected.empty() && said.find(expected) != std::string::npos))
        << said;
    EXPECT_EQ(said.find('\xff'), std::string::npos) << said;
  }

 private:
  const Json& case_;
  const std::function<void()> body_;
};

void expect_no_problems(const CaseRun& run) {
  for (const std::string& problem : run.problems()) {
    ADD_FAILURE() << problem;
  }
}

void run(const Json& contract_case, const Course& course, const MakeRun& make_run) {
  const auto run = make_run(contract_case, course, 0);
  if (ends_process(course)) {
    run->execute_in_child();
  } else {
    run->execute();
  }
  expect_no_problems(*run);
}

void refuse_blocks(const Json& contract_case, const Course& course, const MakeRun& make_run) {
  for (int n = 0; n < blocks_of(course); ++n) {
    SCOPED_TRACE("without block " + std::to_string(n));
    run(contract_case, course_without_block(course, n), make_run);
  }
}

void refuse_news(const Json& contract_case, const Course& course, const MakeRun& make_run) {
  bool has_refused = true;
  for (int n = 1; has_refused; ++n) {
    SCOPED_TRACE("without block " + std::to_string(n) + " of operator new");
    const auto run = make_run(contract_case, course, n);
    run->execute();
    expect_no_problems(*run);
    has_refused = run->has_refused_new() && run->problems().empty();
  }
}

std::string identifier(std::string name) {
  for (char& c : name) {
    c = std::isalnum(static_cast<unsigned char>(c)) != 0 ? c : '_';
  }
  return name;
}

}  // namespace

void add_case_tests(const Json& contract_case, const Course& course, const MakeRun& make_run) {
  const std::string function = contract_case.at("call");
  const auto add = [&](const std::string& suite, auto body) {
    ::testing::RegisterTest(
        suite.c_str(), identifier(contract_case.at("case")).c_str(), nullptr, nullptr, __FILE__,
        __LINE__, [&contract_case, course, make_run, body]() -> CaseTest* {
          return new CaseTest(contract_case, [&contract_case, course, make_run, body] {
            body(contract_case, course, make_run);
          });
        });
  };
  add(function, run);
  if (blocks_of(course) > 0) {
    add(function + "/each_block_refused", refuse_blocks);
  }
  if (!ends_process(course) && !contract_case.contains("flags")) {
    add(function + "/each_new_refused", refuse_news);
  }
}

}  // namespace contract
