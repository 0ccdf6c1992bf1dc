// Creating a chatroom, and the receivers whom the service refuses.

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
using support::HeapWatch;
using support::hex;
using support::kIntSentinel;
using support::kLargest;
using support::kLargestInt;
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

// ---- create_chatroom_request_serialize

class CreateChatroomRequestSerialize : public ExchangeTest {
 protected:
  const std::string name_ = "create_chatroom_request_serialize";
  Encoded out_;

  void call(int64_t request, int type, const int64_t* receivers, int count, const char* title) {
    out_.status = create_chatroom_request_serialize(request, type, receivers, count, title,
                                                    &out_.data.block, &out_.size);
  }
  void call_with_type(int type) {
    const int64_t receiver = 2;
    call(1, type, &receiver, 1, "x");
  }
  void call_with_receivers(const std::vector<int64_t>& receivers) {
    call(1, 0, receivers.data(), static_cast<int>(receivers.size()), nullptr);
  }
  void expect_bytes(const std::string& expected) {
    ASSERT_EQ(out_.status, 0);
    EXPECT_EQ(to_hex(out_.bytes()), expected);
  }
  void expect_receivers_refused() {
    EXPECT_EQ(out_.status, -1);
    EXPECT_TRUE(out_.untouched());
    expect_log(name_, {support::debug("%s start", {name_}),
                       support::error("invalid parameter: receivers is null")});
  }
};

TEST_F(CreateChatroomRequestSerialize, WhenCalled_EncodesTheArgumentsAndNoIdsOfTheSender) {
  const int64_t receivers[] = {2, 300};
  call(1, 1, receivers, 2, "ab");
  expect_bytes("58 01 60 01 68 02 68 ac 02 72 02 61 62");
}

TEST_F(CreateChatroomRequestSerialize, WhenValuesAreZeroAndEmpty_EncodesThemAsPresent) {
  const int64_t receiver = 0;
  call(0, 0, &receiver, 1, "");
  expect_bytes("58 00 60 00 68 00 72 00");
}

TEST_F(CreateChatroomRequestSerialize, WhenIdsAreExtreme_EncodesThem) {
  const int64_t receivers[] = {-1, kSmallest, kLargest};
  call(kLargest, 4, receivers, 3, nullptr);
  expect_bytes(
      "58 ff ff ff ff ff ff ff ff 7f 60 04 68 ff ff ff ff ff ff ff ff ff 01 "
      "68 80 80 80 80 80 80 80 80 80 01 68 ff ff ff ff ff ff ff ff 7f");
}

TEST_F(CreateChatroomRequestSerialize, WhenReceiversRepeat_EncodesThemAllInOrder) {
  call_with_receivers({5, 3, 5, 5});
  expect_bytes("58 01 60 00 68 05 68 03 68 05 68 05");
}

TEST_F(CreateChatroomRequestSerialize, WhenThereAre1000Receivers_EncodesThemAll) {
  Wire expected = Wire().number(11, 1).number(12, 0);
  std::vector<int64_t> receivers;
  for (int i = 0; i < 1000; ++i) {
    receivers.push_back(i - 500);
    expected.number(13, i - 500);
  }
  call_with_receivers(receivers);
  expect_bytes(to_hex(expected.bytes()));
}

TEST_F(CreateChatroomRequestSerialize, WhenCountIsZero_EncodesNoReceivers) {
  const int64_t receiver = 2;
  call(1, 0, &receiver, 0, "x");
  expect_bytes("58 01 60 00 72 01 78");
}

TEST_F(CreateChatroomRequestSerialize, WhenCountIsNegative_EncodesNoReceivers) {
  const int64_t receiver = 2;
  call(1, 0, &receiver, -1, "x");
  expect_bytes("58 01 60 00 72 01 78");
}

TEST_F(CreateChatroomRequestSerialize, WhenCountIsSmallest_EncodesNoReceivers) {
  const int64_t receiver = 2;
  call(1, 0, &receiver, kSmallestInt, "x");
  expect_bytes("58 01 60 00 72 01 78");
}

TEST_F(CreateChatroomRequestSerialize, WhenTitleIsNull_EncodesNoTitle) {
  const int64_t receiver = 2;
  call(1, 0, &receiver, 1, nullptr);
  expect_bytes("58 01 60 00 68 02");
}

