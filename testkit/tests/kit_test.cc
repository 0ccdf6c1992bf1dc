// What a kit delivers, and what it has to report.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>
#include <google/protobuf/stubs/common.h>
#include <google/protobuf/text_format.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "msgspec_frontend.pb.h"
#include "qel-testkit.h"

namespace {

using google::protobuf::DescriptorPool;
using google::protobuf::Message;
using google::protobuf::MessageFactory;
using google::protobuf::TextFormat;

using Lines = std::vector<std::string>;

std::unique_ptr<Message> message_named(const std::string& name) {
  const auto* type = DescriptorPool::generated_pool()->FindMessageTypeByName(name);
  return std::unique_ptr<Message>(MessageFactory::generated_factory()->GetPrototype(type)->New());
}

class TestKit : public ::testing::Test {
 protected:
  ~TestKit() override { qel_testkit_release(kit_); }

  void start(const char* scenario) {
    qel_testkit_release(kit_);
    kit_ = qel_testkit_new(scenario);
    ASSERT_NE(kit_, nullptr);
  }
  // With a connection that is authenticated.
  void start_signed_in(const std::string& scenario) {
    start(("world { isSignedIn: true } " + scenario).c_str());
  }

  void send_bytes(const char* name, const std::string& bytes) {
    qel_testkit_sent(kit_, name, reinterpret_cast<const unsigned char*>(bytes.data()),
                     static_cast<int>(bytes.size()));
  }
  void send(const char* name, const std::string& fields) {
    const google::protobuf::LogSilencer silence;  // of texts that are no UTF-8
    const auto message = message_named(name);
    ASSERT_TRUE(TextFormat::ParseFromString(fields, message.get())) << fields;
    send_bytes(name, message->SerializeAsString());
  }

  // All that is due, in the text form.
  Lines received() {
    Lines lines;
    qel_testkit_delivery_t delivery;
    while (qel_testkit_next(kit_, &delivery)) {
      const auto message = message_named(delivery.message);
      EXPECT_EQ(delivery.after_ms, 0);
      EXPECT_TRUE(message->ParseFromArray(delivery.data, delivery.size)) << delivery.message;
      lines.push_back(std::string(delivery.message) + ": " + message->ShortDebugString());
    }
    next_after_ = delivery.after_ms;
    return lines;
  }
  // The same, as bytes.
  Lines received_bytes() {
    Lines bytes;
    qel_testkit_delivery_t delivery;
    while (qel_testkit_next(kit_, &delivery)) {
      bytes.emplace_back(reinterpret_cast<const char*>(delivery.data),
                         static_cast<size_t>(delivery.size));
    }
    return bytes;
  }

  std::string report() { return qel_testkit_report(kit_); }
  // When all that is due was taken.
  std::string end() {
    received_bytes();
    const bool is_good = qel_testkit_end(kit_);
    EXPECT_EQ(is_good, report().empty());
    return report();
  }

  qel_testkit_t* kit_ = nullptr;
  int64_t next_after_ = -1;
};

// ---- The service

TEST_F(TestKit, ServiceAlone_AnswersEachRequest) {
  start(nullptr);
  send("ChannelAuthRequest",
       "requestId: 1 userId: 5001 deviceId: 7 appId: 'a' accessToken: 'example-access-token'");
  EXPECT_EQ(received(),
            (Lines{"ChannelAuthReply: requestId: 1 result { code: 0 msg: \"welcome\" }"}));
  send("CurrentTimeRequest", "requestId: 2");
  send("UnsealMessageRequest",
       "requestId: 3 chatroomId: 42 sender: 6001 msgId: 8001 msgDetail: ''");
  send("GetAllReadAckRequest", "requestId: 4");
  EXPECT_EQ(received(),
            (Lines{"CurrentTimeReply: requestId: 2 result { code: 0 msg: \"ok\" } "
                   "currentTimeMillis: 1700000100000",
                   "UnsealMessageReply: requestId: 3 chatroomId: 42 result { code: 0 msg: \"ok\" }",
                   "GetAllReadAckReply: requestId: 4 result { code: 0 msg: \"ok\" }"}));
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, Service_TellsTheTimeThatHasPassed) {
  start_signed_in("");
  qel_testkit_wait(kit_, 2500);
  send("CurrentTimeRequest", "requestId: 1");
  EXPECT_EQ(received(), (Lines{"CurrentTimeReply: requestId: 1 result { code: 0 msg: \"ok\" } "
                               "currentTimeMillis: 1700000102500"}));
}

TEST_F(TestKit, NegativeTime_IsNone) {
  start_signed_in("push TypingUpdated after 1s");
  qel_testkit_wait(kit_, -5000);
  received();
  EXPECT_EQ(next_after_, 1000);
}

TEST_F(TestKit, WrongToken_IsRefusedAndNotShown) {
  start(nullptr);
  send("ChannelAuthRequest",
       "requestId: 1 userId: 5001 deviceId: 7 appId: 'a' accessToken: 'secret'");
  EXPECT_EQ(received(),
            (Lines{"ChannelAuthReply: requestId: 1 result { code: 2001 msg: \"access token "
                   "refused\" }"}));
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ChannelAuthRequest, is wrong: it has another access token "
            "than the service.\n");
}

TEST_F(TestKit, NewChatroom_CanBeEnteredAndLeft) {
  start_signed_in("world { firstChatroomId: 50 }");
  send("CreateChatroomRequest",
       "requestId: 1 chatType: GROUP receivers: 6001 chatroomTitle: 'New'");
  received();
  send("AllowChatRequest",
       "requestId: 2 chatroomId: 50 needOrderedChatroomMemberList: true needChatroomMeta: true");
  send("EndChatRequest", "requestId: 3 endChatEntries { chatroomId: 50 }");
  EXPECT_EQ(received()[0],
            "AllowChatReply: requestId: 2 chatroomId: 50 result { code: 0 msg: \"ok\" } "
            "ownerUserId: 5001 orderedChatroomMemberList { userId: 5001 available: true name: "
            "\"Ana\" isAccepted: true } orderedChatroomMemberList { userId: 6001 available: true "
            "name: \"Bo\" isAccepted: true } title: \"New\" msgTtl: 3600");
  EXPECT_EQ(report(), "");
  send("AllowChatRequest", "requestId: 4 chatroomId: 50");
  EXPECT_EQ(end(),
            "Message 4 of the plug-in, an AllowChatRequest, is wrong: there is no chatroom 50, or "
            "the user has left it.\n");
}

TEST_F(TestKit, NewChatrooms_HaveIdsOfTheirOwn) {
  start_signed_in("");
  for (const char* id : {"1", "2"}) {
    send("CreateChatroomRequest", std::string("chatType: GROUP receivers: 6001 requestId: ") + id);
  }
  const Lines replies = received();
  EXPECT_NE(replies[0].find("chatroomId: 50 result { code: 0 "), std::string::npos) << replies[0];
  EXPECT_NE(replies[1].find("chatroomId: 51"), std::string::npos);
}

TEST_F(TestKit, Chatroom_IsDescribedAsFarAsIsAskedFor) {
  start_signed_in("");
  send("AllowChatRequest", "requestId: 1 chatroomId: 42");
  EXPECT_EQ(received(),
            (Lines{"AllowChatReply: requestId: 1 chatroomId: 42 result { code: 0 msg: \"ok\" } "
                   "lastReadAckTimestamp: 1700000008001 ownerUserId: 5001 "
                   "lastDeliveryAckTimestamp: 1700000008002 msgTtl: 3600"}));
}

TEST_F(TestKit, RefusedUsers_AreListedByReason) {
  start_signed_in("");
  send("InviteRequest",
       "requestId: 1 chatroomId: 42 invitingMembers: [6001, 6003, 6004, 6005, 6006, 6007, 999]");
  EXPECT_EQ(received(),
            (Lines{"InviteReply: requestId: 1 chatroomId: 42 result { code: 3003 msg: \"some "
                   "members were not invited\" wrongReceiverDetail { invalidReceivers: 999 "
                   "interruptedReceivers: 6006 disabledReceivers: 6003 existing: 6001 "
                   "invitationDenied: 6005 didViolationUsers { userA: 5001 userB: 6004 } } } "
                   "sentTime: 1700000100000"}));
}

