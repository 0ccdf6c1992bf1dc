// Inviting members into a chatroom, and the users whom the service refuses.

#include <algorithm>

#include "support/exchange.h"
#include "support/heap.h"
#include "support/outputs.h"
#include "support/process_death.h"
#include "support/refused_receivers.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::expect_log;
using support::FailingCalloc;
using support::FailingMalloc;
using support::HeapWatch;
using support::hex;
using support::kIntSentinel;
using support::kLargest;
using support::kLargestInt;
using support::kLongSentinel;
using support::kSmallest;
using support::kSmallestInt;
using support::Line;
using support::ListOutput;
using support::LogObserver;
using support::Received;
using support::to_hex;
using support::warn;
using support::Wire;
using testing::Values;
using testing::ValuesIn;

// ---- invite_chat_request_serialize

class InviteChatRequestSerialize : public ExchangeTest {
 protected:
  const std::string name_ = "invite_chat_request_serialize";
  Encoded out_;

  void call(int64_t request, int64_t chatroom, const int64_t* members, const int* count) {
    out_.status = invite_chat_request_serialize(request, chatroom, members, count, &out_.data.block,
                                                &out_.size);
  }
  void call_with_members(const std::vector<int64_t>& members) {
    const int count = static_cast<int>(members.size());
    call(1, 2, members.data(), &count);
  }
  void call_with_count(const int64_t* members, int count) { call(1, 2, members, &count); }

  void expect_bytes(const std::string& expected) {
    ASSERT_EQ(out_.status, 0);
    EXPECT_EQ(to_hex(out_.bytes()), expected);
  }
  void expect_count_logged(int count) {
    expect_log(name_, {support::debug("%s start", {name_}),
                       support::debug("in_invtingMemebersCount=%d\n", {count}),
                       support::debug("%s: exit", {name_})});
  }
};

TEST_F(InviteChatRequestSerialize, WhenCalled_EncodesTheArgumentsAndNoIdsOfTheSender) {
  call_with_members({3, 300});
  expect_bytes("58 01 60 02 68 03 68 ac 02");
}

TEST_F(InviteChatRequestSerialize, WhenIdsAreZero_EncodesThemAsPresent) {
  const int64_t member = 0;
  const int count = 1;
  call(0, 0, &member, &count);
  expect_bytes("58 00 60 00 68 00");
}

TEST_F(InviteChatRequestSerialize, WhenIdsAreExtreme_EncodesThem) {
  const int64_t members[] = {kSmallest, kLargest};
  const int count = 2;
  call(kLargest, kSmallest, members, &count);
  expect_bytes(
      "58 ff ff ff ff ff ff ff ff 7f 60 80 80 80 80 80 80 80 80 80 01 "
      "68 80 80 80 80 80 80 80 80 80 01 68 ff ff ff ff ff ff ff ff 7f");
}

TEST_F(InviteChatRequestSerialize, WhenMembersRepeat_EncodesThemAllInOrder) {
  call_with_members({5, 3, 5, 5});
  expect_bytes("58 01 60 02 68 05 68 03 68 05 68 05");
}

TEST_F(InviteChatRequestSerialize, WhenThereAre1000Members_EncodesThemAll) {
  std::vector<int64_t> members;
  Wire expected = Wire().number(11, 1).number(12, 2);
  for (int i = 0; i < 1000; ++i) {
    members.push_back(i - 500);
    expected.number(13, i - 500);
  }
  call_with_members(members);
  expect_bytes(to_hex(expected.bytes()));
}

TEST_F(InviteChatRequestSerialize, WhenThereAreMembers_LogsTheirCount) {
  call_with_members({5, 3, 5});
  expect_count_logged(3);
}

TEST_F(InviteChatRequestSerialize, WhenCountIsNull_EncodesNoMembers) {
  const int64_t member = 3;
  call(1, 2, &member, nullptr);
  expect_bytes("58 01 60 02");
}

