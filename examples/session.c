#include "session.h"

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

void session_release(session_t* session) {
  qel_buffer_release(&session->message);
  qel_forward_online_message_get_release(&session->last_push);
  free(session->received.message);
  session->received.message = NULL;
}

int failed(const char* what) {
  fprintf(stderr, "plug-in: %s\n", what);
  return -1;
}

int send_message(session_t* session, const char* name, qel_status_t written) {
  if (written != QEL_OK) {
    return failed("a message could not be built");
  }
  return frame_send(session->socket, name, session->message.data, session->message.size) == 0
             ? 0
             : failed("a message could not be sent");
}

int await_message(session_t* session, const char* name) {
  for (;;) {
    free(session->received.message);
    if (frame_receive(session->socket, &session->received) != 1) {
      return failed("the connection ended or fell silent where a message was due");
    }
    if (strcmp(session->received.name, name) == 0) {
      return 0;
    }
    if (take_push(session) != 0) {
      return -1;
    }
  }
}

int exchange(session_t* session, const char* request, qel_status_t written, const char* reply) {
  return send_message(session, request, written) == 0 ? await_message(session, reply) : -1;
}

int check_reply(const session_t* session, const char* what, qel_status_t read,
                const qel_reply_t* reply, int expected_code) {
  if (read != QEL_OK) {
    return failed(read == QEL_NO_MEMORY ? "out of memory" : "the reply could not be parsed");
  }
  if (reply->resultMsg == NULL) {
    return failed("the reply does not say how it went");
  }
  printf("plug-in: %s: result %d, \"%s\"\n", what, reply->resultCode, reply->resultMsg);
  if (reply->requestId != session->last_request_id) {
    return failed("the reply belongs to another request");
  }
  return reply->resultCode == expected_code ? 0 : failed("the service refused the request");
}

int take_result(const session_t* session, const char* what,
                qel_status_t (*read)(qel_reply_t* reply, const unsigned char* data, int size)) {
  QEL_SCOPED(reply, reply);
  const qel_status_t status = read(&reply, session->received.message, session->received.size);
  return check_reply(session, what, status, &reply, RESULT_OK);
}

const char* shown_text(const qel_message_inboxentry_t* message) {
  const char* c = message->chatMsg;
  while ((unsigned char)*c >= ' ' || *c == '\n' || *c == '\r' || *c == '\t') {
    ++c;
  }
  return message->msgType == QEL_MSG_TYPE_TEXT && *c == '\0' ? message->chatMsg : "(no text)";
}
