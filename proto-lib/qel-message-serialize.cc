// The functions of the public header, in the same order. The order of the steps in a function, the
// log texts and what is not checked are part of the interface. So are differences between functions
// that look alike: do not make them the same.

#include "qel-message-serialize.h"

#include <string.h>

#include "encode-and-parse.h"
#include "log-line.h"
#include "msgspec_frontend.pb.h"
#include "record-layout.h"

#ifdef NDEBUG
#error "NDEBUG is defined: the setters' assertions are part of the interface; build without it"
#endif

namespace {

constexpr int kMaxPageSize = 500;

// Whether count is 1 to 500. As an unsigned number, what is below 1 becomes too large.
constexpr bool is_page_size(int count) {
  return static_cast<unsigned>(count) - 1 < kMaxPageSize;
}

// Whether type is 0 to 30. Not all of these are members of MsgType. The log text of those who call
// this says 0~6: both the check and the text are part of the interface.
constexpr bool is_in_msg_type_range(int type) {
  return static_cast<unsigned>(type) <= 30;
}

// Whether the byte of a caller's bool is not 0. A bool is not simply tested, because the compiler
// assumes that its byte is 0 or 1 and would send any other number as it is.
bool is_true(const bool& flag) {
  return *reinterpret_cast<const volatile unsigned char*>(&flag) != 0;
}

}  // namespace

// ---- Stored messages: placeholders

void forward_stored_message_reply_serialize(int64_t /*requestId*/,
                                            const char** /*nextPaginationKey*/,
                                            const int* /*maxCount*/,
                                            unsigned char** /*serialized_data*/, int* /*size*/) {}

void forward_stored_message_deserialize(const unsigned char* /*data*/, int /*size*/,
                                        int64_t* /*requestId*/,
                                        qel_message_inboxentry_t*** /*inboxEntries*/,
                                        int* /*count*/, char** /*nextPaginationKey*/) {}

// ---- Channel authentication

int channel_auth_request_serialize(int64_t requestId, int64_t userId, int64_t deviceId,
                                   const char* appId, const char* accessToken,
                                   unsigned char** serialized_data, int* size) {
  ChannelAuthRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  request.set_userid(userId);
  request.set_deviceid(deviceId);
  request.set_appid(appId);
  request.set_accesstoken(accessToken);

  return encode(request, serialized_data, size);
}

void channel_auth_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                    int* resultCode, char** resultMsg) {
  QEL_LOG(kLogWarn, "%s start", __func__);

  ChannelAuthReply reply;
  const CodedInputStream* stream = parse(data, size, &reply);
  if (stream == nullptr) {
    return;
  }

  // Unlike other replies, this one writes both outputs even if there is no result.
  *requestId = reply.requestid();
  *resultCode = reply.result().code();
  *resultMsg = reply.result().has_msg() ? copy_text(reply.result().msg()) : nullptr;

  delete stream;
}

// ---- Echo

int client_echo_reply_serialize(int64_t requestId, unsigned char** serialized_data, int* size) {
  ClientEchoReply reply;
  QEL_LOG(kLogDebug, "%s start", __func__);

  reply.set_requestid(requestId);

  return encode(reply, serialized_data, size);
}

