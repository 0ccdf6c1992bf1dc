/* A plug-in in strict C99, of the installed header alone: answers an echo probe. */
#include <stdio.h>
#include <stdlib.h>

#include "qel-message-serialize.h"

int main(void) {
  const unsigned char probe[] = {0x08, 0x07};
  int64_t request_id = -1;
  unsigned char* answer = NULL;
  int size = 0;

  client_echo_deserialize(probe, (int)sizeof probe, &request_id);
  if (client_echo_reply_serialize(request_id, &answer, &size) != 0) {
    return 1;
  }
  printf("probe %d, answer of %d bytes\n", (int)request_id, size);
  free(answer);
  return 0;
}
