#include "service.h"

#include <google/protobuf/descriptor.h>

#include <algorithm>

#include "messages.h"

namespace testkit {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;

enum ResultCode { kOk = 0, kSomeRefused = 1001, kBadToken = 2001, kSomeNotInvited = 3003 };

bool has(const Message& message, const char* name) {
  const FieldDescriptor* field = message.GetDescriptor()->FindFieldByName(name);
  return field != nullptr && message.GetReflection()->HasField(message, field);
}

int64_t number_in(const Message& message, const char* name) {
  const FieldDescriptor* field = message.GetDescriptor()->FindFieldByName(name);
  return field == nullptr ? 0 : message.GetReflection()->GetInt64(message, field);
}

// If the message has such a field.
void set_number(Message* message, const char* name, int64_t number) {
  const FieldDescriptor* field = message->GetDescriptor()->FindFieldByName(name);
  if (field != nullptr) {
    message->GetReflection()->SetInt64(message, field, number);
  }
}

void set_result(Message* reply, ResultCode code, const char* text) {
  const FieldDescriptor* field = reply->GetDescriptor()->FindFieldByName("result");
  if (field != nullptr) {
    auto* result = static_cast<Result*>(reply->GetReflection()->MutableMessage(reply, field));
    result->set_code(code);
    result->set_msg(text);
  }
}

// Also in the messages inside it.
bool has_unknown_fields(const Message& message) {
  const std::unique_ptr<Message> known(message.New());
  known->CopyFrom(message);
  known->DiscardUnknownFields();
  return known->ByteSize() != message.ByteSize();
}

void refuse(const User* user, int64_t id, int64_t inviting, WrongReceiverDetail* detail) {
  if (user == nullptr) {
    detail->add_invalidreceivers(id);
    return;
  }
  switch (user->refused()) {
    case DISABLED:
      detail->add_disabledreceivers(id);
      break;
    case INTERRUPTED:
      detail->add_interruptedreceivers(id);
      break;
    case INVITATION_DENIED:
      detail->add_invitationdenied(id);
      break;
    case DID_VIOLATION:
      DIDViolationUser* pair = detail->add_didviolationusers();
      pair->set_usera(inviting);
      pair->set_userb(id);
      break;
  }
}

void add_member(const User& user, AllowChatReply* chatroom) {
  ChatroomMemberStatus* member = chatroom->add_orderedchatroommemberlist();
  member->set_userid(user.userid());
  member->set_available(user.available());
  member->set_name(user.name());
  member->set_isaccepted(true);
}

bool is_member(const AllowChatReply& chatroom, int64_t id) {
  const auto& members = chatroom.orderedchatroommemberlist();
  return std::any_of(members.begin(), members.end(),
                     [id](const ChatroomMemberStatus& member) { return member.userid() == id; });
}

}  // namespace

Service::Service(const World& world)
    : world_(world),
      now_(world.clockmillis()),
      is_signed_in_(world.issignedin()),
      next_push_id_(world.firstpushid()),
      next_chatroom_id_(world.firstchatroomid()) {}

std::vector<std::string> Service::complaints() {
  return std::exchange(complaints_, {});
}

bool Service::require(bool holds, const std::string& otherwise) {
  if (!holds) {
    complaints_.push_back(otherwise);
  }
  return holds;
}

// ---- Every message

Messages Service::take(const Message& message) {
  require(!has_unknown_fields(message), "it has fields or values that the schema does not have");
  if (const auto* auth = dynamic_cast<const ChannelAuthRequest*>(&message)) {
    return authenticate(*auth);
  }
  if (!require(is_signed_in_, "it comes before the authentication")) {
    return {};
  }
  require(!has(message, "userId") && !has(message, "deviceId"),
          "it has ids of the sender, which the connection has already");
  if (is_reply(*message.GetDescriptor())) {
    return take_acknowledgement(message);
  }
  if (!is_request(message)) {
    return {};
  }
  if (const auto* typing = dynamic_cast<const IsTyping*>(&message)) {
    Messages pushes;
    pushes.push_back(typing_of_another(*typing));
    return pushes;
  }
  Messages said;
  said.push_back(reply_to(message));
  if (const auto* unread = dynamic_cast<const GetAllUnreadMessageRequest*>(&message)) {
    said.push_back(page_from(0, unread->maxcount()));
  }
  return said;
}

// Complains of a requestId or a chatroom, but only a message that nobody answers is no request.
bool Service::is_request(const Message& message) {
  const Descriptor& type = *message.GetDescriptor();
  if (!require(reply_type(type) != nullptr || type.name() == IsTyping::descriptor()->name(),
               "a plug-in does not send it")) {
    return false;
  }
  if (require(has(message, "requestId"), "it has no requestId")) {
    const int64_t id = number_in(message, "requestId");
    require(id > last_request_id_, "its requestId " + std::to_string(id) +
                                       " is not above the one before, which was " +
                                       std::to_string(last_request_id_));
    last_request_id_ = id;
  }
  if (has(message, "chatroomId")) {
    const int64_t id = number_in(message, "chatroomId");
    require(chatroom_with(id) != nullptr,
            "there is no chatroom " + std::to_string(id) + ", or the user has left it");
  }
  return true;
}

