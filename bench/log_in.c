/* The recorder looks for the token of a login in all messages. */

#include <stdlib.h>

#include "qel-message-serialize.h"

__attribute__((constructor)) static void log_in(void) {
  unsigned char* data = NULL;
  int size = 0;
  channel_auth_request_serialize(1, 2, 3, "bench", "0123456789-0123456789-0123456789", &data,
                                 &size);
  free(data);
}
