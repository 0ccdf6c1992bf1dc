/* The library's own functions. */

#include <stdlib.h>

#include "records.h"

static unsigned char* echo_reply(int64_t request_id, int* size) {
  unsigned char* block = NULL;
  if (client_echo_reply_serialize(request_id, &block, size) != 0) {
    abort();
  }
  return block;
}

static unsigned char* chat_request(const char* text, int* size) {
  unsigned char* block = NULL;
  if (chat_request_serialize(kRequestId, kChatroomId, kMessageId, kMessageType, text, kMessageTtl,
                             0, &block, size) != 0) {
    abort();
  }
  return block;
}

static void chat_reply(const unsigned char* data, int size, struct digest* digest) {
  int64_t request_id = -1;
  int64_t chatroom_id = -1;
  int code = -1;
  char* msg = NULL;
  int count = -1;
  int64_t* ids = NULL;
  int64_t* times = NULL;
  chat_reply_deserialize(data, size, &request_id, &chatroom_id, &code, &msg, &count, &ids, &times);
  if (count < 0) {
    abort();
  }
  if (digest != NULL) {
    digest_reply(request_id, chatroom_id, code, msg, digest);
  }
  free(msg);
  finish_processed(ids, times, count, digest);
}

static void message_page(const unsigned char* data, int size, struct digest* digest) {
  int64_t request_id = -1;
  qel_message_inboxentry_t** entries = NULL;
  int count = -1;
  char* next = NULL;
  forward_unread_message_deserialize(data, size, &request_id, &entries, &count, &next);
  if (count < 0) {
    abort();
  }
  if (digest != NULL) {
    digest_number(digest, request_id);
  }
  finish_messages(entries, count, digest);
  if (digest != NULL) {
    digest_text(digest, next);
  }
  free(next);
}

static void chatroom_entry(const unsigned char* data, int size, struct digest* digest) {
  int64_t request_id = -1;
  int64_t chatroom_id = -1;
  int code = -1;
  char* msg = NULL;
  qel_message_watermarkentry_t** deliveries = NULL;
  int delivery_count = -1;
  int64_t delivery_time = -1;
  qel_message_watermarkentry_t** reads = NULL;
  int read_count = -1;
  int64_t read_time = -1;
  qel_message_chatroommember_t** members = NULL;
  int member_count = -1;
  char* title = NULL;
  int ttl = -1;
  allow_chat_reply_deserialize(data, size, &request_id, &chatroom_id, &code, &msg, &deliveries,
                               &delivery_count, &delivery_time, &reads, &read_count, &read_time,
                               &members, &member_count, &title, &ttl);
  if (member_count < 0) {
    abort();
  }
  if (digest != NULL) {
    digest_reply(request_id, chatroom_id, code, msg, digest);
    digest_number(digest, delivery_time);
  }
  finish_watermarks(deliveries, delivery_count, digest);
  if (digest != NULL) {
    digest_number(digest, read_time);
  }
  finish_watermarks(reads, read_count, digest);
  finish_members(members, member_count, digest);
  if (digest != NULL) {
    digest_text(digest, title);
    digest_number(digest, ttl);
  }
  free(msg);
  free(title);
}

void echo(const unsigned char* data, int size, struct digest* digest) {
  int64_t request_id = -1;
  client_echo_deserialize(data, size, &request_id);
  if (request_id == -1) {
    abort();
  }
  if (digest != NULL) {
    digest_number(digest, request_id);
  }
}

void end_of_chats(const unsigned char* data, int size, struct digest* digest) {
  int64_t request_id = -1;
  int code = -1;
  char* msg = NULL;
  end_chat_reply_deserialize(data, size, &request_id, &code, &msg);
  if (request_id == -1) {
    abort();
  }
  if (digest != NULL) {
    digest_number(digest, request_id);
    digest_number(digest, code);
    digest_text(digest, msg);
  }
  free(msg);
}

void invitation(const unsigned char* data, int size, struct digest* digest) {
  int64_t request_id = -1;
  int64_t chatroom_id = -1;
  int64_t sent_time = -1;
  int code = -1;
  char* msg = NULL;
  int64_t *invalid = NULL, *interrupted = NULL, *disabled = NULL, *existing = NULL, *denied = NULL;
  qel_message_didviolationuser_t* violations = NULL;
  int invalid_count = 0, interrupted_count = 0, disabled_count = 0, existing_count = 0;
  int violation_count = 0, denied_count = 0;
  invite_reply_deserialize(data, size, &request_id, &chatroom_id, &sent_time, &code, &msg, &invalid,
                           &invalid_count, &interrupted, &interrupted_count, &disabled,
                           &disabled_count, &existing, &existing_count, &violations,
                           &violation_count, &denied, &denied_count);
  if (request_id == -1) {
    abort();
  }
  if (digest != NULL) {
    digest_reply(request_id, chatroom_id, code, msg, digest);
    digest_number(digest, invalid_count);
  }
  free(msg);
  free(invalid);
  free(interrupted);
  free(disabled);
  free(existing);
  free(violations);
  free(denied);
}

const struct implementation implementation = {"this library", echo_reply,   chat_request,
                                              chat_reply,     message_page, chatroom_entry};
