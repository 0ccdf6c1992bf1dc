// Fetching unread messages, and the service's pushes of messages.

#include <ostream>

#include "support/exchange.h"
#include "support/heap.h"
#include "support/outputs.h"
#include "support/process_death.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::expect_log;
using support::hex;
using support::kIntSentinel;
using support::kLargest;
using support::kLargestInt;
using support::kLongSentinel;
using support::kSmallest;
using support::kSmallestInt;
using support::Received;
using support::to_hex;
using support::Wire;

// Of a page, which has 1 to 500 messages.
const int kSizesInRange[] = {1, 2, 499, 500};
const int kSizesOutOfRange[] = {0, -1, 501, 65537, -65535, kSmallestInt, kLargestInt};

template <typename Case>
std::string name_of(const ::testing::TestParamInfo<Case>& info) {
  return info.param.name;
}

// ---- forward_stored_message_reply_serialize and forward_stored_message_deserialize

class ForwardStoredMessage : public ExchangeTest {};

TEST_F(ForwardStoredMessage, WhenReplyIsSerialized_LeavesOutputsAndLogsNothing) {
  Encoded out;
  const char* key = "k";
  const int most = 5;
  forward_stored_message_reply_serialize(1, &key, &most, &out.data.block, &out.size);
  EXPECT_TRUE(out.untouched());
  EXPECT_TRUE(support::logged_calls().empty());
}

TEST_F(ForwardStoredMessage, WhenPushIsDeserialized_LeavesOutputsAndLogsNothing) {
  support::ForwardUnreadMessageOutputs out;
  const Received received(hex("58 07 62 02 08 01 6a 01 6b"));
  forward_stored_message_deserialize(received.data(), received.size(), &out.request_id,
                                     &out.entries.array.block, &out.entries.count,
                                     &out.next_key.block);
  EXPECT_TRUE(out.untouched());
  EXPECT_TRUE(support::logged_calls().empty());
}

TEST_F(ForwardStoredMessage, WhenPushIsMalformed_LogsNothing) {
  const Received received(hex("ff"));
  forward_stored_message_deserialize(received.data(), received.size(), nullptr, nullptr, nullptr,
                                     nullptr);
  EXPECT_TRUE(support::logged_calls().empty());
}

TEST_F(ForwardStoredMessage, WhateverPointersAreNull_Return) {
  forward_stored_message_reply_serialize(1, nullptr, nullptr, nullptr, nullptr);
  forward_stored_message_deserialize(nullptr, 7, nullptr, nullptr, nullptr, nullptr);
  EXPECT_TRUE(support::logged_calls().empty());
}

TEST_F(ForwardStoredMessage, WhenCalled_AllocateNothing) {
  support::HeapWatch watch;
  forward_stored_message_reply_serialize(1, nullptr, nullptr, nullptr, nullptr);
  forward_stored_message_deserialize(nullptr, 0, nullptr, nullptr, nullptr, nullptr);
  watch.stop();
  EXPECT_EQ(watch.news() + watch.mallocs().size() + watch.callocs().size(), 0u);
}

// ---- get_all_unread_message_request_serialize

class GetAllUnreadMessageRequestSerialize : public ExchangeTest {
 protected:
  const std::string name_ = "get_all_unread_message_request_serialize";

  // The call's bytes, in hexadecimal.
  static std::string encoded(int64_t request, const int* most) {
    Encoded out;
    out.status =
        get_all_unread_message_request_serialize(request, most, &out.data.block, &out.size);
    EXPECT_EQ(out.status, 0);
    return out.status == 0 ? to_hex(out.bytes()) : "";
  }
};

TEST_F(GetAllUnreadMessageRequestSerialize, WhenCalled_EncodesBothArgumentsAndNoIdsOfTheSender) {
  const int most = 3;
  EXPECT_EQ(encoded(300, &most), "58 ac 02 60 03");
}

TEST_F(GetAllUnreadMessageRequestSerialize, WhenIdIsZero_EncodesItAsPresent) {
  EXPECT_EQ(encoded(0, nullptr), "58 00");
}

TEST_F(GetAllUnreadMessageRequestSerialize, WhenIdIsSmallest_EncodesTenByteVarint) {
  EXPECT_EQ(encoded(kSmallest, nullptr), "58 80 80 80 80 80 80 80 80 80 01");
}

TEST_F(GetAllUnreadMessageRequestSerialize, WhenMaxCountIsNull_LeavesItOut) {
  EXPECT_EQ(encoded(7, nullptr), "58 07");
}

