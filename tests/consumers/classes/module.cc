// A module in C++ that takes the exported classes and the C interface: sends itself an echo probe.
#include <cstdint>
#include <iostream>
#include <string>

#include "msgspec_frontend.pb.h"
#include "qel-message-serialize.h"

int main() {
  ClientEcho echo;
  echo.set_requestid(7);
  std::string probe;
  if (!echo.SerializeToString(&probe)) {
    return 1;
  }
  std::int64_t request_id = -1;
  client_echo_deserialize(reinterpret_cast<const unsigned char*>(probe.data()),
                          static_cast<int>(probe.size()), &request_id);
  std::cout << ClientEcho::descriptor()->name() << " " << request_id << "\n";
}
