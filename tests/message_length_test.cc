// The length of the encoded message: a length below 1 is refused, and the length is computed once.
// Every request carries at least its id, so the test replaces what the runtime answers for the
// length of an id; in a program of its own, because that concerns every call.

#include <google/protobuf/io/coded_stream.h>

#include "support/exchange.h"
#include "support/heap.h"
#include "support/serializers.h"

namespace {

// No other id of the requests is the same. It shows in the traces that their table expects.
constexpr int64_t kRequestId = 1;

int added_to_next_id = 0;
int request_ids_measured = 0;

}  // namespace

// In the program itself, so that the library's calls come here.
int google::protobuf::io::CodedOutputStream::VarintSize64(google::protobuf::uint64 value) {
  request_ids_measured += value == kRequestId ? 1 : 0;
  int length = added_to_next_id;
  added_to_next_id = 0;
  for (; value >= 0x80; value >>= 7) {
    ++length;
  }
  return length + 1;
}

namespace {

using support::kSerializers;
using support::Serializer;

class MessageLength : public support::ExchangeTest,
                      public ::testing::WithParamInterface<Serializer> {
 protected:
  const Serializer& function_ = GetParam();
  support::Encoded out_;

  void call() {
    out_.status = function_.call(kRequestId, &out_.data.block, &out_.size);
    added_to_next_id = 0;
  }
  // With a message that reports this length.
  void call_with_length(int length) {
    added_to_next_id = length - function_.length;
    call();
  }
};

TEST_P(MessageLength, WhenZero_IsRefused) {
  call_with_length(0);
  EXPECT_EQ(out_.status, -1);
  EXPECT_EQ(out_.size, 0);
  EXPECT_TRUE(out_.data.untouched());
}

TEST_P(MessageLength, WhenNegative_IsRefused) {
  call_with_length(-5);
  EXPECT_EQ(out_.status, -1);
  EXPECT_EQ(out_.size, -5);
  EXPECT_TRUE(out_.data.untouched());
}

TEST_P(MessageLength, WhenRefused_IsLogged) {
  for (const int length : {0, -5}) {
    support::clear_log();
    call_with_length(length);
    std::vector<support::Line> lines = {support::debug(function_.entry, {function_.name})};
    lines.insert(lines.end(), function_.detail.begin(), function_.detail.end());
    lines.push_back(support::error("Invalid serialized data size : %d", {length}));
    support::expect_log(function_.name, lines);
  }
}

TEST_P(MessageLength, WhenRefused_KeepsNothing) {
  support::HeapWatch watch;
  call_with_length(0);
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_EQ(watch.not_freed(), std::vector<size_t>{});
}

// As far as the allocation, since no message is that short.
TEST_P(MessageLength, WhenOne_IsAllocated) {
  {
    const support::FailingCalloc fault(1);
    call_with_length(1);
  }
  EXPECT_EQ(out_.size, 1);
  EXPECT_EQ(out_.data.block, nullptr);
}

TEST_P(MessageLength, WhenSucceeding_IsComputedOnce) {
  request_ids_measured = 0;
  call();
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(request_ids_measured, 1);
}

// The one serializer without a check: a length that is none goes to calloc, which refuses it.
class MessageLengthOfIsTyping : public support::ExchangeTest {
 protected:
  static constexpr int kLength = 4;
  support::Encoded out_;

  void call() {
    is_typing_request_serialize(kRequestId, 2, nullptr, nullptr, nullptr, &out_.data.block,
                                &out_.size);
  }
  void call_with_length(int length) {
    added_to_next_id = length - kLength;
    call();
  }
};

TEST_F(MessageLengthOfIsTyping, WhenNegative_IsAFailedAllocation) {
  call_with_length(-5);
  EXPECT_EQ(out_.size, -5);
  EXPECT_EQ(out_.data.block, nullptr);
}

TEST_F(MessageLengthOfIsTyping, WhenNegative_IsLogged) {
  call_with_length(-5);
  const std::string name = "is_typing_request_serialize";
  support::expect_log(name, {support::debug("%s: enter", {name}),
                             support::debug("Memory allocation is failed to serialized_data")});
}

TEST_F(MessageLengthOfIsTyping, WhenNegative_KeepsNothing) {
  support::HeapWatch watch;
  call_with_length(-5);
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_EQ(watch.not_freed(), std::vector<size_t>{});
}

TEST_F(MessageLengthOfIsTyping, WhenSucceeding_IsComputedOnce) {
  request_ids_measured = 0;
  call();
  EXPECT_EQ(out_.size, kLength);
  EXPECT_EQ(request_ids_measured, 1);
}

INSTANTIATE_TEST_SUITE_P(CallFrame, MessageLength, ::testing::ValuesIn(kSerializers),
                         [](const auto& row) { return row.param.name; });

}  // namespace
