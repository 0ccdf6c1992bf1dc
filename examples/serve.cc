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

// Sends what is due. Returns after how many milliseconds something else is, or -1.
int64_t send_due(int socket, qel_testkit_t* kit, const Show& show) {
  qel_testkit_delivery_t delivery;
  while (qel_testkit_next(kit, &delivery)) {
    show({false, delivery.message, delivery.data, delivery.size});
    require(frame_send(socket, delivery.message, delivery.data, delivery.size) == 0,
            "a message could not be sent");
  }
  return delivery.after_ms;
}

// Waits so long at most, and tells the kit how long it was. Returns whether something came.
bool wait_for_plugin(int socket, qel_testkit_t* kit, int64_t milliseconds) {
  using std::chrono::steady_clock;
  const auto begin = steady_clock::now();
  pollfd waiting{socket, POLLIN, 0};
  const bool came = poll(&waiting, 1, static_cast<int>(milliseconds)) == 1;
  const auto passed =
      std::chrono::duration_cast<std::chrono::milliseconds>(steady_clock::now() - begin);
  qel_testkit_wait(kit, passed.count());
  return came;
}

// False at the connection's end.
bool receive(int socket, qel_testkit_t* kit, const Show& show) {
  frame_t frame;
  const int status = frame_receive(socket, &frame);
  const std::unique_ptr<unsigned char, decltype(&std::free)> bytes(frame.message, &std::free);
  require(status >= 0, "the connection broke or fell silent");
  if (status == 1) {
    show({true, frame.name, bytes.get(), frame.size});
    qel_testkit_sent(kit, frame.name, bytes.get(), frame.size);
  }
  return status == 1;
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

void serve_one(int listener, int timeout_seconds, qel_testkit_t* kit, const Show& show) {
  if (*qel_testkit_report(kit) != '\0') {
    return;  // there is nothing that it could play
  }
  const Connection connection(accept_one(listener, timeout_seconds));
  const int socket = connection.socket();
  const int64_t timeout = int64_t{timeout_seconds} * 1000;
  bool is_open = true;
  close(listener);
  while (is_open && *qel_testkit_report(kit) == '\0') {
    const int64_t after = send_due(socket, kit, show);
    const bool came = wait_for_plugin(socket, kit, after < 0 ? timeout : std::min(after, timeout));
    require(came || (after >= 0 && after <= timeout), "the connection broke or fell silent");
    is_open = !came || receive(socket, kit, show);
  }
  send_due(socket, kit, show);  // such as a refusal
}
