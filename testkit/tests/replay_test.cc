// Recorded sessions that are played again.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "play.h"

namespace {

constexpr int kSent = 1;
constexpr int kReceived = 2;
constexpr int kDone = 1;
constexpr int kRefused = 2;

// A session file, written here.
class SessionFile {
 public:
  explicit SessionFile(bool is_big_endian = false) : is_big_endian_(is_big_endian) { section(); }

  void section() {
    block(0x0a0d0d0a, number(0x1a2b3c4d, 4) + number(1, 2) + number(0, 2) + std::string(8, '\xff'));
    block(1, number(147, 2) + number(0, 2) + number(0, 4));
  }

  // All that a record can have.
  void record(uint32_t index, int direction, int end, const std::string& name,
              const std::string& message, uint32_t cut_off = 0) {
    std::string data = std::string("qel\1") + little(index, 4) + static_cast<char>(direction) +
                       static_cast<char>(end) + little(static_cast<uint32_t>(name.size()), 2) +
                       name + message;
    const auto size = static_cast<uint32_t>(data.size());
    data.resize((data.size() + 3) / 4 * 4);
    block(6, number(0, 4) + number(0, 4) + number(0, 4) + number(size, 4) +
                 number(size + cut_off, 4) + data);
  }
  void record(int direction, const std::string& name, const std::string& message) {
    record(++last_, direction, kDone, name, message);
  }

  void block(uint32_t type, const std::string& body) {
    const auto length = static_cast<uint32_t>(body.size() + 12);
    bytes += number(type, 4) + number(length, 4) + body + number(length, 4);
  }

  std::string bytes;

 private:
  static std::string little(uint32_t value, int size) {
    std::string result;
    for (int i = 0; i < size; ++i) {
      result += static_cast<char>(value >> (8 * i));
    }
    return result;
  }
  std::string number(uint32_t value, int size) const {
    const std::string result = little(value, size);
    return is_big_endian_ ? std::string(result.rbegin(), result.rend()) : result;
  }

  bool is_big_endian_;
  uint32_t last_ = 0;
};

std::string field(int number, const std::string& text) {
  return static_cast<char>(number << 3 | 2) + std::string(1, static_cast<char>(text.size())) + text;
}
std::string title(const std::string& text) {
  return field(13, text);
}
std::string chat(const std::string& text) {
  return field(13, field(3, text));
}

class Replay : public ::testing::Test {
 protected:
  ~Replay() override { qel_testkit_release(kit_); }

  void start(const SessionFile& file, const char* ignored = nullptr) {
    start_with(file.bytes, ignored);
  }
  void start_with(const std::string& bytes, const char* ignored = nullptr) {
    qel_testkit_release(kit_);
    kit_ = qel_testkit_new_replay(reinterpret_cast<const unsigned char*>(bytes.data()),
                                  bytes.size(), ignored);
  }
  void send(const char* name, const std::string& bytes) {
    qel_testkit_sent(kit_, name, reinterpret_cast<const unsigned char*>(bytes.data()),
                     static_cast<int>(bytes.size()));
  }
  std::string received() {
    qel_testkit_delivery_t delivery;
    std::string all;
    while (qel_testkit_next(kit_, &delivery)) {
      all += std::string(delivery.message) + " " +
             std::string(reinterpret_cast<const char*>(delivery.data),
                         static_cast<size_t>(delivery.size)) +
             "\n";
    }
    return all;
  }
  std::string end() {
    qel_testkit_end(kit_);
    return qel_testkit_report(kit_);
  }

