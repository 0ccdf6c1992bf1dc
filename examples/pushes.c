/* What the service sends of its own accord, at any time. */
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "session.h"

/* The service probes whether the client is alive; the answer carries the probe's requestId. */
static int answer_echo(session_t* session, const frame_t* push) {
  int64_t request_id = NOT_WRITTEN;
  unsigned char* message = NULL;
  int size = 0;
  int status;

  client_echo_deserialize(push->message, push->size, &request_id);
  if (request_id == NOT_WRITTEN) {
    return failed("the echo probe could not be parsed");
  }
  printf("plug-in: echo probe %lld\n", (long long)request_id);
  status = client_echo_reply_serialize(request_id, &message, &size);
  return send_message(session, "ClientEchoReply", status, message, size);
}

/* A message for the user. The call fills our record, but for the chatroom, which is an output of
   its own. */
static int take_online_message(session_t* session, const frame_t* push) {
  int64_t request_id = NOT_WRITTEN;
  int64_t chatroom = 0;
  int chat_type = 0;
  bool skip_reply = false;
  int error_code = 0;
  char* error_text = NULL;
  const bool mark_as_read = true;
  unsigned char* message = NULL;
  int size = 0;
  int status;
  qel_message_inboxentry_t received;
  qel_message_inboxentry_t* record = &received;

  memset(&received, 0, sizeof received);
  forward_online_message_get_deserialize(push->message, push->size, &request_id, &chatroom,
                                         &chat_type, &record, &skip_reply, &error_code,
                                         &error_text);
  if (request_id == NOT_WRITTEN) {
    return failed("the pushed message could not be parsed");
  }
  received.chatroomId = chatroom;
  received.chatType = chat_type;
  free(session->last_message.chatMsg);
  session->last_message = received;
  printf("plug-in: message %lld from user %lld in chatroom %lld: \"%s\"\n",
         (long long)received.msgId, (long long)received.sender, (long long)chatroom,
         shown_text(&received));
  if (skip_reply) {
    return 0;
  }
  status =
      forward_online_message_reply_serialize(request_id, chatroom, &mark_as_read, &message, &size);
  return send_message(session, "ForwardOnlineMessageReply", status, message, size);
}

int take_push(session_t* session, const frame_t* push) {
  if (strcmp(push->name, "ClientEcho") == 0) {
    return answer_echo(session, push);
  }
  if (strcmp(push->name, "ForwardOnlineMessage") == 0) {
    return take_online_message(session, push);
  }
  return failed("a message came that was not expected");
}