void client_echo_deserialize(const unsigned char* data, int size, int64_t* requestId) {
  QEL_LOG(kLogWarn, "%s start", __func__);

  ClientEcho echo;
  const CodedInputStream* stream = parse(data, size, &echo);
  if (stream == nullptr) {
    return;
  }

  *requestId = echo.requestid();

  delete stream;
  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Creating a chatroom

int create_chatroom_request_serialize(int64_t requestId, int chatType, const int64_t* receivers,
                                      int receiversCount, const char* chatroomTitle,
                                      unsigned char** serialized_data, int* size) {
  CreateChatroomRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  if (receivers == nullptr) {
    QEL_LOG(kLogError, "invalid parameter: receivers is null");
    return -1;
  }

  request.set_requestid(requestId);
  request.set_chattype(static_cast<ChatType>(chatType));
  for (int i = 0; i < receiversCount; ++i) {
    request.add_receivers(receivers[i]);
  }
  if (chatroomTitle != nullptr) {
    request.set_chatroomtitle(chatroomTitle);
  }

  return encode(request, serialized_data, size);
}

void create_chatroom_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                       int64_t* chatroomId, int* msgTtl, int* resultCode,
                                       char** resultMsg, int64_t** invalidReceivers,
                                       int* invalidReceiversCount, int64_t** disabledReceivers,
                                       int* disabledReceiversCount,
                                       qel_message_didviolationuser_t** didViolationUsers,
                                       int* didViolationUsersCount, int64_t** invitationDenied,
                                       int* invitationDeniedCount) {
  QEL_LOG(kLogWarn, "%s: enter", __func__);

  CreateChatroomReply reply;
  WrongReceiverDetail detail;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  *chatroomId = reply.chatroomid();
  if (reply.has_msgttl()) {
    *msgTtl = reply.msgttl();
  }
  copy_result(reply, resultCode, resultMsg);

  // The code is read through the caller's pointer, which must not be NULL here and is not tested.
  if (reply.result().has_wrongreceiverdetail() &&
      // NOLINTNEXTLINE(clang-analyzer-core.NullDereference)
      (*resultCode == 1000 || *resultCode == 1001 || *resultCode == 3009)) {
    // Copied before any list is written: if memory runs out here, all lists are as they were.
    detail.CopyFrom(reply.result().wrongreceiverdetail());

    *invalidReceiversCount = detail.invalidreceivers_size();
    if (*invalidReceiversCount != 0 && *resultCode == 1001) {  // otherwise the count alone
      *invalidReceivers = allocate_zeroed<int64_t>(*invalidReceiversCount);
      QEL_LOG(kLogWarn, "%d invalidReceivers are detected", *invalidReceiversCount);
      for (int i = 0; i < *invalidReceiversCount; ++i) {
        (*invalidReceivers)[i] = detail.invalidreceivers(i);
        QEL_LOG(kLogWarn, "invalid Reciever id : %lld", lld((*invalidReceivers)[i]));
      }
    }

    *disabledReceiversCount = detail.disabledreceivers_size();
    if (*disabledReceiversCount != 0) {
      *disabledReceivers = allocate_zeroed<int64_t>(*disabledReceiversCount);
      QEL_LOG(kLogWarn, "%d disabledReceivers are detected", *disabledReceiversCount);
      for (int i = 0; i < *disabledReceiversCount; ++i) {
        (*disabledReceivers)[i] = detail.disabledreceivers(i);
        QEL_LOG(kLogWarn, "disabled Reciever id : %lld", lld((*disabledReceivers)[i]));
      }
    }

    *didViolationUsersCount = detail.didviolationusers_size();
    if (*didViolationUsersCount != 0) {
      *didViolationUsers = allocate_zeroed<qel_message_didviolationuser_t>(*didViolationUsersCount);
      QEL_LOG(kLogWarn, "%d didViolationUsers are detected", *didViolationUsersCount);
      for (int i = 0; i < *didViolationUsersCount; ++i) {
        const DIDViolationUser& pair = detail.didviolationusers(i);
        if (pair.has_usera()) {
          (*didViolationUsers)[i].userA = pair.usera();
          QEL_LOG(kLogWarn, "did violation usera's id : %lld", lld((*didViolationUsers)[i].userA));
        }
        if (pair.has_userb()) {
          (*didViolationUsers)[i].userB = pair.userb();
          QEL_LOG(kLogWarn, "did violation userb's id : %lld", lld((*didViolationUsers)[i].userB));
        }
      }
    }

    *invitationDeniedCount = detail.invitationdenied_size();
    if (*invitationDeniedCount != 0) {
      *invitationDenied = allocate_zeroed<int64_t>(*invitationDeniedCount);
      for (int i = 0; i < *invitationDeniedCount; ++i) {
        (*invitationDenied)[i] = detail.invitationdenied(i);
        QEL_LOG(kLogWarn, "did invitation denied: %lld", lld((*invitationDenied)[i]));
      }
    }
  }

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Sending chat messages

int chat_request_serialize(int64_t requestId, int64_t chatroomId, int64_t msgId, int msgType,
                           const char* chatMsg, int msgTtl, int /*reserved*/,
                           unsigned char** serialized_data, int* size) {
  constexpr int kMaxChatMsgLength = 40000;

  ChatRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  request.set_chatroomid(chatroomId);
  ChatMessageParam* param = request.add_chatmessageparams();
  param->set_msgid(msgId);
  param->set_msgttl(msgTtl);

  if (!is_in_msg_type_range(msgType)) {
    QEL_LOG(kLogError, "msgType is out of range(0~6)");
    return -1;
  }
  param->set_msgtype(static_cast<MsgType>(msgType));

  if (chatMsg == nullptr) {
    QEL_LOG(kLogError, "no message");
    return -1;
  }
  const size_t length = strlen(chatMsg);
  if (length > kMaxChatMsgLength) {
    QEL_LOG(kLogError, "chatMsg length(%d) cannot be greater than %d", static_cast<int>(length),
            kMaxChatMsgLength);
    return -1;
  }
  param->set_chatmsg(chatMsg, length);

  return encode(request, serialized_data, size);
}

void chat_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                            int64_t* chatroomId, int* resultCode, char** resultMsg, int* count,
                            int64_t** msgIds, int64_t** sentTimes) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  ChatReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  if (requestId != nullptr) {
    *requestId = reply.requestid();
  }
  if (chatroomId != nullptr) {
    *chatroomId = reply.chatroomid();
  }
  copy_result(reply, resultCode, resultMsg);

  const int entries = reply.processedmessageentries_size();
  QEL_LOG(kLogDebug, "processed msg entry size : %d", entries);
  *count = entries;
  if (entries > 0) {
    if (msgIds != nullptr) {
      *msgIds = allocate_zeroed<int64_t>(entries);
    }
    if (sentTimes != nullptr) {
      *sentTimes = allocate_zeroed<int64_t>(entries);
    }
    // Must not be NULL here, not tested. NOLINTNEXTLINE(clang-analyzer-core.NullDereference)
    if (*msgIds == nullptr || *sentTimes == nullptr) {
      QEL_LOG(kLogError, "memory allocation error(msgId, sentTime)");
      *count = 0;  // an array that was allocated stays with the caller
      return;
    }
    for (int i = 0; i < entries; ++i) {
      const ProcessedMessageEntry& entry = reply.processedmessageentries(i);
      if (entry.has_msgid()) {
        (*msgIds)[i] = entry.msgid();
      }
      if (entry.has_senttime()) {
        (*sentTimes)[i] = entry.senttime();
      }
    }
  }

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Entering a chatroom

