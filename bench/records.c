#include "records.h"

#include <stdlib.h>

void digest_reply(int64_t request_id, int64_t chatroom_id, int code, const char* msg,
                  struct digest* digest) {
  digest_number(digest, request_id);
  digest_number(digest, chatroom_id);
  digest_number(digest, code);
  digest_text(digest, msg);
}

void digest_processed(const int64_t* ids, const int64_t* times, int count, struct digest* digest) {
  int i;
  digest_number(digest, count);
  for (i = 0; i < count; ++i) {
    digest_number(digest, ids[i]);
    digest_number(digest, times[i]);
  }
}

void digest_messages(qel_message_inboxentry_t* const* messages, int count, struct digest* digest) {
  int i;
  digest_number(digest, count);
  for (i = 0; i < count; ++i) {
    digest_number(digest, messages[i]->msgId);
    digest_number(digest, messages[i]->msgType);
    digest_number(digest, messages[i]->sender);
    digest_number(digest, messages[i]->receiver);
    digest_number(digest, messages[i]->sentTime);
    digest_text(digest, messages[i]->chatMsg);
    digest_number(digest, messages[i]->chatroomId);
    digest_number(digest, messages[i]->chatType);
    digest_number(digest, messages[i]->msgTtl);
  }
}

void digest_watermarks(qel_message_watermarkentry_t* const* marks, int count,
                       struct digest* digest) {
  int i;
  digest_number(digest, count);
  for (i = 0; i < count; ++i) {
    digest_number(digest, marks[i]->userId);
    digest_number(digest, marks[i]->msgId);
    digest_number(digest, marks[i]->timestamp);
  }
}

void digest_members(qel_message_chatroommember_t* const* members, int count,
                    struct digest* digest) {
  int i;
  digest_number(digest, count);
  for (i = 0; i < count; ++i) {
    digest_number(digest, members[i]->userId);
    digest_number(digest, members[i]->available);
    digest_text(digest, members[i]->name);
  }
}

void finish_processed(int64_t* ids, int64_t* times, int count, struct digest* digest) {
  if (digest != NULL) {
    digest_processed(ids, times, count, digest);
  }
  free(ids);
  free(times);
}

void finish_messages(qel_message_inboxentry_t** messages, int count, struct digest* digest) {
  int i;
  if (digest != NULL) {
    digest_messages(messages, count, digest);
  }
  for (i = 0; i < count; ++i) {
    free(messages[i]->chatMsg);
    free(messages[i]);
  }
  free(messages);
}

void finish_watermarks(qel_message_watermarkentry_t** marks, int count, struct digest* digest) {
  int i;
  if (digest != NULL) {
    digest_watermarks(marks, count, digest);
  }
  for (i = 0; i < count; ++i) {
    free(marks[i]);
  }
  free(marks);
}

void finish_members(qel_message_chatroommember_t** members, int count, struct digest* digest) {
  int i;
  if (digest != NULL) {
    digest_members(members, count, digest);
  }
  for (i = 0; i < count; ++i) {
    free(members[i]->name);
    free(members[i]);
  }
  free(members);
}