TEST_F(TestKit, StoredMessages_ComeInPagesOfTheSizeThatIsAskedFor) {
  start_signed_in("world { stored { msgId: 1 } stored { msgId: 2 } stored { msgId: 3 } }");
  send("GetAllUnreadMessageRequest", "requestId: 1 maxCount: 2");
  EXPECT_EQ(received()[1],
            "ForwardUnreadMessage: requestId: 700001 inboxEntries { msgId: 1 } inboxEntries { "
            "msgId: 2 } nextPaginationKey: \"page 2\"");
  send("ForwardUnreadMessageReply", "requestId: 700001 nextPaginationKey: 'page 2' maxCount: 2");
  EXPECT_EQ(received(),
            (Lines{"ForwardUnreadMessage: requestId: 700002 inboxEntries { msgId: 3 }"}));
  send("ForwardUnreadMessageReply", "requestId: 700002");
  EXPECT_EQ(received(), Lines{});
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, PageThatIsAcknowledgedTwice_IsFollowedOnce) {
  start_signed_in("world { stored { msgId: 1 } stored { msgId: 2 } }");
  send("GetAllUnreadMessageRequest", "requestId: 1 maxCount: 1");
  received();
  send("ForwardUnreadMessageReply", "requestId: 700001 nextPaginationKey: 'page 2' maxCount: 1");
  send("ForwardUnreadMessageReply", "requestId: 700001 nextPaginationKey: 'page 2' maxCount: 1");
  EXPECT_EQ(received().size(), 1U);
}

TEST_F(TestKit, Typing_IsPushedByAnotherMemberAndHasNoReply) {
  start_signed_in("");
  send("IsTyping", "requestId: 1 chatroomId: 42 state: 'typing' contentType: CONTENT_TEXT");
  EXPECT_EQ(received(),
            (Lines{"TypingUpdated: requestId: 700001 chatroomId: 42 sender: 6001 state: "
                   "\"typing\" contentType: CONTENT_TEXT refresh: 0"}));
  EXPECT_EQ(end(), "");
}

struct Complaint {
  const char* name;
  const char* message;
  const char* fields;
  const char* reason;
};

const Complaint kComplaints[] = {
    {"NoRequestId", "CurrentTimeRequest", "", "it has no requestId, or 0"},
    {"UnknownChatroom", "IsTyping", "requestId: 1 chatroomId: 43 state: 'x'",
     "there is no chatroom 43, or the user has left it"},
    {"NoRequest", "TypingUpdated", "requestId: 1", "a plug-in does not send it"},
    {"AnswerToNothing", "ClientEchoReply", "requestId: 3",
     "it answers nothing: no such message with the requestId 3 was sent"},
    {"EchoOfItsOwn", "ClientEcho", "requestId: 1", "a plug-in does not send it"},
    {"MessageZero", "ChatRequest",
     "requestId: 1 chatroomId: 42 chatMessageParams { msgId: 0 msgType: TEXT chatMsg: 'x' }",
     "its msgId is 0, which is that of no message"},
    {"EmptyText", "ChatRequest",
     "requestId: 1 chatroomId: 42 chatMessageParams { msgId: 1 msgType: TEXT chatMsg: '' }",
     "its text is empty"},
    {"NegativeLifetimeOfAMessage", "ChatRequest",
     "requestId: 1 chatroomId: 42 chatMessageParams { msgId: 1 msgType: TEXT chatMsg: 'x' msgTtl: "
     "-1 }",
     "its msgTtl -1 is negative"},
    {"NegativeLifetime", "ChangeChatroomMetaRequest", "requestId: 1 chatroomId: 42 msgTtl: -1",
     "its msgTtl -1 is negative"},
    {"ChangeOfNothing", "ChangeChatroomMetaRequest", "requestId: 1 chatroomId: 42",
     "it changes nothing"},
    {"ReceiptOfAnUnknownMessage", "ReadMessageRequest",
     "requestId: 1 chatroomId: 42 inboxEntry { msgId: 8001 sender: 6002 sentTime: 1 }",
     "there is no message 8001 of the user 6002"},
    {"UnsealingAnUnknownMessage", "UnsealMessageRequest",
     "requestId: 1 chatroomId: 42 sender: 8001 msgId: 6001",
     "there is no message 6001 of the user 8001"},
    {"ReceiptInAnotherChatroom", "ReadMessageRequest",
     "requestId: 1 chatroomId: 41 inboxEntry { msgId: 8001 sender: 6001 sentTime: 1700000008001 }",
     "there is no chatroom 41, or the user has left it; the message 8001 is one of the chatroom "
     "42"},
    {"ReceiptWithAnotherTime", "ReadMessageRequest",
     "requestId: 1 chatroomId: 42 inboxEntry { msgId: 8001 sender: 6001 sentTime: 0 }",
     "the message 8001 has another sentTime"},
    {"ReceiptOfNothing", "ReadMessageRequest", "requestId: 1 chatroomId: 42",
     "inboxEntry is missing"},
    {"InvitingNobody", "InviteRequest", "requestId: 1 chatroomId: 42 invitingMembers: [6007, 0]",
     "it has the user 0, which is the id of nobody"},
    {"CreatingWithNobody", "CreateChatroomRequest", "requestId: 1 chatType: GROUP receivers: 0",
     "it has the user 0, which is the id of nobody"},
    {"LeavingAnUnknownChatroom", "EndChatRequest", "requestId: 1 endChatEntries { chatroomId: 7 }",
     "there is no chatroom 7, or the user has left it"},
    {"LeavingNoChatroom", "EndChatRequest", "requestId: 1 endChatEntries { }",
     "an entry has no chatroomId"},
    {"TextThatIsNoUtf8", "ChatRequest",
     "requestId: 1 chatroomId: 42 chatMessageParams { msgId: 1 msgType: TEXT chatMsg: '\\377' }",
     "chatMessageParams.chatMsg is not UTF-8"},
    {"TwoComplaints", "InviteRequest", "chatroomId: 42",
     "invitingMembers is missing; it has no requestId, or 0"},
    {"SecondLogin", "ChannelAuthRequest",
     "requestId: 1 userId: 1 deviceId: 7 appId: 'a' accessToken: 'example-access-token'",
     "the connection is authenticated already"},
};

class Service : public TestKit, public ::testing::WithParamInterface<Complaint> {};

TEST_P(Service, ComplainsOfWhatAPluginShouldNotSend) {
  start_signed_in("");
  send(GetParam().message, GetParam().fields);
  const std::string type = GetParam().message;
  EXPECT_EQ(report(), std::string("Message 1 of the plug-in, ") +
                          (std::strchr("EIU", type[0]) != nullptr ? "an " : "a ") + type +
                          ", is wrong: " + GetParam().reason + ".\n");
}

TEST_F(TestKit, DeniedInvitation_IsThatOfAnyChatroom) {
  start_signed_in("");
  send("EndChatRequest", "requestId: 1 endChatEntries { chatroomId: 7 denyInvitation: true }");
  EXPECT_EQ(end(), "");
}

struct WrongLogin {
  const char* name;
  const char* fields;
  const char* reason;
};

const WrongLogin kWrongLogins[] = {
    {"OtherUser", "userId: 6001 appId: 'a'", "its userId is 6001, but the service's user is 5001"},
    {"EmptyAppId", "userId: 5001 appId: ''", "its appId is empty"},
};

class Login : public TestKit, public ::testing::WithParamInterface<WrongLogin> {};

TEST_P(Login, ThatIsWrong_IsReported) {
  start(nullptr);
  send("ChannelAuthRequest",
       std::string("requestId: 1 deviceId: 7 accessToken: 'example-access-token' ") +
           GetParam().fields);
  EXPECT_EQ(end(), std::string("Message 1 of the plug-in, a ChannelAuthRequest, is wrong: ") +
                       GetParam().reason + ".\n");
}

INSTANTIATE_TEST_SUITE_P(Each, Login, ::testing::ValuesIn(kWrongLogins),
                         [](const auto& row) { return row.param.name; });

const char kChat[] = "chatroomId: 42 chatMessageParams { msgType: TEXT ";

TEST_F(TestKit, MsgIdOfAnotherMessage_IsReported) {
  start_signed_in("");
  send("ChatRequest", std::string(kChat) + "msgId: 1 chatMsg: 'x' } requestId: 1");
  send("ChatRequest", std::string(kChat) + "msgId: 1 chatMsg: 'y' } requestId: 2");
  EXPECT_EQ(end(),
            "Message 2 of the plug-in, a ChatRequest, is wrong: its msgId 1 is that of another "
            "message.\n");
}

