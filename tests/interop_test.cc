// The functions against the independent peer: what it makes is parsed, what they make it reads.

#include "support/outputs.h"
#include "support/peer.h"

namespace {

using support::Encoded;
using support::peer_decode;
using support::peer_encode;

TEST(Interop, OfChannelAuthRequest_PeerReadsTheArguments) {
  Encoded out;
  ASSERT_EQ(
      channel_auth_request_serialize(-9223372036854775807LL - 1, 9223372036854775807LL, -1,
                                     "org.example", "t\xc3\xb6ken", &out.data.block, &out.size),
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
  ASSERT_EQ(client_echo_reply_serialize(123456789012345LL, &out.data.block, &out.size), 0);
  EXPECT_EQ(peer_decode("ClientEchoReply", out.bytes()), "requestId: 123456789012345\n");
}

TEST(Interop, OfCurrentTimeRequest_PeerReadsTheIdAlone) {
  Encoded out;
  ASSERT_EQ(current_time_request_serialize(-5, &out.data.block, &out.size), 0);
  EXPECT_EQ(peer_decode("CurrentTimeRequest", out.bytes()), "requestId: -5\n");
}

TEST(Interop, OfChatRequest_PeerReadsOneMessage) {
  Encoded out;
  ASSERT_EQ(
      chat_request_serialize(1, 2, 3, 30, "line\n\"quoted\"", -7, 99, &out.data.block, &out.size),
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
  support::ChannelAuthReplyOutputs out;
  out.read(peer_encode("ChannelAuthReply",
                       "requestId: 77 result { code: -3 msg: 'Gr\\303\\274\\303\\237e' subCode: 5 "
                       "wrongReceiverDetail { invalidReceivers: 1 } }"));
  EXPECT_EQ(out.request_id, 77);
  EXPECT_EQ(out.code, -3);
  EXPECT_STREQ(out.text.block, "Gr\u00fc\u00dfe");
}

TEST(Interop, OfClientEcho_ReadsWhatThePeerWrote) {
  support::ClientEchoOutputs out;
  out.read(peer_encode("ClientEcho", "requestId: -9223372036854775808"));
  EXPECT_EQ(out.request_id, INT64_MIN);
}

TEST(Interop, OfCurrentTimeReply_ReadsWhatThePeerWrote) {
  support::CurrentTimeOutputs out;
  out.read(peer_encode("CurrentTimeReply",
                       "userId: 1 deviceId: 2 requestId: 3 "
                       "result { code: 4 msg: 'five' } currentTimeMillis: 6"));
  EXPECT_EQ(out.request_id, 3);
  EXPECT_EQ(out.millis, 6);
  EXPECT_EQ(out.code, 4);
  EXPECT_STREQ(out.text.block, "five");
}

TEST(Interop, OfChatReply_ReadsWhatThePeerWrote) {
  support::ChatReplyOutputs out;
  out.read(peer_encode("ChatReply",
                       "userId: 1 deviceId: 2 requestId: 3 chatroomId: 4 "
                       "result { code: 5 msg: 'six' subCode: 7 } "
                       "processedMessageEntries { msgId: 8 sentTime: 9 } "
                       "processedMessageEntries { sentTime: 10 } "
                       "processedMessageEntries { msgId: 11 }"));
  EXPECT_EQ(out.request_id, 3);
  EXPECT_EQ(out.chatroom_id, 4);
  EXPECT_EQ(out.code, 5);
  EXPECT_STREQ(out.text.block, "six");
  ASSERT_EQ(out.count, 3);
  const int64_t* ids = out.ids.block;
  const int64_t* times = out.times.block;
  EXPECT_EQ(std::vector<int64_t>(ids, ids + 3), (std::vector<int64_t>{8, 0, 11}));
  EXPECT_EQ(std::vector<int64_t>(times, times + 3), (std::vector<int64_t>{9, 10, 0}));
}

}  // namespace
