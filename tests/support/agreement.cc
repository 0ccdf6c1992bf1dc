#include "support/agreement.h"

#include <cstring>

namespace support {
namespace {

using Ids = ::google::protobuf::RepeatedField<::google::protobuf::int64>;

// An output, or an element of one, or its member.
struct Place {
  const char* output;
  int index = -1;
  const char* member = nullptr;

  Place(const char* output) : output(output) {}  // NOLINT(google-explicit-constructor)
  Place(const char* output, int index, const char* member = nullptr)
      : output(output), index(index), member(member) {}
};

// Collects the outputs that differ.
class Comparison {
 public:
  const std::string& differences() const { return differences_; }

  void number(const Place& place, int64_t got, int64_t wanted) {
    if (got != wanted) {
      differ(place, std::to_string(got), std::to_string(wanted));
    }
  }
  void number_if(bool is_written, const char* output, int64_t got, int64_t wanted,
                 int64_t sentinel) {
    number(output, got, is_written ? wanted : sentinel);
  }
  void id_if(bool is_written, const char* output, int64_t got, int64_t wanted) {
    number_if(is_written, output, got, wanted, kLongSentinel);
  }
  void int_if(bool is_written, const char* output, int got, int wanted) {
    number_if(is_written, output, got, wanted, kIntSentinel);
  }

  // A copy of the text up to its first NUL.
  void copy(const Place& place, const char* got, const std::string& text) {
    if (got == nullptr) {
      differ(place, "NULL", quoted(text.c_str()));
    } else if (std::strcmp(got, text.c_str()) != 0) {
      differ(place, quoted(got), quoted(text.c_str()));
    }
  }
  void text_if(bool is_written, const char* output, const TextOutput& got,
               const std::string& wanted) {
    if (!is_written) {
      unwritten(output, got);
    } else if (got.untouched()) {
      differ(output, "not written", quoted(wanted.c_str()));
    } else {
      copy(output, got.block, wanted);
    }
  }

  template <typename T>
  void unwritten(const char* output, const BlockOutput<T>& got) {
    if (!got.untouched()) {
      differ(output, got.block == nullptr ? "NULL" : "written", "not written");
    }
  }
  template <typename T>
  void unwritten(const char* output, const ListOutput<T>& got) {
    number(output, got.count, kIntSentinel);
    unwritten(output, got.array);
  }

  // Compares the count, and whether there is an array, which a count of 0 goes without. Returns how
  // many elements are left to be compared.
  template <typename T>
  int elements(const char* output, int count, const BlockOutput<T>& array, int wanted) {
    number(output, count, wanted);
    if (wanted == 0) {
      unwritten(output, array);
      return 0;
    }
    if (array.untouched() || array.block == nullptr) {
      differ(output, array.untouched() ? "not written" : "NULL", "an array");
      return 0;
    }
    return count == wanted ? count : 0;
  }
  template <typename T>
  int elements(const char* output, const ListOutput<T>& got, int wanted) {
    return elements(output, got.count, got.array, wanted);
  }

  void ids(const char* output, const ListOutput<int64_t>& got, const Ids& wanted) {
    const int count = elements(output, got, wanted.size());
    for (int i = 0; i < count; ++i) {
      number({output, i}, got.array.block[i], wanted.Get(i));
    }
  }

  void flag(const char* output, const FlagOutput& got, bool wanted) {
    number(output, got.value(), wanted ? 1 : 0);
    if (!got.neighbours_untouched()) {
      differ(output, "more than a byte written", "one byte");
    }
  }

 private:
  std::string differences_;

  static std::string quoted(const char* text) { return '"' + std::string(text) + '"'; }

  void differ(const Place& place, const std::string& got, const std::string& wanted) {
    differences_ += place.output;
    if (place.index >= 0) {
      differences_ += '[' + std::to_string(place.index) + ']';
    }
    if (place.member != nullptr) {
      differences_ += '.' + std::string(place.member);
    }
    differences_ += " is " + got + " instead of " + wanted + "; ";
  }
};

// A result's code and text are written only if they are there.
template <typename Outputs, typename Reply>
void compare_result(Comparison* compared, const Outputs& outputs, const Reply& reply) {
  compared->int_if(reply.has_result(), "code", outputs.code, reply.result().code());
  compared->text_if(reply.has_result() && reply.result().has_msg(), "text", outputs.text,
                    reply.result().msg());
}

template <typename Outputs, typename Reply>
std::string result_disagreement(const Outputs& outputs, const Reply& reply) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, reply.requestid());
  compare_result(&compared, outputs, reply);
  return compared.differences();
}

