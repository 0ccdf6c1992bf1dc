// The outputs of each deserializer, set to sentinels before the call. Where a reply carries a
// result, read() also takes other pointers for its code and its text.
#ifndef TESTS_SUPPORT_OUTPUTS_H
#define TESTS_SUPPORT_OUTPUTS_H

#include <cstdint>
#include <cstdlib>
#include <string>

#include "qel-message-serialize.h"
#include "support/received.h"
#include "support/sentinels.h"

namespace support {

// Of the replies that hand out their id and their result.
template <auto Deserialize>
struct ResultOutputs {
  int64_t request_id = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;

  void read(const std::string& bytes) { read(bytes, &code, &text.block); }
  void read(const std::string& bytes, int* result_code, char** result_msg) {
    const Received received(bytes);
    Deserialize(received.data(), received.size(), &request_id, result_code, result_msg);
  }
  bool untouched() const {
    return request_id == kLongSentinel && code == kIntSentinel && text.untouched();
  }
};

using ChannelAuthReplyOutputs = ResultOutputs<channel_auth_reply_deserialize>;
using GetAllUnreadMessageReplyOutputs = ResultOutputs<get_all_unread_message_reply_deserialize>;
using EndChatReplyOutputs = ResultOutputs<end_chat_reply_deserialize>;
using SaveCallLogReplyOutputs = ResultOutputs<save_call_log_reply_deserialize>;

// Of the replies that hand out their chatroom's id too.
template <auto Deserialize>
struct ChatroomResultOutputs {
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;

  void read(const std::string& bytes) { read(bytes, &code, &text.block); }
  void read(const std::string& bytes, int* result_code, char** result_msg) {
    const Received received(bytes);
    Deserialize(received.data(), received.size(), &request_id, &chatroom_id, result_code,
                result_msg);
  }
  bool untouched() const {
    return request_id == kLongSentinel && chatroom_id == kLongSentinel && code == kIntSentinel &&
           text.untouched();
  }
};

using ReadMessageReplyOutputs = ChatroomResultOutputs<read_message_reply_deserialize>;
using UnsealMessageReplyOutputs = ChatroomResultOutputs<unseal_message_reply_deserialize>;
using ChangeChatroomMetaReplyOutputs =
    ChatroomResultOutputs<change_chatroom_meta_reply_deserialize>;

struct ClientEchoOutputs {
  int64_t request_id = kLongSentinel;

  void read(const std::string& bytes) {
    const Received received(bytes);
    client_echo_deserialize(received.data(), received.size(), &request_id);
  }
  bool untouched() const { return request_id == kLongSentinel; }
};

struct CreateChatroomReplyOutputs {
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int ttl = kIntSentinel;
  int code = kIntSentinel;
  TextOutput text;
  ListOutput<int64_t> invalid;
  ListOutput<int64_t> disabled;
  ListOutput<qel_message_didviolationuser_t> violations;
  ListOutput<int64_t> denied;

  void read(const std::string& bytes) { read(bytes, &code, &text.block); }
  void read(const std::string& bytes, int* result_code, char** result_msg) {
    const Received received(bytes);
    create_chatroom_reply_deserialize(
        received.data(), received.size(), &request_id, &chatroom_id, &ttl, result_code, result_msg,
        &invalid.array.block, &invalid.count, &disabled.array.block, &disabled.count,
        &violations.array.block, &violations.count, &denied.array.block, &denied.count);
  }
  bool details_untouched() const {
    return invalid.untouched() && disabled.untouched() && violations.untouched() &&
           denied.untouched();
  }
  bool untouched() const {
    return request_id == kLongSentinel && chatroom_id == kLongSentinel && ttl == kIntSentinel &&
           code == kIntSentinel && text.untouched() && details_untouched();
  }
};

struct ChatReplyOutputs {
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;
  int count = kIntSentinel;
  IdListOutput ids;
  IdListOutput times;

  void read(const std::string& bytes) { read(bytes, &code, &text.block); }
  void read(const std::string& bytes, int* result_code, char** result_msg) {
    const Received received(bytes);
    chat_reply_deserialize(received.data(), received.size(), &request_id, &chatroom_id, result_code,
                           result_msg, &count, &ids.block, &times.block);
  }
  bool untouched() const {
    return request_id == kLongSentinel && chatroom_id == kLongSentinel && code == kIntSentinel &&
           text.untouched() && count == kIntSentinel && ids.untouched() && times.untouched();
  }
};

// What a record points to, and the record itself.
inline void release(qel_message_watermarkentry_t* record) {
  std::free(record);
}
inline void release(qel_message_chatroommember_t* record) {
  std::free(record->name);
  std::free(record);
}
inline void release(qel_message_inboxentry_t* record) {
  std::free(record->chatMsg);
  std::free(record);
}

// An array of pointers to records, and its count.
template <typename Record>
struct RecordListOutput : ListOutput<Record*> {
  ~RecordListOutput() {
    for (Record* record : this->elements()) {
      release(record);
    }
  }
};

struct AllowChatReplyOutputs {
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;
  RecordListOutput<qel_message_watermarkentry_t> deliveries;
  int64_t last_delivery = kLongSentinel;
  RecordListOutput<qel_message_watermarkentry_t> reads;
  int64_t last_read = kLongSentinel;
  RecordListOutput<qel_message_chatroommember_t> members;
  TextOutput title;
  int ttl = kIntSentinel;

