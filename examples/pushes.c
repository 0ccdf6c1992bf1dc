/* What the service sends of its own accord, at any time. */
#include <stdio.h>
#include <string.h>

#include "session.h"

/* The service probes whether the client is alive; the answer carries the probe's requestId. */
static int answer_echo(session_t* session) {
  QEL_SCOPED(client_echo, echo);

  if (qel_client_echo_read(&echo, session->received.message, session->received.size) != QEL_OK) {
    return failed("the echo probe could not be parsed");
  }
  printf("plug-in: echo probe %lld\n", (long long)echo.requestId);
  return send_message(session, "ClientEchoReply",
                      qel_client_echo_reply_write(&session->message, echo.requestId));
}

/* A message for the user. */
static int take_online_message(session_t* session) {
  const bool mark_as_read = true;
  qel_forward_online_message_get_t* push = &session->last_push;

  if (qel_forward_online_message_get_read(push, session->received.message,
                                          session->received.size) != QEL_OK) {
    return failed("the pushed message could not be parsed");
  }
  printf("plug-in: message %lld from user %lld in chatroom %lld: \"%s\"\n",
         (long long)push->inboxEntry.msgId, (long long)push->inboxEntry.sender,
         (long long)push->chatroomId, shown_text(&push->inboxEntry));
  if (push->skipReply) {
    return 0;
  }
  return send_message(session, "ForwardOnlineMessageReply",
                      qel_forward_online_message_reply_write(&session->message, push->requestId,
                                                             push->chatroomId, &mark_as_read));
}

int take_push(session_t* session) {
  if (strcmp(session->received.name, "ClientEcho") == 0) {
    return answer_echo(session);
  }
  if (strcmp(session->received.name, "ForwardOnlineMessage") == 0) {
    return take_online_message(session);
  }
  return failed("a message came that was not expected");
}
