#include "plugin.h"

#include <string.h>

enum {
  USER = 5001,
  DEVICE = 77,
  PARTNER = 6001,
  INVITED = 6007,
  CHATROOM = 42, /* which has a sealed message */
  SEALED = 8003,
  SEALED_BY = 6002,
  CALL_SECONDS = 60,
  PATIENCE = 5000,
  MOST_PAGES = 20
};

/* Sets of steps. */
enum {
  SIGNED_IN = 1 << STEP_SIGN_IN,
  CREATED = 1 << STEP_CREATE,
  ENTERED = 1 << STEP_ENTER,
  CHANGED = 1 << STEP_TITLE | 1 << STEP_LIFETIME,
  ALL_BUT_END = (1 << STEP_END) - 1,
  ALL = (1 << STEP_COUNT) - 1
};

/* Without these there is nothing else to do. */
enum { VITAL = SIGNED_IN | CREATED | ENTERED };

static const struct {
  int order[STEP_COUNT];
  bool is_one_by_one;
  int repeats; /* the steps that are tried again, once */
  bool reads_at_once;
  int64_t first_id, id_step;
  int64_t first_message;
  int page_size;
} manners[MANNER_COUNT] = {
    [ONE_BY_ONE] = {.order = {STEP_SIGN_IN, STEP_CLOCK, STEP_CREATE, STEP_ENTER, STEP_CHAT,
                              STEP_CHAT_AGAIN, STEP_READ, STEP_UNREAD, STEP_UNSEAL, STEP_TYPING,
                              STEP_CALL, STEP_TITLE, STEP_LIFETIME, STEP_INVITE, STEP_END},
                    .is_one_by_one = true,
                    .repeats = CREATED | 1 << STEP_CHAT,
                    .first_id = 1,
                    .id_step = 1,
                    .first_message = 9001,
                    .page_size = 2},
    [ALL_AT_ONCE] = {.order = {STEP_SIGN_IN, STEP_UNREAD, STEP_UNSEAL, STEP_CREATE, STEP_CLOCK,
                               STEP_ENTER, STEP_READ, STEP_LIFETIME, STEP_TITLE, STEP_CALL,
                               STEP_TYPING, STEP_CHAT, STEP_CHAT_AGAIN, STEP_INVITE, STEP_END},
                     .repeats = SIGNED_IN,
                     .reads_at_once = true,
                     .first_id = 1000000,
                     .id_step = -7,
                     .first_message = 31,
                     .page_size = 100},
};

/* A reply without the rest of its record. */
static void take_reply_of(qel_reply_t* record, qel_reply_t* reply) {
  *reply = *record;
  memset(record, 0, sizeof *record);
}

static qel_status_t read_time(qel_reply_t* reply, const unsigned char* data, int size) {
  QEL_SCOPED(current_time, now);
  const qel_status_t status = qel_current_time_read(&now, data, size);
  take_reply_of(&now.reply, reply);
  return status;
}

static qel_status_t read_created(qel_reply_t* reply, const unsigned char* data, int size) {
  QEL_SCOPED(create_chatroom_reply, created);
  const qel_status_t status = qel_create_chatroom_reply_read(&created, data, size);
  take_reply_of(&created.reply, reply);
  return status;
}

static qel_status_t read_entered(qel_reply_t* reply, const unsigned char* data, int size) {
  QEL_SCOPED(allow_chat_reply, room);
  const qel_status_t status = qel_allow_chat_reply_read(&room, data, size);
  take_reply_of(&room.reply, reply);
  return status;
}

static qel_status_t read_recorded(qel_reply_t* reply, const unsigned char* data, int size) {
  QEL_SCOPED(chat_reply, chat);
  const qel_status_t status = qel_chat_reply_read(&chat, data, size);
  take_reply_of(&chat.reply, reply);
  return status;
}

static qel_status_t read_invited(qel_reply_t* reply, const unsigned char* data, int size) {
  QEL_SCOPED(invite_reply, invited);
  const qel_status_t status = qel_invite_reply_read(&invited, data, size);
  take_reply_of(&invited.reply, reply);
  return status;
}