TEST_F(GetAllUnreadMessageRequestSerialize, WhenMaxCountIsInRange_EncodesIt) {
  for (const int most : kSizesInRange) {
    EXPECT_EQ(encoded(7, &most), to_hex(Wire().number(11, 7).number(12, most).bytes()));
  }
}

TEST_F(GetAllUnreadMessageRequestSerialize, WhenMaxCountIsOutOfRange_Encodes500) {
  for (const int most : kSizesOutOfRange) {
    EXPECT_EQ(encoded(7, &most), "58 07 60 f4 03") << most;
  }
}

TEST_F(GetAllUnreadMessageRequestSerialize, WhenMaxCountIsOutOfRange_LogsNothingOfIt) {
  const int most = 501;
  encoded(7, &most);
  expect_log(name_, {support::debug("%s start", {name_}), support::debug("%s: exit", {name_})});
}

// ---- get_all_unread_message_reply_deserialize

class GetAllUnreadMessageReplyDeserialize : public ExchangeTest {
 protected:
  support::GetAllUnreadMessageReplyOutputs out_;
};

TEST_F(GetAllUnreadMessageReplyDeserialize, WhenRequestIdIsNull_Faults) {
  EXPECT_EXIT(
      get_all_unread_message_reply_deserialize(nullptr, 0, nullptr, &out_.code, &out_.text.block),
      support::faults, "");
}

// ---- forward_online_message_reply_serialize

class ForwardOnlineMessageReplySerialize : public ExchangeTest {
 protected:
  // The call's bytes, in hexadecimal.
  static std::string encoded(int64_t request, int64_t chatroom, const bool* read) {
    Encoded out;
    out.status =
        forward_online_message_reply_serialize(request, chatroom, read, &out.data.block, &out.size);
    EXPECT_EQ(out.status, 0);
    return out.status == 0 ? to_hex(out.bytes()) : "";
  }
};

TEST_F(ForwardOnlineMessageReplySerialize, WhenCalled_EncodesTheThreeArgumentsAlone) {
  const bool read = true;
  EXPECT_EQ(encoded(300, 2, &read), "58 ac 02 60 02 68 01");
}

TEST_F(ForwardOnlineMessageReplySerialize, WhenMarkAsReadIsFalse_EncodesItAsPresent) {
  const bool read = false;
  EXPECT_EQ(encoded(1, 2, &read), "58 01 60 02 68 00");
}

TEST_F(ForwardOnlineMessageReplySerialize, WhenMarkAsReadIsNull_LeavesItOut) {
  EXPECT_EQ(encoded(1, 2, nullptr), "58 01 60 02");
}

TEST_F(ForwardOnlineMessageReplySerialize, WhenMarkAsReadHoldsAnotherByte_EncodesItAsTrue) {
  for (const unsigned char byte : support::kBytesOfNoBool) {
    EXPECT_EQ(encoded(1, 2, reinterpret_cast<const bool*>(&byte)), "58 01 60 02 68 01")
        << static_cast<int>(byte);
  }
}

TEST_F(ForwardOnlineMessageReplySerialize, WhenIdsAreZero_EncodesThemAsPresent) {
  EXPECT_EQ(encoded(0, 0, nullptr), "58 00 60 00");
}

TEST_F(ForwardOnlineMessageReplySerialize, WhenIdsAreExtreme_EncodesThem) {
  EXPECT_EQ(encoded(kSmallest, kLargest, nullptr),
            "58 80 80 80 80 80 80 80 80 80 01 60 ff ff ff ff ff ff ff ff 7f");
}

// ---- forward_online_message_get_deserialize

class ForwardOnlineMessageGetDeserialize : public ExchangeTest {
 protected:
  const std::string name_ = "forward_online_message_get_deserialize";
  support::ForwardOnlineMessageOutputs out_;

  // The log holds what every successful call starts and ends with, and this in between.
  void expect_log_around(std::vector<support::Line> lines) const {
    lines.insert(lines.begin(), support::warn("%s: start", {name_}));
    lines.insert(lines.begin(), support::error("check "));
    lines.push_back(support::warn("%s: exit", {name_}));
    expect_log(name_, lines);
  }
  static support::Line without_skip_reply() { return support::error("has_skipreply:false "); }
  static support::Line with_skip_reply() { return support::error("has_skipreply:true "); }
  static support::Line skip_reply(int value) { return support::info("skipreply: %d", {value}); }
  static support::Line msg_type(int type) { return support::error("msgType : %d ", {type}); }

  void expect_skip_reply(int value) const {
    EXPECT_EQ(out_.skip.value(), value);
    EXPECT_TRUE(out_.skip.neighbours_untouched());
  }
};

