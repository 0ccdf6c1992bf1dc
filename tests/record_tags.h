/* The records by their tags, as headers of a plug-in name them that do not include the interface's:
 * declared before it, and the same types as those without "struct". In C and in C++. */
struct qel_message_didviolationuser_t;
struct qel_message_watermarkentry_t;
struct qel_message_chatroommember_t;
struct qel_message_inboxentry_t;
struct qel_message_endchatentry_t;

struct records {
  struct qel_message_didviolationuser_t* pair;
  struct qel_message_watermarkentry_t* mark;
  struct qel_message_chatroommember_t* member;
  struct qel_message_inboxentry_t* message;
  struct qel_message_endchatentry_t* ended;
};

#include "qel-message-serialize.h"

void take(struct records* all, qel_message_didviolationuser_t* pair,
          qel_message_watermarkentry_t* mark, qel_message_chatroommember_t* member,
          qel_message_inboxentry_t* message, qel_message_endchatentry_t* ended) {
  all->pair = pair;
  all->mark = mark;
  all->member = member;
  all->message = message;
  all->ended = ended;
}
