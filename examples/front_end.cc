// The service's front end of the example: a process of its own, which takes one connection, checks
// every message that it gets, answers with the schema's generated classes, and prints both
// directions of the conversation.
//
//   front_end [--port PORT] [--port-file FILE] [--timeout SECONDS]
//
// listens on 127.0.0.1, on a free port unless one is given, writes the port's number to FILE, and
// gives the plug-in so long to come and for each message.
// Exits with 0 after a whole session, with 1 after a wrong exchange or when nobody comes, and with
// 2 if it was called wrongly.

#include <arpa/inet.h>
#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>
#include <google/protobuf/text_format.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <string>

#include "framing.h"
#include "msgspec_frontend.pb.h"

namespace {

using google::protobuf::DescriptorPool;
using google::protobuf::Message;
using google::protobuf::MessageFactory;

constexpr int kSessionSeconds = 60;  // at most, whatever the plug-in does
constexpr char kAccessToken[] = "example-access-token";
constexpr int64_t kEchoId = 700001;

enum ResultCode { kOk = 0, kBadToken = 2001 };

// Anything that a front end of this service must not be sent.
struct WrongExchange : std::runtime_error {
  using std::runtime_error::runtime_error;
};

void require(bool holds, const std::string& what) {
  if (!holds) {
    throw WrongExchange(what);
  }
}

int64_t now_millis() {
  timeval now;
  gettimeofday(&now, nullptr);
  return int64_t{now.tv_sec} * 1000 + now.tv_usec / 1000;
}

// The message's fields, one a line; the access token is a credential and is not shown.
std::string text_form(const Message& message) {
  std::unique_ptr<Message> shown(message.New());
  shown->CopyFrom(message);
  if (auto* auth = dynamic_cast<ChannelAuthRequest*>(shown.get())) {
    if (auth->has_accesstoken()) {
      auth->set_accesstoken("(not shown)");
    }
  }
  google::protobuf::TextFormat::Printer printer;
  printer.SetUseUtf8StringEscaping(true);
  printer.SetInitialIndentLevel(2);
  std::string text;
  printer.PrintToString(*shown, &text);
  return text;
}

void print_message(const char* direction, const Message& message, int size) {
  std::printf("%s  %s, %d bytes\n%s", direction, message.GetTypeName().c_str(), size,
              text_form(message).c_str());
}

// One connection and what was said on it.
class Session {
 public:
  explicit Session(int connection) : connection_(connection) {}

  // Until the plug-in closes the connection.
  void run() {
    while (const std::unique_ptr<Message> request = receive()) {
      answer(*request);
    }
    require(authenticated_, "the plug-in never authenticated");
    require(told_time_ > 0, "the plug-in never asked for the time");
    require(chat_messages_ > 0, "the plug-in sent no chat message");
    std::printf("front end: session complete, %d chat messages\n", chat_messages_);
  }

 private:
  // The next message, or nullptr at the end of the conversation.
  std::unique_ptr<Message> receive() {
    frame_t frame;
    const int status = frame_receive(connection_, &frame);
    const std::unique_ptr<unsigned char, decltype(&std::free)> bytes(frame.message, &std::free);
    require(status >= 0, "the connection broke or fell silent");
    if (status == 0) {
      return nullptr;
    }
    const auto* type = DescriptorPool::generated_pool()->FindMessageTypeByName(frame.name);
    require(type != nullptr, std::string("no such message: ") + frame.name);
    std::unique_ptr<Message> message(
        MessageFactory::generated_factory()->GetPrototype(type)->New());
    require(message->ParseFromArray(bytes.get(), frame.size),
            std::string("not a valid message: ") + frame.name);
    require(message->GetReflection()->GetUnknownFields(*message).empty(),
            std::string("unknown fields in: ") + frame.name);
    print_message("plug-in -> front end", *message, frame.size);
    return message;
  }

