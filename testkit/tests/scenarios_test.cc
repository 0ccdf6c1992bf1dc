// The scenarios that come with the kit: each of a plug-in's mistakes is found by one, and a plug-in
// without mistakes plays them all.

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "play.h"

namespace {

std::string report_of(const std::string& scenario, bug_t bug) {
  std::ifstream file(QEL_SCENARIOS "/" + scenario + ".scenario");
  EXPECT_TRUE(file.good()) << scenario;
  const std::string text{std::istreambuf_iterator<char>(file), {}};
  return Play(qel_testkit_new(text.c_str()), bug).run();
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

class ShippedScenario : public ::testing::TestWithParam<std::string> {};

TEST_P(ShippedScenario, WithAPluginWithoutMistakes_HasNothingToReport) {
  EXPECT_EQ(report_of(GetParam(), BUG_NONE), "");
}

INSTANTIATE_TEST_SUITE_P(Each, ShippedScenario, ::testing::ValuesIn(all_scenarios()),
                         [](const auto& row) { return test_name(row.param); });

struct Mistake {
  bug_t bug;
  const char* scenario;
  const char* report;
};

const Mistake kMistakes[] = {
    {BUG_ECHO_UNANSWERED, "connection", "Line 7 expects a ClientEchoReply, which never came."},
    {BUG_ECHO_WITH_ANOTHER_ID, "connection",
     "Message 3 of the plug-in, a ClientEchoReply, is wrong: it answers nothing: no such message "
     "with the requestId 2 was sent."},
    {BUG_FAILURE_IS_SUCCESS, "refused-login",
     "Message 2 of the plug-in, a CurrentTimeRequest, is not expected: the scenario is over."},
    {BUG_BROKEN_IS_SUCCESS, "broken-reply",
     "Message 4 of the plug-in, an AllowChatRequest, is one too many: line 5 allows 0."},
    {BUG_REFUSED_USERS_ARE_FAILURE, "refused-receivers",
     "Line 15 expects an AllowChatRequest, which never came."},
    {BUG_COUNT_WITHOUT_ARRAY, "count-without-array",
     "Message 4 of the plug-in, an InviteRequest, is one too many: line 7 allows 0."},
    {BUG_ANY_REPLY_FITS, "another-request",
     "Message 4 of the plug-in, an AllowChatRequest, is one too many: line 6 allows 0."},
    {BUG_ANY_REPLY_FITS, "answered-twice",
     "Message 14 of the plug-in, an InviteRequest, is one too many: line 8 allows 0."},
    {BUG_TEXT_IS_REQUIRED, "result-without-text",
     "No ChatRequest came within 1000 ms, as line 6 expects."},
    {BUG_ONLY_TEXTS_ARE_ACKNOWLEDGED, "pushes",
     "The ForwardOnlineMessage with the requestId 700001 was not answered by a "
     "ForwardOnlineMessageReply."},
    {BUG_SKIPPED_IS_ACKNOWLEDGED, "pushes",
     "Message 5 of the plug-in, a ForwardOnlineMessageReply, is wrong: it answers nothing: no such "
     "message with the requestId 700002 was sent."},
    {BUG_SENDER_OF_BEFORE, "receipts",
     "Message 8 of the plug-in, a ReadMessageRequest, is not what line 17 expects: "
     "inboxEntry.sender is 6001 instead of 0."},
    {BUG_PAGE_KEY_LOST, "unread",
     "Message 7 of the plug-in, a ForwardUnreadMessageReply, is not what line 13 expects: "
     "nextPaginationKey is missing, which should be \"the second page\"."},
    {BUG_PAGES_WITHOUT_END, "endless-pages",
     "Message 57 of the plug-in, a ForwardUnreadMessageReply, is one too many: line 6 allows 50."},
    {BUG_SAME_ID_AGAIN, "late-answer",
     "Message 6 of the plug-in, a ChatRequest, is wrong: its requestId 5 is not above the one "
     "before, which was 5."},
};

class PlantedMistake : public ::testing::TestWithParam<Mistake> {};

TEST_P(PlantedMistake, IsFoundByAShippedScenario) {
  const std::string report = report_of(GetParam().scenario, GetParam().bug);
  EXPECT_EQ(report.substr(0, report.find('\n')),
            GetParam().report);  // what follows from it follows it
}

INSTANTIATE_TEST_SUITE_P(Each, PlantedMistake, ::testing::ValuesIn(kMistakes), [](const auto& row) {
  return test_name(row.param.scenario) + "_" + std::to_string(row.param.bug);
});

}  // namespace