TEST_F(CreateChatroomRequestSerialize, WhenTitleIsLong_EncodesAllOfIt) {
  const int64_t receiver = 2;
  const std::string title(70000, 'x');
  call(1, 0, &receiver, 1, title.c_str());
  expect_bytes(to_hex(Wire().number(11, 1).number(12, 0).number(13, 2).text(14, title).bytes()));
}

TEST_F(CreateChatroomRequestSerialize, WhenTheTitleCannotBeCopied_ThrowsAndDestroysTheMessage) {
  HeapWatch watch;
  {
    const support::FailingNew fault(2);  // after the list of receivers
    EXPECT_THROW(call_with_type(0), std::bad_alloc);
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_TRUE(out_.untouched());
}

TEST_F(CreateChatroomRequestSerialize, WhenReceiversIsNull_IsRefused) {
  call(1, 0, nullptr, 2, "x");
  expect_receivers_refused();
}

TEST_F(CreateChatroomRequestSerialize, WhenReceiversIsNullAndCountZero_IsRefused) {
  call(1, 0, nullptr, 0, "x");
  expect_receivers_refused();
}

TEST_F(CreateChatroomRequestSerialize, WhenReceiversIsNullAndCountNegative_IsRefused) {
  call(1, 0, nullptr, -1, nullptr);
  expect_receivers_refused();
}

TEST_F(CreateChatroomRequestSerialize, WhenReceiversIsNullAndTypeNoMember_IsRefused) {
  call(1, 5, nullptr, 2, "x");
  expect_receivers_refused();
}

TEST_F(CreateChatroomRequestSerialize, WhenTypeIsAMember_EncodesIt) {
  for (const int type : {0, 1, 2, 3, 4}) {
    Encoded out;
    const int64_t receiver = 2;
    out.status =
        create_chatroom_request_serialize(1, type, &receiver, 1, "x", &out.data.block, &out.size);
    ASSERT_EQ(out.status, 0) << type;
    EXPECT_EQ(to_hex(out.bytes()), "58 01 60 0" + std::to_string(type) + " 68 02 72 01 78");
  }
}

TEST_F(CreateChatroomRequestSerialize, WhenTypeIsNoMember_Aborts) {
  for (const int type : {5, 6, 10, -1, kSmallestInt, kLargestInt}) {
    SCOPED_TRACE(type);
    EXPECT_EXIT(call_with_type(type), support::aborts,
                support::refused_by_setter("CreateChatroomRequest", "chattype", "ChatType"));
  }
}

// ---- create_chatroom_reply_deserialize

class CreateChatroomReplyDeserialize
    : public support::RefusedReceiversTest<support::CreateChatroomReplyOutputs> {
 protected:
  // The log holds these lines between entry and exit.
  static void expect_details(std::vector<Line> lines) {
    const std::string name = "create_chatroom_reply_deserialize";
    lines.insert(lines.begin(), warn("%s: enter", {name}));
    lines.push_back(warn("%s: exit", {name}));
    expect_log(name, lines);
  }
};

// userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 1001, msg "no",
// wrongReceiverDetail { invalidReceivers 1, disabledReceivers 2, invitationDenied 5,
// didViolationUsers { userA 3, userB 4 } } }, createTimeMillis 10, ownerUserId 11, msgTtl 60
const char kReply[] =
    "08 09 10 08 58 07 60 06 6a 16 08 e9 07 12 02 6e 6f 1a 0d 08 01 18 02 30 05 a2 01 04 08 03 10 "
    "04 70 0a a0 01 0b a8 01 3c";

// The detail of that reply.
const Wire kDetail =
    Wire().number(1, 1).number(3, 2).number(6, 5).message(20, Wire().number(1, 3).number(2, 4));

TEST_F(CreateChatroomReplyDeserialize, WhenReplyIsWhole_WritesIdsLifetimeAndResult) {
  out_.read(hex(kReply));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.ttl, 60);
  EXPECT_EQ(out_.code, 1001);
  EXPECT_STREQ(out_.text.block, "no");
}

TEST_F(CreateChatroomReplyDeserialize, WhenReplyIsWhole_WritesTheFourLists) {
  out_.read(hex(kReply));
  EXPECT_EQ(out_.invalid.elements(), std::vector<int64_t>{1});
  EXPECT_EQ(out_.disabled.elements(), std::vector<int64_t>{2});
  EXPECT_EQ(pairs(), (std::vector<Pair>{{3, 4}}));
  EXPECT_EQ(out_.denied.elements(), std::vector<int64_t>{5});
}

