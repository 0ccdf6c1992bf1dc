/* A plug-in in strict C99, of the installed headers alone: answers an echo probe. */
#include <stdio.h>

#include "qel-message.h"

int main(void) {
  const unsigned char probe[] = {0x08, 0x07};
  QEL_SCOPED(client_echo, echo);
  QEL_SCOPED(buffer, answer);

  if (qel_client_echo_read(&echo, probe, (int)sizeof probe) != QEL_OK ||
      qel_client_echo_reply_write(&answer, echo.requestId) != QEL_OK) {
    return 1;
  }
  printf("probe %d, answer of %d bytes\n", (int)echo.requestId, answer.size);
  return 0;
}
