// What the replies to a new chatroom and to invitations do alike with the receivers whom the
// service refused. Codes, lists of ids and log lines differ: the tests of each function have those.

#include "support/refused_receivers.h"

#include <type_traits>

#include "support/heap.h"
#include "support/outputs.h"
#include "support/process_death.h"

namespace {

using support::CreateChatroomReplyOutputs;
using support::hex;
using support::InviteReplyOutputs;
using support::kLargest;
using support::kSmallest;
using support::Wire;

struct FunctionName {
  template <typename Outputs>
  static std::string GetName(int /*index*/) {
    return std::is_same_v<Outputs, InviteReplyOutputs> ? "invite_reply_deserialize"
                                                       : "create_chatroom_reply_deserialize";
  }
};

template <typename Outputs>
class RefusedReceivers : public support::RefusedReceiversTest<Outputs> {
 protected:
  using Pairs = std::vector<typename support::RefusedReceiversTest<Outputs>::Pair>;

  // Something in each list.
  const Wire detail_ =
      Wire().number(1, 1).number(2, 2).number(3, 3).number(4, 4).number(6, 5).message(
          20, this->pair(6, 7));
};

using Replies = testing::Types<CreateChatroomReplyOutputs, InviteReplyOutputs>;
TYPED_TEST_SUITE(RefusedReceivers, Replies, FunctionName);

// ---- The result

TYPED_TEST(RefusedReceivers, WhenResultIsEmpty_LeavesDetails) {
  this->out_.read(hex("6a 00"));
  EXPECT_EQ(this->out_.code, 0);
  EXPECT_TRUE(this->out_.details_untouched());
}

TYPED_TEST(RefusedReceivers, WhenCodeIsAbsent_LeavesDetails) {
  this->out_.read(Wire().message(13, Wire().message(3, this->detail_)).bytes());
  EXPECT_EQ(this->out_.code, 0);
  EXPECT_TRUE(this->out_.details_untouched());
}

TYPED_TEST(RefusedReceivers, WhenResultMsgIsNull_WritesDetails) {
  this->out_.read(this->reply(1001, this->detail_).bytes(), &this->out_.code, nullptr);
  EXPECT_EQ(this->out_.code, 1001);
  EXPECT_EQ(this->out_.denied.elements(), std::vector<int64_t>{5});
}

TYPED_TEST(RefusedReceivers, WhenResultCodeIsNullAndThereAreNone_LeavesDetails) {
  this->out_.read(hex("6a 06 08 e9 07 12 01 78"), nullptr, &this->out_.text.block);
  EXPECT_TRUE(this->out_.details_untouched());
  EXPECT_EQ(support::logged_calls().size(), 2u);  // entry and exit
}

TYPED_TEST(RefusedReceivers, WhenResultCodeIsNullAndResultAbsent_WritesIds) {
  this->out_.read(hex("58 07 60 06"), nullptr, &this->out_.text.block);
  EXPECT_EQ(this->out_.request_id, 7);
  EXPECT_EQ(this->out_.chatroom_id, 6);
}

TYPED_TEST(RefusedReceivers, WhenResultCodeIsNullAndDetailsAreEmpty_Faults) {
  EXPECT_EXIT(this->out_.read(this->reply(2000, Wire()).bytes(), nullptr, &this->out_.text.block),
              support::faults, "");
}

// ---- Pairs of users

TYPED_TEST(RefusedReceivers, WhenIdsOfPairsAreExtreme_WritesThemInOrder) {
  this->read_pairs({this->pair(kSmallest, kLargest), this->pair(0, -1), this->pair(5, 5)});
  EXPECT_EQ(this->out_.violations.count, 3);
  EXPECT_EQ(this->pairs(), (typename TestFixture::Pairs{{kSmallest, kLargest}, {0, -1}, {5, 5}}));
}

TYPED_TEST(RefusedReceivers, WhenThereAre1000Pairs_WritesThemAll) {
  std::vector<Wire> sent;
  typename TestFixture::Pairs expected;
  for (int i = 0; i < 1000; ++i) {
    sent.push_back(this->pair(i, -i));
    expected.emplace_back(i, -i);
  }
  this->read_pairs(sent);
  EXPECT_EQ(this->pairs(), expected);
}

TYPED_TEST(RefusedReceivers, WhenUsersOfPairsAreAbsent_WritesZerosInTheirPlace) {
  this->read_pairs({Wire().number(2, 5), Wire().number(1, 6), Wire(), this->pair(7, 8)});
  EXPECT_EQ(this->pairs(), (typename TestFixture::Pairs{{0, 5}, {6, 0}, {0, 0}, {7, 8}}));
}

TYPED_TEST(RefusedReceivers, WhenThereArePairs_AllocatesOneZeroedArray) {
  support::HeapWatch watch;
  this->read_pairs({this->pair(1, 2), this->pair(3, 4), this->pair(5, 6)});
  watch.stop();
  ASSERT_EQ(watch.callocs().size(), 1u);
  EXPECT_EQ(watch.callocs()[0].elements, 3u);
  EXPECT_EQ(watch.callocs()[0].element_size, 16u);
  EXPECT_TRUE(watch.mallocs().empty());
}

}  // namespace
