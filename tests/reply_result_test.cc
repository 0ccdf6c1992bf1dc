// The outcome that a reply carries, a code and a text. All replies but the channel
// authentication's hand it out alike.

#include <ostream>

#include "support/exchange.h"
#include "support/outputs.h"

namespace {

using support::ExchangeTest;
using support::kIntSentinel;
using support::kLargestInt;
using support::kSmallestInt;
using support::TextOutput;
using support::Wire;

template <typename Outputs>
void read(const std::string& bytes, int* code, char** text) {
  Outputs().read(bytes, code, text);
}

struct Reply {
  std::string name;
  int result_field;
  void (*read)(const std::string& bytes, int* code, char** text);
};

void PrintTo(const Reply& reply, std::ostream* out) {
  *out << reply.name;
}

const Reply kTestingTheCode[] = {
    {"create_chatroom_reply_deserialize", 13, read<support::CreateChatroomReplyOutputs>},
    {"chat_reply_deserialize", 13, read<support::ChatReplyOutputs>},
    {"get_all_unread_message_reply_deserialize", 12,
     read<support::GetAllUnreadMessageReplyOutputs>},
    {"read_message_reply_deserialize", 13, read<support::ReadMessageReplyOutputs>},
    {"end_chat_reply_deserialize", 12, read<support::EndChatReplyOutputs>},
    {"invite_reply_deserialize", 13, read<support::InviteReplyOutputs>},
    {"current_time_deserialize", 12, read<support::CurrentTimeOutputs>},
    {"unseal_message_reply_deserialize", 13, read<support::UnsealMessageReplyOutputs>},
    {"save_call_log_reply_deserialize", 13, read<support::SaveCallLogReplyOutputs>},
    {"change_chatroom_meta_reply_deserialize", 13, read<support::ChangeChatroomMetaReplyOutputs>},
};
// Its pointer for the code is required.
const Reply kNotTestingTheCode[] = {
    {"allow_chat_reply_deserialize", 13, read<support::AllowChatReplyOutputs>},
};

class ReplyResult : public ExchangeTest, public testing::WithParamInterface<Reply> {
 protected:
  int code_ = kIntSentinel;
  TextOutput text_;

  void read_result(const Wire& result) { read_result(result, &code_, &text_.block); }
  static void read_result(const Wire& result, int* code, char** text) {
    GetParam().read(Wire().message(GetParam().result_field, result).bytes(), code, text);
  }
};

TEST_P(ReplyResult, WhenAbsent_LeavesCodeAndText) {
  GetParam().read(Wire().number(11, 7).bytes(), &code_, &text_.block);
  EXPECT_EQ(code_, kIntSentinel);
  EXPECT_TRUE(text_.untouched());
}

TEST_P(ReplyResult, WhenEmpty_WritesCodeZeroAndLeavesText) {
  read_result(Wire());
  EXPECT_EQ(code_, 0);
  EXPECT_TRUE(text_.untouched());
}

TEST_P(ReplyResult, WhenTextIsAbsent_WritesCodeAndLeavesText) {
  read_result(Wire().number(1, 5));
  EXPECT_EQ(code_, 5);
  EXPECT_TRUE(text_.untouched());
}

TEST_P(ReplyResult, WhenCodeIsAbsent_WritesZeroAndText) {
  read_result(Wire().text(2, "no"));
  EXPECT_EQ(code_, 0);
  EXPECT_STREQ(text_.block, "no");
}

TEST_P(ReplyResult, WhenCodeIsSmallest_WritesIt) {
  read_result(Wire().number(1, kSmallestInt));
  EXPECT_EQ(code_, kSmallestInt);
}

TEST_P(ReplyResult, WhenCodeIsLargest_WritesIt) {
  read_result(Wire().number(1, kLargestInt));
  EXPECT_EQ(code_, kLargestInt);
}

TEST_P(ReplyResult, WhenTextIsEmptyButPresent_WritesEmptyText) {
  read_result(Wire().text(2, ""));
  EXPECT_STREQ(text_.block, "");
}

TEST_P(ReplyResult, WhenTextIsLong_CopiesAllOfIt) {
  const std::string text(5000, 'x');
  read_result(Wire().text(2, text));
  EXPECT_EQ(text_.block, text);
}

TEST_P(ReplyResult, WhenTextHoldsANul_CopiesUpToIt) {
  read_result(Wire().text(2, std::string("a\0b", 3)));
  EXPECT_STREQ(text_.block, "a");
}

TEST_P(ReplyResult, WhenResultMsgIsNull_WritesCode) {
  read_result(Wire().number(1, 5).text(2, "no"), &code_, nullptr);
  EXPECT_EQ(code_, 5);
}

INSTANTIATE_TEST_SUITE_P(TestingTheCode, ReplyResult, testing::ValuesIn(kTestingTheCode),
                         [](const auto& row) { return row.param.name; });
INSTANTIATE_TEST_SUITE_P(NotTestingTheCode, ReplyResult, testing::ValuesIn(kNotTestingTheCode),
                         [](const auto& row) { return row.param.name; });

class ReplyResultTestingTheCode : public ReplyResult {};

TEST_P(ReplyResultTestingTheCode, WhenResultCodeIsNull_WritesText) {
  read_result(Wire().number(1, 5).text(2, "no"), nullptr, &text_.block);
  EXPECT_STREQ(text_.block, "no");
}

INSTANTIATE_TEST_SUITE_P(Replies, ReplyResultTestingTheCode, testing::ValuesIn(kTestingTheCode),
                         [](const auto& row) { return row.param.name; });

}  // namespace