int allow_chat_request_serialize(int64_t requestId, int64_t chatroomId, const bool* isAutoAllow,
                                 int maxCount, bool needDeliveryAck,
                                 int64_t lastDeliveryAckTimestamp, bool needReadAck,
                                 int64_t lastReadAckTimestamp, bool needOrderedChatroomMemberList,
                                 bool needChatroomMeta, unsigned char** serialized_data,
                                 int* size) {
  AllowChatRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  request.set_chatroomid(chatroomId);
  if (isAutoAllow != nullptr) {
    request.set_isautoallow(is_true(*isAutoAllow));
  }
  request.set_maxcount(is_page_size(maxCount) ? maxCount : kMaxPageSize);
  request.set_needdeliveryack(is_true(needDeliveryAck));
  if (request.needdeliveryack()) {
    request.set_lastdeliveryacktimestamp(lastDeliveryAckTimestamp);
  }
  request.set_needreadack(is_true(needReadAck));
  if (request.needreadack()) {
    request.set_lastreadacktimestamp(lastReadAckTimestamp);
  }
  request.set_needorderedchatroommemberlist(is_true(needOrderedChatroomMemberList));
  request.set_needchatroommeta(is_true(needChatroomMeta));

  return encode(request, serialized_data, size);
}

namespace {

// Each record is a block of its own, and the list an array of pointers to them.
void copy_watermarks(const google::protobuf::RepeatedPtrField<WaterMarkEntry>& marks,
                     qel_message_watermarkentry_t*** entries, int* count) {
  *count = marks.size();
  if (*count > 0) {
    *entries = allocate<qel_message_watermarkentry_t*>(*count);
    for (int i = 0; i < *count; ++i) {
      const WaterMarkEntry& mark = marks.Get(i);
      auto* entry = allocate<qel_message_watermarkentry_t>(1);
      (*entries)[i] = entry;
      entry->userId = mark.userid();
      entry->msgId = mark.msgid();
      entry->timestamp = mark.timestamp();
    }
  }
}

}  // namespace

