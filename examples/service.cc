#include "service.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/text_format.h>
#include <sys/time.h>

#include <cstdio>
#include <cstdlib>
#include <sstream>
#include <vector>

#include "framing.h"

namespace {

using google::protobuf::DescriptorPool;
using google::protobuf::Message;
using google::protobuf::MessageFactory;

constexpr char kAccessToken[] = "example-access-token";
constexpr int64_t kChatroom = 42;
constexpr int64_t kUser = 5001;
constexpr int64_t kPartner = 6001;
constexpr int64_t kAbsentMember = 6002;
constexpr int64_t kDisabledUser = 6003;
constexpr int64_t kViolatingUser = 6004;
constexpr int64_t kDenyingUser = 6005;
constexpr int64_t kInterruptedUser = 6006;
constexpr int64_t kNobody = 999;
constexpr int64_t kStart = 1700000000000;  // of what happened before the session, in milliseconds

enum ResultCode { kOk = 0, kSomeRefused = 1001, kBadToken = 2001, kSomeNotInvited = 3003 };

// The requests of a session, and what the plug-in does with each.
constexpr struct {
  const char* name;
  const char* title;
} kRequests[] = {
    {"ChannelAuthRequest", "The plug-in signs in"},
    {"CurrentTimeRequest",
     "The plug-in asks for the time; the service first asks whether it is alive"},
    {"CreateChatroomRequest", "The plug-in creates a chatroom; some of the users are refused"},
    {"AllowChatRequest", "The plug-in enters the chatroom"},
    {"ChatRequest", "The plug-in sends a message; another member writes before it is confirmed"},
    {"ReadMessageRequest", "The plug-in tells which message the user has read"},
    {"GetAllUnreadMessageRequest",
     "The plug-in fetches what was stored meanwhile, two messages at a time"},
    {"UnsealMessageRequest", "The plug-in opens a sealed message"},
    {"IsTyping", "The plug-in tells that the user types; another member types too"},
    {"SaveCallLogRequest", "The plug-in reports a call"},
    {"ChangeChatroomMetaRequest", "The plug-in changes the chatroom"},
    {"InviteRequest", "The plug-in invites more users; most of them are refused"},
    {"EndChatRequest", "The plug-in leaves two chats"},
};

constexpr size_t kColumns = 80;  // of a terminal

int64_t now_millis() {
  timeval now;
  gettimeofday(&now, nullptr);
  return int64_t{now.tv_sec} * 1000 + now.tv_usec / 1000;
}

bool is_plain_field(const std::string& line) {
  return line.back() != '{' && line.back() != '}';
}

// Joins lines of one field each, as long as the result fits on a terminal.
std::string side_by_side(const std::string& fields) {
  std::vector<std::string> lines;
  std::istringstream input(fields);
  for (std::string line; std::getline(input, line);) {
    const size_t depth = line.find_first_not_of(' ');
    if (!lines.empty() && is_plain_field(lines.back())) {
      std::string& last = lines.back();
      const size_t last_depth = last.find_first_not_of(' ');
      if (last_depth == depth && is_plain_field(line) &&
          last.size() + 2 + line.size() - depth <= kColumns) {
        last += ", " + line.substr(depth);
        continue;
      }
      if (last_depth > depth && lines.end()[-2].back() == '{') {  // line is "}"
        const std::string whole = lines.end()[-2] + " " + last.substr(last_depth) + " }";
        if (whole.size() <= kColumns) {
          lines.pop_back();
          lines.back() = whole;
          continue;
        }
      }
    }
    lines.push_back(line);
  }
  std::string text;
  for (const std::string& line : lines) {
    text += line + "\n";
  }
  return text;
}

// The message's fields; the access token is a credential and is not shown.
std::string text_form(const Message& message) {
  std::unique_ptr<Message> shown(message.New());
  shown->CopyFrom(message);
  if (auto* auth = dynamic_cast<ChannelAuthRequest*>(shown.get())) {
    if (auth->has_accesstoken()) {
      auth->set_accesstoken("(not shown)");
    }
  }
  google::protobuf::TextFormat::Printer printer;
  printer.SetUseUtf8StringEscaping(true);
  printer.SetInitialIndentLevel(2);
  std::string text;
  printer.PrintToString(*shown, &text);
  return side_by_side(text);
}

void print_message(const char* direction, const Message& message, int size) {
  std::ostringstream text;  // printed in one piece, as the plug-in prints too
  for (const auto& request : kRequests) {
    if (message.GetTypeName() == request.name) {
      text << "\n== " << request.title << "\n";
    }
  }
  text << direction << "  " << message.GetTypeName() << ", " << size << " bytes\n"
       << text_form(message);
  std::fputs(text.str().c_str(), stdout);
}

void require_chatroom(bool has_chatroom, int64_t chatroom, const std::string& request) {
  require(has_chatroom, request + " without a chatroom");
  require(chatroom == kChatroom, request + " of another chatroom");
}

template <typename Reply, typename Request>
Reply reply_to(const Request& request, ResultCode code = kOk, const std::string& text = "ok") {
  Reply reply;
  reply.set_requestid(request.requestid());
  reply.mutable_result()->set_code(code);
  reply.mutable_result()->set_msg(text);
  return reply;
}

void add_mark(WaterMarkEntry* mark, int64_t user, int64_t message) {
  mark->set_userid(user);
  mark->set_msgid(message);
  mark->set_timestamp(kStart + message);
  mark->set_chatroomid(kChatroom);
}

void add_member(ChatroomMemberStatus* member, int64_t user, bool available, const char* name) {
  member->set_userid(user);
  member->set_available(available);
  member->set_name(name);
  member->set_isaccepted(true);
}

void add_stored_message(InboxEntry* entry, int64_t id, int64_t sender, const char* text) {
  entry->set_msgid(id);
  entry->set_msgtype(TEXT);
  entry->set_sender(sender);
  entry->set_receiver(kUser);
  entry->set_senttime(kStart + id);
  entry->set_chatmsg(text);
  entry->set_chatroomid(kChatroom);
  entry->set_chattype(GROUP);
}

void add_violation(WrongReceiverDetail* detail) {
  DIDViolationUser* pair = detail->add_didviolationusers();
  pair->set_usera(kUser);
  pair->set_userb(kViolatingUser);
}

}  // namespace

