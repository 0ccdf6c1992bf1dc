// The example's two programs against another end that misbehaves: each must stop by itself, say
// why, and exit with 1.

#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <string>
#include <vector>

#include "../examples/framing.h"
#include "support/fields.h"

namespace {

using support::Fields;
using support::hex;

// For each message, in seconds: long for a busy machine, short for the tests of silence.
const std::string kTimeout = " --timeout 3";

// A program whose standard error is kept, and whose standard output goes to a file or is dropped.
class Program {
 public:
  explicit Program(const std::string& command, const std::string& output = "/dev/null")
      : errors_(popen((QEL_EMULATOR " " + command + " 2>&1 >" + output).c_str(), "r")) {}
  ~Program() { end(); }
  Program(const Program&) = delete;
  Program& operator=(const Program&) = delete;

  // Waits until it ends by itself.
  void expect_end(int exit_status, const std::string& messages) {
    std::string said;
    for (int c = 0; (c = std::fgetc(errors_)) != EOF;) {
      said += static_cast<char>(c);
    }
    const int status = end();
    EXPECT_TRUE(WIFEXITED(status)) << status;
    EXPECT_EQ(WEXITSTATUS(status), exit_status);
    EXPECT_EQ(said, messages);
  }

 private:
  int end() {
    std::FILE* errors = errors_;
    errors_ = nullptr;
    return errors == nullptr ? 0 : pclose(errors);
  }

  std::FILE* errors_;
};

sockaddr_in loopback(int port) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = htons(static_cast<uint16_t>(port));
  return address;
}

void send_message(int connection, const std::string& name, const Fields& message) {
  const std::string& bytes = message.bytes();
  EXPECT_EQ(
      frame_send(connection, name.c_str(), reinterpret_cast<const unsigned char*>(bytes.data()),
                 static_cast<int>(bytes.size())),
      0);
}

// The name of the next message, or "" at the connection's end.
std::string receive_message(int connection) {
  frame_t frame;
  const int status = frame_receive(connection, &frame);
  std::free(frame.message);
  return status == 1 ? frame.name : "";
}

// A Result with a text.
Fields result(int code) {
  return Fields().number(1, code).text(2, "text");
}

// ---- The plug-in against a front end that misbehaves

// A reply about chatroom 42.
Fields reply(int64_t request, int code) {
  return Fields().number(11, request).number(12, 42).message(13, result(code));
}
// That confirms the message.
Fields chat_reply(int64_t request, int64_t message) {
  return reply(request, 0).message(14, Fields().number(1, message).number(2, 1));
}

// What the front end should send, and what the plug-in then sends.
struct Step {
  const char* message;
  Fields bytes;
  std::vector<const char*> answers;
};

const Step kSession[] = {
    {"ChannelAuthReply", Fields().number(1, 1).message(2, result(0)), {"CurrentTimeRequest"}},
    {"CurrentTimeReply", Fields().number(11, 2).message(12, result(0)), {"CreateChatroomRequest"}},
    {"CreateChatroomReply", reply(3, 1001), {"AllowChatRequest"}},
    {"AllowChatReply", reply(4, 0), {"ChatRequest"}},
    {"ChatReply", chat_reply(5, 9001), {"ChatRequest"}},
    {"ChatReply", chat_reply(6, 9002), {"ReadMessageRequest"}},
    {"ReadMessageReply", reply(7, 0), {"GetAllUnreadMessageRequest"}},
    {"GetAllUnreadMessageReply", Fields().number(11, 8).message(12, result(0)), {}},
    {"ForwardUnreadMessage", Fields(), {"ForwardUnreadMessageReply", "UnsealMessageRequest"}},
    {"UnsealMessageReply", reply(9, 0), {"IsTyping"}},
};

class PluginSession : public ::testing::Test {
 protected:
  void SetUp() override {
    setenv("DLOG_STANDIN_PRIORITY", "S", 1);
    listener_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address = loopback(0);
    socklen_t length = sizeof address;
    ASSERT_EQ(bind(listener_, reinterpret_cast<sockaddr*>(&address), length), 0);
    ASSERT_EQ(listen(listener_, 1), 0);
    ASSERT_EQ(getsockname(listener_, reinterpret_cast<sockaddr*>(&address), &length), 0);
    program_ = std::make_unique<Program>(QEL_PLUGIN_SESSION " " +
                                         std::to_string(ntohs(address.sin_port)) + kTimeout);
    connection_ = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    ASSERT_GE(connection_, 0);
    ASSERT_EQ(receive_message(connection_), "ChannelAuthRequest");
  }
  void TearDown() override {
    close(connection_);
    close(listener_);
  }

  void expect_failure(const std::string& reason) {
    program_->expect_end(1, "plug-in: " + reason + "\n");
  }
  void expect_failure_of_the_connection() {
    expect_failure("the connection ended or fell silent where a message was due");
  }

  int listener_ = -1;
  int connection_ = -1;
  std::unique_ptr<Program> program_;
};

// What the front end sends after so many steps of the session, and why the plug-in stops then.
struct FrontEndMistake {
  const char* name;
  int steps;
  const char* message;
  Fields bytes;
  const char* reason;
};