TEST_F(TestKit, MessageThatIsSentAgain_IsTheSame) {
  start_signed_in("expect ChatRequest answer dropped");
  send("ChatRequest", std::string(kChat) + "msgId: 1 chatMsg: 'x' } requestId: 1");
  qel_testkit_wait(kit_, 5000);
  send("ChatRequest", std::string(kChat) + "msgId: 1 chatMsg: 'x' } requestId: 2");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, MessageThatIsSentAgainAsAnother_IsReportedWhereTextsDiffer) {
  start_signed_in("world { hasDistinctTexts: true }");
  send("ChatRequest", std::string(kChat) + "msgId: 1 chatMsg: 'x' } requestId: 1");
  send("ChatRequest", std::string(kChat) + "msgId: 2 chatMsg: 'x' } requestId: 2");
  EXPECT_EQ(end(),
            "Message 2 of the plug-in, a ChatRequest, is wrong: it has the text of the message 1, "
            "but another msgId.\n");
}

TEST_F(TestKit, SameText_IsAnotherMessageElsewhere) {
  start_signed_in("");
  send("ChatRequest", std::string(kChat) + "msgId: 1 chatMsg: 'x' } requestId: 1");
  send("ChatRequest", std::string(kChat) + "msgId: 2 chatMsg: 'x' } requestId: 2");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, SeveralMessagesInOneRequest_AreFine) {
  start_signed_in("");
  send("ChatRequest", std::string(kChat) +
                          "msgId: 1 chatMsg: 'x' } chatMessageParams { msgId: 2 "
                          "chatMsg: 'y' } requestId: 1");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, SameMsgIdTwiceInOneRequest_IsReported) {
  start_signed_in("");
  send("ChatRequest", std::string(kChat) +
                          "msgId: 1 chatMsg: 'x' } chatMessageParams { msgId: 1 "
                          "chatMsg: 'y' } requestId: 1");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ChatRequest, is wrong: its msgId 1 is that of another "
            "message.\n");
}

struct Textless {
  const char* name;
  const char* fields;
};

const Textless kTextless[] = {
    {"Picture", "msgType: MEDIA"},
    {"SecureMessage", "msgType: TEXT secureChatMsg: 'sealed'"},
};

class MessageWithoutAText : public TestKit, public ::testing::WithParamInterface<Textless> {};

TEST_P(MessageWithoutAText, IsFine) {
  start_signed_in("");
  send("ChatRequest", std::string("requestId: 1 chatroomId: 42 chatMessageParams { msgId: 1 ") +
                          GetParam().fields + " }");
  EXPECT_EQ(end(), "");
}

INSTANTIATE_TEST_SUITE_P(Each, MessageWithoutAText, ::testing::ValuesIn(kTextless),
                         [](const auto& row) { return row.param.name; });

TEST_F(TestKit, ChatroomOfAMessageThatCame_IsOneOfTheUsers) {
  start_signed_in(
      "push ForwardOnlineMessage { chatroomId: 77 skipReply: true inboxEntry { msgId: 1 sender: "
      "6007 "
      "sentTime: 5 } } push ForwardUnreadMessage { inboxEntries { msgId: 2 chatroomId: 78 } }");
  received();
  send("ForwardUnreadMessageReply", "requestId: 700002");
  send("AllowChatRequest", "requestId: 1 chatroomId: 77");
  send("AllowChatRequest", "requestId: 2 chatroomId: 78");
  send("ReadMessageRequest",
       "requestId: 3 chatroomId: 77 inboxEntry { msgId: 1 sender: 6007 sentTime: 5 }");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, RequestIdOfAnOpenRequest_IsReported) {
  start_signed_in("");
  send("CurrentTimeRequest", "requestId: 7");
  send("GetAllReadAckRequest", "requestId: 7");
  EXPECT_EQ(
      end(),
      "Message 2 of the plug-in, a GetAllReadAckRequest, is wrong: its requestId 7 is that of "
      "another request, which has no reply yet.\n");
}

TEST_F(TestKit, RequestIdsInAnyOrder_AreFine) {
  start_signed_in("");
  for (const char* id : {"requestId: 7", "requestId: 3", "requestId: -5"}) {
    send("CurrentTimeRequest", id);
  }
  received();
  send("CurrentTimeRequest", "requestId: 7");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, RepeatedRequest_IsAnsweredAgainAsTheSame) {
  start_signed_in("");
  send("CreateChatroomRequest", "requestId: 7 chatType: GROUP receivers: 6001");
  send("CreateChatroomRequest", "requestId: 7 chatType: GROUP receivers: 6001");
  const Lines replies = received();
  ASSERT_EQ(replies.size(), 2U);
  EXPECT_EQ(replies[0], replies[1]);
  EXPECT_EQ(end(), "");
}

// ---- What changes

TEST_F(TestKit, RequestBeforeTheLoginsReply_IsReported) {
  start(nullptr);
  send("ChannelAuthRequest",
       "requestId: 1 userId: 5001 deviceId: 7 appId: 'a' accessToken: 'example-access-token'");
  send("CurrentTimeRequest", "requestId: 2");
  EXPECT_EQ(end(),
            "Message 2 of the plug-in, a CurrentTimeRequest, is wrong: it comes before the login "
            "was granted.\n");
}

TEST_F(TestKit, LoginWhoseReplyIsLost_CanBeRepeated) {
  start("expect ChannelAuthRequest answer dropped");
  for (const char* id : {"1", "2"}) {
    send("ChannelAuthRequest", std::string("userId: 5001 deviceId: 7 appId: 'a' accessToken: "
                                           "'example-access-token' requestId: ") +
                                   id);
    received();
  }
  send("CurrentTimeRequest", "requestId: 3");
  EXPECT_EQ(end(), "");
}

struct Refusal {
  const char* name;
  const char* answer;
};

const Refusal kRefusals[] = {
    {"Failure", "{ result { code: 5 } }"},
    {"AnotherRequest", "{ requestId: 9 }"},
    {"AnotherMessage", "InviteReply"},
    {"Dropped", "dropped"},
    {"Broken", "cut at 2"},
};

class RefusedRequest : public TestKit, public ::testing::WithParamInterface<Refusal> {};

TEST_P(RefusedRequest, ChangesNothing) {
  start_signed_in(std::string("expect EndChatRequest answer ") + GetParam().answer);
  send("EndChatRequest", "requestId: 1 endChatEntries { chatroomId: 42 }");
  received_bytes();
  send("AllowChatRequest", "requestId: 2 chatroomId: 42");
  EXPECT_EQ(end(), "");
}

INSTANTIATE_TEST_SUITE_P(Each, RefusedRequest, ::testing::ValuesIn(kRefusals),
                         [](const auto& row) { return row.param.name; });

TEST_F(TestKit, CreatedChatroom_HasTheIdOfTheReply) {
  start_signed_in("expect CreateChatroomRequest answer { chatroomId: 60 }");
  send("CreateChatroomRequest", "requestId: 1 chatType: GROUP receivers: 6001");
  received();
  send("AllowChatRequest", "requestId: 2 chatroomId: 60");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, ChatroomThatIsCreatedAnew_HasOtherMembersAndItsMarks) {
  start_signed_in("world { firstChatroomId: 42 }");
  send("CreateChatroomRequest", "requestId: 1 chatType: GROUP receivers: 6007 chatroomTitle: 'x'");
  received();
  send("AllowChatRequest",
       "requestId: 2 chatroomId: 42 needOrderedChatroomMemberList: true needReadAck: true");
  EXPECT_EQ(
      received()[0],
      "AllowChatReply: requestId: 2 chatroomId: 42 result { code: 0 msg: \"ok\" } "
      "lastReadAckTimestamp: 1700000008001 ownerUserId: 5001 orderedChatroomMemberList { "
      "userId: 5001 available: true name: \"Ana\" isAccepted: true } "
      "orderedChatroomMemberList { userId: 6007 available: true name: \"Hana\" isAccepted: true "
      "} readAckEntries { userId: 6001 msgId: 8001 timestamp: 1700000008001 chatroomId: 42 } "
      "lastDeliveryAckTimestamp: 1700000008002 msgTtl: 3600");
}

TEST_F(TestKit, ChangedChatroom_HasTheNewTitleAndLifetimeAndMembers) {
  start_signed_in("");
  send("ChangeChatroomMetaRequest", "requestId: 1 chatroomId: 42 title: 'Dinner'");
  send("ChangeChatroomMetaRequest", "requestId: 2 chatroomId: 42 msgTtl: 60");
  send("InviteRequest", "requestId: 3 chatroomId: 42 invitingMembers: 6007");
  received();
  send("AllowChatRequest",
       "requestId: 4 chatroomId: 42 needOrderedChatroomMemberList: true needChatroomMeta: true");
  const std::string reply = received()[0];
  EXPECT_NE(reply.find("title: \"Dinner\""), std::string::npos) << reply;
  EXPECT_NE(reply.find("msgTtl: 60"), std::string::npos) << reply;
  EXPECT_NE(reply.find("userId: 6007"), std::string::npos) << reply;
}

