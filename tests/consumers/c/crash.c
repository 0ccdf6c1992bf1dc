/* A plug-in whose mistake ends it inside the library: an output that must not be NULL is. */
#include <stddef.h>

#include "qel-message-serialize.h"

int main(void) {
  const unsigned char probe[] = {0x08, 0x07};

  client_echo_deserialize(probe, (int)sizeof probe, NULL);
  return 0;
}