void require(bool holds, const std::string& what) {
  if (!holds) {
    throw WrongExchange(what);
  }
}

// ---- The connection

void Service::run() {
  while (const std::unique_ptr<Message> request = receive()) {
    answer(*request);
  }
  for (const auto& request : kRequests) {
    require(answered_.count(request.name) > 0,
            std::string("the plug-in never sent a message ") + request.name);
  }
  std::printf("service: session complete, %d chat messages\n", chat_messages_);
}

std::unique_ptr<Message> Service::receive() {
  frame_t frame;
  const int status = frame_receive(connection_, &frame);
  const std::unique_ptr<unsigned char, decltype(&std::free)> bytes(frame.message, &std::free);
  require(status >= 0, "the connection broke or fell silent");
  if (status == 0) {
    return nullptr;
  }
  const auto* type = DescriptorPool::generated_pool()->FindMessageTypeByName(frame.name);
  require(type != nullptr, std::string("no such message: ") + frame.name);
  std::unique_ptr<Message> message(MessageFactory::generated_factory()->GetPrototype(type)->New());
  require(message->ParseFromArray(bytes.get(), frame.size),
          std::string("not a valid message: ") + frame.name);
  require(message->GetReflection()->GetUnknownFields(*message).empty(),
          std::string("unknown fields in: ") + frame.name);
  print_message("plug-in -> service", *message, frame.size);
  return message;
}

template <typename Message>
Message Service::expect(const std::string& otherwise) {
  const auto received = receive();
  const auto* message = dynamic_cast<const Message*>(received.get());
  require(message != nullptr, otherwise);
  return *message;
}

void Service::send(const Message& message) {
  const std::string bytes = message.SerializeAsString();
  print_message("service -> plug-in", message, static_cast<int>(bytes.size()));
  require(frame_send(connection_, message.GetTypeName().c_str(),
                     reinterpret_cast<const unsigned char*>(bytes.data()),
                     static_cast<int>(bytes.size())) == 0,
          "a message could not be sent");
}

