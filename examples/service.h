// The service's side of one connection: checks every message that the plug-in sends, answers it
// with the schema's generated classes, and prints both directions of the conversation.
#ifndef EXAMPLES_SERVICE_H
#define EXAMPLES_SERVICE_H

#include <google/protobuf/message.h>

#include <cstdint>
#include <memory>
#include <set>
#include <stdexcept>
#include <string>

#include "msgspec_frontend.pb.h"

// The plug-in sent something that it must not send, or the connection failed.
struct WrongExchange : std::runtime_error {
  using std::runtime_error::runtime_error;
};

void require(bool holds, const std::string& what);

class Service {
 public:
  explicit Service(int connection) : connection_(connection) {}

  // Serves the plug-in until it closes the connection. Throws WrongExchange.
  void run();

 private:
  // The next message, or nullptr at the end of the conversation.
  std::unique_ptr<google::protobuf::Message> receive();
  // The next message, which must be of that type.
  template <typename Message>
  Message expect(const std::string& otherwise);
  void send(const google::protobuf::Message& message);

  void answer(const google::protobuf::Message& request);
  // Lets the function answer the message if it is a request of the function's type.
  template <typename Request>
  bool answered(const google::protobuf::Message& message, void (Service::*answer)(const Request&));
  template <typename Request>
  void take_request_id(const Request& request);

  void authenticate(const ChannelAuthRequest& request);
  void tell_time(const CurrentTimeRequest& request);
  void create_chatroom(const CreateChatroomRequest& request);
  void describe_chatroom(const AllowChatRequest& request);
  void record(const ChatRequest& request);
  void note_read(const ReadMessageRequest& request);
  void send_unread(const GetAllUnreadMessageRequest& request);
  void unseal(const UnsealMessageRequest& request);
  void pass_typing_on(const IsTyping& request);
  void log_call(const SaveCallLogRequest& request);
  void change_chatroom(const ChangeChatroomMetaRequest& request);
  void invite(const InviteRequest& request);
  void end_chats(const EndChatRequest& request);

  void probe();
  // Sends a message that the user's chat partner has written.
  void push_message(int64_t id, const std::string& text, bool skip_reply);
  void push_page(ForwardUnreadMessage page);

  int connection_;
  bool authenticated_ = false;
  std::set<std::string> answered_;  // requests, by name
  int chat_messages_ = 0;
  int64_t last_request_id_ = 0;    // the plug-in's
  int64_t last_push_id_ = 700000;  // ours
};

#endif