Messages Service::authenticate(const ChannelAuthRequest& request) {
  require(!is_signed_in_, "the connection is authenticated already");
  is_request(request);
  is_signed_in_ = require(request.accesstoken() == world_.accesstoken(),
                          "it has another access token than the service");

  Messages said;
  said.push_back(reply_to(request));
  if (is_signed_in_) {
    set_result(said.front().get(), kOk, "welcome");
  } else {
    set_result(said.front().get(), kBadToken, "access token refused");
  }
  return said;
}

Messages Service::take_acknowledgement(const Message& message) {
  const int64_t id = number_in(message, "requestId");
  const Descriptor& type = *message.GetDescriptor();
  const auto found = pushes_.find({type.name(), id});
  const bool is_of_broken = std::any_of(broken_.begin(), broken_.end(), [&type](const auto& name) {
    return reply_type(*message_type(name)) == &type;
  });
  if (found == pushes_.end() && is_of_broken) {
    return {};
  }
  if (!require(found != pushes_.end(), "it answers nothing: no such message with the requestId " +
                                           std::to_string(id) + " was sent")) {
    return {};
  }
  Push& push = found->second;
  const bool is_first = !push.is_answered;
  push.is_answered = true;

  Messages said;
  const auto* page = dynamic_cast<const ForwardUnreadMessageReply*>(&message);
  if (page != nullptr && page->has_nextpaginationkey() &&
      require(page->nextpaginationkey() == push.key,
              "its nextPaginationKey is not that of the page") &&
      is_first && pages_.count(push.key) > 0) {
    said.push_back(page_from(pages_[push.key], page->maxcount()));
  }
  return said;
}

// A success. The messages that say more have functions of their own.
std::unique_ptr<Message> Service::reply_to(const Message& request) {
  std::unique_ptr<Message> reply = new_message(*reply_type(*request.GetDescriptor()));
  set_number(reply.get(), "requestId", number_in(request, "requestId"));
  if (has(request, "chatroomId")) {
    set_number(reply.get(), "chatroomId", number_in(request, "chatroomId"));
  }
  set_result(reply.get(), kOk, "ok");
  for (const char* time :
       {"currentTimeMillis", "createTimeMillis", "changeTimeMillis", "sentTime"}) {
    set_number(reply.get(), time, now_);
  }
  completed(request, reply.get(), &Service::create_chatroom) ||
      completed(request, reply.get(), &Service::describe_chatroom) ||
      completed(request, reply.get(), &Service::change_chatroom) ||
      completed(request, reply.get(), &Service::invite) ||
      completed(request, reply.get(), &Service::end_chats) ||
      completed(request, reply.get(), &Service::record);
  return reply;
}

template <typename Request, typename Reply>
bool Service::completed(const Message& request, Message* reply,
                        void (Service::*complete)(const Request&, Reply*)) {
  const auto* wanted = dynamic_cast<const Request*>(&request);
  if (wanted != nullptr) {
    (this->*complete)(*wanted, static_cast<Reply*>(reply));
  }
  return wanted != nullptr;
}

// ---- Pushes

void Service::number(Message* push) {
  set_number(push, "requestId", next_push_id_++);
}

void Service::note_delivery(const Message& message) {
  const Descriptor& type = *message.GetDescriptor();
  const Descriptor* answer = is_reply(type) ? nullptr : reply_type(type);
  const auto* online = dynamic_cast<const ForwardOnlineMessage*>(&message);
  if (answer == nullptr || (online != nullptr && online->skipreply())) {
    return;
  }
  Push& push = pushes_[{answer->name(), number_in(message, "requestId")}];
  push.type = type.name();
  if (const auto* page = dynamic_cast<const ForwardUnreadMessage*>(&message)) {
    push.key = page->nextpaginationkey();
  }
}

std::vector<std::string> Service::unanswered() const {
  std::vector<std::string> result;
  for (const auto& [answer, push] : pushes_) {
    if (!push.is_answered) {
      result.push_back("The " + push.type + " with the requestId " + std::to_string(answer.second) +
                       " was not answered by a " + answer.first + ".");
    }
  }
  return result;
}

std::unique_ptr<Message> Service::typing_of_another(const IsTyping& request) {
  auto push = std::make_unique<TypingUpdated>();
  number(push.get());
  push->set_chatroomid(request.chatroomid());
  const AllowChatReply* chatroom = chatroom_with(request.chatroomid());
  if (chatroom != nullptr) {
    for (const ChatroomMemberStatus& member : chatroom->orderedchatroommemberlist()) {
      if (member.userid() != world_.userid()) {
        push->set_sender(member.userid());
        break;
      }
    }
  }
  push->set_state(request.state());
  push->set_contenttype(request.contenttype());
  push->set_refresh(request.refresh());
  return push;
}

