/*
 * The worked examples of docs/wire-format.md, which is made of this file: its sections, the
 * functions with the message that each sends or receives, and what they say and log when they run.
 *
 *   wire_format FUNCTION
 *
 * runs one of them. What it sends goes to standard output; what it receives comes from standard
 * input.
 */
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "qel-message-serialize.h"

/* The caller's connection: here a file that the page is made of. */
static void send_message(unsigned char* message, int size) {
  fwrite(message, 1, (size_t)size, stdout);
  free(message);
}

/* ---- Connection ----
 * The channel is authenticated before anything else. The access token is not logged, and the tool
 * shows it only if asked to. In these two messages requestId has the number 1; in most others it
 * has 11.
 */

/* ChannelAuthRequest */
static void authenticate(void) {
  unsigned char* message = NULL;
  int size = 0;
  if (channel_auth_request_serialize(1, 5001, 77, "org.example.chat", "an-access-token", &message,
                                     &size) == 0) {
    send_message(message, size);
  }
}

/* ChannelAuthReply
 * requestId: 1 result { code: 0 msg: "welcome" }
 */
static void authenticated(const unsigned char* data, int size) {
  int64_t request_id = -1;
  int code = -1;
  char* text = NULL;
  channel_auth_reply_deserialize(data, size, &request_id, &code, &text);
  printf("request %lld: %d, %s\n", (long long)request_id, code, text);
  free(text);
}

/* ---- Creating a chatroom ----
 * The receivers are a repeated field: one tag for each. In the reply a result of code 1001 brings
 * the receivers that the service refused.
 */

/* CreateChatroomRequest */
static void create_chatroom(void) {
  static const int64_t receivers[] = {6001, 6002, 999};
  unsigned char* message = NULL;
  int size = 0;
  if (create_chatroom_request_serialize(2, 1, receivers, 3, "Lunch", &message, &size) == 0) {
    send_message(message, size);
  }
}

/* CreateChatroomReply
 * requestId: 2 chatroomId: 42 msgTtl: 3600
 * result {
 *   code: 1001 msg: "some were refused"
 *   wrongReceiverDetail {
 *     invalidReceivers: 999
 *     didViolationUsers { userA: 5001 userB: 6002 }
 *   }
 * }
 */
static void chatroom_created(const unsigned char* data, int size) {
  int64_t request_id = -1, chatroom_id = -1;
  int lifetime = -1, code = -1;
  char* text = NULL;
  int64_t *invalid = NULL, *disabled = NULL, *denied = NULL;
  int invalid_count = 0, disabled_count = 0, violation_count = 0, denied_count = 0;
  qel_message_didviolationuser_t* violations = NULL;
  create_chatroom_reply_deserialize(data, size, &request_id, &chatroom_id, &lifetime, &code, &text,
                                    &invalid, &invalid_count, &disabled, &disabled_count,
                                    &violations, &violation_count, &denied, &denied_count);
  printf("chatroom %lld: %d, %s\n", (long long)chatroom_id, code, text);
  if (invalid_count == 1 && invalid != NULL) {
    printf("no receiver: %lld\n", (long long)invalid[0]);
  }
  if (violation_count == 1) {
    printf("not together: %lld and %lld\n", (long long)violations[0].userA,
           (long long)violations[0].userB);
  }
  free(text);
  free(invalid);
  free(disabled);
  free(violations);
  free(denied);
}

/* ---- Sending chat messages ----
 * A chat request has one message, a record of its own. The reply confirms it by its id.
 */

/* ChatRequest */
static void send_text(void) {
  unsigned char* message = NULL;
  int size = 0;
  if (chat_request_serialize(3, 42, 1, 0, "See you at noon", 3600, 0, &message, &size) == 0) {
    send_message(message, size);
  }
}

/* ChatReply
 * requestId: 3 chatroomId: 42 result { code: 0 msg: "ok" }
 * processedMessageEntries { msgId: 1 sentTime: 1700000000000 }
 */
static void text_sent(const unsigned char* data, int size) {
  int64_t request_id = -1, chatroom_id = -1;
  int code = -1, count = 0;
  char* text = NULL;
  int64_t *ids = NULL, *times = NULL;
  chat_reply_deserialize(data, size, &request_id, &chatroom_id, &code, &text, &count, &ids, &times);
  if (count == 1) {
    printf("message %lld recorded at %lld\n", (long long)ids[0], (long long)times[0]);
  }
  free(text);
  free(ids);
  free(times);
}

/* ---- Entering a chatroom ----
 * Page sizes outside 1 to 500 are sent as 500. Delivery marks are not asked for here, so that their
 * time is not sent.
 */