TEST_F(InviteChatRequestSerialize, WhenCountIsNull_MembersMayBeNull) {
  call(1, 2, nullptr, nullptr);
  expect_bytes("58 01 60 02");
}

TEST_F(InviteChatRequestSerialize, WhenCountIsNull_LogsEntryAndExitAlone) {
  call(1, 2, nullptr, nullptr);
  expect_log(name_, {support::debug("%s start", {name_}), support::debug("%s: exit", {name_})});
}

TEST_F(InviteChatRequestSerialize, WhenCountIsZero_EncodesNoMembersAndLogsIt) {
  const int64_t member = 3;
  call_with_count(&member, 0);
  expect_bytes("58 01 60 02");
  expect_count_logged(0);
}

TEST_F(InviteChatRequestSerialize, WhenCountIsZero_MembersMayBeNull) {
  call_with_count(nullptr, 0);
  expect_bytes("58 01 60 02");
}

TEST_F(InviteChatRequestSerialize, WhenCountIsNegative_EncodesNoMembersAndLogsIt) {
  const int64_t member = 3;
  call_with_count(&member, -1);
  expect_bytes("58 01 60 02");
  expect_count_logged(-1);
}

TEST_F(InviteChatRequestSerialize, WhenCountIsSmallest_EncodesNoMembersAndLogsIt) {
  call_with_count(nullptr, kSmallestInt);
  expect_bytes("58 01 60 02");
  expect_count_logged(kSmallestInt);
}

TEST_F(InviteChatRequestSerialize, WhenMembersIsNullAndCountIsOne_FaultsAfterTheCountLine) {
  EXPECT_EXIT(
      {
        const LogObserver observer(support::print_format);
        call_with_count(nullptr, 1);
      },
      support::faults, "in_invtingMemebersCount");
}

// ---- invite_reply_deserialize

class InviteReplyDeserialize : public support::RefusedReceiversTest<support::InviteReplyOutputs> {
 protected:
  // The log holds these lines between entry and exit.
  static void expect_details(std::vector<Line> lines) {
    const std::string name = "invite_reply_deserialize";
    lines.insert(lines.begin(), warn("%s: start", {name}));
    lines.push_back(warn("%s: exit", {name}));
    expect_log(name, lines);
  }
  static Line pairs_count(int n) { return warn("%d didviolationusersCount", {n}); }
};

// userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3003, msg "no",
// wrongReceiverDetail { invalidReceivers 1, interruptedReceivers 2, disabledReceivers 3,
// existing 4, invitationDenied 5, didViolationUsers { userA 6, userB 7 } } }, sentTime 300
const char kReply[] =
    "08 09 10 08 58 07 60 06 6a 1a 08 bb 17 12 02 6e 6f 1a 11 08 01 10 02 18 03 20 04 30 05 a2 01 "
    "04 08 06 10 07 70 ac 02";

// The detail of that reply.
const Wire kDetail =
    Wire().number(1, 1).number(2, 2).number(3, 3).number(4, 4).number(6, 5).message(
        20, Wire().number(1, 6).number(2, 7));

TEST_F(InviteReplyDeserialize, WhenReplyIsWhole_WritesIdsTimeAndResult) {
  out_.read(hex(kReply));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.sent_time, 300);
  EXPECT_EQ(out_.code, 3003);
  EXPECT_STREQ(out_.text.block, "no");
}

TEST_F(InviteReplyDeserialize, WhenReplyIsWhole_LogsTheDetailsListByList) {
  out_.read(hex(kReply));
  expect_details({warn("%d invalidReceivers", {1}), warn("invalidReceiver[%d] : %lld", {0, 1LL}),
                  warn("%d interruptedReceivers", {1}),
                  warn("interruptedReceivers[%d] : %lld", {0, 2LL}),
                  warn("%d disabledReceivers", {1}), warn("disabledReceivers[%d] : %lld", {0, 3LL}),
                  warn("%d existingChatmembers", {1}),
                  warn("existingChatmembers[%d] : %lld", {0, 4LL}), pairs_count(1), pairs_found(1),
                  user_a(6), user_b(7), warn("did denied invitations : %lld", {5LL})});
}