std::unique_ptr<Message> Service::page_from(size_t first, int most) {
  auto page = std::make_unique<ForwardUnreadMessage>();
  number(page.get());
  const auto count = static_cast<size_t>(world_.stored_size());
  const size_t end = most > 0 ? std::min(count, first + static_cast<size_t>(most)) : count;
  for (size_t i = first; i < end; ++i) {
    page->add_inboxentries()->CopyFrom(world_.stored(static_cast<int>(i)));
  }
  if (end < count || world_.hasendlesspages()) {
    const std::string key = "page " + std::to_string(pages_.size() + 2);
    pages_[key] = end < count ? end : 0;
    page->set_nextpaginationkey(key);
  }
  return page;
}

// ---- Chatrooms

const User* Service::user_with(int64_t id) const {
  for (const User& user : world_.users()) {
    if (user.userid() == id) {
      return &user;
    }
  }
  return nullptr;
}

AllowChatReply* Service::chatroom_with(int64_t id) {
  for (AllowChatReply& chatroom : *world_.mutable_chatrooms()) {
    if (chatroom.chatroomid() == id) {
      return &chatroom;
    }
  }
  return nullptr;
}

// Makes the users members. If some are refused, the result says so, and why.
template <typename Users>
void Service::bring(const Users& users, AllowChatReply* chatroom, Result* result, int code,
                    const char* text) {
  WrongReceiverDetail detail;
  for (const int64_t id : users) {
    const User* user = user_with(id);
    if (is_member(*chatroom, id)) {
      detail.add_existing(id);
    } else if (user == nullptr || user->has_refused()) {
      refuse(user, id, world_.userid(), &detail);
    } else {
      add_member(*user, chatroom);
    }
  }
  if (detail.ByteSize() > 0) {
    result->set_code(code);
    result->set_msg(text);
    result->mutable_wrongreceiverdetail()->CopyFrom(detail);
  }
}

void Service::create_chatroom(const CreateChatroomRequest& request, CreateChatroomReply* reply) {
  const int64_t id = next_chatroom_id_++;
  AllowChatReply* chatroom = chatroom_with(id);
  if (chatroom == nullptr) {
    chatroom = world_.add_chatrooms();
    chatroom->set_chatroomid(id);
  }
  chatroom->set_owneruserid(world_.userid());
  chatroom->set_title(request.chatroomtitle());
  chatroom->set_msgttl(world_.msgttl());
  chatroom->clear_orderedchatroommemberlist();
  if (const User* user = user_with(world_.userid())) {
    add_member(*user, chatroom);
  }
  bring(request.receivers(), chatroom, reply->mutable_result(), kSomeRefused,
        "some receivers were refused");
  reply->set_chatroomid(id);
  reply->set_owneruserid(chatroom->owneruserid());
  reply->set_msgttl(chatroom->msgttl());
}

void Service::describe_chatroom(const AllowChatRequest& request, AllowChatReply* reply) {
  const AllowChatReply* chatroom = chatroom_with(request.chatroomid());
  if (chatroom == nullptr) {
    return;
  }
  reply->MergeFrom(*chatroom);
  if (!request.needorderedchatroommemberlist()) {
    reply->clear_orderedchatroommemberlist();
  }
  if (!request.needdeliveryack()) {
    reply->clear_deliveryackentries();
  }
  if (!request.needreadack()) {
    reply->clear_readackentries();
  }
  if (!request.needchatroommeta()) {
    reply->clear_title();
  }
}

void Service::change_chatroom(const ChangeChatroomMetaRequest& request,
                              ChangeChatroomMetaReply* /*reply*/) {
  require(request.has_title() != request.has_msgttl(),
          "it should change the title or the lifetime, one of them");
  AllowChatReply* chatroom = chatroom_with(request.chatroomid());
  if (chatroom != nullptr && request.has_title()) {
    chatroom->set_title(request.title());
  }
  if (chatroom != nullptr && request.has_msgttl()) {
    chatroom->set_msgttl(request.msgttl());
  }
}

void Service::invite(const InviteRequest& request, InviteReply* reply) {
  if (AllowChatReply* chatroom = chatroom_with(request.chatroomid())) {
    bring(request.invitingmembers(), chatroom, reply->mutable_result(), kSomeNotInvited,
          "some members were not invited");
  }
}

void Service::end_chats(const EndChatRequest& request, EndChatReply* /*reply*/) {
  for (const EndChatEntry& entry : request.endchatentries()) {
    auto& chatrooms = *world_.mutable_chatrooms();
    for (int i = chatrooms.size() - 1; i >= 0; --i) {
      if (chatrooms.Get(i).chatroomid() == entry.chatroomid()) {
        chatrooms.SwapElements(i, chatrooms.size() - 1);
        chatrooms.RemoveLast();
      }
    }
  }
}

void Service::record(const ChatRequest& request, ChatReply* reply) {
  for (const ChatMessageParam& param : request.chatmessageparams()) {
    ProcessedMessageEntry* entry = reply->add_processedmessageentries();
    entry->set_msgid(param.msgid());
    entry->set_senttime(now_);
  }
}

}  // namespace testkit