TEST_F(TestKit, ChatroomThatIsRefusedWithItsReceivers_IsNotCreated) {
  start_signed_in("expect CreateChatroomRequest answer { result { code: 4001 } }");
  send("CreateChatroomRequest", "requestId: 1 chatType: GROUP receivers: 999");
  received();
  send("AllowChatRequest", "requestId: 2 chatroomId: 50");
  EXPECT_NE(end().find("there is no chatroom 50"), std::string::npos);
}

TEST_F(TestKit, ChatroomThatIsCreatedWithoutAnId_IsNone) {
  start_signed_in("expect CreateChatroomRequest answer { !chatroomId }");
  send("CreateChatroomRequest", "requestId: 1 chatType: GROUP receivers: 6001");
  received();
  send("AllowChatRequest", "requestId: 2 chatroomId: 0");
  EXPECT_NE(end().find("there is no chatroom 0"), std::string::npos);
}

TEST_F(TestKit, IdsBeyondTheLast_WrapAround) {
  start_signed_in(
      "world { firstPushId: 9223372036854775807 } push TypingUpdated push TypingUpdated");
  EXPECT_EQ(received(), (Lines{"TypingUpdated: requestId: 9223372036854775807",
                               "TypingUpdated: requestId: -9223372036854775808"}));
}

TEST_F(TestKit, UnreadMessagesThatWereAcknowledged_DoNotComeAgain) {
  start_signed_in("world { stored { msgId: 1 } stored { msgId: 2 } }");
  send("GetAllUnreadMessageRequest", "requestId: 1 maxCount: 1");
  received();
  send("ForwardUnreadMessageReply", "requestId: 700001");
  send("GetAllUnreadMessageRequest", "requestId: 2 maxCount: 1");
  EXPECT_EQ(received()[1], "ForwardUnreadMessage: requestId: 700002 inboxEntries { msgId: 2 }");
}

INSTANTIATE_TEST_SUITE_P(Each, Service, ::testing::ValuesIn(kComplaints),
                         [](const auto& row) { return row.param.name; });

// ---- Expectations

TEST_F(TestKit, Expectation_LooksAtTheFieldsThatItNames) {
  start_signed_in("expect InviteRequest { chatroomId: 42 invitingMembers: 6007 !commonKey }");
  send("InviteRequest", "requestId: 1 chatroomId: 42 invitingMembers: 6007");
  EXPECT_EQ(end(), "");
}

struct Difference {
  const char* name;
  const char* expected;
  const char* came;
  const char* reason;
};

const Difference kDifferences[] = {
    {"Number", "msgId: 7", "msgId: 8", "msgId is 8 instead of 7"},
    {"Text", "chatMsg: 'a'", "chatMsg: 'b'", "chatMsg is \"b\" instead of \"a\""},
    {"LongText", "chatMsg: 'a'",
     "chatMsg: "
     "'0123456789012345678901234567890123456789012345678901234567890123456789012345678901234567890"
     "1234567890'",
     "chatMsg is "
     "\"0123456789012345678901234567890123456789012345678901234567890123456789012345678901234567890"
     "123456789...\" instead of \"a\""},
    {"TextOf100Bytes", "chatMsg: 'a'",
     "chatMsg: "
     "'0123456789012345678901234567890123456789012345678901234567890123456789012345678901234567890"
     "123456789'",
     "chatMsg is "
     "\"0123456789012345678901234567890123456789012345678901234567890123456789012345678901234567890"
     "123456789\" instead of \"a\""},
    {"Enumeration", "msgType: MEDIA", "msgType: TEXT", "msgType is TEXT instead of MEDIA"},
    {"NumberOfNoMember", "msgType: 77", "msgType: TEXT", "msgType is TEXT instead of 77"},
    {"UnknownField", "99: 'x'", "", "the unknown field 99 is missing, which should be \"x\""},
    {"AbsentValue", "msgId: 7", "", "msgId is missing, which should be 7"},
    {"AbsentField", "chatMsg", "", "chatMsg is missing"},
    {"FieldThatShouldNotBe", "!msgId", "msgId: 0", "msgId should not be there"},
    {"Several", "msgId: 7 chatMsg", "msgId: 8", "msgId is 8 instead of 7; chatMsg is missing"},
};

class Expectation : public TestKit, public ::testing::WithParamInterface<Difference> {};

TEST_P(Expectation, ThatIsNotMet_SaysWhichFieldDiffers) {
  start_signed_in(std::string("expect ReadMessageRequest { inboxEntry { ") + GetParam().expected +
                  " } }");
  send("ReadMessageRequest",
       std::string("requestId: 1 chatroomId: 42 inboxEntry { sender: 1 ") + GetParam().came + " }");
  std::string reasons = GetParam().reason;
  for (size_t at = 0; at != std::string::npos; at = reasons.find("; ", at + 1)) {
    const size_t begin = at == 0 ? 0 : at + 2;
    reasons.insert(begin, "inboxEntry.");
  }
  EXPECT_NE(report().find("Message 1 of the plug-in, a ReadMessageRequest, is not what line 1 "
                          "expects: " +
                          reasons + ".\n"),
            std::string::npos)
      << report();
}

INSTANTIATE_TEST_SUITE_P(Each, Expectation, ::testing::ValuesIn(kDifferences),
                         [](const auto& row) { return row.param.name; });

TEST_F(TestKit, ListOfAnotherLength_IsReported) {
  start_signed_in("expect InviteRequest { invitingMembers: [6007, 6008] }");
  send("InviteRequest", "requestId: 1 chatroomId: 42 invitingMembers: 6009");
  EXPECT_EQ(report(),
            "Message 1 of the plug-in, an InviteRequest, is not what line 1 expects: "
            "invitingMembers has 1 elements instead of 2; invitingMembers[0] is 6009 instead of "
            "6007.\n");
}

TEST_F(TestKit, AccessToken_IsNeverReported) {
  start("expect ChannelAuthRequest { accessToken: 'secret1' }");
  send("ChannelAuthRequest",
       "requestId: 1 userId: 1 deviceId: 7 appId: 'a' accessToken: 'secret2'");
  EXPECT_EQ(report().find("secret"), std::string::npos);
  EXPECT_NE(report().find("accessToken is (not shown) instead of (not shown)"), std::string::npos);
}

TEST_F(TestKit, AccessTokenInAnotherPlace_IsNotReportedEither) {
  start_signed_in("expect ChangeChatroomMetaRequest { title: 'x' }");
  send("ChangeChatroomMetaRequest",
       "requestId: 1 chatroomId: 42 title: 'my example-access-token!'");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ChangeChatroomMetaRequest, is not what line 1 expects: "
            "title is \"my (not shown)!\" instead of \"x\".\n");
}

TEST_F(TestKit, AccessTokenInTheFieldOfAnother_IsNotReportedEither) {
  start("expect ChannelAuthRequest { appId: 'x' }");
  send("ChannelAuthRequest",
       "requestId: 1 userId: 5001 deviceId: 7 appId: 'the_real_token' accessToken: 'my app'");
  EXPECT_NE(end().find("appId is (not shown) instead of (not shown)"), std::string::npos);
}

TEST_F(TestKit, AccessTokenThatIsCutOrEscaped_IsNotReportedEither) {
  start_signed_in(
      "world { accessToken: '\\n8\\177xxxxxxxx' } expect ChangeChatroomMetaRequest { title: 'x' }");
  send("ChangeChatroomMetaRequest",
       "requestId: 1 chatroomId: 42 title: '" + std::string(95, 'a') + "\\n8\\177xxxxxxxx'");
  EXPECT_NE(end().find("aaaa(not ...\" instead of"), std::string::npos) << report();
}

TEST_F(TestKit, AccessTokenThatBeginsWithAnother_IsNotReportedEither) {
  start("world { accessToken: 'abcdefgh' } expect ChangeChatroomMetaRequest { title: 'x' }");
  send("ChannelAuthRequest",
       "requestId: 1 userId: 5001 deviceId: 7 appId: 'a' accessToken: 'abcdefghREST'");
  send("ChangeChatroomMetaRequest", "requestId: 2 chatroomId: 42 title: 'abcdefghREST'");
  EXPECT_EQ(end().find("REST"), std::string::npos);
}

TEST_F(TestKit, AccessTokenOfThePlugin_IsNotReportedEither) {
  start(nullptr);
  send("ChannelAuthRequest",
       "requestId: 1 userId: 1 deviceId: 7 appId: 'a' accessToken: 'another_token'");
  send_bytes("another_token", "");
  EXPECT_EQ(end().find("another_token"), std::string::npos);
}

