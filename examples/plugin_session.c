/*
 * A message plug-in's day with the service, in plain C: it authenticates its channel, reads the
 * service's clock, creates a chatroom, enters it, sends and receives messages, fetches stored ones,
 * reports what the user has read, that the user types, and a call, changes and leaves chatrooms,
 * and takes the service's pushes whenever they come.
 *
 *   plugin_session PORT [--access-token TEXT] [--timeout SECONDS]
 *
 * talks to the front end that listens on that port of 127.0.0.1, and waits SECONDS at most for each
 * reply. Exits with 0 if every exchange succeeded, with 1 otherwise, and with 2 if it was called
 * wrongly.
 */
#define _POSIX_C_SOURCE 200809L
#include <arpa/inet.h>
#include <netinet/in.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/socket.h>
#include <time.h>
#include <unistd.h>

#include "session.h"

/* The whole session takes no longer, whatever the front end does. */
enum { SESSION_SECONDS = 60 };

/* One byte more than the library sends. */
enum { TOO_LONG = 40001 };

/* Values of the schema's enumerations. */
enum { CHAT_TYPE_GROUP = 1, MSG_TYPE_TEXT = 0, CONTENT_TYPE_TEXT = 0 };

/* ---- The connection */

static int authenticate(session_t* session, const char* access_token) {
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int status = channel_auth_request_serialize(++session->last_request_id, 5001, 77,
                                              "org.example.chat", access_token, &message, &size);

  if (send_message(session, "ChannelAuthRequest", status, message, size) != 0 ||
      await_message(session, "ChannelAuthReply", &reply) != 0) {
    return -1;
  }
  channel_auth_reply_deserialize(reply.message, reply.size, &request_id, &code, &text);
  free(reply.message);
  status = check_result(session, "channel authentication", request_id, code, text, RESULT_OK);
  free(text);
  return status;
}

static int read_clock(session_t* session) {
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t now_millis = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  char printed[32] = "unknown";
  int status = current_time_request_serialize(++session->last_request_id, &message, &size);

  if (send_message(session, "CurrentTimeRequest", status, message, size) != 0 ||
      await_message(session, "CurrentTimeReply", &reply) != 0) {
    return -1;
  }
  current_time_deserialize(reply.message, reply.size, &request_id, &now_millis, &code, &text);
  free(reply.message);
  status = check_result(session, "current time", request_id, code, text, RESULT_OK);
  free(text);
  if (status != 0) {
    return -1;
  }
  if (now_millis >= 0) {
    time_t seconds = (time_t)(now_millis / 1000);
    struct tm utc;
    strftime(printed, sizeof printed, "%Y-%m-%d %H:%M:%S UTC", gmtime_r(&seconds, &utc));
  }
  printf("plug-in: the service's clock says %s\n", printed);
  return 0;
}

/* ---- Chatrooms */

static void print_users(const char* what, const int64_t* users, int count) {
  int i;
  for (i = 0; i < count; ++i) {
    printf("plug-in:   %s: user %lld\n", what, (long long)users[i]);
  }
}

static void print_violations(const qel_message_didviolationuser_t* pairs, int count) {
  int i;
  for (i = 0; i < count; ++i) {
    printf("plug-in:   DID violation: users %lld and %lld\n", (long long)pairs[i].userA,
           (long long)pairs[i].userB);
  }
}

/* Some of the receivers may be refused: the reply lists them, one list for each reason. */
static int create_chatroom(session_t* session, const char* title, int64_t* chatroom) {
  static const int64_t receivers[] = {6001, 6002, 6003, 6004, 6005, 999};
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int lifetime = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int64_t *invalid = NULL, *disabled = NULL, *denied = NULL;
  int invalid_count = 0, disabled_count = 0, violation_count = 0, denied_count = 0;
  qel_message_didviolationuser_t* violations = NULL;
  int status = create_chatroom_request_serialize(
      ++session->last_request_id, CHAT_TYPE_GROUP, receivers,
      (int)(sizeof receivers / sizeof receivers[0]), title, &message, &size);

  if (send_message(session, "CreateChatroomRequest", status, message, size) != 0 ||
      await_message(session, "CreateChatroomReply", &reply) != 0) {
    return -1;
  }
  create_chatroom_reply_deserialize(reply.message, reply.size, &request_id, chatroom, &lifetime,
                                    &code, &text, &invalid, &invalid_count, &disabled,
                                    &disabled_count, &violations, &violation_count, &denied,
                                    &denied_count);
  free(reply.message);
  status = check_result(session, "chatroom", request_id, code, text, RESULT_SOME_REFUSED);
  print_users("no such user", invalid, invalid_count);
  print_users("disabled", disabled, disabled_count);
  print_violations(violations, violation_count);
  print_users("invitations denied", denied, denied_count);
  free(text);
  free(invalid);
  free(disabled);
  free(violations);
  free(denied);
  if (status == 0) {
    printf("plug-in: chatroom %lld created, its messages live %d\n", (long long)*chatroom,
           lifetime);
  }
  return status;
}

