// The functions against the independent peer: what it makes is parsed, what they make it reads.

#include "qel-message-serialize.h"
#include "support/exchange.h"
#include "support/peer.h"

namespace {

using support::Encoded;
using support::kIntSentinel;
using support::kLongSentinel;
using support::peer_decode;
using support::peer_encode;
using support::Received;

TEST(Interop, OfChannelAuthRequest_PeerReadsTheArguments) {
  Encoded out;
  ASSERT_EQ(channel_auth_request_serialize(-9223372036854775807LL - 1, 9223372036854775807LL, -1,
                                           "org.example", "t\xc3\xb6ken", &out.data, &out.size),
            0);
  EXPECT_EQ(peer_decode("ChannelAuthRequest", out.bytes()),
            "requestId: -9223372036854775808\n"
            "userId: 9223372036854775807\n"
            "deviceId: -1\n"
            "appId: \"org.example\"\n"
            "accessToken: \"t\\303\\266ken\"\n");
}

TEST(Interop, OfClientEchoReply_PeerReadsTheId) {
  Encoded out;
  ASSERT_EQ(client_echo_reply_serialize(123456789012345LL, &out.data, &out.size), 0);
  EXPECT_EQ(peer_decode("ClientEchoReply", out.bytes()), "requestId: 123456789012345\n");
}

TEST(Interop, OfCurrentTimeRequest_PeerReadsTheIdAlone) {
  Encoded out;
  ASSERT_EQ(current_time_request_serialize(-5, &out.data, &out.size), 0);
  EXPECT_EQ(peer_decode("CurrentTimeRequest", out.bytes()), "requestId: -5\n");
}

TEST(Interop, OfChatRequest_PeerReadsOneMessage) {
  Encoded out;
  ASSERT_EQ(chat_request_serialize(1, 2, 3, 30, "line\n\"quoted\"", -7, 99, &out.data, &out.size),
            0);
  EXPECT_EQ(peer_decode("ChatRequest", out.bytes()),
            "requestId: 1\n"
            "chatroomId: 2\n"
            "chatMessageParams {\n"
            "  msgId: 3\n"
            "  msgType: VOIP_CALL_SETUP\n"
            "  chatMsg: \"line\\n\\\"quoted\\\"\"\n"
            "  msgTtl: -7\n"
            "}\n");
}

TEST(Interop, OfChannelAuthReply_ReadsWhatThePeerWrote) {
  const Received received(
      peer_encode("ChannelAuthReply",
                  "requestId: 77 result { code: -3 msg: 'Gr\\303\\274\\303\\237e' subCode: 5 "
                  "wrongReceiverDetail { invalidReceivers: 1 } }"));
  int64_t request_id = kLongSentinel;
  int code = kIntSentinel;
  support::TextOutput text;
  channel_auth_reply_deserialize(received.data(), received.size(), &request_id, &code, &text.text);
  EXPECT_EQ(request_id, 77);
  EXPECT_EQ(code, -3);
  EXPECT_STREQ(text.text,
               "Gr\xc3\xbc\xc3\x9f"
               "e");
}

TEST(Interop, OfClientEcho_ReadsWhatThePeerWrote) {
  const Received received(peer_encode("ClientEcho", "requestId: -9223372036854775808"));
  int64_t request_id = kLongSentinel;
  client_echo_deserialize(received.data(), received.size(), &request_id);
  EXPECT_EQ(request_id, INT64_MIN);
}

TEST(Interop, OfCurrentTimeReply_ReadsWhatThePeerWrote) {
  const Received received(peer_encode("CurrentTimeReply",
                                      "userId: 1 deviceId: 2 requestId: 3 "
                                      "result { code: 4 msg: 'five' } currentTimeMillis: 6"));
  int64_t request_id = kLongSentinel;
  int64_t millis = kLongSentinel;
  int code = kIntSentinel;
  support::TextOutput text;
  current_time_deserialize(received.data(), received.size(), &request_id, &millis, &code,
                           &text.text);
  EXPECT_EQ(request_id, 3);
  EXPECT_EQ(millis, 6);
  EXPECT_EQ(code, 4);
  EXPECT_STREQ(text.text, "five");
}

TEST(Interop, OfChatReply_ReadsWhatThePeerWrote) {
  const Received received(peer_encode("ChatReply",
                                      "userId: 1 deviceId: 2 requestId: 3 chatroomId: 4 "
                                      "result { code: 5 msg: 'six' subCode: 7 } "
                                      "processedMessageEntries { msgId: 8 sentTime: 9 } "
                                      "processedMessageEntries { sentTime: 10 } "
                                      "processedMessageEntries { msgId: 11 }"));
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int code = kIntSentinel;
  support::TextOutput text;
  int count = kIntSentinel;
  support::IdListOutput ids;
  support::IdListOutput times;
  chat_reply_deserialize(received.data(), received.size(), &request_id, &chatroom_id, &code,
                         &text.text, &count, &ids.ids, &times.ids);
  EXPECT_EQ(request_id, 3);
  EXPECT_EQ(chatroom_id, 4);
  EXPECT_EQ(code, 5);
  EXPECT_STREQ(text.text, "six");
  ASSERT_EQ(count, 3);
  EXPECT_EQ(std::vector<int64_t>(ids.ids, ids.ids + 3), (std::vector<int64_t>{8, 0, 11}));
  EXPECT_EQ(std::vector<int64_t>(times.ids, times.ids + 3), (std::vector<int64_t>{9, 10, 0}));
}

}  // namespace
