// The functions against the independent peer: what it makes is parsed, what they make it reads.

#include "support/exchange.h"
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

TEST(Interop, OfCreateChatroomRequest_PeerReadsTheArguments) {
  Encoded out;
  const int64_t receivers[] = {INT64_MIN, INT64_MAX, 0, 7, 7};
  ASSERT_EQ(create_chatroom_request_serialize(-1, 4, receivers, 5, "t\xc3\xb6tle", &out.data.block,
                                              &out.size),
            0);
  EXPECT_EQ(peer_decode("CreateChatroomRequest", out.bytes()),
            "requestId: -1\n"
            "chatType: MONOLOGUE\n"
            "receivers: -9223372036854775808\n"
            "receivers: 9223372036854775807\n"
            "receivers: 0\n"
            "receivers: 7\n"
            "receivers: 7\n"
            "chatroomTitle: \"t\\303\\266tle\"\n");
}

TEST(Interop, OfCreateChatroomReply_ReadsWhatThePeerWrote) {
  support::CreateChatroomReplyOutputs out;
  out.read(peer_encode(
      "CreateChatroomReply",
      "userId: 1 deviceId: 2 requestId: 3 chatroomId: 4 "
      "result { code: 1001 msg: 'f\\303\\274nf' subCode: 6 wrongReceiverDetail { "
      "invalidReceivers: [11, 12] interruptedReceivers: 21 disabledReceivers: [31, -32] "
      "existing: 41 notExisting: 51 invitationDenied: [61, 9223372036854775807] "
      "organizationViolated: 71 secureNotSupported: 81 groupKeyUnavailable: 91 "
      "didViolationUsers { userA: -101 userB: 102 } didViolationUsers { userB: 103 } } } "
      "createTimeMillis: 7 ownerUserId: 8 msgTtl: -9"));
  EXPECT_EQ(out.request_id, 3);
  EXPECT_EQ(out.chatroom_id, 4);
  EXPECT_EQ(out.ttl, -9);
  EXPECT_EQ(out.code, 1001);
  EXPECT_STREQ(out.text.block, "f\u00fcnf");
  EXPECT_EQ(out.invalid.elements(), (std::vector<int64_t>{11, 12}));
  EXPECT_EQ(out.disabled.elements(), (std::vector<int64_t>{31, -32}));
  EXPECT_EQ(out.denied.elements(), (std::vector<int64_t>{61, INT64_MAX}));
  ASSERT_EQ(out.violations.count, 2);
  EXPECT_EQ(out.violations.array.block[0].userA, -101);
  EXPECT_EQ(out.violations.array.block[0].userB, 102);
  EXPECT_EQ(out.violations.array.block[1].userA, 0);
  EXPECT_EQ(out.violations.array.block[1].userB, 103);
}

TEST(Interop, OfEndChatRequest_PeerReadsTheEntries) {
  Encoded out;
  const qel_message_endchatentry_t entries[] = {{INT64_MIN, false}, {INT64_MAX, true}};
  ASSERT_EQ(end_chat_request_serialize(-1, entries, 2, &out.data.block, &out.size), 0);
  EXPECT_EQ(peer_decode("EndChatRequest", out.bytes()),
            "requestId: -1\n"
            "endChatEntries {\n"
            "  chatroomId: -9223372036854775808\n"
            "  denyInvitation: false\n"
            "}\n"
            "endChatEntries {\n"
            "  chatroomId: 9223372036854775807\n"
            "  denyInvitation: true\n"
            "}\n");
}

TEST(Interop, OfEndChatReply_ReadsWhatThePeerWrote) {
  support::EndChatReplyOutputs out;
  out.read(peer_encode("EndChatReply",
                       "userId: 1 deviceId: 2 requestId: 3 "
                       "result { code: -4 msg: 'f\\303\\274nf' subCode: 6 "
                       "wrongReceiverDetail { invalidReceivers: 7 } }"));
  EXPECT_EQ(out.request_id, 3);
  EXPECT_EQ(out.code, -4);
  EXPECT_STREQ(out.text.block, "f\u00fcnf");
}

TEST(Interop, OfInviteRequest_PeerReadsTheArguments) {
  Encoded out;
  const int64_t members[] = {INT64_MIN, INT64_MAX, 0, 7, 7};
  const int count = 5;
  ASSERT_EQ(invite_chat_request_serialize(-1, -2, members, &count, &out.data.block, &out.size), 0);
  EXPECT_EQ(peer_decode("InviteRequest", out.bytes()),
            "requestId: -1\n"
            "chatroomId: -2\n"
            "invitingMembers: -9223372036854775808\n"
            "invitingMembers: 9223372036854775807\n"
            "invitingMembers: 0\n"
            "invitingMembers: 7\n"
            "invitingMembers: 7\n");
}