void allow_chat_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                  int64_t* chatroomId, int* resultCode, char** resultMsg,
                                  qel_message_watermarkentry_t*** deliveryAckEntries,
                                  int* deliveryAckCount, int64_t* lastDeliveryAckTimestamp,
                                  qel_message_watermarkentry_t*** readAckEntries, int* readAckCount,
                                  int64_t* lastReadAckTimestamp,
                                  qel_message_chatroommember_t*** members, int* memberCount,
                                  char** title, int* msgTtl) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  AllowChatReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  *chatroomId = reply.chatroomid();
  if (reply.has_result()) {
    *resultCode = reply.result().code();  // not tested for NULL, unlike in most replies
    copy_result_msg(reply.result(), resultMsg);
  }

  if (reply.has_lastdeliveryacktimestamp()) {
    *lastDeliveryAckTimestamp = reply.lastdeliveryacktimestamp();
  }
  copy_watermarks(reply.deliveryackentries(), deliveryAckEntries, deliveryAckCount);
  if (reply.has_lastreadacktimestamp()) {
    *lastReadAckTimestamp = reply.lastreadacktimestamp();
  }
  copy_watermarks(reply.readackentries(), readAckEntries, readAckCount);

  *memberCount = reply.orderedchatroommemberlist_size();
  if (*memberCount > 0) {
    *members = allocate<qel_message_chatroommember_t*>(*memberCount);
    for (int i = 0; i < *memberCount; ++i) {
      const ChatroomMemberStatus& status = reply.orderedchatroommemberlist(i);
      auto* member = allocate<qel_message_chatroommember_t>(1);
      (*members)[i] = member;
      member->userId = status.userid();
      member->available = status.available() ? 1 : 0;
      member->name = copy_text(status.name());
    }
  }

  if (reply.has_title()) {
    *title = copy_text(reply.title());
  }
  if (reply.has_msgttl()) {
    *msgTtl = reply.msgttl();
  }

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Fetching unread messages

int get_all_unread_message_request_serialize(int64_t requestId, const int* maxCount,
                                             unsigned char** serialized_data, int* size) {
  GetAllUnreadMessageRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  if (maxCount != nullptr) {
    request.set_maxcount(is_page_size(*maxCount) ? *maxCount : kMaxPageSize);
  }

  return encode(request, serialized_data, size);
}

void get_all_unread_message_reply_deserialize(const unsigned char* data, int size,
                                              int64_t* requestId, int* resultCode,
                                              char** resultMsg) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  GetAllUnreadMessageReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  copy_result(reply, resultCode, resultMsg);

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Push of one message

int forward_online_message_reply_serialize(int64_t requestId, int64_t chatroomId,
                                           const bool* markAsRead, unsigned char** serialized_data,
                                           int* size) {
  ForwardOnlineMessageReply reply;
  QEL_LOG(kLogDebug, "%s start", __func__);

  reply.set_requestid(requestId);
  reply.set_chatroomid(chatroomId);
  if (markAsRead != nullptr) {
    reply.set_markasread(is_true(*markAsRead));
  }

  return encode(reply, serialized_data, size);
}