TEST_F(InviteReplyDeserialize, WhenIdsAndTimeAreExtreme_WritesThem) {
  out_.read(Wire().number(11, kSmallest).number(12, kLargest).number(14, kSmallest).bytes());
  EXPECT_EQ(out_.request_id, kSmallest);
  EXPECT_EQ(out_.chatroom_id, kLargest);
  EXPECT_EQ(out_.sent_time, kSmallest);
}

TEST_F(InviteReplyDeserialize, WhenTimeIsZeroButPresent_WritesZero) {
  out_.read(hex("70 00"));
  EXPECT_EQ(out_.sent_time, 0);
}

TEST_F(InviteReplyDeserialize, WhenTimeIsAbsent_LeavesIt) {
  out_.read(hex("58 07 60 06 6a 02 08 05"));
  EXPECT_EQ(out_.sent_time, kLongSentinel);
  EXPECT_EQ(out_.code, 5);
}

TEST_F(InviteReplyDeserialize, WhenTimeIsNull_WritesTheOthers) {
  out_.read(hex(kReply), nullptr, &out_.code, &out_.text.block);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.code, 3003);
  EXPECT_STREQ(out_.text.block, "no");
  EXPECT_EQ(out_.denied.elements(), std::vector<int64_t>{5});
}

TEST_F(InviteReplyDeserialize, WhenInputIsEmpty_WritesZeroIdsAlone) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.chatroom_id, 0);
  EXPECT_EQ(out_.sent_time, kLongSentinel);
  EXPECT_EQ(out_.code, kIntSentinel);
  EXPECT_TRUE(out_.text.untouched());
  EXPECT_TRUE(out_.details_untouched());
}

TEST_F(InviteReplyDeserialize, WhenResultIsAbsent_WritesIdsAndTimeAlone) {
  out_.read(hex("58 07 60 06 70 0a"));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.sent_time, 10);
  EXPECT_EQ(out_.code, kIntSentinel);
  EXPECT_TRUE(out_.text.untouched());
  EXPECT_TRUE(out_.details_untouched());
}

TEST_F(InviteReplyDeserialize, WhenAllListsAreEmpty_WritesZeroCountsAndLeavesArrays) {
  read(1001, Wire());
  for (const auto* list :
       {&out_.invalid, &out_.interrupted, &out_.disabled, &out_.existing, &out_.denied}) {
    EXPECT_EQ(list->count, 0);
    EXPECT_TRUE(list->array.untouched());
  }
  EXPECT_EQ(out_.violations.count, 0);
  EXPECT_TRUE(out_.violations.array.untouched());
}

TEST_F(InviteReplyDeserialize, WhenAllListsAreEmpty_AllocatesAndLogsNothing) {
  HeapWatch watch;
  read(1001, Wire());
  watch.stop();
  EXPECT_TRUE(watch.callocs().empty());
  EXPECT_TRUE(watch.mallocs().empty());
  expect_details({});
}

TEST_F(InviteReplyDeserialize, WhenOneListHasElements_WritesZeroCountsOfTheOthers) {
  read(1001, Wire().number(6, 11).number(6, 12));
  for (const auto* list : {&out_.invalid, &out_.interrupted, &out_.disabled, &out_.existing}) {
    EXPECT_EQ(list->count, 0);
    EXPECT_TRUE(list->array.untouched());
  }
  EXPECT_EQ(out_.violations.count, 0);
  EXPECT_TRUE(out_.violations.array.untouched());
  EXPECT_EQ(out_.denied.elements(), (std::vector<int64_t>{11, 12}));
}