TEST(Interop, OfInviteReply_ReadsWhatThePeerWrote) {
  support::InviteReplyOutputs out;
  out.read(peer_encode(
      "InviteReply",
      "userId: 1 deviceId: 2 requestId: 3 chatroomId: 4 "
      "result { code: 3003 msg: 'f\\303\\274nf' subCode: 6 wrongReceiverDetail { "
      "invalidReceivers: [11, 12] interruptedReceivers: [21, -22] disabledReceivers: 31 "
      "existing: [41, 42, 43] notExisting: 51 invitationDenied: [61, 9223372036854775807] "
      "organizationViolated: 71 secureNotSupported: 81 groupKeyUnavailable: 91 "
      "didViolationUsers { userA: 101 } didViolationUsers { userA: -102 userB: 103 } } } "
      "sentTime: 7"));
  EXPECT_EQ(out.request_id, 3);
  EXPECT_EQ(out.chatroom_id, 4);
  EXPECT_EQ(out.sent_time, 7);
  EXPECT_EQ(out.code, 3003);
  EXPECT_STREQ(out.text.block, "f\u00fcnf");
  EXPECT_EQ(out.invalid.elements(), (std::vector<int64_t>{11, 12}));
  EXPECT_EQ(out.interrupted.elements(), (std::vector<int64_t>{21, -22}));
  EXPECT_EQ(out.disabled.elements(), (std::vector<int64_t>{31}));
  EXPECT_EQ(out.existing.elements(), (std::vector<int64_t>{41, 42, 43}));
  EXPECT_EQ(out.denied.elements(), (std::vector<int64_t>{61, INT64_MAX}));
  ASSERT_EQ(out.violations.count, 2);
  EXPECT_EQ(out.violations.array.block[0].userA, 101);
  EXPECT_EQ(out.violations.array.block[0].userB, 0);
  EXPECT_EQ(out.violations.array.block[1].userA, -102);
  EXPECT_EQ(out.violations.array.block[1].userB, 103);
}

TEST(Interop, OfAllowChatRequest_PeerReadsTheArguments) {
  const bool auto_allow = false;
  Encoded out;
  ASSERT_EQ(allow_chat_request_serialize(INT64_MIN, INT64_MAX, &auto_allow, 500, true, -1, true,
                                         INT64_MAX, true, true, &out.data.block, &out.size),
            0);
  EXPECT_EQ(peer_decode("AllowChatRequest", out.bytes()),
            "requestId: -9223372036854775808\n"
            "chatroomId: 9223372036854775807\n"
            "isAutoAllow: false\n"
            "maxCount: 500\n"
            "needOrderedChatroomMemberList: true\n"
            "needReadAck: true\n"
            "lastReadAckTimestamp: 9223372036854775807\n"
            "needChatroomMeta: true\n"
            "needDeliveryAck: true\n"
            "lastDeliveryAckTimestamp: -1\n");
}

TEST(Interop, OfAllowChatReply_ReadsWhatThePeerWrote) {
  support::AllowChatReplyOutputs out;
  out.read(peer_encode(
      "AllowChatReply",
      "userId: 1 deviceId: 2 requestId: 3 chatroomId: 4 "
      "result { code: 5 msg: 'six' subCode: 7 wrongReceiverDetail { invalidReceivers: 1 } } "
      "lastReadAckTimestamp: 8 ownerUserId: 9 "
      "orderedChatroomMemberList { userId: 10 available: true name: 'Zo\\303\\253' "
      "  isAccepted: true secureChatDevice { deviceId: 11 publicKey: 'p' signKey: 's' } } "
      "readAckEntries { userId: 12 msgId: 13 timestamp: 14 chatroomId: 15 } "
      "title: 'r\\303\\266\\303\\266m' profileUrl: 'url' "
      "deliveryAckEntries { userId: 16 msgId: 17 timestamp: -9223372036854775808 chatroomId: 19 } "
      "lastDeliveryAckTimestamp: 9223372036854775807 msgTtl: -2147483648"));
  EXPECT_EQ(out.request_id, 3);
  EXPECT_EQ(out.chatroom_id, 4);
  EXPECT_EQ(out.code, 5);
  EXPECT_STREQ(out.text.block, "six");
  EXPECT_EQ(out.last_read, 8);
  ASSERT_EQ(out.members.count, 1);
  EXPECT_EQ(out.members.array.block[0]->userId, 10);
  EXPECT_EQ(out.members.array.block[0]->available, 1);
  EXPECT_STREQ(out.members.array.block[0]->name, "Zo\u00eb");
  ASSERT_EQ(out.reads.count, 1);
  EXPECT_EQ(out.reads.array.block[0]->userId, 12);
  EXPECT_EQ(out.reads.array.block[0]->msgId, 13);
  EXPECT_EQ(out.reads.array.block[0]->timestamp, 14);
  EXPECT_STREQ(out.title.block, "r\u00f6\u00f6m");
  ASSERT_EQ(out.deliveries.count, 1);
  EXPECT_EQ(out.deliveries.array.block[0]->userId, 16);
  EXPECT_EQ(out.deliveries.array.block[0]->msgId, 17);
  EXPECT_EQ(out.deliveries.array.block[0]->timestamp, INT64_MIN);
  EXPECT_EQ(out.last_delivery, INT64_MAX);
  EXPECT_EQ(out.ttl, INT32_MIN);
}