void forward_online_message_get_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                            int64_t* chatroomId, int* chatType,
                                            qel_message_inboxentry_t** inboxEntry, bool* skipReply,
                                            int* errorCode, char** errorMsg) {
  // Most of this function's traces are at error level, although nothing has failed.
  QEL_LOG(kLogError, "check ");
  QEL_LOG(kLogWarn, "%s: start", __func__);

  ForwardOnlineMessage push;
  if (parse(data, size, &push) == nullptr) {
    return;
  }

  *requestId = push.requestid();
  *chatroomId = push.chatroomid();
  *chatType = push.chattype();
  if (push.has_skipreply()) {
    QEL_LOG(kLogError, "has_skipreply:true ");
    QEL_LOG(kLogInfo, "skipreply: %d", push.skipreply());
    *skipReply = push.skipreply();
  } else {
    QEL_LOG(kLogError, "has_skipreply:false ");
    *skipReply = false;
  }

  // Copied before the record is written: if memory runs out here, the record is as it was. The copy
  // constructor is not used, because it loses what it has allocated when memory runs out.
  InboxEntry entry;
  entry.CopyFrom(push.inboxentry());
  if (*inboxEntry == nullptr) {  // the caller gave no record
    *errorCode = 18;
    *errorMsg = strdup("inboxentry memory allocation failed");
  } else {
    // The record's chatroomId and chatType stay as they are: both are outputs of their own.
    qel_message_inboxentry_t* record = *inboxEntry;
    record->msgId = entry.msgid();
    record->msgType = entry.msgtype();
    QEL_LOG(kLogError, "msgType : %d ", entry.msgtype());
    if (entry.has_sender()) {
      record->sender = entry.sender();
    }
    if (entry.has_receiver()) {
      record->receiver = entry.receiver();
    }
    record->sentTime = entry.senttime();
    record->chatMsg = copy_text(entry.chatmsg());
    if (entry.has_msgttl()) {
      record->msgTtl = entry.msgttl();
    }
  }

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Push of a page of stored messages

int forward_unread_message_reply_serialize(int64_t requestId, const char** nextPaginationKey,
                                           const int* maxCount, unsigned char** serialized_data,
                                           int* size) {
  ForwardUnreadMessageReply reply;
  QEL_LOG(kLogDebug, "%s start", __func__);

  reply.set_requestid(requestId);
  if (nextPaginationKey != nullptr && *nextPaginationKey != nullptr) {
    reply.set_nextpaginationkey(*nextPaginationKey);
  }
  if (maxCount != nullptr) {
    if (is_page_size(*maxCount)) {
      QEL_LOG(kLogWarn, "maxCount : %d", *maxCount);
      reply.set_maxcount(*maxCount);
    } else {
      QEL_LOG(kLogWarn, "maxCount is out of the range, maxCount : %d", *maxCount);
      reply.set_maxcount(kMaxPageSize);
    }
  }

  return encode(reply, serialized_data, size);
}

void forward_unread_message_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                        qel_message_inboxentry_t*** inboxEntries, int* count,
                                        char** nextPaginationKey) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  ForwardUnreadMessage push;
  if (parse(data, size, &push) == nullptr) {
    return;
  }

  *requestId = push.requestid();
  const int entries = push.inboxentries_size();
  *count = entries;
  if (entries > 0) {
    auto** records = allocate_zeroed<qel_message_inboxentry_t*>(entries);
    *inboxEntries = records;
    if (records == nullptr) {
      QEL_LOG(kLogError, "qel_message_inboxentry_t * allocation fail");
      return;
    }
    for (int i = 0; i < entries; ++i) {
      const InboxEntry& entry = push.inboxentries(i);
      auto* record = allocate_zeroed<qel_message_inboxentry_t>(1);
      records[i] = record;
      record->msgId = entry.msgid();
      record->msgType = entry.msgtype();
      record->sender = entry.sender();
      record->receiver = entry.receiver();
      record->sentTime = entry.senttime();
      record->chatMsg = copy_text(entry.chatmsg());
      if (entry.has_chatroomid()) {
        record->chatroomId = entry.chatroomid();
      }
      if (entry.has_chattype()) {
        record->chatType = entry.chattype();
      }
      if (entry.has_msgttl()) {
        record->msgTtl = entry.msgttl();
      }
    }
  }
  if (nextPaginationKey != nullptr && push.has_nextpaginationkey()) {
    *nextPaginationKey = copy_text(push.nextpaginationkey());
  }

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Read receipt

