// A small chat service: what it says to a plug-in, and what is wrong with what the plug-in says.
#ifndef TESTKIT_SERVICE_H
#define TESTKIT_SERVICE_H

#include <google/protobuf/message.h>

#include <cstdint>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "msgspec_frontend.pb.h"
#include "world.pb.h"

namespace testkit {

using Messages = std::vector<std::unique_ptr<google::protobuf::Message>>;

class Service {
 public:
  explicit Service(const World& world);

  // What the service says to the plug-in's message, the reply first.
  Messages take(const google::protobuf::Message& message);
  // What was wrong with the messages since the last call.
  std::vector<std::string> complaints();

  // Gives a push its requestId.
  void number(google::protobuf::Message* push);
  // The plug-in gets the message now. If it is a push, it has to be answered.
  void note_delivery(const google::protobuf::Message& message);
  // The plug-in gets broken bytes as a message of that name, whose answer may be any.
  void note_broken_delivery(const std::string& name) { broken_.insert(name); }
  // The pushes that were not answered.
  std::vector<std::string> unanswered() const;

  // Time passes.
  void set_time(int64_t milliseconds) { now_ = world_.clockmillis() + milliseconds; }

 private:
  bool require(bool holds, const std::string& otherwise);
  bool is_request(const google::protobuf::Message& message);
  Messages authenticate(const ChannelAuthRequest& request);
  Messages take_acknowledgement(const google::protobuf::Message& message);
  std::unique_ptr<google::protobuf::Message> reply_to(const google::protobuf::Message& request);

  // These change what the service knows, and complete the reply that all requests get.
  void create_chatroom(const CreateChatroomRequest& request, CreateChatroomReply* reply);
  void describe_chatroom(const AllowChatRequest& request, AllowChatReply* reply);
  void change_chatroom(const ChangeChatroomMetaRequest& request, ChangeChatroomMetaReply* reply);
  void invite(const InviteRequest& request, InviteReply* reply);
  void end_chats(const EndChatRequest& request, EndChatReply* reply);
  void record(const ChatRequest& request, ChatReply* reply);
  // Whether the request and its reply are the function's, which has completed the reply.
  template <typename Request, typename Reply>
  bool completed(const google::protobuf::Message& request, google::protobuf::Message* reply,
                 void (Service::*complete)(const Request&, Reply*));

  const User* user_with(int64_t id) const;
  AllowChatReply* chatroom_with(int64_t id);
  template <typename Users>
  void bring(const Users& users, AllowChatReply* chatroom, Result* result, int code,
             const char* text);
  std::unique_ptr<google::protobuf::Message> page_from(size_t first, int most);
  std::unique_ptr<google::protobuf::Message> typing_of_another(const IsTyping& request);

  World world_;
  int64_t now_;
  bool is_signed_in_;
  int64_t last_request_id_ = 0;  // the plug-in's
  int64_t next_push_id_;
  int64_t next_chatroom_id_;
  std::map<std::string, size_t> pages_;  // by key: the index of the first message
  // The pushes that were delivered: by type and requestId of their answers.
  struct Push {
    std::string type;
    std::string key;  // of the next page, or empty
    bool is_answered = false;
  };
  std::map<std::pair<std::string, int64_t>, Push> pushes_;
  std::set<std::string> broken_;
  std::vector<std::string> complaints_;
};

}  // namespace testkit

#endif
