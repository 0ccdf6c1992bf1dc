// The example's two programs against another end that misbehaves: each must stop by itself, say
// why, and exit with 1.

#include <arpa/inet.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "../examples/framing.h"
#include "support/fields.h"

namespace {

using support::Fields;
using support::hex;

// For each message, in seconds: long for a busy machine, short for the tests of silence.
const char kTimeout[] = "3";

// A program whose standard error is kept and whose standard output is dropped.
class Program {
 public:
  explicit Program(std::vector<std::string> command) {
    if (*QEL_EMULATOR != '\0') {
      command.insert(command.begin(), QEL_EMULATOR);
    }
    int ends[2];
    EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
    errors_ = ends[0];
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    posix_spawn_file_actions_adddup2(&actions, ends[1], STDERR_FILENO);
    std::vector<char*> arguments;
    for (std::string& word : command) {
      arguments.push_back(word.data());
    }
    arguments.push_back(nullptr);
    EXPECT_EQ(posix_spawn(&process_, arguments[0], &actions, nullptr, arguments.data(), environ),
              0);
    posix_spawn_file_actions_destroy(&actions);
    close(ends[1]);
  }
  ~Program() { close(errors_); }
  Program(const Program&) = delete;
  Program& operator=(const Program&) = delete;

  // Waits for its end.
  int exit_status() {
    char chunk[4096];
    for (ssize_t n = 0; (n = read(errors_, chunk, sizeof chunk)) > 0;) {
      messages_.append(chunk, static_cast<size_t>(n));
    }
    int status = -1;
    waitpid(process_, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }
  // Standard error, after exit_status().
  const std::string& messages() const { return messages_; }

 private:
  pid_t process_ = -1;
  int errors_ = -1;
  std::string messages_;
};

sockaddr_in loopback(int port) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = htons(static_cast<uint16_t>(port));
  return address;
}

void send_message(int connection, const std::string& name, const std::string& bytes) {
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
    program_.reset(new Program(
        {QEL_PLUGIN_SESSION, std::to_string(ntohs(address.sin_port)), "--timeout", kTimeout}));
    connection_ = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    ASSERT_GE(connection_, 0);
    ASSERT_EQ(receive_message(connection_), "ChannelAuthRequest");
  }
  void TearDown() override {
    close(connection_);
    close(listener_);
  }

  // Answers the authentication, as it should be.
  void welcome() {
    send_message(connection_, "ChannelAuthReply",
                 Fields().number(1, 1).message(2, result(0)).bytes());
    ASSERT_EQ(receive_message(connection_), "CurrentTimeRequest");
  }
  // A reply about chatroom 42 that says that all is well.
  static std::string reply(int64_t request) {
    return Fields().number(11, request).number(12, 42).message(13, result(0)).bytes();
  }
  // The session up to the answer to its request for a chatroom.
  void create_chatroom(int code) {
    welcome();
    send_message(connection_, "CurrentTimeReply",
                 Fields().number(11, 2).message(12, result(0)).bytes());
    ASSERT_EQ(receive_message(connection_), "CreateChatroomRequest");
    send_message(connection_, "CreateChatroomReply",
                 Fields().number(11, 3).number(12, 42).message(13, result(code)).bytes());
  }
  // ... up to its first chat message.
  void enter_chatroom() {
    create_chatroom(1001);
    ASSERT_EQ(receive_message(connection_), "AllowChatRequest");
    send_message(connection_, "AllowChatReply", reply(4));
    ASSERT_EQ(receive_message(connection_), "ChatRequest");
  }
  // ... up to where it waits for stored messages.
  void fetch_unread() {
    enter_chatroom();
    for (int64_t message = 1; message <= 2; ++message) {
      const Fields entry = Fields().number(1, 9000 + message).number(2, 1);
      send_message(connection_, "ChatReply",
                   reply(4 + message) + Fields().message(14, entry).bytes());
      ASSERT_EQ(receive_message(connection_), message == 1 ? "ChatRequest" : "ReadMessageRequest");
    }
    send_message(connection_, "ReadMessageReply", reply(7));
    ASSERT_EQ(receive_message(connection_), "GetAllUnreadMessageRequest");
    send_message(connection_, "GetAllUnreadMessageReply",
                 Fields().number(11, 8).message(12, result(0)).bytes());
  }
  void expect_failure(const std::string& reason) {
    EXPECT_EQ(program_->exit_status(), 1);
    EXPECT_EQ(program_->messages(), "plug-in: " + reason + "\n");
  }