const Fields kBroken(hex("08"));

const FrontEndMistake kFrontEndMistakes[] = {
    {"BrokenReply", 0, "ChannelAuthReply", kBroken, "the reply could not be parsed"},
    {"ReplyWithoutResult", 0, "ChannelAuthReply", Fields().number(1, 1),
     "the reply does not say how it went"},
    {"ReplyToAnotherRequest", 0, "ChannelAuthReply", Fields().number(1, 999).message(2, result(0)),
     "the reply belongs to another request"},
    {"Refusal", 0, "ChannelAuthReply", Fields().number(1, 1).message(2, result(2001)),
     "the service refused the request"},
    {"AnotherMessage", 0, "ChatReply", Fields(), "a message came that was not expected"},
    {"BrokenProbe", 1, "ClientEcho", kBroken, "the echo probe could not be parsed"},
    {"BrokenPush", 1, "ForwardOnlineMessage", kBroken, "the pushed message could not be parsed"},
    {"RefusedChatroom", 2, "CreateChatroomReply", reply(3, 2002),
     "the service refused the request"},
    {"UnconfirmedChatMessage", 4, "ChatReply", reply(5, 0),
     "the service did not confirm the message"},
    {"BrokenPage", 8, "ForwardUnreadMessage", kBroken, "the page could not be parsed"},
    {"BrokenTypingStatus", 10, "TypingUpdated", kBroken, "the typing status could not be parsed"},
};

class PluginSessionWithMistake : public PluginSession,
                                 public ::testing::WithParamInterface<FrontEndMistake> {};

TEST_P(PluginSessionWithMistake, OfTheFrontEnd_SaysItAndFails) {
  for (int i = 0; i < GetParam().steps; ++i) {
    send_message(connection_, kSession[i].message, kSession[i].bytes);
    for (const char* answer : kSession[i].answers) {
      ASSERT_EQ(receive_message(connection_), answer);
    }
  }
  send_message(connection_, GetParam().message, GetParam().bytes);
  expect_failure(GetParam().reason);
}

INSTANTIATE_TEST_SUITE_P(Each, PluginSessionWithMistake, ::testing::ValuesIn(kFrontEndMistakes),
                         [](const auto& row) { return row.param.name; });

TEST_F(PluginSession, WhenTheConnectionEnds_Fails) {
  shutdown(connection_, SHUT_RDWR);
  expect_failure_of_the_connection();
}

TEST_F(PluginSession, WhenTheFrontEndFallsSilent_Fails) {
  expect_failure_of_the_connection();
}

TEST_F(PluginSession, WhenAFrameIsCutShort_Fails) {
  ASSERT_EQ(send(connection_,
                 "\x10"
                 "Chan",
                 5, 0),
            5);
  shutdown(connection_, SHUT_RDWR);
  expect_failure_of_the_connection();
}

TEST_F(PluginSession, WhenAFrameClaimsTooLongAMessage_Fails) {
  ASSERT_EQ(send(connection_,
                 "\x01"
                 "X\x7f\xff\xff\xff",
                 6, 0),
            6);
  expect_failure_of_the_connection();
}

TEST(PluginSessionAlone, WhenNobodyListens_Fails) {
  Program(QEL_PLUGIN_SESSION " 1")
      .expect_end(1, "plug-in: connection to the front end: Connection refused\n");
}

TEST(PluginSessionAlone, WhenThePortIsMissingOrNone_PrintsItsUsage) {
  for (const std::string port : {"", "abc", "''", "0", "-5", "70000"}) {
    Program(QEL_PLUGIN_SESSION " " + port)
        .expect_end(2, "usage: plugin_session PORT [--access-token TEXT] [--timeout SECONDS]\n");
  }
}

// ---- The front end against a plug-in that misbehaves

Fields auth() {
  return Fields().number(1, 1).number(2, 5001).number(3, 77).text(5, "app").text(
      6, "example-access-token");
}

class FrontEnd : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_NE(mkdtemp(folder_.data()), nullptr);
    const std::string port_file = folder_ + "/port";
    program_ = std::make_unique<Program>(
        QEL_FRONT_END " --scenario " QEL_DAY " --port-file " + port_file + kTimeout,
        folder_ + "/transcript");
    for (int tries = 0; tries < 200 && access(port_file.c_str(), R_OK) != 0; ++tries) {
      usleep(50000);
    }
    int port = 0;
    std::ifstream(port_file) >> port;

    connection_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const sockaddr_in address = loopback(port);
    ASSERT_EQ(connect(connection_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  }
  void TearDown() override {
    close(connection_);
    std::filesystem::remove_all(folder_);
  }

  void authenticate() {
    send_message(connection_, "ChannelAuthRequest", auth());
    ASSERT_EQ(receive_message(connection_), "ChannelAuthReply");
  }
  void expect_failure(const std::string& reason) {
    shutdown(connection_, SHUT_WR);
    program_->expect_end(1, "front_end: " + reason + "\n");
  }
  // Whether the text is in what it has printed when it has ended.
  bool has_printed(const std::string& text) {
    shutdown(connection_, SHUT_WR);
    program_.reset();
    std::ifstream file(folder_ + "/transcript");
    const std::string transcript{std::istreambuf_iterator<char>(file), {}};
    return transcript.find(text) != std::string::npos;
  }

  std::string folder_ = testing::TempDir() + "front-end-XXXXXX";
  int connection_ = -1;
  std::unique_ptr<Program> program_;
};