TEST_F(CreateChatroomReplyDeserialize, WhenReplyIsWhole_LogsTheDetailsListByList) {
  out_.read(hex(kReply));
  expect_details(
      {warn("%d invalidReceivers are detected", {1}), warn("invalid Reciever id : %lld", {1LL}),
       warn("%d disabledReceivers are detected", {1}), warn("disabled Reciever id : %lld", {2LL}),
       pairs_found(1), user_a(3), user_b(4), warn("did invitation denied: %lld", {5LL})});
}

TEST_F(CreateChatroomReplyDeserialize, WhenIdsAndLifetimeAreExtreme_WritesThem) {
  out_.read(Wire().number(11, kSmallest).number(12, kLargest).number(21, kSmallestInt).bytes());
  EXPECT_EQ(out_.request_id, kSmallest);
  EXPECT_EQ(out_.chatroom_id, kLargest);
  EXPECT_EQ(out_.ttl, kSmallestInt);
}

TEST_F(CreateChatroomReplyDeserialize, WhenLifetimeIsZeroButPresent_WritesZero) {
  out_.read(hex("a8 01 00"));
  EXPECT_EQ(out_.ttl, 0);
}

TEST_F(CreateChatroomReplyDeserialize, WhenInputIsEmpty_WritesZeroIdsAlone) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.chatroom_id, 0);
  EXPECT_EQ(out_.ttl, kIntSentinel);
  EXPECT_EQ(out_.code, kIntSentinel);
  EXPECT_TRUE(out_.text.untouched());
  EXPECT_TRUE(out_.details_untouched());
}

TEST_F(CreateChatroomReplyDeserialize, WhenResultIsAbsent_WritesIdsAndLifetimeAlone) {
  out_.read(hex("58 07 60 06 a8 01 3c"));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.ttl, 60);
  EXPECT_EQ(out_.code, kIntSentinel);
  EXPECT_TRUE(out_.text.untouched());
  EXPECT_TRUE(out_.details_untouched());
}

TEST_F(CreateChatroomReplyDeserialize, WhenAllListsAreEmpty_WritesZeroCountsAndLeavesArrays) {
  read(1001, Wire());
  for (const auto* list : {&out_.invalid, &out_.disabled, &out_.denied}) {
    EXPECT_EQ(list->count, 0);
    EXPECT_TRUE(list->array.untouched());
  }
  EXPECT_EQ(out_.violations.count, 0);
  EXPECT_TRUE(out_.violations.array.untouched());
}

TEST_F(CreateChatroomReplyDeserialize, WhenAllListsAreEmpty_AllocatesAndLogsNothing) {
  HeapWatch watch;
  read(1001, Wire());
  watch.stop();
  EXPECT_TRUE(watch.callocs().empty());
  expect_details({});
}

TEST_F(CreateChatroomReplyDeserialize, WhenOtherListsHaveElements_HandsNoneOfThemOut) {
  Wire detail;
  for (const int field : {2, 4, 5, 7, 10, 11}) {
    detail.number(field, 1);
  }
  read(1001, detail);
  EXPECT_EQ(out_.invalid.count, 0);
  EXPECT_EQ(out_.disabled.count, 0);
  EXPECT_EQ(out_.violations.count, 0);
  EXPECT_EQ(out_.denied.count, 0);
  expect_details({});
}

// ---- create_chatroom_reply_deserialize: codes

class CreateChatroomReplyDetailCode : public CreateChatroomReplyDeserialize,
                                      public testing::WithParamInterface<int> {};

TEST_P(CreateChatroomReplyDetailCode, WhenReplyHasDetails_WritesAllCounts) {
  read(GetParam(), kDetail);
  EXPECT_EQ(out_.code, GetParam());
  EXPECT_EQ(out_.invalid.count, 1);
  EXPECT_EQ(out_.disabled.count, 1);
  EXPECT_EQ(out_.violations.count, 1);
  EXPECT_EQ(out_.denied.count, 1);
}

TEST_P(CreateChatroomReplyDetailCode, WhenReplyHasDetails_WritesTheListsButTheInvalidOnes) {
  read(GetParam(), kDetail);
  EXPECT_EQ(out_.disabled.elements(), std::vector<int64_t>{2});
  EXPECT_EQ(pairs(), (std::vector<Pair>{{3, 4}}));
  EXPECT_EQ(out_.denied.elements(), std::vector<int64_t>{5});
}