int read_message_request_serialize(int64_t requestId, int64_t chatroomId,
                                   const qel_message_inboxentry_t* inboxEntry,
                                   unsigned char** serialized_data, int* size) {
  ReadMessageRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  request.set_chatroomid(chatroomId);
  if (inboxEntry != nullptr) {
    InboxEntry* entry = request.mutable_inboxentry();
    entry->set_msgid(inboxEntry->msgId);
    if (!is_in_msg_type_range(inboxEntry->msgType)) {
      QEL_LOG(kLogError, "msgType is out of range(0~6)");
      return -1;
    }
    entry->set_msgtype(static_cast<MsgType>(inboxEntry->msgType));
    entry->set_sender(inboxEntry->sender);
    entry->set_senttime(inboxEntry->sentTime);
  }

  return encode(request, serialized_data, size);
}

void read_message_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                    int64_t* chatroomId, int* resultCode, char** resultMsg) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  ReadMessageReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  *chatroomId = reply.chatroomid();
  copy_result(reply, resultCode, resultMsg);

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Ending chats

int end_chat_request_serialize(int64_t requestId, const qel_message_endchatentry_t* entries,
                               int count, unsigned char** serialized_data, int* size) {
  EndChatRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  for (int i = 0; i < count; ++i) {
    EndChatEntry* entry = request.add_endchatentries();
    entry->set_chatroomid(entries[i].chatroomId);
    entry->set_denyinvitation(is_true(entries[i].denyInvitation));
  }

  return encode(request, serialized_data, size);
}

void end_chat_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                int* resultCode, char** resultMsg) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  EndChatReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  copy_result(reply, resultCode, resultMsg);

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Inviting members

int invite_chat_request_serialize(int64_t requestId, int64_t chatroomId,
                                  const int64_t* invitingMembers, const int* invitingMembersCount,
                                  unsigned char** serialized_data, int* size) {
  InviteRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  request.set_chatroomid(chatroomId);
  if (invitingMembersCount != nullptr) {
    QEL_LOG(kLogDebug, "in_invtingMemebersCount=%d\n", *invitingMembersCount);
    for (int i = 0; i < *invitingMembersCount; ++i) {
      request.add_invitingmembers(invitingMembers[i]);
    }
  }

  return encode(request, serialized_data, size);
}

