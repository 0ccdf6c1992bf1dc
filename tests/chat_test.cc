// Sending chat messages.

#include "support/exchange.h"
#include "support/heap.h"
#include "support/outputs.h"
#include "support/process_death.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::expect_log;
using support::FailingCalloc;
using support::HeapWatch;
using support::hex;
using support::IdListOutput;
using support::kIntSentinel;
using support::kLargest;
using support::kLargestInt;
using support::kSmallest;
using support::kSmallestInt;
using support::Received;
using support::TextOutput;
using support::to_hex;
using support::Wire;

// ---- chat_request_serialize

class ChatRequestSerialize : public ExchangeTest {
 protected:
  const std::string name_ = "chat_request_serialize";
  Encoded out_;

  void call(int64_t request, int64_t chatroom, int64_t id, int type, const char* text, int ttl,
            int reserved = 0) {
    out_.status = chat_request_serialize(request, chatroom, id, type, text, ttl, reserved,
                                         &out_.data.block, &out_.size);
  }
  void call_with_type(int type) { call(1, 2, 3, type, "x", 4); }
  void call_with_text(const char* text) { call(1, 2, 3, 0, text, 4); }

  // What call_with_type and call_with_text should make.
  static std::string expected(int type, const std::string& text) {
    const Wire param = Wire().number(1, 3).number(2, type).text(3, text).number(4, 4);
    return Wire().number(11, 1).number(12, 2).message(13, param).bytes();
  }

  // The call failed at a check of its arguments.
  void expect_refused(const support::Line& reason) {
    EXPECT_EQ(out_.status, -1);
    EXPECT_TRUE(out_.untouched());
    expect_log(name_, {support::debug("%s start", {name_}), reason});
  }
};

TEST_F(ChatRequestSerialize, WhenCalled_EncodesOneMessageAndNoIdsOfTheSender) {
  call(1, 300, 5, 1, "hi", 60);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 ac 02 6a 0a 08 05 10 01 1a 02 68 69 20 3c");
}

TEST_F(ChatRequestSerialize, WhenValuesAreZeroAndEmpty_EncodesThemAsPresent) {
  call(0, 0, 0, 0, "", 0);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 00 60 00 6a 08 08 00 10 00 1a 00 20 00");
}

TEST_F(ChatRequestSerialize, WhenValuesAreNegative_EncodesTenByteVarints) {
  call(-1, kSmallest, -2, 0, "", kSmallestInt);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()),
            "58 ff ff ff ff ff ff ff ff ff 01 60 80 80 80 80 80 80 80 80 80 01 "
            "6a 1a 08 fe ff ff ff ff ff ff ff ff 01 10 00 1a 00 20 80 80 80 80 f8 ff ff ff ff 01");
}

TEST_F(ChatRequestSerialize, WhateverReserved_EncodesTheSame) {
  for (const int reserved : {1, -1, kSmallestInt, kLargestInt}) {
    Encoded out;
    out.status = chat_request_serialize(1, 2, 3, 0, "x", 4, reserved, &out.data.block, &out.size);
    ASSERT_EQ(out.status, 0);
    EXPECT_EQ(to_hex(out.bytes()), to_hex(expected(0, "x"))) << reserved;
  }
}

TEST_F(ChatRequestSerialize, WhenTypeIsAMember_EncodesIt) {
  for (const int type : {0, 1, 2, 3, 4, 5, 6, 10, 30}) {
    Encoded out;
    out.status = chat_request_serialize(1, 2, 3, type, "x", 4, 0, &out.data.block, &out.size);
    ASSERT_EQ(out.status, 0) << type;
    EXPECT_EQ(to_hex(out.bytes()), to_hex(expected(type, "x")));
  }
}

TEST_F(ChatRequestSerialize, WhenTypeIsAbove30_IsRefused) {
  call_with_type(31);
  expect_refused(support::error("msgType is out of range(0~6)"));
}

TEST_F(ChatRequestSerialize, WhenTypeIsLargest_IsRefused) {
  call_with_type(kLargestInt);
  expect_refused(support::error("msgType is out of range(0~6)"));
}

TEST_F(ChatRequestSerialize, WhenTypeIsMinusOne_IsRefused) {
  call_with_type(-1);
  expect_refused(support::error("msgType is out of range(0~6)"));
}

TEST_F(ChatRequestSerialize, WhenTypeIsSmallest_IsRefused) {
  call_with_type(kSmallestInt);
  expect_refused(support::error("msgType is out of range(0~6)"));
}

