// Channel authentication, echo, and the service's clock.

#include "support/exchange.h"
#include "support/heap.h"
#include "support/outputs.h"
#include "support/process_death.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::hex;
using support::kIntSentinel;
using support::kLargest;
using support::kLongSentinel;
using support::kSmallest;
using support::Received;
using support::TextOutput;
using support::to_hex;
using support::Wire;

// ---- channel_auth_request_serialize

class ChannelAuthRequestSerialize : public ExchangeTest {
 protected:
  Encoded out_;

  void call(int64_t request, int64_t user, int64_t device, const char* app, const char* token) {
    out_.status = channel_auth_request_serialize(request, user, device, app, token,
                                                 &out_.data.block, &out_.size);
  }
};

TEST_F(ChannelAuthRequestSerialize, WhenCalled_EncodesTheFiveArguments) {
  call(1, 2, 300, "app", "tok");
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "08 01 10 02 18 ac 02 2a 03 61 70 70 32 03 74 6f 6b");
}

TEST_F(ChannelAuthRequestSerialize, WhenValuesAreZeroAndEmpty_EncodesThemAsPresent) {
  call(0, 0, 0, "", "");
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "08 00 10 00 18 00 2a 00 32 00");
}

TEST_F(ChannelAuthRequestSerialize, WhenIdsAreNegative_EncodesTenByteVarints) {
  call(-1, kSmallest, kLargest, "", "");
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()),
            "08 ff ff ff ff ff ff ff ff ff 01 10 80 80 80 80 80 80 80 80 80 01 "
            "18 ff ff ff ff ff ff ff ff 7f 2a 00 32 00");
}

TEST_F(ChannelAuthRequestSerialize, WhenCalled_LogsNoAccessToken) {
  call(1, 2, 3, "the-app", "the-secret");
  for (const auto& logged : support::logged_calls()) {
    EXPECT_EQ(logged.format.find("the-secret"), std::string::npos);
    for (const auto& argument : logged.arguments) {
      EXPECT_NE(argument, support::LogArgument(std::string("the-secret")));
    }
  }
}

TEST_F(ChannelAuthRequestSerialize, WhenAppIdIsNull_Faults) {
  EXPECT_EXIT(call(1, 2, 3, nullptr, ""), support::faults, "");
}

TEST_F(ChannelAuthRequestSerialize, WhenAccessTokenIsNull_Faults) {
  EXPECT_EXIT(call(1, 2, 3, "", nullptr), support::faults, "");
}

// ---- channel_auth_reply_deserialize

class ChannelAuthReplyDeserialize : public ExchangeTest {
 protected:
  support::ChannelAuthReplyOutputs out_;
};

TEST_F(ChannelAuthReplyDeserialize, WhenReplyIsWhole_WritesAllOutputs) {
  out_.read(hex("08 96 01 12 06 08 e8 07 12 01 6f"));
  EXPECT_EQ(out_.request_id, 150);
  EXPECT_EQ(out_.code, 1000);
  EXPECT_STREQ(out_.text.block, "o");
}

TEST_F(ChannelAuthReplyDeserialize, WhenIdAndCodeAreNegative_WritesThem) {
  out_.read(hex("08 ff ff ff ff ff ff ff ff ff 01 12 0b 08 fe ff ff ff ff ff ff ff ff 01"));
  EXPECT_EQ(out_.request_id, -1);
  EXPECT_EQ(out_.code, -2);
}

TEST_F(ChannelAuthReplyDeserialize, WhenIdIsSmallest_WritesIt) {
  out_.read(hex("08 80 80 80 80 80 80 80 80 80 01"));
  EXPECT_EQ(out_.request_id, kSmallest);
}

TEST_F(ChannelAuthReplyDeserialize, WhenInputIsEmpty_WritesZerosAndNull) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.code, 0);
  EXPECT_EQ(out_.text.block, nullptr);
}

TEST_F(ChannelAuthReplyDeserialize, WhenResultIsAbsent_WritesZeroAndNull) {
  out_.read(hex("08 05"));
  EXPECT_EQ(out_.request_id, 5);
  EXPECT_EQ(out_.code, 0);
  EXPECT_EQ(out_.text.block, nullptr);
}

TEST_F(ChannelAuthReplyDeserialize, WhenResultIsEmpty_WritesZeroAndNull) {
  out_.read(hex("08 05 12 00"));
  EXPECT_EQ(out_.code, 0);
  EXPECT_EQ(out_.text.block, nullptr);
}

TEST_F(ChannelAuthReplyDeserialize, WhenTextIsAbsent_WritesNull) {
  out_.read(hex("08 05 12 02 08 07"));
  EXPECT_EQ(out_.code, 7);
  EXPECT_EQ(out_.text.block, nullptr);
}

TEST_F(ChannelAuthReplyDeserialize, WhenTextIsEmptyButPresent_WritesEmptyText) {
  out_.read(hex("08 05 12 02 12 00"));
  EXPECT_EQ(out_.code, 0);
  EXPECT_STREQ(out_.text.block, "");
}

TEST_F(ChannelAuthReplyDeserialize, WhenRequestIdIsNull_Faults) {
  EXPECT_EXIT(channel_auth_reply_deserialize(nullptr, 0, nullptr, &out_.code, &out_.text.block),
              support::faults, "");
}

TEST_F(ChannelAuthReplyDeserialize, WhenResultCodeIsNull_Faults) {
  EXPECT_EXIT(
      channel_auth_reply_deserialize(nullptr, 0, &out_.request_id, nullptr, &out_.text.block),
      support::faults, "");
}

TEST_F(ChannelAuthReplyDeserialize, WhenResultMsgIsNull_Faults) {
  EXPECT_EXIT(channel_auth_reply_deserialize(nullptr, 0, &out_.request_id, &out_.code, nullptr),
              support::faults, "");
}