// userId 9, deviceId 8, requestId 7, chatroomId 6, chatType SECURE, inboxEntry { msgId 1,
// msgType RECALL, sender 2, receiver 4, sentTime 300, chatMsg "hi", msgTtl 5, chatroomId 12,
// chatType GROUP, secureChatMsg "s" }, isActiveForward true, currentTimestamp 11, skipReply true
const char kOnlineMessage[] =
    "08 09 10 08 58 07 60 06 68 03 72 19 08 01 10 03 18 02 20 04 28 ac 02 32 02 68 69 38 05 50 0c "
    "58 01 a2 01 01 73 78 01 80 01 0b f0 01 01";

TEST_F(ForwardOnlineMessageGetDeserialize, WhenPushIsWhole_WritesItsOwnOutputs) {
  out_.read(hex(kOnlineMessage));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.chat_type, 3);
  expect_skip_reply(1);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenPushIsWhole_FillsTheRecord) {
  out_.read(hex(kOnlineMessage));
  EXPECT_EQ(out_.record.msgId, 1);
  EXPECT_EQ(out_.record.msgType, 3);
  EXPECT_EQ(out_.record.sender, 2);
  EXPECT_EQ(out_.record.receiver, 4);
  EXPECT_EQ(out_.record.sentTime, 300);
  EXPECT_STREQ(out_.record.chatMsg, "hi");
  EXPECT_EQ(out_.record.msgTtl, 5);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenPushIsWhole_LeavesTheRecordsChatroom) {
  out_.read(hex(kOnlineMessage));
  EXPECT_EQ(out_.record.chatroomId, kLongSentinel);
  EXPECT_EQ(out_.record.chatType, kIntSentinel);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenPushIsWhole_LeavesTheErrorAndTheRecordsPointer) {
  out_.read(hex(kOnlineMessage));
  EXPECT_EQ(out_.error_code, kIntSentinel);
  EXPECT_TRUE(out_.error_text.untouched());
  EXPECT_EQ(out_.entry, &out_.record);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenPushIsWhole_LogsSkipReplyAndMsgType) {
  out_.read(hex(kOnlineMessage));
  expect_log_around({with_skip_reply(), skip_reply(1), msg_type(3)});
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenSkipReplyIsFalseButPresent_WritesFalse) {
  out_.read(hex("78 01 f0 01 00"));  // isActiveForward is true
  expect_skip_reply(0);
  expect_log_around({with_skip_reply(), skip_reply(0), msg_type(0)});
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenSkipReplyIsAbsent_WritesFalse) {
  out_.read(hex("58 07"));
  expect_skip_reply(0);
  expect_log_around({without_skip_reply(), msg_type(0)});
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenInputIsEmpty_WritesZeros) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.chatroom_id, 0);
  EXPECT_EQ(out_.chat_type, 0);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenEntryIsAbsent_FillsTheRecordFromAnEmptyOne) {
  out_.read("");
  EXPECT_EQ(out_.record.msgId, 0);
  EXPECT_EQ(out_.record.msgType, 0);
  EXPECT_EQ(out_.record.sentTime, 0);
  EXPECT_STREQ(out_.record.chatMsg, "");
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenEntryIsEmpty_FillsItsZerosIntoTheRecord) {
  out_.read(hex("72 00"));
  EXPECT_EQ(out_.record.msgId, 0);
  EXPECT_EQ(out_.record.msgType, 0);
  EXPECT_EQ(out_.record.sentTime, 0);
  EXPECT_STREQ(out_.record.chatMsg, "");
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenEntryIsEmpty_LeavesTheOtherFieldsOfTheRecord) {
  out_.read(hex("72 00"));
  EXPECT_EQ(out_.record.sender, kLongSentinel);
  EXPECT_EQ(out_.record.receiver, kLongSentinel);
  EXPECT_EQ(out_.record.msgTtl, kIntSentinel);
  EXPECT_EQ(out_.record.chatroomId, kLongSentinel);
  EXPECT_EQ(out_.record.chatType, kIntSentinel);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenSenderComesAlone_LeavesReceiverAndTtl) {
  out_.read(hex("72 02 18 05"));
  EXPECT_EQ(out_.record.sender, 5);
  EXPECT_EQ(out_.record.receiver, kLongSentinel);
  EXPECT_EQ(out_.record.msgTtl, kIntSentinel);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenReceiverComesAlone_LeavesSenderAndTtl) {
  out_.read(hex("72 02 20 05"));
  EXPECT_EQ(out_.record.sender, kLongSentinel);
  EXPECT_EQ(out_.record.receiver, 5);
  EXPECT_EQ(out_.record.msgTtl, kIntSentinel);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenTtlComesAlone_LeavesSenderAndReceiver) {
  out_.read(hex("72 02 38 05"));
  EXPECT_EQ(out_.record.sender, kLongSentinel);
  EXPECT_EQ(out_.record.receiver, kLongSentinel);
  EXPECT_EQ(out_.record.msgTtl, 5);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenSenderReceiverAndTtlAreZero_WritesThem) {
  out_.read(hex("72 06 18 00 20 00 38 00"));
  EXPECT_EQ(out_.record.sender, 0);
  EXPECT_EQ(out_.record.receiver, 0);
  EXPECT_EQ(out_.record.msgTtl, 0);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenNumbersAreExtreme_WritesThem) {
  out_.read(Wire()
                .number(11, kSmallest)
                .number(12, kLargest)
                .message(14, Wire()
                                 .number(1, kLargest)
                                 .number(3, kSmallest)
                                 .number(4, -1)
                                 .number(5, kSmallest)
                                 .number(7, kSmallestInt))
                .bytes());
  EXPECT_EQ(out_.request_id, kSmallest);
  EXPECT_EQ(out_.chatroom_id, kLargest);
  EXPECT_EQ(out_.record.msgId, kLargest);
  EXPECT_EQ(out_.record.sender, kSmallest);
  EXPECT_EQ(out_.record.receiver, -1);
  EXPECT_EQ(out_.record.sentTime, kSmallest);
  EXPECT_EQ(out_.record.msgTtl, kSmallestInt);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenChatTypeIsNoMember_WritesZero) {
  out_.read(hex("68 05"));
  EXPECT_EQ(out_.chat_type, 0);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenMsgTypeIsAMember_WritesAndLogsIt) {
  for (const int type : {0, 1, 2, 3, 4, 5, 6, 10, 30}) {
    support::ForwardOnlineMessageOutputs out;
    out.read(Wire().message(14, Wire().number(2, type)).bytes());
    EXPECT_EQ(out.record.msgType, type);
    expect_log_around({without_skip_reply(), msg_type(type)});
  }
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenMsgTypeIsNoMember_WritesAndLogsZero) {
  out_.read(hex("72 02 10 07"));
  EXPECT_EQ(out_.record.msgType, 0);
  expect_log_around({without_skip_reply(), msg_type(0)});
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenTextIsLong_CopiesAllOfIt) {
  const std::string text(5000, 'x');
  out_.read(Wire().message(14, Wire().text(6, text)).bytes());
  EXPECT_EQ(out_.record.chatMsg, text);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenTextHoldsANul_CopiesUpToIt) {
  out_.read(hex("72 05 32 03 61 00 62"));
  EXPECT_STREQ(out_.record.chatMsg, "a");
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenMessageIsSecureAlone_WritesAnEmptyText) {
  out_.read(hex("72 04 a2 01 01 73"));
  EXPECT_STREQ(out_.record.chatMsg, "");
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenThereIsNoRecord_WritesTheError) {
  out_.entry = nullptr;
  out_.read(hex(kOnlineMessage));
  EXPECT_EQ(out_.error_code, 18);
  EXPECT_STREQ(out_.error_text.block, "inboxentry memory allocation failed");
  EXPECT_EQ(out_.entry, nullptr);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenThereIsNoRecord_HasWrittenTheOutputsBeforeIt) {
  out_.entry = nullptr;
  out_.read(hex(kOnlineMessage));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.chat_type, 3);
  expect_skip_reply(1);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenThereIsNoRecord_LogsSkipReplyAndExitAlone) {
  out_.entry = nullptr;
  out_.read(hex(kOnlineMessage));
  expect_log_around({with_skip_reply(), skip_reply(1)});
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenThereIsNoRecordAndNoEntry_WritesTheError) {
  out_.entry = nullptr;
  out_.read("");
  EXPECT_EQ(out_.error_code, 18);
  EXPECT_STREQ(out_.error_text.block, "inboxentry memory allocation failed");
  expect_log_around({without_skip_reply()});
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenParsed_CopiesTheEntryBeforeItLooksAtTheRecord) {
  const std::string push = hex("68 03 72 04 32 02 68 69 f0 01 01");
  support::HeapWatch watch;
  support::ForwardOnlineMessageOutputs().read(push);
  watch.stop();
  out_.entry = nullptr;
  {
    const support::FailingNew fault(static_cast<int>(watch.news()));  // the copy's text
    EXPECT_THROW(out_.read(push), std::bad_alloc);
  }
  EXPECT_EQ(out_.chat_type, 3);
  expect_skip_reply(1);
  EXPECT_EQ(out_.error_code, kIntSentinel);
}

