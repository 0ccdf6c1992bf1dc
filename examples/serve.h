// A test kit on a TCP connection, with the example's framing.
#ifndef EXAMPLES_SERVE_H
#define EXAMPLES_SERVE_H

#include <functional>
#include <stdexcept>
#include <string>

#include "qel-testkit.h"

// The session did not go as it should, or the connection failed.
struct WrongExchange : std::runtime_error {
  using std::runtime_error::runtime_error;
};

void require(bool holds, const std::string& what);

// "what: " and the system's reason for the last failure.
std::string system_error(const std::string& what);

// A listening socket on 127.0.0.1; port 0 stands for any that is free.
int listen_on(int port);
int port_of(int listener);

// A message that the kit has taken or handed out.
struct Shown {
  bool is_from_plugin;
  const char* name;
  const unsigned char* data;
  int size;
};

// Waits for one connection, and serves it until the plug-in closes it or something went wrong,
// which the kit knows. Shows every message. Waits so long for the plug-in to come, for a message
// that it has begun, and for the next one if nothing is due meanwhile: returns false if none came.
// Throws WrongExchange if the connection fails.
bool serve_one(int listener, int timeout_seconds, qel_testkit_t* kit,
               const std::function<void(const Shown&)>& show);

#endif