static const struct {
  int needs;      /* the steps that have to be settled before */
  bug_t any_fits; /* the mistake that takes any such reply for the step's */
  const char* request;
  const char* reply; /* NULL if there is none */
  qel_status_t (*read)(qel_reply_t* reply, const unsigned char* data, int size);
} steps[STEP_COUNT] = {
    [STEP_SIGN_IN] = {0, BUG_ANY_LOGIN_FITS, "ChannelAuthRequest", "ChannelAuthReply",
                      qel_channel_auth_reply_read},
    [STEP_CLOCK] = {SIGNED_IN, BUG_NONE, "CurrentTimeRequest", "CurrentTimeReply", read_time},
    [STEP_CREATE] = {SIGNED_IN, BUG_ANY_CHATROOM_FITS, "CreateChatroomRequest",
                     "CreateChatroomReply", read_created},
    [STEP_ENTER] = {CREATED, BUG_NONE, "AllowChatRequest", "AllowChatReply", read_entered},
    [STEP_CHAT] = {ENTERED, BUG_ANY_CHAT_REPLY_FITS, "ChatRequest", "ChatReply", read_recorded},
    [STEP_CHAT_AGAIN] = {ENTERED, BUG_ANY_CHAT_REPLY_FITS, "ChatRequest", "ChatReply",
                         read_recorded},
    [STEP_READ] = {SIGNED_IN, BUG_NONE, "ReadMessageRequest", "ReadMessageReply",
                   qel_read_message_reply_read},
    [STEP_UNREAD] = {SIGNED_IN, BUG_NONE, "GetAllUnreadMessageRequest", "GetAllUnreadMessageReply",
                     qel_get_all_unread_message_reply_read},
    [STEP_UNSEAL] = {SIGNED_IN, BUG_NONE, "UnsealMessageRequest", "UnsealMessageReply",
                     qel_unseal_message_reply_read},
    [STEP_TYPING] = {ENTERED, BUG_NONE, "IsTyping", NULL, NULL},
    [STEP_CALL] = {ENTERED, BUG_NONE, "SaveCallLogRequest", "SaveCallLogReply",
                   qel_save_call_log_reply_read},
    [STEP_TITLE] = {ENTERED, BUG_ANY_CHANGE_FITS, "ChangeChatroomMetaRequest",
                    "ChangeChatroomMetaReply", qel_change_chatroom_meta_reply_read},
    [STEP_LIFETIME] = {ENTERED, BUG_ANY_CHANGE_FITS, "ChangeChatroomMetaRequest",
                       "ChangeChatroomMetaReply", qel_change_chatroom_meta_reply_read},
    [STEP_INVITE] = {CHANGED, BUG_NONE, "InviteRequest", "InviteReply", read_invited},
    [STEP_END] = {ALL_BUT_END, BUG_NONE, "EndChatRequest", "EndChatReply", qel_end_chat_reply_read},
};

static bool has_bug(const plugin_t* plugin, bug_t bug) {
  return bug != BUG_NONE && plugin->bug == bug;
}

static int64_t pick(const plugin_t* plugin, bug_t bug, int64_t with_it, int64_t without) {
  return has_bug(plugin, bug) ? with_it : without;
}

static void send_buffer(plugin_t* plugin, const char* name, qel_status_t written,
                        const qel_buffer_t* buffer) {
  if (written == QEL_OK) {
    plugin->send(plugin->context, name, buffer->data, buffer->size);
  }
}

static int64_t make_id(plugin_t* plugin) {
  const int64_t id = plugin->next_id;
  plugin->next_id += manners[plugin->manner].id_step;
  return id;
}

/* ---- Requests */

static qel_status_t write_login(const plugin_t* plugin, qel_buffer_t* buffer, int64_t id) {
  const bool is_swapped = has_bug(plugin, BUG_USER_AND_DEVICE_SWAPPED);
  const int64_t user = pick(plugin, BUG_ANOTHER_USER, PARTNER, USER);
  return qel_channel_auth_request_write(
      buffer, id, is_swapped ? DEVICE : user, is_swapped ? USER : DEVICE,
      has_bug(plugin, BUG_EMPTY_APP_ID) ? "" : "org.example.test", "example-access-token");
}