/* Prints and releases one list of marks. */
static void take_marks(const char* what, qel_message_watermarkentry_t** marks, int count) {
  int i;
  for (i = 0; i < count; ++i) {
    printf("plug-in:   user %lld has %s message %lld\n", (long long)marks[i]->userId, what,
           (long long)marks[i]->msgId);
    free(marks[i]);
  }
  free(marks);
}

static int enter_chatroom(session_t* session, int64_t chatroom) {
  const bool auto_allow = true;
  const int entries = 100;
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t replied_chatroom = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  qel_message_watermarkentry_t **deliveries = NULL, **reads = NULL;
  qel_message_chatroommember_t** members = NULL;
  int delivery_count = 0, read_count = 0, member_count = 0;
  int64_t last_delivery = 0, last_read = 0;
  char* title = NULL;
  int lifetime = NOT_WRITTEN;
  int i;
  int status = allow_chat_request_serialize(++session->last_request_id, chatroom, &auto_allow,
                                            entries, true, 0, true, 0, true, true, &message, &size);

  if (send_message(session, "AllowChatRequest", status, message, size) != 0 ||
      await_message(session, "AllowChatReply", &reply) != 0) {
    return -1;
  }
  allow_chat_reply_deserialize(reply.message, reply.size, &request_id, &replied_chatroom, &code,
                               &text, &deliveries, &delivery_count, &last_delivery, &reads,
                               &read_count, &last_read, &members, &member_count, &title, &lifetime);
  free(reply.message);
  status = check_result(session, "entry", request_id, code, text, RESULT_OK);
  if (status == 0) {
    printf("plug-in: chatroom %lld is \"%s\", its messages live %d\n", (long long)replied_chatroom,
           title != NULL ? title : "", lifetime);
  }
  for (i = 0; i < member_count; ++i) {
    printf("plug-in:   member %lld, %s, %s\n", (long long)members[i]->userId, members[i]->name,
           members[i]->available != 0 ? "available" : "not available");
    free(members[i]->name);
    free(members[i]);
  }
  free(members);
  take_marks("received", deliveries, delivery_count);
  take_marks("read", reads, read_count);
  free(text);
  free(title);
  return status;
}

/* Changes the title or the lifetime: the one that is not NULL. */
static int change_chatroom(session_t* session, int64_t chatroom, const char* title,
                           const int* lifetime) {
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t replied_chatroom = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int status = change_chatroom_meta_request_serialize(++session->last_request_id, chatroom, title,
                                                      lifetime, &message, &size);

  if (send_message(session, "ChangeChatroomMetaRequest", status, message, size) != 0 ||
      await_message(session, "ChangeChatroomMetaReply", &reply) != 0) {
    return -1;
  }
  change_chatroom_meta_reply_deserialize(reply.message, reply.size, &request_id, &replied_chatroom,
                                         &code, &text);
  free(reply.message);
  status = check_result(session, title != NULL ? "title" : "lifetime", request_id, code, text,
                        RESULT_OK);
  free(text);
  return status;
}

