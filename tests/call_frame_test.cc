// What all functions share: log lines, the encoded buffer, the parse and its two failure lines, the
// kept stream. One row of a table for each function.

#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <set>
#include <thread>

#include "support/exchange.h"
#include "support/exported_functions.h"
#include "support/heap.h"
#include "support/outputs.h"
#include "support/serializers.h"
#include "support/threads.h"

namespace {

using support::expect_log;
using support::FailingCalloc;
using support::HeapWatch;
using support::hex;
using support::kSerializers;
using support::Line;
using support::logged_calls;
using support::Serializer;
using support::to_hex;
using support::wrong_calls_of_threads;

int log_thread(size_t call) {
  return std::get<int>(logged_calls().at(call).arguments.at(3));
}

// ---- Serializers

class EverySerializer : public support::ExchangeTest,
                        public ::testing::WithParamInterface<Serializer> {
 protected:
  const Serializer& function_ = GetParam();
  support::Encoded out_;

  void call() { out_.status = function_.call(1, &out_.data.block, &out_.size); }
  // The entry line, what the function adds to it, and how it ends.
  void expect_lines(const Line& end) {
    std::vector<Line> lines = {support::debug(function_.entry, {function_.name})};
    lines.insert(lines.end(), function_.detail.begin(), function_.detail.end());
    lines.push_back(end);
    expect_log(function_.name, lines);
  }
};

TEST_P(EverySerializer, WhenSucceeding_ReturnsZeroAndTheLength) {
  call();
  EXPECT_EQ(out_.status, 0);
  EXPECT_EQ(out_.size, function_.length);
}

TEST_P(EverySerializer, WhenSucceeding_LogsEntryAndExit) {
  call();
  expect_lines(support::debug("%s: exit", {function_.name}));
}

TEST_P(EverySerializer, WhenItLogsItsExit_HasEncoded) {
  const std::string encoding = support::encoding_at_exit(out_, [this] { call(); });
  EXPECT_EQ(to_hex(encoding), to_hex(out_.bytes()));
}

TEST_P(EverySerializer, WhenSucceeding_AllocatesOneZeroedBufferOfTheLength) {
  HeapWatch watch;
  call();
  watch.stop();
  ASSERT_EQ(watch.callocs().size(), 1u);
  EXPECT_EQ(watch.callocs()[0].elements, static_cast<size_t>(function_.length));
  EXPECT_EQ(watch.callocs()[0].element_size, 1u);
}

TEST_P(EverySerializer, WhenSucceeding_AllocatesTheMessageAlone) {
  HeapWatch watch;
  call();
  watch.stop();
  EXPECT_EQ(watch.news(), function_.news);
}

TEST_P(EverySerializer, WhenSucceeding_KeepsNothing) {
  HeapWatch watch;
  call();
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
}

TEST_P(EverySerializer, WhenBufferCannotBeAllocated_ReturnsMinusOne) {
  {
    const FailingCalloc fault(1);
    call();
  }
  EXPECT_EQ(out_.status, -1);
}

TEST_P(EverySerializer, WhenBufferCannotBeAllocated_WritesNullAndTheLength) {
  {
    const FailingCalloc fault(1);
    call();
  }
  EXPECT_EQ(out_.data.block, nullptr);
  EXPECT_EQ(out_.size, function_.length);
}

TEST_P(EverySerializer, WhenBufferCannotBeAllocated_LogsEntryAndError) {
  {
    const FailingCalloc fault(1);
    call();
  }
  expect_lines(support::error("Could not allocate memory for serialized data"));
}

TEST_P(EverySerializer, WhenBufferCannotBeAllocated_KeepsNothing) {
  HeapWatch watch;
  {
    const FailingCalloc fault(1);
    call();
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
}

TEST_P(EverySerializer, WhenTwoThreadsCallIt_EncodesEachOnesArguments) {
  const auto encode = [&](int64_t request_id) {
    support::Encoded out;
    out.status = function_.call(request_id, &out.data.block, &out.size);
    return out.status == 0 ? out.bytes() : "";
  };
  const int64_t ids[] = {1, INT64_MAX};
  const std::string expected[] = {encode(ids[0]), encode(ids[1])};
  EXPECT_EQ(wrong_calls_of_threads(
                2, 5000, [&](size_t i, int /*call*/) { return encode(ids[i]) == expected[i]; }),
            0);
}

TEST(CallFrame, IsTestedOfEverySerializerThatHasAStatus) {
  std::set<std::string> functions = support::working_serializers();
  functions.erase("is_typing_request_serialize");
  EXPECT_EQ(support::names_in(kSerializers, &Serializer::name), functions);
}

INSTANTIATE_TEST_SUITE_P(CallFrame, EverySerializer, ::testing::ValuesIn(kSerializers),
                         [](const auto& row) { return row.param.name; });

// ---- Deserializers

struct Deserializer {
  std::string name;
  std::vector<Line> before;  // logged ahead of the entry
  std::string entry;         // text
  bool logs_exit;
  bool releases_stream;  // on success
  std::string whole;     // a representative message
  // Where a cut leaves a valid message: between two fields, and within an embedded message between
  // two of its fields, because the runtime takes the end of the input for the embedded message's.
  std::set<size_t> clean_cuts;
  std::set<size_t> tag_cuts;  // within a tag of two bytes, outside embedded messages
  std::vector<Line> detail;   // logged between entry and exit when the input is empty
  // Calls the function and tells whether it left every output alone.
  bool (*leaves_outputs)(const std::string& bytes);
};

template <typename Outputs>
bool leaves(const std::string& bytes) {
  Outputs outputs;
  outputs.read(bytes);
  return outputs.untouched();
}

const Deserializer kDeserializers[] = {
    // requestId 150, result { code 1000, msg "ok" }
    {"channel_auth_reply_deserialize",
     {},
     "%s start",
     false,
     true,
     hex("08 96 01 12 07 08 e8 07 12 02 6f 6b"),
     {0, 3, 5, 8},
     {},
     {},
     leaves<support::ChannelAuthReplyOutputs>},
    // requestId 150
    {"client_echo_deserialize",
     {},
     "%s start",
     true,
     true,
     hex("08 96 01"),
     {0},
     {},
     {},
     leaves<support::ClientEchoOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 1001, msg "no",
    // wrongReceiverDetail { invalidReceivers 1, disabledReceivers 2, invitationDenied 5,
    // didViolationUsers { userA 3, userB 4 } } }, msgTtl 60
    {"create_chatroom_reply_deserialize",
     {},
     "%s: enter",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 6a 16 08 e9 07 12 02 6e 6f 1a 0d 08 01 18 02 30 05 a2 01 04 08 "
         "03 10 04 a8 01 3c"),
     {0, 2, 4, 6, 8, 10, 13, 17, 19, 21, 23, 25, 28, 30, 32},
     {33},
     {},
     leaves<support::CreateChatroomReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3, msg "no" },
    // processedMessageEntries { msgId 1, sentTime 300 }
    {"chat_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 6a 06 08 03 12 02 6e 6f 72 05 08 01 10 ac 02"),
     {0, 2, 4, 6, 8, 10, 12, 16, 18, 20},
     {},
     {support::debug("processed msg entry size : %d", {0})},
     leaves<support::ChatReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3, msg "no" },
    // lastReadAckTimestamp 5, orderedChatroomMemberList { userId 1, available true, name "a" },
    // readAckEntries { userId 1, msgId 2, timestamp 3 }, title "t",
    // deliveryAckEntries { userId 4, msgId 5, timestamp 6 }, lastDeliveryAckTimestamp 4, msgTtl 60
    {"allow_chat_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 6a 06 08 03 12 02 6e 6f 70 05 82 01 07 08 01 10 01 1a 01 61 8a "
         "01 06 08 01 10 02 18 03 92 01 01 74 a2 01 06 08 04 10 05 18 06 a8 01 04 b0 01 3c"),
     {0, 2, 4, 6, 8, 10, 12, 16, 18, 21, 23, 25, 28, 31, 33, 35, 37, 41, 44, 46, 48, 50, 53},
     {19, 29, 38, 42, 51, 54},
     {},
     leaves<support::AllowChatReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, result { code 3, msg "no" }
    {"get_all_unread_message_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 62 06 08 03 12 02 6e 6f"),
     {0, 2, 4, 6, 8, 10},
     {},
     {},
     leaves<support::GetAllUnreadMessageReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, chatType GROUP, inboxEntry { msgId 1,
    // msgType TEXT, sender 2, receiver 3, sentTime 4, chatMsg "hi", msgTtl 5 }, skipReply true
    {"forward_online_message_get_deserialize",
     {support::error("check ")},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 68 01 72 10 08 01 10 00 18 02 20 03 28 04 32 02 68 69 38 05 f0 "
         "01 01"),
     {0, 2, 4, 6, 8, 10, 12, 14, 16, 18, 20, 22, 26, 28},
     {29},
     {support::error("has_skipreply:false "), support::error("msgType : %d ", {0})},
     leaves<support::ForwardOnlineMessageOutputs>},
    // userId 9, deviceId 8, requestId 7, inboxEntries { msgId 1, msgType TEXT, sender 2,
    // receiver 3, sentTime 4, chatMsg "hi", msgTtl 5, chatroomId 6, chatType GROUP },
    // nextPaginationKey "k"
    {"forward_unread_message_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 62 14 08 01 10 00 18 02 20 03 28 04 32 02 68 69 38 05 50 06 58 01 6a "
         "01 6b"),
     {0, 2, 4, 6, 8, 10, 12, 14, 16, 18, 22, 24, 26, 28},
     {},
     {},
     leaves<support::ForwardUnreadMessageOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3, msg "no" }
    {"read_message_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 6a 06 08 03 12 02 6e 6f"),
     {0, 2, 4, 6, 8, 10, 12},
     {},
     {},
     leaves<support::ReadMessageReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, result { code 3, msg "no" }
    {"end_chat_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 62 06 08 03 12 02 6e 6f"),
     {0, 2, 4, 6, 8, 10},
     {},
     {},
     leaves<support::EndChatReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3003, msg "no",
    // wrongReceiverDetail { invalidReceivers 1, interruptedReceivers 2, disabledReceivers 3,
    // existing 4, invitationDenied 5, didViolationUsers { userA 6, userB 7 } } }, sentTime 300
    {"invite_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 6a 1a 08 bb 17 12 02 6e 6f 1a 11 08 01 10 02 18 03 20 04 30 05 "
         "a2 01 04 08 06 10 07 70 ac 02"),
     {0, 2, 4, 6, 8, 10, 13, 17, 19, 21, 23, 25, 27, 29, 32, 34, 36},
     {},
     {},
     leaves<support::InviteReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, result { code 3, msg "no" }, currentTimeMillis 1500
    {"current_time_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 62 06 08 03 12 02 6e 6f 68 dc 0b"),
     {0, 2, 4, 6, 8, 10, 14},
     {},
     {},
     leaves<support::CurrentTimeOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3, msg "no" }
    {"unseal_message_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 6a 06 08 03 12 02 6e 6f"),
     {0, 2, 4, 6, 8, 10, 12},
     {},
     {},
     leaves<support::UnsealMessageReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3, msg "no" }
    {"save_call_log_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 6a 06 08 03 12 02 6e 6f"),
     {0, 2, 4, 6, 8, 10, 12},
     {},
     {},
     leaves<support::SaveCallLogReplyOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, sender 5, state "on",
    // contentType CONTENT_AUDIO, refresh 300
    {"typing_updated_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 68 05 72 02 6f 6e 78 03 80 01 ac 02"),
     {0, 2, 4, 6, 8, 10, 14, 16},
     {17},
     {},
     leaves<support::TypingUpdatedOutputs>},
    // userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3, msg "no" },
    // changeTimeMillis 300
    {"change_chatroom_meta_reply_deserialize",
     {},
     "%s: start",
     true,
     false,
     hex("08 09 10 08 58 07 60 06 6a 06 08 03 12 02 6e 6f 70 ac 02"),
     {0, 2, 4, 6, 8, 10, 12, 16},
     {},
     {},
     leaves<support::ChangeChatroomMetaReplyOutputs>},
};

