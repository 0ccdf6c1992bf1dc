// The deserializers that do something, in the interface's order: for each, its outputs, the message
// that it reads, and its name. A table of them is made with std::apply.
#ifndef TESTS_SUPPORT_DESERIALIZERS_H
#define TESTS_SUPPORT_DESERIALIZERS_H

#include <tuple>

#include "msgspec_frontend.pb.h"
#include "support/outputs.h"

namespace support {

template <typename OutputsType, typename MessageType>
struct Deserializer {
  using Outputs = OutputsType;
  using Message = MessageType;

  const char* name;
};

inline constexpr std::tuple kDeserializers{
    Deserializer<ChannelAuthReplyOutputs, ChannelAuthReply>{"channel_auth_reply_deserialize"},
    Deserializer<ClientEchoOutputs, ClientEcho>{"client_echo_deserialize"},
    Deserializer<CreateChatroomReplyOutputs, CreateChatroomReply>{
        "create_chatroom_reply_deserialize"},
    Deserializer<ChatReplyOutputs, ChatReply>{"chat_reply_deserialize"},
    Deserializer<AllowChatReplyOutputs, AllowChatReply>{"allow_chat_reply_deserialize"},
    Deserializer<GetAllUnreadMessageReplyOutputs, GetAllUnreadMessageReply>{
        "get_all_unread_message_reply_deserialize"},
    Deserializer<ForwardOnlineMessageOutputs, ForwardOnlineMessage>{
        "forward_online_message_get_deserialize"},
    Deserializer<ForwardUnreadMessageOutputs, ForwardUnreadMessage>{
        "forward_unread_message_deserialize"},
    Deserializer<ReadMessageReplyOutputs, ReadMessageReply>{"read_message_reply_deserialize"},
    Deserializer<EndChatReplyOutputs, EndChatReply>{"end_chat_reply_deserialize"},
    Deserializer<InviteReplyOutputs, InviteReply>{"invite_reply_deserialize"},
    Deserializer<CurrentTimeOutputs, CurrentTimeReply>{"current_time_deserialize"},
    Deserializer<UnsealMessageReplyOutputs, UnsealMessageReply>{"unseal_message_reply_deserialize"},
    Deserializer<SaveCallLogReplyOutputs, SaveCallLogReply>{"save_call_log_reply_deserialize"},
    Deserializer<TypingUpdatedOutputs, TypingUpdated>{"typing_updated_deserialize"},
    Deserializer<ChangeChatroomMetaReplyOutputs, ChangeChatroomMetaReply>{
        "change_chatroom_meta_reply_deserialize"},
};

}  // namespace support

#endif