TEST(Interop, OfGetAllUnreadMessageRequest_PeerReadsTheArguments) {
  const int most = 500;
  Encoded out;
  ASSERT_EQ(get_all_unread_message_request_serialize(INT64_MIN, &most, &out.data.block, &out.size),
            0);
  EXPECT_EQ(peer_decode("GetAllUnreadMessageRequest", out.bytes()),
            "requestId: -9223372036854775808\n"
            "maxCount: 500\n");
}

TEST(Interop, OfGetAllUnreadMessageReply_ReadsWhatThePeerWrote) {
  support::GetAllUnreadMessageReplyOutputs out;
  out.read(peer_encode("GetAllUnreadMessageReply",
                       "userId: 1 deviceId: 2 requestId: -3 "
                       "result { code: -2147483648 msg: 'f\\303\\274nf' subCode: 6 "
                       "wrongReceiverDetail { invalidReceivers: 1 } }"));
  EXPECT_EQ(out.request_id, -3);
  EXPECT_EQ(out.code, INT32_MIN);
  EXPECT_STREQ(out.text.block, "f\u00fcnf");
}

TEST(Interop, OfForwardOnlineMessageReply_PeerReadsTheArguments) {
  const bool read = true;
  Encoded out;
  ASSERT_EQ(forward_online_message_reply_serialize(INT64_MAX, INT64_MIN, &read, &out.data.block,
                                                   &out.size),
            0);
  EXPECT_EQ(peer_decode("ForwardOnlineMessageReply", out.bytes()),
            "requestId: 9223372036854775807\n"
            "chatroomId: -9223372036854775808\n"
            "markAsRead: true\n");
}

TEST(Interop, OfForwardOnlineMessage_ReadsWhatThePeerWrote) {
  support::ForwardOnlineMessageOutputs out;
  out.read(peer_encode(
      "ForwardOnlineMessage",
      "userId: 1 deviceId: 2 requestId: 3 chatroomId: 4 chatType: MONOLOGUE "
      "inboxEntry { msgId: 5 msgType: VOIP_CALL_SETUP sender: 6 receiver: -9223372036854775808 "
      "  sentTime: 7 chatMsg: 'gr\\303\\274n' msgTtl: -8 chatroomId: 9 chatType: SECURE "
      "  secureChatMsg: '\\377' } "
      "isActiveForward: true currentTimestamp: 10 skipReply: true"));
  EXPECT_EQ(out.request_id, 3);
  EXPECT_EQ(out.chatroom_id, 4);
  EXPECT_EQ(out.chat_type, 4);
  EXPECT_EQ(out.record.msgId, 5);
  EXPECT_EQ(out.record.msgType, 30);
  EXPECT_EQ(out.record.sender, 6);
  EXPECT_EQ(out.record.receiver, INT64_MIN);
  EXPECT_EQ(out.record.sentTime, 7);
  EXPECT_STREQ(out.record.chatMsg, "gr\u00fcn");
  EXPECT_EQ(out.record.msgTtl, -8);
  EXPECT_EQ(out.record.chatroomId, support::kLongSentinel);
  EXPECT_EQ(out.record.chatType, support::kIntSentinel);
  EXPECT_EQ(out.skip.value(), 1);
}

