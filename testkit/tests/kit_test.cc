// What a kit delivers, and what it has to report.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>
#include <google/protobuf/text_format.h>
#include <gtest/gtest.h>

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
  std::string end() {
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
  send("CurrentTimeRequest", "requestId: 2");
  send("UnsealMessageRequest", "requestId: 3 chatroomId: 42 sender: 1 msgId: 2 msgDetail: ''");
  send("GetAllReadAckRequest", "requestId: 4");
  EXPECT_EQ(received(),
            (Lines{"ChannelAuthReply: requestId: 1 result { code: 0 msg: \"welcome\" }",
                   "CurrentTimeReply: requestId: 2 result { code: 0 msg: \"ok\" } "
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

TEST_F(TestKit, WrongToken_IsRefusedAndNotShown) {
  start(nullptr);
  send("ChannelAuthRequest", "requestId: 1 userId: 1 deviceId: 7 appId: 'a' accessToken: 'secret'");
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
  send("AllowChatRequest",
       "requestId: 2 chatroomId: 50 needOrderedChatroomMemberList: true needChatroomMeta: true");
  send("EndChatRequest", "requestId: 3 endChatEntries { chatroomId: 50 denyInvitation: true }");
  EXPECT_EQ(received()[1],
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
  EXPECT_NE(replies[0].find("chatroomId: 42 result { code: 0 "), std::string::npos) << replies[0];
  EXPECT_NE(replies[1].find("chatroomId: 43"), std::string::npos);
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
    {"NoRequestId", "CurrentTimeRequest", "", "it has no requestId"},
    {"UnknownChatroom", "UnsealMessageRequest",
     "requestId: 1 chatroomId: 43 sender: 1 msgId: 2 msgDetail: ''",
     "there is no chatroom 43, or the user has left it"},
    {"SendersIds", "CurrentTimeRequest", "requestId: 1 deviceId: 7",
     "it has ids of the sender, which the connection has already"},
    {"NoRequest", "TypingUpdated", "requestId: 1", "a plug-in does not send it"},
    {"AnswerToNothing", "ClientEchoReply", "requestId: 3",
     "it answers nothing: no such message with the requestId 3 was sent"},
    {"TwoComplaints", "InviteRequest", "chatroomId: 42",
     "it has no requestId; invitingMembers is missing"},
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
                          (type[0] == 'I' || type[0] == 'U' ? "an " : "a ") + type +
                          ", is wrong: " + GetParam().reason + ".\n");
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
    {"Enumeration", "msgType: MEDIA", "msgType: TEXT", "msgType is TEXT instead of MEDIA"},
    {"NumberOfNoMember", "msgType: 77", "msgType: TEXT", "msgType is not the expected one"},
    {"UnknownField", "99: 'x'", "", "the unknown field 99 is not the expected one"},
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
  start_signed_in("expect CurrentTimeRequest within 1s expect CurrentTimeRequest within 1s");
  qel_testkit_wait(kit_, 1001);
  qel_testkit_wait(kit_, -1001);
  send("CurrentTimeRequest", "requestId: 1");
  qel_testkit_wait(kit_, 1000);
  EXPECT_EQ(report(), "No CurrentTimeRequest came within 1000 ms, as line 1 expects.\n");
  qel_testkit_wait(kit_, 1);
  send("CurrentTimeRequest", "requestId: 2");
  EXPECT_EQ(end(),
            "No CurrentTimeRequest came within 1000 ms, as line 1 expects.\n"
            "No CurrentTimeRequest came within 1000 ms, as line 1 expects.\n");
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
      "Message 1 of the plug-in, a CurrentTimeRequest, is wrong: it has fields or values that "
      "the schema does not have.\n");
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

TEST_F(TestKit, NumbersOutsideAnEnumerationAndUnknownFields_AreDelivered) {
  start_signed_in(
      "push ForwardOnlineMessage { skipReply: true inboxEntry { msgType: 77 98 { 1: 5 } } "
      "99: -1 }");
  EXPECT_EQ(received(), (Lines{"ForwardOnlineMessage: requestId: 700001 inboxEntry { 2: 77 98 { 1: "
                               "5 } } skipReply: true 99: 18446744073709551615"}));
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
    {"CutBehindTheEnd", "cut at 3", {"\x08\x05"}},
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
     "line 1, column 1: expected 'expect', 'answer', 'push', 'at most', 'never', 'always', "
     "'strict' "
     "or 'world', but here is 'expekt'"},
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
     "line 1, column 35: expected the name of a field, but the text ends"},
    {"FieldTwice", "expect ChatRequest { chatroomId: 1 chatroomId: 2 }",
     "line 1, column 36: the field 'chatroomId' is there twice"},
    {"AnswerToNothing", "push ClientEcho answer",
     "line 1, column 17: no request is expected before "
     "this answer"},
    {"AnswerWithoutAName", "expect IsTyping answer { state: 'x' }",
     "line 1, column 24: IsTyping has no reply, so this answer needs a name, but here is '{'"},
    {"NoValueToDeliver", "push ClientEcho { requestId }",
     "line 1, column 1: the field 'requestId' of a message to deliver needs a value"},
    {"Time", "push ClientEcho after 5", "line 1, column 24: expected 'ms', but the text ends"},
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
