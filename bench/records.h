/*
 * The lists that the library hands out, and the baseline in the same form.
 */
#ifndef BENCH_RECORDS_H
#define BENCH_RECORDS_H

#include "calls.h"
#include "qel-message-serialize.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Adds what a reply about a chatroom begins with. */
void digest_reply(int64_t request_id, int64_t chatroom_id, int code, const char* msg,
                  struct digest* digest);

/* Each adds the list to the digest. */
void digest_processed(const int64_t* ids, const int64_t* times, int count, struct digest* digest);
void digest_messages(qel_message_inboxentry_t* const* messages, int count, struct digest* digest);
void digest_watermarks(qel_message_watermarkentry_t* const* marks, int count,
                       struct digest* digest);
void digest_members(qel_message_chatroommember_t* const* members, int count, struct digest* digest);

/* The same, unless the digest is NULL; then each releases the list. */
void finish_processed(int64_t* ids, int64_t* times, int count, struct digest* digest);
void finish_messages(qel_message_inboxentry_t** messages, int count, struct digest* digest);
void finish_watermarks(qel_message_watermarkentry_t** marks, int count, struct digest* digest);
void finish_members(qel_message_chatroommember_t** members, int count, struct digest* digest);

#ifdef __cplusplus
}
#endif

#endif