TEST_F(TestKit, NameThatMayBeAnything_IsNotShown) {
  start_signed_in("");
  send_bytes("\x05my-token\n", "");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in has a name of other characters, which is that of no "
            "message.\n");
}

TEST_F(TestKit, WhatIsNotExpected_TheServiceAnswers) {
  start_signed_in("expect CurrentTimeRequest");
  send("GetAllReadAckRequest", "requestId: 1");
  EXPECT_EQ(received().size(), 1U);
  EXPECT_EQ(end(), "Line 1 expects a CurrentTimeRequest, which never came.\n");
}

TEST_F(TestKit, WhenStrict_WhatIsNotExpectedIsAMistake) {
  start_signed_in("strict expect CurrentTimeRequest");
  send("GetAllReadAckRequest", "requestId: 1");
  send("CurrentTimeRequest", "requestId: 2");
  send("CurrentTimeRequest", "requestId: 3");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a GetAllReadAckRequest, is not expected: line 1 expects a "
            "CurrentTimeRequest.\n"
            "Message 3 of the plug-in, a CurrentTimeRequest, is not expected: the scenario is "
            "over.\n");
}

TEST_F(TestKit, ExpectationThatIsMetTooLate_IsReportedOnce) {
  start_signed_in("expect CurrentTimeRequest within 2s");
  qel_testkit_wait(kit_, 2000);
  EXPECT_EQ(report(), "");
  qel_testkit_wait(kit_, 1);
  qel_testkit_wait(kit_, 1);
  send("CurrentTimeRequest", "requestId: 1");
  EXPECT_EQ(end(), "No CurrentTimeRequest came within 2000 ms, as line 1 expects.\n");
}

TEST_F(TestKit, EachExpectation_HasATimeOfItsOwn) {
  start_signed_in("expect CurrentTimeRequest within 1s\nexpect CurrentTimeRequest within 1s");
  qel_testkit_wait(kit_, 1001);
  qel_testkit_wait(kit_, -1001);
  send("CurrentTimeRequest", "requestId: 1");
  received();
  qel_testkit_wait(kit_, 1000);
  EXPECT_EQ(report(), "No CurrentTimeRequest came within 1000 ms, as line 1 expects.\n");
  qel_testkit_wait(kit_, 1);
  send("CurrentTimeRequest", "requestId: 2");
  EXPECT_EQ(end(),
            "No CurrentTimeRequest came within 1000 ms, as line 1 expects.\n"
            "No CurrentTimeRequest came within 1000 ms, as line 2 expects.\n");
}

TEST_F(TestKit, Time_CountsFromWhatCameToThePlugin) {
  start_signed_in(
      "expect CurrentTimeRequest answer after 3s expect GetAllReadAckRequest within 1s");
  send("CurrentTimeRequest", "requestId: 1");
  qel_testkit_wait(kit_, 5000);
  received();
  qel_testkit_wait(kit_, 1000);
  EXPECT_EQ(report(), "");
  qel_testkit_wait(kit_, 1);
  EXPECT_EQ(report(), "No GetAllReadAckRequest came within 1000 ms, as line 1 expects.\n");
}

TEST_F(TestKit, TimeWithoutEnd_Stops) {
  start_signed_in("world { clockMillis: 9223372036854775807 } push TypingUpdated after 2s");
  qel_testkit_wait(kit_, INT64_MAX);
  qel_testkit_wait(kit_, INT64_MAX);
  send("CurrentTimeRequest", "requestId: 1");
  EXPECT_NE(received()[1].find("currentTimeMillis: 9223372036854775807"), std::string::npos);
}

TEST_F(TestKit, InAnyOrder_TakesTheMessagesAsTheyCome) {
  start_signed_in(
      "in any order { expect CurrentTimeRequest answer { requestId: 9 } "
      "expect GetAllReadAckRequest }\nexpect GetAllUnreadMessageRequest");
  send("GetAllReadAckRequest", "requestId: 1");
  EXPECT_EQ(received(), (Lines{"GetAllReadAckReply: requestId: 1 result { code: 0 msg: \"ok\" }"}));
  send("CurrentTimeRequest", "requestId: 2");
  EXPECT_EQ(received(), (Lines{"CurrentTimeReply: requestId: 9 result { code: 0 msg: \"ok\" } "
                               "currentTimeMillis: 1700000100000"}));
  EXPECT_EQ(end(), "Line 2 expects a GetAllUnreadMessageRequest, which never came.\n");
}

TEST_F(TestKit, InAnyOrder_PrefersWhatFits) {
  start_signed_in(
      "in any order { expect InviteRequest { invitingMembers: 6001 } expect InviteRequest { "
      "invitingMembers: 6007 } }");
  send("InviteRequest", "requestId: 1 chatroomId: 42 invitingMembers: 6007");
  EXPECT_EQ(report(), "");
  send("InviteRequest", "requestId: 2 chatroomId: 42 invitingMembers: 6002");
  EXPECT_EQ(end(),
            "Message 2 of the plug-in, an InviteRequest, is not what line 1 expects: "
            "invitingMembers[0] is 6002 instead of 6001.\n");
}

TEST_F(TestKit, RequestThatComesAgain_NeedNotBeTheNextExpectedOne) {
  start_signed_in(
      "expect IsTyping { state: 'a' } expect CurrentTimeRequest { userId: 1 } answer dropped "
      "expect "
      "CurrentTimeRequest { userId: 2 }");
  send("IsTyping", "requestId: 1 chatroomId: 42 state: 'a'");
  send("CurrentTimeRequest", "requestId: 2 userId: 1");
  send("CurrentTimeRequest", "requestId: 2 userId: 1");
  send("CurrentTimeRequest", "requestId: 3 userId: 2");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, MissingMessageThatWasReportedLate_IsNotReportedAgain) {
  start_signed_in("push ClientEcho expect ClientEchoReply within 1s");
  received();
  qel_testkit_wait(kit_, 1001);
  EXPECT_EQ(end(), "No ClientEchoReply came within 1000 ms, as line 1 expects.\n");
}

TEST_F(TestKit, NumberOutsideAnEnumeration_IsAnyIfItIsNotNamed) {
  start_signed_in("expect IsTyping expect IsTyping { contentType }");
  for (const char* id : {"\1", "\2"}) {
    send_bytes("IsTyping", std::string("\x58") + id + "\x60\x2a\x6a\x01x\x70\x09");
  }
  EXPECT_EQ(report(),
            "Message 1 of the plug-in, an IsTyping, is wrong: contentType has a value that the "
            "schema does not have. And 1 more time.\n");
}

TEST_F(TestKit, InAnyOrder_WhatIsMissingIsReported) {
  start_signed_in(
      "strict in any order {\nexpect CurrentTimeRequest\nexpect GetAllReadAckRequest }");
  send("IsTyping", "requestId: 1 chatroomId: 42 state: 'x'");
  send("CurrentTimeRequest", "requestId: 2");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, an IsTyping, is not expected: line 2 expects a "
            "CurrentTimeRequest, line 3 expects a GetAllReadAckRequest.\n"
            "Line 3 expects a GetAllReadAckRequest, which never came.\n");
}

TEST_F(TestKit, AnswerToAnEarlierRequest_BelongsToIt) {
  start_signed_in(
      "expect CurrentTimeRequest called clock expect GetAllReadAckRequest answer answer to clock "
      "{ !result }");
  send("CurrentTimeRequest", "requestId: 1");
  send("GetAllReadAckRequest", "requestId: 2");
  EXPECT_EQ(received(), (Lines{"GetAllReadAckReply: requestId: 2 result { code: 0 msg: \"ok\" }",
                               "CurrentTimeReply: requestId: 1 currentTimeMillis: 1700000100000"}));
}

TEST_F(TestKit, AnswerToARequestThatDidNotCome_IsReported) {
  start_signed_in(
      "in any order { expect CurrentTimeRequest called clock\n"
      "expect GetAllReadAckRequest answer to clock }");
  send("GetAllReadAckRequest", "requestId: 2");
  EXPECT_EQ(report(), "Line 2 answers a request that did not come yet.\n");
}

TEST_F(TestKit, EmptyList_IsOneThatIsNotThere) {
  start_signed_in(
      "push ForwardUnreadMessage { inboxEntries: [] } expect EndChatRequest { endChatEntries: [] "
      "}");
  EXPECT_EQ(received(), (Lines{"ForwardUnreadMessage: requestId: 700001"}));
  send("EndChatRequest", "requestId: 1 endChatEntries { chatroomId: 42 }");
  EXPECT_EQ(report(),
            "Message 1 of the plug-in, an EndChatRequest, is not what line 1 expects: "
            "endChatEntries should not be there.\n");
}