/* As with a new chatroom, some may be refused, for two more reasons. */
static int invite(session_t* session, int64_t chatroom) {
  static const int64_t members[] = {6001, 6003, 6004, 6005, 6006, 6007, 999};
  const int member_count = (int)(sizeof members / sizeof members[0]);
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t replied_chatroom = NOT_WRITTEN;
  int64_t sent_time = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int64_t *invalid = NULL, *interrupted = NULL, *disabled = NULL, *existing = NULL, *denied = NULL;
  int invalid_count = 0, interrupted_count = 0, disabled_count = 0, existing_count = 0;
  int violation_count = 0, denied_count = 0;
  qel_message_didviolationuser_t* violations = NULL;
  int status = invite_chat_request_serialize(++session->last_request_id, chatroom, members,
                                             &member_count, &message, &size);

  if (send_message(session, "InviteRequest", status, message, size) != 0 ||
      await_message(session, "InviteReply", &reply) != 0) {
    return -1;
  }
  invite_reply_deserialize(reply.message, reply.size, &request_id, &replied_chatroom, &sent_time,
                           &code, &text, &invalid, &invalid_count, &interrupted, &interrupted_count,
                           &disabled, &disabled_count, &existing, &existing_count, &violations,
                           &violation_count, &denied, &denied_count);
  free(reply.message);
  status = check_result(session, "invitation", request_id, code, text, RESULT_SOME_NOT_INVITED);
  print_users("no such user", invalid, invalid_count);
  print_users("interrupted", interrupted, interrupted_count);
  print_users("disabled", disabled, disabled_count);
  print_users("already a member", existing, existing_count);
  print_violations(violations, violation_count);
  print_users("invitations denied", denied, denied_count);
  free(text);
  free(invalid);
  free(interrupted);
  free(disabled);
  free(existing);
  free(violations);
  free(denied);
  return status;
}

static int end_chats(session_t* session, int64_t chatroom) {
  qel_message_endchatentry_t entries[2];
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int status;

  entries[0].chatroomId = chatroom;
  entries[0].denyInvitation = false;
  entries[1].chatroomId = 41; /* of an earlier day */
  entries[1].denyInvitation = true;
  status = end_chat_request_serialize(++session->last_request_id, entries, 2, &message, &size);
  if (send_message(session, "EndChatRequest", status, message, size) != 0 ||
      await_message(session, "EndChatReply", &reply) != 0) {
    return -1;
  }
  end_chat_reply_deserialize(reply.message, reply.size, &request_id, &code, &text);
  free(reply.message);
  status = check_result(session, "end of chats", request_id, code, text, RESULT_OK);
  free(text);
  return status;
}

/* ---- Messages */

static int send_chat_message(session_t* session, int64_t chatroom, int64_t message_id,
                             const char* text_to_send) {
  const int lifetime = 0;
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t replied_chatroom = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int count = 0;
  int64_t* ids = NULL;
  int64_t* times = NULL;
  int confirmed = 0;
  int i;
  int status = chat_request_serialize(++session->last_request_id, chatroom, message_id,
                                      MSG_TYPE_TEXT, text_to_send, lifetime, 0, &message, &size);

  if (send_message(session, "ChatRequest", status, message, size) != 0 ||
      await_message(session, "ChatReply", &reply) != 0) {
    return -1;
  }
  chat_reply_deserialize(reply.message, reply.size, &request_id, &replied_chatroom, &code, &text,
                         &count, &ids, &times);
  free(reply.message);
  status = check_result(session, "chat message", request_id, code, text, RESULT_OK);
  for (i = 0; i < count; ++i) {
    printf("plug-in: message %lld recorded at %lld\n", (long long)ids[i], (long long)times[i]);
    confirmed = confirmed || ids[i] == message_id;
  }
  free(text);
  free(ids);
  free(times);
  if (status != 0) {
    return -1;
  }
  return confirmed && replied_chatroom == chatroom
             ? 0
             : failed("the service did not confirm the message");
}

/* The library refuses a text of more than 40000 bytes; nothing is sent then. */
static int try_too_long_message(const session_t* session, int64_t chatroom) {
  unsigned char* message = NULL;
  int size = 0;
  int status;
  char* text = malloc(TOO_LONG + 1);
  if (text == NULL) {
    return failed("out of memory");
  }
  memset(text, 'x', TOO_LONG);
  text[TOO_LONG] = '\0';
  status = chat_request_serialize(session->last_request_id + 1, chatroom, 9003, MSG_TYPE_TEXT, text,
                                  0, 0, &message, &size);
  free(text);
  if (status == 0) {
    free(message);
    return failed("a text of 40001 bytes was accepted");
  }
  printf("plug-in: a text of %d bytes is too long and was not sent\n", TOO_LONG);
  return 0;
}

/* Reports the last message that was pushed as read. */
static int report_read(session_t* session) {
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t replied_chatroom = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int status =
      read_message_request_serialize(++session->last_request_id, session->last_message.chatroomId,
                                     &session->last_message, &message, &size);

  if (send_message(session, "ReadMessageRequest", status, message, size) != 0 ||
      await_message(session, "ReadMessageReply", &reply) != 0) {
    return -1;
  }
  read_message_reply_deserialize(reply.message, reply.size, &request_id, &replied_chatroom, &code,
                                 &text);
  free(reply.message);
  status = check_result(session, "read receipt", request_id, code, text, RESULT_OK);
  free(text);
  return status;
}