  qel_testkit_t* kit_ = nullptr;
};

TEST_F(Replay, Session_IsExpectedAndDeliveredInItsOrder) {
  SessionFile file;
  file.record(kReceived, "ClientEcho", "\x08\x05");
  file.record(kSent, "ClientEchoReply", "\x08\x05");
  file.record(kReceived, "ClientEcho", "broken");
  start(file);
  EXPECT_EQ(received(), "ClientEcho \x08\x05\n");
  send("ClientEchoReply", "\x08\x05");
  EXPECT_EQ(received(), "ClientEcho broken\n");
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, OtherFieldsAndMessages_AreReported) {
  SessionFile file;
  file.record(kSent, "CurrentTimeRequest", "\x10\x01");
  file.record(kSent, "CurrentTimeRequest", "\x10\x02");
  file.record(kSent, "CurrentTimeRequest", "\x10\x03");
  start(file);
  send("ClientEchoReply", "");
  send("CurrentTimeRequest", "\x08\x05\x10\x01\x98\x06\x01");
  send("CurrentTimeRequest", "\x10\x05");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ClientEchoReply, is not expected: record 1 expects a "
            "CurrentTimeRequest.\n"
            "Message 2 of the plug-in, a CurrentTimeRequest, is not what record 1 expects: userId "
            "should not be there; the unknown field 99 should not be there.\n"
            "Message 3 of the plug-in, a CurrentTimeRequest, is not what record 2 expects: "
            "deviceId is 5 instead of 2.\n"
            "Record 3 expects a CurrentTimeRequest, which never came.\n");
}

TEST_F(Replay, IgnoredFields_MayDiffer) {
  SessionFile file;
  file.record(kSent, "ClientEchoReply", "\x08\x07");
  start(file, "deviceId  requestId userId");
  send("ClientEchoReply", "\x08\x05");
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, IgnoredNameOfNoField_IsSaid) {
  SessionFile file;
  file.record(kSent, "ClientEchoReply", "\x08\x07");
  start(file, "deviceId sendTime");
  EXPECT_EQ(end(), "The session cannot be replayed: there is no field 'sendTime'.\n");
}

TEST_F(Replay, RequestOfAnotherId_IsAnsweredWithItsOwn) {
  SessionFile file;
  file.record(kSent, "CurrentTimeRequest", "\x58\x01");
  file.record(kSent, "InviteRequest", "\x58\x02");
  file.record(kReceived, "InviteReply", "\x58\x02");
  file.record(kReceived, "CurrentTimeReply", "\x58\x01");
  start(file);
  send("CurrentTimeRequest", "\x58\x0b");
  send("InviteRequest", "\x58\x0c");
  EXPECT_EQ(received(), "InviteReply \x58\x0c\nCurrentTimeReply \x58\x0b\n");
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, RepliesToOtherRequests_KeepTheirIds) {
  SessionFile file;
  file.record(kSent, "CurrentTimeRequest", "\x58\x01");
  file.record(kReceived, "CurrentTimeReply", "\x58\x03");
  file.record(kReceived, "InviteReply", "\x58\x01");
  start(file);
  send("CurrentTimeRequest", "\x58\x0b");
  EXPECT_EQ(received(), "CurrentTimeReply \x58\x03\nInviteReply \x58\x01\n");
}

TEST_F(Replay, ReplyToTheSameId_HasTheBytesOfThen) {
  SessionFile file;
  file.record(kSent, "CurrentTimeRequest", "\x58\x01");
  file.record(kReceived, "CurrentTimeReply", "\x58\x05\x58\x01");
  start(file);
  send("CurrentTimeRequest", "\x58\x01");
  EXPECT_EQ(received(), "CurrentTimeReply \x58\x05\x58\x01\n");
}

TEST_F(Replay, BrokenReply_IsDeliveredAsItWas) {
  SessionFile file;
  file.record(kSent, "CurrentTimeRequest", "\x58\x01");
  file.record(kReceived, "CurrentTimeReply", "\x58\x01\x58");
  start(file);
  send("CurrentTimeRequest", "\x58\x0b");
  EXPECT_EQ(received(), "CurrentTimeReply \x58\x01\x58\n");
}

TEST_F(Replay, RequestWithoutAnId_IsReported) {
  SessionFile file;
  file.record(kSent, "CurrentTimeRequest", "\x58\x01");
  start(file);
  send("CurrentTimeRequest", "");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a CurrentTimeRequest, is not what record 1 expects: "
            "requestId is missing, which should be 1.\n");
}

