#include "session.h"

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

int failed(const char* what) {
  fprintf(stderr, "plug-in: %s\n", what);
  return -1;
}

int send_message(session_t* session, const char* name, int status, unsigned char* message,
                 int size) {
  int sent;
  if (status != 0) {
    return failed("a message could not be built");
  }
  sent = frame_send(session->socket, name, message, size);
  free(message);
  return sent == 0 ? 0 : failed("a message could not be sent");
}

int await_message(session_t* session, const char* name, frame_t* frame) {
  for (;;) {
    int status;
    if (frame_receive(session->socket, frame) != 1) {
      return failed("the connection ended or fell silent where a message was due");
    }
    if (strcmp(frame->name, name) == 0) {
      return 0;
    }
    status = take_push(session, frame);
    free(frame->message);
    if (status != 0) {
      return -1;
    }
  }
}

const char* shown_text(const qel_message_inboxentry_t* message) {
  return message->msgType == 0 ? message->chatMsg : "(no text)";
}

/* If the id was not written, the reply could not be parsed. If the text was not written, the reply
   has no result, or one without a text. */
int check_result(const session_t* session, const char* what, int64_t request_id, int code,
                 const char* text, int expected_code) {
  if (request_id == NOT_WRITTEN) {
    return failed("the reply could not be parsed");
  }
  if (text == NULL) {
    return failed("the reply does not say how it went");
  }
  printf("plug-in: %s: result %d, \"%s\"\n", what, code, text);
  if (request_id != session->last_request_id) {
    return failed("the reply belongs to another request");
  }
  return code == expected_code ? 0 : failed("the service refused the request");
}