  void send(const Message& message) {
    const std::string bytes = message.SerializeAsString();
    print_message("front end -> plug-in", message, static_cast<int>(bytes.size()));
    require(frame_send(connection_, message.GetTypeName().c_str(),
                       reinterpret_cast<const unsigned char*>(bytes.data()),
                       static_cast<int>(bytes.size())) == 0,
            "a message could not be sent");
  }

  void answer(const Message& request) {
    if (const auto* auth = dynamic_cast<const ChannelAuthRequest*>(&request)) {
      authenticate(*auth);
      return;
    }
    require(authenticated_, "a message before the authentication: " + request.GetTypeName());
    if (const auto* time = dynamic_cast<const CurrentTimeRequest*>(&request)) {
      tell_time(*time);
    } else if (const auto* chat = dynamic_cast<const ChatRequest*>(&request)) {
      record(*chat);
    } else {
      throw WrongExchange("this front end does not take a " + request.GetTypeName());
    }
  }

  void authenticate(const ChannelAuthRequest& request) {
    require(!authenticated_, "a second authentication");
    take_request_id(request.has_requestid(), request.requestid());
    require(request.has_userid() && request.has_deviceid() && request.has_appid(),
            "an authentication without user, device or application");
    require(!request.has_imei() && request.proxyoptions_size() == 0,
            "an authentication with IMEI or proxy options");
    authenticated_ = request.accesstoken() == kAccessToken;

    ChannelAuthReply reply;
    reply.set_requestid(request.requestid());
    reply.mutable_result()->set_code(authenticated_ ? kOk : kBadToken);
    reply.mutable_result()->set_msg(authenticated_ ? "welcome" : "access token refused");
    send(reply);
    require(authenticated_, "wrong access token");
  }

  // Before it tells the time, the service probes whether the client is alive.
  void tell_time(const CurrentTimeRequest& request) {
    take_request_id(request.has_requestid(), request.requestid());
    require(!request.has_userid() && !request.has_deviceid(), "ids in a request for the time");
    probe();

    CurrentTimeReply reply;
    reply.set_requestid(request.requestid());
    reply.mutable_result()->set_code(kOk);
    reply.mutable_result()->set_msg("ok");
    reply.set_currenttimemillis(now_millis());
    send(reply);
    ++told_time_;
  }

  void probe() {
    ClientEcho echo;
    echo.set_requestid(kEchoId);
    send(echo);
    const std::unique_ptr<Message> message = receive();
    const auto* reply = dynamic_cast<const ClientEchoReply*>(message.get());
    require(reply != nullptr, "no answer to the echo probe");
    require(reply->requestid() == kEchoId, "an answer to another echo probe");
  }

  void record(const ChatRequest& request) {
    take_request_id(request.has_requestid(), request.requestid());
    require(request.has_chatroomid(), "a chat request without a chatroom");
    require(!request.has_userid() && !request.has_deviceid(), "ids in a chat request");
    require(request.chatmessageparams_size() == 1, "a chat request that is not of one message");
    const ChatMessageParam& param = request.chatmessageparams(0);
    require(param.has_msgid() && param.has_msgtype() && param.has_chatmsg() && param.has_msgttl(),
            "a chat message that lacks a field");
    require(!param.has_securechatmsg(), "a sealed chat message");

    ChatReply reply;
    reply.set_requestid(request.requestid());
    reply.set_chatroomid(request.chatroomid());
    reply.mutable_result()->set_code(kOk);
    reply.mutable_result()->set_msg("ok");
    ProcessedMessageEntry* entry = reply.add_processedmessageentries();
    entry->set_msgid(param.msgid());
    entry->set_senttime(now_millis());
    send(reply);
    ++chat_messages_;
  }

  void take_request_id(bool present, int64_t id) {
    require(present, "a request without a request id");
    require(id > last_request_id_, "a request id that is not above the one before");
    last_request_id_ = id;
  }