TEST_F(ForwardOnlineMessageGetDeserialize, WhenPushIsMalformed_LogsCheckAndKeepsTheRecord) {
  out_.read(hex("58"));
  EXPECT_TRUE(out_.untouched());
  expect_log(name_, {support::error("check "), support::warn("%s: start", {name_}),
                     support::error(support::kMergeError), support::error(support::kStreamError)});
}

// All output pointers, of which a test clears one.
struct OnlinePointers {
  explicit OnlinePointers(support::ForwardOnlineMessageOutputs* out)
      : request_id(&out->request_id),
        chatroom_id(&out->chatroom_id),
        chat_type(&out->chat_type),
        entry(&out->entry),
        skip(out->skip.pointer()),
        error_code(&out->error_code),
        error_text(&out->error_text.block) {}

  void read(const std::string& bytes) const {
    const Received received(bytes);
    forward_online_message_get_deserialize(received.data(), received.size(), request_id,
                                           chatroom_id, chat_type, entry, skip, error_code,
                                           error_text);
  }

  int64_t* request_id;
  int64_t* chatroom_id;
  int* chat_type;
  qel_message_inboxentry_t** entry;
  bool* skip;
  int* error_code;
  char** error_text;
};

struct OnlineNullPointer {
  const char* name;
  void (*clear)(OnlinePointers* pointers);
};
void PrintTo(const OnlineNullPointer& one, std::ostream* out) {
  *out << one.name;
}