void invite_reply_deserialize(
    const unsigned char* data, int size, int64_t* requestId, int64_t* chatroomId, int64_t* sentTime,
    int* resultCode, char** resultMsg, int64_t** invalidReceivers, int* invalidReceiversCount,
    int64_t** interruptedReceivers, int* interruptedReceiversCount, int64_t** disabledReceivers,
    int* disabledReceiversCount, int64_t** existingChatmembers, int* existingChatmembersCount,
    qel_message_didviolationuser_t** didViolationUsers, int* didViolationUsersCount,
    int64_t** invitationDenied, int* invitationDeniedCount) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  InviteReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  *chatroomId = reply.chatroomid();
  if (sentTime != nullptr && reply.has_senttime()) {
    *sentTime = reply.senttime();
  }
  copy_result(reply, resultCode, resultMsg);

  // The code is read through the caller's pointer, which must not be NULL here and is not tested.
  // Only the last two lists are zeroed, and all but the last log their count.
  if (reply.result().has_wrongreceiverdetail() &&
      // NOLINTNEXTLINE(clang-analyzer-core.NullDereference)
      (*resultCode == 1000 || *resultCode == 1001 || *resultCode == 3003 || *resultCode == 3009)) {
    const WrongReceiverDetail& detail = reply.result().wrongreceiverdetail();

    *invalidReceiversCount = detail.invalidreceivers_size();
    if (*invalidReceiversCount != 0) {
      QEL_LOG(kLogWarn, "%d invalidReceivers", *invalidReceiversCount);
      *invalidReceivers = allocate<int64_t>(*invalidReceiversCount);
      for (int i = 0; i < *invalidReceiversCount; ++i) {
        (*invalidReceivers)[i] = detail.invalidreceivers(i);
        QEL_LOG(kLogWarn, "invalidReceiver[%d] : %lld", i, lld((*invalidReceivers)[i]));
      }
    }

    *interruptedReceiversCount = detail.interruptedreceivers_size();
    if (*interruptedReceiversCount != 0) {
      QEL_LOG(kLogWarn, "%d interruptedReceivers", *interruptedReceiversCount);
      *interruptedReceivers = allocate<int64_t>(*interruptedReceiversCount);
      for (int i = 0; i < *interruptedReceiversCount; ++i) {
        (*interruptedReceivers)[i] = detail.interruptedreceivers(i);
        QEL_LOG(kLogWarn, "interruptedReceivers[%d] : %lld", i, lld((*interruptedReceivers)[i]));
      }
    }

    *disabledReceiversCount = detail.disabledreceivers_size();
    if (*disabledReceiversCount != 0) {
      QEL_LOG(kLogWarn, "%d disabledReceivers", *disabledReceiversCount);
      *disabledReceivers = allocate<int64_t>(*disabledReceiversCount);
      for (int i = 0; i < *disabledReceiversCount; ++i) {
        (*disabledReceivers)[i] = detail.disabledreceivers(i);
        QEL_LOG(kLogWarn, "disabledReceivers[%d] : %lld", i, lld((*disabledReceivers)[i]));
      }
    }

    *existingChatmembersCount = detail.existing_size();
    if (*existingChatmembersCount != 0) {
      QEL_LOG(kLogWarn, "%d existingChatmembers", *existingChatmembersCount);
      *existingChatmembers = allocate<int64_t>(*existingChatmembersCount);
      for (int i = 0; i < *existingChatmembersCount; ++i) {
        (*existingChatmembers)[i] = detail.existing(i);
        QEL_LOG(kLogWarn, "existingChatmembers[%d] : %lld", i, lld((*existingChatmembers)[i]));
      }
    }

    *didViolationUsersCount = detail.didviolationusers_size();
    if (*didViolationUsersCount != 0) {
      QEL_LOG(kLogWarn, "%d didviolationusersCount", *didViolationUsersCount);
      *didViolationUsers = allocate_zeroed<qel_message_didviolationuser_t>(*didViolationUsersCount);
      QEL_LOG(kLogWarn, "%d didViolationUsers are detected", *didViolationUsersCount);
      for (int i = 0; i < *didViolationUsersCount; ++i) {
        const DIDViolationUser& pair = detail.didviolationusers(i);
        if (pair.has_usera()) {
          (*didViolationUsers)[i].userA = pair.usera();
          QEL_LOG(kLogWarn, "did violation usera's id : %lld", lld((*didViolationUsers)[i].userA));
        }
        if (pair.has_userb()) {
          (*didViolationUsers)[i].userB = pair.userb();
          QEL_LOG(kLogWarn, "did violation userb's id : %lld", lld((*didViolationUsers)[i].userB));
        }
      }
    }

    *invitationDeniedCount = detail.invitationdenied_size();
    if (*invitationDeniedCount != 0) {
      *invitationDenied = allocate_zeroed<int64_t>(*invitationDeniedCount);
      for (int i = 0; i < *invitationDeniedCount; ++i) {
        (*invitationDenied)[i] = detail.invitationdenied(i);
        QEL_LOG(kLogWarn, "did denied invitations : %lld", lld((*invitationDenied)[i]));
      }
    }
  }

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- The service's clock

int current_time_request_serialize(int64_t requestId, unsigned char** serialized_data, int* size) {
  CurrentTimeRequest request;
  QEL_LOG(kLogDebug, "%s: enter", __func__);

  request.set_requestid(requestId);

  return encode(request, serialized_data, size);
}

void current_time_deserialize(const unsigned char* data, int size, int64_t* requestId,
                              int64_t* currentTimeMillis, int* resultCode, char** resultMsg) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  CurrentTimeReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  *currentTimeMillis = reply.has_currenttimemillis() ? reply.currenttimemillis() : -1;
  copy_result(reply, resultCode, resultMsg);

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Unsealing a message

int unseal_message_request_serialize(int64_t requestId, int64_t chatroomId, int64_t sender,
                                     int64_t msgId, const char* msgDetail,
                                     unsigned char** serialized_data, int* size) {
  UnsealMessageRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  request.set_chatroomid(chatroomId);
  request.set_sender(sender);
  request.set_msgid(msgId);
  if (msgDetail != nullptr) {
    request.set_msgdetail(msgDetail);
  }

  return encode(request, serialized_data, size);
}

