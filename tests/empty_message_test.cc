// A message that encodes to no bytes. Every request carries at least its id, so the test replaces
// the length that the messages report; in a program of its own, because it does so throughout.

#include "msgspec_frontend.pb.h"
#include "qel-message-serialize.h"
#include "support/exchange.h"
#include "support/heap.h"

// In the program itself, so that the library's virtual calls come here.
int ChannelAuthRequest::ByteSize() const {
  return 0;
}
int ClientEchoReply::ByteSize() const {
  return 0;
}
int ChatRequest::ByteSize() const {
  return 0;
}
int CurrentTimeRequest::ByteSize() const {
  return 0;
}

namespace {

using support::Encoded;

class EmptyMessage : public support::ExchangeTest {
 protected:
  Encoded out_;

  void expect_refused(const std::string& function, const std::string& entry) {
    EXPECT_EQ(out_.status, -1);
    EXPECT_EQ(out_.size, 0);
    EXPECT_TRUE(out_.data.untouched());
    support::expect_log(function, {support::debug(entry, {function}),
                                   support::error("Invalid serialized data size : %d", {0})});
  }
};

TEST_F(EmptyMessage, OfChannelAuthRequest_IsRefused) {
  out_.status = channel_auth_request_serialize(1, 2, 3, "a", "b", &out_.data.block, &out_.size);
  expect_refused("channel_auth_request_serialize", "%s start");
}

TEST_F(EmptyMessage, OfClientEchoReply_IsRefused) {
  out_.status = client_echo_reply_serialize(1, &out_.data.block, &out_.size);
  expect_refused("client_echo_reply_serialize", "%s start");
}

TEST_F(EmptyMessage, OfChatRequest_IsRefused) {
  out_.status = chat_request_serialize(1, 2, 3, 0, "a", 4, 0, &out_.data.block, &out_.size);
  expect_refused("chat_request_serialize", "%s start");
}

TEST_F(EmptyMessage, OfCurrentTimeRequest_IsRefused) {
  out_.status = current_time_request_serialize(1, &out_.data.block, &out_.size);
  expect_refused("current_time_request_serialize", "%s: enter");
}

TEST_F(EmptyMessage, WhenRefused_KeepsNothing) {
  support::HeapWatch watch;
  out_.status = chat_request_serialize(1, 2, 3, 0, "a", 4, 0, &out_.data.block, &out_.size);
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
}

}  // namespace
