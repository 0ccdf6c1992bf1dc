// The service's front end of the example: a process of its own, which takes one connection. The
// service is the test kit's; this program carries its messages, and prints both directions.
//
//   front_end [--scenario FILE] [--port PORT] [--port-file FILE] [--timeout SECONDS]
//
// listens on 127.0.0.1, on a free port unless one is given, and writes the port's number to the
// port file. The scenario says what it expects of the plug-in; without one, it takes what comes. It
// waits SECONDS at most for the plug-in to connect, and for each message. It exits with 0 after a
// whole session, with 1 after a wrong exchange or if no plug-in connects, and with 2 if it was
// called wrongly.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/stubs/common.h>
#include <google/protobuf/text_format.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "msgspec_frontend.pb.h"
#include "serve.h"

namespace {

using google::protobuf::Message;

constexpr int kSessionSeconds = 60;  // at most, whatever the plug-in does

// The requests of a session, and what the plug-in does with each.
constexpr struct {
  const char* name;
  const char* title;
} kRequests[] = {
    {"ChannelAuthRequest", "The plug-in signs in"},
    {"CurrentTimeRequest",
     "The plug-in asks for the time; the service first asks whether it is alive"},
    {"CreateChatroomRequest", "The plug-in creates a chatroom; some of the users are refused"},
    {"AllowChatRequest", "The plug-in enters the chatroom"},
    {"ChatRequest", "The plug-in sends a message; another member writes before it is confirmed"},
    {"ReadMessageRequest", "The plug-in tells which message the user has read"},
    {"GetAllUnreadMessageRequest",
     "The plug-in fetches what was stored meanwhile, two messages at a time"},
    {"UnsealMessageRequest", "The plug-in opens a sealed message"},
    {"IsTyping", "The plug-in tells that the user types; another member types too"},
    {"SaveCallLogRequest", "The plug-in reports a call"},
    {"ChangeChatroomMetaRequest", "The plug-in changes the chatroom"},
    {"InviteRequest", "The plug-in invites more users; most of them are refused"},
    {"EndChatRequest", "The plug-in leaves two chats"},
};

constexpr size_t kColumns = 80;  // of a terminal

bool is_plain_field(const std::string& line) {
  return line.back() != '{' && line.back() != '}';
}

// Joins lines of one field each, as long as the result fits on a terminal.
std::string side_by_side(const std::string& fields) {
  std::vector<std::string> lines;
  std::istringstream input(fields);
  for (std::string line; std::getline(input, line);) {
    const size_t depth = line.find_first_not_of(' ');
    if (!lines.empty() && is_plain_field(lines.back())) {
      std::string& last = lines.back();
      const size_t last_depth = last.find_first_not_of(' ');
      if (last_depth == depth && is_plain_field(line) &&
          last.size() + 2 + line.size() - depth <= kColumns) {
        last += ", " + line.substr(depth);
        continue;
      }
      if (last_depth > depth && lines.end()[-2].back() == '{') {  // line is "}"
        const std::string whole = lines.end()[-2] + " " + last.substr(last_depth) + " }";
        if (whole.size() <= kColumns) {
          lines.pop_back();
          lines.back() = whole;
          continue;
        }
      }
    }
    lines.push_back(line);
  }
  std::string text;
  for (const std::string& line : lines) {
    text += line + "\n";
  }
  return text;
}

// Prints both directions, without the access token, which is a credential.
class Transcript {
 public:
  // A message that is wrong may have the token anywhere, so its fields are not printed.
  void print(const Shown& shown, bool is_wrong);

 private:
  std::string text_form(const Message& message);

