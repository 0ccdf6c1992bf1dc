// Whether a deserializer's outputs are what the interface makes of a parsed message, read through
// the message's own accessors.
//
// The call was given all pointers, over outputs that held their sentinels, and all its allocations
// succeeded. Every member of every record is compared: those that the interface leaves unwritten
// are zeroed by it. Only the arrays that a code gates are counted without being there; only the
// caller's own record of forward_online_message_get_deserialize has members that keep their
// sentinels.
#ifndef TESTS_SUPPORT_AGREEMENT_H
#define TESTS_SUPPORT_AGREEMENT_H

#include <string>

#include "msgspec_frontend.pb.h"
#include "support/outputs.h"

namespace support {

// Empty if they agree; otherwise each output that differs, with both values.
std::string disagreement(const ChannelAuthReplyOutputs& outputs, const ChannelAuthReply& message);
std::string disagreement(const ClientEchoOutputs& outputs, const ClientEcho& message);
std::string disagreement(const CreateChatroomReplyOutputs& outputs,
                         const CreateChatroomReply& message);
std::string disagreement(const ChatReplyOutputs& outputs, const ChatReply& message);
std::string disagreement(const AllowChatReplyOutputs& outputs, const AllowChatReply& message);
std::string disagreement(const GetAllUnreadMessageReplyOutputs& outputs,
                         const GetAllUnreadMessageReply& message);
// With the record that is there from the start, or with none (entry is NULL).
std::string disagreement(const ForwardOnlineMessageOutputs& outputs,
                         const ForwardOnlineMessage& message);
std::string disagreement(const ForwardUnreadMessageOutputs& outputs,
                         const ForwardUnreadMessage& message);
std::string disagreement(const ReadMessageReplyOutputs& outputs, const ReadMessageReply& message);
std::string disagreement(const EndChatReplyOutputs& outputs, const EndChatReply& message);
std::string disagreement(const InviteReplyOutputs& outputs, const InviteReply& message);
std::string disagreement(const CurrentTimeOutputs& outputs, const CurrentTimeReply& message);
std::string disagreement(const UnsealMessageReplyOutputs& outputs,
                         const UnsealMessageReply& message);
std::string disagreement(const SaveCallLogReplyOutputs& outputs, const SaveCallLogReply& message);
std::string disagreement(const TypingUpdatedOutputs& outputs, const TypingUpdated& message);
std::string disagreement(const ChangeChatroomMetaReplyOutputs& outputs,
                         const ChangeChatroomMetaReply& message);

}  // namespace support

#endif
