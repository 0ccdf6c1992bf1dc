// Entering a chatroom.

#include <ostream>

#include "support/exchange.h"
#include "support/heap.h"
#include "support/outputs.h"
#include "support/process_death.h"

namespace {

using support::AllowChatReplyOutputs;
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

// ---- allow_chat_request_serialize

class AllowChatRequestSerialize : public ExchangeTest {
 protected:
  struct Arguments {
    int64_t request = 1;
    int64_t chatroom = 2;
    const bool* auto_allow = nullptr;
    int most = 3;
    bool need_deliveries = false;
    int64_t last_delivery = 0;
    bool need_reads = false;
    int64_t last_read = 0;
    bool need_members = false;
    bool need_meta = false;
  };

  Arguments in_;

  // The call's bytes, in hexadecimal.
  std::string encoded() const {
    Encoded out;
    out.status = allow_chat_request_serialize(
        in_.request, in_.chatroom, in_.auto_allow, in_.most, in_.need_deliveries, in_.last_delivery,
        in_.need_reads, in_.last_read, in_.need_members, in_.need_meta, &out.data.block, &out.size);
    EXPECT_EQ(out.status, 0);
    return out.status == 0 ? to_hex(out.bytes()) : "";
  }
  std::string encoded_with_most(int most) {
    in_.most = most;
    return encoded();
  }
};

TEST_F(AllowChatRequestSerialize, WhenNothingIsWanted_EncodesFourFalseFlagsAndNoTimes) {
  EXPECT_EQ(encoded(), "58 01 60 02 70 03 78 00 80 01 00 90 01 00 98 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenEverythingIsWanted_EncodesAllArgumentsAndNoIdsOfTheSender) {
  const bool auto_allow = true;
  in_ = {1, 300, &auto_allow, 4, true, 5, true, 6, true, true};
  EXPECT_EQ(encoded(),
            "58 01 60 ac 02 68 01 70 04 78 01 80 01 01 88 01 06 90 01 01 98 01 01 a0 01 05");
}

TEST_F(AllowChatRequestSerialize, WhenIdsAreZero_EncodesThemAsPresent) {
  in_.request = 0;
  in_.chatroom = 0;
  EXPECT_EQ(encoded(), "58 00 60 00 70 03 78 00 80 01 00 90 01 00 98 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenIdsAreNegative_EncodesTenByteVarints) {
  in_.request = -1;
  in_.chatroom = kSmallest;
  EXPECT_EQ(encoded(),
            "58 ff ff ff ff ff ff ff ff ff 01 60 80 80 80 80 80 80 80 80 80 01 "
            "70 03 78 00 80 01 00 90 01 00 98 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenAutoAllowIsFalse_EncodesItAsPresent) {
  const bool auto_allow = false;
  in_.auto_allow = &auto_allow;
  EXPECT_EQ(encoded(), "58 01 60 02 68 00 70 03 78 00 80 01 00 90 01 00 98 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenMaxCountIsInRange_EncodesIt) {
  for (const int most : {1, 2, 499, 500}) {
    const std::string field = to_hex(Wire().number(14, most).bytes());
    EXPECT_EQ(encoded_with_most(most),
              "58 01 60 02 " + field + " 78 00 80 01 00 90 01 00 98 01 00");
  }
}

TEST_F(AllowChatRequestSerialize, WhenMaxCountIsOutOfRange_Encodes500) {
  for (const int most : {0, -1, 501, 65537, -65535, kSmallestInt, kLargestInt}) {
    EXPECT_EQ(encoded_with_most(most), "58 01 60 02 70 f4 03 78 00 80 01 00 90 01 00 98 01 00")
        << most;
  }
}

TEST_F(AllowChatRequestSerialize, WhenMaxCountIsOutOfRange_LogsNothingOfIt) {
  encoded_with_most(501);
  expect_log("allow_chat_request_serialize",
             {support::debug("%s start", {"allow_chat_request_serialize"}),
              support::debug("%s: exit", {"allow_chat_request_serialize"})});
}

TEST_F(AllowChatRequestSerialize, WhenNoAcksAreWanted_IgnoresBothTimes) {
  in_.last_delivery = 5;
  in_.last_read = 6;
  EXPECT_EQ(encoded(), "58 01 60 02 70 03 78 00 80 01 00 90 01 00 98 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenDeliveryAcksAreWanted_EncodesTheirTimeAlone) {
  in_.need_deliveries = true;
  in_.last_delivery = 5;
  in_.last_read = 6;
  EXPECT_EQ(encoded(), "58 01 60 02 70 03 78 00 80 01 00 90 01 00 98 01 01 a0 01 05");
}

TEST_F(AllowChatRequestSerialize, WhenReadAcksAreWanted_EncodesTheirTimeAlone) {
  in_.need_reads = true;
  in_.last_delivery = 5;
  in_.last_read = 6;
  EXPECT_EQ(encoded(), "58 01 60 02 70 03 78 00 80 01 01 88 01 06 90 01 00 98 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenAcksAreWantedFromZeroOn_EncodesTheTimesAsPresent) {
  in_.need_deliveries = true;
  in_.need_reads = true;
  EXPECT_EQ(encoded(), "58 01 60 02 70 03 78 00 80 01 01 88 01 00 90 01 00 98 01 01 a0 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenTimesAreExtreme_EncodesThem) {
  in_.need_deliveries = true;
  in_.last_delivery = kSmallest;
  in_.need_reads = true;
  in_.last_read = kLargest;
  EXPECT_EQ(encoded(),
            "58 01 60 02 70 03 78 00 80 01 01 88 01 ff ff ff ff ff ff ff ff 7f 90 01 00 98 01 01 "
            "a0 01 80 80 80 80 80 80 80 80 80 01");
}

TEST_F(AllowChatRequestSerialize, WhenMembersAreWanted_SetsTheirFlagAlone) {
  in_.need_members = true;
  EXPECT_EQ(encoded(), "58 01 60 02 70 03 78 01 80 01 00 90 01 00 98 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenMetaIsWanted_SetsItsFlagAlone) {
  in_.need_meta = true;
  EXPECT_EQ(encoded(), "58 01 60 02 70 03 78 00 80 01 00 90 01 01 98 01 00");
}

TEST_F(AllowChatRequestSerialize, WhenFlagsHoldOtherBytesThanOneAndZero_EncodesThemAsTrue) {
  // Of callers whose compiler has no bool.
  using Call = int (*)(int64_t, int64_t, const unsigned char*, int, unsigned char, int64_t,
                       unsigned char, int64_t, unsigned char, unsigned char, unsigned char**, int*);
  const auto call =
      reinterpret_cast<Call>(reinterpret_cast<void (*)()>(allow_chat_request_serialize));
  for (const unsigned char byte : support::kBytesOfNoBool) {
    Encoded out;
    call(1, 2, &byte, 3, byte, 5, byte, 6, byte, byte, &out.data.block, &out.size);
    EXPECT_EQ(to_hex(out.bytes()),
              "58 01 60 02 68 01 70 03 78 01 80 01 01 88 01 06 90 01 01 98 01 01 a0 01 05")
        << static_cast<int>(byte);
  }
}

// ---- allow_chat_reply_deserialize

class AllowChatReplyDeserialize : public ExchangeTest {
 protected:
  const std::string name_ = "allow_chat_reply_deserialize";
  AllowChatReplyOutputs out_;

  void read_with_failing_malloc(int n, const std::string& bytes) {
    const support::FailingMalloc fault(n);
    out_.read(bytes);
  }
};

// userId 9, deviceId 8, requestId 7, chatroomId 6, result { code 3, msg "no", subCode 1 },
// lastReadAckTimestamp 300, ownerUserId 5,
// orderedChatroomMemberList { userId 42, available true, name "Ann", isAccepted true,
//   secureChatDevice { deviceId 1 } } { userId 41, available false, name "" },
// readAckEntries { userId 11, msgId 12, timestamp 13, chatroomId 6 }, title "room",
// profileUrl "url", deliveryAckEntries { userId 21, msgId 22, timestamp 23, chatroomId 6 }
// { userId 31, msgId 32, timestamp 33 }, lastDeliveryAckTimestamp 400, msgTtl 60
const char kAllowChatReply[] =
    "08 09 10 08 58 07 60 06 6a 08 08 03 12 02 6e 6f 20 01 70 ac 02 78 05 "
    "82 01 0f 08 2a 10 01 1a 03 41 6e 6e 50 01 5a 02 08 01 82 01 06 08 29 10 00 1a 00 "
    "8a 01 08 08 0b 10 0c 18 0d 50 06 92 01 04 72 6f 6f 6d 9a 01 03 75 72 6c "
    "a2 01 08 08 15 10 16 18 17 50 06 a2 01 06 08 1f 10 20 18 21 a8 01 90 03 b0 01 3c";

TEST_F(AllowChatReplyDeserialize, WhenReplyIsWhole_WritesScalarsAndTexts) {
  out_.read(hex(kAllowChatReply));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.chatroom_id, 6);
  EXPECT_EQ(out_.code, 3);
  EXPECT_STREQ(out_.text.block, "no");
  EXPECT_EQ(out_.last_delivery, 400);
  EXPECT_EQ(out_.last_read, 300);
  EXPECT_STREQ(out_.title.block, "room");
  EXPECT_EQ(out_.ttl, 60);
}

TEST_F(AllowChatReplyDeserialize, WhenReplyIsWhole_WritesThreeListsOfTheirOwn) {
  out_.read(hex(kAllowChatReply));
  ASSERT_EQ(out_.deliveries.count, 2);
  EXPECT_EQ(out_.deliveries.elements()[0]->userId, 21);
  EXPECT_EQ(out_.deliveries.elements()[1]->userId, 31);
  ASSERT_EQ(out_.reads.count, 1);
  EXPECT_EQ(out_.reads.elements()[0]->userId, 11);
  ASSERT_EQ(out_.members.count, 2);
  EXPECT_EQ(out_.members.elements()[0]->userId, 42);
  EXPECT_EQ(out_.members.elements()[1]->userId, 41);
}

TEST_F(AllowChatReplyDeserialize, WhenReplyIsWhole_LogsEntryAndExitAlone) {
  out_.read(hex(kAllowChatReply));
  expect_log(name_, {support::warn("%s: start", {name_}), support::warn("%s: exit", {name_})});
}

TEST_F(AllowChatReplyDeserialize, WhenInputIsEmpty_WritesIdsAndCountsAlone) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.chatroom_id, 0);
  EXPECT_EQ(out_.deliveries.count, 0);
  EXPECT_EQ(out_.reads.count, 0);
  EXPECT_EQ(out_.members.count, 0);
  out_.request_id = out_.chatroom_id = kLongSentinel;
  out_.deliveries.count = out_.reads.count = out_.members.count = kIntSentinel;
  EXPECT_TRUE(out_.untouched());
}

TEST_F(AllowChatReplyDeserialize, WhenOwnerAndProfileUrlComeAlone_WritesNoMoreThanForEmptyInput) {
  out_.read(hex("78 05 9a 01 03 75 72 6c"));
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.chatroom_id, 0);
  EXPECT_TRUE(out_.title.untouched());
  EXPECT_EQ(out_.last_read, kLongSentinel);
  expect_log(name_, {support::warn("%s: start", {name_}), support::warn("%s: exit", {name_})});
}

TEST_F(AllowChatReplyDeserialize, WhenIdsAreExtreme_WritesThem) {
  out_.read(hex("58 80 80 80 80 80 80 80 80 80 01 60 ff ff ff ff ff ff ff ff 7f"));
  EXPECT_EQ(out_.request_id, kSmallest);
  EXPECT_EQ(out_.chatroom_id, kLargest);
}

TEST_F(AllowChatReplyDeserialize, WhenTtlIsSmallest_WritesIt) {
  out_.read(hex("b0 01 80 80 80 80 f8 ff ff ff ff 01"));
  EXPECT_EQ(out_.ttl, kSmallestInt);
}

TEST_F(AllowChatReplyDeserialize, WhenTtlIsZeroButPresent_WritesZero) {
  out_.read(hex("b0 01 00"));
  EXPECT_EQ(out_.ttl, 0);
}

TEST_F(AllowChatReplyDeserialize, WhenResultMsgIsNull_WritesCodeAndWhatFollows) {
  out_.read(hex(kAllowChatReply), &out_.code, nullptr);
  EXPECT_EQ(out_.code, 3);
  EXPECT_EQ(out_.deliveries.count, 2);
}

TEST_F(AllowChatReplyDeserialize, WhenTitleIsEmptyButPresent_WritesEmptyText) {
  out_.read(hex("92 01 00"));
  EXPECT_STREQ(out_.title.block, "");
}

TEST_F(AllowChatReplyDeserialize, WhenTitleHoldsANul_CopiesUpToIt) {
  out_.read(hex("92 01 03 61 00 62"));
  EXPECT_STREQ(out_.title.block, "a");
}

TEST_F(AllowChatReplyDeserialize, WhenTitleIsLong_CopiesAllOfIt) {
  const std::string title(5000, 'x');
  out_.read(Wire().text(18, title).bytes());
  EXPECT_EQ(out_.title.block, title);
}

// A watched heap's blocks are not zeroed, so that half a field that is not written shows.
TEST_F(AllowChatReplyDeserialize, WhenMembersAreFilled_WritesTheWholeOfAvailable) {
  support::HeapWatch watch;
  out_.read(hex("82 01 02 10 01 82 01 02 10 00 82 01 00"));
  watch.stop();
  ASSERT_EQ(out_.members.count, 3);
  EXPECT_EQ(out_.members.elements()[0]->available, 1);
  EXPECT_EQ(out_.members.elements()[1]->available, 0);
  EXPECT_EQ(out_.members.elements()[2]->available, 0);
}

TEST_F(AllowChatReplyDeserialize, WhenAMemberIsWhole_WritesItsThreeFields) {
  out_.read(hex(kAllowChatReply));
  ASSERT_EQ(out_.members.count, 2);
  const qel_message_chatroommember_t* member = out_.members.elements()[0];
  EXPECT_EQ(member->userId, 42);
  EXPECT_EQ(member->available, 1);
  EXPECT_STREQ(member->name, "Ann");
}

TEST_F(AllowChatReplyDeserialize, WhenAMemberIsEmpty_WritesZerosAndAnEmptyName) {
  support::HeapWatch watch;
  out_.read(hex("82 01 00"));
  watch.stop();
  ASSERT_EQ(out_.members.count, 1);
  EXPECT_EQ(out_.members.elements()[0]->userId, 0);
  EXPECT_EQ(out_.members.elements()[0]->available, 0);
  EXPECT_STREQ(out_.members.elements()[0]->name, "");
}

TEST_F(AllowChatReplyDeserialize, WhenAMemberHasAcceptedAlone_IsNotAvailable) {
  out_.read(hex("82 01 02 50 01"));
  ASSERT_EQ(out_.members.count, 1);
  EXPECT_EQ(out_.members.elements()[0]->available, 0);
}

TEST_F(AllowChatReplyDeserialize, WhenAMembersNameHoldsANul_CopiesUpToIt) {
  out_.read(hex("82 01 05 1a 03 61 00 62"));
  ASSERT_EQ(out_.members.count, 1);
  EXPECT_STREQ(out_.members.elements()[0]->name, "a");
}

TEST_F(AllowChatReplyDeserialize, WhenAMembersIdIsSmallest_WritesIt) {
  out_.read(hex("82 01 0b 08 80 80 80 80 80 80 80 80 80 01"));
  ASSERT_EQ(out_.members.count, 1);
  EXPECT_EQ(out_.members.elements()[0]->userId, kSmallest);
}

TEST_F(AllowChatReplyDeserialize, WhenReplyHas1000Members_WritesThemInTheServicesOrder) {
  Wire reply;
  for (int i = 0; i < 1000; ++i) {
    reply.message(16, Wire().number(1, -i).text(3, std::to_string(i)));
  }
  out_.read(reply.bytes());
  ASSERT_EQ(out_.members.count, 1000);
  for (int i = 0; i < 1000; ++i) {
    ASSERT_EQ(out_.members.array.block[i]->userId, -i);
    ASSERT_STREQ(out_.members.array.block[i]->name, std::to_string(i).c_str());
  }
}

TEST_F(AllowChatReplyDeserialize, WhenReplyHasLists_AllocatesEachArrayAndThenItsRecords) {
  support::HeapWatch watch;
  out_.read(hex("82 01 00 82 01 00 82 01 00 82 01 00 8a 01 00 a2 01 00 a2 01 00"));
  watch.stop();
  constexpr size_t kMark = sizeof(qel_message_watermarkentry_t);
  constexpr size_t kMember = sizeof(qel_message_chatroommember_t);
  EXPECT_EQ(watch.mallocs(), (std::vector<size_t>{2 * sizeof(void*), kMark, kMark,  // deliveries
                                                  1 * sizeof(void*), kMark,         // reads
                                                  4 * sizeof(void*), kMember, kMember,  // members
                                                  kMember, kMember}));
  EXPECT_TRUE(watch.callocs().empty());
}

TEST_F(AllowChatReplyDeserialize, WhenThereAreNoLists_AllocatesNothing) {
  support::HeapWatch watch;
  out_.read(hex("58 07 6a 02 08 03 70 01 a8 01 02 b0 01 03"));
  watch.stop();
  EXPECT_EQ(watch.mallocs(), std::vector<size_t>{});
}

TEST_F(AllowChatReplyDeserialize, WhenTheMembersArrayCannotBeAllocated_Faults) {
  EXPECT_EXIT(read_with_failing_malloc(1, hex("82 01 00")), support::faults, "");
}

TEST_F(AllowChatReplyDeserialize, WhenAMemberCannotBeAllocated_Faults) {
  EXPECT_EXIT(read_with_failing_malloc(2, hex("82 01 00")), support::faults, "");
}

// The two lists of marks, which are read alike.
struct MarkList {
  const char* name;
  int field;
  support::RecordListOutput<qel_message_watermarkentry_t> AllowChatReplyOutputs::*list;
  int last_field;  // the time up to which the list goes
  int64_t AllowChatReplyOutputs::*last;
};
void PrintTo(const MarkList& one, std::ostream* out) {
  *out << one.name;
}

const MarkList kMarkLists[] = {
    {"Deliveries", 20, &AllowChatReplyOutputs::deliveries, 21,
     &AllowChatReplyOutputs::last_delivery},
    {"Reads", 17, &AllowChatReplyOutputs::reads, 14, &AllowChatReplyOutputs::last_read},
};

template <typename Case>
std::string name_of(const ::testing::TestParamInfo<Case>& info) {
  return info.param.name;
}

class AllowChatReplyMarks : public AllowChatReplyDeserialize,
                            public ::testing::WithParamInterface<MarkList> {
 protected:
  const support::RecordListOutput<qel_message_watermarkentry_t>& list_ = out_.*GetParam().list;
  const int64_t& last_ = out_.*GetParam().last;

  void read(const std::vector<Wire>& marks) {
    Wire reply;
    for (const Wire& mark : marks) {
      reply.message(GetParam().field, mark);
    }
    support::HeapWatch watch;  // a field that is not written shows
    out_.read(reply.bytes());
    watch.stop();
  }

  // The list holds these marks.
  void expect(const std::vector<qel_message_watermarkentry_t>& expected) const {
    ASSERT_EQ(static_cast<size_t>(list_.count), expected.size());
    for (size_t i = 0; i < expected.size(); ++i) {
      SCOPED_TRACE(i);
      const qel_message_watermarkentry_t* mark = list_.array.block[i];
      EXPECT_EQ(mark->userId, expected[i].userId);
      EXPECT_EQ(mark->msgId, expected[i].msgId);
      EXPECT_EQ(mark->timestamp, expected[i].timestamp);
    }
  }
};

INSTANTIATE_TEST_SUITE_P(AllowChatReply, AllowChatReplyMarks, ::testing::ValuesIn(kMarkLists),
                         name_of<MarkList>);

TEST_P(AllowChatReplyMarks, WhenThereIsOne_WritesItsThreeFields) {
  read({Wire().number(1, 5).number(2, 6).number(3, 7).number(10, 8)});
  expect({{5, 6, 7}});
}

TEST_P(AllowChatReplyMarks, WhenThereIsNone_WritesCountZeroAndLeavesTheArray) {
  out_.read(hex("58 07"));
  EXPECT_EQ(list_.count, 0);
  EXPECT_TRUE(list_.array.untouched());
}

TEST_P(AllowChatReplyMarks, WhenFieldsAreAbsent_WritesZeros) {
  read({Wire(), Wire().number(1, 5), Wire().number(2, 6), Wire().number(3, 7)});
  expect({{0, 0, 0}, {5, 0, 0}, {0, 6, 0}, {0, 0, 7}});
}

TEST_P(AllowChatReplyMarks, WhenFieldsAreExtreme_WritesThem) {
  read({Wire().number(1, kSmallest).number(2, kLargest).number(3, -1),
        Wire().number(1, kLargest).number(2, -1).number(3, kSmallest)});
  expect({{kSmallest, kLargest, -1}, {kLargest, -1, kSmallest}});
}

TEST_P(AllowChatReplyMarks, WhenThereAre1000_WritesThemInOrder) {
  std::vector<Wire> marks;
  std::vector<qel_message_watermarkentry_t> expected;
  for (int i = 0; i < 1000; ++i) {
    marks.push_back(Wire().number(1, i).number(2, -i).number(3, kSmallest + i));
    expected.push_back({i, -i, kSmallest + i});
  }
  read(marks);
  expect(expected);
}

TEST_P(AllowChatReplyMarks, WhenTheLastTimeIsPresent_WritesItAndNoOther) {
  out_.read(Wire().number(GetParam().last_field, kSmallest).bytes());
  EXPECT_EQ(last_, kSmallest);
  EXPECT_EQ(out_.last_delivery == kLongSentinel, &last_ != &out_.last_delivery);
  EXPECT_EQ(out_.last_read == kLongSentinel, &last_ != &out_.last_read);
}

TEST_P(AllowChatReplyMarks, WhenTheLastTimeIsZeroButPresent_WritesZero) {
  out_.read(Wire().number(GetParam().last_field, 0).bytes());
  EXPECT_EQ(last_, 0);
}

TEST_P(AllowChatReplyMarks, WhenThereAreMarksWithoutALastTime_LeavesIt) {
  read({Wire().number(3, 7)});
  EXPECT_EQ(last_, kLongSentinel);
}

TEST_P(AllowChatReplyMarks, WhenTheArrayCannotBeAllocated_Faults) {
  const std::string reply = Wire().message(GetParam().field, Wire()).bytes();
  EXPECT_EXIT(read_with_failing_malloc(1, reply), support::faults, "");
}

TEST_P(AllowChatReplyMarks, WhenARecordCannotBeAllocated_Faults) {
  const std::string reply = Wire().message(GetParam().field, Wire()).bytes();
  EXPECT_EXIT(read_with_failing_malloc(2, reply), support::faults, "");
}

// All output pointers, of which a test clears one.
struct AllowChatReplyPointers {
  explicit AllowChatReplyPointers(AllowChatReplyOutputs* out)
      : request_id(&out->request_id),
        chatroom_id(&out->chatroom_id),
        code(&out->code),
        text(&out->text.block),
        deliveries(&out->deliveries.array.block),
        delivery_count(&out->deliveries.count),
        last_delivery(&out->last_delivery),
        reads(&out->reads.array.block),
        read_count(&out->reads.count),
        last_read(&out->last_read),
        members(&out->members.array.block),
        member_count(&out->members.count),
        title(&out->title.block),
        ttl(&out->ttl) {}

  void read(const std::string& bytes) const {
    const Received received(bytes);
    allow_chat_reply_deserialize(received.data(), received.size(), request_id, chatroom_id, code,
                                 text, deliveries, delivery_count, last_delivery, reads, read_count,
                                 last_read, members, member_count, title, ttl);
  }

  int64_t* request_id;
  int64_t* chatroom_id;
  int* code;
  char** text;
  qel_message_watermarkentry_t*** deliveries;
  int* delivery_count;
  int64_t* last_delivery;
  qel_message_watermarkentry_t*** reads;
  int* read_count;
  int64_t* last_read;
  qel_message_chatroommember_t*** members;
  int* member_count;
  char** title;
  int* ttl;
};

struct NullPointer {
  const char* name;
  void (*clear)(AllowChatReplyPointers* pointers);
  const char* reply;  // makes the function write through it
};
void PrintTo(const NullPointer& one, std::ostream* out) {
  *out << one.name;
}

class AllowChatReplyNull : public AllowChatReplyDeserialize,
                           public ::testing::WithParamInterface<NullPointer> {
 protected:
  AllowChatReplyPointers pointers_{&out_};

  void SetUp() override {
    AllowChatReplyDeserialize::SetUp();
    GetParam().clear(&pointers_);
  }
};

TEST_P(AllowChatReplyNull, WhenTheReplyIsWrittenThroughIt_Faults) {
  EXPECT_EXIT(pointers_.read(hex(GetParam().reply)), support::faults, "");
}

class AllowChatReplyUnusedNull : public AllowChatReplyNull {};

TEST_P(AllowChatReplyUnusedNull, WhenTheReplyHasNothingForIt_WritesTheOthers) {
  pointers_.read(hex("58 07"));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.members.count, 0);
  expect_log(name_, {support::warn("%s: start", {name_}), support::warn("%s: exit", {name_})});
}

const NullPointer kAlwaysWritten[] = {
    {"RequestId", [](AllowChatReplyPointers* p) { p->request_id = nullptr; }, ""},
    {"ChatroomId", [](AllowChatReplyPointers* p) { p->chatroom_id = nullptr; }, ""},
    {"DeliveryAckCount", [](AllowChatReplyPointers* p) { p->delivery_count = nullptr; }, ""},
    {"ReadAckCount", [](AllowChatReplyPointers* p) { p->read_count = nullptr; }, ""},
    {"MemberCount", [](AllowChatReplyPointers* p) { p->member_count = nullptr; }, ""},
};

const NullPointer kWrittenIfPresent[] = {
    {"ResultCode", [](AllowChatReplyPointers* p) { p->code = nullptr; }, "6a 00"},
    {"DeliveryAckEntries", [](AllowChatReplyPointers* p) { p->deliveries = nullptr; }, "a2 01 00"},
    {"LastDeliveryAckTimestamp", [](AllowChatReplyPointers* p) { p->last_delivery = nullptr; },
     "a8 01 00"},
    {"ReadAckEntries", [](AllowChatReplyPointers* p) { p->reads = nullptr; }, "8a 01 00"},
    {"LastReadAckTimestamp", [](AllowChatReplyPointers* p) { p->last_read = nullptr; }, "70 00"},
    {"Members", [](AllowChatReplyPointers* p) { p->members = nullptr; }, "82 01 00"},
    {"Title", [](AllowChatReplyPointers* p) { p->title = nullptr; }, "92 01 00"},
    {"MsgTtl", [](AllowChatReplyPointers* p) { p->ttl = nullptr; }, "b0 01 00"},
};

INSTANTIATE_TEST_SUITE_P(AlwaysWritten, AllowChatReplyNull, ::testing::ValuesIn(kAlwaysWritten),
                         name_of<NullPointer>);
INSTANTIATE_TEST_SUITE_P(WrittenIfPresent, AllowChatReplyNull,
                         ::testing::ValuesIn(kWrittenIfPresent), name_of<NullPointer>);
INSTANTIATE_TEST_SUITE_P(WrittenIfPresent, AllowChatReplyUnusedNull,
                         ::testing::ValuesIn(kWrittenIfPresent), name_of<NullPointer>);

}  // namespace
