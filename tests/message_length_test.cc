// The length of the encoded message: a length below 1 is refused, and the length is computed once.
// Every request carries at least its id, so the test replaces the length that the messages report;
// in a program of its own, because that concerns every call.

#include <dlfcn.h>

#include <cstring>
#include <optional>
#include <stdexcept>

#include "msgspec_frontend.pb.h"
#include "support/exchange.h"
#include "support/heap.h"
#include "support/serializers.h"

namespace {

std::optional<int> replaced_length;
int lengths_computed = 0;

// What the messages answer, unless a test replaces it.
template <typename Message>
int length_of(const Message* message, const char* symbol) {
  ++lengths_computed;
  if (replaced_length) {
    return *replaced_length;
  }
  int (*real)(const Message*) = nullptr;
  void* found = dlsym(RTLD_NEXT, symbol);
  if (found == nullptr) {
    throw std::runtime_error(symbol);
  }
  std::memcpy(&real, &found, sizeof real);
  return real(message);
}

}  // namespace

// In the program itself, so that the library's virtual calls come here.
int ChannelAuthRequest::ByteSize() const {
  return length_of(this, "_ZNK18ChannelAuthRequest8ByteSizeEv");
}
int ClientEchoReply::ByteSize() const {
  return length_of(this, "_ZNK15ClientEchoReply8ByteSizeEv");
}
int CreateChatroomRequest::ByteSize() const {
  return length_of(this, "_ZNK21CreateChatroomRequest8ByteSizeEv");
}
int ChatRequest::ByteSize() const {
  return length_of(this, "_ZNK11ChatRequest8ByteSizeEv");
}
int AllowChatRequest::ByteSize() const {
  return length_of(this, "_ZNK16AllowChatRequest8ByteSizeEv");
}
int GetAllUnreadMessageRequest::ByteSize() const {
  return length_of(this, "_ZNK26GetAllUnreadMessageRequest8ByteSizeEv");
}
int ForwardOnlineMessageReply::ByteSize() const {
  return length_of(this, "_ZNK25ForwardOnlineMessageReply8ByteSizeEv");
}
int ForwardUnreadMessageReply::ByteSize() const {
  return length_of(this, "_ZNK25ForwardUnreadMessageReply8ByteSizeEv");
}
int ReadMessageRequest::ByteSize() const {
  return length_of(this, "_ZNK18ReadMessageRequest8ByteSizeEv");
}
int EndChatRequest::ByteSize() const {
  return length_of(this, "_ZNK14EndChatRequest8ByteSizeEv");
}
int InviteRequest::ByteSize() const {
  return length_of(this, "_ZNK13InviteRequest8ByteSizeEv");
}
int CurrentTimeRequest::ByteSize() const {
  return length_of(this, "_ZNK18CurrentTimeRequest8ByteSizeEv");
}
int UnsealMessageRequest::ByteSize() const {
  return length_of(this, "_ZNK20UnsealMessageRequest8ByteSizeEv");
}
int SaveCallLogRequest::ByteSize() const {
  return length_of(this, "_ZNK18SaveCallLogRequest8ByteSizeEv");
}
int IsTyping::ByteSize() const {
  return length_of(this, "_ZNK8IsTyping8ByteSizeEv");
}
int ChangeChatroomMetaRequest::ByteSize() const {
  return length_of(this, "_ZNK25ChangeChatroomMetaRequest8ByteSizeEv");
}

namespace {

using support::kSerializers;
using support::Serializer;

class MessageLength : public support::ExchangeTest,
                      public ::testing::WithParamInterface<Serializer> {
 protected:
  const Serializer& function_ = GetParam();
  support::Encoded out_;

  void TearDown() override { replaced_length.reset(); }
  void call() { out_.status = function_.call(1, &out_.data.block, &out_.size); }
};

TEST_P(MessageLength, WhenZero_IsRefused) {
  replaced_length = 0;
  call();
  EXPECT_EQ(out_.status, -1);
  EXPECT_EQ(out_.size, 0);
  EXPECT_TRUE(out_.data.untouched());
}

TEST_P(MessageLength, WhenNegative_IsRefused) {
  replaced_length = -5;
  call();
  EXPECT_EQ(out_.status, -1);
  EXPECT_EQ(out_.size, -5);
  EXPECT_TRUE(out_.data.untouched());
}

TEST_P(MessageLength, WhenRefused_IsLogged) {
  for (const int length : {0, -5}) {
    replaced_length = length;
    call();
    std::vector<support::Line> lines = {support::debug(function_.entry, {function_.name})};
    lines.insert(lines.end(), function_.detail.begin(), function_.detail.end());
    lines.push_back(support::error("Invalid serialized data size : %d", {length}));
    support::expect_log(function_.name, lines);
  }
}

TEST_P(MessageLength, WhenRefused_KeepsNothing) {
  replaced_length = 0;
  support::HeapWatch watch;
  call();
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_EQ(watch.not_freed(), std::vector<size_t>{});
}

// As far as the allocation, since no message is that short.
TEST_P(MessageLength, WhenOne_IsAllocated) {
  replaced_length = 1;
  {
    const support::FailingCalloc fault(1);
    call();
  }
  EXPECT_EQ(out_.size, 1);
  EXPECT_EQ(out_.data.block, nullptr);
}

TEST_P(MessageLength, WhenSucceeding_IsComputedOnce) {
  lengths_computed = 0;
  call();
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(lengths_computed, 1);
}

// The one serializer without a check: a length that is none goes to calloc, which refuses it.
TEST(MessageLengthOfIsTyping, WhenNegative_IsAFailedAllocation) {
  replaced_length = -5;
  support::clear_log();
  support::Encoded out;
  is_typing_request_serialize(1, 2, nullptr, nullptr, nullptr, &out.data.block, &out.size);
  replaced_length.reset();
  EXPECT_EQ(out.size, -5);
  EXPECT_EQ(out.data.block, nullptr);
  const std::string name = "is_typing_request_serialize";
  support::expect_log(name, {support::debug("%s: enter", {name}),
                             support::debug("Memory allocation is failed to serialized_data")});
}

TEST(MessageLengthOfIsTyping, WhenNegative_KeepsNothing) {
  replaced_length = -5;
  support::Encoded out;
  support::HeapWatch watch;
  is_typing_request_serialize(1, 2, "a", nullptr, nullptr, &out.data.block, &out.size);
  watch.stop();
  replaced_length.reset();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_EQ(watch.not_freed(), std::vector<size_t>{});
}

TEST(MessageLengthOfIsTyping, WhenSucceeding_IsComputedOnce) {
  lengths_computed = 0;
  support::Encoded out;
  is_typing_request_serialize(1, 2, nullptr, nullptr, nullptr, &out.data.block, &out.size);
  EXPECT_EQ(lengths_computed, 1);
}

INSTANTIATE_TEST_SUITE_P(CallFrame, MessageLength, ::testing::ValuesIn(kSerializers),
                         [](const auto& row) { return row.param.name; });

}  // namespace
