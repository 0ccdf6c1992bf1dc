// Ending chats.

#include <cstring>
#include <limits>

#include "support/exchange.h"
#include "support/outputs.h"
#include "support/process_death.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::kLargest;
using support::kSmallest;
using support::to_hex;
using support::Wire;

// ---- end_chat_request_serialize

class EndChatRequestSerialize : public ExchangeTest {
 protected:
  Encoded out_;

  void call(int64_t request, const qel_message_endchatentry_t* entries, int count) {
    out_.status = end_chat_request_serialize(request, entries, count, &out_.data.block, &out_.size);
  }
  void call(int64_t request, const std::vector<qel_message_endchatentry_t>& entries) {
    call(request, entries.data(), static_cast<int>(entries.size()));
  }
  void expect_bytes(const std::string& expected) {
    ASSERT_EQ(out_.status, 0);
    EXPECT_EQ(to_hex(out_.bytes()), expected);
  }
};

TEST_F(EndChatRequestSerialize, WhenCalled_EncodesEntriesInOrderAndNoIdsOfTheSender) {
  call(1, {{300, true}, {5, false}, {300, true}});
  expect_bytes("58 01 62 05 08 ac 02 58 01 62 04 08 05 58 00 62 05 08 ac 02 58 01");
}

TEST_F(EndChatRequestSerialize, WhenInvitationsAreNotDenied_EncodesThatAsPresent) {
  call(1, {{2, false}});
  expect_bytes("58 01 62 04 08 02 58 00");
}

TEST_F(EndChatRequestSerialize, WhenDenyInvitationHoldsAnotherByte_EncodesItAsTrue) {
  for (const unsigned char byte : support::kBytesOfNoBool) {
    Encoded out;
    qel_message_endchatentry_t entry = {2, false};
    std::memset(&entry.denyInvitation, byte, 1);
    end_chat_request_serialize(1, &entry, 1, &out.data.block, &out.size);
    EXPECT_EQ(to_hex(out.bytes()), "58 01 62 04 08 02 58 01") << static_cast<int>(byte);
  }
}

TEST_F(EndChatRequestSerialize, WhenIdsAreZero_EncodesThemAsPresent) {
  call(0, {{0, true}});
  expect_bytes("58 00 62 04 08 00 58 01");
}

TEST_F(EndChatRequestSerialize, WhenIdsAreExtreme_EncodesThem) {
  call(kLargest, {{kSmallest, true}, {kLargest, false}});
  expect_bytes(
      "58 ff ff ff ff ff ff ff ff 7f 62 0d 08 80 80 80 80 80 80 80 80 80 01 58 01 "
      "62 0c 08 ff ff ff ff ff ff ff ff 7f 58 00");
}

TEST_F(EndChatRequestSerialize, WhenThereAre1000Entries_EncodesThemAll) {
  std::vector<qel_message_endchatentry_t> entries;
  Wire expected = Wire().number(11, 1);
  for (int i = 0; i < 1000; ++i) {
    entries.push_back({i - 500, i % 2 != 0});
    expected.message(12, Wire().number(1, i - 500).number(11, i % 2));
  }
  call(1, entries);
  expect_bytes(to_hex(expected.bytes()));
}

TEST_F(EndChatRequestSerialize, WhenCountIsZero_EncodesTheRequestIdAlone) {
  const qel_message_endchatentry_t entry = {2, true};
  call(0, &entry, 0);
  expect_bytes("58 00");
}

TEST_F(EndChatRequestSerialize, WhenCountIsZero_EntriesMayBeNull) {
  call(1, nullptr, 0);
  expect_bytes("58 01");
}

TEST_F(EndChatRequestSerialize, WhenCountIsNegative_EntriesMayBeNull) {
  call(1, nullptr, -1);
  expect_bytes("58 01");
}

TEST_F(EndChatRequestSerialize, WhenCountIsSmallest_EncodesNoEntries) {
  const qel_message_endchatentry_t entry = {2, true};
  call(1, &entry, std::numeric_limits<int>::min());
  expect_bytes("58 01");
}

TEST_F(EndChatRequestSerialize, WhenEntriesIsNullAndCountIsOne_Faults) {
  EXPECT_EXIT(call(1, nullptr, 1), support::faults, "");
}

// ---- end_chat_reply_deserialize

TEST(EndChatReplyDeserialize, WhenRequestIdIsNull_Faults) {
  support::EndChatReplyOutputs out;
  EXPECT_EXIT(end_chat_reply_deserialize(nullptr, 0, nullptr, &out.code, &out.text.block),
              support::faults, "");
}

}  // namespace