void PrintTo(const Deserializer& function, std::ostream* out) {
  *out << function.name;
}

// A field that no message has, number 1000, as an unknown group: its start and its end.
const char kGroupStart[] = "c3 3e";
const char kGroupEnd[] = "c4 3e";

std::string repeated(const std::string& text, int times) {
  std::string all;
  for (int i = 0; i < times; ++i) {
    all += text;
  }
  return all;
}

class EveryDeserializer : public support::ExchangeTest,
                          public ::testing::WithParamInterface<Deserializer> {
 protected:
  const Deserializer& function_ = GetParam();

  bool leaves_outputs(const std::string& bytes) const { return function_.leaves_outputs(bytes); }
  // What every call logs first.
  std::vector<Line> entry() const {
    std::vector<Line> lines = function_.before;
    lines.push_back(support::warn(function_.entry, {function_.name}));
    return lines;
  }

  void expect_success(const std::string& bytes) {
    EXPECT_FALSE(leaves_outputs(bytes));
    const auto logged = logged_calls();
    ASSERT_FALSE(logged.empty());
    for (const auto& call : logged) {
      EXPECT_EQ(call.format.find(support::kMergeError), std::string::npos);
      EXPECT_EQ(call.format.find(support::kStreamError), std::string::npos);
    }
    support::clear_log();
  }
  void expect_failure(const std::string& bytes, const std::vector<std::string>& errors) {
    EXPECT_TRUE(leaves_outputs(bytes));
    std::vector<Line> lines = entry();
    for (const std::string& text : errors) {
      lines.push_back(support::error(text));
    }
    expect_log(function_.name, lines);
  }
  // Apart from what it hands out, which is released.
  std::vector<size_t> kept(const std::string& bytes) const {
    HeapWatch watch;
    leaves_outputs(bytes);
    watch.stop();
    EXPECT_EQ(watch.not_freed(), std::vector<size_t>{});
    return watch.kept();
  }
};

