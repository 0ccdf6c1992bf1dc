#include "rules.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/stubs/common.h>

#include <algorithm>
#include <functional>
#include <map>

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
    std::map<int64_t, Written> before = state_.written;
    for (const ChatMessageParam& message : request.chatmessageparams()) {
      const Written written{request.chatroomid(), message.chatmsg()};
      const bool has_text = !message.chatmsg().empty() || message.has_securechatmsg();
      require(message.msgid() != 0, "its msgId is 0, which is that of no message");
      require(has_text || message.msgtype() != TEXT, "its text is empty");
      require(message.msgttl() >= 0,
              "its msgTtl " + std::to_string(message.msgttl()) + " is negative");
      new_or_repeated(message.msgid(), written, before);
      before.emplace(message.msgid(), written);
    }
  }

  void operator()(const ReadMessageRequest& request) {
    if (request.has_inboxentry()) {
      const InboxEntry& entry = request.inboxentry();
      const Known* message = known(entry.sender(), entry.msgid(), request.chatroomid());
      require(
          message == nullptr || message->sent_time == 0 || message->sent_time == entry.senttime(),
          "the message " + std::to_string(entry.msgid()) + " has another sentTime");
    }
  }

  void operator()(const UnsealMessageRequest& request) {
    known(request.sender(), request.msgid(), request.chatroomid());
  }

  void operator()(const ChangeChatroomMetaRequest& request) {
    require(request.has_title() || request.has_msgttl() || request.has_profileurl() ||
                request.has_notionoff(),
            "it changes nothing");
    require(request.msgttl() >= 0,
            "its msgTtl " + std::to_string(request.msgttl()) + " is negative");
  }

  void operator()(const EndChatRequest& request) {
    for (const EndChatEntry& entry : request.endchatentries()) {
      require(entry.has_chatroomid(), "an entry has no chatroomId");
      if (entry.has_chatroomid() && !entry.denyinvitation()) {
        chatroom(entry.chatroomid());
      }
    }
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

  // Null if there is none.
  const Known* known(int64_t sender, int64_t message, int64_t chatroom) {
    const auto found = state_.known.find({sender, message});
    if (found == state_.known.end()) {
      require(false, "there is no message " + std::to_string(message) + " of the user " +
                         std::to_string(sender));
      return nullptr;
    }
    const Known& result = found->second;
    require(result.chatroom == 0 || result.chatroom == chatroom,
            "the message " + std::to_string(message) + " is one of the chatroom " +
                std::to_string(result.chatroom));
    return &result;
  }

  // A message may be sent again, as the same: then nobody gets it twice.
  void new_or_repeated(int64_t id, const Written& message,
                       const std::map<int64_t, Written>& before) {
    const auto is_same = [&message](const Written& written) {
      return written.chatroom == message.chatroom && written.text == message.text;
    };
    const auto same_id = before.find(id);
    if (same_id != before.end()) {
      require(is_same(same_id->second),
              "its msgId " + std::to_string(id) + " is that of another message");
      return;
    }
    for (const auto& [other, written] : before) {
      require(!state_.world.hasdistincttexts() || !is_same(written),
              "it has the text of the message " + std::to_string(other) + ", but another msgId");
    }
  }

  const State& state_;
};

using Inside = std::function<void(const Message& message, const std::string& path)>;

// The message, and those inside it.
void for_each_inside(const Message& message, const std::string& path, const Inside& use) {
  use(message, path);
  std::vector<const FieldDescriptor*> fields;
  const auto& values = *message.GetReflection();
  values.ListFields(message, &fields);
  for (const FieldDescriptor* field : fields) {
    const std::string inside = path + field->name() + ".";
    if (field->message_type() != nullptr && field->is_repeated()) {
      for (int i = 0; i < values.FieldSize(message, field); ++i) {
        for_each_inside(values.GetRepeatedMessage(message, field, i), inside, use);
      }
    } else if (field->message_type() != nullptr) {
      for_each_inside(values.GetMessage(message, field), inside, use);
    }
  }
}

bool is_utf8(const std::string& text) {
  return google::protobuf::internal::IsStructurallyValidUTF8(text.data(),
                                                             static_cast<int>(text.size()));
}

// The schema has no lists of texts.
void find_broken_texts(const Message& message, const std::string& path,
                       std::vector<std::string>* found) {
  std::vector<const FieldDescriptor*> fields;
  message.GetReflection()->ListFields(message, &fields);
  for (const FieldDescriptor* field : fields) {
    if (field->type() == FieldDescriptor::TYPE_STRING &&
        !is_utf8(message.GetReflection()->GetString(message, field))) {
      found->push_back(path + field->name() + " is not UTF-8");
    }
  }
}

void find_unknown_fields(const Message& message, const std::string& path,
                         std::vector<std::string>* found) {
  const auto& unknown = message.GetReflection()->GetUnknownFields(message);
  for (int i = 0; i < unknown.field_count(); ++i) {
    const int number = unknown.field(i).number();
    const FieldDescriptor* field = message.GetDescriptor()->FindFieldByNumber(number);
    found->push_back(field == nullptr
                         ? "the schema has no field " + path + std::to_string(number)
                         : path + field->name() + " has a value that the schema does not have");
  }
}

}  // namespace

std::vector<std::string> mistakes_in_form(const Message& message) {
  std::vector<std::string> found;
  for_each_inside(message, "", [&found](const Message& inside, const std::string& path) {
    find_unknown_fields(inside, path, &found);
    find_broken_texts(inside, path, &found);
  });
  return found;
}

std::vector<std::string> mistakes_in(const Message& request, const State& state) {
  Check check(state);
  if (has(request, "chatroomId")) {
    check.chatroom(number_in(request, "chatroomId"));
  }
  visit<ChannelAuthRequest, CreateChatroomRequest, InviteRequest, ChatRequest, ReadMessageRequest,
        UnsealMessageRequest, ChangeChatroomMetaRequest, EndChatRequest>(
      request, [&check](const auto& of_type) { check(of_type); });
  return check.found;
}

}  // namespace testkit