static qel_status_t write_entry(const plugin_t* plugin, qel_buffer_t* buffer, int64_t id) {
  const bool auto_allow = true;
  return qel_allow_chat_request_write(buffer, id, plugin->chatroom, &auto_allow, 100, true, 0, true,
                                      0, true, true);
}

static int64_t message_id(const plugin_t* plugin, int step) {
  const int64_t first = pick(plugin, BUG_MESSAGE_ID_0, 0, manners[plugin->manner].first_message);
  if (step == STEP_CHAT_AGAIN) {
    return pick(plugin, BUG_SAME_MESSAGE_ID, first, first + 1);
  }
  return (plugin->repeated & 1 << STEP_CHAT) == 0
             ? first
             : pick(plugin, BUG_REPEATED_AS_ANOTHER, first + 2, first);
}

static qel_status_t write_chat(const plugin_t* plugin, qel_buffer_t* buffer, int step) {
  const char* text = step == STEP_CHAT ? "Hello" : "Are you there?";
  if (has_bug(plugin, BUG_EMPTY_TEXT)) {
    text = "";
  } else if (has_bug(plugin, BUG_TEXT_IN_LATIN_1)) {
    text = "Ol\xe1";
  }
  return qel_chat_request_write(buffer, plugin->request_ids[step], plugin->chatroom,
                                message_id(plugin, step), QEL_MSG_TYPE_TEXT, text,
                                (int)pick(plugin, BUG_NEGATIVE_LIFETIME, -1, 0));
}

static qel_status_t write_unsealing(const plugin_t* plugin, qel_buffer_t* buffer, int64_t id) {
  const bool is_swapped = has_bug(plugin, BUG_UNSEALED_SWAPPED);
  const int64_t message = pick(plugin, BUG_UNKNOWN_IS_UNSEALED, SEALED + 1000, SEALED);
  return qel_unseal_message_request_write(buffer, id, CHATROOM, is_swapped ? message : SEALED_BY,
                                          is_swapped ? SEALED_BY : message, "opened");
}

static qel_status_t write_typing(const plugin_t* plugin, qel_buffer_t* buffer, int64_t id) {
  const int content_type = QEL_CONTENT_TYPE_TEXT;
  const int refresh = 10;
  return qel_is_typing_request_write(buffer, id, plugin->chatroom,
                                     has_bug(plugin, BUG_TYPING_WITHOUT_STATE) ? NULL : "typing",
                                     &content_type, &refresh);
}

static qel_status_t write_call(const plugin_t* plugin, qel_buffer_t* buffer, int64_t id) {
  const bool is_swapped = has_bug(plugin, BUG_CALL_SWAPPED);
  return qel_save_call_log_request_write(
      buffer, id, plugin->chatroom, "call-1", "voice", is_swapped ? PARTNER : USER,
      is_swapped ? USER : PARTNER,
      (int)pick(plugin, BUG_CALL_IN_MILLISECONDS, (int64_t)CALL_SECONDS * 1000, CALL_SECONDS));
}

static qel_status_t write_invitation(const plugin_t* plugin, qel_buffer_t* buffer, int64_t id) {
  const int64_t users[] = {PARTNER, pick(plugin, BUG_NOBODY_INVITED, 0, INVITED)};
  return qel_invite_chat_request_write(buffer, id, plugin->chatroom, users, 2);
}

static qel_status_t write_end(const plugin_t* plugin, qel_buffer_t* buffer, int64_t id) {
  qel_message_endchatentry_t entry;
  memset(&entry, 0, sizeof entry);
  entry.chatroomId = pick(plugin, BUG_LEAVES_ANOTHER_CHATROOM, CHATROOM,
                          pick(plugin, BUG_LEAVES_NO_CHATROOM, 0, plugin->chatroom));
  return qel_end_chat_request_write(buffer, id, &entry, 1);
}

