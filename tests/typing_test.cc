// Typing status: the notice, and the service's push.

#include <new>
#include <type_traits>

#include "support/exchange.h"
#include "support/heap.h"
#include "support/outputs.h"
#include "support/process_death.h"
#include "support/threads.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::expect_log;
using support::FailingCalloc;
using support::FailingNew;
using support::HeapWatch;
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

// ---- is_typing_request_serialize: the one without a status, so what all other serializers share
// is tested here too.

static_assert(std::is_void_v<decltype(is_typing_request_serialize(0, 0, nullptr, nullptr, nullptr,
                                                                  nullptr, nullptr))>);

class IsTypingRequestSerialize : public ExchangeTest {
 protected:
  const std::string name_ = "is_typing_request_serialize";
  const int type_ = 1;
  const int refresh_ = 300;
  Encoded out_;

  void call(int64_t request, int64_t chatroom, const char* state, const int* type,
            const int* refresh) {
    is_typing_request_serialize(request, chatroom, state, type, refresh, &out_.data.block,
                                &out_.size);
  }
  void call_with_type(int type) { call(1, 2, nullptr, &type, nullptr); }
  void call_with_refresh(int refresh) { call(1, 2, nullptr, nullptr, &refresh); }

  // All arguments, and the length of what they make.
  static constexpr int kLength = 13;
  void call_with_all() { call(1, 2, "on", &type_, &refresh_); }

  support::Line enter() const { return support::debug("%s: enter", {name_}); }
};

TEST_F(IsTypingRequestSerialize, WhenAllIsGiven_EncodesTheFiveArguments) {
  call_with_all();
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 6a 02 6f 6e 70 01 78 ac 02");
}

TEST_F(IsTypingRequestSerialize, WhenStateIsNull_EncodesTheOthersAlone) {
  call(1, 2, nullptr, &type_, &refresh_);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 70 01 78 ac 02");
}

TEST_F(IsTypingRequestSerialize, WhenContentTypeIsNull_EncodesTheOthersAlone) {
  call(1, 2, "on", nullptr, &refresh_);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 6a 02 6f 6e 78 ac 02");
}

TEST_F(IsTypingRequestSerialize, WhenRefreshIsNull_EncodesTheOthersAlone) {
  call(1, 2, "on", &type_, nullptr);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 6a 02 6f 6e 70 01");
}

TEST_F(IsTypingRequestSerialize, WhenNoneIsGiven_EncodesTheIdsAlone) {
  call(1, 2, nullptr, nullptr, nullptr);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02");
}

TEST_F(IsTypingRequestSerialize, WhenValuesAreZeroAndEmpty_EncodesThemAsPresent) {
  const int zero = 0;
  call(0, 0, "", &zero, &zero);
  EXPECT_EQ(to_hex(out_.bytes()), "58 00 60 00 6a 00 70 00 78 00");
}

TEST_F(IsTypingRequestSerialize, WhenIdsAreExtreme_EncodesThemWhole) {
  call(kSmallest, kLargest, nullptr, nullptr, nullptr);
  EXPECT_EQ(to_hex(out_.bytes()), "58 80 80 80 80 80 80 80 80 80 01 60 ff ff ff ff ff ff ff ff 7f");
}

TEST_F(IsTypingRequestSerialize, WhenStateIsLong_EncodesAllOfIt) {
  const std::string state(100000, 'x');
  call(1, 2, state.c_str(), nullptr, nullptr);
  EXPECT_EQ(out_.bytes(), Wire().number(11, 1).number(12, 2).text(13, state).bytes());
}

TEST_F(IsTypingRequestSerialize, WhenContentTypeIsTheLastMember_EncodesIt) {
  call_with_type(3);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 70 03");
}

TEST_F(IsTypingRequestSerialize, WhenContentTypeIsNoMember_Aborts) {
  for (const int type : {4, -1, kLargestInt, kSmallestInt}) {
    SCOPED_TRACE(type);
    EXPECT_EXIT(call_with_type(type), support::aborts,
                support::refused_by_setter("IsTyping", "contenttype", "IsTypingContentType"));
  }
}