TEST_F(TestKit, ManyDifferences_AreCounted) {
  start_signed_in("expect InviteRequest { invitingMembers: [1, 2, 3, 4, 5, 6, 7] }");
  send("InviteRequest",
       "requestId: 1 chatroomId: 42 invitingMembers: [11, 12, 13, 14, 15, 16, 17]");
  EXPECT_NE(report().find("invitingMembers[4] is 15 instead of 5; and 2 more.\n"),
            std::string::npos)
      << report();
}

TEST_F(TestKit, SameMistake_IsSaidOnce) {
  start_signed_in("always CurrentTimeRequest { !requestId }");
  for (const char* id : {"requestId: 1", "requestId: 2", "requestId: 3"}) {
    send("CurrentTimeRequest", id);
  }
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a CurrentTimeRequest, is not what line 1 requires: "
            "requestId should not be there. And 2 more times.\n");
}

TEST_F(TestKit, WhatSeveralRequire_IsSaidOnce) {
  start_signed_in("always AllowChatRequest { chatroomId } expect AllowChatRequest { chatroomId }");
  send("AllowChatRequest", "requestId: 1");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, an AllowChatRequest, is wrong: chatroomId is missing.\n");
}

TEST_F(TestKit, BytesThatAreNoSuchMessage_AreReported) {
  start_signed_in("");
  send_bytes("ClientEchoReply", "\x08");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ClientEchoReply, cannot be read: its bytes are broken, or "
            "those of another message.\n");
}

TEST_F(TestKit, FieldsThatTheSchemaDoesNotHave_AreReported) {
  start_signed_in("");
  send_bytes("CurrentTimeRequest", "\x58\x01\x98\x06\x01");
  EXPECT_EQ(
      end(),
      "Message 1 of the plug-in, a CurrentTimeRequest, is wrong: the schema has no field 99.\n");
}

TEST_F(TestKit, AtMost_AllowsSoMany) {
  start_signed_in("at most 1 CurrentTimeRequest");
  send("CurrentTimeRequest", "requestId: 1");
  EXPECT_EQ(report(), "");
  send("CurrentTimeRequest", "requestId: 2");
  send("CurrentTimeRequest", "requestId: 3");
  EXPECT_EQ(end(),
            "Message 2 of the plug-in, a CurrentTimeRequest, is one too many: line 1 allows 1.\n");
}

TEST_F(TestKit, Never_CountsWhatHasTheFields) {
  start_signed_in("never GetAllReadAckRequest { lastReadAckTimestamp: 5 }");
  send("GetAllReadAckRequest", "requestId: 1 lastReadAckTimestamp: 4");
  EXPECT_EQ(report(), "");
  send("GetAllReadAckRequest", "requestId: 2 lastReadAckTimestamp: 5");
  EXPECT_NE(report(), "");
}

TEST_F(TestKit, NeverWithin_HoldsForSoLong) {
  start_signed_in("never CurrentTimeRequest within 1s");
  qel_testkit_wait(kit_, 1001);
  send("CurrentTimeRequest", "requestId: 1");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, Always_HoldsForEachMessage) {
  start_signed_in("always CurrentTimeRequest { requestId: 1 }");
  send("CurrentTimeRequest", "requestId: 1");
  send("CurrentTimeRequest", "requestId: 2");
  EXPECT_EQ(
      end(),
      "Message 2 of the plug-in, a CurrentTimeRequest, is not what line 1 requires: requestId "
      "is 2 instead of 1.\n");
}

TEST_F(TestKit, PluginWithoutEnd_IsStopped) {
  start_signed_in("strict");
  for (int i = 1; i <= 100; ++i) {
    send("CurrentTimeRequest", "requestId: " + std::to_string(i));
    received();
  }
  send("CurrentTimeRequest", "requestId: 101");
  EXPECT_EQ(received(), Lines{});
  EXPECT_NE(end().find("There is more, and nothing is delivered any longer.\n"), std::string::npos);
}

// ---- Answers and pushes

const char kClock[] = "expect CurrentTimeRequest ";

TEST_F(TestKit, Answer_IsTheServicesUnlessTheScenarioHasAnother) {
  start_signed_in(std::string(kClock) + "answer CurrentTimeReply { result { code: 3 } }");
  send("CurrentTimeRequest", "requestId: 5");
  EXPECT_EQ(received(), (Lines{"CurrentTimeReply: requestId: 5 result { code: 3 }"}));
}

TEST_F(TestKit, AnotherAnswer_HasTheRequestsChatroom) {
  start_signed_in("expect InviteRequest answer InviteReply answer InviteReply { !chatroomId }");
  send("InviteRequest", "requestId: 5 chatroomId: 42 invitingMembers: 6007");
  EXPECT_EQ(received(),
            (Lines{"InviteReply: requestId: 5 chatroomId: 42", "InviteReply: requestId: 5"}));
}

TEST_F(TestKit, AnotherAnswerToARequestWithoutAChatroom_HasNone) {
  start_signed_in(std::string(kClock) + "answer InviteReply");
  send("CurrentTimeRequest", "requestId: 5");
  EXPECT_EQ(received(), (Lines{"InviteReply: requestId: 5"}));
}

TEST_F(TestKit, FieldsOfAScenario_MayHaveSignsBetweenThem) {
  start_signed_in("push TypingUpdated { requestId: 1, chatroomId: 2; sender: 3 state: 'a' 'b' }");
  EXPECT_EQ(received(),
            (Lines{"TypingUpdated: requestId: 1 chatroomId: 2 sender: 3 state: \"ab\""}));
}

TEST_F(TestKit, AnswerWithFields_HasThemInsteadOfTheServices) {
  start_signed_in(std::string(kClock) +
                  "answer { requestId: 9 result { !msg } !currentTimeMillis 99: 'x' }");
  send("CurrentTimeRequest", "requestId: 5");
  EXPECT_EQ(received(), (Lines{"CurrentTimeReply: requestId: 9 result { code: 0 } 99: \"x\""}));
}

TEST_F(TestKit, AnswersOfOneRequest_DoNotChangeEachOther) {
  start_signed_in(std::string(kClock) + "answer { requestId: 9 !result } answer");
  send("CurrentTimeRequest", "requestId: 5");
  EXPECT_EQ(received().back(),
            "CurrentTimeReply: requestId: 5 result { code: 0 msg: \"ok\" } currentTimeMillis: "
            "1700000100000");
}

TEST_F(TestKit, Answer_MayFollowAnExchangeOfAPush) {
  start_signed_in(std::string(kClock) + "push ClientEcho expect ClientEchoReply answer");
  send("CurrentTimeRequest", "requestId: 5");
  EXPECT_EQ(received(), (Lines{"ClientEcho: requestId: 700001"}));
  send("ClientEchoReply", "requestId: 700001");
  EXPECT_EQ(received().size(), 1U);
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, PushThatIsNotAnswered_IsReported) {
  start_signed_in("push ClientEcho { requestId: 5 }");
  received();
  EXPECT_EQ(end(), "The ClientEcho with the requestId 5 was not answered by a ClientEchoReply.\n");
}

TEST_F(TestKit, PushThatIsAnsweredTwice_IsReported) {
  start_signed_in("push ClientEcho { requestId: 5 }");
  received();
  send("ClientEchoReply", "requestId: 5");
  EXPECT_EQ(report(), "");
  send("ClientEchoReply", "requestId: 5");
  EXPECT_EQ(end(),
            "Message 2 of the plug-in, a ClientEchoReply, is wrong: the message with the requestId "
            "5 was answered before.\n");
}

TEST_F(TestKit, PushThatComesTwice_MayBeAnsweredTwice) {
  start_signed_in("push ClientEcho { requestId: 5 } twice");
  received();
  send("ClientEchoReply", "requestId: 5");
  send("ClientEchoReply", "requestId: 5");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, AnswerWithAnotherChatroom_IsReported) {
  start_signed_in("push ForwardOnlineMessage { requestId: 5 chatroomId: 43 }");
  received();
  send("ForwardOnlineMessageReply", "requestId: 5 chatroomId: 42");
  EXPECT_EQ(
      end(),
      "Message 1 of the plug-in, a ForwardOnlineMessageReply, is wrong: its chatroomId is 42, "
      "but that of the message with the requestId 5 is 43.\n");
}

TEST_F(TestKit, PushThatWantsNoAnswer_HasNone) {
  start_signed_in("push ForwardOnlineMessage { requestId: 5 chatroomId: 42 skipReply: true }");
  received();
  EXPECT_EQ(report(), "");
  send("ForwardOnlineMessageReply", "requestId: 5 chatroomId: 42");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ForwardOnlineMessageReply, is wrong: the message with the "
            "requestId 5 wants no answer.\n");
}

