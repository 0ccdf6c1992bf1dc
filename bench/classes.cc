// The calls with the generated classes alone, as a careful user would write them. The file is built
// with two versions of the classes; the build names each.

#include <cstdlib>
#include <cstring>
#include <string>

#include "msgspec_frontend.pb.h"
#include "records.h"

namespace {

template <typename T>
T* checked(T* block) {
  if (block == nullptr) {
    abort();
  }
  return block;
}

// T may be a pointer to a record.
template <typename T>
T* allocate(int count) {
  // NOLINTNEXTLINE(bugprone-sizeof-expression)
  return checked(static_cast<T*>(malloc(static_cast<size_t>(count) * sizeof(T))));
}
template <typename T>
T* allocate_zeroed(int count) {
  // NOLINTNEXTLINE(bugprone-sizeof-expression)
  return checked(static_cast<T*>(calloc(static_cast<size_t>(count), sizeof(T))));
}

char* copy_text(const std::string& text) {
  return checked(strdup(text.c_str()));
}

template <typename Message>
unsigned char* encode(const Message& message, int* size) {
#if GOOGLE_PROTOBUF_VERSION < 3000000
  *size = message.ByteSize();
#else
  *size = static_cast<int>(message.ByteSizeLong());
#endif
  auto* block = allocate_zeroed<unsigned char>(*size);
  message.SerializeWithCachedSizesToArray(block);
  return block;
}

template <typename Message>
void parse(const unsigned char* data, int size, Message* message) {
  if (!message->ParseFromArray(data, size)) {
    abort();
  }
}

// ---- Requests

unsigned char* echo_reply(int64_t request_id, int* size) {
  ClientEchoReply reply;
  reply.set_requestid(request_id);
  return encode(reply, size);
}

unsigned char* chat_request(const char* text, int* size) {
  ChatRequest request;
  request.set_requestid(kRequestId);
  request.set_chatroomid(kChatroomId);
  ChatMessageParam* param = request.add_chatmessageparams();
  param->set_msgid(kMessageId);
  param->set_msgtype(static_cast<MsgType>(kMessageType));
  param->set_chatmsg(text, strlen(text));
  param->set_msgttl(kMessageTtl);
  return encode(request, size);
}

// ---- Received messages. As in the library, the message is destroyed before its data is used.

struct ReplyHead {
  int64_t request_id;
  int64_t chatroom_id;
  int code;
  char* text;
};

template <typename Reply>
ReplyHead head_of(const Reply& reply) {
  const Result& result = reply.result();
  return {reply.requestid(), reply.chatroomid(), result.code(), copy_text(result.msg())};
}

void digest_head(struct digest* digest, const ReplyHead& head) {
  digest_reply(head.request_id, head.chatroom_id, head.code, head.text, digest);
}

struct ProcessedMessages {
  ReplyHead head;
  int count;
  int64_t* ids;
  int64_t* times;
};

ProcessedMessages read_chat_reply(const unsigned char* data, int size) {
  ChatReply reply;
  parse(data, size, &reply);
  const int count = reply.processedmessageentries_size();
  const ProcessedMessages read = {head_of(reply), count, allocate_zeroed<int64_t>(count),
                                  allocate_zeroed<int64_t>(count)};
  for (int i = 0; i < count; ++i) {
    const ProcessedMessageEntry& entry = reply.processedmessageentries(i);
    read.ids[i] = entry.msgid();
    read.times[i] = entry.senttime();
  }
  return read;
}

void chat_reply(const unsigned char* data, int size, struct digest* digest) {
  const ProcessedMessages read = read_chat_reply(data, size);
  if (digest != nullptr) {
    digest_head(digest, read.head);
  }
  free(read.head.text);
  finish_processed(read.ids, read.times, read.count, digest);
}

struct Page {
  int64_t request_id;
  int count;
  qel_message_inboxentry_t** entries;
  char* next;
};

Page read_message_page(const unsigned char* data, int size) {
  ForwardUnreadMessage push;
  parse(data, size, &push);
  Page page;
  page.request_id = push.requestid();
  page.count = push.inboxentries_size();
  page.entries = allocate_zeroed<qel_message_inboxentry_t*>(page.count);
  for (int i = 0; i < page.count; ++i) {
    const InboxEntry& entry = push.inboxentries(i);
    auto* record = allocate_zeroed<qel_message_inboxentry_t>(1);
    page.entries[i] = record;
    record->msgId = entry.msgid();
    record->msgType = entry.msgtype();
    record->sender = entry.sender();
    record->receiver = entry.receiver();
    record->sentTime = entry.senttime();
    record->chatMsg = copy_text(entry.chatmsg());
    record->chatroomId = entry.chatroomid();
    record->chatType = entry.chattype();
    record->msgTtl = entry.msgttl();
  }
  page.next = copy_text(push.nextpaginationkey());
  return page;
}

void message_page(const unsigned char* data, int size, struct digest* digest) {
  const Page page = read_message_page(data, size);
  if (digest != nullptr) {
    digest_number(digest, page.request_id);
  }
  finish_messages(page.entries, page.count, digest);
  if (digest != nullptr) {
    digest_text(digest, page.next);
  }
  free(page.next);
}

struct Watermarks {
  int count;
  qel_message_watermarkentry_t** entries;
};

Watermarks copy_watermarks(const google::protobuf::RepeatedPtrField<WaterMarkEntry>& marks) {
  const int count = marks.size();
  const Watermarks copy = {count, allocate<qel_message_watermarkentry_t*>(count)};
  for (int i = 0; i < count; ++i) {
    const WaterMarkEntry& mark = marks.Get(i);
    auto* record = allocate<qel_message_watermarkentry_t>(1);
    copy.entries[i] = record;
    record->userId = mark.userid();
    record->msgId = mark.msgid();
    record->timestamp = mark.timestamp();
  }
  return copy;
}

struct Chatroom {
  ReplyHead head;
  int64_t delivery_time;
  Watermarks delivery;
  int64_t read_time;
  Watermarks read;
  int member_count;
  qel_message_chatroommember_t** members;
  char* title;
  int msg_ttl;
};

Chatroom read_chatroom_entry(const unsigned char* data, int size) {
  AllowChatReply reply;
  parse(data, size, &reply);
  Chatroom room;
  room.head = head_of(reply);
  room.delivery_time = reply.lastdeliveryacktimestamp();
  room.delivery = copy_watermarks(reply.deliveryackentries());
  room.read_time = reply.lastreadacktimestamp();
  room.read = copy_watermarks(reply.readackentries());
  room.member_count = reply.orderedchatroommemberlist_size();
  room.members = allocate<qel_message_chatroommember_t*>(room.member_count);
  for (int i = 0; i < room.member_count; ++i) {
    const ChatroomMemberStatus& status = reply.orderedchatroommemberlist(i);
    auto* member = allocate<qel_message_chatroommember_t>(1);
    room.members[i] = member;
    member->userId = status.userid();
    member->available = status.available() ? 1 : 0;
    member->name = copy_text(status.name());
  }
  room.title = copy_text(reply.title());
  room.msg_ttl = reply.msgttl();
  return room;
}

void chatroom_entry(const unsigned char* data, int size, struct digest* digest) {
  const Chatroom room = read_chatroom_entry(data, size);
  if (digest != nullptr) {
    digest_head(digest, room.head);
    digest_number(digest, room.delivery_time);
  }
  finish_watermarks(room.delivery.entries, room.delivery.count, digest);
  if (digest != nullptr) {
    digest_number(digest, room.read_time);
  }
  finish_watermarks(room.read.entries, room.read.count, digest);
  finish_members(room.members, room.member_count, digest);
  if (digest != nullptr) {
    digest_text(digest, room.title);
    digest_number(digest, room.msg_ttl);
  }
  free(room.head.text);
  free(room.title);
}

}  // namespace

const struct implementation implementation = {QEL_BENCH_NAME, echo_reply,   chat_request,
                                              chat_reply,     message_page, chatroom_entry};
