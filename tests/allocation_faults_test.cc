// Every block that a function asks for is refused in turn. What becomes of the call, and which
// blocks it keeps, stands in an account of the function's steps: one for each of the 34 with
// everything that it takes, and one for each refusal of its own.

#include "support/call_account.h"
#include "support/exported_functions.h"
#include "support/outputs.h"
#include "support/process_death.h"

namespace {

using support::Allocator;
using support::debug;
using support::error;
using support::Observation;
using support::Outcome;
using support::Steps;
using support::to_hex;
using support::warn;
using support::Wire;

constexpr Allocator kCalloc = Allocator::kCalloc;
constexpr Allocator kMalloc = Allocator::kMalloc;
constexpr Allocator kStrdup = Allocator::kStrdup;

struct Account {
  Steps steps;
  // Makes the call and shows each output.
  void (*observe)(Observation* seen);
  std::string situation = {};

  std::string name() const { return steps.function() + (situation.empty() ? "" : "_" + situation); }
};

void PrintTo(const Account& account, std::ostream* out) {
  *out << account.name();
}

// Longer than what a string has room for without a block of its own.
const char kText[] = "a text in a block of its own";
const char kOutcome[] = "an outcome that takes a block";

const std::string kTooLongText(40001, 'x');

Wire result() {
  return Wire().number(1, 3).text(2, kOutcome);
}

// A result with every list of receivers, in the order of their fields: two for each.
Wire refusal(int code) {
  Wire detail;
  for (const int field : {1, 2, 3, 4, 5, 6, 7, 10, 11}) {
    detail.number(field, 10 * field + 1).number(field, 10 * field + 2);
  }
  detail.message(20, Wire().number(1, 301).number(2, 302));
  detail.message(20, Wire().number(1, 303).number(2, 304));
  return Wire().number(1, code).text(2, kOutcome).message(3, detail);
}

Wire inbox_entry() {
  return Wire()
      .number(1, 21)
      .number(2, 3)
      .number(3, 22)
      .number(4, 23)
      .number(5, 24)
      .text(6, kText)
      .number(7, 25)
      .number(10, 26)
      .number(11, 1)
      .text(20, kText);
}

// Calls a serializer with outputs, its last two arguments.
template <typename Serialize>
void observe_encoding(Observation* seen, Serialize serialize) {
  support::Encoded out;
  seen->of([&] { return serialize(&out.data.block, &out.size); });
  seen->shows("serialized_data", out.data, out.size);
  seen->shows("size", out.size);
}

// A reply that hands out its id and its result.
template <typename Outputs>
void observe_result(Observation* seen, const Wire& reply) {
  Outputs out;
  seen->of([&] { out.read(reply.bytes()); });
  seen->shows("requestId", out.request_id);
  seen->shows("resultCode", out.code);
  seen->shows("resultMsg", out.text);
}

// Its chatroom's id too.
template <typename Outputs>
void observe_chatroom_result(Observation* seen) {
  const Wire reply =
      Wire().number(1, 9).number(2, 8).number(11, 7).number(12, 6).message(13, result());
  Outputs out;
  seen->of([&] { out.read(reply.bytes()); });
  seen->shows("requestId", out.request_id);
  seen->shows("chatroomId", out.chatroom_id);
  seen->shows("resultCode", out.code);
  seen->shows("resultMsg", out.text);
}

// A push of one message, into the outputs given.
void observe_push_of_one(Observation* seen, support::ForwardOnlineMessageOutputs* out) {
  const Wire push = Wire()
                        .number(1, 9)
                        .number(2, 8)
                        .number(11, 7)
                        .number(12, 6)
                        .number(13, 1)
                        .message(14, inbox_entry())
                        .number(15, 1)
                        .number(16, 5)
                        .number(30, 1);
  seen->of([&] { out->read(push.bytes()); });
  seen->shows("requestId", out->request_id);
  seen->shows("chatroomId", out->chatroom_id);
  seen->shows("chatType", out->chat_type);
  seen->shows("inboxEntry.msgId", out->record.msgId);
  seen->shows("inboxEntry.msgType", out->record.msgType);
  seen->shows("inboxEntry.sender", out->record.sender);
  seen->shows("inboxEntry.receiver", out->record.receiver);
  seen->shows("inboxEntry.sentTime", out->record.sentTime);
  seen->shows("inboxEntry.chatMsg", out->chat_msg);
  seen->shows("inboxEntry.chatroomId", out->record.chatroomId);
  seen->shows("inboxEntry.chatType", out->record.chatType);
  seen->shows("inboxEntry.msgTtl", out->record.msgTtl);
  seen->shows("skipReply", out->skip);
  seen->shows("errorCode", out->error_code);
  seen->shows("errorMsg", out->error_text);
}

// The steps of the replies with a result.
Steps reading_result(const std::string& function) {
  return Steps(function)
      .logs_name(warn("%s: start"))
      .parses()
      .writes("requestId", "7")
      .hands_out_result(3, kOutcome)
      .exits();
}
Steps reading_chatroom_result(const std::string& function) {
  return Steps(function)
      .logs_name(warn("%s: start"))
      .parses()
      .writes("requestId", "7")
      .writes("chatroomId", "6")
      .hands_out_result(3, kOutcome)
      .exits();
}

const Account kAccounts[] = {
    {Steps("forward_stored_message_reply_serialize").returns(),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const char* key = kText;
         const int most = 5;
         forward_stored_message_reply_serialize(1, &key, &most, data, size);
       });
     }},

    {Steps("forward_stored_message_deserialize").returns(),
     [](Observation* seen) {
       const Wire push = Wire().message(12, inbox_entry()).text(13, kText);
       const support::Received received(push.bytes());
       support::ForwardUnreadMessageOutputs out;
       seen->of([&] {
         forward_stored_message_deserialize(received.data(), received.size(), &out.request_id,
                                            &out.entries.array.block, &out.entries.count,
                                            &out.next_key.block);
       });
       seen->shows("requestId", out.request_id);
       seen->shows("inboxEntries", out.entries.array, 0);
       seen->shows("count", out.entries.count);
       seen->shows("nextPaginationKey", out.next_key);
     }},

    {Steps("channel_auth_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .encodes(Wire().number(1, 1).number(2, 2).number(3, 3).text(5, kText).text(6, kText)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return channel_auth_request_serialize(1, 2, 3, kText, kText, data, size);
       });
     }},

    {Steps("channel_auth_reply_deserialize")
         .logs_name(warn("%s start"))
         .parses()
         .writes("requestId", "7")
         .hands_out_result(3, kOutcome)
         .releases_stream()
         .returns(),
     [](Observation* seen) {
       observe_result<support::ChannelAuthReplyOutputs>(
           seen, Wire().number(1, 7).message(2, result()));
     }},

    {Steps("client_echo_reply_serialize")
         .logs_name(debug("%s start"))
         .encodes(Wire().number(1, 1)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return client_echo_reply_serialize(1, data, size);
       });
     }},

    {Steps("client_echo_deserialize")
         .logs_name(warn("%s start"))
         .makes_stream()
         .writes("requestId", "7")
         .releases_stream()
         .exits(),
     [](Observation* seen) {
       const Wire echo = Wire().number(1, 7);
       support::ClientEchoOutputs out;
       seen->of([&] { out.read(echo.bytes()); });
       seen->shows("requestId", out.request_id);
     }},

    {Steps("create_chatroom_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .encodes(Wire().number(11, 1).number(12, 2).number(13, 3).number(13, 4).text(14, kText)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const int64_t receivers[] = {3, 4};
         return create_chatroom_request_serialize(1, 2, receivers, 2, kText, data, size);
       });
     }},

    {Steps("create_chatroom_request_serialize")
         .logs_name(debug("%s start"))
         .logs(error("invalid parameter: receivers is null"))
         .returns(-1),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return create_chatroom_request_serialize(1, 2, nullptr, 2, kText, data, size);
       });
     },
     "WithoutReceivers"},

    {Steps("create_chatroom_reply_deserialize")
         .logs_name(warn("%s: enter"))
         .parses()
         .writes("requestId", "7")
         .writes("chatroomId", "6")
         .writes("msgTtl", "60")
         .hands_out_result(1001, kOutcome)
         .fills_objects()  // a copy of the lists
         .writes("invalidReceiversCount", "2")
         .logs(warn("%d invalidReceivers are detected", {2}))
         .uses_block_of(kCalloc)
         .writes("invalidReceivers", "11 12")
         .logs(warn("invalid Reciever id : %lld", {11LL}))
         .logs(warn("invalid Reciever id : %lld", {12LL}))
         .writes("disabledReceiversCount", "2")
         .logs(warn("%d disabledReceivers are detected", {2}))
         .uses_block_of(kCalloc)
         .writes("disabledReceivers", "31 32")
         .logs(warn("disabled Reciever id : %lld", {31LL}))
         .logs(warn("disabled Reciever id : %lld", {32LL}))
         .writes("didViolationUsersCount", "2")
         .logs(warn("%d didViolationUsers are detected", {2}))
         .uses_block_of(kCalloc)
         .writes("didViolationUsers", "{301, 302} {303, 304}")
         .logs(warn("did violation usera's id : %lld", {301LL}))
         .logs(warn("did violation userb's id : %lld", {302LL}))
         .logs(next_round(warn("did violation usera's id : %lld", {303LL})))
         .logs(warn("did violation userb's id : %lld", {304LL}))
         .writes("invitationDeniedCount", "2")
         .uses_block_of(kCalloc)
         .writes("invitationDenied", "61 62")
         .logs(warn("did invitation denied: %lld", {61LL}))
         .logs(warn("did invitation denied: %lld", {62LL}))
         .exits(),
     [](Observation* seen) {
       const Wire reply =
           Wire()
               .number(1, 9)
               .number(2, 8)
               .number(11, 7)
               .number(12, 6)
               .message(13, refusal(1001))
               .number(14, 5)
               .number(20, 4)
               .number(21, 60);
       support::CreateChatroomReplyOutputs out;
       seen->of([&] { out.read(reply.bytes()); });
       seen->shows("requestId", out.request_id);
       seen->shows("chatroomId", out.chatroom_id);
       seen->shows("msgTtl", out.ttl);
       seen->shows("resultCode", out.code);
       seen->shows("resultMsg", out.text);
       seen->shows("invalidReceivers", out.invalid);
       seen->shows("disabledReceivers", out.disabled);
       seen->shows("didViolationUsers", out.violations);
       seen->shows("invitationDenied", out.denied);
     }},

    {Steps("chat_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .encodes(Wire().number(11, 1).number(12, 2).message(
             13, Wire().number(1, 3).number(2, 4).text(3, kText).number(4, 5))),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return chat_request_serialize(1, 2, 3, 4, kText, 5, 6, data, size);
       });
     }},

    {Steps("chat_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .logs(error("msgType is out of range(0~6)"))
         .returns(-1),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return chat_request_serialize(1, 2, 3, 31, kText, 5, 6, data, size);
       });
     },
     "WithATypeOutOfRange"},

    {Steps("chat_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .logs(error("no message"))
         .returns(-1),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return chat_request_serialize(1, 2, 3, 4, nullptr, 5, 6, data, size);
       });
     },
     "WithoutAText"},

    {Steps("chat_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .logs(error("chatMsg length(%d) cannot be greater than %d", {40001, 40000}))
         .returns(-1),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return chat_request_serialize(1, 2, 3, 4, kTooLongText.c_str(), 5, 6, data, size);
       });
     },
     "WithTooLongAText"},

    {Steps("chat_reply_deserialize")
         .logs_name(warn("%s: start"))
         .parses()
         .writes("requestId", "7")
         .writes("chatroomId", "6")
         .hands_out_result(3, kOutcome)
         .logs(debug("processed msg entry size : %d", {2}))
         .writes("count", "2")
         .hands_out_or(kCalloc, "msgIds", "0 0",
                       Steps("chat_reply_deserialize")
                           .writes("sentTimes", "0 0")
                           .logs(error("memory allocation error(msgId, sentTime)"))
                           .writes("count", "0")
                           .returns())
         .hands_out_or(kCalloc, "sentTimes", "0 0",
                       Steps("chat_reply_deserialize")
                           .logs(error("memory allocation error(msgId, sentTime)"))
                           .writes("count", "0")
                           .returns())
         .writes("msgIds", "11 12")
         .writes("sentTimes", "13 14")
         .exits(),
     [](Observation* seen) {
       const Wire reply = Wire()
                              .number(1, 9)
                              .number(2, 8)
                              .number(11, 7)
                              .number(12, 6)
                              .message(13, result())
                              .message(14, Wire().number(1, 11).number(2, 13))
                              .message(14, Wire().number(1, 12).number(2, 14));
       support::ChatReplyOutputs out;
       seen->of([&] { out.read(reply.bytes()); });
       seen->shows("requestId", out.request_id);
       seen->shows("chatroomId", out.chatroom_id);
       seen->shows("resultCode", out.code);
       seen->shows("resultMsg", out.text);
       seen->shows("count", out.count);
       seen->shows("msgIds", out.ids, 2);
       seen->shows("sentTimes", out.times, 2);
     }},

    {Steps("allow_chat_request_serialize")
         .logs_name(debug("%s start"))
         .encodes(Wire()
                      .number(11, 1)
                      .number(12, 2)
                      .number(13, 1)
                      .number(14, 3)
                      .number(15, 1)
                      .number(16, 1)
                      .number(17, 5)
                      .number(18, 1)
                      .number(19, 1)
                      .number(20, 4)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const bool allows = true;
         return allow_chat_request_serialize(1, 2, &allows, 3, true, 4, true, 5, true, true, data,
                                             size);
       });
     }},

    {Steps("allow_chat_reply_deserialize")
         .logs_name(warn("%s: start"))
         .parses()
         .writes("requestId", "7")
         .writes("chatroomId", "6")
         .hands_out_result(3, kOutcome)
         .writes("lastDeliveryAckTimestamp", "400")
         .writes("deliveryAckCount", "2")
         .uses_block_of(kMalloc)  // the array, and then each record
         .uses_block_of(kMalloc)
         .uses_block_of(kMalloc)
         .writes("deliveryAckEntries", "{21, 22, 23} {24, 25, 26}")
         .writes("lastReadAckTimestamp", "300")
         .writes("readAckCount", "2")
         .uses_block_of(kMalloc)
         .uses_block_of(kMalloc)
         .uses_block_of(kMalloc)
         .writes("readAckEntries", "{31, 32, 33} {34, 35, 36}")
         .writes("memberCount", "2")
         .uses_block_of(kMalloc)
         .uses_block_of(kMalloc)
         .hands_out(kStrdup, "members[0].name", "Ann")
         .uses_block_of(kMalloc)
         .hands_out(kStrdup, "members[1].name", kText)
         .writes("members", "{41, 1} {42, 0}")
         .hands_out(kStrdup, "title", kText)
         .writes("msgTtl", "60")
         .exits(),
     [](Observation* seen) {
       const Wire device = Wire().number(1, 51).text(2, kText).text(3, kText);
       const Wire reply =
           Wire()
               .number(1, 9)
               .number(2, 8)
               .number(11, 7)
               .number(12, 6)
               .message(13, result())
               .number(14, 300)
               .number(15, 5)
               .message(16, Wire().number(1, 41).number(2, 1).text(3, "Ann").number(10, 1))
               .message(16, Wire()
                                .number(1, 42)
                                .number(2, 0)
                                .text(3, kText)
                                .message(11, device)
                                .message(11, device))
               .message(17, Wire().number(1, 31).number(2, 32).number(3, 33).number(10, 6))
               .message(17, Wire().number(1, 34).number(2, 35).number(3, 36).number(10, 6))
               .text(18, kText)
               .text(19, kText)
               .message(20, Wire().number(1, 21).number(2, 22).number(3, 23).number(10, 6))
               .message(20, Wire().number(1, 24).number(2, 25).number(3, 26).number(10, 6))
               .number(21, 400)
               .number(22, 60);
       support::AllowChatReplyOutputs out;
       seen->of([&] { out.read(reply.bytes()); });
       seen->shows("requestId", out.request_id);
       seen->shows("chatroomId", out.chatroom_id);
       seen->shows("resultCode", out.code);
       seen->shows("resultMsg", out.text);
       seen->shows("deliveryAckEntries", out.deliveries.array, 2);
       seen->shows("deliveryAckCount", out.deliveries.count);
       seen->shows("lastDeliveryAckTimestamp", out.last_delivery);
       seen->shows("readAckEntries", out.reads.array, 2);
       seen->shows("readAckCount", out.reads.count);
       seen->shows("lastReadAckTimestamp", out.last_read);
       seen->shows("members", out.members.array, 2);
       if (!out.members.untouched()) {
         seen->shows_text("members[0].name", out.members.array.block[0]->name);
         seen->shows_text("members[1].name", out.members.array.block[1]->name);
       }
       seen->shows("memberCount", out.members.count);
       seen->shows("title", out.title);
       seen->shows("msgTtl", out.ttl);
     }},

    {Steps("get_all_unread_message_request_serialize")
         .logs_name(debug("%s start"))
         .encodes(Wire().number(11, 1).number(12, 5)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const int most = 5;
         return get_all_unread_message_request_serialize(1, &most, data, size);
       });
     }},

    {reading_result("get_all_unread_message_reply_deserialize"),
     [](Observation* seen) {
       observe_result<support::GetAllUnreadMessageReplyOutputs>(
           seen, Wire().number(1, 9).number(2, 8).number(11, 7).message(12, result()));
     }},

    {Steps("forward_online_message_reply_serialize")
         .logs_name(debug("%s start"))
         .encodes(Wire().number(11, 1).number(12, 2).number(13, 1)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const bool read = true;
         return forward_online_message_reply_serialize(1, 2, &read, data, size);
       });
     }},

    {Steps("forward_online_message_get_deserialize")
         .logs(error("check "))
         .logs_name(warn("%s: start"))
         .parses()
         .writes("requestId", "7")
         .writes("chatroomId", "6")
         .writes("chatType", "1")
         .logs(error("has_skipreply:true "))
         .logs(support::info("skipreply: %d", {1}))
         .writes("skipReply", "1")
         .fills_objects()  // a copy of the entry
         .writes("inboxEntry.msgId", "21")
         .writes("inboxEntry.msgType", "3")
         .logs(error("msgType : %d ", {3}))
         .writes("inboxEntry.sender", "22")
         .writes("inboxEntry.receiver", "23")
         .writes("inboxEntry.sentTime", "24")
         .hands_out(kStrdup, "inboxEntry.chatMsg", kText)
         .writes("inboxEntry.msgTtl", "25")
         .exits(),
     [](Observation* seen) {
       support::ForwardOnlineMessageOutputs out;
       observe_push_of_one(seen, &out);
     }},

    {Steps("forward_online_message_get_deserialize")
         .logs(error("check "))
         .logs_name(warn("%s: start"))
         .parses()
         .writes("requestId", "7")
         .writes("chatroomId", "6")
         .writes("chatType", "1")
         .logs(error("has_skipreply:true "))
         .logs(support::info("skipreply: %d", {1}))
         .writes("skipReply", "1")
         .fills_objects()
         .writes("errorCode", "18")
         .hands_out(kStrdup, "errorMsg", "inboxentry memory allocation failed")
         .exits(),
     [](Observation* seen) {
       support::ForwardOnlineMessageOutputs out;
       out.entry = nullptr;
       observe_push_of_one(seen, &out);
     },
     "WithoutARecord"},

    {Steps("forward_unread_message_reply_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .logs(warn("maxCount : %d", {5}))
         .encodes(Wire().number(11, 1).text(12, kText).number(13, 5)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const char* key = kText;
         const int most = 5;
         return forward_unread_message_reply_serialize(1, &key, &most, data, size);
       });
     }},

    {Steps("forward_unread_message_deserialize")
         .logs_name(warn("%s: start"))
         .parses()
         .writes("requestId", "7")
         .writes("count", "2")
         .hands_out_or(kCalloc, "inboxEntries",
                       "{21, 3, 22, 23, 24, 26, 1, 25} {21, 3, 22, 23, 24, 26, 1, 25}",
                       Steps("forward_unread_message_deserialize")
                           .logs(error("qel_message_inboxentry_t * allocation fail"))
                           .returns())
         .uses_block_of(kCalloc)  // each record
         .hands_out(kStrdup, "inboxEntries[0].chatMsg", kText)
         .uses_block_of(kCalloc)
         .hands_out(kStrdup, "inboxEntries[1].chatMsg", kText)
         .hands_out(kStrdup, "nextPaginationKey", kText)
         .exits(),
     [](Observation* seen) {
       const Wire push = Wire()
                             .number(1, 9)
                             .number(2, 8)
                             .number(11, 7)
                             .message(12, inbox_entry())
                             .message(12, inbox_entry())
                             .text(13, kText)
                             .number(14, 1);
       support::ForwardUnreadMessageOutputs out;
       seen->of([&] { out.read(push.bytes()); });
       seen->shows("requestId", out.request_id);
       seen->shows("count", out.entries.count);
       seen->shows("inboxEntries", out.entries.array, 2);
       if (out.entries.array.block == nullptr) {
         out.entries.count = 0;  // so that nobody walks the array
       } else if (!out.entries.untouched()) {
         seen->shows_text("inboxEntries[0].chatMsg", out.entries.array.block[0]->chatMsg);
         seen->shows_text("inboxEntries[1].chatMsg", out.entries.array.block[1]->chatMsg);
       }
       seen->shows("nextPaginationKey", out.next_key);
     }},

    {Steps("read_message_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .encodes(Wire().number(11, 1).number(12, 2).message(
             13, Wire().number(1, 3).number(2, 4).number(3, 5).number(5, 7))),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         char text[] = "x";
         const qel_message_inboxentry_t entry = {3, 4, 5, 6, 7, text, 8, 1, 9};
         return read_message_request_serialize(1, 2, &entry, data, size);
       });
     }},

    {Steps("read_message_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .logs(error("msgType is out of range(0~6)"))
         .returns(-1),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const qel_message_inboxentry_t entry = {3, 31, 5, 6, 7, nullptr, 8, 1, 9};
         return read_message_request_serialize(1, 2, &entry, data, size);
       });
     },
     "WithATypeOutOfRange"},

    {reading_chatroom_result("read_message_reply_deserialize"),
     observe_chatroom_result<support::ReadMessageReplyOutputs>},

    {Steps("end_chat_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .encodes(Wire()
                      .number(11, 1)
                      .message(12, Wire().number(1, 2).number(11, 1))
                      .message(12, Wire().number(1, 3).number(11, 0))),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const qel_message_endchatentry_t entries[] = {{2, true}, {3, false}};
         return end_chat_request_serialize(1, entries, 2, data, size);
       });
     }},

    {reading_result("end_chat_reply_deserialize"),
     [](Observation* seen) {
       observe_result<support::EndChatReplyOutputs>(
           seen, Wire().number(1, 9).number(2, 8).number(11, 7).message(12, result()));
     }},

    {Steps("invite_chat_request_serialize")
         .logs_name(debug("%s start"))
         .logs(debug("in_invtingMemebersCount=%d\n", {2}))
         .fills_objects()
         .encodes(Wire().number(11, 1).number(12, 2).number(13, 3).number(13, 4)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const int64_t members[] = {3, 4};
         const int count = 2;
         return invite_chat_request_serialize(1, 2, members, &count, data, size);
       });
     }},

    {Steps("invite_reply_deserialize")
         .logs_name(warn("%s: start"))
         .parses()
         .writes("requestId", "7")
         .writes("chatroomId", "6")
         .writes("sentTime", "300")
         .hands_out_result(3003, kOutcome)
         .writes("invalidReceiversCount", "2")
         .logs(warn("%d invalidReceivers", {2}))
         .uses_block_of(kMalloc)
         .writes("invalidReceivers", "11 12")
         .logs(warn("invalidReceiver[%d] : %lld", {0, 11LL}))
         .logs(warn("invalidReceiver[%d] : %lld", {1, 12LL}))
         .writes("interruptedReceiversCount", "2")
         .logs(warn("%d interruptedReceivers", {2}))
         .uses_block_of(kMalloc)
         .writes("interruptedReceivers", "21 22")
         .logs(warn("interruptedReceivers[%d] : %lld", {0, 21LL}))
         .logs(warn("interruptedReceivers[%d] : %lld", {1, 22LL}))
         .writes("disabledReceiversCount", "2")
         .logs(warn("%d disabledReceivers", {2}))
         .uses_block_of(kMalloc)
         .writes("disabledReceivers", "31 32")
         .logs(warn("disabledReceivers[%d] : %lld", {0, 31LL}))
         .logs(warn("disabledReceivers[%d] : %lld", {1, 32LL}))
         .writes("existingChatmembersCount", "2")
         .logs(warn("%d existingChatmembers", {2}))
         .uses_block_of(kMalloc)
         .writes("existingChatmembers", "41 42")
         .logs(warn("existingChatmembers[%d] : %lld", {0, 41LL}))
         .logs(warn("existingChatmembers[%d] : %lld", {1, 42LL}))
         .writes("didViolationUsersCount", "2")
         .logs(warn("%d didviolationusersCount", {2}))
         .logs(warn("%d didViolationUsers are detected", {2}))
         .uses_block_of(kCalloc)
         .writes("didViolationUsers", "{301, 302} {303, 304}")
         .logs(warn("did violation usera's id : %lld", {301LL}))
         .logs(warn("did violation userb's id : %lld", {302LL}))
         .logs(next_round(warn("did violation usera's id : %lld", {303LL})))
         .logs(warn("did violation userb's id : %lld", {304LL}))
         .writes("invitationDeniedCount", "2")
         .uses_block_of(kCalloc)
         .writes("invitationDenied", "61 62")
         .logs(warn("did denied invitations : %lld", {61LL}))
         .logs(warn("did denied invitations : %lld", {62LL}))
         .exits(),
     [](Observation* seen) {
       const Wire reply =
           Wire()
               .number(1, 9)
               .number(2, 8)
               .number(11, 7)
               .number(12, 6)
               .message(13, refusal(3003))
               .number(14, 300);
       support::InviteReplyOutputs out;
       seen->of([&] { out.read(reply.bytes()); });
       seen->shows("requestId", out.request_id);
       seen->shows("chatroomId", out.chatroom_id);
       seen->shows("sentTime", out.sent_time);
       seen->shows("resultCode", out.code);
       seen->shows("resultMsg", out.text);
       seen->shows("invalidReceivers", out.invalid);
       seen->shows("interruptedReceivers", out.interrupted);
       seen->shows("disabledReceivers", out.disabled);
       seen->shows("existingChatmembers", out.existing);
       seen->shows("didViolationUsers", out.violations);
       seen->shows("invitationDenied", out.denied);
     }},

    {Steps("current_time_request_serialize")
         .logs_name(debug("%s: enter"))
         .encodes(Wire().number(11, 1)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return current_time_request_serialize(1, data, size);
       });
     }},

    {Steps("current_time_deserialize")
         .logs_name(warn("%s: start"))
         .parses()
         .writes("requestId", "7")
         .writes("currentTimeMillis", "1500")
         .hands_out_result(3, kOutcome)
         .exits(),
     [](Observation* seen) {
       const Wire reply =
           Wire().number(1, 9).number(2, 8).number(11, 7).message(12, result()).number(13, 1500);
       support::CurrentTimeOutputs out;
       seen->of([&] { out.read(reply.bytes()); });
       seen->shows("requestId", out.request_id);
       seen->shows("currentTimeMillis", out.millis);
       seen->shows("resultCode", out.code);
       seen->shows("resultMsg", out.text);
     }},

    {Steps("unseal_message_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .encodes(
             Wire().number(11, 1).number(12, 2).number(13, 3).number(14, 4).text(15, kText)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return unseal_message_request_serialize(1, 2, 3, 4, kText, data, size);
       });
     }},

    {reading_chatroom_result("unseal_message_reply_deserialize"),
     observe_chatroom_result<support::UnsealMessageReplyOutputs>},

    {Steps("save_call_log_request_serialize")
         .logs_name(debug("%s start"))
         .fills_objects()
         .encodes(Wire()
                      .number(11, 1)
                      .number(12, 2)
                      .text(20, kText)
                      .text(21, kText)
                      .number(22, 3)
                      .number(23, 4)
                      .number(25, 5)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return save_call_log_request_serialize(1, 2, kText, kText, 3, 4, 5, data, size);
       });
     }},

    {reading_result("save_call_log_reply_deserialize"),
     [](Observation* seen) {
       observe_result<support::SaveCallLogReplyOutputs>(
           seen,
           Wire().number(1, 9).number(2, 8).number(11, 7).number(12, 6).message(13, result()));
     }},

    {Steps("is_typing_request_serialize")
         .logs_name(debug("%s: enter"))
         .fills_objects()
         .writes("size", "38")
         .hands_out_or(kCalloc, "serialized_data",
                       to_hex(Wire()
                                  .number(11, 1)
                                  .number(12, 2)
                                  .text(13, kText)
                                  .number(14, 3)
                                  .number(15, 4)
                                  .bytes()),
                       Steps("is_typing_request_serialize")
                           .logs(debug("Memory allocation is failed to serialized_data"))
                           .returns())
         .logs_name(debug("%s: exit"))
         .returns(),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const int content = 3;
         const int refresh = 4;
         is_typing_request_serialize(1, 2, kText, &content, &refresh, data, size);
       });
     }},

    {Steps("typing_updated_deserialize")
         .logs_name(warn("%s: start"))
         .parses()
         .writes("requestId", "7")
         .writes("chatroomId", "6")
         .writes("sender", "5")
         .hands_out(kStrdup, "state", kText)
         .writes("contentType", "3")
         .writes("refresh", "4")
         .exits(),
     [](Observation* seen) {
       const Wire push = Wire()
                             .number(1, 9)
                             .number(2, 8)
                             .number(11, 7)
                             .number(12, 6)
                             .number(13, 5)
                             .text(14, kText)
                             .number(15, 3)
                             .number(16, 4);
       support::TypingUpdatedOutputs out;
       seen->of([&] { out.read(push.bytes()); });
       seen->shows("requestId", out.request_id);
       seen->shows("chatroomId", out.chatroom_id);
       seen->shows("sender", out.sender);
       seen->shows("state", out.state);
       seen->shows("contentType", out.content_type);
       seen->shows("refresh", out.refresh);
     }},

    {Steps("change_chatroom_meta_request_serialize")
         .logs_name(debug("%s start"))
         .logs(debug("requestId: %lld", {1LL}))
         .logs(warn("both title and msgTtl are set, title is used, msgTtl skipped"))
         .fills_objects()
         .encodes(Wire().number(11, 1).number(12, 2).text(13, kText)),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         const int ttl = 3;
         return change_chatroom_meta_request_serialize(1, 2, kText, &ttl, data, size);
       });
     }},

    {Steps("change_chatroom_meta_request_serialize")
         .logs_name(debug("%s start"))
         .logs(debug("requestId: %lld", {1LL}))
         .logs(error("both title and msgTtl are empty"))
         .returns(-1),
     [](Observation* seen) {
       observe_encoding(seen, [](unsigned char** data, int* size) {
         return change_chatroom_meta_request_serialize(1, 2, nullptr, nullptr, data, size);
       });
     },
     "WithoutATitleAndALifetime"},

    {reading_chatroom_result("change_chatroom_meta_reply_deserialize"),
     observe_chatroom_result<support::ChangeChatroomMetaReplyOutputs>},
};

