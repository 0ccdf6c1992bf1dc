#include "service.h"

#include <google/protobuf/descriptor.h>

#include <algorithm>
#include <limits>
#include <utility>

#include "qel-message.h"
#include "rules.h"

namespace testkit {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;

enum ResultCode {
  kOk = 0,
  kBadToken = 2001,
  kSomeRefused = QEL_RESULT_REFUSED_1001,
  kSomeNotInvited = QEL_RESULT_REFUSED_3003
};

void set_result(Message* reply, ResultCode code, const char* text) {
  const FieldDescriptor* field = reply->GetDescriptor()->FindFieldByName("result");
  if (field != nullptr) {
    auto* result = static_cast<Result*>(reply->GetReflection()->MutableMessage(reply, field));
    result->set_code(code);
    result->set_msg(text);
  }
}

// Those that refuse some of its users grant the rest.
bool grants(int code) {
  switch (code) {
    case kOk:
    case QEL_RESULT_REFUSED_1000:
    case QEL_RESULT_REFUSED_1001:
    case QEL_RESULT_REFUSED_3003:
    case QEL_RESULT_REFUSED_3009:
      return true;
    default:
      return false;
  }
}

// Also if it has no result.
bool grants(const Message& reply) {
  const FieldDescriptor* field = reply.GetDescriptor()->FindFieldByName("result");
  return field == nullptr ||
         grants(static_cast<const Result&>(reply.GetReflection()->GetMessage(reply, field)).code());
}

void set_refused(const WrongReceiverDetail& refused, ResultCode code, const char* text,
                 Result* result) {
  if (refused.ByteSize() > 0) {
    result->set_code(code);
    result->set_msg(text);
    result->mutable_wrongreceiverdetail()->CopyFrom(refused);
  }
}

}  // namespace

Service::Service(const World& world, std::vector<Pattern> required)
    : state_(world),
      required_(std::move(required)),
      next_push_id_(static_cast<uint64_t>(world.firstpushid())),
      next_chatroom_id_(static_cast<uint64_t>(world.firstchatroomid())) {}

std::vector<std::string> Service::complaints() {
  return std::exchange(complaints_, {});
}

void Service::complain_of(const std::vector<std::string>& mistakes) {
  complaints_.insert(complaints_.end(), mistakes.begin(), mistakes.end());
}

bool Service::require(bool holds, const std::string& otherwise) {
  if (!holds) {
    complaints_.push_back(otherwise);
  }
  return holds;
}

void Service::set_time(int64_t milliseconds) {
  const int64_t begin = state_.world.clockmillis();
  state_.now = begin + std::min(milliseconds,
                                std::numeric_limits<int64_t>::max() - std::max<int64_t>(begin, 0));
}

// ---- What the plug-in sends

Said Service::take(const Message& message) {
  complain_of(mistakes_in_form(message));
  if (!require(is_from_plugin(*message.GetDescriptor()), "a plug-in does not send it") ||
      !require(state_.is_signed_in || message.GetDescriptor() == ChannelAuthRequest::descriptor(),
               "it comes before the login was granted")) {
    return {};
  }
  for (const Pattern& pattern : required_) {
    if (&pattern.type() == message.GetDescriptor()) {
      complain_of(differences(pattern, message, {}));
    }
  }
  if (is_reply(*message.GetDescriptor())) {
    return {take_acknowledgement(message), false};
  }
  return take_request(message);
}

// One that is sent again as it was is the same request.
Said Service::take_request(const Message& message) {
  const int64_t id = number_in(message, "requestId");
  const auto open = open_.find(id);
  if (open != open_.end() && open->second.request->GetDescriptor() == message.GetDescriptor() &&
      open->second.request->SerializeAsString() == message.SerializeAsString()) {
    return {copies_of(open->second.said), true};
  }
  require(id != 0, "it has no requestId, or 0");
  require(id == 0 || open == open_.end(),
          "its requestId " + std::to_string(id) +
              " is that of another request, which has no reply yet");
  complain_of(mistakes_in(message, state_));
  Messages said = say(message);
  if (const auto* chat = dynamic_cast<const ChatRequest*>(&message)) {
    remember(*chat);
  }
  if (reply_type(*message.GetDescriptor()) != nullptr) {
    open_[id] = {copy_of(message), copies_of(said)};
  }
  return {std::move(said), false};
}

void Service::remember(const ChatRequest& request) {
  for (const ChatMessageParam& message : request.chatmessageparams()) {
    state_.written.emplace(message.msgid(), Written{request.chatroomid(), message.chatmsg()});
    state_.known[{state_.world.userid(), message.msgid()}] = {request.chatroomid(), 0};
  }
}

