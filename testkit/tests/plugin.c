#include "plugin.h"

#include <string.h>

enum {
  SIGN_IN,
  CLOCK,
  CREATE,
  ENTER,
  CHAT,
  READ,
  UNREAD,
  UNSEAL,
  TYPING,
  CALL,
  TITLE,
  LIFETIME,
  INVITE,
  END,
  DONE
};

enum { USER = 5001, PARTNER = 6001, PATIENCE = 5000, MOST_PAGES = 20 };

static const int page_size = 2;

/* What a step sends, and what it waits for; NULL if for nothing. */
static const struct {
  const char* request;
  const char* reply;
} steps[] = {
    {"ChannelAuthRequest", "ChannelAuthReply"},
    {"CurrentTimeRequest", "CurrentTimeReply"},
    {"CreateChatroomRequest", "CreateChatroomReply"},
    {"AllowChatRequest", "AllowChatReply"},
    {"ChatRequest", "ChatReply"},
    {"ReadMessageRequest", "ReadMessageReply"},
    {"GetAllUnreadMessageRequest", "GetAllUnreadMessageReply"},
    {"UnsealMessageRequest", "UnsealMessageReply"},
    {"IsTyping", NULL},
    {"SaveCallLogRequest", "SaveCallLogReply"},
    {"ChangeChatroomMetaRequest", "ChangeChatroomMetaReply"},
    {"ChangeChatroomMetaRequest", "ChangeChatroomMetaReply"},
    {"InviteRequest", "InviteReply"},
    {"EndChatRequest", "EndChatReply"},
};

/* What a reply says. */
typedef struct {
  qel_status_t status;
  int64_t request_id;
  int code;
  bool has_text;
} outcome_t;

static void send_buffer(plugin_t* plugin, const char* name, qel_status_t written,
                        const qel_buffer_t* buffer) {
  if (written == QEL_OK) {
    plugin->send(plugin->context, name, buffer->data, buffer->size);
  }
}

/* ---- The steps */

static qel_status_t write_read_receipt(const plugin_t* plugin, qel_buffer_t* buffer) {
  qel_message_inboxentry_t entry;
  memset(&entry, 0, sizeof entry);
  entry.msgId = plugin->pushed_message;
  entry.sender = plugin->pushed_sender;
  entry.sentTime = plugin->pushed_time;
  return qel_read_message_request_write(buffer, plugin->request_id, plugin->chatroom, &entry);
}

static qel_status_t write_entry(const plugin_t* plugin, qel_buffer_t* buffer) {
  const bool auto_allow = true;
  return qel_allow_chat_request_write(buffer, plugin->request_id, plugin->chatroom, &auto_allow,
                                      100, true, 0, true, 0, true, true);
}

static qel_status_t write_typing(const plugin_t* plugin, qel_buffer_t* buffer) {
  const int content_type = QEL_CONTENT_TYPE_TEXT;
  const int refresh = 10;
  return qel_is_typing_request_write(buffer, plugin->request_id, plugin->chatroom, "typing",
                                     &content_type, &refresh);
}

static qel_status_t write_end(const plugin_t* plugin, qel_buffer_t* buffer) {
  qel_message_endchatentry_t entry;
  memset(&entry, 0, sizeof entry);
  entry.chatroomId = plugin->chatroom;
  return qel_end_chat_request_write(buffer, plugin->request_id, &entry, 1);
}

static qel_status_t write_request(const plugin_t* plugin, qel_buffer_t* buffer) {
  static const int64_t users[] = {PARTNER, 6002, 6003, 999};
  static const int64_t invited[] = {PARTNER, 6007};
  const int64_t id = plugin->request_id;
  const int64_t room = plugin->chatroom;
  const int lifetime = 60;
  switch (plugin->step) {
    case SIGN_IN:
      return qel_channel_auth_request_write(buffer, id, USER, 77, "org.example.test",
                                            "example-access-token");
    case CLOCK:
      return qel_current_time_request_write(buffer, id);
    case CREATE:
      return qel_create_chatroom_request_write(buffer, id, QEL_CHAT_TYPE_GROUP, users, 4, "Lunch");
    case ENTER:
      return write_entry(plugin, buffer);
    case CHAT:
      return qel_chat_request_write(buffer, id, room, 9001, QEL_MSG_TYPE_TEXT, "Hello", 0);
    case READ:
      return write_read_receipt(plugin, buffer);
    case UNREAD:
      return qel_get_all_unread_message_request_write(buffer, id, &page_size);
    case UNSEAL:
      return qel_unseal_message_request_write(buffer, id, room, 6002, 8003, "opened");
    case TYPING:
      return write_typing(plugin, buffer);
    case CALL:
      return qel_save_call_log_request_write(buffer, id, room, "call-1", "voice", USER, PARTNER, 5);
    case TITLE:
      return qel_change_chatroom_meta_request_write(buffer, id, room, "Dinner", NULL);
    case LIFETIME:
      return qel_change_chatroom_meta_request_write(buffer, id, room, NULL, &lifetime);
    case INVITE:
      return qel_invite_chat_request_write(buffer, id, room, invited, 2);
    default:
      return write_end(plugin, buffer);
  }
}