static qel_status_t write_request(const plugin_t* plugin, int step, qel_buffer_t* buffer) {
  static const int64_t users[] = {PARTNER, 6002, 6003, 999};
  const int64_t id = plugin->request_ids[step];
  const int64_t room = plugin->chatroom;
  const int lifetime = 60;
  switch (step) {
    case STEP_SIGN_IN:
      return write_login(plugin, buffer, id);
    case STEP_CLOCK:
      return qel_current_time_request_write(buffer, id);
    case STEP_CREATE:
      return qel_create_chatroom_request_write(buffer, id, QEL_CHAT_TYPE_GROUP, users, 4, "Lunch");
    case STEP_ENTER:
      return write_entry(plugin, buffer, id);
    case STEP_CHAT:
    case STEP_CHAT_AGAIN:
      return write_chat(plugin, buffer, step);
    case STEP_READ:
      return qel_read_message_request_write(buffer, id, plugin->pushed.chatroomId, &plugin->pushed);
    case STEP_UNREAD:
      return qel_get_all_unread_message_request_write(buffer, id,
                                                      &manners[plugin->manner].page_size);
    case STEP_UNSEAL:
      return write_unsealing(plugin, buffer, id);
    case STEP_TYPING:
      return write_typing(plugin, buffer, id);
    case STEP_CALL:
      return write_call(plugin, buffer, id);
    case STEP_TITLE:
      return qel_change_chatroom_meta_request_write(buffer, id, room, "Dinner", NULL);
    case STEP_LIFETIME:
      return qel_change_chatroom_meta_request_write(buffer, id, room, NULL, &lifetime);
    case STEP_INVITE:
      return write_invitation(plugin, buffer, id);
    default:
      return write_end(plugin, buffer, id);
  }
}

static void send_request(plugin_t* plugin, int step) {
  QEL_SCOPED(buffer, buffer);
  qel_status_t written;
  plugin->request_ids[step] = make_id(plugin);
  plugin->timers[step] = has_bug(plugin, BUG_WAITS_FOR_EVER) ? 0 : PATIENCE;
  written = write_request(plugin, step, &buffer);
  send_buffer(plugin, steps[step].request, written, &buffer);
}

/* ---- The order of steps */

static bool is_open(const plugin_t* plugin, int step) {
  return ((plugin->begun & ~plugin->settled) >> step & 1) != 0;
}

static void settle(plugin_t* plugin, int step) {
  plugin->settled |= 1 << step;
}

static void begin(plugin_t* plugin, int step) {
  const bool is_needless = step == STEP_READ && plugin->pushed.msgId == 0;
  plugin->begun |= 1 << step;
  if (!is_needless) {
    send_request(plugin, step);
  }
  if (is_needless || steps[step].reply == NULL) {
    settle(plugin, step);
  }
}

/* Begins what can begin now. */
static void go_on(plugin_t* plugin) {
  int before = 0;
  int i;
  for (i = 0; i < STEP_COUNT; ++i) {
    const int step = manners[plugin->manner].order[i];
    int needs = manners[plugin->manner].is_one_by_one ? before : steps[step].needs;
    if (step == STEP_CLOCK && has_bug(plugin, BUG_LOGIN_NOT_AWAITED)) {
      needs = 0;
    }
    if ((plugin->begun >> step & 1) == 0 && (needs & ~plugin->settled) == 0) {
      begin(plugin, step);
    }
    before |= 1 << step;
  }
}

static void fail(plugin_t* plugin, int step) {
  const int bit = 1 << step;
  if ((manners[plugin->manner].repeats & bit & ~plugin->repeated) != 0) {
    plugin->repeated |= bit;
    send_request(plugin, step);
  } else if ((VITAL & bit) != 0) {
    plugin->begun = plugin->settled = ALL;
  } else {
    settle(plugin, step);
  }
}

static void give_up(plugin_t* plugin, int step) {
  plugin->has_given_up = true;
  if (has_bug(plugin, BUG_SAME_ID_AGAIN)) {
    plugin->next_id = plugin->request_ids[step];
    settle(plugin, step);
  } else {
    fail(plugin, step);
  }
}