TEST(Accounts, AreThoseOfAllFunctions) {
  const auto function = [](const Account& account) { return account.steps.function(); };
  EXPECT_EQ(support::names_in(kAccounts, function), support::exported_functions());
}

class Faults : public support::ExchangeTest {
 protected:
  static void observe(const Account& account, Observation* seen) {
    support::clear_log();
    account.observe(seen);
    seen->stop();
  }
};

// ---- calloc, malloc and strdup: a test for each block

// A row's function, and one block that it asks for.
struct RefusedBlock {
  const Account* account;
  support::Refusal refusal;
};

std::string name_of(Allocator allocator) {
  switch (allocator) {
    case kCalloc:
      return "calloc";
    case kMalloc:
      return "malloc";
    case kStrdup:
      return "strdup";
    case Allocator::kNew:
      return "new";
  }
  return "";
}

void PrintTo(const RefusedBlock& block, std::ostream* out) {
  *out << block.account->name() << ", " << name_of(block.refusal.allocator) << " "
       << block.refusal.n;
}

std::vector<RefusedBlock> refused_blocks() {
  std::vector<RefusedBlock> blocks;
  for (const Account& account : kAccounts) {
    for (const Allocator allocator : {kCalloc, kMalloc, kStrdup}) {
      for (int n = 1; n <= account.steps.blocks_of(allocator); ++n) {
        blocks.push_back({&account, {allocator, n}});
      }
    }
  }
  return blocks;
}

