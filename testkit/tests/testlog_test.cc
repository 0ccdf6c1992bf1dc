// The collected log lines: of the library's own calls.

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "qel-message.h"
#include "qel-testlog.h"

extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

namespace {

class TestLog : public ::testing::Test {
 protected:
  TestLog() { qel_testlog_clear(); }
  ~TestLog() override { qel_testlog_clear(); }
};

TEST_F(TestLog, LibrarysLines_AreCollected) {
  const std::string too_long(40001, 'x');
  QEL_SCOPED(buffer, buffer);
  EXPECT_EQ(qel_chat_request_write(&buffer, 1, 2, 3, QEL_MSG_TYPE_TEXT, too_long.c_str(), 0),
            QEL_BAD_ARGUMENT);
  EXPECT_EQ(qel_testlog_count("E MESSAGE_PLUGIN: "), 1);
}

TEST_F(TestLog, Find_ReturnsTheFirstLineWithItsPriorityAndTag) {
  __dlog_print(0, 6, "TAG", "%s\n", "one");
  __dlog_print(0, 3, "TAG", "%d", 2);
  EXPECT_STREQ(qel_testlog_find("TAG"), "E TAG: one");
  EXPECT_STREQ(qel_testlog_find("2"), "D TAG: 2");
  EXPECT_EQ(qel_testlog_find("three"), nullptr);
}

TEST_F(TestLog, Count_IsOfAllLinesOrOfThoseWithTheText) {
  __dlog_print(0, 3, "TAG", "one");
  __dlog_print(0, 99, "TAG", "one and two");
  EXPECT_EQ(qel_testlog_count(nullptr), 2);
  EXPECT_EQ(qel_testlog_count("two"), 1);
}

TEST_F(TestLog, Clear_ForgetsAllLines) {
  __dlog_print(0, 3, "TAG", "one");
  qel_testlog_clear();
  __dlog_print(0, 3, "TAG", "two");
  EXPECT_EQ(qel_testlog_count(nullptr), 1);
}

TEST_F(TestLog, LinesOfSeveralThreads_AreAllKept) {
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      for (int line = 0; line < 1000; ++line) {
        __dlog_print(0, 3, "TAG", "line %d", line);
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(qel_testlog_count(nullptr), 4000);
}

}  // namespace