Messages Service::take_acknowledgement(const Message& message) {
  const int64_t id = number_in(message, "requestId");
  const auto found = pushed_.find({message.GetDescriptor()->name(), id});
  if (!require(found != pushed_.end(), "it answers nothing: no such message with the requestId " +
                                           std::to_string(id) + " was sent")) {
    return {};
  }
  Pushed& push = found->second;
  const std::string name = "the message with the requestId " + std::to_string(id);
  require(push.wants_answer, name + " wants no answer");
  ++push.answers;
  require(push.answers <= push.deliveries, name + " was answered before");
  if (const auto* online = dynamic_cast<const ForwardOnlineMessage*>(push.message.get())) {
    const int64_t chatroom = number_in(message, "chatroomId");
    require(chatroom == online->chatroomid(), "its chatroomId is " + std::to_string(chatroom) +
                                                  ", but that of " + name + " is " +
                                                  std::to_string(online->chatroomid()));
  }
  const auto* page = dynamic_cast<const ForwardUnreadMessage*>(push.message.get());
  return page == nullptr || push.answers > 1
             ? Messages()
             : turn_page(*page, static_cast<const ForwardUnreadMessageReply&>(message));
}

// The next one, if the plug-in asks for it.
Messages Service::turn_page(const ForwardUnreadMessage& page,
                            const ForwardUnreadMessageReply& answer) {
  for (const InboxEntry& entry : page.inboxentries()) {
    read_.insert(entry.msgid());
  }
  const auto next = pages_.find(answer.nextpaginationkey());
  Messages said;
  if (answer.has_nextpaginationkey() &&
      require(answer.nextpaginationkey() == page.nextpaginationkey(),
              "its nextPaginationKey is not that of the page, " + page.nextpaginationkey()) &&
      next != pages_.end()) {
    said.push_back(page_from(next->second, answer.maxcount()));
  }
  return said;
}

// ---- What the service says

Messages Service::say(const Message& request) {
  Messages said;
  if (const auto* typing = dynamic_cast<const IsTyping*>(&request)) {
    said.push_back(typing_of_another(*typing));
    return said;
  }
  said.push_back(reply_to(request));
  if (const auto* unread = dynamic_cast<const GetAllUnreadMessageRequest*>(&request)) {
    said.push_back(page_from(0, unread->maxcount()));
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
    set_number(reply.get(), time, state_.now);
  }
  visit<ChannelAuthRequest, CreateChatroomRequest, AllowChatRequest, InviteRequest, ChatRequest>(
      request, [this, &reply](const auto& of_type) { complete(of_type, reply.get()); });
  return reply;
}

void Service::complete(const ChannelAuthRequest& request, Message* reply) {
  if (request.accesstoken() == state_.world.accesstoken()) {
    set_result(reply, kOk, "welcome");
  } else {
    set_result(reply, kBadToken, "access token refused");
  }
}

void Service::complete(const CreateChatroomRequest& request, Message* message) {
  auto* reply = static_cast<CreateChatroomReply*>(message);
  AllowChatReply chatroom = new_chatroom(state_, static_cast<int64_t>(next_chatroom_id_++));
  set_refused(bring(request.receivers(), state_, &chatroom), kSomeRefused,
              "some receivers were refused", reply->mutable_result());
  reply->set_chatroomid(chatroom.chatroomid());
  reply->set_owneruserid(chatroom.owneruserid());
  reply->set_msgttl(chatroom.msgttl());
}

