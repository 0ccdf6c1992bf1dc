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

#include "messages.h"
#include "notation.h"
#include "state.h"

namespace testkit {

// What the service says to a message, the reply first.
struct Said {
  Messages messages;
  bool is_again;  // as the message is a request that came before, and has no reply yet
};

// A push without the answer that it needs.
struct Unanswered {
  std::string answer;  // which message it is
  std::string sentence;
};

// What a request changes is changed once the plug-in has got a reply that grants it: one that is
// lost, broken or replaced changes nothing.
class Service {
 public:
  // Of each message, the fields of its pattern have to be there.
  Service(const World& world, std::vector<Pattern> required);

  Said take(const google::protobuf::Message& message);
  // What was wrong with the messages since the last call.
  std::vector<std::string> complaints();

  // Gives a push its requestId.
  void number(google::protobuf::Message* push);
  // The plug-in gets the message now. If it is a push, it has to be answered, unless it is broken.
  void note_delivery(const std::string& name, const std::string& bytes, bool is_intact);
  std::vector<Unanswered> unanswered() const;

  bool is_signed_in() const { return state_.is_signed_in; }

  // In milliseconds from the beginning.
  void set_time(int64_t milliseconds);

 private:
  // A request that the plug-in has no reply to, and what the service says.
  struct Open {
    std::unique_ptr<google::protobuf::Message> request;
    Messages said;
  };

  // What was delivered under a requestId, and is answered.
  struct Pushed {
    std::unique_ptr<google::protobuf::Message> message;
    bool wants_answer = false;
    bool needs_answer = false;  // as it came as it should
    int deliveries = 0;
    int answers = 0;
  };

  void complain_of(const std::vector<std::string>& mistakes);
  bool require(bool holds, const std::string& otherwise);
  Said take_request(const google::protobuf::Message& message);
  Messages take_acknowledgement(const google::protobuf::Message& message);
  Messages turn_page(const ForwardUnreadMessage& page, const ForwardUnreadMessageReply& answer);
  void remember(const ChatRequest& request);

  Messages say(const google::protobuf::Message& request);
  std::unique_ptr<google::protobuf::Message> reply_to(const google::protobuf::Message& request);
  // These complete the reply that all requests get.
  void complete(const ChannelAuthRequest& request, google::protobuf::Message* reply);
  void complete(const CreateChatroomRequest& request, google::protobuf::Message* reply);
  void complete(const AllowChatRequest& request, google::protobuf::Message* reply);
  void complete(const InviteRequest& request, google::protobuf::Message* reply);
  void complete(const ChatRequest& request, google::protobuf::Message* reply);
  std::unique_ptr<google::protobuf::Message> page_from(int first, int most);
  std::unique_ptr<google::protobuf::Message> typing_of_another(const IsTyping& request);

  void note_reply(const google::protobuf::Message& reply);
  void grant(const google::protobuf::Message& request, const google::protobuf::Message& reply);
  void note_push(std::unique_ptr<google::protobuf::Message> message, bool is_intact);

  State state_;
  std::vector<Pattern> required_;
  uint64_t next_push_id_;  // they wrap around
  uint64_t next_chatroom_id_;
  std::map<int64_t, Open> open_;      // by requestId
  std::map<std::string, int> pages_;  // by key: the index of the first message
  std::set<int64_t> read_;            // the stored messages that were acknowledged
  std::map<std::pair<std::string, int64_t>, Pushed> pushed_;  // by type and requestId of the answer
  std::vector<std::string> complaints_;
};

}  // namespace testkit

#endif
