// The replies that hand out ids and a result alone. The functions behave alike: one row of a table
// for each.

#include <algorithm>
#include <iterator>
#include <ostream>
#include <vector>

#include "qel-message-serialize.h"
#include "support/exchange.h"
#include "support/process_death.h"

namespace {

using support::ExchangeTest;
using support::hex;
using support::kIntSentinel;
using support::kLargest;
using support::kLargestInt;
using support::kLongSentinel;
using support::kSmallest;
using support::kSmallestInt;
using support::Received;
using support::TextOutput;
using support::Wire;

// For those that do not hand out the chatroom's id.
template <auto Deserialize>
void without_chatroom(const unsigned char* data, int size, int64_t* request_id,
                      int64_t* /*chatroom_id*/, int* code, char** text) {
  Deserialize(data, size, request_id, code, text);
}

struct PlainReply {
  std::string name;
  bool hands_out_chatroom;
  int result_field;
  // A message with all its fields: userId 9, deviceId 8, requestId 7, chatroomId 6 where it has
  // one, result { code 3, msg "no", wrongReceiverDetail { invalidReceivers 1 }, subCode 4 }.
  std::string whole;
  void (*call)(const unsigned char* data, int size, int64_t* request_id, int64_t* chatroom_id,
               int* code, char** text);
};

const PlainReply kReplies[] = {
    {"get_all_unread_message_reply_deserialize", false, 12,
     hex("08 09 10 08 58 07 62 0c 08 03 12 02 6e 6f 1a 02 08 01 20 04"),
     without_chatroom<get_all_unread_message_reply_deserialize>},
    {"read_message_reply_deserialize", true, 13,
     hex("08 09 10 08 58 07 60 06 6a 0c 08 03 12 02 6e 6f 1a 02 08 01 20 04"),
     read_message_reply_deserialize},
    {"end_chat_reply_deserialize", false, 12,
     hex("08 09 10 08 58 07 62 0c 08 03 12 02 6e 6f 1a 02 08 01 20 04"),
     without_chatroom<end_chat_reply_deserialize>},
    {"unseal_message_reply_deserialize", true, 13,
     hex("08 09 10 08 58 07 60 06 6a 0c 08 03 12 02 6e 6f 1a 02 08 01 20 04"),
     unseal_message_reply_deserialize},
    {"save_call_log_reply_deserialize", false, 13,
     hex("08 09 10 08 58 07 60 06 6a 0c 08 03 12 02 6e 6f 1a 02 08 01 20 04"),
     without_chatroom<save_call_log_reply_deserialize>},
    // And changeTimeMillis 300.
    {"change_chatroom_meta_reply_deserialize", true, 13,
     hex("08 09 10 08 58 07 60 06 6a 0c 08 03 12 02 6e 6f 1a 02 08 01 20 04 70 ac 02"),
     change_chatroom_meta_reply_deserialize},
};

void PrintTo(const PlainReply& reply, std::ostream* out) {
  *out << reply.name;
}

class PlainReplyDeserialize : public ExchangeTest,
                              public ::testing::WithParamInterface<PlainReply> {
 protected:
  const PlainReply& reply_ = GetParam();
  int64_t request_id_ = kLongSentinel;
  int64_t chatroom_id_ = kLongSentinel;
  int code_ = kIntSentinel;
  TextOutput text_;

  void read(const std::string& bytes) {
    read(bytes, &request_id_, &chatroom_id_, &code_, &text_.block);
  }
  void read(const std::string& bytes, int64_t* request_id, int64_t* chatroom_id, int* code,
            char** text) const {
    const Received received(bytes);
    reply_.call(received.data(), received.size(), request_id, chatroom_id, code, text);
  }

  void expect_ids(int64_t request_id, int64_t chatroom_id) const {
    EXPECT_EQ(request_id_, request_id);
    EXPECT_EQ(chatroom_id_, reply_.hands_out_chatroom ? chatroom_id : kLongSentinel);
  }
};

TEST_P(PlainReplyDeserialize, WhenReplyIsWhole_WritesIdsAndResult) {
  read(reply_.whole);
  expect_ids(7, 6);
  EXPECT_EQ(code_, 3);
  EXPECT_STREQ(text_.block, "no");
}

TEST_P(PlainReplyDeserialize, WhenReplyIsWhole_LogsEntryAndExitAlone) {
  read(reply_.whole);
  support::expect_log(reply_.name, {support::warn("%s: start", {reply_.name}),
                                    support::warn("%s: exit", {reply_.name})});
}

TEST_P(PlainReplyDeserialize, WhenValuesAreSmallest_WritesThem) {
  const Wire result = Wire().number(1, kSmallestInt);
  read(Wire()
           .number(11, kSmallest)
           .number(12, kSmallest + 1)
           .message(reply_.result_field, result)
           .bytes());
  expect_ids(kSmallest, kSmallest + 1);
  EXPECT_EQ(code_, kSmallestInt);
}

TEST_P(PlainReplyDeserialize, WhenValuesAreLargest_WritesThem) {
  const Wire result = Wire().number(1, kLargestInt);
  read(Wire()
           .number(11, kLargest)
           .number(12, kLargest - 1)
           .message(reply_.result_field, result)
           .bytes());
  expect_ids(kLargest, kLargest - 1);
  EXPECT_EQ(code_, kLargestInt);
}

TEST_P(PlainReplyDeserialize, WhenInputIsEmpty_WritesZeroIdsAlone) {
  read("");
  expect_ids(0, 0);
  EXPECT_EQ(code_, kIntSentinel);
  EXPECT_TRUE(text_.untouched());
}

TEST_P(PlainReplyDeserialize, WhenResultIsAbsent_LeavesCodeAndText) {
  read(hex("08 09 10 08 58 07"));
  expect_ids(7, 0);
  EXPECT_EQ(code_, kIntSentinel);
  EXPECT_TRUE(text_.untouched());
}

TEST_P(PlainReplyDeserialize, WhenResultCodeIsNull_WritesTheOthers) {
  read(reply_.whole, &request_id_, &chatroom_id_, nullptr, &text_.block);
  expect_ids(7, 6);
  EXPECT_STREQ(text_.block, "no");
}

TEST_P(PlainReplyDeserialize, WhenResultMsgIsNull_WritesTheOthers) {
  read(reply_.whole, &request_id_, &chatroom_id_, &code_, nullptr);
  expect_ids(7, 6);
  EXPECT_EQ(code_, 3);
}

TEST_P(PlainReplyDeserialize, WhenResultCodeAndResultMsgAreNull_WritesTheIds) {
  read(reply_.whole, &request_id_, &chatroom_id_, nullptr, nullptr);
  expect_ids(7, 6);
}

TEST_P(PlainReplyDeserialize, WhenRequestIdIsNull_Faults) {
  EXPECT_EXIT(read("", nullptr, &chatroom_id_, &code_, &text_.block), support::faults, "");
}

INSTANTIATE_TEST_SUITE_P(Replies, PlainReplyDeserialize, ::testing::ValuesIn(kReplies),
                         [](const auto& row) { return row.param.name; });

// Those that hand out the chatroom's id.
class PlainReplyWithChatroomDeserialize : public PlainReplyDeserialize {};

std::vector<PlainReply> replies_with_chatroom() {
  std::vector<PlainReply> replies;
  std::copy_if(std::begin(kReplies), std::end(kReplies), std::back_inserter(replies),
               [](const PlainReply& reply) { return reply.hands_out_chatroom; });
  return replies;
}

TEST_P(PlainReplyWithChatroomDeserialize, WhenRequestIdIsAbsent_WritesZeroAndChatroomId) {
  read(hex("60 06"));
  expect_ids(0, 6);
}

TEST_P(PlainReplyWithChatroomDeserialize, WhenChatroomIdIsNull_Faults) {
  EXPECT_EXIT(read("", &request_id_, nullptr, &code_, &text_.block), support::faults, "");
}

INSTANTIATE_TEST_SUITE_P(Replies, PlainReplyWithChatroomDeserialize,
                         ::testing::ValuesIn(replies_with_chatroom()),
                         [](const auto& row) { return row.param.name; });

}  // namespace
