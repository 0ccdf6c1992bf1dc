// The length of the encoded message: one below 1 is refused, and it is computed once. Every request
// carries at least its id, so the test replaces what the runtime answers for the length of an id;
// in a program of its own, because that concerns every call.

#include <google/protobuf/io/coded_stream.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>

#include "cases.h"
#include "qel-message.h"
#include "run.h"

namespace {

int added_to_next_id = 0;
int64_t counted_id = 0;
int times_measured = 0;

}  // namespace

// In the program itself, so that the library's calls come here.
int google::protobuf::io::CodedOutputStream::VarintSize64(google::protobuf::uint64 value) {
  times_measured += value == static_cast<google::protobuf::uint64>(counted_id) ? 1 : 0;
  int length = added_to_next_id;
  added_to_next_id = 0;
  for (; value >= 0x80; value >>= 7) {
    ++length;
  }
  return length + 1;
}

namespace {

using contract::CaseRun;
using contract::Course;
using contract::Json;
using contract::Step;

// Where the course stores the length.
std::vector<Step>::iterator length_in(Course* course) {
  return std::find_if(course->steps.begin(), course->steps.end(), [](const Step& step) {
    return step.kind == Step::kWrite && step.what.contains("size");
  });
}

// What a call does whose message reports this length: most say so and return -1, one has no check
// and asks for a block of it, which is refused.
Course course_with_length(Course course, int length) {
  const auto stored = length_in(&course);
  stored->what["size"] = length;
  const bool is_checked = course.end.contains("returns");
  if (is_checked) {
    course.steps.erase(stored + 1, course.steps.end());
    Step line = {Step::kLine, {"Invalid serialized data size : %d", length}};
    line.priority = 6;
    course.steps.push_back(line);
    course.end = {{"returns", -1}};
    return course;
  }
  (stored + 1)->what["count"] = static_cast<size_t>(length);
  return course_without_block(course, 0);
}

void expect_course(const Json& contract_case, const Course& course) {
  CaseRun run(contract_case, course);
  run.execute();
  added_to_next_id = 0;
  for (const std::string& problem : run.problems()) {
    ADD_FAILURE() << contract_case["call"] << ", " << contract_case["case"] << ": " << problem;
  }
}

// Of every successful call of a serializer. Returns the functions.
template <typename Check>
std::set<std::string> for_each_encoding(Check check) {
  std::set<std::string> functions;
  for (const Json& contract_case : contract::cases()) {
    Course course = contract::course_of(contract_case);
    if (length_in(&course) != course.steps.end() && !course.end.contains("faults")) {
      functions.insert(contract_case["call"]);
      check(contract_case, course);
    }
  }
  EXPECT_FALSE(functions.empty());
  return functions;
}

TEST(MessageLength, WhenBelowOne_IsStoredAndRefused) {
  for_each_encoding([](const Json& contract_case, Course course) {
    const int length = length_in(&course)->what["size"];
    for (const int reported : {0, -5}) {
      added_to_next_id = reported - length;
      expect_course(contract_case, course_with_length(course, reported));
    }
  });
}

TEST(MessageLength, WhenOne_IsTakenForALength) {
  for_each_encoding([](const Json& contract_case, Course course) {
    const auto stored = length_in(&course);
    added_to_next_id = 1 - stored->what["size"].get<int>();
    stored->what["size"] = 1;
    (stored + 1)->what["count"] = 1;
    // Without the block, since no message is that short.
    expect_course(contract_case, course_without_block(course, 0));
  });
}

TEST(MessageLength, WhenBelowZero_TheHeaderSaysThatTheMessageIsTooLong) {
  qel_buffer_t buffer = {};
  added_to_next_id = -10;
  EXPECT_EQ(qel_client_echo_reply_write(&buffer, 1), QEL_TOO_LONG);
  EXPECT_EQ(buffer.size, 0);
  added_to_next_id = -10;
  EXPECT_EQ(qel_is_typing_request_write(&buffer, 1, 2, nullptr, nullptr, nullptr), QEL_TOO_LONG);
  EXPECT_EQ(buffer.size, 0);
}

// Seen where no other argument is the same number.
TEST(MessageLength, WhenTheCallSucceeds_IsComputedOnce) {
  std::set<std::string> seen;
  const std::set<std::string> all =
      for_each_encoding([&](const Json& contract_case, const Course& course) {
        const Json arguments = contract_case.value("given", Json::object()).flatten();
        const Json id = arguments.value("/requestId", Json());
        if (!id.is_number() || std::count(arguments.begin(), arguments.end(), id) != 1) {
          return;
        }
        seen.insert(contract_case["call"]);
        counted_id = id;
        times_measured = 0;
        expect_course(contract_case, course);
        EXPECT_EQ(times_measured, 1) << contract_case["call"] << ", " << contract_case["case"];
      });
  EXPECT_EQ(seen, all);
}

}  // namespace