TEST_F(TestKit, BrokenPush_MayBeAnsweredAsItCanBeRead) {
  start_signed_in("push ClientEcho { requestId: 5 } corrupt byte 1");
  received_bytes();
  EXPECT_EQ(report(), "");
  send_bytes("ClientEchoReply", "\x08\x7a");  // with one more byte, which is another number
  EXPECT_NE(report().find("it answers nothing"), std::string::npos);
}

TEST_F(TestKit, PushThatCannotBeRead_IsNotAnswered) {
  start_signed_in("push ClientEcho { requestId: 5 } cut at 1");
  received_bytes();
  send("ClientEchoReply", "requestId: 0");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ClientEchoReply, is wrong: it answers nothing: no such "
            "message with the requestId 0 was sent.\n");
}

TEST_F(TestKit, PushBeforeTheLogin_ComesBehindItsReply) {
  start("push ClientEcho expect ChannelAuthRequest");
  EXPECT_EQ(received(), Lines{});
  send("ChannelAuthRequest",
       "requestId: 1 userId: 5001 deviceId: 7 appId: 'a' accessToken: 'example-access-token'");
  EXPECT_EQ(received(), (Lines{"ChannelAuthReply: requestId: 1 result { code: 0 msg: \"welcome\" }",
                               "ClientEcho: requestId: 700001"}));
}

TEST_F(TestKit, PushWithoutALogin_IsReported) {
  start("push ClientEcho");
  EXPECT_EQ(end(), "Line 1 pushes a ClientEcho, but the plug-in did not sign in.\n");
}

TEST_F(TestKit, NumbersOutsideAnEnumerationAndUnknownFields_AreDelivered) {
  start_signed_in(
      "push ForwardOnlineMessage { skipReply: true inboxEntry { msgType: 77 98 { 1: 5 } } "
      "99: -1 }");
  EXPECT_EQ(received(), (Lines{"ForwardOnlineMessage: requestId: 700001 inboxEntry { 2: 77 98 { 1: "
                               "5 } } skipReply: true 99: 18446744073709551615"}));
}

TEST_F(TestKit, MemberOfAnEnumeration_MayBeItsNumber) {
  start_signed_in("push TypingUpdated { contentType: 0 }");
  EXPECT_EQ(received(), (Lines{"TypingUpdated: requestId: 700001 contentType: CONTENT_TEXT"}));
}

TEST_F(TestKit, Push_MayHaveNoRequestId) {
  start_signed_in("push TypingUpdated { !requestId state: 'x' }");
  EXPECT_EQ(received(), (Lines{"TypingUpdated: state: \"x\""}));
}

// ---- Faults

struct Fault {
  const char* name;
  const char* fault;
  Lines bytes;
};

const Fault kFaults[] = {
    {"None", "", {"\x08\x05"}},
    {"Twice", "twice", {"\x08\x05", "\x08\x05"}},
    {"Dropped", "dropped", {}},
    {"Cut", "cut at 1", {"\x08"}},
    {"Corrupt", "corrupt byte 1", {"\x08\xfa"}},
    {"CutAndTwice", "cut at 1 twice", {"\x08", "\x08"}},
};

class FaultOfADelivery : public TestKit, public ::testing::WithParamInterface<Fault> {};

TEST_P(FaultOfADelivery, ChangesWhatThePluginReceives) {
  start_signed_in(std::string("push ClientEcho { requestId: 5 } ") + GetParam().fault);
  EXPECT_EQ(received_bytes(), GetParam().bytes);
}

INSTANTIATE_TEST_SUITE_P(Each, FaultOfADelivery, ::testing::ValuesIn(kFaults),
                         [](const auto& row) { return row.param.name; });

struct UselessFault {
  const char* name;
  const char* fault;
  const char* what;
};

const UselessFault kUselessFaults[] = {
    {"CutBehindTheEnd", "cut at 2", "cuts it at 2"},
    {"CorruptBehindTheEnd", "corrupt byte 2", "corrupts the byte 2"},
    {"CorruptBehindTheCut", "cut at 1 corrupt byte 1", "corrupts the byte 1"},
    {"ItsOwnName", "as ClientEcho", "delivers it under its own name"},
};

class FaultThatChangesNothing : public TestKit,
                                public ::testing::WithParamInterface<UselessFault> {};

TEST_P(FaultThatChangesNothing, IsReported) {
  start_signed_in(std::string("push ClientEcho { requestId: 5 } ") + GetParam().fault);
  EXPECT_EQ(report(), std::string("Line 1 delivers a ClientEcho of 2 bytes, and ") +
                          GetParam().what + ", which changes nothing.\n");
}

INSTANTIATE_TEST_SUITE_P(Each, FaultThatChangesNothing, ::testing::ValuesIn(kUselessFaults),
                         [](const auto& row) { return row.param.name; });

TEST_F(TestKit, MessageThatIsNotTaken_IsReported) {
  start_signed_in("push TypingUpdated");
  EXPECT_FALSE(qel_testkit_end(kit_));
  EXPECT_EQ(report(), "A TypingUpdated was due, but the test did not take it.\n");
}

TEST_F(TestKit, SwappedMessages_ComeBehindTheNextInTheOtherOrder) {
  start_signed_in(
      "push TypingUpdated swapped with the next push TypingUpdated swapped with the next push "
      "TypingUpdated");
  EXPECT_EQ(received(),
            (Lines{"TypingUpdated: requestId: 700003", "TypingUpdated: requestId: 700002",
                   "TypingUpdated: requestId: 700001"}));
}

TEST_F(TestKit, LateMessage_ComesWhenItsTimeHasCome) {
  start_signed_in("push ClientEcho after 5s push TypingUpdated after 200ms");
  EXPECT_EQ(received(), Lines{});
  EXPECT_EQ(next_after_, 200);
  qel_testkit_wait(kit_, 200);
  EXPECT_EQ(received(), (Lines{"TypingUpdated: requestId: 700002"}));
  EXPECT_EQ(next_after_, 4800);
  qel_testkit_wait(kit_, 4799);
  EXPECT_EQ(received(), Lines{});
  qel_testkit_wait(kit_, 1);
  EXPECT_EQ(received(), (Lines{"ClientEcho: requestId: 700001"}));
  EXPECT_EQ(next_after_, -1);
}

TEST_F(TestKit, LateMessageThatIsNotTaken_IsReported) {
  start_signed_in("push TypingUpdated after 5s");
  EXPECT_EQ(end(), "A TypingUpdated was due 5000 ms later, but the test was over.\n");
}

TEST_F(TestKit, SwappedMessage_ComesBehindTheNext) {
  start_signed_in("push TypingUpdated swapped with the next push TypingUpdated push TypingUpdated");
  EXPECT_EQ(received(),
            (Lines{"TypingUpdated: requestId: 700002", "TypingUpdated: requestId: 700001",
                   "TypingUpdated: requestId: 700003"}));
}

TEST_F(TestKit, SwappedMessage_WaitsForALateNextOne) {
  start_signed_in("push TypingUpdated swapped with the next push TypingUpdated after 1s");
  EXPECT_EQ(received(), Lines{});
  qel_testkit_wait(kit_, 1000);
  EXPECT_EQ(received(),
            (Lines{"TypingUpdated: requestId: 700002", "TypingUpdated: requestId: 700001"}));
}

TEST_F(TestKit, SwappedMessageWithoutANextOne_IsReported) {
  start_signed_in("push TypingUpdated swapped with the next");
  EXPECT_EQ(end(), "A TypingUpdated was to be swapped with the next message, but none came.\n");
}

TEST_F(TestKit, MessageUnderAnothersName_NeedsNoAnswer) {
  start_signed_in("push TypingUpdated { state: 'x' } as ClientEcho");
  qel_testkit_delivery_t delivery;
  ASSERT_TRUE(qel_testkit_next(kit_, &delivery));
  EXPECT_STREQ(delivery.message, "ClientEcho");
  send("ClientEchoReply", "requestId: 0");
  EXPECT_EQ(end(), "");
}

// ---- Texts that are no scenarios

struct Misread {
  const char* name;
  const char* scenario;
  const char* reason;
};