TEST_F(ChatRequestSerialize, WhenTypeIsInRangeButNoMember_Aborts) {
  for (int type = 7; type < 30; ++type) {
    if (type != 10) {
      SCOPED_TRACE(type);
      EXPECT_EXIT(call_with_type(type), support::aborts,
                  support::refused_by_setter("ChatMessageParam", "msgtype", "MsgType"));
    }
  }
}

TEST_F(ChatRequestSerialize, WhenTextIsNull_IsRefused) {
  call_with_text(nullptr);
  expect_refused(support::error("no message"));
}

TEST_F(ChatRequestSerialize, WhenTextIsNullAndTypeOutOfRange_NamesTheType) {
  call(1, 2, 3, 31, nullptr, 4);
  expect_refused(support::error("msgType is out of range(0~6)"));
}

TEST_F(ChatRequestSerialize, WhenTextIsNullAndTypeNoMember_Aborts) {
  EXPECT_EXIT(call(1, 2, 3, 7, nullptr, 4), support::aborts, "MsgType_IsValid");
}

TEST_F(ChatRequestSerialize, WhenTextHas40000Bytes_EncodesIt) {
  const std::string text(40000, 'x');
  call_with_text(text.c_str());
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(out_.bytes(), expected(0, text));
}

TEST_F(ChatRequestSerialize, WhenTextHas40001Bytes_IsRefused) {
  call_with_text(std::string(40001, 'x').c_str());
  expect_refused(support::error("chatMsg length(%d) cannot be greater than %d", {40001, 40000}));
}

TEST_F(ChatRequestSerialize, WhenTextIsMultiByte_CountsBytes) {
  std::string text;  // 20001 characters of two bytes
  for (int i = 0; i < 20001; ++i) {
    text += "\xc3\xa9";
  }
  call_with_text(text.c_str());
  expect_refused(support::error("chatMsg length(%d) cannot be greater than %d", {40002, 40000}));
}

TEST_F(ChatRequestSerialize, WhenMultiByteTextHas40000Bytes_EncodesIt) {
  std::string text;
  for (int i = 0; i < 20000; ++i) {
    text += "\xc3\xa9";
  }
  call_with_text(text.c_str());
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(out_.bytes(), expected(0, text));
}

TEST_F(ChatRequestSerialize, WhenTheTextCannotBeCopied_ThrowsAndDestroysTheMessage) {
  support::HeapWatch watch;
  {
    const support::FailingNew fault(3);  // after the list of messages and the message in it
    EXPECT_THROW(call_with_text("x"), std::bad_alloc);
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_TRUE(out_.untouched());
}

TEST_F(ChatRequestSerialize, WhenTextHas40001Bytes_IsNotCopied) {
  const std::string text(40001, 'x');
  HeapWatch watch;
  call_with_text(text.c_str());
  watch.stop();
  EXPECT_EQ(watch.news(), 2u);  // the parameter, and the list of them
}

TEST_F(ChatRequestSerialize, WhenTextIsTooLongAndTypeOutOfRange_NamesTheType) {
  call(1, 2, 3, 31, std::string(40001, 'x').c_str(), 4);
  expect_refused(support::error("msgType is out of range(0~6)"));
}

// ---- chat_reply_deserialize

class ChatReplyDeserialize : public ExchangeTest {
 protected:
  const std::string name_ = "chat_reply_deserialize";
  support::ChatReplyOutputs out_;

  support::Line start() const { return support::warn("%s: start", {name_}); }
  support::Line exit() const { return support::warn("%s: exit", {name_}); }
  static support::Line entries(int n) {
    return support::debug("processed msg entry size : %d", {n});
  }
  static support::Line allocation_error() {
    return support::error("memory allocation error(msgId, sentTime)");
  }
};

// userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3, msg "no" },
// processedMessageEntries { msgId 1, sentTime 300 } { msgId 2, sentTime 400 }
const char kChatReply[] =
    "08 09 10 08 58 07 60 06 6a 06 08 03 12 02 6e 6f 72 05 08 01 10 ac 02 72 05 08 02 10 90 03";

TEST_F(ChatReplyDeserialize, WhenReplyIsWhole_WritesIdsAndResult) {
  out_.read(hex(kChatReply));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.code, 3);
  EXPECT_STREQ(out_.text.block, "no");
}

TEST_F(ChatReplyDeserialize, WhenReplyHasTwoEntries_WritesTwoArraysInOrder) {
  out_.read(hex(kChatReply));
  ASSERT_EQ(out_.count, 2);
  EXPECT_EQ(out_.ids.block[0], 1);
  EXPECT_EQ(out_.ids.block[1], 2);
  EXPECT_EQ(out_.times.block[0], 300);
  EXPECT_EQ(out_.times.block[1], 400);
}

