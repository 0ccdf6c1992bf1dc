#include "state.h"

#include <algorithm>

namespace testkit {
namespace {

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

}  // namespace

State::State(const World& of_test)
    : world(of_test), is_signed_in(of_test.issignedin()), now(of_test.clockmillis()) {
  for (const auto* entries : {&world.stored(), &world.past()}) {
    for (const InboxEntry& entry : *entries) {
      know(entry, entry.chatroomid());
    }
  }
}

void State::know(const InboxEntry& entry, int64_t chatroom) {
  known[{entry.sender(), entry.msgid()}] = {chatroom, entry.senttime()};
  if (chatroom != 0 && chatroom_with(chatroom) == nullptr) {
    world.add_chatrooms()->set_chatroomid(chatroom);
  }
}

const User* State::user_with(int64_t id) const {
  const auto& users = world.users();
  const auto found = std::find_if(users.begin(), users.end(),
                                  [id](const User& user) { return user.userid() == id; });
  return found == users.end() ? nullptr : &*found;
}

const AllowChatReply* State::chatroom_with(int64_t id) const {
  const auto& chatrooms = world.chatrooms();
  const auto found = std::find_if(chatrooms.begin(), chatrooms.end(),
                                  [id](const auto& room) { return room.chatroomid() == id; });
  return found == chatrooms.end() ? nullptr : &*found;
}

AllowChatReply* State::chatroom_with(int64_t id) {
  const State& same = *this;
  return const_cast<AllowChatReply*>(same.chatroom_with(id));
}

void State::create_chatroom(const CreateChatroomRequest& request, int64_t id) {
  AllowChatReply* chatroom = chatroom_with(id);
  if (chatroom == nullptr) {
    chatroom = world.add_chatrooms();
    chatroom->CopyFrom(new_chatroom(*this, id));
  } else {  // its marks stay
    chatroom->clear_orderedchatroommemberlist();
    chatroom->MergeFrom(new_chatroom(*this, id));
  }
  chatroom->set_title(request.chatroomtitle());
  bring(request.receivers(), *this, chatroom);
}

void State::change_chatroom(const ChangeChatroomMetaRequest& request) {
  AllowChatReply* chatroom = chatroom_with(request.chatroomid());
  if (chatroom != nullptr && request.has_title()) {
    chatroom->set_title(request.title());
  }
  if (chatroom != nullptr && request.has_msgttl()) {
    chatroom->set_msgttl(request.msgttl());
  }
}

void State::invite(const InviteRequest& request) {
  if (AllowChatReply* chatroom = chatroom_with(request.chatroomid())) {
    bring(request.invitingmembers(), *this, chatroom);
  }
}

void State::end_chats(const EndChatRequest& request) {
  auto& chatrooms = *world.mutable_chatrooms();
  for (const EndChatEntry& entry : request.endchatentries()) {
    for (int i = chatrooms.size() - 1; i >= 0; --i) {
      if (chatrooms.Get(i).chatroomid() == entry.chatroomid()) {
        chatrooms.SwapElements(i, chatrooms.size() - 1);
        chatrooms.RemoveLast();
      }
    }
  }
}

WrongReceiverDetail bring(const google::protobuf::RepeatedField<google::protobuf::int64>& users,
                          const State& state, AllowChatReply* chatroom) {
  WrongReceiverDetail detail;
  for (const int64_t id : users) {
    const User* user = state.user_with(id);
    if (is_member(*chatroom, id)) {
      detail.add_existing(id);
    } else if (user == nullptr || user->has_refused()) {
      refuse(user, id, state.world.userid(), &detail);
    } else {
      add_member(*user, chatroom);
    }
  }
  return detail;
}

AllowChatReply new_chatroom(const State& state, int64_t id) {
  AllowChatReply chatroom;
  chatroom.set_chatroomid(id);
  chatroom.set_owneruserid(state.world.userid());
  chatroom.set_msgttl(state.world.msgttl());
  if (const User* owner = state.user_with(state.world.userid())) {
    add_member(*owner, &chatroom);
  }
  return chatroom;
}

}  // namespace testkit