/* Takes one page of stored messages and acknowledges it; with a key that asks for the next page. */
static int take_page(session_t* session, int page_size, bool* has_next) {
  frame_t page;
  int64_t request_id = NOT_WRITTEN;
  qel_message_inboxentry_t** entries = NULL;
  int count = 0;
  char* next_key = NULL;
  const char* sent_key;
  unsigned char* message = NULL;
  int size = 0;
  int i;
  int status;

  if (await_message(session, "ForwardUnreadMessage", &page) != 0) {
    return -1;
  }
  forward_unread_message_deserialize(page.message, page.size, &request_id, &entries, &count,
                                     &next_key);
  free(page.message);
  if (request_id == NOT_WRITTEN) {
    return failed("the page could not be parsed");
  }
  if (entries == NULL) {
    count = 0; /* nothing stored, or no memory */
  }
  for (i = 0; i < count; ++i) {
    printf("plug-in: stored message %lld from user %lld in chatroom %lld: \"%s\"\n",
           (long long)entries[i]->msgId, (long long)entries[i]->sender,
           (long long)entries[i]->chatroomId, shown_text(entries[i]));
    free(entries[i]->chatMsg);
    free(entries[i]);
  }
  free(entries);
  *has_next = next_key != NULL;
  sent_key = next_key;
  status =
      forward_unread_message_reply_serialize(request_id, &sent_key, &page_size, &message, &size);
  free(next_key);
  return send_message(session, "ForwardUnreadMessageReply", status, message, size);
}

/* Asks for the stored messages; they come as pushes, page by page. */
static int fetch_unread(session_t* session) {
  const int page_size = 2;
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  bool has_next = true;
  int status = get_all_unread_message_request_serialize(++session->last_request_id, &page_size,
                                                        &message, &size);

  if (send_message(session, "GetAllUnreadMessageRequest", status, message, size) != 0 ||
      await_message(session, "GetAllUnreadMessageReply", &reply) != 0) {
    return -1;
  }
  get_all_unread_message_reply_deserialize(reply.message, reply.size, &request_id, &code, &text);
  free(reply.message);
  status = check_result(session, "unread messages", request_id, code, text, RESULT_OK);
  free(text);
  while (status == 0 && has_next) {
    status = take_page(session, page_size, &has_next);
  }
  return status;
}

static int unseal(session_t* session, int64_t chatroom, int64_t sender, int64_t message_id) {
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int64_t replied_chatroom = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int status = unseal_message_request_serialize(++session->last_request_id, chatroom, sender,
                                                message_id, "opened by hand", &message, &size);

  if (send_message(session, "UnsealMessageRequest", status, message, size) != 0 ||
      await_message(session, "UnsealMessageReply", &reply) != 0) {
    return -1;
  }
  unseal_message_reply_deserialize(reply.message, reply.size, &request_id, &replied_chatroom, &code,
                                   &text);
  free(reply.message);
  status = check_result(session, "unsealing", request_id, code, text, RESULT_OK);
  free(text);
  return status;
}

/* ---- Typing and calls */

/* Tells that the user types, and waits until somebody else does. */
static int type_together(session_t* session, int64_t chatroom) {
  const int content_type = CONTENT_TYPE_TEXT;
  const int refresh = 10;
  unsigned char* message = NULL;
  int size = 0;
  frame_t push;
  int64_t request_id = NOT_WRITTEN;
  int64_t typing_chatroom = 0;
  int64_t sender = 0;
  char* state = NULL;
  int typed_content = NOT_WRITTEN;
  int typed_refresh = NOT_WRITTEN;

  /* This serializer returns no status: the buffer tells whether it failed. */
  is_typing_request_serialize(++session->last_request_id, chatroom, "typing", &content_type,
                              &refresh, &message, &size);
  if (send_message(session, "IsTyping", message != NULL ? 0 : -1, message, size) != 0 ||
      await_message(session, "TypingUpdated", &push) != 0) {
    return -1;
  }
  typing_updated_deserialize(push.message, push.size, &request_id, &typing_chatroom, &sender,
                             &state, &typed_content, &typed_refresh);
  free(push.message);
  if (request_id == NOT_WRITTEN) {
    return failed("the typing status could not be parsed");
  }
  printf("plug-in: user %lld in chatroom %lld: %s\n", (long long)sender, (long long)typing_chatroom,
         state != NULL ? state : "unknown");
  free(state);
  return 0;
}