template <typename Outputs, typename Reply>
std::string chatroom_result_disagreement(const Outputs& outputs, const Reply& reply) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, reply.requestid());
  compared.number("chatroom_id", outputs.chatroom_id, reply.chatroomid());
  compare_result(&compared, outputs, reply);
  return compared.differences();
}

void compare_violations(Comparison* compared,
                        const ListOutput<qel_message_didviolationuser_t>& violations,
                        const WrongReceiverDetail& detail) {
  const int count = compared->elements("violations", violations, detail.didviolationusers_size());
  for (int i = 0; i < count; ++i) {
    const qel_message_didviolationuser_t& pair = violations.array.block[i];
    compared->number({"violations", i, "userA"}, pair.userA, detail.didviolationusers(i).usera());
    compared->number({"violations", i, "userB"}, pair.userB, detail.didviolationusers(i).userb());
  }
}

template <typename Entries>
void compare_marks(Comparison* compared, const char* output,
                   const ListOutput<qel_message_watermarkentry_t*>& marks, const Entries& entries) {
  const int count = compared->elements(output, marks, entries.size());
  for (int i = 0; i < count; ++i) {
    const qel_message_watermarkentry_t& mark = *marks.array.block[i];
    compared->number({output, i, "userId"}, mark.userId, entries.Get(i).userid());
    compared->number({output, i, "msgId"}, mark.msgId, entries.Get(i).msgid());
    compared->number({output, i, "timestamp"}, mark.timestamp, entries.Get(i).timestamp());
  }
}

}  // namespace

// Other than its siblings: all outputs are written, and an absent text is NULL.
std::string disagreement(const ChannelAuthReplyOutputs& outputs, const ChannelAuthReply& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  compared.number("code", outputs.code, message.result().code());
  if (message.result().has_msg()) {
    compared.text_if(true, "text", outputs.text, message.result().msg());
  } else if (outputs.text.block != nullptr) {
    return compared.differences() + "text is not NULL; ";
  }
  return compared.differences();
}

std::string disagreement(const ClientEchoOutputs& outputs, const ClientEcho& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  return compared.differences();
}

std::string disagreement(const CreateChatroomReplyOutputs& outputs,
                         const CreateChatroomReply& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  compared.number("chatroom_id", outputs.chatroom_id, message.chatroomid());
  compared.int_if(message.has_msgttl(), "ttl", outputs.ttl, message.msgttl());
  compare_result(&compared, outputs, message);

  const WrongReceiverDetail& detail = message.result().wrongreceiverdetail();
  const int code = message.result().code();
  const bool has_detail =
      message.result().has_wrongreceiverdetail() && (code == 1000 || code == 1001 || code == 3009);
  if (!has_detail) {
    compared.unwritten("invalid", outputs.invalid);
    compared.unwritten("disabled", outputs.disabled);
    compared.unwritten("violations", outputs.violations);
    compared.unwritten("denied", outputs.denied);
    return compared.differences();
  }
  if (code == 1001) {
    compared.ids("invalid", outputs.invalid, detail.invalidreceivers());
  } else {  // counted, but not handed out
    compared.number("invalid", outputs.invalid.count, detail.invalidreceivers_size());
    compared.unwritten("invalid", outputs.invalid.array);
  }
  compared.ids("disabled", outputs.disabled, detail.disabledreceivers());
  compare_violations(&compared, outputs.violations, detail);
  compared.ids("denied", outputs.denied, detail.invitationdenied());
  return compared.differences();
}