struct PluginMistake {
  const char* name;
  bool is_authenticated;
  const char* message;
  Fields bytes;
  const char* reason;
};

const PluginMistake kPluginMistakes[] = {
    {"NoMessage", false, "NoSuchMessage", Fields(),
     "Message 1 of the plug-in has a name 'NoSuchMessage', which is that of no message."},
    {"BrokenMessage", false, "ChannelAuthRequest", kBroken,
     "Message 1 of the plug-in, a ChannelAuthRequest, cannot be read: its bytes are broken, or "
     "those of another message."},
    {"UnknownField", false, "ChannelAuthRequest", auth().number(1000, 1),
     "Message 1 of the plug-in, a ChannelAuthRequest, is wrong: the schema has no field 1000."},
    {"WrongToken", false, "ChannelAuthRequest", auth().text(6, "wrong"),
     "Message 1 of the plug-in, a ChannelAuthRequest, is wrong: it has another access token than "
     "the service."},
    {"RequestBeforeAuthentication", false, "CurrentTimeRequest", Fields().number(11, 1),
     "Message 1 of the plug-in, a CurrentTimeRequest, is wrong: it comes before the login "
     "was granted."},
    {"AnotherChatroom", true, "IsTyping", Fields().number(11, 2).number(12, 43).text(13, "typing"),
     "Message 2 of the plug-in, an IsTyping, is wrong: there is no chatroom 43, or the user has "
     "left it."},
    {"ChangeOfNothing", true, "ChangeChatroomMetaRequest", Fields().number(11, 2).number(12, 42),
     "Message 2 of the plug-in, a ChangeChatroomMetaRequest, is wrong: it changes nothing."},
    {"MessageOfTheService", true, "ChatReply", Fields(),
     "Message 2 of the plug-in, a ChatReply, is wrong: a plug-in does not send it."},
};

class FrontEndWithMistake : public FrontEnd, public ::testing::WithParamInterface<PluginMistake> {};

TEST_P(FrontEndWithMistake, OfThePlugin_SaysItAndFails) {
  if (GetParam().is_authenticated) {
    authenticate();
  }
  send_message(connection_, GetParam().message, GetParam().bytes);
  expect_failure(GetParam().reason);
}

INSTANTIATE_TEST_SUITE_P(Each, FrontEndWithMistake, ::testing::ValuesIn(kPluginMistakes),
                         [](const auto& row) { return row.param.name; });

TEST_F(FrontEnd, WhenThePluginFallsSilent_Fails) {
  authenticate();
  program_->expect_end(1, "front_end: the connection broke or fell silent\n");
}

TEST_F(FrontEnd, WhenTheProbeIsAnsweredWithAnotherId_Fails) {
  authenticate();
  send_message(connection_, "CurrentTimeRequest", Fields().number(11, 2));
  ASSERT_EQ(receive_message(connection_), "ClientEcho");
  send_message(connection_, "ClientEchoReply", Fields().number(1, 5));
  expect_failure(
      "Message 3 of the plug-in, a ClientEchoReply, is wrong: it answers nothing: no such message "
      "with the requestId 5 was sent.");
}

TEST_F(FrontEnd, WhenTheSessionEndsTooEarly_Fails) {
  authenticate();
  expect_failure("Line 7 expects a CurrentTimeRequest, which never came.");
}

TEST_F(FrontEnd, WhenTheConnectionBreaksWithinAFrame_Fails) {
  ASSERT_EQ(send(connection_,
                 "\x10"
                 "Chan",
                 5, 0),
            5);
  expect_failure("the connection broke or fell silent");
}

TEST_F(FrontEnd, WhenALoginComesUnderAnotherName_ShowsNoAccessToken) {
  send_message(connection_, "InboxEntry", auth());
  EXPECT_FALSE(has_printed("example-access-token"));
}

TEST_F(FrontEnd, WhenTheAccessTokenStandsInAnotherField_HidesItThereToo) {
  send_message(connection_, "ChannelAuthRequest", auth().text(5, "an example-access-token"));
  EXPECT_TRUE(has_printed("appId: \"an (not shown)\""));
}

TEST_F(FrontEnd, WhenANameIsNone_DoesNotPrintIt) {
  send_message(connection_, "\x1b[2J", Fields());
  EXPECT_TRUE(has_printed("plug-in -> service  no message of the schema, 0 bytes\n"));
}

TEST(FrontEndAlone, WhenNobodyComes_Fails) {
  Program(QEL_FRONT_END " --timeout 1").expect_end(1, "front_end: nobody came\n");
}

TEST(FrontEndAlone, WhenThePortIsNone_SaysSo) {
  Program(QEL_FRONT_END " --port 70000")
      .expect_end(2, "front_end: --port takes a number of 0 to 65535, not '70000'\n");
}

}  // namespace
