// The exchanges of the message plug-in, one function each way, in the order of the interface's
// table. Every function is read top-down in the order in which things happen: that order, the log
// texts and what is not tested are all part of the interface.

#include "qel-message-serialize.h"

#include <stdlib.h>
#include <string.h>

#include "call-frame.h"
#include "log-line.h"
#include "msgspec_frontend.pb.h"

#ifdef NDEBUG
#error "NDEBUG is defined: the setters' assertions are part of the interface; build without it"
#endif

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

  // Unlike in the other replies, the outcome is always written.
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

// ---- Sending chat messages

int chat_request_serialize(int64_t requestId, int64_t chatroomId, int64_t msgId, int msgType,
                           const char* chatMsg, int msgTtl, int /*reserved*/,
                           unsigned char** serialized_data, int* size) {
  constexpr unsigned kMaxMsgType = 30;
  constexpr int kMaxChatMsgLength = 40000;

  ChatRequest request;
  QEL_LOG(kLogDebug, "%s start", __func__);

  request.set_requestid(requestId);
  request.set_chatroomid(chatroomId);
  ChatMessageParam* param = request.add_chatmessageparams();
  param->set_msgid(msgId);
  param->set_msgttl(msgTtl);

  // The text has kept an older bound.
  if (static_cast<unsigned>(msgType) > kMaxMsgType) {
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
  if (reply.has_result()) {
    copy_result(reply.result(), resultCode, resultMsg);
  }

  const int entries = reply.processedmessageentries_size();
  QEL_LOG(kLogDebug, "processed msg entry size : %d", entries);
  *count = entries;
  if (entries > 0) {
    if (msgIds != nullptr) {
      *msgIds = static_cast<int64_t*>(calloc(static_cast<size_t>(entries), sizeof(int64_t)));
    }
    if (sentTimes != nullptr) {
      *sentTimes = static_cast<int64_t*>(calloc(static_cast<size_t>(entries), sizeof(int64_t)));
    }
    // Required by now, and not tested. NOLINTNEXTLINE(clang-analyzer-core.NullDereference)
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
  if (reply.has_result()) {
    copy_result(reply.result(), resultCode, resultMsg);
  }

  QEL_LOG(kLogWarn, "%s: exit", __func__);
}