TEST_P(CreateChatroomReplyDetailCode, WhenCodeIsNull_Faults) {
  EXPECT_EXIT(out_.read(reply(GetParam(), Wire()).bytes(), nullptr, &out_.text.block),
              support::faults, "");
}

INSTANTIATE_TEST_SUITE_P(Reply, CreateChatroomReplyDetailCode, Values(1000, 1001, 3009));

// Under all of those codes but one, the invalid receivers are counted and not listed.
class CreateChatroomReplyCountCode : public CreateChatroomReplyDeserialize,
                                     public testing::WithParamInterface<int> {};

TEST_P(CreateChatroomReplyCountCode, WhenReceiversAreInvalid_WritesTheirCountAndLeavesTheArray) {
  read(GetParam(), Wire().number(1, 11).number(1, 12).number(1, 13));
  EXPECT_EQ(out_.invalid.count, 3);
  EXPECT_TRUE(out_.invalid.array.untouched());
}

TEST_P(CreateChatroomReplyCountCode, WhenReceiversAreInvalid_AllocatesAndLogsNothing) {
  HeapWatch watch;
  read(GetParam(), Wire().number(1, 11).number(1, 12).number(1, 13));
  watch.stop();
  EXPECT_TRUE(watch.callocs().empty());
  expect_details({});
}

INSTANTIATE_TEST_SUITE_P(Reply, CreateChatroomReplyCountCode, Values(1000, 3009));

class CreateChatroomReplyOtherCode : public CreateChatroomReplyDeserialize,
                                     public testing::WithParamInterface<int> {};

TEST_P(CreateChatroomReplyOtherCode, WhenReplyHasDetails_WritesTheCodeAndNoDetails) {
  read(GetParam(), kDetail);
  EXPECT_EQ(out_.code, GetParam());
  EXPECT_TRUE(out_.details_untouched());
  expect_details({});
}

INSTANTIATE_TEST_SUITE_P(Reply, CreateChatroomReplyOtherCode,
                         Values(0, 1, 999, 1002, 2000, 3002, 3003, 3004, 3008, 3010, 9999, -1000,
                                -1001, -3009, kSmallestInt, kLargestInt));

// ---- create_chatroom_reply_deserialize: lists of ids

struct IdList {
  std::string name;
  int field;
  std::vector<std::string> count_text;  // none, or one
  std::string element_text;
  ListOutput<int64_t> support::CreateChatroomReplyOutputs::*output;
};

const IdList kIdLists[] = {{"invalidReceivers",
                            1,
                            {"%d invalidReceivers are detected"},
                            "invalid Reciever id : %lld",
                            &support::CreateChatroomReplyOutputs::invalid},
                           {"disabledReceivers",
                            3,
                            {"%d disabledReceivers are detected"},
                            "disabled Reciever id : %lld",
                            &support::CreateChatroomReplyOutputs::disabled},
                           {"invitationDenied",
                            6,
                            {},
                            "did invitation denied: %lld",
                            &support::CreateChatroomReplyOutputs::denied}};

class CreateChatroomReplyIdList : public CreateChatroomReplyDeserialize,
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
};

TEST_P(CreateChatroomReplyIdList, WhenThereIsOneId_WritesIt) {
  read_ids({300});
  EXPECT_EQ(list_.count, 1);
  EXPECT_EQ(list_.elements(), std::vector<int64_t>{300});
}

TEST_P(CreateChatroomReplyIdList, WhenIdsAreExtremeAndRepeat_WritesThemAllInOrder) {
  const std::vector<int64_t> ids = {kLargest, 0, -1, kSmallest, -1};
  read_ids(ids);
  EXPECT_EQ(list_.elements(), ids);
}

TEST_P(CreateChatroomReplyIdList, WhenThereAre1000Ids_WritesThemAll) {
  std::vector<int64_t> ids;
  for (int i = 0; i < 1000; ++i) {
    ids.push_back(kSmallest + i);
  }
  read_ids(ids);
  EXPECT_EQ(list_.count, 1000);
  EXPECT_EQ(list_.elements(), ids);
}

