/* The calls with nanopb. Its decoded messages are plain C data. With nanopb.options, lists and
 * texts are blocks of their own. */

#include <pb_decode.h>
#include <pb_encode.h>
#include <stdlib.h>

#include "calls.h"
#include "msgspec_frontend.pb.h"

static unsigned char* encode(const pb_msgdesc_t* fields, const void* message, int* size) {
  size_t length;
  unsigned char* block;
  pb_ostream_t stream;
  if (!pb_get_encoded_size(&length, fields, message)) {
    abort();
  }
  block = calloc(length, 1);
  if (block == NULL) {
    abort();
  }
  stream = pb_ostream_from_buffer(block, length);
  if (!pb_encode(&stream, fields, message)) {
    abort();
  }
  *size = (int)stream.bytes_written;
  return block;
}

static void decode(const unsigned char* data, int size, const pb_msgdesc_t* fields, void* message) {
  pb_istream_t stream = pb_istream_from_buffer(data, (size_t)size);
  if (!pb_decode(&stream, fields, message)) {
    abort();
  }
}

/* ---- Requests */

static unsigned char* echo_reply(int64_t request_id, int* size) {
  ClientEchoReply reply = ClientEchoReply_init_zero;
  reply.has_requestId = true;
  reply.requestId = request_id;
  return encode(ClientEchoReply_fields, &reply, size);
}

static unsigned char* chat_request(const char* text, int* size) {
  ChatMessageParam param = ChatMessageParam_init_zero;
  ChatRequest request = ChatRequest_init_zero;
  param.has_msgId = true;
  param.msgId = kMessageId;
  param.has_msgType = true;
  param.msgType = (MsgType)kMessageType;
  param.chatMsg = (char*)text; /* encoding does not write to it */
  param.has_msgTtl = true;
  param.msgTtl = kMessageTtl;
  request.has_requestId = true;
  request.requestId = kRequestId;
  request.has_chatroomId = true;
  request.chatroomId = kChatroomId;
  request.chatMessageParams_count = 1;
  request.chatMessageParams = &param;
  return encode(ChatRequest_fields, &request, size);
}

/* ---- Received messages */

static void digest_result(struct digest* digest, const Result* result) {
  digest_number(digest, result->code);
  digest_text(digest, result->msg);
}

static void chat_reply(const unsigned char* data, int size, struct digest* digest) {
  ChatReply reply = ChatReply_init_zero;
  decode(data, size, ChatReply_fields, &reply);
  if (digest != NULL) {
    pb_size_t i;
    digest_number(digest, reply.requestId);
    digest_number(digest, reply.chatroomId);
    digest_result(digest, &reply.result);
    digest_number(digest, reply.processedMessageEntries_count);
    for (i = 0; i < reply.processedMessageEntries_count; ++i) {
      digest_number(digest, reply.processedMessageEntries[i].msgId);
      digest_number(digest, reply.processedMessageEntries[i].sentTime);
    }
  }
  pb_release(ChatReply_fields, &reply);
}

static void message_page(const unsigned char* data, int size, struct digest* digest) {
  ForwardUnreadMessage push = ForwardUnreadMessage_init_zero;
  decode(data, size, ForwardUnreadMessage_fields, &push);
  if (digest != NULL) {
    pb_size_t i;
    digest_number(digest, push.requestId);
    digest_number(digest, push.inboxEntries_count);
    for (i = 0; i < push.inboxEntries_count; ++i) {
      const InboxEntry* entry = &push.inboxEntries[i];
      digest_number(digest, entry->msgId);
      digest_number(digest, entry->msgType);
      digest_number(digest, entry->sender);
      digest_number(digest, entry->receiver);
      digest_number(digest, entry->sentTime);
      digest_text(digest, entry->chatMsg);
      digest_number(digest, entry->chatroomId);
      digest_number(digest, entry->chatType);
      digest_number(digest, entry->msgTtl);
    }
    digest_text(digest, push.nextPaginationKey);
  }
  pb_release(ForwardUnreadMessage_fields, &push);
}

static void digest_watermarks(struct digest* digest, const WaterMarkEntry* marks, pb_size_t count) {
  pb_size_t i;
  digest_number(digest, count);
  for (i = 0; i < count; ++i) {
    digest_number(digest, marks[i].userId);
    digest_number(digest, marks[i].msgId);
    digest_number(digest, marks[i].timestamp);
  }
}

static void chatroom_entry(const unsigned char* data, int size, struct digest* digest) {
  AllowChatReply reply = AllowChatReply_init_zero;
  decode(data, size, AllowChatReply_fields, &reply);
  if (digest != NULL) {
    pb_size_t i;
    digest_number(digest, reply.requestId);
    digest_number(digest, reply.chatroomId);
    digest_result(digest, &reply.result);
    digest_number(digest, reply.lastDeliveryAckTimestamp);
    digest_watermarks(digest, reply.deliveryAckEntries, reply.deliveryAckEntries_count);
    digest_number(digest, reply.lastReadAckTimestamp);
    digest_watermarks(digest, reply.readAckEntries, reply.readAckEntries_count);
    digest_number(digest, reply.orderedChatroomMemberList_count);
    for (i = 0; i < reply.orderedChatroomMemberList_count; ++i) {
      const ChatroomMemberStatus* member = &reply.orderedChatroomMemberList[i];
      digest_number(digest, member->userId);
      digest_number(digest, member->available);
      digest_text(digest, member->name);
    }
    digest_text(digest, reply.title);
    digest_number(digest, reply.msgTtl);
  }
  pb_release(AllowChatReply_fields, &reply);
}

const struct implementation implementation = {"nanopb",   echo_reply,   chat_request,
                                              chat_reply, message_page, chatroom_entry};