/* ---- Replies */

static bool is_success(const plugin_t* plugin, int step, int code) {
  if (has_bug(plugin,
              step == STEP_SIGN_IN ? BUG_FAILED_LOGIN_IS_SUCCESS : BUG_FAILURE_IS_SUCCESS)) {
    return true;
  }
  switch (code) {
    case 0:
      return true;
    case QEL_RESULT_REFUSED_1000:
    case QEL_RESULT_REFUSED_1001:
    case QEL_RESULT_REFUSED_3003:
    case QEL_RESULT_REFUSED_3009:
      return !has_bug(plugin, BUG_REFUSED_USERS_ARE_FAILURE);
    default:
      return false;
  }
}

static bool is_answered_by(const plugin_t* plugin, int step, qel_status_t status,
                           const qel_reply_t* reply) {
  if (status != QEL_OK) {
    return has_bug(plugin, BUG_BROKEN_IS_SUCCESS);
  }
  return (reply->requestId == plugin->request_ids[step] || has_bug(plugin, steps[step].any_fits)) &&
         (reply->resultMsg != NULL || !has_bug(plugin, BUG_TEXT_IS_REQUIRED));
}

static void take_result(plugin_t* plugin, int step, const qel_reply_t* reply) {
  if (step == STEP_CREATE) {
    plugin->chatroom = reply->chatroomId;
  }
  if (!is_success(plugin, step, reply->resultCode)) {
    fail(plugin, step);
  } else if (step == STEP_UNREAD) { /* the pages come */
    plugin->timers[STEP_UNREAD] = PATIENCE;
  } else {
    settle(plugin, step);
  }
}

static void take_reply(plugin_t* plugin, const char* message, const unsigned char* data, int size) {
  int step;
  for (step = 0; step < STEP_COUNT; ++step) {
    if (is_open(plugin, step) && strcmp(steps[step].reply, message) == 0) {
      QEL_SCOPED(reply, reply);
      const qel_status_t status = steps[step].read(&reply, data, size);
      if (is_answered_by(plugin, step, status, &reply)) {
        take_result(plugin, step, &reply);
        return;
      }
    }
  }
}

/* ---- What the service sends of its own accord */

static void take_echo(plugin_t* plugin, const unsigned char* data, int size) {
  QEL_SCOPED(client_echo, echo);
  QEL_SCOPED(buffer, buffer);
  qel_status_t written;
  if (qel_client_echo_read(&echo, data, size) != QEL_OK || has_bug(plugin, BUG_ECHO_UNANSWERED)) {
    return;
  }
  written = qel_client_echo_reply_write(
      &buffer, pick(plugin, BUG_ECHO_WITH_ANOTHER_ID, plugin->next_id, echo.requestId));
  send_buffer(plugin, "ClientEchoReply", written, &buffer);
  if (has_bug(plugin, BUG_ECHO_ANSWERED_TWICE)) {
    send_buffer(plugin, "ClientEchoReply", written, &buffer);
  }
}

static bool is_to_be_acknowledged(const plugin_t* plugin,
                                  const qel_forward_online_message_get_t* push) {
  return (!push->skipReply || has_bug(plugin, BUG_SKIPPED_IS_ACKNOWLEDGED)) &&
         (push->inboxEntry.msgType == QEL_MSG_TYPE_TEXT ||
          !has_bug(plugin, BUG_ONLY_TEXTS_ARE_ACKNOWLEDGED));
}

static void acknowledge(plugin_t* plugin, const qel_forward_online_message_get_t* push) {
  QEL_SCOPED(buffer, buffer);
  const qel_status_t written = qel_forward_online_message_reply_write(
      &buffer, push->requestId,
      pick(plugin, BUG_ACKNOWLEDGED_ELSEWHERE, plugin->chatroom, push->chatroomId),
      &manners[plugin->manner].reads_at_once);
  send_buffer(plugin, "ForwardOnlineMessageReply", written, &buffer);
  if (has_bug(plugin, BUG_ACKNOWLEDGED_TWICE)) {
    send_buffer(plugin, "ForwardOnlineMessageReply", written, &buffer);
  }
}