TEST_F(ChannelAuthReplyDeserialize, WhenTextHoldsANul_CopiesUpToIt) {
  out_.read(hex("12 05 12 03 61 00 62"));
  EXPECT_STREQ(out_.text.block, "a");
}

// ---- client_echo_reply_serialize

class ClientEchoReplySerialize : public ExchangeTest {
 protected:
  Encoded out_;

  void call(int64_t request) {
    out_.status = client_echo_reply_serialize(request, &out_.data.block, &out_.size);
  }
};

TEST_F(ClientEchoReplySerialize, WhenIdIsZero_EncodesTwoBytes) {
  call(0);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "08 00");
}

TEST_F(ClientEchoReplySerialize, WhenIdIsNegative_EncodesTenByteVarint) {
  call(-1);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "08 ff ff ff ff ff ff ff ff ff 01");
}

// ---- client_echo_deserialize

class ClientEchoDeserialize : public ExchangeTest {
 protected:
  support::ClientEchoOutputs out_;
};

TEST_F(ClientEchoDeserialize, WhenProbeIsWhole_WritesItsId) {
  out_.read(hex("08 96 01"));
  EXPECT_EQ(out_.request_id, 150);
}

TEST_F(ClientEchoDeserialize, WhenIdIsSmallest_WritesIt) {
  out_.read(hex("08 80 80 80 80 80 80 80 80 80 01"));
  EXPECT_EQ(out_.request_id, kSmallest);
}

TEST_F(ClientEchoDeserialize, WhenInputIsEmpty_WritesZero) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
}

TEST_F(ClientEchoDeserialize, WhenRequestIdIsNull_Faults) {
  EXPECT_EXIT(client_echo_deserialize(nullptr, 0, nullptr), support::faults, "");
}

// ---- current_time_request_serialize

class CurrentTimeRequestSerialize : public ExchangeTest {
 protected:
  Encoded out_;

  void call(int64_t request) {
    out_.status = current_time_request_serialize(request, &out_.data.block, &out_.size);
  }
};

TEST_F(CurrentTimeRequestSerialize, WhenIdIsZero_EncodesTwoBytes) {
  call(0);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 00");
}

TEST_F(CurrentTimeRequestSerialize, WhenIdIsLargest_EncodesNineByteVarint) {
  call(kLargest);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 ff ff ff ff ff ff ff ff 7f");
}

// ---- current_time_deserialize

class CurrentTimeDeserialize : public ExchangeTest {
 protected:
  support::CurrentTimeOutputs out_;
};

// userId 9, deviceId 8, requestId 7, result { code 3, msg "no" }, currentTimeMillis 1500
const char kTimeReply[] = "08 09 10 08 58 07 62 06 08 03 12 02 6e 6f 68 dc 0b";

TEST_F(CurrentTimeDeserialize, WhenReplyIsWhole_WritesAllOutputs) {
  out_.read(hex(kTimeReply));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.millis, 1500);
  EXPECT_EQ(out_.code, 3);
  EXPECT_STREQ(out_.text.block, "no");
}

TEST_F(CurrentTimeDeserialize, WhenIdAndTimeAreExtreme_WritesThem) {
  out_.read(Wire().number(11, kSmallest).number(13, kLargest).bytes());
  EXPECT_EQ(out_.request_id, kSmallest);
  EXPECT_EQ(out_.millis, kLargest);
}

TEST_F(CurrentTimeDeserialize, WhenTimeIsZeroButPresent_WritesZero) {
  out_.read(hex("68 00"));
  EXPECT_EQ(out_.millis, 0);
}

TEST_F(CurrentTimeDeserialize, WhenTimeIsAbsent_WritesMinusOne) {
  out_.read(hex("58 07"));
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.millis, -1);
}

TEST_F(CurrentTimeDeserialize, WhenInputIsEmpty_WritesZeroAndMinusOneAlone) {
  out_.read("");
  EXPECT_EQ(out_.request_id, 0);
  EXPECT_EQ(out_.millis, -1);
  EXPECT_EQ(out_.code, kIntSentinel);
  EXPECT_TRUE(out_.text.untouched());
}

TEST_F(CurrentTimeDeserialize, WhenCodeAndTextAreNull_WritesTheOtherTwo) {
  const Received received(hex(kTimeReply));
  current_time_deserialize(received.data(), received.size(), &out_.request_id, &out_.millis,
                           nullptr, nullptr);
  EXPECT_EQ(out_.request_id, 7);
  EXPECT_EQ(out_.millis, 1500);
}

TEST_F(CurrentTimeDeserialize, WhenTheStreamCannotBeAllocated_WritesNothing) {
  {
    const support::FailingNew fault(1);
    EXPECT_THROW(current_time_deserialize(nullptr, 0, &out_.request_id, &out_.millis, &out_.code,
                                          &out_.text.block),
                 std::bad_alloc);
  }
  EXPECT_EQ(out_.request_id, kLongSentinel);
  EXPECT_EQ(out_.millis, kLongSentinel);
  EXPECT_EQ(out_.code, kIntSentinel);
  EXPECT_TRUE(out_.text.untouched());
}

TEST_F(CurrentTimeDeserialize, WhenRequestIdIsNull_Faults) {
  EXPECT_EXIT(
      current_time_deserialize(nullptr, 0, nullptr, &out_.millis, &out_.code, &out_.text.block),
      support::faults, "");
}

TEST_F(CurrentTimeDeserialize, WhenCurrentTimeMillisIsNull_Faults) {
  EXPECT_EXIT(
      current_time_deserialize(nullptr, 0, &out_.request_id, nullptr, &out_.code, &out_.text.block),
      support::faults, "");
}

}  // namespace