TEST_P(CreateChatroomReplyIdList, WhenThereAreIds_LogsTheCountLineIfItHasOneAndEachId) {
  read_ids({5, kSmallest, 4});
  std::vector<Line> lines;
  for (const auto& text : GetParam().count_text) {
    lines.push_back(warn(text, {3}));
  }
  for (const long long id : {5LL, static_cast<long long>(kSmallest), 4LL}) {
    lines.push_back(warn(GetParam().element_text, {id}));
  }
  expect_details(lines);
}

TEST_P(CreateChatroomReplyIdList, WhenThereAreIds_LogsOnlyWhatIsStored) {
  std::vector<std::vector<int64_t>> seen;
  const LogObserver observer([&](const auto& /*call*/) { seen.push_back(list_.elements()); });
  read_ids({5, 6});
  std::vector<std::vector<int64_t>> expected = {{}, {5, 0}, {5, 6}, {5, 6}};
  expected.insert(expected.begin() + 1, GetParam().count_text.size(), {0, 0});
  EXPECT_EQ(seen, expected);
}

TEST_P(CreateChatroomReplyIdList, WhenThereAreIds_AllocatesOneZeroedArray) {
  HeapWatch watch;
  read_ids({5, 6, 7});
  watch.stop();
  ASSERT_EQ(watch.callocs().size(), 1u);
  EXPECT_EQ(watch.callocs()[0].elements, 3u);
  EXPECT_EQ(watch.callocs()[0].element_size, 8u);
  EXPECT_TRUE(watch.mallocs().empty());
}

TEST_P(CreateChatroomReplyIdList, WhenTheArrayCannotBeAllocated_FaultsAfterTheLinesBeforeIt) {
  const auto last_line = GetParam().count_text.empty() ? "%s: enter" : GetParam().count_text[0];
  EXPECT_EXIT(
      {
        const LogObserver observer(support::print_format);
        const FailingCalloc fault(1);
        read_ids({5, 6});
      },
      support::faults, last_line);
}

INSTANTIATE_TEST_SUITE_P(Reply, CreateChatroomReplyIdList, ValuesIn(kIdLists),
                         [](const auto& row) { return row.param.name; });

// ---- create_chatroom_reply_deserialize: pairs

class CreateChatroomReplyPairs : public CreateChatroomReplyDeserialize {};

TEST_F(CreateChatroomReplyPairs, WhenIdsAreZeroButPresent_LogsThem) {
  read_pairs({pair(0, 0)});
  expect_details({pairs_found(1), user_a(0), user_b(0)});
}

TEST_F(CreateChatroomReplyPairs, WhenThereAreTwo_LogsTheirCountAndEach) {
  read_pairs({pair(1, kSmallest), pair(3, 4)});
  expect_details({pairs_found(2), user_a(1), user_b(kSmallest), next_round(user_a(3)), user_b(4)});
}

TEST_F(CreateChatroomReplyPairs, WhenUsersAreAbsent_DoesNotLogThem) {
  read_pairs({Wire().number(2, 5), Wire().number(1, 6), Wire(), pair(7, 8)});
  expect_details(
      {pairs_found(4), user_b(5), next_round(user_a(6)), next_round(user_a(7)), user_b(8)});
}

TEST_F(CreateChatroomReplyPairs, WhenThereAreAny_LogsOnlyWhatIsStored) {
  std::vector<std::vector<Pair>> seen;
  const LogObserver observer([&](const auto& /*call*/) { seen.push_back(pairs()); });
  read_pairs({pair(1, 2), pair(3, 4)});
  EXPECT_EQ(seen, (std::vector<std::vector<Pair>>{{},
                                                  {{0, 0}, {0, 0}},
                                                  {{1, 0}, {0, 0}},
                                                  {{1, 2}, {0, 0}},
                                                  {{1, 2}, {3, 0}},
                                                  {{1, 2}, {3, 4}},
                                                  {{1, 2}, {3, 4}}}));
}

TEST_F(CreateChatroomReplyPairs, WhenTheArrayCannotBeAllocated_FaultsAfterTheCountLine) {
  EXPECT_EXIT(
      {
        const LogObserver observer(support::print_format);
        const FailingCalloc fault(1);
        read_pairs({pair(1, 2)});
      },
      support::faults, "%d didViolationUsers are detected");
}

// ---- create_chatroom_reply_deserialize: pointers