static int log_call(session_t* session, int64_t chatroom) {
  const int seconds = 75;
  unsigned char* message = NULL;
  int size = 0;
  frame_t reply;
  int64_t request_id = NOT_WRITTEN;
  int code = NOT_WRITTEN;
  char* text = NULL;
  int status = save_call_log_request_serialize(++session->last_request_id, chatroom, "call-1",
                                               "voice", 5001, 6001, seconds, &message, &size);

  if (send_message(session, "SaveCallLogRequest", status, message, size) != 0 ||
      await_message(session, "SaveCallLogReply", &reply) != 0) {
    return -1;
  }
  save_call_log_reply_deserialize(reply.message, reply.size, &request_id, &code, &text);
  free(reply.message);
  status = check_result(session, "call log", request_id, code, text, RESULT_OK);
  free(text);
  return status;
}

/* ---- The day */

static int run_session(session_t* session, const char* access_token) {
  const int lifetime = 7200;
  int64_t chatroom = 0;

  if (authenticate(session, access_token) != 0 || read_clock(session) != 0 ||
      create_chatroom(session, "Lunch", &chatroom) != 0 || enter_chatroom(session, chatroom) != 0 ||
      send_chat_message(session, chatroom, 9001, "Hello from the plug-in") != 0 ||
      send_chat_message(session, chatroom, 9002,
                        "Gr\xc3\xbc\xc3\x9f"
                        "e \xe2\x98\x95") != 0 ||
      try_too_long_message(session, chatroom) != 0 || report_read(session) != 0 ||
      fetch_unread(session) != 0 || unseal(session, chatroom, 6002, 8003) != 0 ||
      type_together(session, chatroom) != 0 || log_call(session, chatroom) != 0 ||
      change_chatroom(session, chatroom, "Lunch on Friday", NULL) != 0 ||
      change_chatroom(session, chatroom, NULL, &lifetime) != 0 || invite(session, chatroom) != 0 ||
      end_chats(session, chatroom) != 0) {
    return -1;
  }
  printf("plug-in: session complete\n");
  return 0;
}

/* Returns the socket, or -1 after a line on standard error. */
static int connect_to(int port, int timeout_seconds) {
  struct sockaddr_in address;
  int connection = socket(AF_INET, SOCK_STREAM, 0);
  memset(&address, 0, sizeof address);
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = htons((uint16_t)port);
  if (connection < 0 || connect(connection, (struct sockaddr*)&address, sizeof address) != 0 ||
      frame_set_timeout(connection, timeout_seconds) != 0) {
    perror("plug-in: connection to the front end");
    if (connection >= 0) {
      close(connection);
    }
    return -1;
  }
  return connection;
}

/* Ends the program. */
static void usage(void) {
  fprintf(stderr, "usage: plugin_session PORT [--access-token TEXT] [--timeout SECONDS]\n");
  exit(2);
}

/* The number in the text, 1 to most; ends the program if it is no such number. */
static int parse_number(const char* text, long most) {
  char* end = NULL;
  const long number = strtol(text, &end, 10);
  if (end == text || *end != '\0' || number < 1 || number > most) {
    usage();
  }
  return (int)number;
}

int main(int argc, char** argv) {
  const char* access_token = "example-access-token";
  int timeout_seconds = 10;
  session_t session;
  int port;
  int status;
  int i;

  if (argc < 2 || argc % 2 != 0) {
    usage();
  }
  port = parse_number(argv[1], 65535);
  for (i = 2; i < argc; i += 2) {
    if (strcmp(argv[i], "--access-token") == 0) {
      access_token = argv[i + 1];
    } else if (strcmp(argv[i], "--timeout") == 0) {
      timeout_seconds = parse_number(argv[i + 1], SESSION_SECONDS);
    } else {
      usage();
    }
  }
  setvbuf(stdout, NULL, _IOLBF, 0); /* in step with the log and the front end */
  alarm(SESSION_SECONDS);

  memset(&session, 0, sizeof session);
  session.socket = connect_to(port, timeout_seconds);
  if (session.socket < 0) {
    return 1;
  }
  status = run_session(&session, access_token);
  free(session.last_message.chatMsg);
  close(session.socket);
  return status == 0 ? 0 : 1;
}