static void send_request(plugin_t* plugin) {
  QEL_SCOPED(buffer, buffer);
  qel_status_t written;
  if (!plugin->is_repeated || plugin->bug != BUG_SAME_ID_AGAIN) {
    ++plugin->request_id;
  }
  plugin->timer = PATIENCE; /* before the answer can come */
  written = write_request(plugin, &buffer);
  send_buffer(plugin, steps[plugin->step].request, written, &buffer);
}

static void begin(plugin_t* plugin, int step) {
  plugin->step = step;
  plugin->is_repeated = false;
  plugin->timer = 0;
  if (step == READ && plugin->pushed_message == 0) {
    begin(plugin, READ + 1);
  } else if (step != DONE) {
    send_request(plugin);
    if (steps[step].reply == NULL) {
      begin(plugin, step + 1);
    }
  }
}

/* ---- Replies */

static outcome_t outcome_of(qel_status_t status, const qel_reply_t* reply) {
  outcome_t outcome;
  outcome.status = status;
  outcome.request_id = reply->requestId;
  outcome.code = reply->resultCode;
  outcome.has_text = reply->resultMsg != NULL;
  return outcome;
}

/* The functions alone leave the array as it was, and hand out a count all the same. */
static void invite_unlisted(plugin_t* plugin, int count) {
  static const int64_t left_as_it_was[4];
  QEL_SCOPED(buffer, buffer);
  const qel_status_t written = qel_invite_chat_request_write(
      &buffer, ++plugin->request_id, plugin->chatroom, left_as_it_was, count < 4 ? count : 4);
  send_buffer(plugin, "InviteRequest", written, &buffer);
}

static outcome_t read_created(plugin_t* plugin, const unsigned char* data, int size) {
  QEL_SCOPED(create_chatroom_reply, created);
  const qel_status_t status = qel_create_chatroom_reply_read(&created, data, size);
  const outcome_t outcome = outcome_of(status, &created.reply);
  if (outcome.request_id == plugin->request_id || plugin->bug == BUG_ANY_REPLY_FITS) {
    plugin->chatroom = created.reply.chatroomId;
  }
  if (plugin->bug == BUG_COUNT_WITHOUT_ARRAY && created.unlistedInvalidReceivers > 0) {
    invite_unlisted(plugin, created.unlistedInvalidReceivers);
    ++plugin->request_id; /* which the reply is not to */
  }
  return outcome;
}

static outcome_t read_entered(const unsigned char* data, int size) {
  QEL_SCOPED(allow_chat_reply, room);
  const qel_status_t status = qel_allow_chat_reply_read(&room, data, size);
  return outcome_of(status, &room.reply);
}

static outcome_t read_recorded(const unsigned char* data, int size) {
  QEL_SCOPED(chat_reply, chat);
  const qel_status_t status = qel_chat_reply_read(&chat, data, size);
  return outcome_of(status, &chat.reply);
}

static outcome_t read_invited(const unsigned char* data, int size) {
  QEL_SCOPED(invite_reply, invited);
  const qel_status_t status = qel_invite_reply_read(&invited, data, size);
  return outcome_of(status, &invited.reply);
}

static outcome_t read_clock(const unsigned char* data, int size) {
  QEL_SCOPED(current_time, now);
  const qel_status_t status = qel_current_time_read(&now, data, size);
  return outcome_of(status, &now.reply);
}

static outcome_t read_result(int step, const unsigned char* data, int size) {
  QEL_SCOPED(reply, reply);
  qel_status_t status;
  switch (step) {
    case SIGN_IN:
      status = qel_channel_auth_reply_read(&reply, data, size);
      break;
    case READ:
      status = qel_read_message_reply_read(&reply, data, size);
      break;
    case UNREAD:
      status = qel_get_all_unread_message_reply_read(&reply, data, size);
      break;
    case UNSEAL:
      status = qel_unseal_message_reply_read(&reply, data, size);
      break;
    case CALL:
      status = qel_save_call_log_reply_read(&reply, data, size);
      break;
    case END:
      status = qel_end_chat_reply_read(&reply, data, size);
      break;
    default:
      status = qel_change_chatroom_meta_reply_read(&reply, data, size);
  }
  return outcome_of(status, &reply);
}

static outcome_t read_reply(plugin_t* plugin, const unsigned char* data, int size) {
  switch (plugin->step) {
    case CLOCK:
      return read_clock(data, size);
    case CREATE:
      return read_created(plugin, data, size);
    case ENTER:
      return read_entered(data, size);
    case CHAT:
      return read_recorded(data, size);
    case INVITE:
      return read_invited(data, size);
    default:
      return read_result(plugin->step, data, size);
  }
}