  void read(const std::string& bytes) { read(bytes, &code, &text.block); }
  void read(const std::string& bytes, int* result_code, char** result_msg) {
    const Received received(bytes);
    allow_chat_reply_deserialize(
        received.data(), received.size(), &request_id, &chatroom_id, result_code, result_msg,
        &deliveries.array.block, &deliveries.count, &last_delivery, &reads.array.block,
        &reads.count, &last_read, &members.array.block, &members.count, &title.block, &ttl);
  }
  bool untouched() const {
    return request_id == kLongSentinel && chatroom_id == kLongSentinel && code == kIntSentinel &&
           text.untouched() && deliveries.untouched() && last_delivery == kLongSentinel &&
           reads.untouched() && last_read == kLongSentinel && members.untouched() &&
           title.untouched() && ttl == kIntSentinel;
  }
};

// With a record of the caller's whose fields are sentinels.
struct ForwardOnlineMessageOutputs {
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int chat_type = kIntSentinel;
  TextOutput chat_msg;  // the record's, released from here
  qel_message_inboxentry_t record = {kLongSentinel, kIntSentinel,  kLongSentinel,
                                     kLongSentinel, kLongSentinel, chat_msg.block,
                                     kLongSentinel, kIntSentinel,  kIntSentinel};
  qel_message_inboxentry_t* entry = &record;
  FlagOutput skip;
  int error_code = kIntSentinel;
  TextOutput error_text;

  void read(const std::string& bytes) {
    const Received received(bytes);
    forward_online_message_get_deserialize(received.data(), received.size(), &request_id,
                                           &chatroom_id, &chat_type, &entry, skip.pointer(),
                                           &error_code, &error_text.block);
    chat_msg.block = record.chatMsg;
  }
  bool record_untouched() const {
    return record.msgId == kLongSentinel && record.msgType == kIntSentinel &&
           record.sender == kLongSentinel && record.receiver == kLongSentinel &&
           record.sentTime == kLongSentinel && chat_msg.untouched() &&
           record.chatroomId == kLongSentinel && record.chatType == kIntSentinel &&
           record.msgTtl == kIntSentinel;
  }
  bool untouched() const {
    return request_id == kLongSentinel && chatroom_id == kLongSentinel &&
           chat_type == kIntSentinel && record_untouched() && entry == &record &&
           skip.untouched() && error_code == kIntSentinel && error_text.untouched();
  }
};

struct ForwardUnreadMessageOutputs {
  int64_t request_id = kLongSentinel;
  RecordListOutput<qel_message_inboxentry_t> entries;
  TextOutput next_key;

  void read(const std::string& bytes) { read(bytes, &next_key.block); }
  // With another pointer for the key.
  void read(const std::string& bytes, char** next_pagination_key) {
    const Received received(bytes);
    forward_unread_message_deserialize(received.data(), received.size(), &request_id,
                                       &entries.array.block, &entries.count, next_pagination_key);
  }
  bool untouched() const {
    return request_id == kLongSentinel && entries.untouched() && next_key.untouched();
  }
};

struct InviteReplyOutputs {
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int64_t sent_time = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;
  ListOutput<int64_t> invalid;
  ListOutput<int64_t> interrupted;
  ListOutput<int64_t> disabled;
  ListOutput<int64_t> existing;
  ListOutput<qel_message_didviolationuser_t> violations;
  ListOutput<int64_t> denied;

  void read(const std::string& bytes) { read(bytes, &code, &text.block); }
  void read(const std::string& bytes, int* result_code, char** result_msg) {
    read(bytes, &sent_time, result_code, result_msg);
  }
  // With another pointer for the time too.
  void read(const std::string& bytes, int64_t* time, int* result_code, char** result_msg) {
    const Received received(bytes);
    invite_reply_deserialize(
        received.data(), received.size(), &request_id, &chatroom_id, time, result_code, result_msg,
        &invalid.array.block, &invalid.count, &interrupted.array.block, &interrupted.count,
        &disabled.array.block, &disabled.count, &existing.array.block, &existing.count,
        &violations.array.block, &violations.count, &denied.array.block, &denied.count);
  }
  bool details_untouched() const {
    return invalid.untouched() && interrupted.untouched() && disabled.untouched() &&
           existing.untouched() && violations.untouched() && denied.untouched();
  }
  bool untouched() const {
    return request_id == kLongSentinel && chatroom_id == kLongSentinel &&
           sent_time == kLongSentinel && code == kIntSentinel && text.untouched() &&
           details_untouched();
  }
};

struct CurrentTimeOutputs {
  int64_t request_id = kLongSentinel;
  int64_t millis = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;

  void read(const std::string& bytes) { read(bytes, &code, &text.block); }
  void read(const std::string& bytes, int* result_code, char** result_msg) {
    const Received received(bytes);
    current_time_deserialize(received.data(), received.size(), &request_id, &millis, result_code,
                             result_msg);
  }
  bool untouched() const {
    return request_id == kLongSentinel && millis == kLongSentinel && code == kIntSentinel &&
           text.untouched();
  }
};

struct TypingUpdatedOutputs {
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int64_t sender = kLongSentinel;
  TextOutput state;
  int content_type = kIntSentinel;
  int refresh = kIntSentinel;

  void read(const std::string& bytes) {
    const Received received(bytes);
    typing_updated_deserialize(received.data(), received.size(), &request_id, &chatroom_id, &sender,
                               &state.block, &content_type, &refresh);
  }
  bool untouched() const {
    return request_id == kLongSentinel && chatroom_id == kLongSentinel && sender == kLongSentinel &&
           state.untouched() && content_type == kIntSentinel && refresh == kIntSentinel;
  }
};

}  // namespace support

#endif