TEST(Interop, OfForwardUnreadMessageReply_PeerReadsTheArguments) {
  const char* key = "K\xc3\xa9y \"2\"";
  const int most = 1;
  Encoded out;
  ASSERT_EQ(
      forward_unread_message_reply_serialize(INT64_MIN, &key, &most, &out.data.block, &out.size),
      0);
  EXPECT_EQ(peer_decode("ForwardUnreadMessageReply", out.bytes()),
            "requestId: -9223372036854775808\n"
            "nextPaginationKey: \"K\\303\\251y \\\"2\\\"\"\n"
            "maxCount: 1\n");
}

TEST(Interop, OfForwardUnreadMessage_ReadsWhatThePeerWrote) {
  support::ForwardUnreadMessageOutputs out;
  out.read(peer_encode(
      "ForwardUnreadMessage",
      "userId: 1 deviceId: 2 requestId: 3 "
      "inboxEntries { msgId: 5 msgType: UNSEAL sender: 6 receiver: 9223372036854775807 "
      "  sentTime: -7 chatMsg: 'gr\\303\\274n' msgTtl: 8 chatroomId: 9 chatType: SECURE "
      "  secureChatMsg: '\\377' } "
      "inboxEntries { msgId: 10 } nextPaginationKey: 'n\\303\\244chste' isActiveForward: true"));
  EXPECT_EQ(out.request_id, 3);
  ASSERT_EQ(out.entries.count, 2);
  const qel_message_inboxentry_t& first = *out.entries.array.block[0];
  EXPECT_EQ(first.msgId, 5);
  EXPECT_EQ(first.msgType, 10);
  EXPECT_EQ(first.sender, 6);
  EXPECT_EQ(first.receiver, INT64_MAX);
  EXPECT_EQ(first.sentTime, -7);
  EXPECT_STREQ(first.chatMsg, "gr\u00fcn");
  EXPECT_EQ(first.chatroomId, 9);
  EXPECT_EQ(first.chatType, 3);
  EXPECT_EQ(first.msgTtl, 8);
  EXPECT_EQ(out.entries.array.block[1]->msgId, 10);
  EXPECT_STREQ(out.next_key.block, "n\u00e4chste");
}

TEST(Interop, OfReadMessageRequest_PeerReadsFourFieldsOfTheRecord) {
  char text[] = "text";
  const qel_message_inboxentry_t entry = {INT64_MAX, 30, INT64_MIN, 1, -2, text, 2, 3, 4};
  Encoded out;
  ASSERT_EQ(
      read_message_request_serialize(INT64_MIN, INT64_MAX, &entry, &out.data.block, &out.size), 0);
  EXPECT_EQ(peer_decode("ReadMessageRequest", out.bytes()),
            "requestId: -9223372036854775808\n"
            "chatroomId: 9223372036854775807\n"
            "inboxEntry {\n"
            "  msgId: 9223372036854775807\n"
            "  msgType: VOIP_CALL_SETUP\n"
            "  sender: -9223372036854775808\n"
            "  sentTime: -2\n"
            "}\n");
}

TEST(Interop, OfUnsealMessageRequest_PeerReadsTheArguments) {
  Encoded out;
  ASSERT_EQ(unseal_message_request_serialize(INT64_MIN, INT64_MAX, -3, INT64_MIN, "gr\xc3\xbcn",
                                             &out.data.block, &out.size),
            0);
  EXPECT_EQ(peer_decode("UnsealMessageRequest", out.bytes()),
            "requestId: -9223372036854775808\n"
            "chatroomId: 9223372036854775807\n"
            "sender: -3\n"
            "msgId: -9223372036854775808\n"
            "msgDetail: \"gr\\303\\274n\"\n");
}

TEST(Interop, OfSaveCallLogRequest_PeerReadsTheArguments) {
  Encoded out;
  ASSERT_EQ(save_call_log_request_serialize(INT64_MIN, INT64_MAX, "gr\xc3\xbcn", "\xe9\x9f\xb3", -3,
                                            INT64_MIN, INT32_MIN, &out.data.block, &out.size),
            0);
  EXPECT_EQ(peer_decode("SaveCallLogRequest", out.bytes()),
            "requestId: -9223372036854775808\n"
            "chatroomId: 9223372036854775807\n"
            "callId: \"gr\\303\\274n\"\n"
            "callLogType: \"\\351\\237\\263\"\n"
            "sender: -3\n"
            "receiver: -9223372036854775808\n"
            "conversationSeconds: -2147483648\n");
}

TEST(Interop, OfIsTyping_PeerReadsTheArguments) {
  const int type = 3;
  const int refresh = INT32_MIN;
  Encoded out;
  is_typing_request_serialize(INT64_MIN, INT64_MAX, "gr\xc3\xbcn", &type, &refresh, &out.data.block,
                              &out.size);
  EXPECT_EQ(peer_decode("IsTyping", out.bytes()),
            "requestId: -9223372036854775808\n"
            "chatroomId: 9223372036854775807\n"
            "state: \"gr\\303\\274n\"\n"
            "contentType: CONTENT_AUDIO\n"
            "refresh: -2147483648\n");
}