static void keep(plugin_t* plugin, const qel_message_inboxentry_t* entry) {
  const int64_t sender_of_before = plugin->pushed.sender;
  plugin->pushed = *entry;
  plugin->pushed.chatMsg = NULL;
  if (entry->sender == 0 && has_bug(plugin, BUG_SENDER_OF_BEFORE)) {
    plugin->pushed.sender = sender_of_before;
  }
}

static void take_message(plugin_t* plugin, const unsigned char* data, int size) {
  QEL_SCOPED(forward_online_message_get, push);
  if (qel_forward_online_message_get_read(&push, data, size) != QEL_OK &&
      !has_bug(plugin, BUG_BROKEN_IS_ACKNOWLEDGED)) {
    return;
  }
  keep(plugin, &push.inboxEntry);
  if (is_to_be_acknowledged(plugin, &push)) {
    acknowledge(plugin, &push);
  }
  if (manners[plugin->manner].reads_at_once && (plugin->begun >> STEP_END & 1) == 0) {
    plugin->settled &= ~(1 << STEP_READ);
    begin(plugin, STEP_READ);
  }
}

static void take_page(plugin_t* plugin, const unsigned char* data, int size) {
  QEL_SCOPED(forward_unread_message, page);
  QEL_SCOPED(buffer, buffer);
  bool is_last;
  qel_status_t written;
  if (qel_forward_unread_message_read(&page, data, size) != QEL_OK) {
    return;
  }
  ++plugin->pages;
  is_last = page.nextPaginationKey == NULL || has_bug(plugin, BUG_PAGE_KEY_LOST) ||
            (plugin->pages == MOST_PAGES && !has_bug(plugin, BUG_PAGES_WITHOUT_END));
  plugin->timers[STEP_UNREAD] = PATIENCE;
  written = qel_forward_unread_message_reply_write(&buffer, page.requestId,
                                                   is_last ? NULL : page.nextPaginationKey,
                                                   &manners[plugin->manner].page_size);
  send_buffer(plugin, "ForwardUnreadMessageReply", written, &buffer);
  if (is_last && is_open(plugin, STEP_UNREAD)) {
    settle(plugin, STEP_UNREAD);
  }
}

/* ---- Mistakes that a good plug-in has no place for */

/* The functions alone leave the array as it was, and hand out a count all the same. */
static void invite_unlisted(plugin_t* plugin, const unsigned char* data, int size) {
  static const int64_t left_as_it_was[] = {PARTNER, INVITED};
  QEL_SCOPED(create_chatroom_reply, created);
  QEL_SCOPED(buffer, buffer);
  if (qel_create_chatroom_reply_read(&created, data, size) == QEL_OK &&
      created.unlistedInvalidReceivers > 0) {
    const qel_status_t written = qel_invite_chat_request_write(
        &buffer, make_id(plugin), created.reply.chatroomId, left_as_it_was, 2);
    send_buffer(plugin, "InviteRequest", written, &buffer);
  }
}

static void lose_memory(const unsigned char* data, int size) {
  int64_t request_id = 0, chatroom = 0;
  int code = 0, count = 0;
  char* text = NULL;
  int64_t *ids = NULL, *times = NULL;
  chat_reply_deserialize(data, size, &request_id, &chatroom, &code, &text, &count, &ids, &times);
}

/* The functions alone do not write a type that they do not know, and end the process for it. */
static void type_too(plugin_t* plugin, const unsigned char* data, int size) {
  enum { NOT_WRITTEN = -1 };
  int64_t request_id = 0, chatroom = 0, sender = 0;
  char* state = NULL;
  int content_type = NOT_WRITTEN, refresh = 0;
  QEL_SCOPED(buffer, buffer);
  typing_updated_deserialize(data, size, &request_id, &chatroom, &sender, &state, &content_type,
                             &refresh);
  is_typing_request_serialize(make_id(plugin), chatroom, state, &content_type, &refresh,
                              &buffer.data, &buffer.size);
  free(state);
}