void Service::answer(const Message& message) {
  const auto* auth = dynamic_cast<const ChannelAuthRequest*>(&message);
  answered_.insert(message.GetTypeName());
  if (auth != nullptr) {
    authenticate(*auth);
    return;
  }
  require(authenticated_, "a message before the authentication: " + message.GetTypeName());
  const bool known =
      answered(message, &Service::tell_time) || answered(message, &Service::create_chatroom) ||
      answered(message, &Service::describe_chatroom) || answered(message, &Service::record) ||
      answered(message, &Service::note_read) || answered(message, &Service::send_unread) ||
      answered(message, &Service::unseal) || answered(message, &Service::pass_typing_on) ||
      answered(message, &Service::log_call) || answered(message, &Service::change_chatroom) ||
      answered(message, &Service::invite) || answered(message, &Service::end_chats);
  require(known, "this front end does not take a " + message.GetTypeName());
}

template <typename Request>
bool Service::answered(const Message& message, void (Service::*answer)(const Request&)) {
  const auto* request = dynamic_cast<const Request*>(&message);
  if (request == nullptr) {
    return false;
  }
  take_request_id(*request);
  require(!request->has_userid() && !request->has_deviceid(),
          "ids of the sender in: " + message.GetTypeName());
  (this->*answer)(*request);
  return true;
}

template <typename Request>
void Service::take_request_id(const Request& request) {
  require(request.has_requestid(), "a request without a request id");
  require(request.requestid() > last_request_id_, "a request id that is not above the one before");
  last_request_id_ = request.requestid();
}

void Service::authenticate(const ChannelAuthRequest& request) {
  require(!authenticated_, "a second authentication");
  take_request_id(request);
  require(request.has_userid() && request.has_deviceid() && request.has_appid(),
          "an authentication without user, device or application");
  require(!request.has_imei() && request.proxyoptions_size() == 0,
          "an authentication with IMEI or proxy options");
  authenticated_ = request.accesstoken() == kAccessToken;

  send(authenticated_ ? reply_to<ChannelAuthReply>(request, kOk, "welcome")
                      : reply_to<ChannelAuthReply>(request, kBadToken, "access token refused"));
  require(authenticated_, "wrong access token");
}

// Before it tells the time, the service probes whether the client is alive.
void Service::tell_time(const CurrentTimeRequest& request) {
  probe();

  auto reply = reply_to<CurrentTimeReply>(request);
  reply.set_currenttimemillis(now_millis());
  send(reply);
}

void Service::probe() {
  ClientEcho echo;
  echo.set_requestid(++last_push_id_);
  send(echo);
  const auto reply = expect<ClientEchoReply>("no answer to the echo probe");
  require(reply.requestid() == echo.requestid(), "an answer to another echo probe");
}

// ---- Chatrooms

void Service::create_chatroom(const CreateChatroomRequest& request) {
  require(
      request.chattype() == GROUP && request.receivers_size() > 0 && request.has_chatroomtitle(),
      "a chatroom without type, receivers or title");
  require(!request.has_chatroomprofileurl() && !request.has_commonkey() &&
              request.groupkeyentries_size() == 0,
          "a chatroom with a picture or keys");

  auto reply = reply_to<CreateChatroomReply>(request, kSomeRefused, "some receivers were refused");
  WrongReceiverDetail* detail = reply.mutable_result()->mutable_wrongreceiverdetail();
  detail->add_invalidreceivers(kNobody);
  detail->add_disabledreceivers(kDisabledUser);
  detail->add_invitationdenied(kDenyingUser);
  add_violation(detail);
  reply.set_chatroomid(kChatroom);
  reply.set_createtimemillis(now_millis());
  reply.set_owneruserid(kUser);
  reply.set_msgttl(3600);
  send(reply);
}