TEST(Interop, OfChangeChatroomMetaRequestWithTitle_PeerReadsItAlone) {
  const int ttl = INT32_MAX;
  Encoded out;
  ASSERT_EQ(change_chatroom_meta_request_serialize(INT64_MIN, INT64_MAX, "gr\xc3\xbcn", &ttl,
                                                   &out.data.block, &out.size),
            0);
  EXPECT_EQ(peer_decode("ChangeChatroomMetaRequest", out.bytes()),
            "requestId: -9223372036854775808\n"
            "chatroomId: 9223372036854775807\n"
            "title: \"gr\\303\\274n\"\n");
}

TEST(Interop, OfChangeChatroomMetaRequestWithLifetime_PeerReadsItAlone) {
  const int ttl = INT32_MAX;
  Encoded out;
  ASSERT_EQ(
      change_chatroom_meta_request_serialize(-1, 0, nullptr, &ttl, &out.data.block, &out.size), 0);
  EXPECT_EQ(peer_decode("ChangeChatroomMetaRequest", out.bytes()),
            "requestId: -1\n"
            "chatroomId: 0\n"
            "msgTtl: 2147483647\n");
}

TEST(Interop, OfTypingUpdated_ReadsWhatThePeerWrote) {
  support::TypingUpdatedOutputs out;
  out.read(peer_encode("TypingUpdated",
                       "userId: 1 deviceId: 2 requestId: -9223372036854775808 "
                       "chatroomId: 9223372036854775807 sender: -3 state: 'gr\\303\\274n' "
                       "contentType: CONTENT_VIDEO refresh: -2147483648"));
  EXPECT_EQ(out.request_id, INT64_MIN);
  EXPECT_EQ(out.chatroom_id, INT64_MAX);
  EXPECT_EQ(out.sender, -3);
  EXPECT_STREQ(out.state.block, "gr\xc3\xbcn");
  EXPECT_EQ(out.content_type, 2);
  EXPECT_EQ(out.refresh, INT32_MIN);
}

// All that a plain reply with a chatroom's id has.
const char kPlainReply[] =
    "userId: 1 deviceId: 2 requestId: -9223372036854775808 chatroomId: 9223372036854775807 "
    "result { code: -2147483648 msg: 'gr\\303\\274n' subCode: 3 wrongReceiverDetail { "
    "invalidReceivers: 4 interruptedReceivers: 5 disabledReceivers: 6 existing: 7 notExisting: 8 "
    "invitationDenied: 9 organizationViolated: 10 secureNotSupported: 11 groupKeyUnavailable: 12 "
    "didViolationUsers { userA: 13 userB: 14 } } } ";

template <typename Outputs>
void expect_plain_reply(const Outputs& out) {
  EXPECT_EQ(out.request_id, INT64_MIN);
  EXPECT_EQ(out.code, INT32_MIN);
  EXPECT_STREQ(out.text.block, "gr\xc3\xbcn");
}

TEST(Interop, OfReadMessageReply_ReadsWhatThePeerWrote) {
  support::ReadMessageReplyOutputs out;
  out.read(peer_encode("ReadMessageReply", kPlainReply));
  expect_plain_reply(out);
  EXPECT_EQ(out.chatroom_id, INT64_MAX);
}

TEST(Interop, OfUnsealMessageReply_ReadsWhatThePeerWrote) {
  support::UnsealMessageReplyOutputs out;
  out.read(peer_encode("UnsealMessageReply", kPlainReply));
  expect_plain_reply(out);
  EXPECT_EQ(out.chatroom_id, INT64_MAX);
}

TEST(Interop, OfSaveCallLogReply_ReadsWhatThePeerWrote) {
  support::SaveCallLogReplyOutputs out;
  out.read(peer_encode("SaveCallLogReply", kPlainReply));
  expect_plain_reply(out);
}

TEST(Interop, OfChangeChatroomMetaReply_ReadsWhatThePeerWrote) {
  support::ChangeChatroomMetaReplyOutputs out;
  out.read(
      peer_encode("ChangeChatroomMetaReply", kPlainReply + std::string("changeTimeMillis: 15")));
  expect_plain_reply(out);
  EXPECT_EQ(out.chatroom_id, INT64_MAX);
}

}  // namespace