std::string disagreement(const ChatReplyOutputs& outputs, const ChatReply& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  compared.number("chatroom_id", outputs.chatroom_id, message.chatroomid());
  compare_result(&compared, outputs, message);
  const int entries = message.processedmessageentries_size();
  const int ids = compared.elements("ids", outputs.count, outputs.ids, entries);
  for (int i = 0; i < ids; ++i) {
    compared.number({"ids", i}, outputs.ids.block[i], message.processedmessageentries(i).msgid());
  }
  const int times = compared.elements("times", outputs.count, outputs.times, entries);
  for (int i = 0; i < times; ++i) {
    compared.number({"times", i}, outputs.times.block[i],
                    message.processedmessageentries(i).senttime());
  }
  return compared.differences();
}

std::string disagreement(const AllowChatReplyOutputs& outputs, const AllowChatReply& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  compared.number("chatroom_id", outputs.chatroom_id, message.chatroomid());
  compare_result(&compared, outputs, message);
  compared.id_if(message.has_lastdeliveryacktimestamp(), "last_delivery", outputs.last_delivery,
                 message.lastdeliveryacktimestamp());
  compare_marks(&compared, "deliveries", outputs.deliveries, message.deliveryackentries());
  compared.id_if(message.has_lastreadacktimestamp(), "last_read", outputs.last_read,
                 message.lastreadacktimestamp());
  compare_marks(&compared, "reads", outputs.reads, message.readackentries());
  const int members =
      compared.elements("members", outputs.members, message.orderedchatroommemberlist_size());
  for (int i = 0; i < members; ++i) {
    const qel_message_chatroommember_t& member = *outputs.members.array.block[i];
    const ChatroomMemberStatus& status = message.orderedchatroommemberlist(i);
    compared.number({"members", i, "userId"}, member.userId, status.userid());
    compared.number({"members", i, "available"}, member.available, status.available() ? 1 : 0);
    compared.copy({"members", i, "name"}, member.name, status.name());
  }
  compared.text_if(message.has_title(), "title", outputs.title, message.title());
  compared.int_if(message.has_msgttl(), "ttl", outputs.ttl, message.msgttl());
  return compared.differences();
}

std::string disagreement(const GetAllUnreadMessageReplyOutputs& outputs,
                         const GetAllUnreadMessageReply& message) {
  return result_disagreement(outputs, message);
}

std::string disagreement(const ForwardOnlineMessageOutputs& outputs,
                         const ForwardOnlineMessage& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  compared.number("chatroom_id", outputs.chatroom_id, message.chatroomid());
  compared.number("chat_type", outputs.chat_type, message.chattype());
  compared.flag("skip", outputs.skip, message.skipreply());

  const bool has_record = outputs.entry != nullptr;
  const qel_message_inboxentry_t& record = outputs.record;
  const InboxEntry& entry = message.inboxentry();
  compared.id_if(has_record, "record.msgId", record.msgId, entry.msgid());
  compared.int_if(has_record, "record.msgType", record.msgType, entry.msgtype());
  compared.id_if(has_record && entry.has_sender(), "record.sender", record.sender, entry.sender());
  compared.id_if(has_record && entry.has_receiver(), "record.receiver", record.receiver,
                 entry.receiver());
  compared.id_if(has_record, "record.sentTime", record.sentTime, entry.senttime());
  compared.text_if(has_record, "record.chatMsg", outputs.chat_msg, entry.chatmsg());
  compared.id_if(false, "record.chatroomId", record.chatroomId, 0);
  compared.int_if(false, "record.chatType", record.chatType, 0);
  compared.int_if(has_record && entry.has_msgttl(), "record.msgTtl", record.msgTtl, entry.msgttl());

  compared.int_if(!has_record, "error_code", outputs.error_code, 18);
  compared.text_if(!has_record, "error_text", outputs.error_text,
                   "inboxentry memory allocation failed");
  if (has_record && outputs.entry != &outputs.record) {
    return compared.differences() + "entry is another record; ";
  }
  return compared.differences();
}