void Service::describe_chatroom(const AllowChatRequest& request) {
  require_chatroom(request.has_chatroomid(), request.chatroomid(), "an entry");
  require(request.isautoallow() && request.maxcount() == 100 && request.needdeliveryack() &&
              request.has_lastdeliveryacktimestamp() && request.needreadack() &&
              request.has_lastreadacktimestamp() && request.needorderedchatroommemberlist() &&
              request.needchatroommeta(),
          "an entry that asks for less than everything");

  auto reply = reply_to<AllowChatReply>(request);
  reply.set_chatroomid(kChatroom);
  reply.set_owneruserid(kUser);
  add_member(reply.add_orderedchatroommemberlist(), kUser, true, "Ana");
  add_member(reply.add_orderedchatroommemberlist(), kPartner, true, "Bo");
  add_member(reply.add_orderedchatroommemberlist(), kAbsentMember, false, "Chloé");
  add_mark(reply.add_deliveryackentries(), kPartner, 8002);
  add_mark(reply.add_deliveryackentries(), kAbsentMember, 8001);
  reply.set_lastdeliveryacktimestamp(kStart + 8002);
  add_mark(reply.add_readackentries(), kPartner, 8001);
  reply.set_lastreadacktimestamp(kStart + 8001);
  reply.set_title("Lunch");
  reply.set_msgttl(3600);
  send(reply);
}

void Service::change_chatroom(const ChangeChatroomMetaRequest& request) {
  require_chatroom(request.has_chatroomid(), request.chatroomid(), "a change");
  require(request.has_title() != request.has_msgttl(), "a change that is not of one property");
  require(!request.has_profileurl() && !request.has_notionoff(),
          "a change of picture or notification");

  auto reply = reply_to<ChangeChatroomMetaReply>(request);
  reply.set_chatroomid(kChatroom);
  reply.set_changetimemillis(now_millis());
  send(reply);
}

void Service::invite(const InviteRequest& request) {
  require_chatroom(request.has_chatroomid(), request.chatroomid(), "an invitation");
  require(request.invitingmembers_size() > 0, "an invitation of nobody");
  require(!request.has_commonkey() && request.groupkeyentries_size() == 0,
          "an invitation with keys");

  auto reply = reply_to<InviteReply>(request, kSomeNotInvited, "some members were not invited");
  WrongReceiverDetail* detail = reply.mutable_result()->mutable_wrongreceiverdetail();
  detail->add_invalidreceivers(kNobody);
  detail->add_interruptedreceivers(kInterruptedUser);
  detail->add_disabledreceivers(kDisabledUser);
  detail->add_existing(kPartner);
  detail->add_invitationdenied(kDenyingUser);
  add_violation(detail);
  reply.set_chatroomid(kChatroom);
  reply.set_senttime(now_millis());
  send(reply);
}

void Service::end_chats(const EndChatRequest& request) {
  require(request.endchatentries_size() > 0, "an end of no chats");
  for (const EndChatEntry& entry : request.endchatentries()) {
    require(entry.has_chatroomid() && entry.has_denyinvitation(), "an end that lacks a field");
    require(!entry.has_securekeylost(), "an end of a secure chat");
  }
  send(reply_to<EndChatReply>(request));
}

// ---- Messages

// Before the service confirms a message, the partner writes too.
void Service::record(const ChatRequest& request) {
  require_chatroom(request.has_chatroomid(), request.chatroomid(), "a chat request");
  require(request.chatmessageparams_size() == 1, "a chat request that is not of one message");
  const ChatMessageParam& param = request.chatmessageparams(0);
  require(param.has_msgid() && param.has_msgtype() && param.has_chatmsg() && param.has_msgttl(),
          "a chat message that lacks a field");
  require(!param.has_securechatmsg(), "a sealed chat message");

  ++chat_messages_;
  const bool first = chat_messages_ == 1;
  push_message(8100 + chat_messages_, first ? "Where are you?" : "See you", !first);

  auto reply = reply_to<ChatReply>(request);
  reply.set_chatroomid(kChatroom);
  ProcessedMessageEntry* entry = reply.add_processedmessageentries();
  entry->set_msgid(param.msgid());
  entry->set_senttime(now_millis());
  send(reply);
}

