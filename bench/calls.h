/*
 * What is measured: five calls. Each program has one implementation of them, and aborts if a call
 * fails.
 */
#ifndef BENCH_CALLS_H
#define BENCH_CALLS_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* A checksum of the values that a parser found, to compare the implementations. */
struct digest {
  uint64_t value;
};

static inline void digest_number(struct digest* digest, int64_t number) {
  digest->value = (digest->value ^ (uint64_t)number) * UINT64_C(0x100000001b3);
  digest->value ^= digest->value >> 29;
}

static inline void digest_text(struct digest* digest, const char* text) {
  for (; *text != '\0'; ++text) {
    digest_number(digest, (unsigned char)*text);
  }
  digest_number(digest, 256);
}

/* The values that all requests carry. */
enum { kRequestId = 123456789, kMessageTtl = 86400, kMessageType = 0 /* TEXT */ };
static const int64_t kChatroomId = INT64_C(1234567890123);
static const int64_t kMessageId = INT64_C(1419876543210123);

/*
 * The serializers hand out a block with the encoding, which the caller frees, and its length.
 *
 * The parsers turn the bytes into plain C data that does not point into the bytes, and release it.
 * Before that they add each value to the digest, unless it is NULL, in the order given here. All
 * values are present.
 */
struct implementation {
  const char* name;

  /* ClientEchoReply: requestId */
  unsigned char* (*echo_reply)(int64_t request_id, int* size);

  /* ChatRequest: requestId, chatroomId, and one of chatMessageParams: msgId, msgType, chatMsg,
   * msgTtl. Apart from the text these are the constants above. */
  unsigned char* (*chat_request)(const char* text, int* size);

  /* ChatReply: requestId, chatroomId, result.code, result.msg; the number of
   * processedMessageEntries, and of each: msgId, sentTime */
  void (*chat_reply)(const unsigned char* data, int size, struct digest* digest);

  /* ForwardUnreadMessage: requestId; the number of inboxEntries, and of each: msgId, msgType,
   * sender, receiver, sentTime, chatMsg, chatroomId, chatType, msgTtl; nextPaginationKey */
  void (*message_page)(const unsigned char* data, int size, struct digest* digest);

  /* AllowChatReply: requestId, chatroomId, result.code, result.msg; lastDeliveryAckTimestamp; the
   * number of deliveryAckEntries, and of each: userId, msgId, timestamp; lastReadAckTimestamp;
   * readAckEntries in the same way; the number of orderedChatroomMemberList, and of each: userId,
   * available (0 or 1), name; title; msgTtl */
  void (*chatroom_entry)(const unsigned char* data, int size, struct digest* digest);
};

/* The program's implementation. A call that it does not have is NULL. */
extern const struct implementation implementation;

/*
 * Parsers of small messages, in which qel-message.h is compared with the functions below it. In
 * other programs they are NULL.
 */

/* ClientEcho: requestId */
void echo(const unsigned char* data, int size, struct digest* digest) __attribute__((weak));

/* EndChatReply: requestId, result.code, result.msg */
void end_of_chats(const unsigned char* data, int size, struct digest* digest) __attribute__((weak));

/* InviteReply: requestId, chatroomId, result.code, result.msg; the number of invalid receivers,
 * which are absent like all lists */
void invitation(const unsigned char* data, int size, struct digest* digest) __attribute__((weak));

#ifdef __cplusplus
}
#endif

#endif