  int listener_ = -1;
  int connection_ = -1;
  std::unique_ptr<Program> program_;
};

TEST_F(PluginSession, WhenTheReplyCannotBeParsed_Fails) {
  send_message(connection_, "ChannelAuthReply", hex("08"));
  expect_failure("the reply could not be parsed");
}

TEST_F(PluginSession, WhenTheReplyHasNoResult_Fails) {
  send_message(connection_, "ChannelAuthReply", Fields().number(1, 1).bytes());
  expect_failure("the reply does not say how it went");
}

TEST_F(PluginSession, WhenTheReplyIsForAnotherRequest_Fails) {
  send_message(connection_, "ChannelAuthReply",
               Fields().number(1, 999).message(2, result(0)).bytes());
  expect_failure("the reply belongs to another request");
}

TEST_F(PluginSession, WhenTheServiceRefuses_Fails) {
  send_message(connection_, "ChannelAuthReply",
               Fields().number(1, 1).message(2, result(2001)).bytes());
  expect_failure("the service refused the request");
}

TEST_F(PluginSession, WhenAnotherMessageComes_Fails) {
  send_message(connection_, "ChatReply", "");
  expect_failure("a message came that was not expected");
}

TEST_F(PluginSession, WhenTheConnectionEnds_Fails) {
  shutdown(connection_, SHUT_RDWR);
  expect_failure("the connection ended or fell silent where a message was due");
}

TEST_F(PluginSession, WhenTheFrontEndFallsSilent_Fails) {
  expect_failure("the connection ended or fell silent where a message was due");
}

TEST_F(PluginSession, WhenAFrameIsCutShort_Fails) {
  ASSERT_EQ(send(connection_,
                 "\x10"
                 "Chan",
                 5, 0),
            5);
  shutdown(connection_, SHUT_RDWR);
  expect_failure("the connection ended or fell silent where a message was due");
}

TEST_F(PluginSession, WhenAFrameClaimsTooLongAMessage_Fails) {
  ASSERT_EQ(send(connection_,
                 "\x01"
                 "X\x7f\xff\xff\xff",
                 6, 0),
            6);
  expect_failure("the connection ended or fell silent where a message was due");
}

TEST_F(PluginSession, WhenAProbeCannotBeParsed_Fails) {
  welcome();
  send_message(connection_, "ClientEcho", hex("08"));
  expect_failure("the echo probe could not be parsed");
}

TEST_F(PluginSession, WhenAPushedMessageCannotBeParsed_Fails) {
  welcome();
  send_message(connection_, "ForwardOnlineMessage", hex("08"));
  expect_failure("the pushed message could not be parsed");
}

TEST_F(PluginSession, WhenTheChatroomIsRefused_Fails) {
  create_chatroom(2002);
  expect_failure("the service refused the request");
}

TEST_F(PluginSession, WhenTheChatMessageIsNotConfirmed_Fails) {
  enter_chatroom();
  send_message(connection_, "ChatReply", reply(5));
  expect_failure("the service did not confirm the message");
}

TEST_F(PluginSession, WhenAPageCannotBeParsed_Fails) {
  fetch_unread();
  send_message(connection_, "ForwardUnreadMessage", hex("08"));
  expect_failure("the page could not be parsed");
}

TEST_F(PluginSession, WhenAPageIsEmpty_GoesOn) {
  fetch_unread();
  send_message(connection_, "ForwardUnreadMessage", "");
  ASSERT_EQ(receive_message(connection_), "ForwardUnreadMessageReply");
  EXPECT_EQ(receive_message(connection_), "UnsealMessageRequest");
}

TEST_F(PluginSession, WhenTheTypingStatusCannotBeParsed_Fails) {
  fetch_unread();
  send_message(connection_, "ForwardUnreadMessage", "");
  ASSERT_EQ(receive_message(connection_), "ForwardUnreadMessageReply");
  ASSERT_EQ(receive_message(connection_), "UnsealMessageRequest");
  send_message(connection_, "UnsealMessageReply", reply(9));
  ASSERT_EQ(receive_message(connection_), "IsTyping");
  send_message(connection_, "TypingUpdated", hex("08"));
  expect_failure("the typing status could not be parsed");
}

