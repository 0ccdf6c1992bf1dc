// A module in C++ that takes the C interface: answers an echo probe.
#include <cstdint>
#include <cstdlib>
#include <iostream>

#include "qel-message-serialize.h"

int main() {
  const unsigned char probe[] = {0x08, 0x07};
  std::int64_t request_id = -1;
  unsigned char* answer = nullptr;
  int size = 0;

  client_echo_deserialize(probe, sizeof probe, &request_id);
  if (client_echo_reply_serialize(request_id, &answer, &size) != 0) {
    return 1;
  }
  std::cout << "probe " << request_id << ", answer of " << size << " bytes\n";
  std::free(answer);
}