class ForwardOnlineMessageNull : public ForwardOnlineMessageGetDeserialize,
                                 public ::testing::WithParamInterface<OnlineNullPointer> {
 protected:
  OnlinePointers pointers_{&out_};

  void SetUp() override {
    ForwardOnlineMessageGetDeserialize::SetUp();
    GetParam().clear(&pointers_);
  }
};
class ForwardOnlineMessageNullError : public ForwardOnlineMessageNull {};

TEST_P(ForwardOnlineMessageNull, WhenPushIsWhole_Faults) {
  EXPECT_EXIT(pointers_.read(hex(kOnlineMessage)), support::faults, "");
}

TEST_P(ForwardOnlineMessageNull, WhenInputIsEmpty_Faults) {
  EXPECT_EXIT(pointers_.read(""), support::faults, "");
}

TEST_P(ForwardOnlineMessageNullError, WhenThereIsNoRecord_Faults) {
  out_.entry = nullptr;
  EXPECT_EXIT(pointers_.read(hex(kOnlineMessage)), support::faults, "");
}

const OnlineNullPointer kOnlineNullPointers[] = {
    {"RequestId", [](OnlinePointers* p) { p->request_id = nullptr; }},
    {"ChatroomId", [](OnlinePointers* p) { p->chatroom_id = nullptr; }},
    {"ChatType", [](OnlinePointers* p) { p->chat_type = nullptr; }},
    {"InboxEntry", [](OnlinePointers* p) { p->entry = nullptr; }},
    {"SkipReply", [](OnlinePointers* p) { p->skip = nullptr; }},
};
const OnlineNullPointer kOnlineNullErrors[] = {
    {"ErrorCode", [](OnlinePointers* p) { p->error_code = nullptr; }},
    {"ErrorMsg", [](OnlinePointers* p) { p->error_text = nullptr; }},
};

INSTANTIATE_TEST_SUITE_P(Untested, ForwardOnlineMessageNull,
                         ::testing::ValuesIn(kOnlineNullPointers), name_of<OnlineNullPointer>);
INSTANTIATE_TEST_SUITE_P(Untested, ForwardOnlineMessageNullError,
                         ::testing::ValuesIn(kOnlineNullErrors), name_of<OnlineNullPointer>);

// ---- forward_unread_message_reply_serialize

class ForwardUnreadMessageReplySerialize : public ExchangeTest {
 protected:
  const std::string name_ = "forward_unread_message_reply_serialize";
  Encoded out_;

  void call(int64_t request, const char** key, const int* most) {
    out_.status =
        forward_unread_message_reply_serialize(request, key, most, &out_.data.block, &out_.size);
  }
  // The call's bytes, in hexadecimal.
  static std::string encoded(int64_t request, const char** key, const int* most) {
    Encoded out;
    out.status =
        forward_unread_message_reply_serialize(request, key, most, &out.data.block, &out.size);
    EXPECT_EQ(out.status, 0);
    return out.status == 0 ? to_hex(out.bytes()) : "";
  }
  // With a key and no size.
  static std::string encoded_with_key(const char* key) { return encoded(1, &key, nullptr); }

  void expect_log_around(const std::vector<support::Line>& lines) const {
    std::vector<support::Line> all = {support::debug("%s start", {name_})};
    all.insert(all.end(), lines.begin(), lines.end());
    all.push_back(support::debug("%s: exit", {name_}));
    expect_log(name_, all);
  }
};