/* AllowChatRequest */
static void enter_chatroom(void) {
  unsigned char* message = NULL;
  int size = 0;
  if (allow_chat_request_serialize(4, 42, NULL, 1000, false, 0, true, 1700000000000, true, true,
                                   &message, &size) == 0) {
    send_message(message, size);
  }
}

/* AllowChatReply
 * requestId: 4 chatroomId: 42 result { code: 0 }
 * title: "Lunch"
 * orderedChatroomMemberList { userId: 6001 available: true name: "Ada" }
 * readAckEntries { userId: 6001 msgId: 1 timestamp: 1700000000500 }
 */
static void chatroom_entered(const unsigned char* data, int size) {
  int64_t request_id = -1, chatroom_id = -1, delivery_time = -1, read_time = -1;
  int code = -1, delivery_count = 0, read_count = 0, member_count = 0, lifetime = -1, i;
  char *text = NULL, *title = NULL;
  qel_message_watermarkentry_t **delivered = NULL, **read = NULL;
  qel_message_chatroommember_t** members = NULL;
  allow_chat_reply_deserialize(data, size, &request_id, &chatroom_id, &code, &text, &delivered,
                               &delivery_count, &delivery_time, &read, &read_count, &read_time,
                               &members, &member_count, &title, &lifetime);
  printf("title: %s; lifetime left as it was: %d\n", title, lifetime);
  for (i = 0; i < member_count; ++i) {
    printf("member: %lld, %s\n", (long long)members[i]->userId, members[i]->name);
    free(members[i]->name);
    free(members[i]);
  }
  for (i = 0; i < read_count; ++i) {
    printf("%lld has read message %lld\n", (long long)read[i]->userId, (long long)read[i]->msgId);
    free(read[i]);
  }
  for (i = 0; i < delivery_count; ++i) {
    free(delivered[i]);
  }
  free(members);
  free(read);
  free(delivered);
  free(title);
  free(text);
}

/* ---- Fetching unread messages, and pushes ----
 * The service pushes a page of stored messages; the plug-in acknowledges it, with the key that
 * came, and asks for the next one.
 */

/* ForwardUnreadMessage
 * requestId: 700001
 * inboxEntries {
 *   msgId: 8 msgType: TEXT sender: 6001 receiver: 5001 sentTime: 1700000000000
 *   chatMsg: "At noon, then" chatroomId: 42 chatType: GROUP
 * }
 * nextPaginationKey: "page-2"
 */
static void page_received(const unsigned char* data, int size) {
  int64_t request_id = -1;
  int count = 0, i;
  qel_message_inboxentry_t** entries = NULL;
  char* key = NULL;
  forward_unread_message_deserialize(data, size, &request_id, &entries, &count, &key);
  for (i = 0; i < count; ++i) {
    printf("message %lld of %lld: %s\n", (long long)entries[i]->msgId,
           (long long)entries[i]->sender, entries[i]->chatMsg);
    free(entries[i]->chatMsg);
    free(entries[i]);
  }
  printf("next: %s\n", key);
  free(entries);
  free(key);
}

/* ForwardUnreadMessageReply */
static void acknowledge_page(void) {
  const char* key = "page-2";
  const int most = 50;
  unsigned char* message = NULL;
  int size = 0;
  if (forward_unread_message_reply_serialize(700001, &key, &most, &message, &size) == 0) {
    send_message(message, size);
  }
}

/* ---- Read receipts and unsealing ----
 * The read message is named by four fields of its record.
 */

/* ReadMessageRequest */
static void tell_that_it_was_read(void) {
  qel_message_inboxentry_t entry;
  unsigned char* message = NULL;
  int size = 0;
  memset(&entry, 0, sizeof entry);
  entry.msgId = 8;
  entry.msgType = 0;
  entry.sender = 6001;
  entry.sentTime = 1700000000000;
  if (read_message_request_serialize(5, 42, &entry, &message, &size) == 0) {
    send_message(message, size);
  }
}

/* ReadMessageReply
 * requestId: 5 chatroomId: 42 result { code: 0 msg: "ok" }
 */
static void read_was_told(const unsigned char* data, int size) {
  int64_t request_id = -1, chatroom_id = -1;
  int code = -1;
  char* text = NULL;
  read_message_reply_deserialize(data, size, &request_id, &chatroom_id, &code, &text);
  printf("request %lld: %d, %s\n", (long long)request_id, code, text);
  free(text);
}

/* ---- Ending chats and inviting members ----
 * A reply about invitations has the same details of refused users as one about a creation, and
 * hands out more of them.
 */

/* InviteRequest */
static void invite(void) {
  static const int64_t users[] = {6003, 6004};
  const int count = 2;
  unsigned char* message = NULL;
  int size = 0;
  if (invite_chat_request_serialize(6, 42, users, &count, &message, &size) == 0) {
    send_message(message, size);
  }
}

