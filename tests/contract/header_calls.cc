#include "header_calls.h"

#include <algorithm>
#include <cstdlib>
#include <map>
#include <memory>
#include <tuple>

#include "qel-message.h"

namespace contract {
namespace {

void place(Call* call, qel_buffer_t* buffer) {
  call->place("serialized_data", &buffer->data);
  call->place("size", &buffer->size);
}

void place(Call* call, qel_reply_t* reply) {
  call->place("requestId", &reply->requestId);
  call->place("chatroomId", &reply->chatroomId);
  call->place("resultCode", &reply->resultCode);
  call->place("resultMsg", &reply->resultMsg);
}

void place(Call* call, qel_client_echo_t* echo) {
  call->place("requestId", &echo->requestId);
}

void place(Call* call, qel_current_time_t* now) {
  place(call, &now->reply);
  call->place("currentTimeMillis", &now->currentTimeMillis);
}

void place(Call* call, qel_create_chatroom_reply_t* created) {
  place(call, &created->reply);
  call->place("msgTtl", &created->msgTtl);
  call->place("invalidReceivers", &created->invalidReceivers);
  call->place("invalidReceiversCount", &created->invalidReceiversCount);
  call->place("unlistedInvalidReceivers", &created->unlistedInvalidReceivers);
  call->place("disabledReceivers", &created->disabledReceivers);
  call->place("disabledReceiversCount", &created->disabledReceiversCount);
  call->place("didViolationUsers", &created->didViolationUsers);
  call->place("didViolationUsersCount", &created->didViolationUsersCount);
  call->place("invitationDenied", &created->invitationDenied);
  call->place("invitationDeniedCount", &created->invitationDeniedCount);
}

void place(Call* call, qel_chat_reply_t* chat) {
  place(call, &chat->reply);
  call->place("count", &chat->count);
  call->place("msgIds", &chat->msgIds);
  call->place("sentTimes", &chat->sentTimes);
}

void place(Call* call, qel_allow_chat_reply_t* room) {
  place(call, &room->reply);
  call->place("deliveryAckEntries", &room->deliveryAckEntries);
  call->place("deliveryAckCount", &room->deliveryAckCount);
  call->place("lastDeliveryAckTimestamp", &room->lastDeliveryAckTimestamp);
  call->place("readAckEntries", &room->readAckEntries);
  call->place("readAckCount", &room->readAckCount);
  call->place("lastReadAckTimestamp", &room->lastReadAckTimestamp);
  call->place("members", &room->members);
  call->place("memberCount", &room->memberCount);
  call->place("title", &room->title);
  call->place("msgTtl", &room->msgTtl);
}

void place(Call* call, qel_forward_online_message_get_t* push) {
  call->place("requestId", &push->requestId);
  call->place("chatroomId", &push->chatroomId);
  call->place("chatType", &push->chatType);
  call->place("inboxEntry", &push->inboxEntry);
  call->place("skipReply", &push->skipReply);
}

void place(Call* call, qel_forward_unread_message_t* page) {
  call->place("requestId", &page->requestId);
  call->place("inboxEntries", &page->inboxEntries);
  call->place("count", &page->count);
  call->place("nextPaginationKey", &page->nextPaginationKey);
}

void place(Call* call, qel_invite_reply_t* invited) {
  place(call, &invited->reply);
  call->place("sentTime", &invited->sentTime);
  call->place("invalidReceivers", &invited->invalidReceivers);
  call->place("invalidReceiversCount", &invited->invalidReceiversCount);
  call->place("interruptedReceivers", &invited->interruptedReceivers);
  call->place("interruptedReceiversCount", &invited->interruptedReceiversCount);
  call->place("disabledReceivers", &invited->disabledReceivers);
  call->place("disabledReceiversCount", &invited->disabledReceiversCount);
  call->place("existingChatmembers", &invited->existingChatmembers);
  call->place("existingChatmembersCount", &invited->existingChatmembersCount);
  call->place("didViolationUsers", &invited->didViolationUsers);
  call->place("didViolationUsersCount", &invited->didViolationUsersCount);
  call->place("invitationDenied", &invited->invitationDenied);
  call->place("invitationDeniedCount", &invited->invitationDeniedCount);
}

void place(Call* call, qel_typing_updated_t* typing) {
  call->place("requestId", &typing->requestId);
  call->place("chatroomId", &typing->chatroomId);
  call->place("sender", &typing->sender);
  call->place("state", &typing->state);
  call->place("contentType", &typing->contentType);
  call->place("refresh", &typing->refresh);
}

char* text() {
  return static_cast<char*>(std::calloc(2, 1));
}

void fill(qel_buffer_t* buffer) {
  *buffer = {reinterpret_cast<unsigned char*>(text()), 2};
}

void fill(qel_reply_t* reply) {
  *reply = {1, 1, 1, text()};
}

void fill(qel_client_echo_t* echo) {
  echo->requestId = 1;
}

void fill(qel_forward_online_message_get_t* push) {
  push->requestId = 1;
  push->inboxEntry.sender = 1;
  push->inboxEntry.chatMsg = text();
}

void fill(qel_forward_unread_message_t* page) {
  page->requestId = 1;
  page->nextPaginationKey = text();
}

void fill(qel_typing_updated_t* typing) {
  typing->requestId = 1;
  typing->sender = 1;
  typing->state = text();
}

template <typename Record>
void fill(Record* record) {
  fill(&record->reply);
}

// The names of the function's inputs that the header has too.
std::vector<std::string> inputs_of(const std::string& function) {
  const bool is_serializer = function.find("_deserialize") == std::string::npos;
  std::vector<std::string> names;
  for (const Parameter& parameter : parameters_of(function)) {
    const bool is_input = is_serializer
                              ? parameter.kind != Kind::kOutput
                              : parameter.kind == Kind::kReceived || parameter.name == "size";
    if (is_input && parameter.name != "reserved") {
      names.push_back(parameter.name);
    }
  }
  return names;
}

using MakeCall = std::function<HeaderCall(const std::vector<std::string>& names, Call* call)>;

// A bool is made of a byte, which may be neither 0 nor 1.
template <typename T>
using Given = std::conditional_t<std::is_same_v<T, bool>, unsigned char, T>;

template <typename Record, typename... A>
MakeCall header_call(qel_status_t (*function)(Record*, A...), void (*release)(Record*)) {
  return [=](const std::vector<std::string>& names, Call* call) -> HeaderCall {
    const auto record = std::make_shared<Record>();
    place(call, record.get());
    auto name = names.begin();
    // In braces, so that they are made in order.
    const std::tuple<Given<A>...> arguments{call->argument<Given<A>>(*name++)...};
    return {[=] {
              return std::apply(
                  [&](auto... argument) { return function(record.get(), A(argument)...); },
                  arguments);
            },
            [=] { release(record.get()); }, [=] { fill(record.get()); }};
  };
}

template <typename... A>
MakeCall header_call(qel_status_t (*write)(qel_buffer_t*, A...)) {
  return header_call(write, qel_buffer_release);
}

template <typename... A>
MakeCall header_call(qel_status_t (*read)(qel_reply_t*, A...)) {
  return header_call(read, qel_reply_release);
}

const std::map<std::string, MakeCall>& header_calls() {
  static const std::map<std::string, MakeCall> all = {
      {"channel_auth_request_serialize", header_call(qel_channel_auth_request_write)},
      {"channel_auth_reply_deserialize", header_call(qel_channel_auth_reply_read)},
      {"client_echo_reply_serialize", header_call(qel_client_echo_reply_write)},
      {"client_echo_deserialize", header_call(qel_client_echo_read, qel_client_echo_release)},
      {"create_chatroom_request_serialize", header_call(qel_create_chatroom_request_write)},
      {"create_chatroom_reply_deserialize",
       header_call(qel_create_chatroom_reply_read, qel_create_chatroom_reply_release)},
      {"chat_request_serialize", header_call(qel_chat_request_write)},
      {"chat_reply_deserialize", header_call(qel_chat_reply_read, qel_chat_reply_release)},
      {"allow_chat_request_serialize", header_call(qel_allow_chat_request_write)},
      {"allow_chat_reply_deserialize",
       header_call(qel_allow_chat_reply_read, qel_allow_chat_reply_release)},
      {"get_all_unread_message_request_serialize",
       header_call(qel_get_all_unread_message_request_write)},
      {"get_all_unread_message_reply_deserialize",
       header_call(qel_get_all_unread_message_reply_read)},
      {"forward_online_message_reply_serialize",
       header_call(qel_forward_online_message_reply_write)},
      {"forward_online_message_get_deserialize",
       header_call(qel_forward_online_message_get_read, qel_forward_online_message_get_release)},
      {"forward_unread_message_reply_serialize",
       header_call(qel_forward_unread_message_reply_write)},
      {"forward_unread_message_deserialize",
       header_call(qel_forward_unread_message_read, qel_forward_unread_message_release)},
      {"read_message_request_serialize", header_call(qel_read_message_request_write)},
      {"read_message_reply_deserialize", header_call(qel_read_message_reply_read)},
      {"end_chat_request_serialize", header_call(qel_end_chat_request_write)},
      {"end_chat_reply_deserialize", header_call(qel_end_chat_reply_read)},
      {"invite_chat_request_serialize", header_call(qel_invite_chat_request_write)},
      {"invite_reply_deserialize", header_call(qel_invite_reply_read, qel_invite_reply_release)},
      {"current_time_request_serialize", header_call(qel_current_time_request_write)},
      {"current_time_deserialize", header_call(qel_current_time_read, qel_current_time_release)},
      {"unseal_message_request_serialize", header_call(qel_unseal_message_request_write)},
      {"unseal_message_reply_deserialize", header_call(qel_unseal_message_reply_read)},
      {"save_call_log_request_serialize", header_call(qel_save_call_log_request_write)},
      {"save_call_log_reply_deserialize", header_call(qel_save_call_log_reply_read)},
      {"is_typing_request_serialize", header_call(qel_is_typing_request_write)},
      {"typing_updated_deserialize",
       header_call(qel_typing_updated_read, qel_typing_updated_release)},
      {"change_chatroom_meta_request_serialize",
       header_call(qel_change_chatroom_meta_request_write)},
      {"change_chatroom_meta_reply_deserialize", header_call(qel_change_chatroom_meta_reply_read)},
  };
  return all;
}

}  // namespace

HeaderCall header_call_of(const std::string& function, Call* call) {
  return header_calls().at(function)(inputs_of(function), call);
}

std::vector<std::string> functions_without_header_call() {
  std::vector<std::string> names = function_names();
  names.erase(std::remove_if(names.begin(), names.end(),
                             [](const auto& name) { return header_calls().count(name) > 0; }),
              names.end());
  return names;
}

}  // namespace contract