TEST_F(ForwardUnreadMessageReplySerialize, WhenCalled_EncodesTheThreeArgumentsAlone) {
  const char* key = "key";
  const int most = 3;
  EXPECT_EQ(encoded(300, &key, &most), "58 ac 02 62 03 6b 65 79 68 03");
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenBothPointersAreNull_EncodesTheIdAlone) {
  EXPECT_EQ(encoded(1, nullptr, nullptr), "58 01");
  expect_log_around({});
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenIdIsZero_EncodesItAsPresent) {
  EXPECT_EQ(encoded(0, nullptr, nullptr), "58 00");
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenIdIsSmallest_EncodesTenByteVarint) {
  EXPECT_EQ(encoded(kSmallest, nullptr, nullptr), "58 80 80 80 80 80 80 80 80 80 01");
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenKeyPointsToNull_LeavesItOut) {
  EXPECT_EQ(encoded_with_key(nullptr), "58 01");
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenKeyIsEmpty_EncodesItAsPresent) {
  EXPECT_EQ(encoded_with_key(""), "58 01 62 00");
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenKeyIsMultiByte_EncodesItsBytes) {
  EXPECT_EQ(encoded_with_key("\xc3\xa9"), "58 01 62 02 c3 a9");
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenKeyIsLong_EncodesAllOfIt) {
  const std::string key(5000, 'x');
  EXPECT_EQ(encoded_with_key(key.c_str()), to_hex(hex("58 01 62 88 27") + key));
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenMaxCountComesAlone_EncodesIt) {
  const int most = 5;
  EXPECT_EQ(encoded(1, nullptr, &most), "58 01 68 05");
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenMaxCountIsInRange_EncodesAndLogsIt) {
  for (const int most : kSizesInRange) {
    EXPECT_EQ(encoded(7, nullptr, &most), to_hex(Wire().number(11, 7).number(13, most).bytes()));
    expect_log_around({support::warn("maxCount : %d", {most})});
  }
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenMaxCountIsOutOfRange_Encodes500AndLogsWhatWasGiven) {
  for (const int most : kSizesOutOfRange) {
    EXPECT_EQ(encoded(7, nullptr, &most), "58 07 68 f4 03") << most;
    expect_log_around({support::warn("maxCount is out of the range, maxCount : %d", {most})});
  }
}

TEST_F(ForwardUnreadMessageReplySerialize, WhenTheKeyCannotBeCopied_ThrowsAfterItsEntryLine) {
  const char* key = "key";
  const int most = 5;
  support::HeapWatch watch;
  {
    const support::FailingNew fault(1);
    EXPECT_THROW(call(1, &key, &most), std::bad_alloc);
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_TRUE(out_.untouched());
  expect_log(name_, {support::debug("%s start", {name_})});
}

// ---- forward_unread_message_deserialize

class ForwardUnreadMessageDeserialize : public ExchangeTest {
 protected:
  const std::string name_ = "forward_unread_message_deserialize";
  support::ForwardUnreadMessageOutputs out_;

  // One of the page's records.
  const qel_message_inboxentry_t& record(int index) const {
    return *out_.entries.array.block[index];
  }

  void read_one(const Wire& entry) {
    out_.read(Wire().message(12, entry).bytes());
    ASSERT_EQ(out_.entries.count, 1);
  }
  void read_with_failing_calloc(int n, const std::string& bytes) {
    const support::FailingCalloc fault(n);
    out_.read(bytes);
  }
  // The outputs when there is no array.
  void read_without_array(const std::string& bytes) {
    read_with_failing_calloc(1, bytes);
    count_ = out_.entries.count;
    out_.entries.count = 0;  // so that nobody walks the array
  }

  int count_ = kIntSentinel;
};

// userId 9, deviceId 8, requestId 7, inboxEntries { msgId 1, msgType RECALL, sender 2, receiver 4,
// sentTime 300, chatMsg "hi", msgTtl 5, chatroomId 12, chatType GROUP, secureChatMsg "s" }
// { msgId 13 }, nextPaginationKey "key", isActiveForward true
const char kPage[] =
    "08 09 10 08 58 07 62 19 08 01 10 03 18 02 20 04 28 ac 02 32 02 68 69 38 05 50 0c 58 01 a2 01 "
    "01 73 62 02 08 0d 6a 03 6b 65 79 70 01";

TEST_F(ForwardUnreadMessageDeserialize, WhenPageIsWhole_WritesIdCountAndKey) {
  out_.read(hex(kPage));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.entries.count, 2);
  EXPECT_STREQ(out_.next_key.block, "key");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenAnEntryIsWhole_WritesAllItsFields) {
  out_.read(hex(kPage));
  ASSERT_EQ(out_.entries.count, 2);
  EXPECT_EQ(record(0).msgId, 1);
  EXPECT_EQ(record(0).msgType, 3);
  EXPECT_EQ(record(0).sender, 2);
  EXPECT_EQ(record(0).receiver, 4);
  EXPECT_EQ(record(0).sentTime, 300);
  EXPECT_STREQ(record(0).chatMsg, "hi");
  EXPECT_EQ(record(0).chatroomId, 12);
  EXPECT_EQ(record(0).chatType, 1);
  EXPECT_EQ(record(0).msgTtl, 5);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenFieldsOfAnEntryAreAbsent_ThoseOfItsRecordAreZero) {
  out_.read(hex(kPage));
  ASSERT_EQ(out_.entries.count, 2);
  EXPECT_EQ(record(1).msgId, 13);
  EXPECT_EQ(record(1).msgType, 0);
  EXPECT_EQ(record(1).sender, 0);
  EXPECT_EQ(record(1).receiver, 0);
  EXPECT_EQ(record(1).sentTime, 0);
  EXPECT_STREQ(record(1).chatMsg, "");
  EXPECT_EQ(record(1).chatroomId, 0);
  EXPECT_EQ(record(1).chatType, 0);
  EXPECT_EQ(record(1).msgTtl, 0);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenPageIsWhole_LogsEntryAndExitAlone) {
  out_.read(hex(kPage));
  expect_log(name_, {support::warn("%s: start", {name_}), support::warn("%s: exit", {name_})});
}