TEST_F(Replay, AnswerToAPush_HasTheIdOfThen) {
  SessionFile file;
  file.record(kReceived, "ClientEcho", "\x08\x07");
  file.record(kSent, "ClientEchoReply", "\x08\x07");
  start(file);
  send("ClientEchoReply", "\x08\x05");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ClientEchoReply, is not what record 2 expects: requestId "
            "is 5 instead of 7.\n");
}

TEST_F(Replay, MaskedToken_StandsForAny) {
  SessionFile file;
  file.record(kSent, "ChannelAuthRequest", "\x08\x01\x32\x02**");
  start(file);
  send("ChannelAuthRequest", "\x08\x01\x32\x06secret");
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, MaskInALaterMessage_StandsForTheTokenAlone) {
  SessionFile file;
  file.record(kSent, "ChannelAuthRequest", "\x2a\x0c(**********)\x32\x0a**********");
  file.record(kSent, "ChangeChatroomMetaRequest", title("**********, **********"));
  file.record(kSent, "ChangeChatroomMetaRequest", title("**********"));
  start(file);
  send("ChannelAuthRequest", "\x2a\x0a(my-token)\x32\x08my-token");
  send("ChangeChatroomMetaRequest", title("my-token, my-token"));
  send("ChangeChatroomMetaRequest", title("its-name, my-token"));
  EXPECT_EQ(end(),
            "Message 3 of the plug-in, a ChangeChatroomMetaRequest, is not what record 3 expects: "
            "title is \"its-name, **********\" instead of \"**********\".\n");
}

TEST_F(Replay, MaskInAMessageInsideAnother_StandsForTheToken) {
  SessionFile file;
  file.record(kSent, "ChannelAuthRequest", "\x32\x0a**********");
  file.record(kSent, "ChatRequest", chat("**********"));
  start(file);
  send("ChannelAuthRequest", "\x32\x08my-token");
  send("ChatRequest", chat("my-token"));
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, ShortToken_IsAnyWordElsewhere) {
  SessionFile file;
  file.record(kSent, "ChannelAuthRequest", "\x32\x0a**********");
  file.record(kSent, "ChangeChatroomMetaRequest", title("token"));
  start(file);
  send("ChannelAuthRequest", "\x32\x02to");
  send("ChangeChatroomMetaRequest", title("token"));
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, Tokens_AreInNoReport) {
  SessionFile file;  // of another tool than the recorder
  file.record(kSent, "ChannelAuthRequest", "\x32\x0aThen-token");
  file.record(kSent, "ChangeChatroomMetaRequest", title("Then-token"));
  file.record(kSent, "ChangeChatroomMetaRequest", title("Then-token"));
  start(file);
  send("ChannelAuthRequest", "\x32\x09Now-token");
  send("ChangeChatroomMetaRequest", title("Now-token"));
  send("ChangeChatroomMetaRequest", title("nothing"));
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ChannelAuthRequest, is not what record 1 expects: "
            "accessToken is (not shown) instead of (not shown).\n"
            "Message 2 of the plug-in, a ChangeChatroomMetaRequest, is not what record 2 expects: "
            "title is \"(not shown)\" instead of \"(not shown)\".\n"
            "Message 3 of the plug-in, a ChangeChatroomMetaRequest, is not what record 3 expects: "
            "title is \"nothing\" instead of \"(not shown)\".\n");
}

TEST_F(Replay, TokenThatIsSaidBeforeTheLogin_IsInNoReport) {
  SessionFile file;
  file.record(kSent, "ChangeChatroomMetaRequest", title("nothing"));
  file.record(kSent, "ChannelAuthRequest", "\x32\x02**");
  start(file);
  send("ChangeChatroomMetaRequest", title("my-token"));
  send("ChannelAuthRequest", "\x32\x08my-token");
  EXPECT_EQ(end(),
            "Message 1 of the plug-in, a ChangeChatroomMetaRequest, is not what record 1 expects: "
            "title is \"(not shown)\" instead of \"nothing\".\n");
}