TEST_F(IsTypingRequestSerialize, WhenRefreshIsSmallest_EncodesTenByteVarint) {
  call_with_refresh(kSmallestInt);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 78 80 80 80 80 f8 ff ff ff ff 01");
}

TEST_F(IsTypingRequestSerialize, WhenRefreshIsLargest_EncodesFiveByteVarint) {
  call_with_refresh(kLargestInt);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 78 ff ff ff ff 07");
}

TEST_F(IsTypingRequestSerialize, WhenSucceeding_LogsEntryAndExit) {
  call_with_all();
  expect_log(name_, {enter(), support::debug("%s: exit", {name_})});
}

TEST_F(IsTypingRequestSerialize, WhenItLogsItsExit_HasEncoded) {
  const std::string encoding = support::encoding_at_exit(out_, [this] { call_with_all(); });
  EXPECT_EQ(to_hex(encoding), "58 01 60 02 6a 02 6f 6e 70 01 78 ac 02");
}

TEST_F(IsTypingRequestSerialize, WhenSucceeding_AllocatesOneZeroedBufferOfTheLength) {
  HeapWatch watch;
  call_with_all();
  watch.stop();
  ASSERT_EQ(watch.callocs().size(), 1u);
  EXPECT_EQ(watch.callocs()[0].elements, static_cast<size_t>(kLength));
  EXPECT_EQ(watch.callocs()[0].element_size, 1u);
}

TEST_F(IsTypingRequestSerialize, WhenStateIsGiven_AllocatesItAlone) {
  HeapWatch watch;
  call_with_all();
  watch.stop();
  EXPECT_EQ(watch.news(), 1u);
}

TEST_F(IsTypingRequestSerialize, WhenStateIsNull_AllocatesTheBufferAlone) {
  HeapWatch watch;
  call(1, 2, nullptr, &type_, &refresh_);
  watch.stop();
  EXPECT_EQ(watch.news(), 0u);
}

TEST_F(IsTypingRequestSerialize, WhenSucceeding_KeepsNothing) {
  HeapWatch watch;
  call_with_all();
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
}

TEST_F(IsTypingRequestSerialize, WhenBufferCannotBeAllocated_WritesNullAndTheLength) {
  {
    const FailingCalloc fault(1);
    call_with_all();
  }
  EXPECT_EQ(out_.data.block, nullptr);
  EXPECT_EQ(out_.size, kLength);
}

TEST_F(IsTypingRequestSerialize, WhenBufferCannotBeAllocated_LogsItAtDebugLevelAndNoExit) {
  {
    const FailingCalloc fault(1);
    call_with_all();
  }
  expect_log(name_, {enter(), support::debug("Memory allocation is failed to serialized_data")});
}

