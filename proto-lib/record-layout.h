// Checks the layout of the records when the library is compiled, as it is part of the binary
// interface. On 32-bit ARM and on 64-bit workstations only the size of pointers differs.
#ifndef QEL_RECORD_LAYOUT_H
#define QEL_RECORD_LAYOUT_H

#include <stddef.h>

#include "qel-message-serialize.h"

namespace record_layout {

using Pair = qel_message_didviolationuser_t;
static_assert(offsetof(Pair, userA) == 0 && sizeof(Pair::userA) == 8);
static_assert(offsetof(Pair, userB) == 8 && sizeof(Pair::userB) == 8);
static_assert(sizeof(Pair) == 16);

using Watermark = qel_message_watermarkentry_t;
static_assert(offsetof(Watermark, userId) == 0 && sizeof(Watermark::userId) == 8);
static_assert(offsetof(Watermark, msgId) == 8 && sizeof(Watermark::msgId) == 8);
static_assert(offsetof(Watermark, timestamp) == 16 && sizeof(Watermark::timestamp) == 8);
static_assert(sizeof(Watermark) == 24);

using Member = qel_message_chatroommember_t;
static_assert(offsetof(Member, userId) == 0 && sizeof(Member::userId) == 8);
static_assert(offsetof(Member, available) == 8 && sizeof(Member::available) == 8);
static_assert(offsetof(Member, name) == 16 && sizeof(Member::name) == sizeof(char*));
static_assert(sizeof(Member) == 24);

using Entry = qel_message_inboxentry_t;
static_assert(offsetof(Entry, msgId) == 0 && sizeof(Entry::msgId) == 8);
static_assert(offsetof(Entry, msgType) == 8 && sizeof(Entry::msgType) == 4);
static_assert(offsetof(Entry, sender) == 16 && sizeof(Entry::sender) == 8);
static_assert(offsetof(Entry, receiver) == 24 && sizeof(Entry::receiver) == 8);
static_assert(offsetof(Entry, sentTime) == 32 && sizeof(Entry::sentTime) == 8);
static_assert(offsetof(Entry, chatMsg) == 40 && sizeof(Entry::chatMsg) == sizeof(char*));
static_assert(offsetof(Entry, chatroomId) == 48 && sizeof(Entry::chatroomId) == 8);
static_assert(offsetof(Entry, chatType) == 56 && sizeof(Entry::chatType) == 4);
static_assert(offsetof(Entry, msgTtl) == 60 && sizeof(Entry::msgTtl) == 4);
static_assert(sizeof(Entry) == 64);

using EndedChat = qel_message_endchatentry_t;
static_assert(offsetof(EndedChat, chatroomId) == 0 && sizeof(EndedChat::chatroomId) == 8);
static_assert(offsetof(EndedChat, denyInvitation) == 8 && sizeof(EndedChat::denyInvitation) == 1);
static_assert(sizeof(EndedChat) == 16);

}  // namespace record_layout

#endif