class EveryBlock : public Faults, public ::testing::WithParamInterface<RefusedBlock> {
 protected:
  const Account& account_ = *GetParam().account;
  const support::Refusal refusal_ = GetParam().refusal;
  const Outcome outcome_ = account_.steps.outcome(refusal_);

  // Matches when exactly these lines come first on standard error.
  static std::string lines_alone(const std::vector<support::Line>& lines) {
    std::string pattern = "^";
    for (const support::Line& line : lines) {
      for (const char c : whole_format(line)) {
        pattern += std::string(".[{}()\\*+?|^$").find(c) != std::string::npos ? "\\" : "";
        pattern += c;
      }
      pattern += "\n";
    }
    return pattern + "([^%]|$)";  // with which each line begins
  }
};

TEST_P(EveryBlock, WhenRefused_EndsTheCallAsItsAccountSays) {
  if (outcome_.end == "faults") {
    EXPECT_EXIT(
        {
          const support::LogObserver observer(support::print_format);
          Observation seen(refusal_);
          observe(account_, &seen);
        },
        support::faults, lines_alone(outcome_.lines));
    return;
  }
  Observation seen(refusal_);
  observe(account_, &seen);
  ASSERT_TRUE(seen.refused());
  seen.expect(account_.steps.function(), outcome_);
}

