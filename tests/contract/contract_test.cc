// Every case of the contract: as it is, and with each block that it asks for refused in turn.

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <fstream>
#include <functional>
#include <set>
#include <stdexcept>
#include <string>

#include "cases.h"
#include "run.h"
#include "support/address_sanitizer.h"

namespace {

using contract::CaseRun;
using contract::Course;
using contract::Json;
using contract::Step;

// Besides the log nothing is said, but by the runtime: of a check that failed, and that a text is
// no UTF-8, without the text.
class ContractTest : public ::testing::Test {
 public:
  ContractTest(const Json& contract_case, std::function<void()> body)
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

bool ends_process(const Course& course) {
  return course.end.contains("aborts") || course.end.contains("faults");
}

void run(const Json& contract_case, const Course& course) {
  CaseRun run(contract_case, course);
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
    CaseRun run(contract_case, course, n);
    run.execute();
    expect_no_problems(run);
    has_refused = run.has_refused_new() && run.problems().empty();
  }
}

TEST(Contract, HasCasesOfTheFunctionsThatAreExported) {
  std::set<std::string> with_cases;
  for (const Json& contract_case : contract::cases()) {
    with_cases.insert(contract_case.at("call"));
  }
  std::ifstream list(QEL_FUNCTIONS);
  std::set<std::string> exported;
  for (std::string function; std::getline(list, function, ';');) {
    exported.insert(function);
  }
  EXPECT_EQ(with_cases, exported);
}

// Whether the case comes to a block of operator new.
bool allocates(const std::string& function, const std::string& name) {
  for (const Json& contract_case : contract::cases()) {
    if (contract_case["call"] == function && contract_case["case"] == name) {
      CaseRun run(contract_case, contract::course_of(contract_case), 1);
      run.execute();
      return run.has_refused_new();
    }
  }
  throw std::invalid_argument(function + " has no case: " + name);
}

TEST(Contract, ARefusedArgumentComesBeforeOrAfterTheMessageIsFilled) {
  EXPECT_TRUE(allocates("chat_request_serialize", "A type of -1 is refused"));
  EXPECT_TRUE(allocates("read_message_request_serialize", "A type of -1 is refused"));
  EXPECT_FALSE(allocates("create_chatroom_request_serialize", "Without receivers it is refused"));
}

TEST(Contract, WhatTheCasesCopy_IsCopiedThere) {
  std::set<std::string> copying;
  std::set<std::string> copied;
  for (const Json& contract_case : contract::cases()) {
    const Course course = contract::course_of(contract_case);
    const bool copies = std::any_of(course.steps.begin(), course.steps.end(),
                                    [](const Step& step) { return step.is_copy(); });
    const bool returns = !ends_process(course) && !course.end.contains("throws");
    if (copies && returns && !contract_case.contains("flags")) {
      copying.insert(contract_case["call"]);
      CaseRun run(contract_case, course);
      run.execute();
      if (run.has_copied()) {
        copied.insert(contract_case["call"]);
      }
    }
  }
  EXPECT_FALSE(copying.empty());
  EXPECT_EQ(copied, copying);
}

// The lines of all cases, and what has to be said of each.
void for_each_line(const std::function<void(const std::string& function, const Step& line)>& look) {
  for (const Json& contract_case : contract::cases()) {
    for (const Step& step : contract::course_of(contract_case).steps) {
      if (step.kind == Step::kLine) {
        look(contract_case["call"], step);
      }
    }
  }
}

TEST(Contract, LinesShowNoTextButTheFunctionsName) {
  for_each_line([](const std::string& function, const Step& line) {
    for (size_t i = 1; i < line.what.size(); ++i) {
      EXPECT_TRUE(line.what[i].is_number() || line.what[i] == function) << line.what;
    }
  });
}

TEST(Contract, IdsInTheLog_AreThoseOfRefusedUsersAndOfOneRequest) {
  std::set<std::string> functions;
  for_each_line([&](const std::string& function, const Step& line) {
    if (line.what[0].get<std::string>().find("%lld") != std::string::npos) {
      functions.insert(function);
    }
  });
  EXPECT_EQ(functions,
            (std::set<std::string>{"create_chatroom_reply_deserialize", "invite_reply_deserialize",
                                   "change_chatroom_meta_request_serialize"}));
}

std::string identifier(std::string name) {
  for (char& c : name) {
    c = std::isalnum(static_cast<unsigned char>(c)) != 0 ? c : '_';
  }
  return name;
}

void add_test(const std::string& suite, const Json& contract_case, const Course& course,
              void (*body)(const Json&, const Course&)) {
  const auto test = [&contract_case, course, body] { body(contract_case, course); };
  ::testing::RegisterTest(suite.c_str(), identifier(contract_case.at("case")).c_str(), nullptr,
                          nullptr, __FILE__, __LINE__, [&contract_case, test]() -> ContractTest* {
                            return new ContractTest(contract_case, test);
                          });
}

}  // namespace

int main(int argc, char** argv) {
  ::testing::InitGoogleTest(&argc, argv);
  for (const Json& contract_case : contract::cases()) {
    const std::string function = contract_case.at("call");
    const Course course = contract::course_of(contract_case);
    add_test(function, contract_case, course, run);
    if (blocks_of(course) > 0) {
      add_test(function + "/each_block_refused", contract_case, course, refuse_blocks);
    }
    if (!ends_process(course) && !contract_case.contains("flags")) {
      add_test(function + "/each_new_refused", contract_case, course, refuse_news);
    }
  }
  return RUN_ALL_TESTS();
}