TEST_F(ChatReplyDeserialize, WhenIdsAndTimesAreExtreme_WritesThem) {
  out_.read(Wire()
                .number(11, kSmallest)
                .number(12, kLargest)
                .message(14, Wire().number(1, kLargest).number(2, kSmallest))
                .bytes());
  EXPECT_EQ(out_.request_id, kSmallest);
  EXPECT_EQ(out_.chatroom_id, kLargest);
  ASSERT_EQ(out_.count, 1);
  EXPECT_EQ(out_.ids.block[0], kLargest);
  EXPECT_EQ(out_.times.block[0], kSmallest);
}

TEST_F(ChatReplyDeserialize, WhenReplyHasTwoEntries_LogsTheirNumberAtDebugLevel) {
  out_.read(hex(kChatReply));
  expect_log(name_, {start(), entries(2), exit()});
}

TEST_F(ChatReplyDeserialize, WhenReplyHasEntries_AllocatesTwoZeroedArrays) {
  support::HeapWatch watch;
  out_.read(hex(kChatReply));
  watch.stop();
  ASSERT_EQ(watch.callocs().size(), 2u);
  for (const auto& block : watch.callocs()) {
    EXPECT_EQ(block.elements, 2u);
    EXPECT_EQ(block.element_size, 8u);
  }
}

TEST_F(ChatReplyDeserialize, WhenReplyHasOneEntry_WritesArraysOfOne) {
  out_.read(hex("72 04 08 05 10 06"));
  ASSERT_EQ(out_.count, 1);
  EXPECT_EQ(out_.ids.block[0], 5);
  EXPECT_EQ(out_.times.block[0], 6);
}

TEST_F(ChatReplyDeserialize, WhenReplyHas1000Entries_WritesThemAll) {
  Wire reply;
  for (int i = 0; i < 1000; ++i) {
    reply.message(14, Wire().number(1, i - 500).number(2, kSmallest + i));
  }
  out_.read(reply.bytes());
  ASSERT_EQ(out_.count, 1000);
  for (int i = 0; i < 1000; ++i) {
    ASSERT_EQ(out_.ids.block[i], i - 500);
    ASSERT_EQ(out_.times.block[i], kSmallest + i);
  }
}

TEST_F(ChatReplyDeserialize, WhenReplyHasNoEntries_WritesCountZeroAndLeavesArrays) {
  out_.read(hex("58 07"));
  EXPECT_EQ(out_.count, 0);
  EXPECT_TRUE(out_.ids.untouched());
  EXPECT_TRUE(out_.times.untouched());
  expect_log(name_, {start(), entries(0), exit()});
}

TEST_F(ChatReplyDeserialize, WhenSentTimesAreAbsent_WritesZeros) {
  out_.read(hex("72 02 08 05 72 02 08 06"));
  ASSERT_EQ(out_.count, 2);
  EXPECT_EQ(out_.ids.block[0], 5);
  EXPECT_EQ(out_.ids.block[1], 6);
  EXPECT_EQ(out_.times.block[0], 0);
  EXPECT_EQ(out_.times.block[1], 0);
}

TEST_F(ChatReplyDeserialize, WhenAMsgIdIsAbsent_WritesZeroAtItsIndex) {
  out_.read(hex("72 02 10 05 72 04 08 06 10 07"));
  ASSERT_EQ(out_.count, 2);
  EXPECT_EQ(out_.ids.block[0], 0);
  EXPECT_EQ(out_.ids.block[1], 6);
  EXPECT_EQ(out_.times.block[0], 5);
  EXPECT_EQ(out_.times.block[1], 7);
}

TEST_F(ChatReplyDeserialize, WhenAnEntryIsEmpty_WritesZerosAtItsIndex) {
  out_.read(hex("72 00 72 04 08 06 10 07"));
  ASSERT_EQ(out_.count, 2);
  EXPECT_EQ(out_.ids.block[0], 0);
  EXPECT_EQ(out_.times.block[0], 0);
}

TEST_F(ChatReplyDeserialize, WhenInputIsEmpty_WritesZeroIdsAndCountAlone) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.chatroom_id, 0);
  EXPECT_EQ(out_.count, 0);
  EXPECT_EQ(out_.code, kIntSentinel);
  EXPECT_TRUE(out_.text.untouched());
  EXPECT_TRUE(out_.ids.untouched());
  EXPECT_TRUE(out_.times.untouched());
}