void Service::push_message(int64_t id, const std::string& text, bool skip_reply) {
  ForwardOnlineMessage push;
  push.set_requestid(++last_push_id_);
  push.set_chatroomid(kChatroom);
  push.set_chattype(GROUP);
  InboxEntry* entry = push.mutable_inboxentry();
  entry->set_msgid(id);
  entry->set_msgtype(TEXT);
  entry->set_sender(kPartner);
  entry->set_receiver(kUser);
  entry->set_senttime(now_millis());
  entry->set_chatmsg(text);
  entry->set_msgttl(3600);
  push.set_skipreply(skip_reply);
  send(push);
  if (!skip_reply) {
    const auto reply =
        expect<ForwardOnlineMessageReply>("no acknowledgement of the pushed message");
    require(reply.requestid() == push.requestid() && reply.chatroomid() == kChatroom &&
                reply.markasread(),
            "an acknowledgement of another push");
  }
}

void Service::note_read(const ReadMessageRequest& request) {
  require_chatroom(request.has_chatroomid(), request.chatroomid(), "a read receipt");
  const InboxEntry& entry = request.inboxentry();
  require(entry.has_msgid() && entry.has_msgtype() && entry.sender() == kPartner &&
              entry.has_senttime(),
          "a read receipt that lacks a field");
  require(!entry.has_receiver() && !entry.has_chatmsg() && !entry.has_msgttl() &&
              !entry.has_chatroomid() && !entry.has_chattype() && !entry.has_securechatmsg(),
          "a read receipt with more than the message's name");

  auto reply = reply_to<ReadMessageReply>(request);
  reply.set_chatroomid(kChatroom);
  send(reply);
}

// Two pages: the first one comes with the key of the second.
void Service::send_unread(const GetAllUnreadMessageRequest& request) {
  require(request.maxcount() == 2, "a request for pages of another size");
  send(reply_to<GetAllUnreadMessageReply>(request));

  ForwardUnreadMessage page;
  add_stored_message(page.add_inboxentries(), 8001, kPartner, "Anyone for lunch?");
  add_stored_message(page.add_inboxentries(), 8002, kAbsentMember, "Not today");
  page.set_nextpaginationkey("page 2");
  push_page(page);

  page.clear_inboxentries();
  page.clear_nextpaginationkey();
  add_stored_message(page.add_inboxentries(), 8003, kAbsentMember, "(sealed)");
  push_page(page);
}

void Service::push_page(ForwardUnreadMessage page) {
  page.set_requestid(++last_push_id_);
  send(page);
  const auto reply = expect<ForwardUnreadMessageReply>("no acknowledgement of the page");
  require(reply.requestid() == page.requestid() && reply.maxcount() == 2,
          "an acknowledgement of another push");
  require(reply.has_nextpaginationkey() == page.has_nextpaginationkey() &&
              reply.nextpaginationkey() == page.nextpaginationkey(),
          "a request for another page");
}

void Service::unseal(const UnsealMessageRequest& request) {
  require_chatroom(request.has_chatroomid(), request.chatroomid(), "an unsealing");
  require(request.sender() == kAbsentMember && request.msgid() == 8003 && request.has_msgdetail(),
          "an unsealing of another message");

  auto reply = reply_to<UnsealMessageReply>(request);
  reply.set_chatroomid(kChatroom);
  send(reply);
}

// ---- Typing and calls

// The partner types too. There is no reply.
void Service::pass_typing_on(const IsTyping& request) {
  require_chatroom(request.has_chatroomid(), request.chatroomid(), "a typing status");
  require(request.has_state() && request.has_contenttype() && request.has_refresh(),
          "a typing status that lacks a field");

  TypingUpdated push;
  push.set_requestid(++last_push_id_);
  push.set_chatroomid(kChatroom);
  push.set_sender(kPartner);
  push.set_state(request.state());
  push.set_contenttype(request.contenttype());
  push.set_refresh(request.refresh());
  send(push);
}

void Service::log_call(const SaveCallLogRequest& request) {
  require_chatroom(request.has_chatroomid(), request.chatroomid(), "a call");
  require(request.has_callid() && request.has_calllogtype() && request.sender() == kUser &&
              request.receiver() == kPartner && request.has_conversationseconds(),
          "a call that lacks a field");

  auto reply = reply_to<SaveCallLogReply>(request);
  reply.set_chatroomid(kChatroom);
  send(reply);
}
