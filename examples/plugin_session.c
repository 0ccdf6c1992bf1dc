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

/* ---- The connection */

static int authenticate(session_t* session, const char* access_token) {
  if (exchange(session, "ChannelAuthRequest",
               qel_channel_auth_request_write(&session->message, ++session->last_request_id, 5001,
                                              77, "org.example.chat", access_token),
               "ChannelAuthReply") != 0) {
    return -1;
  }
  return take_result(session, "channel authentication", qel_channel_auth_reply_read);
}

static int read_clock(session_t* session) {
  QEL_SCOPED(current_time, now);
  const frame_t* frame = &session->received;
  char printed[32] = "unknown";

  if (exchange(session, "CurrentTimeRequest",
               qel_current_time_request_write(&session->message, ++session->last_request_id),
               "CurrentTimeReply") != 0 ||
      check_reply(session, "current time", qel_current_time_read(&now, frame->message, frame->size),
                  &now.reply, RESULT_OK) != 0) {
    return -1;
  }
  if (now.currentTimeMillis >= 0) {
    time_t seconds = (time_t)(now.currentTimeMillis / 1000);
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

/* Some of the receivers may be refused. Then the chatroom is created without them, and the reply
   lists them, one list for each reason. */
static int create_chatroom(session_t* session, const char* title, int64_t* chatroom) {
  static const int64_t receivers[] = {6001, 6002, 6003, 6004, 6005, 999};
  QEL_SCOPED(create_chatroom_reply, created);
  const frame_t* frame = &session->received;

  if (exchange(session, "CreateChatroomRequest",
               qel_create_chatroom_request_write(
                   &session->message, ++session->last_request_id, QEL_CHAT_TYPE_GROUP, receivers,
                   (int)(sizeof receivers / sizeof receivers[0]), title),
               "CreateChatroomReply") != 0 ||
      check_reply(session, "chatroom",
                  qel_create_chatroom_reply_read(&created, frame->message, frame->size),
                  &created.reply, QEL_RESULT_REFUSED_1001) != 0) {
    return -1;
  }
  print_users("no such user", created.invalidReceivers, created.invalidReceiversCount);
  print_users("disabled", created.disabledReceivers, created.disabledReceiversCount);
  print_violations(created.didViolationUsers, created.didViolationUsersCount);
  print_users("invitations denied", created.invitationDenied, created.invitationDeniedCount);
  *chatroom = created.reply.chatroomId;
  printf("plug-in: chatroom %lld created, its messages live %d\n", (long long)*chatroom,
         created.msgTtl);
  return 0;
}

static void print_marks(const char* what, qel_message_watermarkentry_t* const* marks, int count) {
  int i;
  for (i = 0; i < count; ++i) {
    printf("plug-in:   user %lld has %s message %lld\n", (long long)marks[i]->userId, what,
           (long long)marks[i]->msgId);
  }
}

static int enter_chatroom(session_t* session, int64_t chatroom) {
  const bool auto_allow = true;
  const int entries = 100;
  QEL_SCOPED(allow_chat_reply, room);
  const frame_t* frame = &session->received;
  int i;

  if (exchange(session, "AllowChatRequest",
               qel_allow_chat_request_write(&session->message, ++session->last_request_id, chatroom,
                                            &auto_allow, entries, true, 0, true, 0, true, true),
               "AllowChatReply") != 0 ||
      check_reply(session, "entry", qel_allow_chat_reply_read(&room, frame->message, frame->size),
                  &room.reply, RESULT_OK) != 0) {
    return -1;
  }
  printf("plug-in: chatroom %lld is \"%s\", its messages live %d\n",
         (long long)room.reply.chatroomId, room.title != NULL ? room.title : "", room.msgTtl);
  for (i = 0; i < room.memberCount; ++i) {
    printf("plug-in:   member %lld, %s, %s\n", (long long)room.members[i]->userId,
           room.members[i]->name, room.members[i]->available != 0 ? "available" : "not available");
  }
  print_marks("received", room.deliveryAckEntries, room.deliveryAckCount);
  print_marks("read", room.readAckEntries, room.readAckCount);
  return 0;
}

/* Changes the title or the lifetime: the one that is not NULL. */
static int change_chatroom(session_t* session, int64_t chatroom, const char* title,
                           const int* lifetime) {
  if (exchange(session, "ChangeChatroomMetaRequest",
               qel_change_chatroom_meta_request_write(&session->message, ++session->last_request_id,
                                                      chatroom, title, lifetime),
               "ChangeChatroomMetaReply") != 0) {
    return -1;
  }
  return take_result(session, title != NULL ? "title" : "lifetime",
                     qel_change_chatroom_meta_reply_read);
}

/* As with a new chatroom, the others are invited if some are refused, for two more reasons. */
static int invite(session_t* session, int64_t chatroom) {
  static const int64_t members[] = {6001, 6003, 6004, 6005, 6006, 6007, 999};
  QEL_SCOPED(invite_reply, invited);
  const frame_t* frame = &session->received;

  if (exchange(
          session, "InviteRequest",
          qel_invite_chat_request_write(&session->message, ++session->last_request_id, chatroom,
                                        members, (int)(sizeof members / sizeof members[0])),
          "InviteReply") != 0 ||
      check_reply(session, "invitation",
                  qel_invite_reply_read(&invited, frame->message, frame->size), &invited.reply,
                  QEL_RESULT_REFUSED_3003) != 0) {
    return -1;
  }
  print_users("no such user", invited.invalidReceivers, invited.invalidReceiversCount);
  print_users("interrupted", invited.interruptedReceivers, invited.interruptedReceiversCount);
  print_users("disabled", invited.disabledReceivers, invited.disabledReceiversCount);
  print_users("already a member", invited.existingChatmembers, invited.existingChatmembersCount);
  print_violations(invited.didViolationUsers, invited.didViolationUsersCount);
  print_users("invitations denied", invited.invitationDenied, invited.invitationDeniedCount);
  return 0;
}

static int end_chats(session_t* session, int64_t chatroom) {
  const qel_message_endchatentry_t entries[] = {
      {.chatroomId = chatroom, .denyInvitation = false},
      {.chatroomId = 41, .denyInvitation = true}, /* of an earlier day */
  };
  if (exchange(
          session, "EndChatRequest",
          qel_end_chat_request_write(&session->message, ++session->last_request_id, entries, 2),
          "EndChatReply") != 0) {
    return -1;
  }
  return take_result(session, "end of chats", qel_end_chat_reply_read);
}

/* ---- Messages */

static int send_chat_message(session_t* session, int64_t chatroom, int64_t message_id,
                             const char* text) {
  const int lifetime = 0;
  QEL_SCOPED(chat_reply, chat);
  const frame_t* frame = &session->received;
  bool is_confirmed = false;
  int i;

  if (exchange(session, "ChatRequest",
               qel_chat_request_write(&session->message, ++session->last_request_id, chatroom,
                                      message_id, QEL_MSG_TYPE_TEXT, text, lifetime),
               "ChatReply") != 0 ||
      check_reply(session, "chat message", qel_chat_reply_read(&chat, frame->message, frame->size),
                  &chat.reply, RESULT_OK) != 0) {
    return -1;
  }
  for (i = 0; i < chat.count; ++i) {
    printf("plug-in: message %lld recorded at %lld\n", (long long)chat.msgIds[i],
           (long long)chat.sentTimes[i]);
    is_confirmed = is_confirmed || chat.msgIds[i] == message_id;
  }
  return is_confirmed && chat.reply.chatroomId == chatroom
             ? 0
             : failed("the service did not confirm the message");
}

/* The library refuses a text of more than 40000 bytes; nothing is sent then. */
static int try_too_long_message(session_t* session, int64_t chatroom) {
  char* text = malloc(TOO_LONG + 1);
  qel_status_t status;
  if (text == NULL) {
    return failed("out of memory");
  }
  memset(text, 'x', TOO_LONG);
  text[TOO_LONG] = '\0';
  status = qel_chat_request_write(&session->message, session->last_request_id + 1, chatroom, 9003,
                                  QEL_MSG_TYPE_TEXT, text, 0);
  free(text);
  if (status != QEL_BAD_ARGUMENT) {
    return failed("a text of 40001 bytes was not refused");
  }
  printf("plug-in: a text of %d bytes is too long and was not sent\n", TOO_LONG);
  return 0;
}

/* Reports the last message that was pushed as read. */
static int report_read(session_t* session) {
  if (exchange(session, "ReadMessageRequest",
               qel_read_message_request_write(&session->message, ++session->last_request_id,
                                              session->last_push.chatroomId,
                                              &session->last_push.inboxEntry),
               "ReadMessageReply") != 0) {
    return -1;
  }
  return take_result(session, "read receipt", qel_read_message_reply_read);
}

/* Takes one page of stored messages and acknowledges it; with a key that asks for the next page. */
static int take_page(session_t* session, int page_size, bool* has_next) {
  QEL_SCOPED(forward_unread_message, page);
  const frame_t* frame = &session->received;
  int i;

  if (await_message(session, "ForwardUnreadMessage") != 0) {
    return -1;
  }
  if (qel_forward_unread_message_read(&page, frame->message, frame->size) != QEL_OK) {
    return failed("the page could not be parsed");
  }
  for (i = 0; i < page.count; ++i) {
    const qel_message_inboxentry_t* entry = page.inboxEntries[i];
    printf("plug-in: stored message %lld from user %lld in chatroom %lld: \"%s\"\n",
           (long long)entry->msgId, (long long)entry->sender, (long long)entry->chatroomId,
           shown_text(entry));
  }
  *has_next = page.nextPaginationKey != NULL;
  return send_message(session, "ForwardUnreadMessageReply",
                      qel_forward_unread_message_reply_write(&session->message, page.requestId,
                                                             page.nextPaginationKey, &page_size));
}

/* Asks for the stored messages; they come as pushes, page by page. */
static int fetch_unread(session_t* session) {
  const int page_size = 2;
  bool has_next = true;
  int status;

  if (exchange(session, "GetAllUnreadMessageRequest",
               qel_get_all_unread_message_request_write(&session->message,
                                                        ++session->last_request_id, &page_size),
               "GetAllUnreadMessageReply") != 0) {
    return -1;
  }
  status = take_result(session, "unread messages", qel_get_all_unread_message_reply_read);
  while (status == 0 && has_next) {
    status = take_page(session, page_size, &has_next);
  }
  return status;
}

static int unseal(session_t* session, int64_t chatroom, int64_t sender, int64_t message_id) {
  if (exchange(session, "UnsealMessageRequest",
               qel_unseal_message_request_write(&session->message, ++session->last_request_id,
                                                chatroom, sender, message_id, "opened by hand"),
               "UnsealMessageReply") != 0) {
    return -1;
  }
  return take_result(session, "unsealing", qel_unseal_message_reply_read);
}

/* ---- Typing and calls */

/* Tells that the user types, and waits until somebody else does. */
static int type_together(session_t* session, int64_t chatroom) {
  const int content_type = QEL_CONTENT_TYPE_TEXT;
  const int refresh = 10;
  QEL_SCOPED(typing_updated, typing);
  const frame_t* frame = &session->received;

  if (exchange(session, "IsTyping",
               qel_is_typing_request_write(&session->message, ++session->last_request_id, chatroom,
                                           "typing", &content_type, &refresh),
               "TypingUpdated") != 0) {
    return -1;
  }
  if (qel_typing_updated_read(&typing, frame->message, frame->size) != QEL_OK) {
    return failed("the typing status could not be parsed");
  }
  printf("plug-in: user %lld in chatroom %lld: %s\n", (long long)typing.sender,
         (long long)typing.chatroomId, typing.state != NULL ? typing.state : "unknown");
  return 0;
}

static int log_call(session_t* session, int64_t chatroom) {
  const int seconds = 75;
  if (exchange(session, "SaveCallLogRequest",
               qel_save_call_log_request_write(&session->message, ++session->last_request_id,
                                               chatroom, "call-1", "voice", 5001, 6001, seconds),
               "SaveCallLogReply") != 0) {
    return -1;
  }
  return take_result(session, "call log", qel_save_call_log_reply_read);
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
  session_release(&session);
  close(session.socket);
  return status == 0 ? 0 : 1;
}