const char kPluginUsage[] =
    "usage: plugin_session PORT [--access-token TEXT] [--timeout SECONDS]\n";

TEST(PluginSessionAlone, WhenNobodyListens_Fails) {
  Program program({QEL_PLUGIN_SESSION, "1"});
  EXPECT_EQ(program.exit_status(), 1);
  EXPECT_EQ(program.messages(), "plug-in: connection to the front end: Connection refused\n");
}

TEST(PluginSessionAlone, WhenCalledWithoutAPort_PrintsItsUsage) {
  Program program({QEL_PLUGIN_SESSION});
  EXPECT_EQ(program.exit_status(), 2);
  EXPECT_EQ(program.messages(), kPluginUsage);
}

TEST(PluginSessionAlone, WhenThePortIsNone_PrintsItsUsage) {
  for (const char* port : {"abc", "", "0", "-5", "70000"}) {
    Program program({QEL_PLUGIN_SESSION, port});
    EXPECT_EQ(program.exit_status(), 2);
    EXPECT_EQ(program.messages(), kPluginUsage);
  }
}

// ---- The front end against a plug-in that misbehaves

class FrontEnd : public ::testing::Test {
 protected:
  void SetUp() override {
    std::string folder = testing::TempDir() + "front-end-XXXXXX";
    ASSERT_NE(mkdtemp(folder.data()), nullptr);
    const std::string port_file = folder + "/port";
    program_.reset(new Program({QEL_FRONT_END, "--port-file", port_file, "--timeout", kTimeout}));
    for (int tries = 0; tries < 200 && access(port_file.c_str(), R_OK) != 0; ++tries) {
      usleep(50000);
    }
    int port = 0;
    std::FILE* file = std::fopen(port_file.c_str(), "r");
    ASSERT_NE(file, nullptr);
    ASSERT_EQ(std::fscanf(file, "%d", &port), 1);
    std::fclose(file);
    unlink(port_file.c_str());
    rmdir(folder.c_str());

    connection_ = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const sockaddr_in address = loopback(port);
    ASSERT_EQ(connect(connection_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  }
  void TearDown() override { close(connection_); }

  static Fields auth() {
    return Fields().number(1, 1).number(2, 2).number(3, 3).text(5, "app").text(
        6, "example-access-token");
  }
  void authenticate() {
    send_message(connection_, "ChannelAuthRequest", auth().bytes());
    ASSERT_EQ(receive_message(connection_), "ChannelAuthReply");
  }
  void expect_failure(const std::string& reason) {
    shutdown(connection_, SHUT_WR);
    EXPECT_EQ(program_->exit_status(), 1);
    EXPECT_EQ(program_->messages(), "front_end: " + reason + "\n");
  }

  int connection_ = -1;
  std::unique_ptr<Program> program_;
};

TEST_F(FrontEnd, WhenThePluginFallsSilent_Fails) {
  authenticate();
  EXPECT_EQ(program_->exit_status(), 1);
  EXPECT_EQ(program_->messages(), "front_end: the connection broke or fell silent\n");
}

TEST(FrontEndAlone, WhenNobodyComes_Fails) {
  Program program({QEL_FRONT_END, "--timeout", "1"});
  EXPECT_EQ(program.exit_status(), 1);
  EXPECT_EQ(program.messages(), "front_end: nobody came\n");
}

TEST(FrontEndAlone, WhenThePortIsNone_SaysSo) {
  Program program({QEL_FRONT_END, "--port", "70000"});
  EXPECT_EQ(program.exit_status(), 2);
  EXPECT_EQ(program.messages(), "front_end: --port takes a number of 0 to 65535, not '70000'\n");
}

TEST_F(FrontEnd, WhenTheMessageDoesNotExist_Fails) {
  send_message(connection_, "NoSuchMessage", "");
  expect_failure("no such message: NoSuchMessage");
}

TEST_F(FrontEnd, WhenTheMessageIsMalformed_Fails) {
  send_message(connection_, "ChannelAuthRequest", hex("08"));
  expect_failure("not a valid message: ChannelAuthRequest");
}

TEST_F(FrontEnd, WhenTheMessageHasAnUnknownField_Fails) {
  send_message(connection_, "ChannelAuthRequest", auth().number(1000, 1).bytes());
  expect_failure("unknown fields in: ChannelAuthRequest");
}

TEST_F(FrontEnd, WhenTheAuthenticationCarriesAnImei_Fails) {
  send_message(connection_, "ChannelAuthRequest", auth().text(4, "1").bytes());
  expect_failure("an authentication with IMEI or proxy options");
}

TEST_F(FrontEnd, WhenTheTokenIsWrong_Fails) {
  send_message(connection_, "ChannelAuthRequest", auth().text(6, "wrong").bytes());
  expect_failure("wrong access token");
}

TEST_F(FrontEnd, WhenARequestComesBeforeTheAuthentication_Fails) {
  send_message(connection_, "CurrentTimeRequest", Fields().number(11, 1).bytes());
  expect_failure("a message before the authentication: CurrentTimeRequest");
}

TEST_F(FrontEnd, WhenARequestIdIsUsedAgain_Fails) {
  authenticate();
  send_message(connection_, "CurrentTimeRequest", Fields().number(11, 1).bytes());
  expect_failure("a request id that is not above the one before");
}

TEST_F(FrontEnd, WhenTheProbeIsAnsweredWithAnotherId_Fails) {
  authenticate();
  send_message(connection_, "CurrentTimeRequest", Fields().number(11, 2).bytes());
  ASSERT_EQ(receive_message(connection_), "ClientEcho");
  send_message(connection_, "ClientEchoReply", Fields().number(1, 5).bytes());
  expect_failure("an answer to another echo probe");
}

TEST_F(FrontEnd, WhenAChatMessageLacksItsLifetime_Fails) {
  authenticate();
  const Fields param = Fields().number(1, 3).number(2, 0).text(3, "x");
  send_message(connection_, "ChatRequest",
               Fields().number(11, 2).number(12, 42).message(13, param).bytes());
  expect_failure("a chat message that lacks a field");
}

TEST_F(FrontEnd, WhenARequestCarriesTheSendersIds_Fails) {
  authenticate();
  send_message(connection_, "CurrentTimeRequest", Fields().number(1, 5001).number(11, 2).bytes());
  expect_failure("ids of the sender in: CurrentTimeRequest");
}

TEST_F(FrontEnd, WhenARequestIsOfAnotherChatroom_Fails) {
  authenticate();
  send_message(connection_, "IsTyping", Fields().number(11, 2).number(12, 43).bytes());
  expect_failure("a typing status of another chatroom");
}

TEST_F(FrontEnd, WhenBothTitleAndLifetimeChange_Fails) {
  authenticate();
  send_message(connection_, "ChangeChatroomMetaRequest",
               Fields().number(11, 2).number(12, 42).text(13, "x").number(16, 1).bytes());
  expect_failure("a change that is not of one property");
}

TEST_F(FrontEnd, WhenAReadReceiptSaysMoreThanItShould_Fails) {
  authenticate();
  const Fields entry = Fields().number(1, 1).number(2, 0).number(3, 6001).number(5, 1).text(6, "x");
  send_message(connection_, "ReadMessageRequest",
               Fields().number(11, 2).number(12, 42).message(13, entry).bytes());
  expect_failure("a read receipt with more than the message's name");
}

TEST_F(FrontEnd, WhenAMessageIsNotOneOfAPlugins_Fails) {
  authenticate();
  send_message(connection_, "ChatReply", "");
  expect_failure("this front end does not take a ChatReply");
}

TEST_F(FrontEnd, WhenTheSessionEndsTooEarly_Fails) {
  authenticate();
  expect_failure("the plug-in never sent a message CurrentTimeRequest");
}

TEST_F(FrontEnd, WhenTheConnectionBreaksWithinAFrame_Fails) {
  ASSERT_EQ(send(connection_,
                 "\x10"
                 "Chan",
                 5, 0),
            5);
  expect_failure("the connection broke or fell silent");
}

}  // namespace