const Misread kMisread[] = {
    {"Word", "expekt ChatRequest",
     "line 1, column 1: expected 'expect', 'in any order', 'answer', 'push', 'at most', 'never', "
     "'always', 'strict' or 'world', but here is 'expekt'"},
    {"MessageName", "# one\n  expect ChatRequests",
     "line 2, column 10: there is no message "
     "'ChatRequests'"},
    {"NoMessageName", "expect",
     "line 1, column 7: expected the name of a message, but the text "
     "ends"},
    {"FieldName", "expect ChatRequest { roomId: 1 }",
     "line 1, column 22: ChatRequest has no field 'roomId'"},
    {"FieldOfAnEmbeddedMessage", "push ChatReply { result {\n text: 'x' } }",
     "line 2, column 2: Result has no field 'text'"},
    {"Value", "expect ChatRequest { chatroomId: x }",
     "line 1, column 34: this is no value of the field 'chatroomId': Expected integer"},
    {"Member", "push TypingUpdated { contentType: TEXT }",
     "line 1, column 35: this is no value of the field 'contentType': Unknown enumeration value of "
     "\"TEXT\" for field \"contentType\""},
    {"Brace", "expect ChatRequest { chatroomId: 1",
     "line 1, column 35: expected the name of a field, or '}', but the text ends"},
    {"FieldTwice", "expect ChatRequest { chatroomId: 1 chatroomId: 2 }",
     "line 1, column 36: the field 'chatroomId' is there twice"},
    {"AnswerToNothing", "push ClientEcho answer",
     "line 1, column 17: no request is expected before "
     "this answer"},
    {"AnswerWithoutAName", "expect IsTyping answer { state: 'x' }",
     "line 1, column 24: IsTyping has no reply, so this answer needs a name, but here is '{'"},
    {"NoValueToDeliver", "push ClientEcho { requestId }",
     "line 1, column 1: the field 'requestId' needs a value here"},
    {"Time", "push ClientEcho after 5",
     "line 1, column 24: expected 's' or 'ms' behind the number, but the text ends"},
    {"TimeWithAPoint", "push ClientEcho after 1.5s",
     "line 1, column 23: expected a time such as 5s or 200ms, but here is '1.5'"},
    {"TimeInMinutes", "push ClientEcho after 2m",
     "line 1, column 24: expected 's' or 'ms' behind the number, but here is 'm'"},
    {"OctalNumber", "push ClientEcho cut at 010",
     "line 1, column 24: expected a number of bytes, but here is '010'"},
    {"FaultTwice", "push ClientEcho twice after 1s twice",
     "line 1, column 32: 'twice' is there twice"},
    {"DroppedAndMore", "push ClientEcho twice dropped",
     "line 1, column 23: nothing else can happen to a message that is dropped"},
    {"AbsentAndPresent", "expect ChatRequest { !chatroomId chatroomId: 5 }",
     "line 1, column 34: the field 'chatroomId' is there twice"},
    {"PresentAndAbsent", "expect InviteRequest { invitingMembers: 5 !invitingMembers }",
     "line 1, column 44: the field 'invitingMembers' is there twice"},
    {"FieldNumberOfTheSchema", "push ClientEcho { 1: 5 }",
     "line 1, column 19: the field 1 is known: write its name, 'requestId'"},
    {"FieldNumberTooLarge", "push ClientEcho { 536870912: 5 }",
     "line 1, column 19: fields have numbers from 1 to 536870911"},
    {"FieldNumberZero", "push ClientEcho { 0: 5 }",
     "line 1, column 19: fields have numbers from 1 to 536870911"},
    {"MessageOfTheService", "expect ChatReply",
     "line 1, column 8: a plug-in does not send 'ChatReply'"},
    {"NeverOfTheService", "never ClientEcho",
     "line 1, column 7: a plug-in does not send 'ClientEcho'"},
    {"MessageOfThePlugin", "push ChatRequest",
     "line 1, column 1: the service does not send 'ChatRequest'"},
    {"NameTwice", "expect ChatRequest called a expect ChatRequest called a",
     "line 1, column 55: the name 'a' is that of another request, or of a reply"},
    {"NameOfNothing", "expect ChatRequest answer to a",
     "line 1, column 30: no request before is called 'a'"},
    {"AnyOrderWithoutExpectations", "in any order { push ClientEcho }",
     "line 1, column 16: expected 'expect', but here is 'push'"},
    {"AnyOrderInAnother", "in any order { expect ChatRequest in any order { } }",
     "line 1, column 35: expected 'expect', 'in any order', 'answer', 'push', 'at most', 'never', "
     "'always', 'strict' or 'world', or behind an expectation 'within' or 'called', but here is "
     "'in'"},
    {"AnotherWord", "at least 5 ChatRequest",
     "line 1, column 4: expected 'most', but here is 'least'"},
    {"AnyOrderOfNothing", "in any order { }",
     "line 1, column 16: expected 'expect', but here is '}'"},
    {"WordBehindAMessageToDeliver", "push ClientEcho delay",
     "line 1, column 17: expected 'expect', 'in any order', 'answer', 'push', 'at most', 'never', "
     "'always', 'strict' or 'world', or behind a message to deliver 'after', 'twice', 'dropped', "
     "'swapped with the next', 'cut at', 'corrupt byte' or 'as', but here is 'delay'"},
    {"WordBehindARule", "never ChatRequest until",
     "line 1, column 19: expected 'expect', 'in any order', 'answer', 'push', 'at most', 'never', "
     "'always', 'strict' or 'world', or behind the message 'within', but here is 'until'"},
    {"SwappedAndTwice", "push ClientEcho swapped with the next twice",
     "line 1, column 39: a message that is swapped with the next comes once"},
    {"PartOfAMessage", "push InboxEntry", "line 1, column 6: there is no message 'InboxEntry'"},
    {"WorldWithoutAValue", "world { isSignedIn }",
     "line 1, column 7: the field 'isSignedIn' needs a value here"},
    {"WorldWithANumber", "world { 99: 5 }",
     "line 1, column 7: the world has no fields by their numbers"},
    {"ListThatIsEmptyAndNot",
     "push CreateChatroomReply push InviteReply { result { "
     "wrongReceiverDetail { existing: 3 existing: [] } } }",
     "line 1, column 88: the field 'existing' is there twice"},
    {"NoColon", "expect ChatRequest { chatroomId 42 }",
     "line 1, column 36: expected ':' or '{' behind the number of a field, but here is '}'"},
    {"ListWithoutBrackets", "expect InviteRequest { invitingMembers: 1, 2 }",
     "line 1, column 46: expected ':' or '{' behind the number of a field, but here is '}'"},
    {"NoBraceBeforeTheNext", "expect ChatRequest { chatroomId: 1 expect ChatRequest",
     "line 1, column 36: ChatRequest has no field 'expect'. Is there a '}' missing before it?"},
    {"Quote", "push TypingUpdated { state: 'x", "line 1, column 31: Unexpected end of string"},
};

class NoScenario : public TestKit, public ::testing::WithParamInterface<Misread> {};

TEST_P(NoScenario, IsReportedWithItsPlace) {
  start(GetParam().scenario);
  EXPECT_EQ(report(), std::string("The scenario cannot be read: ") + GetParam().reason + ".\n");
}

INSTANTIATE_TEST_SUITE_P(Each, NoScenario, ::testing::ValuesIn(kMisread),
                         [](const auto& row) { return row.param.name; });

TEST_F(TestKit, ScenarioOfManyMessagesInEachOther_IsRefused) {
  std::string scenario = "push ClientEcho { ";
  for (int i = 0; i < 100000; ++i) {
    scenario += "9 { ";
  }
  start(scenario.c_str());
  EXPECT_NE(report().find("too many messages in each other"), std::string::npos);
}

TEST_F(TestKit, ScenarioWithAByteOrderMark_IsRead) {
  start("\xef\xbb\xbfworld { isSignedIn: true } push TypingUpdated");
  EXPECT_EQ(received().size(), 1U);
}

TEST_F(TestKit, KitWithoutAScenario_DoesNothing) {
  start("?");
  send("ClientEchoReply", "requestId: 5");
  qel_testkit_wait(kit_, 5);
  EXPECT_EQ(received(), Lines{});
  EXPECT_FALSE(qel_testkit_end(kit_));
}

TEST_F(TestKit, AfterTheEnd_NothingCountsAnyMore) {
  start_signed_in("push ClientEcho after 1s");
  qel_testkit_wait(kit_, 1000);
  received();
  send("ClientEchoReply", "requestId: 700001");
  EXPECT_EQ(end(), "");
  send_bytes("NoSuchMessage", "");
  EXPECT_EQ(end(), "");
}

TEST_F(TestKit, TextThatIsNoUtf8_IsNotPrintedAbout) {
  testing::internal::CaptureStderr();
  start_signed_in("expect IsTyping answer");
  send_bytes("IsTyping", "\x58\x01\x60\x2a\x6a\x01\xff");
  received_bytes();
  end();
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

TEST(TestKitAlone, ReleaseOfNothing_DoesNothing) {
  qel_testkit_release(nullptr);
}

}  // namespace