TEST_F(ForwardUnreadMessageDeserialize, WhenPageHasEntries_AllocatesTheArrayAndEachRecordZeroed) {
  support::HeapWatch watch;
  out_.read(hex("62 00 62 00 62 00"));
  watch.stop();
  ASSERT_EQ(watch.callocs().size(), 4u);
  EXPECT_EQ(watch.callocs()[0].elements, 3u);
  EXPECT_EQ(watch.callocs()[0].element_size, sizeof(void*));
  for (size_t i = 1; i < 4; ++i) {
    EXPECT_EQ(watch.callocs()[i].elements, 1u);
    EXPECT_EQ(watch.callocs()[i].element_size, sizeof(qel_message_inboxentry_t));
  }
}

TEST_F(ForwardUnreadMessageDeserialize, WhenPageHasNoEntries_WritesCountZeroAndLeavesTheArray) {
  out_.read(hex("58 07 6a 01 6b"));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.entries.count, 0);
  EXPECT_TRUE(out_.entries.array.untouched());
  EXPECT_STREQ(out_.next_key.block, "k");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenInputIsEmpty_WritesIdAndCountAlone) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.entries.count, 0);
  EXPECT_TRUE(out_.entries.array.untouched());
  EXPECT_TRUE(out_.next_key.untouched());
}

TEST_F(ForwardUnreadMessageDeserialize, WhenPageHas1000Entries_WritesThemInOrder) {
  Wire page;
  for (int i = 0; i < 1000; ++i) {
    page.message(12, Wire().number(1, i - 500).text(6, std::to_string(i)));
  }
  out_.read(page.bytes());
  ASSERT_EQ(out_.entries.count, 1000);
  for (int i = 0; i < 1000; ++i) {
    ASSERT_EQ(record(i).msgId, i - 500);
    ASSERT_STREQ(record(i).chatMsg, std::to_string(i).c_str());
  }
}