std::string disagreement(const ForwardUnreadMessageOutputs& outputs,
                         const ForwardUnreadMessage& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  const int count = compared.elements("entries", outputs.entries, message.inboxentries_size());
  for (int i = 0; i < count; ++i) {
    const qel_message_inboxentry_t& record = *outputs.entries.array.block[i];
    const InboxEntry& entry = message.inboxentries(i);
    compared.number({"entries", i, "msgId"}, record.msgId, entry.msgid());
    compared.number({"entries", i, "msgType"}, record.msgType, entry.msgtype());
    compared.number({"entries", i, "sender"}, record.sender, entry.sender());
    compared.number({"entries", i, "receiver"}, record.receiver, entry.receiver());
    compared.number({"entries", i, "sentTime"}, record.sentTime, entry.senttime());
    compared.copy({"entries", i, "chatMsg"}, record.chatMsg, entry.chatmsg());
    compared.number({"entries", i, "chatroomId"}, record.chatroomId, entry.chatroomid());
    compared.number({"entries", i, "chatType"}, record.chatType, entry.chattype());
    compared.number({"entries", i, "msgTtl"}, record.msgTtl, entry.msgttl());
  }
  compared.text_if(message.has_nextpaginationkey(), "next_key", outputs.next_key,
                   message.nextpaginationkey());
  return compared.differences();
}

std::string disagreement(const ReadMessageReplyOutputs& outputs, const ReadMessageReply& message) {
  return chatroom_result_disagreement(outputs, message);
}

std::string disagreement(const EndChatReplyOutputs& outputs, const EndChatReply& message) {
  return result_disagreement(outputs, message);
}

std::string disagreement(const InviteReplyOutputs& outputs, const InviteReply& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  compared.number("chatroom_id", outputs.chatroom_id, message.chatroomid());
  compared.id_if(message.has_senttime(), "sent_time", outputs.sent_time, message.senttime());
  compare_result(&compared, outputs, message);

  const WrongReceiverDetail& detail = message.result().wrongreceiverdetail();
  const int code = message.result().code();
  const bool has_detail = message.result().has_wrongreceiverdetail() &&
                          (code == 1000 || code == 1001 || code == 3003 || code == 3009);
  if (!has_detail) {
    compared.unwritten("invalid", outputs.invalid);
    compared.unwritten("interrupted", outputs.interrupted);
    compared.unwritten("disabled", outputs.disabled);
    compared.unwritten("existing", outputs.existing);
    compared.unwritten("violations", outputs.violations);
    compared.unwritten("denied", outputs.denied);
    return compared.differences();
  }
  compared.ids("invalid", outputs.invalid, detail.invalidreceivers());
  compared.ids("interrupted", outputs.interrupted, detail.interruptedreceivers());
  compared.ids("disabled", outputs.disabled, detail.disabledreceivers());
  compared.ids("existing", outputs.existing, detail.existing());
  compare_violations(&compared, outputs.violations, detail);
  compared.ids("denied", outputs.denied, detail.invitationdenied());
  return compared.differences();
}

std::string disagreement(const CurrentTimeOutputs& outputs, const CurrentTimeReply& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  compared.number("millis", outputs.millis,
                  message.has_currenttimemillis() ? message.currenttimemillis() : -1);
  compare_result(&compared, outputs, message);
  return compared.differences();
}

std::string disagreement(const UnsealMessageReplyOutputs& outputs,
                         const UnsealMessageReply& message) {
  return chatroom_result_disagreement(outputs, message);
}

std::string disagreement(const SaveCallLogReplyOutputs& outputs, const SaveCallLogReply& message) {
  return result_disagreement(outputs, message);
}

std::string disagreement(const TypingUpdatedOutputs& outputs, const TypingUpdated& message) {
  Comparison compared;
  compared.number("request_id", outputs.request_id, message.requestid());
  compared.number("chatroom_id", outputs.chatroom_id, message.chatroomid());
  compared.id_if(message.has_sender(), "sender", outputs.sender, message.sender());
  compared.text_if(message.has_state(), "state", outputs.state, message.state());
  compared.int_if(message.has_contenttype(), "content_type", outputs.content_type,
                  message.contenttype());
  compared.int_if(message.has_refresh(), "refresh", outputs.refresh, message.refresh());
  return compared.differences();
}

std::string disagreement(const ChangeChatroomMetaReplyOutputs& outputs,
                         const ChangeChatroomMetaReply& message) {
  return chatroom_result_disagreement(outputs, message);
}

}  // namespace support