/* Whether a reply lacks a field that it may lack. */
static bool is_incomplete(const char* message, const unsigned char* data, int size) {
  if (strcmp(message, "CreateChatroomReply") == 0) {
    QEL_SCOPED(create_chatroom_reply, created);
    return qel_create_chatroom_reply_read(&created, data, size) == QEL_OK &&
           created.msgTtl == QEL_ABSENT;
  }
  if (strcmp(message, "AllowChatReply") == 0) {
    QEL_SCOPED(allow_chat_reply, room);
    return qel_allow_chat_reply_read(&room, data, size) == QEL_OK && room.memberCount == 0;
  }
  if (strcmp(message, "ChangeChatroomMetaReply") == 0) {
    QEL_SCOPED(reply, reply);
    return qel_change_chatroom_meta_reply_read(&reply, data, size) == QEL_OK &&
           reply.chatroomId == 0;
  }
  return false;
}

/* In the answer's form, which is the same. */
static void send_echo(plugin_t* plugin) {
  QEL_SCOPED(buffer, buffer);
  const qel_status_t written = qel_client_echo_reply_write(&buffer, make_id(plugin));
  send_buffer(plugin, "ClientEcho", written, &buffer);
}

static void make_mistake(plugin_t* plugin, const char* message, const unsigned char* data,
                         int size) {
  if (strcmp(message, "CreateChatroomReply") == 0 && has_bug(plugin, BUG_COUNT_WITHOUT_ARRAY)) {
    invite_unlisted(plugin, data, size);
  } else if (strcmp(message, "ChatReply") == 0 && has_bug(plugin, BUG_MEMORY_LOST)) {
    lose_memory(data, size);
  } else if (strcmp(message, "TypingUpdated") == 0 &&
             has_bug(plugin, BUG_NUMBER_OUTSIDE_ENUMERATION)) {
    type_too(plugin, data, size);
  } else if (strcmp(message, "CurrentTimeReply") == 0 && has_bug(plugin, BUG_ECHO_OF_ITS_OWN)) {
    send_echo(plugin);
  }
}

/* ---- Outside */

void plugin_start(plugin_t* plugin) {
  plugin->next_id = manners[plugin->manner].first_id;
  plugin->begun = plugin->settled = plugin->left_out;
  go_on(plugin);
}

void plugin_receive(plugin_t* plugin, const char* message, const unsigned char* data, int size) {
  if ((has_bug(plugin, BUG_DEAF_AFTER_GIVING_UP) && plugin->has_given_up) ||
      (has_bug(plugin, BUG_WHOLE_REPLY_IS_REQUIRED) && is_incomplete(message, data, size))) {
    return;
  }
  make_mistake(plugin, message, data, size);
  if (strcmp(message, "ClientEcho") == 0) {
    take_echo(plugin, data, size);
  } else if (strcmp(message, "ForwardOnlineMessage") == 0) {
    take_message(plugin, data, size);
  } else if (strcmp(message, "ForwardUnreadMessage") == 0) {
    take_page(plugin, data, size);
  } else {
    take_reply(plugin, message, data, size);
  }
  go_on(plugin);
}

int plugin_timer(const plugin_t* plugin) {
  int least = 0;
  int step;
  for (step = 0; step < STEP_COUNT; ++step) {
    const int timer = plugin->timers[step];
    if (is_open(plugin, step) && timer > 0 && (least == 0 || timer < least)) {
      least = timer;
    }
  }
  return least;
}

void plugin_wait(plugin_t* plugin, int milliseconds) {
  int step;
  for (step = 0; step < STEP_COUNT; ++step) {
    int* timer = &plugin->timers[step];
    if (!is_open(plugin, step) || *timer == 0) {
      continue;
    }
    *timer -= milliseconds;
    if (*timer <= 0) {
      give_up(plugin, step);
    }
  }
  go_on(plugin);
}
