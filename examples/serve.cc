#include "serve.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "framing.h"

namespace {

using Show = std::function<void(const Shown&)>;

// A descriptor that is closed in the end.
class Connection {
 public:
  explicit Connection(int socket) : socket_(socket) {}
  ~Connection() { close(socket_); }
  Connection(const Connection&) = delete;
  Connection& operator=(const Connection&) = delete;
  int socket() const { return socket_; }

 private:
  int socket_;
};

int accept_one(int listener, int timeout_seconds) {
  pollfd waiting{listener, POLLIN, 0};
  require(poll(&waiting, 1, timeout_seconds * 1000) == 1, "nobody came");
  const int connection = accept(listener, nullptr, nullptr);
  require(connection >= 0 && frame_set_timeout(connection, timeout_seconds) == 0,
          system_error("no connection"));
  return connection;
}

// Sends what is due. Returns after how many milliseconds something else is, or -1. What a plug-in
// does not receive because it has gone, the kit misses if it needs an answer.
int64_t send_due(int socket, qel_testkit_t* kit, const Show& show) {
  qel_testkit_delivery_t delivery;
  while (qel_testkit_next(kit, &delivery)) {
    show({false, delivery.message, delivery.data, delivery.size});
    errno = 0;
    require(frame_send(socket, delivery.message, delivery.data, delivery.size) == 0 ||
                errno == EPIPE || errno == ECONNRESET,
            "a message could not be sent");
  }
  return delivery.after_ms;
}

// Waits so long at most, and tells the kit how long it was. Returns what poll() does: 1 if
// something came, 0 if nothing did, -1 if a signal ended the wait.
int wait_for_plugin(int socket, qel_testkit_t* kit, int64_t milliseconds) {
  using std::chrono::steady_clock;
  const auto begin = steady_clock::now();
  pollfd waiting{socket, POLLIN, 0};
  const int came = poll(&waiting, 1, static_cast<int>(std::min<int64_t>(milliseconds, INT32_MAX)));
  const auto passed =
      std::chrono::duration_cast<std::chrono::milliseconds>(steady_clock::now() - begin);
  qel_testkit_wait(kit, passed.count());
  return came;
}

// Also if it was closed before the plug-in had read everything, which breaks it.
bool is_closed(int socket) {
  char byte = 0;
  return recv(socket, &byte, 1, MSG_PEEK) <= 0;
}

void receive(int socket, qel_testkit_t* kit, const Show& show) {
  frame_t frame;
  const int status = frame_receive(socket, &frame);
  const std::unique_ptr<unsigned char, decltype(&std::free)> bytes(frame.message, &std::free);
  require(status == 1, "the connection broke or fell silent");
  qel_testkit_sent(kit, frame.name, bytes.get(), frame.size);
  show({true, frame.name, bytes.get(), frame.size});
}

}  // namespace

void require(bool holds, const std::string& what) {
  if (!holds) {
    throw WrongExchange(what);
  }
}

std::string system_error(const std::string& what) {
  return what + ": " + std::strerror(errno);
}

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
                                     " is taken: choose another, or 0 for any that is free");
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

bool serve_one(int listener, int timeout_seconds, qel_testkit_t* kit, const Show& show) {
  const Connection connection(accept_one(listener, timeout_seconds));
  const int socket = connection.socket();
  close(listener);
  while (*qel_testkit_report(kit) == '\0') {
    const int64_t after = send_due(socket, kit, show);
    const int came =
        wait_for_plugin(socket, kit, after < 0 ? int64_t{timeout_seconds} * 1000 : after);
    if (came == 0 && after < 0) {
      return false;
    }
    if (came == 1) {
      if (is_closed(socket)) {
        return true;
      }
      receive(socket, kit, show);
    }
  }
  send_due(socket, kit, show);  // such as a refusal
  return true;
}
