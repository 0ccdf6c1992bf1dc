#include "rules.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/stubs/common.h>

#include <algorithm>

#include "messages.h"

namespace testkit {
namespace {

using google::protobuf::FieldDescriptor;
using google::protobuf::Message;

class Check {
 public:
  explicit Check(const State& state) : state_(state) {}

  void operator()(const ChannelAuthRequest& request) {
    if (state_.is_signed_in) {
      found.emplace_back("the connection is authenticated already");
      return;
    }
    require(request.accesstoken() == state_.world.accesstoken(),
            "it has another access token than the service");
    require(request.userid() == state_.world.userid(),
            "its userId is " + std::to_string(request.userid()) + ", but the service's user is " +
                std::to_string(state_.world.userid()));
    require(!request.appid().empty(), "its appId is empty");
  }

  void operator()(const CreateChatroomRequest& request) { users(request.receivers()); }

  void operator()(const InviteRequest& request) { users(request.invitingmembers()); }

  void operator()(const ChatRequest& request) {
    for (const ChatMessageParam& message : request.chatmessageparams()) {
      require(message.msgid() != 0, "its msgId is 0, which is that of no message");
      require(!message.chatmsg().empty() || message.msgtype() != TEXT, "its text is empty");
      require(message.msgttl() >= 0, "its msgTtl is negative");
      new_or_repeated(request.chatroomid(), message);
    }
  }

  void operator()(const ReadMessageRequest& request) {
    known(request.inboxentry().sender(), request.inboxentry().msgid());
  }

  void operator()(const UnsealMessageRequest& request) { known(request.sender(), request.msgid()); }

  void operator()(const ChangeChatroomMetaRequest& request) {
    require(request.has_title() != request.has_msgttl(),
            "it should change the title or the lifetime, one of them");
    require(request.msgttl() >= 0, "its msgTtl is negative");
  }

  void operator()(const EndChatRequest& request) {
    for (const EndChatEntry& entry : request.endchatentries()) {
      require(entry.has_chatroomid(), "an entry has no chatroomId");
      if (entry.has_chatroomid() && !entry.denyinvitation()) {
        chatroom(entry.chatroomid());
      }
    }
  }

  void operator()(const SaveCallLogRequest& request) {
    const int64_t user = state_.world.userid();
    require((request.sender() == user) != (request.receiver() == user),
            "the user has to be the call's sender or its receiver");
  }

  void chatroom(int64_t id) {
    require(state_.chatroom_with(id) != nullptr,
            "there is no chatroom " + std::to_string(id) + ", or the user has left it");
  }

  std::vector<std::string> found;

 private:
  void require(bool holds, const std::string& otherwise) {
    if (!holds) {
      found.push_back(otherwise);
    }
  }

  void users(const google::protobuf::RepeatedField<google::protobuf::int64>& ids) {
    require(std::find(ids.begin(), ids.end(), 0) == ids.end(),
            "it has the user 0, which is the id of nobody");
  }

  void known(int64_t sender, int64_t message) {
    require(state_.known.count({sender, message}) > 0,
            "there is no message " + std::to_string(message) + " of the user " +
                std::to_string(sender));
  }

  // A message that waits for its answer may be sent again, as the same: then nobody gets it twice.
  void new_or_repeated(int64_t room, const ChatMessageParam& message) {
    constexpr int64_t kPatience = 1000;  // milliseconds: until then, it is another message
    const auto same_id = state_.written.find(message.msgid());
    const auto is_same = [room, &message](const Written& written) {
      return written.chatroom == room && written.text == message.chatmsg();
    };
    if (same_id != state_.written.end()) {
      require(is_same(same_id->second),
              "its msgId " + std::to_string(message.msgid()) + " is that of another message");
      return;
    }
    for (const auto& [id, written] : state_.written) {
      require(!is_same(written) || written.is_answered || state_.now - written.since < kPatience,
              "it has the text of the message " + std::to_string(id) +
                  ", which is not answered yet, but another msgId");
    }
  }

  const State& state_;
};

void find_broken_texts(const Message& message, const std::string& path,
                       std::vector<std::string>* found) {
  std::vector<const FieldDescriptor*> fields;
  const auto& values = *message.GetReflection();
  values.ListFields(message, &fields);
  for (const FieldDescriptor* field : fields) {
    const std::string name = path + field->name();
    const int count = field->is_repeated() ? values.FieldSize(message, field) : 1;
    for (int i = 0; i < count; ++i) {
      if (field->message_type() != nullptr) {
        find_broken_texts(field->is_repeated() ? values.GetRepeatedMessage(message, field, i)
                                               : values.GetMessage(message, field),
                          name + ".", found);
      } else if (field->type() == FieldDescriptor::TYPE_STRING) {
        const std::string text = field->is_repeated() ? values.GetRepeatedString(message, field, i)
                                                      : values.GetString(message, field);
        if (!google::protobuf::internal::IsStructurallyValidUTF8(text.data(),
                                                                 static_cast<int>(text.size()))) {
          found->push_back(name);
        }
      }
    }
  }
}

}  // namespace

std::vector<std::string> mistakes_in(const Message& request, const State& state) {
  Check check(state);
  const FieldDescriptor* chatroom = request.GetDescriptor()->FindFieldByName("chatroomId");
  if (chatroom != nullptr && request.GetReflection()->HasField(request, chatroom)) {
    check.chatroom(request.GetReflection()->GetInt64(request, chatroom));
  }
  visit<ChannelAuthRequest, CreateChatroomRequest, InviteRequest, ChatRequest, ReadMessageRequest,
        UnsealMessageRequest, ChangeChatroomMetaRequest, EndChatRequest, SaveCallLogRequest>(
      request, [&check](const auto& of_type) { check(of_type); });
  return check.found;
}

std::vector<std::string> broken_texts(const Message& message) {
  std::vector<std::string> found;
  find_broken_texts(message, "", &found);
  return found;
}

}  // namespace testkit