TEST_P(EveryDeserializer, WhenInputIsEmpty_SucceedsAndLogsEntryAndExit) {
  EXPECT_FALSE(leaves_outputs(""));
  std::vector<Line> lines = entry();
  lines.insert(lines.end(), function_.detail.begin(), function_.detail.end());
  if (function_.logs_exit) {
    lines.push_back(support::warn("%s: exit", {function_.name}));
  }
  expect_log(function_.name, lines);
}

TEST_P(EveryDeserializer, WhenMessageIsWhole_Succeeds) {
  expect_success(function_.whole);
}

TEST_P(EveryDeserializer, WhenCutWithinAField_WritesNothingAndLogsBothErrors) {
  for (size_t cut = 0; cut < function_.whole.size(); ++cut) {
    SCOPED_TRACE(cut);
    if (function_.clean_cuts.count(cut) == 0 && function_.tag_cuts.count(cut) == 0) {
      expect_failure(function_.whole.substr(0, cut), {support::kMergeError, support::kStreamError});
    }
  }
}

TEST_P(EveryDeserializer, WhenCutBetweenFields_Succeeds) {
  for (const size_t cut : function_.clean_cuts) {
    SCOPED_TRACE(cut);
    expect_success(function_.whole.substr(0, cut));
  }
}

TEST_P(EveryDeserializer, WhenCutWithinATag_WritesNothingAndLogsTheStreamErrorAlone) {
  expect_failure(function_.whole + hex("c3"), {support::kStreamError});
  for (const size_t cut : function_.tag_cuts) {
    SCOPED_TRACE(cut);
    expect_failure(function_.whole.substr(0, cut), {support::kStreamError});
  }
}