static bool is_success(const plugin_t* plugin, const outcome_t* outcome) {
  if (plugin->bug == BUG_FAILURE_IS_SUCCESS) {
    return true;
  }
  switch (outcome->code) {
    case 0:
      return true;
    case QEL_RESULT_REFUSED_1000:
    case QEL_RESULT_REFUSED_1001:
    case QEL_RESULT_REFUSED_3003:
    case QEL_RESULT_REFUSED_3009:
      return plugin->bug != BUG_REFUSED_USERS_ARE_FAILURE;
    default:
      return false;
  }
}

/* Without a login or a chatroom there is nothing else to do. */
static void fail_step(plugin_t* plugin) {
  begin(plugin, plugin->step == SIGN_IN || plugin->step == CREATE ? DONE : plugin->step + 1);
}

static void take_reply(plugin_t* plugin, const unsigned char* data, int size) {
  const outcome_t outcome = read_reply(plugin, data, size);
  if (outcome.status != QEL_OK && plugin->bug == BUG_BROKEN_IS_SUCCESS) {
    begin(plugin, plugin->step + 1);
    return;
  }
  if (outcome.status != QEL_OK ||
      (outcome.request_id != plugin->request_id && plugin->bug != BUG_ANY_REPLY_FITS) ||
      (!outcome.has_text && plugin->bug == BUG_TEXT_IS_REQUIRED)) {
    return;
  }
  if (!is_success(plugin, &outcome)) {
    fail_step(plugin);
  } else if (plugin->step == UNREAD) { /* the pages come */
    plugin->timer = PATIENCE;
  } else {
    begin(plugin, plugin->step + 1);
  }
}

/* ---- What the service sends of its own accord */

static void take_echo(plugin_t* plugin, const unsigned char* data, int size) {
  QEL_SCOPED(client_echo, echo);
  QEL_SCOPED(buffer, buffer);
  qel_status_t written;
  if (qel_client_echo_read(&echo, data, size) != QEL_OK || plugin->bug == BUG_ECHO_UNANSWERED) {
    return;
  }
  written = qel_client_echo_reply_write(
      &buffer, plugin->bug == BUG_ECHO_WITH_ANOTHER_ID ? plugin->request_id : echo.requestId);
  send_buffer(plugin, "ClientEchoReply", written, &buffer);
}

static void take_message(plugin_t* plugin, const unsigned char* data, int size) {
  const bool mark_as_read = true;
  QEL_SCOPED(forward_online_message_get, push);
  QEL_SCOPED(buffer, buffer);
  qel_status_t written;
  if (qel_forward_online_message_get_read(&push, data, size) != QEL_OK) {
    return;
  }
  plugin->pushed_message = push.inboxEntry.msgId;
  plugin->pushed_time = push.inboxEntry.sentTime;
  if (push.inboxEntry.sender != 0 || plugin->bug != BUG_SENDER_OF_BEFORE) {
    plugin->pushed_sender = push.inboxEntry.sender;
  }
  if ((push.skipReply && plugin->bug != BUG_SKIPPED_IS_ACKNOWLEDGED) ||
      (push.inboxEntry.msgType != QEL_MSG_TYPE_TEXT &&
       plugin->bug == BUG_ONLY_TEXTS_ARE_ACKNOWLEDGED)) {
    return;
  }
  written = qel_forward_online_message_reply_write(&buffer, push.requestId, push.chatroomId,
                                                   &mark_as_read);
  send_buffer(plugin, "ForwardOnlineMessageReply", written, &buffer);
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
  is_last = page.nextPaginationKey == NULL || plugin->bug == BUG_PAGE_KEY_LOST ||
            (plugin->pages == MOST_PAGES && plugin->bug != BUG_PAGES_WITHOUT_END);
  plugin->timer = PATIENCE;
  written = qel_forward_unread_message_reply_write(
      &buffer, page.requestId, is_last ? NULL : page.nextPaginationKey, &page_size);
  send_buffer(plugin, "ForwardUnreadMessageReply", written, &buffer);
  if (is_last && plugin->step == UNREAD) {
    begin(plugin, UNREAD + 1);
  }
}

/* ---- Outside */

void plugin_start(plugin_t* plugin) {
  begin(plugin, SIGN_IN);
}

void plugin_receive(plugin_t* plugin, const char* message, const unsigned char* data, int size) {
  if (strcmp(message, "ClientEcho") == 0) {
    take_echo(plugin, data, size);
  } else if (strcmp(message, "ForwardOnlineMessage") == 0) {
    take_message(plugin, data, size);
  } else if (strcmp(message, "ForwardUnreadMessage") == 0) {
    take_page(plugin, data, size);
  } else if (plugin->step != DONE && strcmp(message, steps[plugin->step].reply) == 0) {
    take_reply(plugin, data, size);
  }
}

/* A chat message is sent twice before it is given up. */
void plugin_wait(plugin_t* plugin, int milliseconds) {
  if (plugin->timer == 0 || milliseconds < plugin->timer) {
    plugin->timer -= plugin->timer == 0 ? 0 : milliseconds;
  } else if (plugin->step == CHAT && !plugin->is_repeated) {
    plugin->is_repeated = true;
    send_request(plugin);
  } else {
    fail_step(plugin);
  }
}
