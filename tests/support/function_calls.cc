#include "support/function_calls.h"

#include <utility>

#include "support/exchange.h"
#include "support/heap.h"
#include "support/outputs.h"
#include "support/wire.h"

namespace support {
namespace {

// ---- Values, written out

std::string shown(int64_t number) {
  return std::to_string(number);
}
std::string shown(const std::string& text) {
  return "'" + text + "'";
}
std::string shown(const char* text) {
  return text == nullptr ? "NULL" : shown(std::string(text));
}
std::string shown(const TextOutput& text) {
  return text.untouched() ? "untouched" : shown(text.block);
}
std::string shown(const FlagOutput& flag) {
  return flag.untouched() ? "untouched" : shown(flag.value());
}
std::string shown(const qel_message_didviolationuser_t& pair) {
  return shown(pair.userA) + "/" + shown(pair.userB);
}
std::string shown(const qel_message_watermarkentry_t& mark) {
  return shown(mark.userId) + "/" + shown(mark.msgId) + "/" + shown(mark.timestamp);
}
std::string shown(const qel_message_chatroommember_t& member) {
  return shown(member.userId) + "/" + shown(member.available) + "/" + shown(member.name);
}
std::string shown(const qel_message_inboxentry_t& entry) {
  return shown(entry.msgId) + "/" + shown(entry.msgType) + "/" + shown(entry.sender) + "/" +
         shown(entry.receiver) + "/" + shown(entry.sentTime) + "/" + shown(entry.chatMsg) + "/" +
         shown(entry.chatroomId) + "/" + shown(entry.chatType) + "/" + shown(entry.msgTtl);
}
template <typename T>
std::string shown(const std::vector<T>& elements) {
  std::string list = "[";
  for (const T& element : elements) {
    if constexpr (std::is_pointer_v<T>) {
      list += shown(*element) + " ";
    } else {
      list += shown(element) + " ";
    }
  }
  return list + "]";
}
template <typename T>
std::string shown(const ListOutput<T>& list) {
  return list.array.untouched() ? "untouched, " + shown(list.count) : shown(list.elements());
}

template <typename... T>
Values values(const T&... value) {
  return {shown(value)...};
}

// ---- All outputs, in the order of the arguments

template <auto Deserialize>
Values values_of(const ResultOutputs<Deserialize>& out) {
  return values(out.request_id, out.code, out.text);
}
template <auto Deserialize>
Values values_of(const ChatroomResultOutputs<Deserialize>& out) {
  return values(out.request_id, out.chatroom_id, out.code, out.text);
}
Values values_of(const ClientEchoOutputs& out) {
  return values(out.request_id);
}
Values values_of(const CreateChatroomReplyOutputs& out) {
  return values(out.request_id, out.chatroom_id, out.ttl, out.code, out.text, out.invalid,
                out.disabled, out.violations, out.denied);
}
Values values_of(const ChatReplyOutputs& out) {
  const auto list = [&](const IdListOutput& ids) {
    if (ids.untouched()) {
      return std::string("untouched");
    }
    return ids.block == nullptr ? "NULL"
                                : shown(std::vector<int64_t>(ids.block, ids.block + out.count));
  };
  return {shown(out.request_id), shown(out.chatroom_id), shown(out.code), shown(out.text),
          shown(out.count),      list(out.ids),          list(out.times)};
}
Values values_of(const AllowChatReplyOutputs& out) {
  return values(out.request_id, out.chatroom_id, out.code, out.text, out.deliveries,
                out.last_delivery, out.reads, out.last_read, out.members, out.title, out.ttl);
}
Values values_of(const ForwardOnlineMessageOutputs& out) {
  qel_message_inboxentry_t record = out.record;
  if (out.chat_msg.untouched()) {
    record.chatMsg = nullptr;
  }
  return values(out.request_id, out.chatroom_id, out.chat_type, record, out.skip, out.error_code,
                out.error_text);
}
Values values_of(const ForwardUnreadMessageOutputs& out) {
  return values(out.request_id, out.entries, out.next_key);
}
Values values_of(const InviteReplyOutputs& out) {
  return values(out.request_id, out.chatroom_id, out.sent_time, out.code, out.text, out.invalid,
                out.interrupted, out.disabled, out.existing, out.violations, out.denied);
}
Values values_of(const CurrentTimeOutputs& out) {
  return values(out.request_id, out.millis, out.code, out.text);
}
Values values_of(const TypingUpdatedOutputs& out) {
  return values(out.request_id, out.chatroom_id, out.sender, out.state, out.content_type,
                out.refresh);
}

// ---- Serializers

using Encode = void (*)(const Own&, Encoded*);

// What a serializer shows on its way to the buffer.
struct SerializerRow {
  std::string function;
  std::string situation;
  std::string entry;                        // text
  std::vector<Line> (*detail)(const Own&);  // logged after the entry
  Encode encode;
  Wire (*message)(const Own&);
  bool has_status = true;
};

Values encode(Encode call, const Own& own) {
  Encoded out;
  call(own, &out);
  const std::string bytes = out.data.untouched()        ? "untouched"
                            : out.data.block == nullptr ? "NULL"
                                                        : to_hex(out.bytes());
  return {shown(out.status), bytes, shown(out.size)};
}

void add(std::vector<FunctionCall>& calls, const SerializerRow& row) {
  const auto lines_until = [=](const Line& end) {
    return [=](const Own& own) {
      std::vector<Line> lines = {debug(row.entry, {row.function})};
      for (const Line& line : row.detail(own)) {
        lines.push_back(line);
      }
      lines.push_back(end);
      return lines;
    };
  };
  const auto size = [=](const Own& own) {
    return shown(static_cast<int64_t>(row.message(own).bytes().size()));
  };
  calls.push_back({row.function, row.situation,
                   [=](const Own& own) { return encode(row.encode, own); },
                   [=](const Own& own) -> Values {
                     return {shown(row.has_status ? 0 : kIntSentinel),
                             to_hex(row.message(own).bytes()), size(own)};
                   },
                   lines_until(debug("%s: exit", {row.function}))});
  calls.push_back(
      {row.function, row.situation + ", no memory for the buffer",
       [=](const Own& own) {
         const FailingCalloc fault(1);
         return encode(row.encode, own);
       },
       [=](const Own& own) -> Values {
         return {shown(row.has_status ? -1 : kIntSentinel), "NULL", size(own)};
       },
       lines_until(row.has_status ? error("Could not allocate memory for serialized data")
                                  : debug("Memory allocation is failed to serialized_data"))});
}

// A serializer's call that a check of its arguments ends.
void add_refused(std::vector<FunctionCall>& calls, const std::string& function,
                 const std::string& situation, Encode call,
                 std::vector<Line> (*detail)(const Own&)) {
  calls.push_back({function, situation, [=](const Own& own) { return encode(call, own); },
                   [](const Own&) -> Values {
                     return {shown(-1), "untouched", shown(kIntSentinel)};
                   },
                   [=](const Own& own) {
                     std::vector<Line> lines = {debug("%s start", {function})};
                     for (const Line& line : detail(own)) {
                       lines.push_back(line);
                     }
                     return lines;
                   }});
}

std::vector<Line> nothing(const Own& /*own*/) {
  return {};
}

// A member of an enumeration that begins with that many, from 0.
int member(const Own& own, int members) {
  return static_cast<int>(own.id % members);
}
// A number of seconds, or another small one.
int little(const Own& own) {
  return static_cast<int>(own.id % 10000);
}
int page(const Own& own) {
  return static_cast<int>(own.id % 500) + 1;
}

const SerializerRow kSerializerRows[] = {
    {"channel_auth_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       out->status =
           channel_auth_request_serialize(own.id, own.id + 1, own.id + 2, own.text.c_str(),
                                          ("of " + own.text).c_str(), &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire()
           .number(1, own.id)
           .number(2, own.id + 1)
           .number(3, own.id + 2)
           .text(5, own.text)
           .text(6, "of " + own.text);
     }},
    {"client_echo_reply_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       out->status = client_echo_reply_serialize(own.id, &out->data.block, &out->size);
     },
     [](const Own& own) { return Wire().number(1, own.id); }},
    {"create_chatroom_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       const int64_t receivers[] = {own.id + 1, own.id + 2, own.id + 3};
       out->status = create_chatroom_request_serialize(
           own.id, member(own, 5), receivers, 3, own.text.c_str(), &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire()
           .number(11, own.id)
           .number(12, member(own, 5))
           .number(13, own.id + 1)
           .number(13, own.id + 2)
           .number(13, own.id + 3)
           .text(14, own.text);
     }},
    {"chat_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       out->status =
           chat_request_serialize(own.id, own.id + 1, own.id + 2, member(own, 7), own.text.c_str(),
                                  little(own), 0, &out->data.block, &out->size);
     },
     [](const Own& own) {
       const Wire param = Wire()
                              .number(1, own.id + 2)
                              .number(2, member(own, 7))
                              .text(3, own.text)
                              .number(4, little(own));
       return Wire().number(11, own.id).number(12, own.id + 1).message(13, param);
     }},
    {"allow_chat_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       const bool automatic = own.id % 2 == 0;
       out->status = allow_chat_request_serialize(own.id, own.id + 1, &automatic, page(own), true,
                                                  own.id + 2, true, own.id + 3, !automatic, true,
                                                  &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire()
           .number(11, own.id)
           .number(12, own.id + 1)
           .number(13, own.id % 2 == 0 ? 1 : 0)
           .number(14, page(own))
           .number(15, own.id % 2 == 0 ? 0 : 1)
           .number(16, 1)
           .number(17, own.id + 3)
           .number(18, 1)
           .number(19, 1)
           .number(20, own.id + 2);
     }},
    {"get_all_unread_message_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       const int most = page(own);
       out->status =
           get_all_unread_message_request_serialize(own.id, &most, &out->data.block, &out->size);
     },
     [](const Own& own) { return Wire().number(11, own.id).number(12, page(own)); }},
    {"forward_online_message_reply_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       const bool read = own.id % 2 == 0;
       out->status = forward_online_message_reply_serialize(own.id, own.id + 1, &read,
                                                            &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire().number(11, own.id).number(12, own.id + 1).number(13, own.id % 2 == 0 ? 1 : 0);
     }},
    {"forward_unread_message_reply_serialize", "all arguments", "%s start",
     [](const Own& own) -> std::vector<Line> { return {warn("maxCount : %d", {page(own)})}; },
     [](const Own& own, Encoded* out) {
       const char* key = own.text.c_str();
       const int most = page(own);
       out->status = forward_unread_message_reply_serialize(own.id, &key, &most, &out->data.block,
                                                            &out->size);
     },
     [](const Own& own) {
       return Wire().number(11, own.id).text(12, own.text).number(13, page(own));
     }},
    {"forward_unread_message_reply_serialize", "too large a page", "%s start",
     [](const Own& own) -> std::vector<Line> {
       return {warn("maxCount is out of the range, maxCount : %d", {little(own) + 501})};
     },
     [](const Own& own, Encoded* out) {
       const char* key = own.text.c_str();
       const int most = little(own) + 501;
       out->status = forward_unread_message_reply_serialize(own.id, &key, &most, &out->data.block,
                                                            &out->size);
     },
     [](const Own& own) { return Wire().number(11, own.id).text(12, own.text).number(13, 500); }},
    {"read_message_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       std::string text = own.text;
       qel_message_inboxentry_t entry = {};
       entry.msgId = own.id + 2;
       entry.msgType = member(own, 7);
       entry.sender = own.id + 3;
       entry.sentTime = own.id + 4;
       entry.chatMsg = text.data();
       out->status =
           read_message_request_serialize(own.id, own.id + 1, &entry, &out->data.block, &out->size);
     },
     [](const Own& own) {
       const Wire entry = Wire()
                              .number(1, own.id + 2)
                              .number(2, member(own, 7))
                              .number(3, own.id + 3)
                              .number(5, own.id + 4);
       return Wire().number(11, own.id).number(12, own.id + 1).message(13, entry);
     }},
    {"end_chat_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       const qel_message_endchatentry_t entries[] = {{own.id + 1, true}, {own.id + 2, false}};
       out->status = end_chat_request_serialize(own.id, entries, 2, &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire()
           .number(11, own.id)
           .message(12, Wire().number(1, own.id + 1).number(11, 1))
           .message(12, Wire().number(1, own.id + 2).number(11, 0));
     }},
    {"invite_chat_request_serialize", "all arguments", "%s start",
     [](const Own& /*own*/) -> std::vector<Line> {
       return {debug("in_invtingMemebersCount=%d\n", {2})};
     },
     [](const Own& own, Encoded* out) {
       const int64_t members[] = {own.id + 2, own.id + 3};
       const int count = 2;
       out->status = invite_chat_request_serialize(own.id, own.id + 1, members, &count,
                                                   &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire()
           .number(11, own.id)
           .number(12, own.id + 1)
           .number(13, own.id + 2)
           .number(13, own.id + 3);
     }},
    {"current_time_request_serialize", "all arguments", "%s: enter", nothing,
     [](const Own& own, Encoded* out) {
       out->status = current_time_request_serialize(own.id, &out->data.block, &out->size);
     },
     [](const Own& own) { return Wire().number(11, own.id); }},
    {"unseal_message_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       out->status =
           unseal_message_request_serialize(own.id, own.id + 1, own.id + 2, own.id + 3,
                                            own.text.c_str(), &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire()
           .number(11, own.id)
           .number(12, own.id + 1)
           .number(13, own.id + 2)
           .number(14, own.id + 3)
           .text(15, own.text);
     }},
    {"save_call_log_request_serialize", "all arguments", "%s start", nothing,
     [](const Own& own, Encoded* out) {
       out->status = save_call_log_request_serialize(
           own.id, own.id + 1, own.text.c_str(), ("of " + own.text).c_str(), own.id + 2, own.id + 3,
           little(own), &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire()
           .number(11, own.id)
           .number(12, own.id + 1)
           .text(20, own.text)
           .text(21, "of " + own.text)
           .number(22, own.id + 2)
           .number(23, own.id + 3)
           .number(25, little(own));
     }},
    {"is_typing_request_serialize", "all arguments", "%s: enter", nothing,
     [](const Own& own, Encoded* out) {
       const int type = member(own, 4);
       const int refresh = little(own);
       is_typing_request_serialize(own.id, own.id + 1, own.text.c_str(), &type, &refresh,
                                   &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire()
           .number(11, own.id)
           .number(12, own.id + 1)
           .text(13, own.text)
           .number(14, member(own, 4))
           .number(15, little(own));
     },
     false},
    {"change_chatroom_meta_request_serialize", "title and lifetime", "%s start",
     [](const Own& own) -> std::vector<Line> {
       return {debug("requestId: %lld", {static_cast<long long>(own.id)}),
               warn("both title and msgTtl are set, title is used, msgTtl skipped")};
     },
     [](const Own& own, Encoded* out) {
       const int ttl = little(own);
       out->status = change_chatroom_meta_request_serialize(own.id, own.id + 1, own.text.c_str(),
                                                            &ttl, &out->data.block, &out->size);
     },
     [](const Own& own) {
       return Wire().number(11, own.id).number(12, own.id + 1).text(13, own.text);
     }},
};

// ---- Deserializers

// What a deserializer reads, and what it hands out.
struct DeserializerRow {
  std::string function;
  std::string situation;
  std::vector<Line> before;     // logged ahead of the entry
  std::string entry;            // text
  Wire (*message)(const Own&);  // the last byte is in no embedded message
  Values (*expected)(const Own&);
  std::vector<Line> (*detail)(const Own&);  // logged after the entry
  bool logs_exit = true;
};

using Read = Values (*)(const std::string& bytes);

template <typename Outputs>
Values read(const std::string& bytes) {
  Outputs out;
  out.read(bytes);
  return values_of(out);
}

template <typename Outputs>
Values read_without_memory_for_an_array(const std::string& bytes) {
  const FailingCalloc fault(1);
  return read<Outputs>(bytes);
}

std::vector<Line> entry_lines(const DeserializerRow& row) {
  std::vector<Line> lines = row.before;
  lines.push_back(warn(row.entry, {row.function}));
  return lines;
}

void add(std::vector<FunctionCall>& calls, const DeserializerRow& row, Read read) {
  calls.push_back({row.function, row.situation,
                   [=](const Own& own) { return read(row.message(own).bytes()); }, row.expected,
                   [=](const Own& own) {
                     std::vector<Line> lines = entry_lines(row);
                     for (const Line& line : row.detail(own)) {
                       lines.push_back(line);
                     }
                     if (row.logs_exit) {
                       lines.push_back(warn("%s: exit", {row.function}));
                     }
                     return lines;
                   }});
}

// The whole message, and the same cut within its last field.
template <typename Outputs>
void add_whole_and_cut(std::vector<FunctionCall>& calls, const DeserializerRow& row) {
  add(calls, row, read<Outputs>);
  calls.push_back({row.function, "cut input",
                   [=](const Own& own) {
                     std::string bytes = row.message(own).bytes();
                     bytes.pop_back();
                     return read<Outputs>(bytes);
                   },
                   [](const Own& /*own*/) { return values_of(Outputs()); },
                   [=](const Own& /*own*/) {
                     std::vector<Line> lines = entry_lines(row);
                     lines.push_back(error(kMergeError));
                     lines.push_back(error(kStreamError));
                     return lines;
                   }});
}

Wire result(const Own& own) {
  return Wire().number(1, little(own)).text(2, own.text);
}

// A field behind the others that has no output.
Wire with_another_field(Wire message) {
  return message.text(99, "unknown");
}

Wire reply(const Own& own) {
  return with_another_field(Wire().number(11, own.id).message(12, result(own)));
}
Values reply_values(const Own& own) {
  return values(own.id, little(own), own.text);
}

Wire chatroom_reply(const Own& own) {
  return with_another_field(
      Wire().number(11, own.id).number(12, own.id + 1).message(13, result(own)));
}
Values chatroom_reply_values(const Own& own) {
  return values(own.id, own.id + 1, little(own), own.text);
}

using Ids = std::vector<int64_t>;
using Pairs = std::vector<qel_message_didviolationuser_t>;
using Marks = std::vector<qel_message_watermarkentry_t>;
using Members = std::vector<qel_message_chatroommember_t>;
using Entries = std::vector<qel_message_inboxentry_t>;

// As an argument of a line.
long long lld(int64_t id) {
  return id;
}

Wire pair(int64_t first) {
  return Wire().number(1, first).number(2, first + 1);
}
Wire mark(int64_t first) {
  return Wire().number(1, first).number(2, first + 1).number(3, first + 2);
}
qel_message_watermarkentry_t mark_record(int64_t first) {
  return {first, first + 1, first + 2};
}

// An entry with a secure text, which has no output.
Wire inbox_entry(const Own& own, int64_t first) {
  return Wire()
      .number(1, first)
      .number(2, member(own, 7))
      .number(3, first + 1)
      .number(4, first + 2)
      .number(5, first + 3)
      .text(6, own.text)
      .number(7, little(own))
      .number(10, first + 4)
      .number(11, member(own, 5))
      .text(20, "secure " + own.text);
}
qel_message_inboxentry_t inbox_record(const Own& own, char* text, int64_t first) {
  return {first, member(own, 7), first + 1,      first + 2,  first + 3,
          text,  first + 4,      member(own, 5), little(own)};
}

Wire chatroom_with_refused(const Own& own) {
  const Wire detail = Wire()
                          .number(1, own.id + 2)
                          .number(1, own.id + 3)
                          .number(3, own.id + 4)
                          .number(6, own.id + 5)
                          .message(20, pair(own.id + 6));
  return Wire()
      .number(11, own.id)
      .number(12, own.id + 1)
      .message(13, Wire().number(1, 1001).text(2, own.text).message(3, detail))
      .number(21, little(own));
}
Values chatroom_with_refused_values(const Own& own) {
  return values(own.id, own.id + 1, little(own), 1001, own.text, Ids{own.id + 2, own.id + 3},
                Ids{own.id + 4}, Pairs{{own.id + 6, own.id + 7}}, Ids{own.id + 5});
}
std::vector<Line> chatroom_with_refused_lines(const Own& own) {
  return {warn("%d invalidReceivers are detected", {2}),
          warn("invalid Reciever id : %lld", {lld(own.id + 2)}),
          warn("invalid Reciever id : %lld", {lld(own.id + 3)}),
          warn("%d disabledReceivers are detected", {1}),
          warn("disabled Reciever id : %lld", {lld(own.id + 4)}),
          warn("%d didViolationUsers are detected", {1}),
          warn("did violation usera's id : %lld", {lld(own.id + 6)}),
          warn("did violation userb's id : %lld", {lld(own.id + 7)}),
          warn("did invitation denied: %lld", {lld(own.id + 5)})};
}

Wire invitation_with_refused(const Own& own) {
  const Wire detail = Wire()
                          .number(1, own.id + 2)
                          .number(2, own.id + 3)
                          .number(3, own.id + 4)
                          .number(4, own.id + 5)
                          .number(6, own.id + 6)
                          .message(20, pair(own.id + 7));
  return Wire()
      .number(11, own.id)
      .number(12, own.id + 1)
      .message(13, Wire().number(1, 3003).text(2, own.text).message(3, detail))
      .number(14, own.id + 9);
}
Values invitation_with_refused_values(const Own& own) {
  return values(own.id, own.id + 1, own.id + 9, 3003, own.text, Ids{own.id + 2}, Ids{own.id + 3},
                Ids{own.id + 4}, Ids{own.id + 5}, Pairs{{own.id + 7, own.id + 8}}, Ids{own.id + 6});
}
std::vector<Line> invitation_with_refused_lines(const Own& own) {
  return {warn("%d invalidReceivers", {1}),
          warn("invalidReceiver[%d] : %lld", {0, lld(own.id + 2)}),
          warn("%d interruptedReceivers", {1}),
          warn("interruptedReceivers[%d] : %lld", {0, lld(own.id + 3)}),
          warn("%d disabledReceivers", {1}),
          warn("disabledReceivers[%d] : %lld", {0, lld(own.id + 4)}),
          warn("%d existingChatmembers", {1}),
          warn("existingChatmembers[%d] : %lld", {0, lld(own.id + 5)}),
          warn("%d didviolationusersCount", {1}),
          warn("%d didViolationUsers are detected", {1}),
          warn("did violation usera's id : %lld", {lld(own.id + 7)}),
          warn("did violation userb's id : %lld", {lld(own.id + 8)}),
          warn("did denied invitations : %lld", {lld(own.id + 6)})};
}

Wire two_processed(const Own& own) {
  return with_another_field(Wire()
                                .number(11, own.id)
                                .number(12, own.id + 1)
                                .message(13, result(own))
                                .message(14, pair(own.id + 2))
                                .message(14, pair(own.id + 4)));
}
std::vector<Line> two_processed_lines(const Own& /*own*/) {
  return {debug("processed msg entry size : %d", {2})};
}

Wire page_of_two(const Own& own) {
  return Wire()
      .number(11, own.id)
      .message(12, inbox_entry(own, own.id + 1))
      .message(12, inbox_entry(own, own.id + 10))
      .text(13, "key of " + own.text);
}

Wire chatroom_state(const Own& own) {
  return Wire()
      .number(11, own.id)
      .number(12, own.id + 1)
      .message(13, result(own))
      .number(14, own.id + 2)
      .message(16, Wire().number(1, own.id + 3).number(2, 1).text(3, own.text))
      .message(17, mark(own.id + 4))
      .message(17, mark(own.id + 5))
      .text(18, "title of " + own.text)
      .message(20, mark(own.id + 6))
      .number(21, own.id + 7)
      .number(22, little(own));
}
Values chatroom_state_values(const Own& own) {
  std::string name = own.text;
  return values(own.id, own.id + 1, little(own), own.text, Marks{mark_record(own.id + 6)},
                own.id + 7, Marks{mark_record(own.id + 4), mark_record(own.id + 5)}, own.id + 2,
                Members{{own.id + 3, 1, name.data()}}, "title of " + own.text, little(own));
}

Wire online_push(const Own& own) {
  return Wire()
      .number(11, own.id)
      .number(12, own.id + 1)
      .number(13, member(own, 5))
      .message(14, inbox_entry(own, own.id + 2))
      .number(30, 1);
}
Values online_push_values(const Own& own) {
  std::string text = own.text;
  qel_message_inboxentry_t record = inbox_record(own, text.data(), own.id + 2);
  record.chatroomId = kLongSentinel;
  record.chatType = kIntSentinel;
  return values(own.id, own.id + 1, member(own, 5), record, 1, kIntSentinel, TextOutput());
}

void add_deserializers(std::vector<FunctionCall>& calls) {
  add_whole_and_cut<ChannelAuthReplyOutputs>(
      calls, {"channel_auth_reply_deserialize",
              "all fields",
              {},
              "%s start",
              [](const Own& own) {
                return with_another_field(Wire().number(1, own.id).message(2, result(own)));
              },
              reply_values,
              nothing,
              false});
  add_whole_and_cut<ClientEchoOutputs>(calls,
                                       {"client_echo_deserialize",
                                        "all fields",
                                        {},
                                        "%s start",
                                        [](const Own& own) { return Wire().number(1, own.id); },
                                        [](const Own& own) { return values(own.id); },
                                        nothing});
  add_whole_and_cut<CreateChatroomReplyOutputs>(calls, {"create_chatroom_reply_deserialize",
                                                        "refused receivers",
                                                        {},
                                                        "%s: enter",
                                                        chatroom_with_refused,
                                                        chatroom_with_refused_values,
                                                        chatroom_with_refused_lines});
  add_whole_and_cut<ChatReplyOutputs>(
      calls, {"chat_reply_deserialize",
              "two messages",
              {},
              "%s: start",
              two_processed,
              [](const Own& own) {
                return values(own.id, own.id + 1, little(own), own.text, 2,
                              Ids{own.id + 2, own.id + 4}, Ids{own.id + 3, own.id + 5});
              },
              two_processed_lines});
  add(calls,
      {"chat_reply_deserialize",
       "no memory for an array",
       {},
       "%s: start",
       two_processed,
       [](const Own& own) {
         const char* none = nullptr;
         return values(own.id, own.id + 1, little(own), own.text, 0, none, Ids());
       },
       [](const Own& own) {
         std::vector<Line> lines = two_processed_lines(own);
         lines.push_back(error("memory allocation error(msgId, sentTime)"));
         return lines;
       },
       false},
      read_without_memory_for_an_array<ChatReplyOutputs>);
  add_whole_and_cut<AllowChatReplyOutputs>(calls, {"allow_chat_reply_deserialize",
                                                   "all fields",
                                                   {},
                                                   "%s: start",
                                                   chatroom_state,
                                                   chatroom_state_values,
                                                   nothing});
  add_whole_and_cut<GetAllUnreadMessageReplyOutputs>(calls,
                                                     {"get_all_unread_message_reply_deserialize",
                                                      "all fields",
                                                      {},
                                                      "%s: start",
                                                      reply,
                                                      reply_values,
                                                      nothing});
  add_whole_and_cut<ForwardOnlineMessageOutputs>(
      calls, {"forward_online_message_get_deserialize",
              "all fields",
              {error("check ")},
              "%s: start",
              online_push,
              online_push_values,
              [](const Own& own) -> std::vector<Line> {
                return {error("has_skipreply:true "), info("skipreply: %d", {1}),
                        error("msgType : %d ", {member(own, 7)})};
              }});
  add(calls,
      {"forward_online_message_get_deserialize",
       "no record",
       {error("check ")},
       "%s: start",
       online_push,
       [](const Own& own) {
         qel_message_inboxentry_t untouched = ForwardOnlineMessageOutputs().record;
         untouched.chatMsg = nullptr;
         return values(own.id, own.id + 1, member(own, 5), untouched, 1, 18,
                       "inboxentry memory allocation failed");
       },
       [](const Own& /*own*/) -> std::vector<Line> {
         return {error("has_skipreply:true "), info("skipreply: %d", {1})};
       }},
      [](const std::string& bytes) {
        ForwardOnlineMessageOutputs out;
        out.entry = nullptr;
        out.read(bytes);
        return values_of(out);
      });
  add_whole_and_cut<ForwardUnreadMessageOutputs>(
      calls, {"forward_unread_message_deserialize",
              "two messages",
              {},
              "%s: start",
              page_of_two,
              [](const Own& own) {
                std::string text = own.text;
                return values(own.id,
                              Entries{inbox_record(own, text.data(), own.id + 1),
                                      inbox_record(own, text.data(), own.id + 10)},
                              "key of " + own.text);
              },
              nothing});
  add(calls,
      {"forward_unread_message_deserialize",
       "no memory for the array",
       {},
       "%s: start",
       page_of_two,
       [](const Own& own) {
         const char* none = nullptr;
         return values(own.id, 2, none, TextOutput());
       },
       [](const Own& /*own*/) -> std::vector<Line> {
         return {error("qel_message_inboxentry_t * allocation fail")};
       },
       false},
      [](const std::string& bytes) {
        ForwardUnreadMessageOutputs out;
        {
          const FailingCalloc fault(1);
          out.read(bytes);
        }
        const char* array = reinterpret_cast<const char*>(out.entries.array.block);
        const int count = std::exchange(out.entries.count, 0);  // there is no array to walk
        return values(out.request_id, count, array, out.next_key);
      });
  add_whole_and_cut<ReadMessageReplyOutputs>(calls, {"read_message_reply_deserialize",
                                                     "all fields",
                                                     {},
                                                     "%s: start",
                                                     chatroom_reply,
                                                     chatroom_reply_values,
                                                     nothing});
  add_whole_and_cut<EndChatReplyOutputs>(
      calls,
      {"end_chat_reply_deserialize", "all fields", {}, "%s: start", reply, reply_values, nothing});
  add_whole_and_cut<InviteReplyOutputs>(calls, {"invite_reply_deserialize",
                                                "refused users",
                                                {},
                                                "%s: start",
                                                invitation_with_refused,
                                                invitation_with_refused_values,
                                                invitation_with_refused_lines});
  add_whole_and_cut<CurrentTimeOutputs>(
      calls, {"current_time_deserialize",
              "all fields",
              {},
              "%s: start",
              [](const Own& own) { return reply(own).number(13, own.id + 1); },
              [](const Own& own) { return values(own.id, own.id + 1, little(own), own.text); },
              nothing});
  add_whole_and_cut<UnsealMessageReplyOutputs>(calls, {"unseal_message_reply_deserialize",
                                                       "all fields",
                                                       {},
                                                       "%s: start",
                                                       chatroom_reply,
                                                       chatroom_reply_values,
                                                       nothing});
  add_whole_and_cut<SaveCallLogReplyOutputs>(calls, {"save_call_log_reply_deserialize",
                                                     "all fields",
                                                     {},
                                                     "%s: start",
                                                     chatroom_reply,
                                                     reply_values,
                                                     nothing});
  add_whole_and_cut<TypingUpdatedOutputs>(calls, {"typing_updated_deserialize",
                                                  "all fields",
                                                  {},
                                                  "%s: start",
                                                  [](const Own& own) {
                                                    return Wire()
                                                        .number(11, own.id)
                                                        .number(12, own.id + 1)
                                                        .number(13, own.id + 2)
                                                        .text(14, own.text)
                                                        .number(15, member(own, 4))
                                                        .number(16, little(own));
                                                  },
                                                  [](const Own& own) {
                                                    return values(own.id, own.id + 1, own.id + 2,
                                                                  own.text, member(own, 4),
                                                                  little(own));
                                                  },
                                                  nothing});
  add_whole_and_cut<ChangeChatroomMetaReplyOutputs>(calls,
                                                    {"change_chatroom_meta_reply_deserialize",
                                                     "all fields",
                                                     {},
                                                     "%s: start",
                                                     chatroom_reply,
                                                     chatroom_reply_values,
                                                     nothing});
}

// ---- Serializers that refuse an argument

void add_refusing_serializers(std::vector<FunctionCall>& calls) {
  add_refused(
      calls, "create_chatroom_request_serialize", "no receivers",
      [](const Own& own, Encoded* out) {
        out->status = create_chatroom_request_serialize(
            own.id, member(own, 5), nullptr, 0, own.text.c_str(), &out->data.block, &out->size);
      },
      [](const Own& /*own*/) -> std::vector<Line> {
        return {error("invalid parameter: receivers is null")};
      });
  add_refused(
      calls, "chat_request_serialize", "msgType out of range",
      [](const Own& own, Encoded* out) {
        out->status = chat_request_serialize(own.id, own.id, own.id, 31 + little(own),
                                             own.text.c_str(), 0, 0, &out->data.block, &out->size);
      },
      [](const Own& /*own*/) -> std::vector<Line> {
        return {error("msgType is out of range(0~6)")};
      });
  add_refused(
      calls, "chat_request_serialize", "no text",
      [](const Own& own, Encoded* out) {
        out->status = chat_request_serialize(own.id, own.id, own.id, 0, nullptr, 0, 0,
                                             &out->data.block, &out->size);
      },
      [](const Own& /*own*/) -> std::vector<Line> { return {error("no message")}; });
  add_refused(
      calls, "chat_request_serialize", "too long a text",
      [](const Own& own, Encoded* out) {
        const std::string text = own.text + std::string(40001, 'x');
        out->status = chat_request_serialize(own.id, own.id, own.id, 0, text.c_str(), 0, 0,
                                             &out->data.block, &out->size);
      },
      [](const Own& own) -> std::vector<Line> {
        return {error("chatMsg length(%d) cannot be greater than %d",
                      {static_cast<int>(own.text.size()) + 40001, 40000})};
      });
  add_refused(
      calls, "read_message_request_serialize", "msgType out of range",
      [](const Own& own, Encoded* out) {
        std::string text = own.text;
        qel_message_inboxentry_t entry = {};
        entry.msgType = 31 + little(own);
        entry.chatMsg = text.data();
        out->status =
            read_message_request_serialize(own.id, own.id, &entry, &out->data.block, &out->size);
      },
      [](const Own& /*own*/) -> std::vector<Line> {
        return {error("msgType is out of range(0~6)")};
      });
  add_refused(
      calls, "change_chatroom_meta_request_serialize", "neither title nor lifetime",
      [](const Own& own, Encoded* out) {
        const int none = -1;
        out->status = change_chatroom_meta_request_serialize(own.id, own.id, "", &none,
                                                             &out->data.block, &out->size);
      },
      [](const Own& own) -> std::vector<Line> {
        return {debug("requestId: %lld", {lld(own.id)}), error("both title and msgTtl are empty")};
      });
}

// ---- Placeholders

void add_placeholders(std::vector<FunctionCall>& calls) {
  const auto no_lines = [](const Own& /*own*/) { return std::vector<Line>(); };
  calls.push_back({"forward_stored_message_reply_serialize", "all arguments",
                   [](const Own& own) {
                     const char* key = own.text.c_str();
                     const int most = page(own);
                     Encoded out;
                     forward_stored_message_reply_serialize(own.id, &key, &most, &out.data.block,
                                                            &out.size);
                     return values(out.data.untouched() ? 1 : 0, out.size);
                   },
                   [](const Own& /*own*/) { return values(1, kIntSentinel); }, no_lines});
  calls.push_back({"forward_stored_message_deserialize", "all fields",
                   [](const Own& own) {
                     const Received received(page_of_two(own).bytes());
                     ForwardUnreadMessageOutputs out;
                     forward_stored_message_deserialize(received.data(), received.size(),
                                                        &out.request_id, &out.entries.array.block,
                                                        &out.entries.count, &out.next_key.block);
                     return values_of(out);
                   },
                   [](const Own& /*own*/) { return values_of(ForwardUnreadMessageOutputs()); },
                   no_lines});
}

std::vector<FunctionCall> all_calls() {
  std::vector<FunctionCall> calls;
  add_placeholders(calls);
  for (const SerializerRow& row : kSerializerRows) {
    add(calls, row);
  }
  add_refusing_serializers(calls);
  add_deserializers(calls);
  return calls;
}

}  // namespace

const std::vector<FunctionCall>& function_calls() {
  static const std::vector<FunctionCall> calls = all_calls();
  return calls;
}

}  // namespace support