// Of one call, so that a test can take some away.
struct ReplyPointers {
  int64_t* request_id;
  int64_t* chatroom_id;
  int* ttl;
  int* code;
  char** text;
  int64_t** invalid;
  int* invalid_count;
  int64_t** disabled;
  int* disabled_count;
  qel_message_didviolationuser_t** violations;
  int* violations_count;
  int64_t** denied;
  int* denied_count;
};

class CreateChatroomReplyPointers : public CreateChatroomReplyDeserialize {
 protected:
  ReplyPointers pointers_ = {&out_.request_id,
                             &out_.chatroom_id,
                             &out_.ttl,
                             &out_.code,
                             &out_.text.block,
                             &out_.invalid.array.block,
                             &out_.invalid.count,
                             &out_.disabled.array.block,
                             &out_.disabled.count,
                             &out_.violations.array.block,
                             &out_.violations.count,
                             &out_.denied.array.block,
                             &out_.denied.count};

  void take_arrays() {
    pointers_.invalid = pointers_.disabled = pointers_.denied = nullptr;
    pointers_.violations = nullptr;
  }
  void take_counts() {
    pointers_.invalid_count = pointers_.disabled_count = nullptr;
    pointers_.violations_count = pointers_.denied_count = nullptr;
  }
  void call(const std::string& bytes) {
    const Received received(bytes);
    const ReplyPointers& p = pointers_;
    create_chatroom_reply_deserialize(received.data(), received.size(), p.request_id, p.chatroom_id,
                                      p.ttl, p.code, p.text, p.invalid, p.invalid_count, p.disabled,
                                      p.disabled_count, p.violations, p.violations_count, p.denied,
                                      p.denied_count);
  }
};

TEST_F(CreateChatroomReplyPointers, WhenCodeHandsOutNoDetails_TheListsMayBeNull) {
  take_arrays();
  take_counts();
  call(reply(2000, kDetail).bytes());
  EXPECT_EQ(out_.code, 2000);
}

TEST_F(CreateChatroomReplyPointers, WhenListsAreEmpty_TheArraysMayBeNull) {
  take_arrays();
  call(reply(1001, Wire()).bytes());
  EXPECT_EQ(out_.denied.count, 0);
}

TEST_F(CreateChatroomReplyPointers, WhenInvalidReceiversAreCountedOnly_TheirArrayMayBeNull) {
  pointers_.invalid = nullptr;
  call(reply(1000, kDetail).bytes());
  EXPECT_EQ(out_.invalid.count, 1);
}

TEST_F(CreateChatroomReplyPointers, WhenLifetimeIsAbsent_ItMayBeNull) {
  pointers_.ttl = nullptr;
  call(hex("58 07 6a 02 08 05"));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.code, 5);
}

// A pointer that a whole reply needs.
struct Needed {
  std::string name;
  void (*take)(ReplyPointers& pointers);
};

class CreateChatroomReplyNeeded : public CreateChatroomReplyPointers,
                                  public testing::WithParamInterface<Needed> {};

TEST_P(CreateChatroomReplyNeeded, WhenNullAndReplyIsWhole_Faults) {
  GetParam().take(pointers_);
  EXPECT_EXIT(call(hex(kReply)), support::faults, "");
}

INSTANTIATE_TEST_SUITE_P(
    Reply, CreateChatroomReplyNeeded,
    Values(Needed{"requestId", [](auto& p) { p.request_id = nullptr; }},
           Needed{"chatroomId", [](auto& p) { p.chatroom_id = nullptr; }},
           Needed{"msgTtl", [](auto& p) { p.ttl = nullptr; }},
           Needed{"resultCode", [](auto& p) { p.code = nullptr; }},
           Needed{"invalidReceivers", [](auto& p) { p.invalid = nullptr; }},
           Needed{"invalidReceiversCount", [](auto& p) { p.invalid_count = nullptr; }},
           Needed{"disabledReceivers", [](auto& p) { p.disabled = nullptr; }},
           Needed{"disabledReceiversCount", [](auto& p) { p.disabled_count = nullptr; }},
           Needed{"didViolationUsers", [](auto& p) { p.violations = nullptr; }},
           Needed{"didViolationUsersCount", [](auto& p) { p.violations_count = nullptr; }},
           Needed{"invitationDenied", [](auto& p) { p.denied = nullptr; }},
           Needed{"invitationDeniedCount", [](auto& p) { p.denied_count = nullptr; }}),
    [](const auto& row) { return row.param.name; });

}  // namespace
