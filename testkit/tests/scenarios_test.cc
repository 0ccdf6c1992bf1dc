// The scenarios that come with the kit: plug-ins without mistakes play them all, and each mistake
// is found by one.

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <tuple>
#include <vector>

#include "play.h"
#include "support/process_death.h"

// Of the leak checker, where the tests are built with one.
extern "C" [[gnu::weak]] void __lsan_do_leak_check();

namespace {

std::string report_of(const std::string& scenario, bug_t bug, manner_t manner = ONE_BY_ONE) {
  std::ifstream file(QEL_SCENARIOS "/" + scenario + ".scenario");
  EXPECT_TRUE(file.good()) << scenario;
  const std::string text{std::istreambuf_iterator<char>(file), {}};
  const int left_out = scenario == "count-without-array" ? 1 << STEP_INVITE : 0;
  return Play(qel_testkit_new(text.c_str()), bug, manner, left_out).run();
}

std::vector<std::string> all_scenarios() {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(QEL_SCENARIOS)) {
    names.push_back(entry.path().stem());
  }
  return names;
}

std::string test_name(std::string text) {
  for (char& c : text) {
    c = c == '-' ? '_' : c;
  }
  return text;
}

class ShippedScenario : public ::testing::TestWithParam<std::tuple<std::string, manner_t>> {};

TEST_P(ShippedScenario, WithAPluginWithoutMistakes_HasNothingToReport) {
  const auto& [scenario, manner] = GetParam();
  EXPECT_EQ(report_of(scenario, BUG_NONE, manner), "");
}

INSTANTIATE_TEST_SUITE_P(Each, ShippedScenario,
                         ::testing::Combine(::testing::ValuesIn(all_scenarios()),
                                            ::testing::Values(ONE_BY_ONE, ALL_AT_ONCE)),
                         [](const auto& row) {
                           const bool is_first = std::get<manner_t>(row.param) == ONE_BY_ONE;
                           return test_name(std::get<std::string>(row.param)) +
                                  (is_first ? "_one_by_one" : "_all_at_once");
                         });

struct Mistake {
  bug_t bug;
  const char* scenario;
  const char* report;  // what its first line has
};

