// Every case of the contract.

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <memory>
#include <set>
#include <stdexcept>
#include <string>

#include "case_tests.h"
#include "cases.h"
#include "run.h"

namespace {

using contract::CaseRun;
using contract::Course;
using contract::Json;
using contract::Step;

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

std::unique_ptr<CaseRun> make_run(const Json& contract_case, const Course& course,
                                  int refused_new) {
  return std::make_unique<CaseRun>(contract_case, course, refused_new);
}

}  // namespace

int main(int argc, char** argv) {
  ::testing::InitGoogleTest(&argc, argv);
  for (const Json& contract_case : contract::cases()) {
    contract::add_case_tests(contract_case, contract::course_of(contract_case), make_run);
  }
  return RUN_ALL_TESTS();
}