TEST_F(ForwardUnreadMessageDeserialize, WhenIdIsSmallest_WritesIt) {
  out_.read(hex("58 80 80 80 80 80 80 80 80 80 01"));
  EXPECT_EQ(out_.request_id, kSmallest);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenNumbersAreExtreme_WritesThem) {
  read_one(Wire()
               .number(1, kLargest)
               .number(3, kSmallest)
               .number(4, -1)
               .number(5, kSmallest)
               .number(7, kSmallestInt)
               .number(10, kSmallest));
  EXPECT_EQ(record(0).msgId, kLargest);
  EXPECT_EQ(record(0).sender, kSmallest);
  EXPECT_EQ(record(0).receiver, -1);
  EXPECT_EQ(record(0).sentTime, kSmallest);
  EXPECT_EQ(record(0).msgTtl, kSmallestInt);
  EXPECT_EQ(record(0).chatroomId, kSmallest);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenChatroomIdComesAlone_WritesIt) {
  read_one(Wire().number(10, 5));
  EXPECT_EQ(record(0).chatroomId, 5);
  EXPECT_EQ(record(0).chatType, 0);
  EXPECT_EQ(record(0).msgTtl, 0);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenChatTypeComesAlone_WritesIt) {
  read_one(Wire().number(11, 4));
  EXPECT_EQ(record(0).chatroomId, 0);
  EXPECT_EQ(record(0).chatType, 4);
  EXPECT_EQ(record(0).msgTtl, 0);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenTtlComesAlone_WritesIt) {
  read_one(Wire().number(7, 5));
  EXPECT_EQ(record(0).chatroomId, 0);
  EXPECT_EQ(record(0).chatType, 0);
  EXPECT_EQ(record(0).msgTtl, 5);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenEnumerationsHoldNoMember_WritesZeros) {
  read_one(Wire().number(2, 7).number(11, 5));
  EXPECT_EQ(record(0).msgType, 0);
  EXPECT_EQ(record(0).chatType, 0);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenMsgTypeIsLargest_WritesIt) {
  read_one(Wire().number(2, 30));
  EXPECT_EQ(record(0).msgType, 30);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenTextHoldsANul_CopiesUpToIt) {
  read_one(Wire().text(6, std::string("a\0b", 3)));
  EXPECT_STREQ(record(0).chatMsg, "a");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenMessageIsSecureAlone_WritesAnEmptyText) {
  read_one(Wire().text(20, "s"));
  EXPECT_STREQ(record(0).chatMsg, "");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenKeyIsAbsent_LeavesIt) {
  out_.read(hex("58 07 62 00"));
  EXPECT_TRUE(out_.next_key.untouched());
}

TEST_F(ForwardUnreadMessageDeserialize, WhenKeyIsEmptyButPresent_WritesEmptyText) {
  out_.read(hex("6a 00"));
  EXPECT_STREQ(out_.next_key.block, "");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenKeyHoldsANul_CopiesUpToIt) {
  out_.read(hex("6a 03 61 00 62"));
  EXPECT_STREQ(out_.next_key.block, "a");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenKeyIsNull_WritesTheOthers) {
  out_.read(hex(kPage), nullptr);
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.entries.count, 2);
  expect_log(name_, {support::warn("%s: start", {name_}), support::warn("%s: exit", {name_})});
}

TEST_F(ForwardUnreadMessageDeserialize, WhenTheArrayCannotBeAllocated_HasWrittenIdAndCount) {
  read_without_array(hex(kPage));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(count_, 2);
  EXPECT_EQ(out_.entries.array.block, nullptr);
}

TEST_F(ForwardUnreadMessageDeserialize, WhenTheArrayCannotBeAllocated_LeavesTheKey) {
  read_without_array(hex(kPage));
  EXPECT_TRUE(out_.next_key.untouched());
}

TEST_F(ForwardUnreadMessageDeserialize, WhenTheArrayCannotBeAllocated_LogsAnErrorAndNoExit) {
  read_without_array(hex(kPage));
  expect_log(name_, {support::warn("%s: start", {name_}),
                     support::error("qel_message_inboxentry_t * allocation fail")});
}

TEST_F(ForwardUnreadMessageDeserialize, WhenARecordCannotBeAllocated_Faults) {
  EXPECT_EXIT(read_with_failing_calloc(2, hex(kPage)), support::faults, "");
  EXPECT_EXIT(read_with_failing_calloc(3, hex(kPage)), support::faults, "");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenRequestIdIsNull_Faults) {
  EXPECT_EXIT(forward_unread_message_deserialize(nullptr, 0, nullptr, &out_.entries.array.block,
                                                 &out_.entries.count, &out_.next_key.block),
              support::faults, "");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenCountIsNull_Faults) {
  EXPECT_EXIT(
      forward_unread_message_deserialize(nullptr, 0, &out_.request_id, &out_.entries.array.block,
                                         nullptr, &out_.next_key.block),
      support::faults, "");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenInboxEntriesIsNullAndThereAreEntries_Faults) {
  const Received received(hex(kPage));
  EXPECT_EXIT(
      forward_unread_message_deserialize(received.data(), received.size(), &out_.request_id,
                                         nullptr, &out_.entries.count, &out_.next_key.block),
      support::faults, "");
}

TEST_F(ForwardUnreadMessageDeserialize, WhenInboxEntriesIsNullAndThereAreNone_WritesTheOthers) {
  const Received received(hex("58 07 6a 01 6b"));
  forward_unread_message_deserialize(received.data(), received.size(), &out_.request_id, nullptr,
                                     &out_.entries.count, &out_.next_key.block);
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.entries.count, 0);
  EXPECT_STREQ(out_.next_key.block, "k");
}

}  // namespace