TEST_F(Replay, MissingToken_IsExpectedToBeMissing) {
  SessionFile file;
  file.record(kSent, "ChannelAuthRequest", "\x08\x01");
  start(file);
  send("ChannelAuthRequest", "\x08\x01");
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, FunctionsOfTheInterface_AreTheirMessages) {
  SessionFile file;
  file.record(kReceived, "current_time_deserialize", "\x58\x01");
  file.record(kSent, "invite_chat_request_serialize", "\x58\x01");
  start(file);
  EXPECT_EQ(received(), "CurrentTimeReply \x58\x01\n");
  send("InviteRequest", "\x58\x01");
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, RefusedCall_HasSentNothing) {
  SessionFile file;
  file.record(1, kSent, kRefused, "chat_request_serialize", "");
  file.record(2, kReceived, kDone, "ClientEcho", "");
  start(file);
  EXPECT_EQ(end(), "");
}

TEST_F(Replay, RingWhoseFirstSectionIsTheNewer_IsInTheOrderOfItsNumbers) {
  SessionFile file;
  file.record(2, kReceived, kDone, "ClientEcho", "b");
  file.section();
  file.record(1, kReceived, kDone, "ClientEcho", "a");
  file.block(0x80000000, "room that is not used   ");
  start(file);
  EXPECT_EQ(received(), "ClientEcho a\nClientEcho b\n");
}

TEST_F(Replay, FileOfTheOtherByteOrder_IsRead) {
  SessionFile file(true);
  file.record(kReceived, "ClientEcho", "a");
  start(file);
  EXPECT_EQ(received(), "ClientEcho a\n");
}

TEST_F(Replay, FileThatIsCutOff_EndsWithItsLastWholeRecord) {
  SessionFile file;
  file.record(kReceived, "ClientEcho", "a");
  file.record(kReceived, "ClientEcho", "b");
  for (size_t cut = 1; cut <= 48; ++cut) {
    start_with(file.bytes.substr(0, file.bytes.size() - cut));
    EXPECT_EQ(received(), "ClientEcho a\n") << cut;
  }
}

TEST_F(Replay, LostRecords_AreSaid) {
  SessionFile file;
  file.record(7, kReceived, kDone, "ClientEcho", "a");
  start(file);
  EXPECT_EQ(end(), "The session cannot be replayed: the records before record 7 are lost.\n");
}

TEST_F(Replay, RecordsOfOneNumber_AreSaid) {
  SessionFile file;
  file.record(1, kReceived, kDone, "ClientEcho", "a");
  file.record(1, kReceived, kDone, "ClientEcho", "b");
  start(file);
  EXPECT_EQ(end(), "The session cannot be replayed: there are two records 1.\n");
}

TEST_F(Replay, SessionWithoutMessages_IsSaid) {
  SessionFile file;
  file.record(1, kSent, kRefused, "chat_request_serialize", "");
  start(file);
  EXPECT_EQ(end(), "The session cannot be replayed: it has no messages.\n");
}

TEST_F(Replay, BlockThatBreaksOffBeforeALaterSection_IsSaid) {
  SessionFile file;
  file.record(kReceived, "ClientEcho", "a");
  const size_t broken = file.bytes.size();
  file.record(kReceived, "ClientEcho", "b");
  file.bytes[broken + 6] = 1;  // its length
  start(file);
  EXPECT_EQ(end(), "") << "it could be the end";
  file.section();
  start(file);
  EXPECT_EQ(end(), "The session cannot be replayed: the bytes from offset " +
                       std::to_string(broken) + " on cannot be read.\n");
}

TEST_F(Replay, BlockOfNoWholeLength_IsSaid) {
  SessionFile file;
  file.record(kReceived, "ClientEcho", "a");
  const size_t broken = file.bytes.size();
  file.record(kReceived, "ClientEcho", "b");
  file.bytes[broken + 4] = 8;  // its length
  start(file);
  EXPECT_EQ(end(), "The session cannot be replayed: the bytes from offset " +
                       std::to_string(broken) + " on cannot be read.\n");
}