TEST_P(EveryDeserializer, WhenAnUnknownGroupIsNotEnded_WritesNothingAndLogsTheMergeErrorAlone) {
  expect_failure(function_.whole + hex(kGroupStart), {support::kMergeError});
}

TEST_P(EveryDeserializer, WhenAGroupEndsThatNeverStarted_WritesNothingAndLogsTheStreamErrorAlone) {
  expect_failure(function_.whole + hex(kGroupEnd), {support::kStreamError});
}

TEST_P(EveryDeserializer, WhenATagIsZero_WritesNothingAndLogsTheStreamErrorAlone) {
  expect_failure(function_.whole + hex("00"), {support::kStreamError});
}

TEST_P(EveryDeserializer, WhenAWireTypeDoesNotExist_WritesNothingAndLogsBothErrors) {
  expect_failure(hex("0f") + function_.whole, {support::kMergeError, support::kStreamError});
}

TEST_P(EveryDeserializer, WhenAVarintIsTooLong_WritesNothingAndLogsBothErrors) {
  expect_failure(hex("08 ff ff ff ff ff ff ff ff ff ff 01"),
                 {support::kMergeError, support::kStreamError});
}

TEST_P(EveryDeserializer, WhenAFieldIsUnknown_Succeeds) {
  expect_success(function_.whole + support::Wire().text(1000, "unknown").bytes());
}

TEST_P(EveryDeserializer, WhenGroupsNestAsDeepAsTheRuntimeAllows_Succeeds) {
  expect_success(hex(repeated(kGroupStart, 100) + repeated(kGroupEnd, 100)));
}

TEST_P(EveryDeserializer, WhenGroupsNestDeeper_WritesNothingAndLogsBothErrors) {
  expect_failure(hex(repeated(kGroupStart, 101) + repeated(kGroupEnd, 101)),
                 {support::kMergeError, support::kStreamError});
}