TEST_F(InviteReplyDeserialize, WhenOtherListsHaveElements_HandsNoneOfThemOut) {
  Wire detail;
  for (const int field : {5, 7, 10, 11}) {
    detail.number(field, 1);
  }
  read(1001, detail);
  for (const auto* list :
       {&out_.invalid, &out_.interrupted, &out_.disabled, &out_.existing, &out_.denied}) {
    EXPECT_EQ(list->count, 0);
  }
  EXPECT_EQ(out_.violations.count, 0);
  expect_details({});
}

// ---- invite_reply_deserialize: codes

class InviteReplyDetailCode : public InviteReplyDeserialize,
                              public testing::WithParamInterface<int> {};

TEST_P(InviteReplyDetailCode, WhenReplyHasDetails_WritesTheSixLists) {
  read(GetParam(), kDetail);
  EXPECT_EQ(out_.code, GetParam());
  EXPECT_EQ(out_.invalid.elements(), std::vector<int64_t>{1});
  EXPECT_EQ(out_.interrupted.elements(), std::vector<int64_t>{2});
  EXPECT_EQ(out_.disabled.elements(), std::vector<int64_t>{3});
  EXPECT_EQ(out_.existing.elements(), std::vector<int64_t>{4});
  EXPECT_EQ(out_.denied.elements(), std::vector<int64_t>{5});
  EXPECT_EQ(pairs(), (std::vector<Pair>{{6, 7}}));
}

TEST_P(InviteReplyDetailCode, WhenCodeIsNull_Faults) {
  EXPECT_EXIT(out_.read(reply(GetParam(), Wire()).bytes(), nullptr, &out_.text.block),
              support::faults, "");
}

INSTANTIATE_TEST_SUITE_P(Reply, InviteReplyDetailCode, Values(1000, 1001, 3003, 3009));

class InviteReplyOtherCode : public InviteReplyDeserialize,
                             public testing::WithParamInterface<int> {};

TEST_P(InviteReplyOtherCode, WhenReplyHasDetails_WritesTheCodeAndNoDetails) {
  read(GetParam(), kDetail);
  EXPECT_EQ(out_.code, GetParam());
  EXPECT_TRUE(out_.details_untouched());
  expect_details({});
}

INSTANTIATE_TEST_SUITE_P(Reply, InviteReplyOtherCode,
                         Values(0, 1, 999, 1002, 2000, 3002, 3004, 3008, 3010, 9999, -1000, -1001,
                                -3003, -3009, kSmallestInt, kLargestInt));

// ---- invite_reply_deserialize: lists of ids

struct IdList {
  std::string name;
  int field;
  std::string count_text;
  std::string element_text;
  ListOutput<int64_t> support::InviteReplyOutputs::*output;
};

// Four of the five are alike.
const IdList kIndexedLists[] = {
    {"invalidReceivers", 1, "%d invalidReceivers", "invalidReceiver[%d] : %lld",
     &support::InviteReplyOutputs::invalid},
    {"interruptedReceivers", 2, "%d interruptedReceivers", "interruptedReceivers[%d] : %lld",
     &support::InviteReplyOutputs::interrupted},
    {"disabledReceivers", 3, "%d disabledReceivers", "disabledReceivers[%d] : %lld",
     &support::InviteReplyOutputs::disabled},
    {"existing", 4, "%d existingChatmembers", "existingChatmembers[%d] : %lld",
     &support::InviteReplyOutputs::existing}};
const IdList kDeniedList[] = {{"invitationDenied", 6, "", "did denied invitations : %lld",
                               &support::InviteReplyOutputs::denied}};

class InviteReplyIdList : public InviteReplyDeserialize,
                          public testing::WithParamInterface<IdList> {
 protected:
  const ListOutput<int64_t>& list_ = out_.*GetParam().output;

  void read_ids(const std::vector<int64_t>& ids) {
    Wire detail;
    for (const int64_t id : ids) {
      detail.number(GetParam().field, id);
    }
    read(1001, detail);
  }
  // At each log line, what the list holds.
  std::vector<std::vector<int64_t>> seen_while_reading(const std::vector<int64_t>& ids) {
    std::vector<std::vector<int64_t>> seen;
    const LogObserver observer([&](const auto& /*call*/) { seen.push_back(list_.elements()); });
    const HeapWatch fills_fresh_blocks;
    read_ids(ids);
    return seen;
  }
};

