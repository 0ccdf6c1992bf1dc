#include "adapters.h"

#include <dlfcn.h>

#include <cstdlib>
#include <map>
#include <sstream>
#include <stdexcept>
#include <utility>

namespace contract {
namespace {

void* library() {
  static void* loaded = [] {
    const bool is_linked = dlsym(RTLD_DEFAULT, "client_echo_deserialize") != nullptr;
    const char* named = std::getenv("QEL_LIBRARY");
    void* opened = is_linked ? dlopen(nullptr, RTLD_NOW)
                             : dlopen(named != nullptr ? named : QEL_BUILT_LIBRARY, RTLD_NOW);
    if (opened == nullptr) {
      throw std::runtime_error(dlerror());
    }
    // From its first message on, the runtime keeps objects of its own: before any case has begun.
    if (void* found = dlsym(opened, "_ZN6google8protobuf8internal24InitLogSilencerCountOnceEv")) {
      void (*keep)() = nullptr;
      std::memcpy(&keep, &found, sizeof keep);
      keep();
    }
    return opened;
  }();
  return loaded;
}

void* address(const std::string& function) {
  void* found = dlsym(library(), function.c_str());
  if (found == nullptr) {
    throw std::runtime_error(dlerror());
  }
  return found;
}

// A bool goes as the byte that it is, so that a byte that is neither 0 nor 1 can go too.
template <typename T>
using Passed = std::conditional_t<std::is_same_v<T, bool>, unsigned char, T>;

template <typename T>
Kind kind_of() {
  // clang-format off
  return std::is_same_v<T, int64_t>                             ? Kind::kId
       : std::is_same_v<T, int>                                 ? Kind::kNumber
       : std::is_same_v<T, bool>                                ? Kind::kFlag
       : std::is_same_v<T, const char*>                         ? Kind::kText
       : std::is_same_v<T, const char**>                        ? Kind::kTextPointer
       : std::is_same_v<T, const int*>                          ? Kind::kNumberPointer
       : std::is_same_v<T, const bool*>                         ? Kind::kFlagPointer
       : std::is_same_v<T, const int64_t*>                      ? Kind::kIds
       : std::is_same_v<T, const qel_message_endchatentry_t*>   ? Kind::kChats
       : std::is_same_v<T, const qel_message_inboxentry_t*>     ? Kind::kEntry
       : std::is_same_v<T, const unsigned char*>                ? Kind::kReceived
                                                                : Kind::kOutput;
  // clang-format on
}

// An argument, as it waits for the call.
using Slot = uint64_t;

template <typename T>
Slot slot_of(T argument) {
  Slot slot = 0;
  std::memcpy(&slot, &argument, sizeof argument);
  return slot;
}

template <typename T>
T argument_in(const Slot& slot) {
  T argument;
  std::memcpy(&argument, &slot, sizeof argument);
  return argument;
}

struct Adapter {
  std::vector<Parameter> parameters;
  std::vector<Slot> (*make_arguments)(const std::vector<Parameter>& parameters, Call* call);
  std::optional<int> (*call)(void* function, const Slot* arguments);
};

template <typename... A>
std::vector<Slot> make_arguments(const std::vector<Parameter>& parameters, Call* call) {
  auto parameter = parameters.begin();
  // In braces, so that they are made in order.
  return {slot_of(call->argument<Passed<A>>((parameter++)->name))...};
}

template <typename R, typename... A, size_t... I>
std::optional<int> call_with(void* function, const Slot* arguments, std::index_sequence<I...>) {
  R (*called)(Passed<A>...) = nullptr;
  std::memcpy(&called, &function, sizeof called);
  if constexpr (std::is_void_v<R>) {
    called(argument_in<Passed<A>>(arguments[I])...);
    return std::nullopt;
  } else {
    return called(argument_in<Passed<A>>(arguments[I])...);
  }
}

template <typename R, typename... A>
Adapter adapter(R (* /*declared*/)(A...), const std::string& names) {
  std::istringstream words(names);
  std::vector<Parameter> parameters;
  for (const Kind kind : {kind_of<A>()...}) {
    std::string name;
    words >> name;
    parameters.push_back({name, kind});
  }
  return {parameters, make_arguments<A...>, [](void* function, const Slot* arguments) {
            return call_with<R, A...>(function, arguments, std::index_sequence_for<A...>());
          }};
}

// Nothing of the library is linked with this program: of the functions, only the types are used.
template <typename F>
Adapter adapter(const std::string& names) {
  return adapter(static_cast<F*>(nullptr), names);
}

const std::map<std::string, Adapter>& adapters() {
  static const std::map<std::string, Adapter> all = {
      {"forward_stored_message_reply_serialize",
       adapter<decltype(forward_stored_message_reply_serialize)>(
           "requestId nextPaginationKey maxCount serialized_data size")},
      {"forward_stored_message_deserialize",
       adapter<decltype(forward_stored_message_deserialize)>(
           "data size requestId inboxEntries count nextPaginationKey")},
      {"channel_auth_request_serialize",
       adapter<decltype(channel_auth_request_serialize)>(
           "requestId userId deviceId appId accessToken serialized_data size")},
      {"channel_auth_reply_deserialize", adapter<decltype(channel_auth_reply_deserialize)>(
                                             "data size requestId resultCode resultMsg")},
      {"client_echo_reply_serialize",
       adapter<decltype(client_echo_reply_serialize)>("requestId serialized_data size")},
      {"client_echo_deserialize",
       adapter<decltype(client_echo_deserialize)>("data size requestId")},
      {"create_chatroom_request_serialize",
       adapter<decltype(create_chatroom_request_serialize)>(
           "requestId chatType receivers receiversCount chatroomTitle serialized_data size")},
      {"create_chatroom_reply_deserialize",
       adapter<decltype(create_chatroom_reply_deserialize)>(
           "data size requestId chatroomId msgTtl resultCode resultMsg "
           "invalidReceivers invalidReceiversCount disabledReceivers disabledReceiversCount "
           "didViolationUsers didViolationUsersCount invitationDenied invitationDeniedCount")},
      {"chat_request_serialize",
       adapter<decltype(chat_request_serialize)>(
           "requestId chatroomId msgId msgType chatMsg msgTtl reserved serialized_data size")},
      {"chat_reply_deserialize",
       adapter<decltype(chat_reply_deserialize)>(
           "data size requestId chatroomId resultCode resultMsg count msgIds sentTimes")},
      {"allow_chat_request_serialize",
       adapter<decltype(allow_chat_request_serialize)>(
           "requestId chatroomId isAutoAllow maxCount needDeliveryAck lastDeliveryAckTimestamp "
           "needReadAck lastReadAckTimestamp needOrderedChatroomMemberList needChatroomMeta "
           "serialized_data size")},
      {"allow_chat_reply_deserialize",
       adapter<decltype(allow_chat_reply_deserialize)>(
           "data size requestId chatroomId resultCode resultMsg "
           "deliveryAckEntries deliveryAckCount lastDeliveryAckTimestamp "
           "readAckEntries readAckCount lastReadAckTimestamp members memberCount title msgTtl")},
      {"get_all_unread_message_request_serialize",
       adapter<decltype(get_all_unread_message_request_serialize)>(
           "requestId maxCount serialized_data size")},
      {"get_all_unread_message_reply_deserialize",
       adapter<decltype(get_all_unread_message_reply_deserialize)>(
           "data size requestId resultCode resultMsg")},
      {"forward_online_message_reply_serialize",
       adapter<decltype(forward_online_message_reply_serialize)>(
           "requestId chatroomId markAsRead serialized_data size")},
      {"forward_online_message_get_deserialize",
       adapter<decltype(forward_online_message_get_deserialize)>(
           "data size requestId chatroomId chatType inboxEntry skipReply errorCode errorMsg")},
      {"forward_unread_message_reply_serialize",
       adapter<decltype(forward_unread_message_reply_serialize)>(
           "requestId nextPaginationKey maxCount serialized_data size")},
      {"forward_unread_message_deserialize",
       adapter<decltype(forward_unread_message_deserialize)>(
           "data size requestId inboxEntries count nextPaginationKey")},
      {"read_message_request_serialize",
       adapter<decltype(read_message_request_serialize)>(
           "requestId chatroomId inboxEntry serialized_data size")},
      {"read_message_reply_deserialize",
       adapter<decltype(read_message_reply_deserialize)>(
           "data size requestId chatroomId resultCode resultMsg")},
      {"end_chat_request_serialize", adapter<decltype(end_chat_request_serialize)>(
                                         "requestId entries count serialized_data size")},
      {"end_chat_reply_deserialize",
       adapter<decltype(end_chat_reply_deserialize)>("data size requestId resultCode resultMsg")},
      {"invite_chat_request_serialize",
       adapter<decltype(invite_chat_request_serialize)>(
           "requestId chatroomId invitingMembers invitingMembersCount serialized_data size")},
      {"invite_reply_deserialize",
       adapter<decltype(invite_reply_deserialize)>(
           "data size requestId chatroomId sentTime resultCode resultMsg "
           "invalidReceivers invalidReceiversCount interruptedReceivers interruptedReceiversCount "
           "disabledReceivers disabledReceiversCount existingChatmembers existingChatmembersCount "
           "didViolationUsers didViolationUsersCount invitationDenied invitationDeniedCount")},
      {"current_time_request_serialize",
       adapter<decltype(current_time_request_serialize)>("requestId serialized_data size")},
      {"current_time_deserialize",
       adapter<decltype(current_time_deserialize)>(
           "data size requestId currentTimeMillis resultCode resultMsg")},
      {"unseal_message_request_serialize",
       adapter<decltype(unseal_message_request_serialize)>(
           "requestId chatroomId sender msgId msgDetail serialized_data size")},
      {"unseal_message_reply_deserialize",
       adapter<decltype(unseal_message_reply_deserialize)>(
           "data size requestId chatroomId resultCode resultMsg")},
      {"save_call_log_request_serialize",
       adapter<decltype(save_call_log_request_serialize)>(
           "requestId chatroomId callId callLogType sender receiver conversationSeconds "
           "serialized_data size")},
      {"save_call_log_reply_deserialize", adapter<decltype(save_call_log_reply_deserialize)>(
                                              "data size requestId resultCode resultMsg")},
      {"is_typing_request_serialize",
       adapter<decltype(is_typing_request_serialize)>(
           "requestId chatroomId state contentType refresh serialized_data size")},
      {"typing_updated_deserialize",
       adapter<decltype(typing_updated_deserialize)>(
           "data size requestId chatroomId sender state contentType refresh")},
      {"change_chatroom_meta_request_serialize",
       adapter<decltype(change_chatroom_meta_request_serialize)>(
           "requestId chatroomId title msgTtl serialized_data size")},
      {"change_chatroom_meta_reply_deserialize",
       adapter<decltype(change_chatroom_meta_reply_deserialize)>(
           "data size requestId chatroomId resultCode resultMsg")},
  };
  return all;
}

const Adapter& adapter_of(const std::string& function) {
  const auto found = adapters().find(function);
  if (found == adapters().end()) {
    throw std::runtime_error("no adapter for " + function);
  }
  return found->second;
}

}  // namespace

std::vector<std::string> function_names() {
  std::vector<std::string> names;
  for (const auto& [name, adapter] : adapters()) {
    names.push_back(name);
  }
  return names;
}

const std::vector<Parameter>& parameters_of(const std::string& function) {
  return adapter_of(function).parameters;
}

void load_library() {
  library();
}

Invocation invocation_of(const std::string& function, Call* call) {
  const Adapter& adapter = adapter_of(function);
  void* const found = address(function);
  return [&adapter, found, arguments = adapter.make_arguments(adapter.parameters, call)] {
    return adapter.call(found, arguments.data());
  };
}

}  // namespace contract