  int connection_;
  bool authenticated_ = false;
  int told_time_ = 0;
  int chat_messages_ = 0;
  int64_t last_request_id_ = 0;
};

// A number of least to most; ends the program if the text is none.
int parse_number(const char* what, const char* text, long least, long most) {
  char* end = nullptr;
  const long number = std::strtol(text, &end, 10);
  if (end == text || *end != '\0' || number < least || number > most) {
    std::fprintf(stderr, "front_end: %s takes a number of %ld to %ld, not '%s'\n", what, least,
                 most, text);
    std::exit(2);
  }
  return static_cast<int>(number);
}

std::string system_error(const std::string& what) {
  return what + ": " + std::strerror(errno);
}

// A listening socket on 127.0.0.1; port 0 stands for any that is free.
int listen_on(int port) {
  const int listener = socket(AF_INET, SOCK_STREAM, 0);
  const int on = 1;
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = htons(static_cast<uint16_t>(port));
  require(listener >= 0, system_error("no socket"));
  setsockopt(listener, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
  if (bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
      listen(listener, 1) != 0) {
    require(errno != EADDRINUSE, "port " + std::to_string(port) +
                                     " is taken: choose another with --port, or leave --port out");
    throw WrongExchange(system_error("cannot listen on port " + std::to_string(port)));
  }
  return listener;
}

int port_of(int listener) {
  sockaddr_in address{};
  socklen_t length = sizeof address;
  require(getsockname(listener, reinterpret_cast<sockaddr*>(&address), &length) == 0,
          system_error("no address"));
  return ntohs(address.sin_port);
}

// Whoever waits for the file sees it whole or not at all.
void write_port_file(const std::string& path, int port) {
  const std::string unfinished = path + ".unfinished";
  std::FILE* file = std::fopen(unfinished.c_str(), "w");
  require(file != nullptr, system_error(unfinished));
  std::fprintf(file, "%d\n", port);
  require(std::fclose(file) == 0 && std::rename(unfinished.c_str(), path.c_str()) == 0,
          system_error(path));
}

int accept_one(int listener, int timeout_seconds) {
  pollfd waiting{listener, POLLIN, 0};
  require(poll(&waiting, 1, timeout_seconds * 1000) == 1, "nobody came");
  const int connection = accept(listener, nullptr, nullptr);
  require(connection >= 0 && frame_set_timeout(connection, timeout_seconds) == 0,
          system_error("no connection"));
  return connection;
}

}  // namespace

int main(int argc, char** argv) {
  int port = 0;
  int timeout_seconds = 10;
  std::string port_file;
  for (int i = 1; i < argc; i += 2) {
    const std::string option = argv[i];
    if (i + 1 < argc && option == "--port") {
      port = parse_number("--port", argv[i + 1], 0, 65535);
    } else if (i + 1 < argc && option == "--port-file") {
      port_file = argv[i + 1];
    } else if (i + 1 < argc && option == "--timeout") {
      timeout_seconds = parse_number("--timeout", argv[i + 1], 1, kSessionSeconds);
    } else {
      std::fprintf(stderr,
                   "usage: front_end [--port PORT] [--port-file FILE] [--timeout SECONDS]\n");
      return 2;
    }
  }
  std::setvbuf(stdout, nullptr, _IOLBF, 0);  // in step with the plug-in
  alarm(kSessionSeconds);

  try {
    const int listener = listen_on(port);
    std::printf("front end: listening on 127.0.0.1:%d\n", port_of(listener));
    if (!port_file.empty()) {
      write_port_file(port_file, port_of(listener));
    }
    const int connection = accept_one(listener, timeout_seconds);
    close(listener);
    Session(connection).run();
    close(connection);
  } catch (const WrongExchange& problem) {
    std::fprintf(stderr, "front_end: %s\n", problem.what());
    return 1;
  }
  google::protobuf::ShutdownProtobufLibrary();
  return 0;
}