TEST_P(InviteReplyIdList, WhenThereIsOneId_WritesIt) {
  read_ids({300});
  EXPECT_EQ(list_.count, 1);
  EXPECT_EQ(list_.elements(), std::vector<int64_t>{300});
}

TEST_P(InviteReplyIdList, WhenIdsAreExtremeAndRepeat_WritesThemAllInOrder) {
  const std::vector<int64_t> ids = {kLargest, 0, -1, kSmallest, -1};
  read_ids(ids);
  EXPECT_EQ(list_.elements(), ids);
}

TEST_P(InviteReplyIdList, WhenThereAre1000Ids_WritesThemAll) {
  std::vector<int64_t> ids;
  for (int i = 0; i < 1000; ++i) {
    ids.push_back(kSmallest + i);
  }
  read_ids(ids);
  EXPECT_EQ(list_.count, 1000);
  EXPECT_EQ(list_.elements(), ids);
}

INSTANTIATE_TEST_SUITE_P(Indexed, InviteReplyIdList, ValuesIn(kIndexedLists),
                         [](const auto& row) { return row.param.name; });
INSTANTIATE_TEST_SUITE_P(Other, InviteReplyIdList, ValuesIn(kDeniedList),
                         [](const auto& row) { return row.param.name; });

class InviteReplyIndexedList : public InviteReplyIdList {};

TEST_P(InviteReplyIndexedList, WhenThereAreIds_LogsTheirCountAndEachWithItsIndex) {
  read_ids({5, kSmallest, 4});
  expect_details({warn(GetParam().count_text, {3}), warn(GetParam().element_text, {0, 5LL}),
                  warn(GetParam().element_text, {1, static_cast<long long>(kSmallest)}),
                  warn(GetParam().element_text, {2, 4LL})});
}

TEST_P(InviteReplyIndexedList, WhenThereAreIds_LogsTheirCountBeforeTheArrayAndEachOnceStored) {
  int64_t fresh = 0;
  std::fill_n(reinterpret_cast<unsigned char*>(&fresh), sizeof fresh, HeapWatch::kFreshByte);
  EXPECT_EQ(seen_while_reading({5, 6}),
            (std::vector<std::vector<int64_t>>{{}, {}, {5, fresh}, {5, 6}, {5, 6}}));
}

TEST_P(InviteReplyIndexedList, WhenThereAreIds_AllocatesOneArrayThatIsNotZeroed) {
  HeapWatch watch;
  read_ids({5, 6, 7});
  watch.stop();
  EXPECT_EQ(watch.mallocs(), std::vector<size_t>{24});
  EXPECT_TRUE(watch.callocs().empty());
}

TEST_P(InviteReplyIndexedList, WhenTheArrayCannotBeAllocated_FaultsAfterTheCountLine) {
  EXPECT_EXIT(
      {
        const LogObserver observer(support::print_format);
        const FailingMalloc fault(1);
        read_ids({5, 6});
      },
      support::faults, GetParam().count_text);
}

INSTANTIATE_TEST_SUITE_P(Reply, InviteReplyIndexedList, ValuesIn(kIndexedLists),
                         [](const auto& row) { return row.param.name; });

class InviteReplyDeniedList : public InviteReplyIdList {};

TEST_P(InviteReplyDeniedList, WhenThereAreIds_LogsEachAndNoCount) {
  read_ids({5, kSmallest, 4});
  expect_details({warn(GetParam().element_text, {5LL}),
                  warn(GetParam().element_text, {static_cast<long long>(kSmallest)}),
                  warn(GetParam().element_text, {4LL})});
}

TEST_P(InviteReplyDeniedList, WhenThereAreIds_LogsEachOnceStored) {
  EXPECT_EQ(seen_while_reading({5, 6}),
            (std::vector<std::vector<int64_t>>{{}, {5, 0}, {5, 6}, {5, 6}}));
}