TEST_F(Replay, PacketThatIsNoRecord_IsSaid) {
  SessionFile file;
  file.record(1, 3, kDone, "ClientEcho", "a");
  start(file);
  EXPECT_EQ(end(), "The session cannot be replayed: a packet is no record of this format.\n");
}

TEST_F(Replay, MessageThatWasCutOff_IsSaid) {
  SessionFile file;
  file.record(1, kReceived, kDone, "ClientEcho", "a", 1);
  start(file);
  EXPECT_EQ(end(), "The session cannot be replayed: record 1 has a message that was cut off.\n");
}

TEST_F(Replay, UnknownName_IsSaid) {
  SessionFile file;
  file.record(kReceived, "nothing_deserialize", "");
  start(file);
  EXPECT_EQ(end(),
            "The session cannot be replayed: record 1 has a name 'nothing_deserialize', which is "
            "that of no message.\n");
}

TEST_F(Replay, OtherFiles_AreRefused) {
  for (const char* bytes : {"", "\n\r\r\n", "no session at all"}) {
    start_with(bytes);
    EXPECT_EQ(end(), "The session cannot be replayed: it is no pcapng file.\n") << bytes;
  }
}

TEST_F(Replay, EachPrefixAndEachChangedByte_IsReadOrRefused) {
  SessionFile file;
  file.record(kReceived, "ClientEcho", "\x08\x05");
  file.record(kSent, "ClientEchoReply", "\x08\x05");
  for (size_t i = 0; i < file.bytes.size(); ++i) {
    std::string bytes = file.bytes;
    bytes[i] = static_cast<char>(~bytes[i]);
    start_with(bytes);
    EXPECT_NE(kit_, nullptr);
    start_with(file.bytes.substr(0, i));
    EXPECT_NE(kit_, nullptr);
  }
}

// The ids of the plug-in's requests are small numbers. Here they are others.
std::string with_another_id(const Spoken& spoken) {
  using google::protobuf::DescriptorPool;
  const auto& type = *DescriptorPool::generated_pool()->FindMessageTypeByName(spoken.message);
  const std::unique_ptr<google::protobuf::Message> message(
      google::protobuf::MessageFactory::generated_factory()->GetPrototype(&type)->New());
  const auto& fields = *message->GetReflection();
  const auto* id = type.FindFieldByName("requestId");
  message->ParseFromString(spoken.bytes);
  if (fields.GetInt64(*message, id) < 1000) {
    fields.SetInt64(message.get(), id, fields.GetInt64(*message, id) + 1000);
  }
  return message->SerializeAsString();
}

class RecordedDay : public ::testing::Test {
 protected:
  RecordedDay() : day_(qel_testkit_new(nullptr)) { EXPECT_EQ(day_.run(), ""); }

  void record(const Spoken& spoken, const std::string& bytes) {
    file_.record(spoken.was_sent ? kSent : kReceived, spoken.message, bytes);
  }
  void expect_the_same_again() {
    Play again(qel_testkit_new_replay(reinterpret_cast<const unsigned char*>(file_.bytes.data()),
                                      file_.bytes.size(), nullptr));
    EXPECT_EQ(again.run(), "");
    EXPECT_GT(day_.spoken().size(), 20U);
    EXPECT_TRUE(again.spoken() == day_.spoken());
  }

  Play day_;
  SessionFile file_;
};

TEST_F(RecordedDay, Again_HasEqualMessages) {
  for (const Spoken& spoken : day_.spoken()) {
    record(spoken, spoken.bytes);
  }
  expect_the_same_again();
}

TEST_F(RecordedDay, OfOtherRequestIds_HasTheOnesOfNow) {
  for (const Spoken& spoken : day_.spoken()) {
    record(spoken, with_another_id(spoken));
  }
  EXPECT_NE(file_.bytes.find("\x58\xea\x07"), std::string::npos);  // 1002
  expect_the_same_again();
}

}  // namespace