const Mistake kMistakes[] = {
    {BUG_SAME_ID_AGAIN, "unanswered",
     "ChatRequest, is wrong: its requestId 5 is that of another request"},
    {BUG_WAITS_FOR_EVER, "unanswered", "expects an EndChatRequest, which never came"},
    {BUG_USER_AND_DEVICE_SWAPPED, "connection", "its userId is 77"},
    {BUG_ANOTHER_USER, "connection", "its userId is 6001"},
    {BUG_EMPTY_APP_ID, "connection", "its appId is empty"},
    {BUG_LOGIN_NOT_AWAITED, "connection",
     "CurrentTimeRequest, is wrong: it comes before the login was granted"},
    {BUG_FAILED_LOGIN_IS_SUCCESS, "refused-login",
     "CurrentTimeRequest, is wrong: it comes before the login was granted"},
    {BUG_FAILURE_IS_SUCCESS, "refused-chatroom",
     "AllowChatRequest, is wrong: there is no chatroom 50"},
    {BUG_BROKEN_IS_SUCCESS, "broken-reply", "AllowChatRequest, is wrong: there is no chatroom 0"},
    {BUG_REFUSED_USERS_ARE_FAILURE, "refused-receivers",
     "expects an AllowChatRequest, which never came"},
    {BUG_TEXT_IS_REQUIRED, "result-without-text", "expects a ChatRequest, which never came"},
    {BUG_WHOLE_REPLY_IS_REQUIRED, "creating", "chatroomId is 51 instead of 50"},
    {BUG_WHOLE_REPLY_IS_REQUIRED, "entering", "expects a ChatRequest, which never came"},
    {BUG_WHOLE_REPLY_IS_REQUIRED, "changing", "No InviteRequest came within 2000 ms"},
    {BUG_DEAF_AFTER_GIVING_UP, "late-answer", "expects a ClientEchoReply, which never came"},
    {BUG_ANY_LOGIN_FITS, "another-request",
     "CurrentTimeRequest, is wrong: it comes before the login was granted"},
    {BUG_ANY_CHATROOM_FITS, "another-request",
     "AllowChatRequest, is wrong: there is no chatroom 666"},
    {BUG_ANY_CHAT_REPLY_FITS, "another-request", "EndChatRequest, is one too many"},
    {BUG_ANY_CHANGE_FITS, "answered-twice", "InviteRequest, is one too many"},
    {BUG_ECHO_UNANSWERED, "connection", "expects a ClientEchoReply, which never came"},
    {BUG_ECHO_WITH_ANOTHER_ID, "connection", "ClientEchoReply, is wrong: it answers nothing"},
    {BUG_ECHO_ANSWERED_TWICE, "connection", "the requestId 700001 was answered before"},
    {BUG_ECHO_OF_ITS_OWN, "connection", "ClientEcho, is wrong: a plug-in does not send it"},
    {BUG_ONLY_TEXTS_ARE_ACKNOWLEDGED, "pushes",
     "The ForwardOnlineMessage with the requestId 700001 was not answered"},
    {BUG_SKIPPED_IS_ACKNOWLEDGED, "pushes", "the requestId 700002 wants no answer"},
    {BUG_ACKNOWLEDGED_TWICE, "pushes", "the requestId 700001 was answered before"},
    {BUG_ACKNOWLEDGED_ELSEWHERE, "pushes",
     "but that of the message with the requestId 700001 is 42"},
    {BUG_BROKEN_IS_ACKNOWLEDGED, "broken-delivery",
     "ForwardOnlineMessageReply, is wrong: it answers nothing"},
    {BUG_SENDER_OF_BEFORE, "receipts",
     "ReadMessageRequest, is wrong: there is no message 8102 of the user 6001"},
    {BUG_PAGE_KEY_LOST, "unread",
     "nextPaginationKey is missing, which should be \"the second page\""},
    {BUG_PAGES_WITHOUT_END, "endless-pages", "ForwardUnreadMessageReply, is one too many"},
    {BUG_MESSAGE_ID_0, "chat", "its msgId is 0"},
    {BUG_SAME_MESSAGE_ID, "chat", "its msgId 9001 is that of another message"},
    {BUG_EMPTY_TEXT, "chat", "its text is empty"},
    {BUG_TEXT_IN_LATIN_1, "chat", "chatMsg is not UTF-8"},
    {BUG_NEGATIVE_LIFETIME, "chat", "its msgTtl -1 is negative"},
    {BUG_UNKNOWN_IS_UNSEALED, "receipts", "there is no message 9003 of the user 6002"},
    {BUG_UNSEALED_SWAPPED, "receipts", "there is no message 6002 of the user 8003"},
    {BUG_CALL_SWAPPED, "typing-and-calls", "sender is 6001 instead of 5001"},
    {BUG_CALL_IN_MILLISECONDS, "typing-and-calls", "conversationSeconds is 60000 instead of 60"},
    {BUG_TYPING_WITHOUT_STATE, "typing-and-calls", "state is missing"},
    {BUG_NOBODY_INVITED, "ending-and-inviting", "it has the user 0"},
    {BUG_LEAVES_ANOTHER_CHATROOM, "ending-and-inviting", "chatroomId is 42 instead of 50"},
    {BUG_LEAVES_NO_CHATROOM, "ending-and-inviting",
     "EndChatRequest, is wrong: there is no chatroom 0"},
    {BUG_COUNT_WITHOUT_ARRAY, "count-without-array", "InviteRequest, is one too many"},
};

// What follows from a mistake comes behind it.
std::string first_line(const std::string& report) {
  return report.substr(0, report.find('\n'));
}

class PlantedMistake : public ::testing::TestWithParam<Mistake> {};

TEST_P(PlantedMistake, IsSaidInTheFirstLineOfTheReport) {
  const std::string line = first_line(report_of(GetParam().scenario, GetParam().bug));
  EXPECT_NE(line.find(GetParam().report), std::string::npos) << line;
}

TEST_P(PlantedMistake, IsFoundInAPluginOfAnotherManner) {
  EXPECT_NE(report_of(GetParam().scenario, GetParam().bug, ALL_AT_ONCE), "");
}

INSTANTIATE_TEST_SUITE_P(Each, PlantedMistake, ::testing::ValuesIn(kMistakes), [](const auto& row) {
  return test_name(row.param.scenario) + "_" + std::to_string(row.param.bug);
});

TEST(PlantedMistakeOfOneManner, AMessageRepeatedUnderAnotherId_IsSaidInTheFirstLineOfTheReport) {
  const std::string line = first_line(report_of("unanswered", BUG_REPEATED_AS_ANOTHER));
  EXPECT_NE(line.find("it has the text of the message 9001"), std::string::npos) << line;
}

TEST(PlantedMistakeDeathTest, OfANumberOutsideItsEnumeration_EndsTheProcess) {
  EXPECT_EXIT(report_of("typing-and-calls", BUG_NUMBER_OUTSIDE_ENUMERATION), support::aborts,
              support::refused_by_setter("IsTyping", "contenttype", "IsTypingContentType"));
}

TEST(PlantedMistakeDeathTest, OfLostMemory_IsReportedByTheLeakChecker) {
  if (__lsan_do_leak_check == nullptr) {
    GTEST_SKIP() << "no leak checker";
  }
  const auto play = [] {
    report_of("chat", BUG_MEMORY_LOST);
    __lsan_do_leak_check();
  };
  EXPECT_DEATH(play(), "detected memory leaks");
}

}  // namespace