TEST_P(InviteReplyDeniedList, WhenThereAreIds_AllocatesOneZeroedArray) {
  HeapWatch watch;
  read_ids({5, 6, 7});
  watch.stop();
  ASSERT_EQ(watch.callocs().size(), 1u);
  EXPECT_EQ(watch.callocs()[0].elements, 3u);
  EXPECT_EQ(watch.callocs()[0].element_size, 8u);
  EXPECT_TRUE(watch.mallocs().empty());
}

TEST_P(InviteReplyDeniedList, WhenTheArrayCannotBeAllocated_Faults) {
  EXPECT_EXIT(
      {
        const FailingCalloc fault(1);
        read_ids({5, 6});
      },
      support::faults, "");
}

INSTANTIATE_TEST_SUITE_P(Reply, InviteReplyDeniedList, ValuesIn(kDeniedList),
                         [](const auto& row) { return row.param.name; });

// ---- invite_reply_deserialize: pairs

class InviteReplyPairs : public InviteReplyDeserialize {};

TEST_F(InviteReplyPairs, WhenIdsAreZeroButPresent_LogsThem) {
  read_pairs({pair(0, 0)});
  expect_details({pairs_count(1), pairs_found(1), user_a(0), user_b(0)});
}

TEST_F(InviteReplyPairs, WhenThereAreTwo_LogsTheirCountTwiceAndEach) {
  read_pairs({pair(1, kSmallest), pair(3, 4)});
  expect_details({pairs_count(2), pairs_found(2), user_a(1), user_b(kSmallest),
                  next_round(user_a(3)), user_b(4)});
}

TEST_F(InviteReplyPairs, WhenUsersAreAbsent_DoesNotLogThem) {
  read_pairs({Wire().number(2, 5), Wire().number(1, 6), Wire(), pair(7, 8)});
  expect_details({pairs_count(4), pairs_found(4), user_b(5), next_round(user_a(6)),
                  next_round(user_a(7)), user_b(8)});
}

TEST_F(InviteReplyPairs, WhenThereAreAny_StoresTheArrayBetweenTheTwoCountLines) {
  std::vector<std::vector<Pair>> seen;
  const LogObserver observer([&](const auto& /*call*/) { seen.push_back(pairs()); });
  read_pairs({pair(1, 2), pair(3, 4)});
  EXPECT_EQ(seen, (std::vector<std::vector<Pair>>{{},
                                                  {},
                                                  {{0, 0}, {0, 0}},
                                                  {{1, 0}, {0, 0}},
                                                  {{1, 2}, {0, 0}},
                                                  {{1, 2}, {3, 0}},
                                                  {{1, 2}, {3, 4}},
                                                  {{1, 2}, {3, 4}}}));
}

TEST_F(InviteReplyPairs, WhenTheArrayCannotBeAllocated_FaultsAfterBothCountLines) {
  EXPECT_EXIT(
      {
        const LogObserver observer(support::print_format);
        const FailingCalloc fault(1);
        read_pairs({pair(1, 2)});
      },
      support::faults, "%d didviolationusersCount.*\n.*%d didViolationUsers are detected");
}

// ---- invite_reply_deserialize: pointers

// Of one call, so that a test can take some away.
struct ReplyPointers {
  int64_t* request_id;
  int64_t* chatroom_id;
  int64_t* sent_time;
  int* code;
  char** text;
  int64_t** invalid;
  int* invalid_count;
  int64_t** interrupted;
  int* interrupted_count;
  int64_t** disabled;
  int* disabled_count;
  int64_t** existing;
  int* existing_count;
  qel_message_didviolationuser_t** violations;
  int* violations_count;
  int64_t** denied;
  int* denied_count;
};

