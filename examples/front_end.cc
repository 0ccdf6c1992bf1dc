// The service's front end of the example: a process of its own, which takes one connection.
//
//   front_end [--port PORT] [--port-file FILE] [--timeout SECONDS]
//
// listens on 127.0.0.1, on a free port unless one is given, and writes the port's number to FILE.
// It waits SECONDS at most for the plug-in to connect, and for each message. It exits with 0 after
// a whole session, with 1 after a wrong exchange or if no plug-in connects, and with 2 if it was
// called wrongly.

#include <arpa/inet.h>
#include <google/protobuf/stubs/common.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "framing.h"
#include "service.h"

namespace {

constexpr int kSessionSeconds = 60;  // at most, whatever the plug-in does

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

// Writes another file and renames it, so that nobody reads a part of the file.
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
    std::printf("service: its front end listens on 127.0.0.1:%d\n", port_of(listener));
    if (!port_file.empty()) {
      write_port_file(port_file, port_of(listener));
    }
    const int connection = accept_one(listener, timeout_seconds);
    close(listener);
    Service(connection).run();
    close(connection);
  } catch (const WrongExchange& problem) {
    std::fprintf(stderr, "front_end: %s\n", problem.what());
    return 1;
  }
  google::protobuf::ShutdownProtobufLibrary();
  return 0;
}
