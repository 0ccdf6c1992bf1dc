// What the service knows: its world, which requests change, and the messages of its users.
#ifndef TESTKIT_STATE_H
#define TESTKIT_STATE_H

#include <cstdint>
#include <map>
#include <string>
#include <utility>

#include "msgspec_frontend.pb.h"
#include "world.pb.h"

namespace testkit {

// A message that the plug-in has sent.
struct Written {
  int64_t chatroom;
  std::string text;
};

// A message that the plug-in may name. What is 0 may be any.
struct Known {
  int64_t chatroom;
  int64_t sent_time;
};

struct State {
  explicit State(const World& world);

  const User* user_with(int64_t id) const;
  // Null if the user is in no such chatroom.
  const AllowChatReply* chatroom_with(int64_t id) const;
  AllowChatReply* chatroom_with(int64_t id);

  // A message came to the plug-in, from a chatroom that is the user's from now on.
  void know(const InboxEntry& entry, int64_t chatroom);

  // What a request changes once it is granted.
  void create_chatroom(const CreateChatroomRequest& request, int64_t id);
  void change_chatroom(const ChangeChatroomMetaRequest& request);
  void invite(const InviteRequest& request);
  void end_chats(const EndChatRequest& request);

  World world;
  bool is_signed_in;
  int64_t now;                                         // milliseconds since 1970
  std::map<int64_t, Written> written;                  // by msgId
  std::map<std::pair<int64_t, int64_t>, Known> known;  // by sender and msgId
};

// Makes the users members of the chatroom. Returns who was refused, and why.
WrongReceiverDetail bring(const google::protobuf::RepeatedField<google::protobuf::int64>& users,
                          const State& state, AllowChatReply* chatroom);

// A chatroom with its owner, and nobody else.
AllowChatReply new_chatroom(const State& state, int64_t id);

}  // namespace testkit

#endif
