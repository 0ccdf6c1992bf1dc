/* The calls with protobuf-c. Its unpacked messages are plain C data. */

#include <stdlib.h>

#include "calls.h"
#include "msgspec_frontend.pb-c.h"

static void* checked(void* block) {
  if (block == NULL) {
    abort();
  }
  return block;
}

static unsigned char* encode(const ProtobufCMessage* message, int* size) {
  const size_t length = protobuf_c_message_get_packed_size(message);
  unsigned char* block = checked(calloc(length, 1));
  protobuf_c_message_pack(message, block);
  *size = (int)length;
  return block;
}

/* ---- Requests */

static unsigned char* echo_reply(int64_t request_id, int* size) {
  ClientEchoReply reply = CLIENT_ECHO_REPLY__INIT;
  reply.has_requestid = 1;
  reply.requestid = request_id;
  return encode(&reply.base, size);
}

static unsigned char* chat_request(const char* text, int* size) {
  ChatMessageParam param = CHAT_MESSAGE_PARAM__INIT;
  ChatMessageParam* params[1];
  ChatRequest request = CHAT_REQUEST__INIT;
  param.has_msgid = 1;
  param.msgid = kMessageId;
  param.has_msgtype = 1;
  param.msgtype = (MsgType)kMessageType;
  param.chatmsg = (char*)text; /* packing does not write to it */
  param.has_msgttl = 1;
  param.msgttl = kMessageTtl;
  params[0] = &param;
  request.has_requestid = 1;
  request.requestid = kRequestId;
  request.has_chatroomid = 1;
  request.chatroomid = kChatroomId;
  request.n_chatmessageparams = 1;
  request.chatmessageparams = params;
  return encode(&request.base, size);
}

/* ---- Received messages */

static void digest_result(struct digest* digest, const Result* result) {
  digest_number(digest, result->code);
  digest_text(digest, result->msg);
}

static void chat_reply(const unsigned char* data, int size, struct digest* digest) {
  ChatReply* reply = checked(chat_reply__unpack(NULL, (size_t)size, data));
  if (digest != NULL) {
    size_t i;
    digest_number(digest, reply->requestid);
    digest_number(digest, reply->chatroomid);
    digest_result(digest, reply->result);
    digest_number(digest, (int64_t)reply->n_processedmessageentries);
    for (i = 0; i < reply->n_processedmessageentries; ++i) {
      digest_number(digest, reply->processedmessageentries[i]->msgid);
      digest_number(digest, reply->processedmessageentries[i]->senttime);
    }
  }
  chat_reply__free_unpacked(reply, NULL);
}

static void message_page(const unsigned char* data, int size, struct digest* digest) {
  ForwardUnreadMessage* push = checked(forward_unread_message__unpack(NULL, (size_t)size, data));
  if (digest != NULL) {
    size_t i;
    digest_number(digest, push->requestid);
    digest_number(digest, (int64_t)push->n_inboxentries);
    for (i = 0; i < push->n_inboxentries; ++i) {
      const InboxEntry* entry = push->inboxentries[i];
      digest_number(digest, entry->msgid);
      digest_number(digest, entry->msgtype);
      digest_number(digest, entry->sender);
      digest_number(digest, entry->receiver);
      digest_number(digest, entry->senttime);
      digest_text(digest, entry->chatmsg);
      digest_number(digest, entry->chatroomid);
      digest_number(digest, entry->chattype);
      digest_number(digest, entry->msgttl);
    }
    digest_text(digest, push->nextpaginationkey);
  }
  forward_unread_message__free_unpacked(push, NULL);
}

static void digest_watermarks(struct digest* digest, WaterMarkEntry* const* marks, size_t count) {
  size_t i;
  digest_number(digest, (int64_t)count);
  for (i = 0; i < count; ++i) {
    digest_number(digest, marks[i]->userid);
    digest_number(digest, marks[i]->msgid);
    digest_number(digest, marks[i]->timestamp);
  }
}

static void chatroom_entry(const unsigned char* data, int size, struct digest* digest) {
  AllowChatReply* reply = checked(allow_chat_reply__unpack(NULL, (size_t)size, data));
  if (digest != NULL) {
    size_t i;
    digest_number(digest, reply->requestid);
    digest_number(digest, reply->chatroomid);
    digest_result(digest, reply->result);
    digest_number(digest, reply->lastdeliveryacktimestamp);
    digest_watermarks(digest, reply->deliveryackentries, reply->n_deliveryackentries);
    digest_number(digest, reply->lastreadacktimestamp);
    digest_watermarks(digest, reply->readackentries, reply->n_readackentries);
    digest_number(digest, (int64_t)reply->n_orderedchatroommemberlist);
    for (i = 0; i < reply->n_orderedchatroommemberlist; ++i) {
      const ChatroomMemberStatus* member = reply->orderedchatroommemberlist[i];
      digest_number(digest, member->userid);
      digest_number(digest, member->available != 0);
      digest_text(digest, member->name);
    }
    digest_text(digest, reply->title);
    digest_number(digest, reply->msgttl);
  }
  allow_chat_reply__free_unpacked(reply, NULL);
}

const struct implementation implementation = {"protobuf-c", echo_reply,   chat_request,
                                              chat_reply,   message_page, chatroom_entry};