class InviteReplyPointers : public InviteReplyDeserialize {
 protected:
  ReplyPointers pointers_ = {&out_.request_id,        &out_.chatroom_id,
                             &out_.sent_time,         &out_.code,
                             &out_.text.block,        &out_.invalid.array.block,
                             &out_.invalid.count,     &out_.interrupted.array.block,
                             &out_.interrupted.count, &out_.disabled.array.block,
                             &out_.disabled.count,    &out_.existing.array.block,
                             &out_.existing.count,    &out_.violations.array.block,
                             &out_.violations.count,  &out_.denied.array.block,
                             &out_.denied.count};

  void take_arrays() {
    pointers_.invalid = pointers_.interrupted = pointers_.disabled = nullptr;
    pointers_.existing = pointers_.denied = nullptr;
    pointers_.violations = nullptr;
  }
  void take_counts() {
    pointers_.invalid_count = pointers_.interrupted_count = pointers_.disabled_count = nullptr;
    pointers_.existing_count = pointers_.violations_count = pointers_.denied_count = nullptr;
  }
  void call(const std::string& bytes) {
    const Received received(bytes);
    const ReplyPointers& p = pointers_;
    invite_reply_deserialize(received.data(), received.size(), p.request_id, p.chatroom_id,
                             p.sent_time, p.code, p.text, p.invalid, p.invalid_count, p.interrupted,
                             p.interrupted_count, p.disabled, p.disabled_count, p.existing,
                             p.existing_count, p.violations, p.violations_count, p.denied,
                             p.denied_count);
  }
};

TEST_F(InviteReplyPointers, WhenCodeHandsOutNoDetails_TheListsMayBeNull) {
  take_arrays();
  take_counts();
  call(reply(2000, kDetail).bytes());
  EXPECT_EQ(out_.code, 2000);
}

TEST_F(InviteReplyPointers, WhenListsAreEmpty_TheArraysMayBeNull) {
  take_arrays();
  call(reply(3003, Wire()).bytes());
  EXPECT_EQ(out_.denied.count, 0);
}

// A pointer that a whole reply needs.
struct Needed {
  std::string name;
  void (*take)(ReplyPointers& pointers);
};

class InviteReplyNeeded : public InviteReplyPointers, public testing::WithParamInterface<Needed> {};

TEST_P(InviteReplyNeeded, WhenNullAndReplyIsWhole_Faults) {
  GetParam().take(pointers_);
  EXPECT_EXIT(call(hex(kReply)), support::faults, "");
}

INSTANTIATE_TEST_SUITE_P(
    Reply, InviteReplyNeeded,
    Values(Needed{"requestId", [](auto& p) { p.request_id = nullptr; }},
           Needed{"chatroomId", [](auto& p) { p.chatroom_id = nullptr; }},
           Needed{"resultCode", [](auto& p) { p.code = nullptr; }},
           Needed{"invalidReceivers", [](auto& p) { p.invalid = nullptr; }},
           Needed{"invalidReceiversCount", [](auto& p) { p.invalid_count = nullptr; }},
           Needed{"interruptedReceivers", [](auto& p) { p.interrupted = nullptr; }},
           Needed{"interruptedReceiversCount", [](auto& p) { p.interrupted_count = nullptr; }},
           Needed{"disabledReceivers", [](auto& p) { p.disabled = nullptr; }},
           Needed{"disabledReceiversCount", [](auto& p) { p.disabled_count = nullptr; }},
           Needed{"existingChatmembers", [](auto& p) { p.existing = nullptr; }},
           Needed{"existingChatmembersCount", [](auto& p) { p.existing_count = nullptr; }},
           Needed{"didViolationUsers", [](auto& p) { p.violations = nullptr; }},
           Needed{"didViolationUsersCount", [](auto& p) { p.violations_count = nullptr; }},
           Needed{"invitationDenied", [](auto& p) { p.denied = nullptr; }},
           Needed{"invitationDeniedCount", [](auto& p) { p.denied_count = nullptr; }}),
    [](const auto& row) { return row.param.name; });

}  // namespace