void Service::complete(const AllowChatRequest& request, Message* message) {
  auto* reply = static_cast<AllowChatReply*>(message);
  const AllowChatReply* chatroom = state_.chatroom_with(request.chatroomid());
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

void Service::complete(const InviteRequest& request, Message* reply) {
  if (const AllowChatReply* chatroom = state_.chatroom_with(request.chatroomid())) {
    AllowChatReply with_invited = *chatroom;
    set_refused(bring(request.invitingmembers(), state_, &with_invited), kSomeNotInvited,
                "some members were not invited",
                static_cast<InviteReply*>(reply)->mutable_result());
  }
}

void Service::complete(const ChatRequest& request, Message* reply) {
  for (const ChatMessageParam& message : request.chatmessageparams()) {
    ProcessedMessageEntry* entry = static_cast<ChatReply*>(reply)->add_processedmessageentries();
    entry->set_msgid(message.msgid());
    entry->set_senttime(state_.now);
  }
}

std::unique_ptr<Message> Service::typing_of_another(const IsTyping& request) {
  auto push = std::make_unique<TypingUpdated>();
  number(push.get());
  push->set_chatroomid(request.chatroomid());
  const AllowChatReply* chatroom = state_.chatroom_with(request.chatroomid());
  if (chatroom != nullptr) {
    for (const ChatroomMemberStatus& member : chatroom->orderedchatroommemberlist()) {
      if (member.userid() != state_.world.userid()) {
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

// So many unread messages at most, from that index on. Pages without end come again and again.
std::unique_ptr<Message> Service::page_from(int first, int most) {
  const auto is_unread = [this](const InboxEntry& entry) {
    return state_.world.hasendlesspages() || read_.count(entry.msgid()) == 0;
  };
  const auto& stored = state_.world.stored();
  auto page = std::make_unique<ForwardUnreadMessage>();
  number(page.get());
  auto next = stored.begin() + first;
  for (; next != stored.end() && (most <= 0 || page->inboxentries_size() < most); ++next) {
    if (is_unread(*next)) {
      page->add_inboxentries()->CopyFrom(*next);
    }
  }
  const bool has_more = std::any_of(next, stored.end(), is_unread);
  if (has_more || state_.world.hasendlesspages()) {
    const std::string key = "page " + std::to_string(pages_.size() + 2);
    pages_[key] = has_more ? static_cast<int>(next - stored.begin()) : 0;
    page->set_nextpaginationkey(key);
  }
  return page;
}

// ---- What the plug-in gets

void Service::number(Message* push) {
  set_number(push, "requestId", static_cast<int64_t>(next_push_id_++));
}

void Service::note_delivery(const std::string& name, const std::string& bytes, bool is_intact) {
  std::unique_ptr<Message> message = new_message(*message_type(name));
  if (!message->ParseFromString(bytes)) {
    return;
  }
  if (!is_reply(*message->GetDescriptor())) {
    note_push(std::move(message), is_intact);
  } else if (is_intact) {
    note_reply(*message);
  }
}

void Service::note_push(std::unique_ptr<Message> message, bool is_intact) {
  const Descriptor* answer = reply_type(*message->GetDescriptor());
  if (const auto* page = dynamic_cast<const ForwardUnreadMessage*>(message.get())) {
    for (const InboxEntry& entry : page->inboxentries()) {
      state_.know(entry, entry.chatroomid());
    }
  }
  const auto* online = dynamic_cast<const ForwardOnlineMessage*>(message.get());
  if (online != nullptr) {
    state_.know(online->inboxentry(), online->chatroomid());
  }
  if (answer == nullptr) {
    return;
  }
  Pushed& pushed = pushed_[{answer->name(), number_in(*message, "requestId")}];
  ++pushed.deliveries;
  pushed.wants_answer = online == nullptr || !online->skipreply();
  pushed.needs_answer = pushed.needs_answer || (is_intact && pushed.wants_answer);
  pushed.message = std::move(message);
}

std::vector<Unanswered> Service::unanswered() const {
  std::vector<Unanswered> result;
  for (const auto& [answer, pushed] : pushed_) {
    if (pushed.needs_answer && pushed.answers == 0) {
      result.push_back({answer.first, "The " + pushed.message->GetDescriptor()->name() +
                                          " with the requestId " + std::to_string(answer.second) +
                                          " was not answered by a " + answer.first + "."});
    }
  }
  return result;
}

void Service::note_reply(const Message& reply) {
  const auto open = open_.find(number_in(reply, "requestId"));
  if (open == open_.end() ||
      reply_type(*open->second.request->GetDescriptor()) != reply.GetDescriptor()) {
    return;
  }
  const std::unique_ptr<Message> request = std::move(open->second.request);
  open_.erase(open);
  if (grants(reply)) {
    grant(*request, reply);
  }
}

void Service::grant(const Message& request, const Message& reply) {
  if (const auto* create = dynamic_cast<const CreateChatroomRequest*>(&request)) {
    if (has(reply, "chatroomId")) {
      state_.create_chatroom(*create, number_in(reply, "chatroomId"));
    }
  } else if (const auto* change = dynamic_cast<const ChangeChatroomMetaRequest*>(&request)) {
    state_.change_chatroom(*change);
  } else if (const auto* invited = dynamic_cast<const InviteRequest*>(&request)) {
    state_.invite(*invited);
  } else if (const auto* ended = dynamic_cast<const EndChatRequest*>(&request)) {
    state_.end_chats(*ended);
  } else if (request.GetDescriptor() == ChannelAuthRequest::descriptor()) {
    state_.is_signed_in = true;
  }
}

}  // namespace testkit