TEST_F(IsTypingRequestSerialize, WhenBufferCannotBeAllocated_KeepsNothing) {
  HeapWatch watch;
  {
    const FailingCalloc fault(1);
    call_with_all();
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
}

TEST_F(IsTypingRequestSerialize, WhenStateCannotBeCopied_ThrowsAndKeepsNothing) {
  HeapWatch watch;
  {
    const FailingNew fault(1);
    EXPECT_THROW(call_with_all(), std::bad_alloc);
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_TRUE(out_.untouched());
}

TEST_F(IsTypingRequestSerialize, WhenSerializedDataIsNull_Faults) {
  EXPECT_EXIT(is_typing_request_serialize(1, 2, nullptr, nullptr, nullptr, nullptr, &out_.size),
              support::faults, "");
}

TEST_F(IsTypingRequestSerialize, WhenSizeIsNull_Faults) {
  EXPECT_EXIT(
      is_typing_request_serialize(1, 2, nullptr, nullptr, nullptr, &out_.data.block, nullptr),
      support::faults, "");
}

TEST_F(IsTypingRequestSerialize, WhenTwoThreadsCallIt_EncodesEachOnesArguments) {
  const int64_t ids[] = {1, kLargest};
  const std::string expected[] = {hex("58 01 60 02 6a 02 6f 6e 70 01 78 ac 02"),
                                  hex("58 ff ff ff ff ff ff ff ff 7f 60 02 6a 02 6f 6e 70 01 "
                                      "78 ac 02")};
  const auto encodes_its_own = [&](size_t i, int /*call*/) {
    Encoded out;
    is_typing_request_serialize(ids[i], 2, "on", &type_, &refresh_, &out.data.block, &out.size);
    return out.bytes() == expected[i];
  };
  EXPECT_EQ(support::wrong_calls_of_threads(2, 5000, encodes_its_own), 0);
}

// ---- typing_updated_deserialize

class TypingUpdatedDeserialize : public ExchangeTest {
 protected:
  support::TypingUpdatedOutputs out_;
};

// userId 9, deviceId 8, requestId 7, chatroomId 6, sender 5, state "on",
// contentType CONTENT_AUDIO, refresh 300
const char kTypingUpdated[] = "08 09 10 08 58 07 60 06 68 05 72 02 6f 6e 78 03 80 01 ac 02";

TEST_F(TypingUpdatedDeserialize, WhenPushIsWhole_WritesAllOutputs) {
  out_.read(hex(kTypingUpdated));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.sender, 5);
  EXPECT_STREQ(out_.state.block, "on");
  EXPECT_EQ(out_.content_type, 3);
  EXPECT_EQ(out_.refresh, 300);
}

TEST_F(TypingUpdatedDeserialize, WhenPushIsWhole_LogsEntryAndExitAlone) {
  out_.read(hex(kTypingUpdated));
  const std::string name = "typing_updated_deserialize";
  expect_log(name, {support::warn("%s: start", {name}), support::warn("%s: exit", {name})});
}

TEST_F(TypingUpdatedDeserialize, WhenInputIsEmpty_WritesZeroIdsAlone) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.chatroom_id, 0);
  EXPECT_EQ(out_.sender, kLongSentinel);
  EXPECT_TRUE(out_.state.untouched());
  EXPECT_EQ(out_.content_type, kIntSentinel);
  EXPECT_EQ(out_.refresh, kIntSentinel);
}

TEST_F(TypingUpdatedDeserialize, WhenSenderIsAbsent_LeavesItAlone) {
  out_.read(hex("58 07 60 06 72 02 6f 6e 78 03 80 01 05"));
  EXPECT_EQ(out_.sender, kLongSentinel);
  EXPECT_STREQ(out_.state.block, "on");
  EXPECT_EQ(out_.content_type, 3);
  EXPECT_EQ(out_.refresh, 5);
}

TEST_F(TypingUpdatedDeserialize, WhenStateIsAbsent_LeavesItAlone) {
  out_.read(hex("58 07 60 06 68 05 78 03 80 01 05"));
  EXPECT_EQ(out_.sender, 5);
  EXPECT_TRUE(out_.state.untouched());
  EXPECT_EQ(out_.content_type, 3);
  EXPECT_EQ(out_.refresh, 5);
}

TEST_F(TypingUpdatedDeserialize, WhenContentTypeIsAbsent_LeavesItAlone) {
  out_.read(hex("58 07 60 06 68 05 72 02 6f 6e 80 01 05"));
  EXPECT_EQ(out_.sender, 5);
  EXPECT_STREQ(out_.state.block, "on");
  EXPECT_EQ(out_.content_type, kIntSentinel);
  EXPECT_EQ(out_.refresh, 5);
}

TEST_F(TypingUpdatedDeserialize, WhenRefreshIsAbsent_LeavesItAlone) {
  out_.read(hex("58 07 60 06 68 05 72 02 6f 6e 78 03"));
  EXPECT_EQ(out_.sender, 5);
  EXPECT_STREQ(out_.state.block, "on");
  EXPECT_EQ(out_.content_type, 3);
  EXPECT_EQ(out_.refresh, kIntSentinel);
}

TEST_F(TypingUpdatedDeserialize, WhenIdsAreAbsent_WritesZerosForThem) {
  out_.read(hex("68 05"));
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.chatroom_id, 0);
  EXPECT_EQ(out_.sender, 5);
}