/* InviteReply
 * requestId: 6 chatroomId: 42 sentTime: 1700000001000
 * result { code: 3003 msg: "some were not invited" wrongReceiverDetail { disabledReceivers: 6003 }
 * }
 */
static void invited(const unsigned char* data, int size) {
  int64_t request_id = -1, chatroom_id = -1, time = -1;
  int code = -1;
  char* text = NULL;
  int64_t *invalid = NULL, *interrupted = NULL, *disabled = NULL, *existing = NULL, *denied = NULL;
  qel_message_didviolationuser_t* violations = NULL;
  int counts[6] = {0};
  invite_reply_deserialize(data, size, &request_id, &chatroom_id, &time, &code, &text, &invalid,
                           &counts[0], &interrupted, &counts[1], &disabled, &counts[2], &existing,
                           &counts[3], &violations, &counts[4], &denied, &counts[5]);
  printf("%d, %s\n", code, text);
  if (counts[2] == 1) {
    printf("disabled: %lld\n", (long long)disabled[0]);
  }
  free(text);
  free(invalid);
  free(interrupted);
  free(disabled);
  free(existing);
  free(violations);
  free(denied);
}

/* ---- Call log and typing status ----
 * Each of the last three arguments of IsTyping may be left out; it has no reply, and its function
 * no status.
 */

/* IsTyping */
static void type(void) {
  const int content_type = 0;
  unsigned char* message = NULL;
  int size = 0;
  is_typing_request_serialize(7, 42, "typing", &content_type, NULL, &message, &size);
  if (message != NULL) {
    send_message(message, size);
  }
}

/* TypingUpdated
 * requestId: 700002 chatroomId: 42 sender: 6001 state: "typing" contentType: CONTENT_TEXT
 */
static void somebody_types(const unsigned char* data, int size) {
  int64_t request_id = -1, chatroom_id = -1, sender = -1;
  char* state = NULL;
  int content_type = -1, refresh = -1;
  typing_updated_deserialize(data, size, &request_id, &chatroom_id, &sender, &state, &content_type,
                             &refresh);
  printf("%lld: %s; refresh left as it was: %d\n", (long long)sender, state, refresh);
  free(state);
}

/* ---- Changing a chatroom's title or lifetime ----
 * With both, the title alone is sent, and the log has a warning.
 */

/* ChangeChatroomMetaRequest */
static void rename_chatroom(void) {
  const int lifetime = 60;
  unsigned char* message = NULL;
  int size = 0;
  if (change_chatroom_meta_request_serialize(8, 42, "Dinner", &lifetime, &message, &size) == 0) {
    send_message(message, size);
  }
}

/* ChangeChatroomMetaReply
 * requestId: 8 chatroomId: 42
 */
static void chatroom_renamed(const unsigned char* data, int size) {
  int64_t request_id = -1, chatroom_id = -1;
  int code = -1;
  char* text = NULL;
  change_chatroom_meta_reply_deserialize(data, size, &request_id, &chatroom_id, &code, &text);
  printf("request %lld; without a result the code stays %d\n", (long long)request_id, code);
  free(text);
}

/* ---- The program ---- */

static const struct {
  const char* name;
  void (*send)(void);
  void (*receive)(const unsigned char* data, int size);
} functions[] = {
    {"authenticate", authenticate, NULL},
    {"authenticated", NULL, authenticated},
    {"create_chatroom", create_chatroom, NULL},
    {"chatroom_created", NULL, chatroom_created},
    {"send_text", send_text, NULL},
    {"text_sent", NULL, text_sent},
    {"enter_chatroom", enter_chatroom, NULL},
    {"chatroom_entered", NULL, chatroom_entered},
    {"page_received", NULL, page_received},
    {"acknowledge_page", acknowledge_page, NULL},
    {"tell_that_it_was_read", tell_that_it_was_read, NULL},
    {"read_was_told", NULL, read_was_told},
    {"invite", invite, NULL},
    {"invited", NULL, invited},
    {"type", type, NULL},
    {"somebody_types", NULL, somebody_types},
    {"rename_chatroom", rename_chatroom, NULL},
    {"chatroom_renamed", NULL, chatroom_renamed},
};

int main(int argc, char** argv) {
  static unsigned char received[4096];
  size_t i;
  for (i = 0; argc == 2 && i < sizeof functions / sizeof functions[0]; ++i) {
    if (strcmp(argv[1], functions[i].name) != 0) {
      continue;
    }
    if (functions[i].send != NULL) {
      functions[i].send();
    } else {
      functions[i].receive(received, (int)fread(received, 1, sizeof received, stdin));
    }
    return 0;
  }
  fprintf(stderr, "usage: wire_format FUNCTION\n");
  return 2;
}