  std::string token_;  // of the login, as the text form has it
};

std::string Transcript::text_form(const Message& message) {
  constexpr char kHidden[] = "(not shown)";
  google::protobuf::TextFormat::Printer printer;
  printer.SetUseUtf8StringEscaping(true);
  const auto* auth = dynamic_cast<const ChannelAuthRequest*>(&message);
  if (auth != nullptr && auth->has_accesstoken()) {
    printer.PrintFieldValueToString(*auth,
                                    ChannelAuthRequest::descriptor()->FindFieldByNumber(
                                        ChannelAuthRequest::kAccessTokenFieldNumber),
                                    -1, &token_);
    token_ = token_.substr(1, token_.size() - 2);  // without quotes
  }
  printer.SetInitialIndentLevel(2);
  std::string text;
  printer.PrintToString(message, &text);
  for (size_t at = 0; !token_.empty() && (at = text.find(token_, at)) != std::string::npos;) {
    text.replace(at, token_.size(), kHidden);
    at += sizeof kHidden - 1;
  }
  return side_by_side(text);
}

void Transcript::print(const Shown& shown, bool is_wrong) {
  const std::string name = shown.name;
  std::ostringstream text;  // printed in one piece, as the plug-in prints too
  for (const auto& request : kRequests) {
    if (name == request.name) {
      text << "\n== " << request.title << "\n";
    }
  }
  const auto* type =
      google::protobuf::DescriptorPool::generated_pool()->FindMessageTypeByName(name);
  text << (shown.is_from_plugin ? "plug-in -> service" : "service -> plug-in") << "  "
       << (type != nullptr ? name : "no message of the schema") << ", " << shown.size << " bytes\n";
  if (type != nullptr && !is_wrong) {
    const std::unique_ptr<Message> message(
        google::protobuf::MessageFactory::generated_factory()->GetPrototype(type)->New());
    message->ParsePartialFromArray(shown.data, shown.size);
    text << text_form(*message);
  }
  std::fputs(text.str().c_str(), stdout);
}

// The number in the text, least to most; ends the program if it is no such number.
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

// Writes another file and renames it, so that nobody reads a part of the file.
void write_port_file(const std::string& path, int port) {
  const std::string unfinished = path + ".unfinished";
  std::FILE* file = std::fopen(unfinished.c_str(), "w");
  require(file != nullptr, system_error(unfinished));
  std::fprintf(file, "%d\n", port);
  require(std::fclose(file) == 0 && std::rename(unfinished.c_str(), path.c_str()) == 0,
          system_error(path));
}

std::string read_file(const std::string& path) {
  std::ifstream file(path);
  require(file.good(), system_error(path));
  return {std::istreambuf_iterator<char>(file), {}};
}

struct Options {
  std::string scenario;  // a file's name, or empty
  int port = 0;
  std::string port_file;
  int timeout_seconds = 10;
};

// Ends the program if it was called wrongly.
Options options_of(int argc, char** argv) {
  Options options;
  for (int i = 1; i < argc; i += 2) {
    const std::string option = argv[i];
    if (i + 1 < argc && option == "--scenario") {
      options.scenario = argv[i + 1];
    } else if (i + 1 < argc && option == "--port") {
      options.port = parse_number("--port", argv[i + 1], 0, 65535);
    } else if (i + 1 < argc && option == "--port-file") {
      options.port_file = argv[i + 1];
    } else if (i + 1 < argc && option == "--timeout") {
      options.timeout_seconds = parse_number("--timeout", argv[i + 1], 1, kSessionSeconds);
    } else {
      std::fprintf(stderr,
                   "usage: front_end [--scenario FILE] [--port PORT] [--port-file FILE] "
                   "[--timeout SECONDS]\n");
      std::exit(2);
    }
  }
  return options;
}

void serve(const Options& options) {
  const std::string scenario = options.scenario.empty() ? "" : read_file(options.scenario);
  const std::unique_ptr<qel_testkit_t, decltype(&qel_testkit_release)> kit(
      qel_testkit_new(scenario.c_str()), &qel_testkit_release);
  require(kit != nullptr, "out of memory");
  const auto report = [&kit] { return std::string(qel_testkit_report(kit.get())); };
  require(report().empty(), report());
  const int listener = listen_on(options.port);
  std::printf("service: its front end listens on 127.0.0.1:%d\n", port_of(listener));
  if (!options.port_file.empty()) {
    write_port_file(options.port_file, port_of(listener));
  }
  Transcript transcript;
  int chat_messages = 0;
  const auto show = [&](const Shown& shown) {
    chat_messages += shown.name == ChatRequest::descriptor()->name() ? 1 : 0;
    transcript.print(shown, shown.is_from_plugin && !report().empty());
  };
  require(serve_one(listener, options.timeout_seconds, kit.get(), show),
          "the connection broke or fell silent");
  // What else is missing after a mistake does not matter.
  const bool is_good = report().empty() && qel_testkit_end(kit.get());
  require(is_good, report().substr(0, report().find('\n')));
  std::printf("service: session complete, %d chat messages\n", chat_messages);
}

}  // namespace

int main(int argc, char** argv) {
  const Options options = options_of(argc, argv);
  std::setvbuf(stdout, nullptr, _IOLBF, 0);  // in step with the plug-in
  alarm(kSessionSeconds);
  try {
    serve(options);
  } catch (const WrongExchange& problem) {
    std::fprintf(stderr, "front_end: %s\n", problem.what());
    return 1;
  }
  google::protobuf::ShutdownProtobufLibrary();
  return 0;
}