TEST_F(TypingUpdatedDeserialize, WhenValuesAreZeroAndEmptyButPresent_WritesThem) {
  out_.read(hex("58 00 60 00 68 00 72 00 78 00 80 01 00"));
  EXPECT_EQ(out_.sender, 0);
  EXPECT_STREQ(out_.state.block, "");
  EXPECT_EQ(out_.content_type, 0);
  EXPECT_EQ(out_.refresh, 0);
}

TEST_F(TypingUpdatedDeserialize, WhenValuesAreSmallest_WritesThem) {
  out_.read(
      hex("58 80 80 80 80 80 80 80 80 80 01 60 81 80 80 80 80 80 80 80 80 01 "
          "68 82 80 80 80 80 80 80 80 80 01 80 01 80 80 80 80 f8 ff ff ff ff 01"));
  EXPECT_EQ(out_.request_id, kSmallest);
  EXPECT_EQ(out_.chatroom_id, kSmallest + 1);
  EXPECT_EQ(out_.sender, kSmallest + 2);
  EXPECT_EQ(out_.refresh, kSmallestInt);
}

TEST_F(TypingUpdatedDeserialize, WhenValuesAreLargest_WritesThem) {
  out_.read(
      hex("58 ff ff ff ff ff ff ff ff 7f 60 fe ff ff ff ff ff ff ff 7f "
          "68 fd ff ff ff ff ff ff ff 7f 80 01 ff ff ff ff 07"));
  EXPECT_EQ(out_.request_id, kLargest);
  EXPECT_EQ(out_.chatroom_id, kLargest - 1);
  EXPECT_EQ(out_.sender, kLargest - 2);
  EXPECT_EQ(out_.refresh, kLargestInt);
}

TEST_F(TypingUpdatedDeserialize, WhenContentTypeIsAMember_WritesIt) {
  for (const int type : {0, 1, 2, 3}) {
    support::TypingUpdatedOutputs out;
    out.read(Wire().number(15, type).bytes());
    EXPECT_EQ(out.content_type, type);
  }
}

TEST_F(TypingUpdatedDeserialize, WhenContentTypeIsNoMember_LeavesItAloneAndWritesTheOthers) {
  for (const int type : {4, -1, kLargestInt, kSmallestInt}) {
    SCOPED_TRACE(type);
    support::TypingUpdatedOutputs out;
    out.read(Wire().number(11, 7).number(15, type).number(16, 5).bytes());
    EXPECT_EQ(out.content_type, kIntSentinel);
    EXPECT_EQ(out.request_id, 7);
    EXPECT_EQ(out.refresh, 5);
  }
}

TEST_F(TypingUpdatedDeserialize, WhenStateIsLong_CopiesAllOfIt) {
  const std::string state(5000, 'x');
  out_.read(Wire().text(14, state).bytes());
  EXPECT_EQ(out_.state.block, state);
}

TEST_F(TypingUpdatedDeserialize, WhenStateHoldsANul_CopiesUpToIt) {
  out_.read(hex("72 03 61 00 62"));
  EXPECT_STREQ(out_.state.block, "a");
}

// NULL for one of the outputs, whose place among them is the parameter.
class TypingUpdatedDeserializeWithNull : public TypingUpdatedDeserialize,
                                         public ::testing::WithParamInterface<int> {
 protected:
  template <typename T>
  static T* unless_null(int place, T* output) {
    return place == GetParam() ? nullptr : output;
  }

  void read() {
    const Received received(hex(kTypingUpdated));
    typing_updated_deserialize(received.data(), received.size(), unless_null(0, &out_.request_id),
                               unless_null(1, &out_.chatroom_id), unless_null(2, &out_.sender),
                               unless_null(3, &out_.state.block),
                               unless_null(4, &out_.content_type), unless_null(5, &out_.refresh));
  }
};

TEST_P(TypingUpdatedDeserializeWithNull, WhenPushIsWhole_Faults) {
  EXPECT_EXIT(read(), support::faults, "");
}

const char* const kOutputs[] = {"requestId", "chatroomId",  "sender",
                                "state",     "contentType", "refresh"};

INSTANTIATE_TEST_SUITE_P(Outputs, TypingUpdatedDeserializeWithNull, ::testing::Range(0, 6),
                         [](const auto& place) { return kOutputs[place.param]; });

}  // namespace