// An unknown field that makes the whole input as long as wanted; at these lengths its own length
// takes four bytes.
std::string input_of(int size) {
  const int around = 2 + 4;
  return support::Wire().text(1000, std::string(static_cast<size_t>(size - around), 'x')).bytes();
}

TEST_P(EveryDeserializer, WhenInputHas64MiB_Succeeds) {
  expect_success(input_of(64 << 20));
}

TEST_P(EveryDeserializer, WhenInputHasMoreThan64MiB_WritesNothingAndLogsTheStreamErrorAlone) {
  expect_failure(input_of((64 << 20) + 1), {support::kStreamError});
}

TEST_P(EveryDeserializer, WhenSucceeding_KeepsTheStreamUnlessItReleasesIt) {
  const std::vector<size_t> one_stream = {support::kStreamSize};
  EXPECT_EQ(kept(function_.whole), function_.releases_stream ? std::vector<size_t>{} : one_stream);
}

TEST_P(EveryDeserializer, WhenTheParseFails_KeepsTheStream) {
  EXPECT_EQ(kept(hex(kGroupStart)), std::vector<size_t>{support::kStreamSize});
}

TEST_P(EveryDeserializer, WhenTheStreamDoesNotEndCleanly_KeepsTheStream) {
  EXPECT_EQ(kept(hex("00")), std::vector<size_t>{support::kStreamSize});
}

TEST_P(EveryDeserializer, WhenBothFail_KeepsTheStream) {
  EXPECT_EQ(kept(hex("0f")), std::vector<size_t>{support::kStreamSize});
}

TEST_P(EveryDeserializer, WhenTheStreamCannotBeAllocated_ThrowsAfterItsEntryLine) {
  {
    const support::FailingNew fault(1);
    EXPECT_THROW(leaves_outputs(function_.whole), std::bad_alloc);
  }
  expect_log(function_.name, entry());
}

TEST_P(EveryDeserializer, WhenTwoThreadsCallIt_ReadsEachOnesMessage) {
  // One reads a whole message, the other one that is cut; neither sees the other's.
  const std::string messages[] = {function_.whole, function_.whole.substr(0, 1)};
  EXPECT_EQ(
      wrong_calls_of_threads(
          2, 5000, [&](size_t i, int /*call*/) { return leaves_outputs(messages[i]) == (i == 1); }),
      0);
}

TEST(CallFrame, IsTestedOfEveryDeserializer) {
  EXPECT_EQ(support::names_in(kDeserializers, &Deserializer::name),
            support::working_deserializers());
}

INSTANTIATE_TEST_SUITE_P(CallFrame, EveryDeserializer, ::testing::ValuesIn(kDeserializers),
                         [](const auto& row) { return row.param.name; });

// ---- The log line

class LogLine : public support::ExchangeTest {
 protected:
  support::Encoded out_;

  void call() { out_.status = client_echo_reply_serialize(1, &out_.data.block, &out_.size); }
};

TEST_F(LogLine, OfAnEntry_HasTheWholeFormatInOneLiteral) {
  call();
  EXPECT_EQ(logged_calls().at(0).format, "%s: %s(%d) > \033[32m[%d]%s start\033[0m");
}

TEST_F(LogLine, OfAFailedParse_HasTheWholeFormatInOneLiteral) {
  support::ClientEchoOutputs out;
  out.read(hex("08"));
  EXPECT_EQ(logged_calls().at(0).format, "%s: %s(%d) > \033[33m[%d]%s start\033[0m");
  EXPECT_EQ(logged_calls().at(1).format,
            "%s: %s(%d) > \033[31m[%d]merge error : Could not parse the received data!\033[0m");
  EXPECT_EQ(logged_calls().at(2).format,
            "%s: %s(%d) > \033[31m[%d]ConsumedEntireMessage error :Could not parse the received "
            "data\033[0m");
}

TEST_F(LogLine, OfAnotherThread_CarriesThatThreadsId) {
  int id = 0;
  std::thread([&] {
    id = static_cast<int>(syscall(SYS_gettid));
    call();
  }).join();
  EXPECT_NE(id, static_cast<int>(getpid()));
  EXPECT_EQ(log_thread(0), id);
}

TEST_F(LogLine, OfAForkedProcess_CarriesItsOwnThreadId) {
  call();  // whatever might be cached is cached now
  support::clear_log();
  const pid_t child = fork();
  if (child == 0) {
    client_echo_reply_serialize(1, &out_.data.block, &out_.size);
    _exit(log_thread(1) == static_cast<int>(getpid()) ? 0 : 1);
  }
  int status = -1;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0);
}

}  // namespace