INSTANTIATE_TEST_SUITE_P(AllocationFaults, EveryBlock, ::testing::ValuesIn(refused_blocks()),
                         [](const auto& row) {
                           return row.param.account->name() + "_" +
                                  name_of(row.param.refusal.allocator) + "_" +
                                  std::to_string(row.param.refusal.n);
                         });

// ---- No block refused, and operator new

class EveryCall : public Faults, public ::testing::WithParamInterface<Account> {
 protected:
  const Steps& steps_ = GetParam().steps;
};

TEST_P(EveryCall, WhenNoBlockIsRefused_LeavesWhatItsAccountSays) {
  Observation seen({});
  observe(GetParam(), &seen);
  seen.expect(steps_.function(), steps_.outcome());
}

TEST_P(EveryCall, WhenABlockMoreThanInItsAccountIsRefused_IsNeverAskedForIt) {
  for (const Allocator allocator : {kCalloc, kMalloc, kStrdup}) {
    SCOPED_TRACE(name_of(allocator));
    Observation seen({allocator, steps_.blocks_of(allocator) + 1});
    observe(GetParam(), &seen);
    EXPECT_FALSE(seen.refused());
  }
}

// How many blocks a step takes is the runtime's affair, but not how often it uses operator new and
// what is there when it throws.
TEST_P(EveryCall, WhenABlockOfNewIsRefused_ThrowsAndLeavesWhatItsAccountSays) {
  const std::vector<Outcome> outcomes = steps_.outcomes_of_throws();
  size_t reached = 0;  // of them
  for (int n = 1; !HasFailure(); ++n) {
    SCOPED_TRACE(n);
    Observation seen({Allocator::kNew, n});
    observe(GetParam(), &seen);
    if (!seen.refused()) {
      seen.expect(steps_.function(), steps_.outcome());
      break;
    }
    if (reached == 0 || (reached < outcomes.size() && !seen.agrees_with(outcomes[reached - 1]))) {
      ++reached;
    }
    ASSERT_GT(outcomes.size(), 0u) << "uses operator new";
    seen.expect(steps_.function(), outcomes[reached - 1]);
  }
  EXPECT_EQ(reached, outcomes.size()) << "a step does not use operator new";
}

INSTANTIATE_TEST_SUITE_P(AllocationFaults, EveryCall, ::testing::ValuesIn(kAccounts),
                         [](const auto& row) { return row.param.name(); });

}  // namespace
