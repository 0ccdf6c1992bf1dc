/* The library's functions, called through qel-message.h. */

#include <stdlib.h>

#include "qel-message.h"
#include "records.h"

/* The caller frees the block. */
static unsigned char* taken(qel_status_t status, const qel_buffer_t* buffer, int* size) {
  if (status != QEL_OK) {
    abort();
  }
  *size = buffer->size;
  return buffer->data;
}

static unsigned char* echo_reply(int64_t request_id, int* size) {
  qel_buffer_t buffer = {0};
  return taken(qel_client_echo_reply_write(&buffer, request_id), &buffer, size);
}

static unsigned char* chat_request(const char* text, int* size) {
  qel_buffer_t buffer = {0};
  return taken(qel_chat_request_write(&buffer, kRequestId, kChatroomId, kMessageId, kMessageType,
                                      text, kMessageTtl),
               &buffer, size);
}

static void digest_record(const qel_reply_t* reply, struct digest* digest) {
  digest_reply(reply->requestId, reply->chatroomId, reply->resultCode, reply->resultMsg, digest);
}

static void chat_reply(const unsigned char* data, int size, struct digest* digest) {
  QEL_SCOPED(chat_reply, chat);
  if (qel_chat_reply_read(&chat, data, size) != QEL_OK) {
    abort();
  }
  if (digest != NULL) {
    digest_record(&chat.reply, digest);
    digest_processed(chat.msgIds, chat.sentTimes, chat.count, digest);
  }
}

static void message_page(const unsigned char* data, int size, struct digest* digest) {
  QEL_SCOPED(forward_unread_message, page);
  if (qel_forward_unread_message_read(&page, data, size) != QEL_OK) {
    abort();
  }
  if (digest != NULL) {
    digest_number(digest, page.requestId);
    digest_messages(page.inboxEntries, page.count, digest);
    digest_text(digest, page.nextPaginationKey);
  }
}

static void chatroom_entry(const unsigned char* data, int size, struct digest* digest) {
  QEL_SCOPED(allow_chat_reply, room);
  if (qel_allow_chat_reply_read(&room, data, size) != QEL_OK) {
    abort();
  }
  if (digest != NULL) {
    digest_record(&room.reply, digest);
    digest_number(digest, room.lastDeliveryAckTimestamp);
    digest_watermarks(room.deliveryAckEntries, room.deliveryAckCount, digest);
    digest_number(digest, room.lastReadAckTimestamp);
    digest_watermarks(room.readAckEntries, room.readAckCount, digest);
    digest_members(room.members, room.memberCount, digest);
    digest_text(digest, room.title);
    digest_number(digest, room.msgTtl);
  }
}

void echo(const unsigned char* data, int size, struct digest* digest) {
  QEL_SCOPED(client_echo, echo);
  if (qel_client_echo_read(&echo, data, size) != QEL_OK) {
    abort();
  }
  if (digest != NULL) {
    digest_number(digest, echo.requestId);
  }
}

void end_of_chats(const unsigned char* data, int size, struct digest* digest) {
  QEL_SCOPED(reply, reply);
  if (qel_end_chat_reply_read(&reply, data, size) != QEL_OK) {
    abort();
  }
  if (digest != NULL) {
    digest_number(digest, reply.requestId);
    digest_number(digest, reply.resultCode);
    digest_text(digest, reply.resultMsg);
  }
}

void invitation(const unsigned char* data, int size, struct digest* digest) {
  QEL_SCOPED(invite_reply, invited);
  if (qel_invite_reply_read(&invited, data, size) != QEL_OK) {
    abort();
  }
  if (digest != NULL) {
    digest_record(&invited.reply, digest);
    digest_number(digest, invited.invalidReceiversCount);
  }
}

const struct implementation implementation = {"qel-message.h", echo_reply,   chat_request,
                                              chat_reply,      message_page, chatroom_entry};
