// Any bytes into any deserializer: it succeeds exactly where the message's class takes all of them,
// hands out what the class reads in them, and otherwise touches no output.

#include <google/protobuf/io/coded_stream.h>

#include <algorithm>

#include "msgspec_frontend.pb.h"
#include "observation.h"
#include "support/agreement.h"
#include "support/outputs.h"
#include "target.h"

namespace fuzz {
namespace {

using google::protobuf::io::CodedInputStream;

// How a function's calls begin and end.
struct Frame {
  std::string function;
  std::vector<LogLine> entry;
  bool has_exit = true;
  bool releases_stream = false;  // after a success
};

Frame entered_with(const std::string& text, const std::string& function) {
  return {function, {{kWarn, function + text}}};
}

// Fails unless these are the lines of a success: the entry first, the exit last, and neither an
// error nor another exit between them.
void check_lines_of_success(const Frame& frame, const std::vector<LogLine>& lines) {
  const LogLine exit = {kWarn, frame.function + ": exit"};
  if (lines.size() < frame.entry.size() ||
      !std::equal(frame.entry.begin(), frame.entry.end(), lines.begin())) {
    fail("another entry line");
  }
  if (frame.has_exit && !(lines.back() == exit)) {
    fail("no exit line after a success");
  }
  const size_t end = lines.size() - (frame.has_exit ? 1 : 0);
  for (size_t i = frame.entry.size(); i < end; ++i) {
    if (lines[i].text.find("error") != std::string::npos || lines[i].text == exit.text) {
      fail("a line that does not belong to a success: " + lines[i].text);
    }
  }
}

void check_lines_of_failure(const Frame& frame, const std::vector<LogLine>& lines, bool parsed,
                            bool consumed) {
  std::vector<LogLine> expected = frame.entry;
  if (!parsed) {
    expected.push_back({kError, "merge error : Could not parse the received data!"});
  }
  if (!consumed) {
    expected.push_back({kError, "ConsumedEntireMessage error :Could not parse the received data"});
  }
  if (!(lines == expected)) {
    fail("other lines than a failure's: " + std::to_string(lines.size()) + " instead of " +
         std::to_string(expected.size()));
  }
}

// Calls the function and compares everything that it did.
template <typename Outputs, typename Message>
void check(const Frame& frame, const std::string& bytes) {
  Outputs outputs;
  Message message;
  CodedInputStream stream(reinterpret_cast<const unsigned char*>(bytes.data()),
                          static_cast<int>(bytes.size()));
  const bool parsed = message.ParseFromCodedStream(&stream);
  const bool consumed = stream.ConsumedEntireMessage();
  const bool succeeds = parsed && consumed;

  const LogWatch log(frame.function);
  StreamWatch watch;
  outputs.read(bytes);
  const bool kept_stream = watch.release();

  if (succeeds) {
    const std::string difference = support::disagreement(outputs, message);
    if (!difference.empty()) {
      fail(difference + "message: " + message.ShortDebugString());
    }
    check_lines_of_success(frame, log.lines());
  } else {
    if (!outputs.untouched()) {
      fail("an output was written although the call failed");
    }
    check_lines_of_failure(frame, log.lines(), parsed, consumed);
  }
  if (kept_stream == (succeeds && frame.releases_stream)) {
    fail(kept_stream ? "the stream was kept" : "the stream was released");
  }
}

// Of a caller that brings no record.
struct OutputsWithoutRecord : support::ForwardOnlineMessageOutputs {
  OutputsWithoutRecord() { entry = nullptr; }
  bool untouched() {
    const bool is_entry_untouched = entry == nullptr;
    entry = &record;
    return is_entry_untouched && ForwardOnlineMessageOutputs::untouched();
  }
};

void check_forward_online_message(const std::string& bytes) {
  Frame frame = entered_with(": start", "forward_online_message_get_deserialize");
  frame.entry.insert(frame.entry.begin(), {kError, "check "});
  check<support::ForwardOnlineMessageOutputs, ForwardOnlineMessage>(frame, bytes);
  check<OutputsWithoutRecord, ForwardOnlineMessage>(frame, bytes);
}

}  // namespace

const std::vector<Target>& deserializer_targets() {
  static const std::vector<Target> targets = {
      {"channel_auth_reply_deserialize",
       [](const std::string& bytes) {
         Frame frame = entered_with(" start", "channel_auth_reply_deserialize");
         frame.has_exit = false;
         frame.releases_stream = true;
         check<support::ChannelAuthReplyOutputs, ChannelAuthReply>(frame, bytes);
       }},
      {"client_echo_deserialize",
       [](const std::string& bytes) {
         Frame frame = entered_with(" start", "client_echo_deserialize");
         frame.releases_stream = true;
         check<support::ClientEchoOutputs, ClientEcho>(frame, bytes);
       }},
      {"create_chatroom_reply_deserialize",
       [](const std::string& bytes) {
         check<support::CreateChatroomReplyOutputs, CreateChatroomReply>(
             entered_with(": enter", "create_chatroom_reply_deserialize"), bytes);
       }},
      {"chat_reply_deserialize",
       [](const std::string& bytes) {
         check<support::ChatReplyOutputs, ChatReply>(
             entered_with(": start", "chat_reply_deserialize"), bytes);
       }},
      {"allow_chat_reply_deserialize",
       [](const std::string& bytes) {
         check<support::AllowChatReplyOutputs, AllowChatReply>(
             entered_with(": start", "allow_chat_reply_deserialize"), bytes);
       }},
      {"get_all_unread_message_reply_deserialize",
       [](const std::string& bytes) {
         check<support::GetAllUnreadMessageReplyOutputs, GetAllUnreadMessageReply>(
             entered_with(": start", "get_all_unread_message_reply_deserialize"), bytes);
       }},
      {"forward_online_message_get_deserialize", check_forward_online_message},
      {"forward_unread_message_deserialize",
       [](const std::string& bytes) {
         check<support::ForwardUnreadMessageOutputs, ForwardUnreadMessage>(
             entered_with(": start", "forward_unread_message_deserialize"), bytes);
       }},
      {"read_message_reply_deserialize",
       [](const std::string& bytes) {
         check<support::ReadMessageReplyOutputs, ReadMessageReply>(
             entered_with(": start", "read_message_reply_deserialize"), bytes);
       }},
      {"end_chat_reply_deserialize",
       [](const std::string& bytes) {
         check<support::EndChatReplyOutputs, EndChatReply>(
             entered_with(": start", "end_chat_reply_deserialize"), bytes);
       }},
      {"invite_reply_deserialize",
       [](const std::string& bytes) {
         check<support::InviteReplyOutputs, InviteReply>(
             entered_with(": start", "invite_reply_deserialize"), bytes);
       }},
      {"current_time_deserialize",
       [](const std::string& bytes) {
         check<support::CurrentTimeOutputs, CurrentTimeReply>(
             entered_with(": start", "current_time_deserialize"), bytes);
       }},
      {"unseal_message_reply_deserialize",
       [](const std::string& bytes) {
         check<support::UnsealMessageReplyOutputs, UnsealMessageReply>(
             entered_with(": start", "unseal_message_reply_deserialize"), bytes);
       }},
      {"save_call_log_reply_deserialize",
       [](const std::string& bytes) {
         check<support::SaveCallLogReplyOutputs, SaveCallLogReply>(
             entered_with(": start", "save_call_log_reply_deserialize"), bytes);
       }},
      {"typing_updated_deserialize",
       [](const std::string& bytes) {
         check<support::TypingUpdatedOutputs, TypingUpdated>(
             entered_with(": start", "typing_updated_deserialize"), bytes);
       }},
      {"change_chatroom_meta_reply_deserialize",
       [](const std::string& bytes) {
         check<support::ChangeChatroomMetaReplyOutputs, ChangeChatroomMetaReply>(
             entered_with(": start", "change_chatroom_meta_reply_deserialize"), bytes);
       }},
  };
  return targets;
}

}  // namespace fuzz