TEST_F(ChatReplyDeserialize, WhenTheFirstFourOutputsAreNull_WritesTheOthers) {
  const Received received(hex(kChatReply));
  chat_reply_deserialize(received.data(), received.size(), nullptr, nullptr, nullptr, nullptr,
                         &out_.count, &out_.ids.block, &out_.times.block);
  ASSERT_EQ(out_.count, 2);
  EXPECT_EQ(out_.ids.block[1], 2);
  EXPECT_EQ(out_.times.block[1], 400);
}

TEST_F(ChatReplyDeserialize, WhenRequestIdIsNull_WritesChatroomId) {
  const Received received(hex(kChatReply));
  chat_reply_deserialize(received.data(), received.size(), nullptr, &out_.chatroom_id, &out_.code,
                         &out_.text.block, &out_.count, &out_.ids.block, &out_.times.block);
  EXPECT_EQ(out_.chatroom_id, 6);
}

TEST_F(ChatReplyDeserialize, WhenChatroomIdIsNull_WritesRequestId) {
  const Received received(hex(kChatReply));
  chat_reply_deserialize(received.data(), received.size(), &out_.request_id, nullptr, &out_.code,
                         &out_.text.block, &out_.count, &out_.ids.block, &out_.times.block);
  EXPECT_EQ(out_.request_id, 7);
}

TEST_F(ChatReplyDeserialize, WhenArraysAreNullAndThereAreNoEntries_WritesCountZero) {
  const Received received(hex("58 07"));
  chat_reply_deserialize(received.data(), received.size(), &out_.request_id, &out_.chatroom_id,
                         &out_.code, &out_.text.block, &out_.count, nullptr, nullptr);
  EXPECT_EQ(out_.count, 0);
  expect_log(name_, {start(), entries(0), exit()});
}

TEST_F(ChatReplyDeserialize, WhenFirstArrayCannotBeAllocated_WritesCountZeroAndKeepsTheSecond) {
  {
    const FailingCalloc fault(1);
    out_.read(hex(kChatReply));
  }
  EXPECT_EQ(out_.count, 0);
  EXPECT_EQ(out_.ids.block, nullptr);
  ASSERT_NE(out_.times.block, nullptr);
  EXPECT_FALSE(out_.times.untouched());
  EXPECT_EQ(out_.times.block[1], 0);
  expect_log(name_, {start(), entries(2), allocation_error()});
}

TEST_F(ChatReplyDeserialize, WhenSecondArrayCannotBeAllocated_WritesCountZeroAndKeepsTheFirst) {
  {
    const FailingCalloc fault(2);
    out_.read(hex(kChatReply));
  }
  EXPECT_EQ(out_.count, 0);
  ASSERT_NE(out_.ids.block, nullptr);
  EXPECT_FALSE(out_.ids.untouched());
  EXPECT_EQ(out_.ids.block[1], 0);
  EXPECT_EQ(out_.times.block, nullptr);
  expect_log(name_, {start(), entries(2), allocation_error()});
}

TEST_F(ChatReplyDeserialize, WhenAnArrayCannotBeAllocated_HasWrittenTheOutputsBeforeIt) {
  {
    const FailingCalloc fault(1);
    out_.read(hex(kChatReply));
  }
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.code, 3);
  EXPECT_STREQ(out_.text.block, "no");
}

TEST_F(ChatReplyDeserialize, WhenCountIsNull_Faults) {
  EXPECT_EXIT(chat_reply_deserialize(nullptr, 0, &out_.request_id, &out_.chatroom_id, &out_.code,
                                     &out_.text.block, nullptr, &out_.ids.block, &out_.times.block),
              support::faults, "");
}

TEST_F(ChatReplyDeserialize, WhenMsgIdsIsNullAndThereAreEntries_Faults) {
  const Received received(hex(kChatReply));
  EXPECT_EXIT(
      chat_reply_deserialize(received.data(), received.size(), &out_.request_id, &out_.chatroom_id,
                             &out_.code, &out_.text.block, &out_.count, nullptr, &out_.times.block),
      support::faults, "");
}

TEST_F(ChatReplyDeserialize, WhenSentTimesIsNullAndThereAreEntries_Faults) {
  const Received received(hex(kChatReply));
  EXPECT_EXIT(
      chat_reply_deserialize(received.data(), received.size(), &out_.request_id, &out_.chatroom_id,
                             &out_.code, &out_.text.block, &out_.count, &out_.ids.block, nullptr),
      support::faults, "");
}

}  // namespace