void unseal_message_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                      int64_t* chatroomId, int* resultCode, char** resultMsg) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  UnsealMessageReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  *chatroomId = reply.chatroomid();
  copy_result(reply, resultCode, resultMsg);

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Call log

int save_call_log_request_serialize(int64_t requestId, int64_t chatroomId, const char* callId,
                                    const char* callLogType, int64_t sender, int64_t receiver,
                                    int conversationSeconds, unsigned char** serialized_data,
                                    int* size) {
  SaveCallLogRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  request.set_chatroomid(chatroomId);
  request.set_callid(callId);
  request.set_calllogtype(callLogType);
  request.set_sender(sender);
  request.set_receiver(receiver);
  request.set_conversationseconds(conversationSeconds);

  return encode(request, serialized_data, size);
}

void save_call_log_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                     int* resultCode, char** resultMsg) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  SaveCallLogReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  copy_result(reply, resultCode, resultMsg);

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Typing status

void is_typing_request_serialize(int64_t requestId, int64_t chatroomId, const char* state,
                                 const int* contentType, const int* refresh,
                                 unsigned char** serialized_data, int* size) {
  IsTyping notice;
  QEL_LOG(kLogDebug, "%s: enter", __func__);

  notice.set_requestid(requestId);
  notice.set_chatroomid(chatroomId);
  if (state != nullptr) {
    notice.set_state(state);
  }
  if (contentType != nullptr) {
    notice.set_contenttype(static_cast<IsTypingContentType>(*contentType));
  }
  if (refresh != nullptr) {
    notice.set_refresh(*refresh);
  }

  // Not encode(): there is no status, the length is not checked, and no line is at error level.
  *size = notice.ByteSize();
  *serialized_data = allocate_zeroed<unsigned char>(*size);
  if (*serialized_data == nullptr) {
    QEL_LOG(kLogDebug, "Memory allocation is failed to serialized_data");
    return;
  }
  notice.SerializeWithCachedSizesToArray(*serialized_data);
  QEL_LOG(kLogDebug, "%s: exit", __func__);
}

void typing_updated_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                int64_t* chatroomId, int64_t* sender, char** state,
                                int* contentType, int* refresh) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  TypingUpdated push;
  if (parse(data, size, &push) == nullptr) {
    return;
  }

  *requestId = push.requestid();
  *chatroomId = push.chatroomid();
  if (push.has_sender()) {
    *sender = push.sender();
  }
  if (push.has_state()) {
    *state = copy_text(push.state());
  }
  if (push.has_contenttype()) {
    *contentType = push.contenttype();
  }
  if (push.has_refresh()) {
    *refresh = push.refresh();
  }

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}

// ---- Changing a chatroom's title or lifetime

int change_chatroom_meta_request_serialize(int64_t requestId, int64_t chatroomId, const char* title,
                                           const int* msgTtl, unsigned char** serialized_data,
                                           int* size) {
  ChangeChatroomMetaRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);
  QEL_LOG(kLogDebug, "requestId: %lld", lld(requestId));

  request.set_requestid(requestId);
  request.set_chatroomid(chatroomId);
  const bool has_title = title != nullptr && *title != '\0';
  const bool has_ttl = msgTtl != nullptr && *msgTtl >= 0;
  if (has_title) {
    if (has_ttl) {
      QEL_LOG(kLogWarn, "both title and msgTtl are set, title is used, msgTtl skipped");
    }
    request.set_title(title);
  } else if (has_ttl) {
    request.set_msgttl(*msgTtl);
  } else {
    QEL_LOG(kLogError, "both title and msgTtl are empty");
    return -1;
  }

  return encode(request, serialized_data, size);
}

void change_chatroom_meta_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                            int64_t* chatroomId, int* resultCode,
                                            char** resultMsg) {
  QEL_LOG(kLogWarn, "%s: start", __func__);

  ChangeChatroomMetaReply reply;
  if (parse(data, size, &reply) == nullptr) {
    return;
  }

  *requestId = reply.requestid();
  *chatroomId = reply.chatroomid();
  copy_result(reply, resultCode, resultMsg);

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}
