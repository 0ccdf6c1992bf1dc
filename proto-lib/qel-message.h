/**
 * @file
 * @brief The interface for plug-ins in C: records that are read and released, and buffers that are
 * written.
 *
 * This header stands on the functions of qel-message-serialize.h, which says what the arguments,
 * the outputs and the log lines mean. All that it adds is inline: nothing of it is in the library,
 * it keeps no state, and it allocates nothing.
 *
 * @par Names
 * A deserializer chat_reply_deserialize() becomes a record, qel_chat_reply_t, and the functions
 * qel_chat_reply_read() and qel_chat_reply_release(). Its fields have the names of the outputs. In
 * a reply, requestId, chatroomId, resultCode and resultMsg are in its field reply; replies that
 * have nothing more are all qel_reply_t. A serializer client_echo_reply_serialize() becomes
 * qel_client_echo_reply_write(), with a qel_buffer_t in front of its arguments instead of the two
 * outputs behind them. If another argument differs, the comment says so. The two placeholders for
 * stored messages have nothing here.
 *
 * @par Life of a record or a buffer
 * It begins zeroed: with QEL_SCOPED(), by "= {0}" (in C++ "= {}"), or as part of something that was
 * zeroed. To read or to write releases what it held before. To release leaves it zeroed, and may be
 * done at any time and twice. A copy is not zeroed with it: release only one of them. What is
 * zeroed holds nothing, and need not be released. Unless the status is QEL_OK, the record or the
 * buffer is zeroed.
 *
 * @par
 * To keep a text, an array, an element of it or a buffer's bytes for longer than the record, take
 * the pointer and set it to NULL in the record; then release it with free(). An array comes with
 * its count. Entries, marks, members and their texts are blocks of their own.
 *
 * @par What is absent
 * A text that a message does not have is NULL, but for a member's name and a message's chatMsg,
 * which are "". A number is QEL_ABSENT where the comment at the field says so, and 0 elsewhere. A
 * list is NULL with the count 0, and no list is NULL with another count.
 *
 * @par What cannot be told
 * - a number that is 0 from one that is absent, where it is not QEL_ABSENT: a result without a code
 *   has the code 0
 * - a login's reply without a result from one with the code 0
 * - a message with the requestId QEL_ABSENT from unreadable bytes, a number that is sent as
 *   QEL_ABSENT from an absent one, and a clock of -1 too
 * - which message the bytes are: the transport has to say
 * - whether the message is whole: bytes that were cut between two fields are a message
 * - a msgType or chatType that is newer than this library from TEXT and SINGLE
 *
 * @par Memory and exceptions
 * Without memory for an entry, a mark or a member of a list, and for most arrays, the process ends.
 * So it does by an exception of the protocol runtime, if the caller is written in C. To a caller in
 * C++ the exception passes through: then do nothing with the record but release it, where it is.
 */
#ifndef QEL_MESSAGE_H
#define QEL_MESSAGE_H

#include <limits.h>
#include <stdlib.h>
#include <string.h>

#include "qel-message-serialize.h"

#ifdef __cplusplus
extern "C" {
#endif

/** @defgroup qel_common Statuses, buffers and values
 *  @{ */

/** @cond */
#ifdef __cplusplus
#define QEL_INTERNAL_NULL nullptr
#define QEL_INTERNAL_ZEROED \
  {}
#else
#define QEL_INTERNAL_NULL NULL
#define QEL_INTERNAL_ZEROED \
  { 0 }
#endif
#ifdef __GNUC__
#define QEL_MUST_USE __attribute__((warn_unused_result))
/** @endcond */

/**
 * Declares a zeroed variable that is released where its scope ends: QEL_SCOPED(buffer, request); is
 * a qel_buffer_t request. No goto and no case may jump over it into its scope. With GCC and clang.
 */
#define QEL_SCOPED(kind, variable) \
  __attribute__((cleanup(qel_##kind##_release))) qel_##kind##_t variable = QEL_INTERNAL_ZEROED

/** @cond */
#else
#define QEL_MUST_USE
#endif
/** @endcond */

/** How a call went. */
typedef enum qel_status {
  QEL_OK = 0,       /**< the record has been read, or the buffer written */
  QEL_UNREADABLE,   /**< the bytes could not be parsed to their end; or data is NULL, or size below
                         0. Size 0 is a message without fields. */
  QEL_BAD_ARGUMENT, /**< an argument that the message cannot have; the log may say which */
  QEL_NO_MEMORY,    /**< none for the buffer, or for an array or a text of the record */
  QEL_TOO_LONG      /**< the message would have more than 2 GiB */
} qel_status_t;

/** Stands for numbers that a message does not have. */
enum { QEL_ABSENT = INT_MIN };

/**
 * The codes of results that list refused users. What they and all other codes mean, the service
 * defines.
 */
typedef enum qel_result_code {
  QEL_RESULT_REFUSED_1000 = 1000, /**< no list of invalid receivers for a new chatroom */
  QEL_RESULT_REFUSED_1001 = 1001, /**< all lists */
  QEL_RESULT_REFUSED_3003 = 3003, /**< all lists of an invitation, none for a new chatroom */
  QEL_RESULT_REFUSED_3009 = 3009  /**< no list of invalid receivers for a new chatroom */
} qel_result_code_t;

/** The schema's ChatType. */
typedef enum qel_chat_type {
  QEL_CHAT_TYPE_SINGLE = 0,
  QEL_CHAT_TYPE_GROUP = 1,
  QEL_CHAT_TYPE_BROADCAST = 2,
  QEL_CHAT_TYPE_SECURE = 3,
  QEL_CHAT_TYPE_MONOLOGUE = 4
} qel_chat_type_t;

/** The schema's MsgType. */
typedef enum qel_msg_type {
  QEL_MSG_TYPE_TEXT = 0,
  QEL_MSG_TYPE_MEDIA = 1,
  QEL_MSG_TYPE_CUSTOM = 2,
  QEL_MSG_TYPE_RECALL = 3,
  QEL_MSG_TYPE_NOTI = 4,
  QEL_MSG_TYPE_READ_ACK = 5,
  QEL_MSG_TYPE_DELIVERY_ACK = 6,
  QEL_MSG_TYPE_UNSEAL = 10,
  QEL_MSG_TYPE_VOIP_CALL_SETUP = 30
} qel_msg_type_t;

/** The schema's IsTypingContentType. */
typedef enum qel_content_type {
  QEL_CONTENT_TYPE_TEXT = 0,
  QEL_CONTENT_TYPE_IMAGE = 1,
  QEL_CONTENT_TYPE_VIDEO = 2,
  QEL_CONTENT_TYPE_AUDIO = 3
} qel_content_type_t;

/** Whether the number is a qel_chat_type_t. */
static inline bool qel_is_chat_type(int number) {
  return number >= QEL_CHAT_TYPE_SINGLE && number <= QEL_CHAT_TYPE_MONOLOGUE;
}

/** Whether the number is a qel_msg_type_t. */
static inline bool qel_is_msg_type(int number) {
  return (number >= QEL_MSG_TYPE_TEXT && number <= QEL_MSG_TYPE_DELIVERY_ACK) ||
         number == QEL_MSG_TYPE_UNSEAL || number == QEL_MSG_TYPE_VOIP_CALL_SETUP;
}

/** Whether the number is a qel_content_type_t. */
static inline bool qel_is_content_type(int number) {
  return number >= QEL_CONTENT_TYPE_TEXT && number <= QEL_CONTENT_TYPE_AUDIO;
}

/** An encoded message. */
typedef struct qel_buffer {
  unsigned char* data; /**< its first byte */
  int size;            /**< its length in bytes */
} qel_buffer_t;

/** Releases the message. */
static inline void qel_buffer_release(qel_buffer_t* buffer) {
  free(buffer->data);
  buffer->data = QEL_INTERNAL_NULL;
  buffer->size = 0;
}

/** @cond */

/* Before a call, texts and msgIds hold the address of their record. Afterwards it stands for "not
 * written", and NULL for "no memory". It is never freed; after an exception it may still be there.
 */
static inline void qel_internal_free(void* block, const void* record) {
  if (block != record) {
    free(block);
  }
}

/* Most replies have few lists, and no call of free() is made for the others. */
static inline void qel_internal_free_list(void* list) {
  if (list) {
    free(list);
  }
}

/* The address that stands for "not written". */
static inline char* qel_internal_unwritten(void* record) {
#ifdef __cplusplus
  return static_cast<char*>(record);
#else
  return record;
#endif
}

/* False if there was no memory for the text. One that was not written becomes NULL. */
static inline bool qel_internal_is_copied(char** text, const void* record) {
  if (*text == record) {
    *text = QEL_INTERNAL_NULL;
    return true;
  }
  return *text;
}

/** @endcond */

/** What all replies begin with. Some have nothing more. */
typedef struct qel_reply {
  int64_t requestId;  /**< the request that is answered */
  int64_t chatroomId; /**< its chatroom, 0 if the function hands out none */
  int resultCode;     /**< QEL_ABSENT if the reply has no result; a login's is 0 then, for which see
                           qel_channel_auth_reply_read() */
  char* resultMsg;    /**< the service's text, or NULL */
} qel_reply_t;

/** Releases the reply. */
static inline void qel_reply_release(qel_reply_t* reply) {
  qel_internal_free(reply->resultMsg, reply);
  memset(reply, 0, sizeof *reply);
}

/** @} */

/** @cond */

static inline bool qel_internal_has_bytes(const unsigned char* data, int size) {
  return data ? size >= 0 : size == 0;
}

/* The requestId is always written, if anything is. */
static inline qel_status_t qel_internal_read_status(int64_t request_id, bool had_memory) {
  if (request_id == QEL_ABSENT) {
    return QEL_UNREADABLE;
  }
  return had_memory ? QEL_OK : QEL_NO_MEMORY;
}

/* The reply must be zeroed. */
static inline void qel_internal_preset_reply(qel_reply_t* reply) {
  reply->requestId = QEL_ABSENT;
  reply->resultCode = QEL_ABSENT;
  reply->resultMsg = qel_internal_unwritten(reply);
}

static inline qel_status_t qel_internal_reply_status(qel_reply_t* reply, bool had_memory) {
  if (!qel_internal_is_copied(&reply->resultMsg, reply)) {
    had_memory = false;
  }
  return qel_internal_read_status(reply->requestId, had_memory);
}

/* Of a reply that has nothing more. */
static inline qel_status_t qel_internal_end_reply(qel_reply_t* reply) {
  const qel_status_t status = qel_internal_reply_status(reply, true);
  if (status != QEL_OK) {
    qel_reply_release(reply);
  }
  return status;
}

/* Of the functions that hand out a result, and of those that hand out its chatroom too. */
static inline qel_status_t qel_internal_read_result(
    void (*deserialize)(const unsigned char* data, int size, int64_t* requestId, int* resultCode,
                        char** resultMsg),
    qel_reply_t* reply, const unsigned char* data, int size) {
  qel_reply_release(reply);
  if (!qel_internal_has_bytes(data, size)) {
    return QEL_UNREADABLE;
  }
  qel_internal_preset_reply(reply);
  deserialize(data, size, &reply->requestId, &reply->resultCode, &reply->resultMsg);
  return qel_internal_end_reply(reply);
}
static inline qel_status_t qel_internal_read_chatroom_result(
    void (*deserialize)(const unsigned char* data, int size, int64_t* requestId,
                        int64_t* chatroomId, int* resultCode, char** resultMsg),
    qel_reply_t* reply, const unsigned char* data, int size) {
  qel_reply_release(reply);
  if (!qel_internal_has_bytes(data, size)) {
    return QEL_UNREADABLE;
  }
  qel_internal_preset_reply(reply);
  deserialize(data, size, &reply->requestId, &reply->chatroomId, &reply->resultCode,
              &reply->resultMsg);
  return qel_internal_end_reply(reply);
}

/* A refused argument leaves the size at 0; without memory it is the length. */
static inline qel_status_t qel_internal_write_status(int status, qel_buffer_t* buffer) {
  int size = 0;
  if (status == 0) {
    return QEL_OK;
  }
  size = buffer->size;
  buffer->size = 0;
  if (size == 0) {
    return QEL_BAD_ARGUMENT;
  }
  return size > 0 ? QEL_NO_MEMORY : QEL_TOO_LONG;
}

static inline bool qel_internal_is_list(const void* elements, int count) {
  return elements ? count >= 0 : count == 0;
}

/** @endcond */

/** @addtogroup qel_channel_auth
 *  @{ */

/**
 * Writes a ChannelAuthRequest. NULL is refused.
 *
 * @param requestId  the request's id. It must not be 0, as an empty reply reads as the answer to 0.
 *                   This is not checked.
 */
QEL_MUST_USE static inline qel_status_t qel_channel_auth_request_write(
    qel_buffer_t* buffer, int64_t requestId, int64_t userId, int64_t deviceId, const char* appId,
    const char* accessToken) {
  qel_buffer_release(buffer);
  if (!appId || !accessToken) {
    return QEL_BAD_ARGUMENT;
  }
  return qel_internal_write_status(
      channel_auth_request_serialize(requestId, userId, deviceId, appId, accessToken, &buffer->data,
                                     &buffer->size),
      buffer);
}

/**
 * Reads a ChannelAuthReply. Without a result its code is 0, like that of a success, so compare its
 * requestId with the request's. Only without a requestId and a text too, as empty bytes are, the
 * code is QEL_ABSENT. A text for which there was no memory reads as absent.
 */
QEL_MUST_USE static inline qel_status_t qel_channel_auth_reply_read(qel_reply_t* reply,
                                                                    const unsigned char* data,
                                                                    int size) {
  qel_reply_release(reply);
  if (!qel_internal_has_bytes(data, size)) {
    return QEL_UNREADABLE;
  }
  qel_internal_preset_reply(reply);
  channel_auth_reply_deserialize(data, size, &reply->requestId, &reply->resultCode,
                                 &reply->resultMsg);
  if (!reply->resultMsg) {
    reply->resultMsg = qel_internal_unwritten(reply); /* NULL stands for an absent text too */
    reply->resultCode = reply->requestId || reply->resultCode ? reply->resultCode : QEL_ABSENT;
  }
  return qel_internal_end_reply(reply);
}

/** @} */

/** @addtogroup qel_echo
 *  @{ */

/** Writes a ClientEchoReply. */
QEL_MUST_USE static inline qel_status_t qel_client_echo_reply_write(qel_buffer_t* buffer,
                                                                    int64_t requestId) {
  qel_buffer_release(buffer);
  return qel_internal_write_status(
      client_echo_reply_serialize(requestId, &buffer->data, &buffer->size), buffer);
}

/** A ClientEcho. */
typedef struct qel_client_echo {
  int64_t requestId; /**< the probe, for the answer */
} qel_client_echo_t;

/** Releases the probe. */
static inline void qel_client_echo_release(qel_client_echo_t* echo) {
  echo->requestId = 0;
}

/** Reads a ClientEcho. */
QEL_MUST_USE static inline qel_status_t qel_client_echo_read(qel_client_echo_t* echo,
                                                             const unsigned char* data, int size) {
  qel_status_t status = QEL_UNREADABLE;
  if (qel_internal_has_bytes(data, size)) {
    echo->requestId = QEL_ABSENT;
    client_echo_deserialize(data, size, &echo->requestId);
    status = qel_internal_read_status(echo->requestId, true);
  }
  if (status != QEL_OK) {
    qel_client_echo_release(echo);
  }
  return status;
}

/** @} */

/** @addtogroup qel_create_chatroom
 *  @{ */

/**
 * Writes a CreateChatroomRequest.
 *
 * @param chatType        a qel_chat_type_t; any other number is refused
 * @param receivers       the users to bring into it: receiversCount ids, in order. NULL is
 *                        refused, even if receiversCount is 0.
 * @param receiversCount  may be 0; a negative number is refused
 */
QEL_MUST_USE static inline qel_status_t qel_create_chatroom_request_write(
    qel_buffer_t* buffer, int64_t requestId, int chatType, const int64_t* receivers,
    int receiversCount, const char* chatroomTitle) {
  qel_buffer_release(buffer);
  if (!qel_is_chat_type(chatType) || receiversCount < 0) {
    return QEL_BAD_ARGUMENT;
  }
  return qel_internal_write_status(
      create_chatroom_request_serialize(requestId, chatType, receivers, receiversCount,
                                        chatroomTitle, &buffer->data, &buffer->size),
      buffer);
}

/** A CreateChatroomReply. */
typedef struct qel_create_chatroom_reply {
  qel_reply_t reply;                                 /**< chatroomId is the new chatroom */
  int msgTtl;                                        /**< lifetime of messages, or QEL_ABSENT */
  int64_t* invalidReceivers;                         /**< ids that are no receivers */
  int invalidReceiversCount;                         /**< how many are listed */
  int unlistedInvalidReceivers;                      /**< how many there are, but not listed */
  int64_t* disabledReceivers;                        /**< users who are disabled */
  int disabledReceiversCount;                        /**< how many */
  qel_message_didviolationuser_t* didViolationUsers; /**< pairs that are a DID violation */
  int didViolationUsersCount;                        /**< how many */
  int64_t* invitationDenied;                         /**< users who deny invitations */
  int invitationDeniedCount;                         /**< how many */
} qel_create_chatroom_reply_t;

/** Releases the reply. */
static inline void qel_create_chatroom_reply_release(qel_create_chatroom_reply_t* created) {
  qel_internal_free(created->reply.resultMsg, created);
  qel_internal_free_list(created->invalidReceivers);
  qel_internal_free_list(created->disabledReceivers);
  qel_internal_free_list(created->didViolationUsers);
  qel_internal_free_list(created->invitationDenied);
  memset(created, 0, sizeof *created);
}

/** Reads a CreateChatroomReply. */
QEL_MUST_USE static inline qel_status_t qel_create_chatroom_reply_read(
    qel_create_chatroom_reply_t* created, const unsigned char* data, int size) {
  qel_status_t status = QEL_UNREADABLE;
  qel_create_chatroom_reply_release(created);
  if (!qel_internal_has_bytes(data, size)) {
    return status;
  }
  qel_internal_preset_reply(&created->reply);
  created->msgTtl = QEL_ABSENT;
  create_chatroom_reply_deserialize(data, size, &created->reply.requestId,
                                    &created->reply.chatroomId, &created->msgTtl,
                                    &created->reply.resultCode, &created->reply.resultMsg,
                                    &created->invalidReceivers, &created->invalidReceiversCount,
                                    &created->disabledReceivers, &created->disabledReceiversCount,
                                    &created->didViolationUsers, &created->didViolationUsersCount,
                                    &created->invitationDenied, &created->invitationDeniedCount);
  if (!created->invalidReceivers) {
    created->unlistedInvalidReceivers = created->invalidReceiversCount;
    created->invalidReceiversCount = 0;
  }
  status = qel_internal_reply_status(&created->reply, true);
  if (status != QEL_OK) {
    qel_create_chatroom_reply_release(created);
  }
  return status;
}

/** @} */

/** @addtogroup qel_chat
 *  @{ */

/**
 * Writes a ChatRequest. There is no reserved here.
 *
 * @param msgType  a qel_msg_type_t; any other number is refused
 * @param chatMsg  at most 40000 bytes; it may be empty. More are refused, and so is NULL.
 */
QEL_MUST_USE static inline qel_status_t qel_chat_request_write(qel_buffer_t* buffer,
                                                               int64_t requestId,
                                                               int64_t chatroomId, int64_t msgId,
                                                               int msgType, const char* chatMsg,
                                                               int msgTtl) {
  qel_buffer_release(buffer);
  if (!qel_is_msg_type(msgType)) {
    return QEL_BAD_ARGUMENT;
  }
  return qel_internal_write_status(
      chat_request_serialize(requestId, chatroomId, msgId, msgType, chatMsg, msgTtl, 0,
                             &buffer->data, &buffer->size),
      buffer);
}

/** A ChatReply. */
typedef struct qel_chat_reply {
  qel_reply_t reply;  /**< the result */
  int count;          /**< the number of processed messages */
  int64_t* msgIds;    /**< their ids */
  int64_t* sentTimes; /**< when the service recorded each, in the order of msgIds */
} qel_chat_reply_t;

/** Releases the reply. */
static inline void qel_chat_reply_release(qel_chat_reply_t* chat) {
  qel_internal_free(chat->reply.resultMsg, chat);
  qel_internal_free(chat->msgIds, chat);
  free(chat->sentTimes);
  memset(chat, 0, sizeof *chat);
}

/** Reads a ChatReply. */
QEL_MUST_USE static inline qel_status_t qel_chat_reply_read(qel_chat_reply_t* chat,
                                                            const unsigned char* data, int size) {
  qel_status_t status = QEL_UNREADABLE;
  bool had_memory = true;
  qel_chat_reply_release(chat);
  if (!qel_internal_has_bytes(data, size)) {
    return status;
  }
  qel_internal_preset_reply(&chat->reply);
  chat->msgIds = &chat->reply.requestId;
  chat_reply_deserialize(data, size, &chat->reply.requestId, &chat->reply.chatroomId,
                         &chat->reply.resultCode, &chat->reply.resultMsg, &chat->count,
                         &chat->msgIds, &chat->sentTimes);
  if (chat->msgIds == &chat->reply.requestId) {
    chat->msgIds = QEL_INTERNAL_NULL;
  } else {
    had_memory = chat->count > 0; /* it is 0 without memory for one of the arrays */
  }
  status = qel_internal_reply_status(&chat->reply, had_memory);
  if (status != QEL_OK) {
    qel_chat_reply_release(chat);
  }
  return status;
}

/** @} */

/** @addtogroup qel_allow_chat
 *  @{ */

/** Writes an AllowChatRequest. */
QEL_MUST_USE static inline qel_status_t qel_allow_chat_request_write(
    qel_buffer_t* buffer, int64_t requestId, int64_t chatroomId, const bool* isAutoAllow,
    int maxCount, bool needDeliveryAck, int64_t lastDeliveryAckTimestamp, bool needReadAck,
    int64_t lastReadAckTimestamp, bool needOrderedChatroomMemberList, bool needChatroomMeta) {
  qel_buffer_release(buffer);
  return qel_internal_write_status(
      allow_chat_request_serialize(requestId, chatroomId, isAutoAllow, maxCount, needDeliveryAck,
                                   lastDeliveryAckTimestamp, needReadAck, lastReadAckTimestamp,
                                   needOrderedChatroomMemberList, needChatroomMeta, &buffer->data,
                                   &buffer->size),
      buffer);
}

/** An AllowChatReply. */
typedef struct qel_allow_chat_reply {
  qel_reply_t reply;                                 /**< the result */
  qel_message_watermarkentry_t** deliveryAckEntries; /**< who has received up to which message */
  int deliveryAckCount;                              /**< how many */
  int64_t lastDeliveryAckTimestamp;                  /**< QEL_ABSENT if the reply has none */
  qel_message_watermarkentry_t** readAckEntries;     /**< who has read up to which message */
  int readAckCount;                                  /**< how many */
  int64_t lastReadAckTimestamp;                      /**< QEL_ABSENT if the reply has none */
  qel_message_chatroommember_t** members;            /**< in the service's order */
  int memberCount;                                   /**< how many */
  char* title;                                       /**< the chatroom's, or NULL */
  int msgTtl;                                        /**< lifetime of messages, or QEL_ABSENT */
} qel_allow_chat_reply_t;

/** @cond */
static inline void qel_internal_release_marks(qel_message_watermarkentry_t** marks, int count) {
  int i = 0;
  for (i = 0; marks && i < count; ++i) {
    free(marks[i]);
  }
  free(marks);
}
/** @endcond */

/** Releases the reply. */
static inline void qel_allow_chat_reply_release(qel_allow_chat_reply_t* room) {
  int i = 0;
  qel_internal_free(room->reply.resultMsg, room);
  qel_internal_release_marks(room->deliveryAckEntries, room->deliveryAckCount);
  qel_internal_release_marks(room->readAckEntries, room->readAckCount);
  for (i = 0; room->members && i < room->memberCount; ++i) {
    if (room->members[i]) {
      free(room->members[i]->name);
      free(room->members[i]);
    }
  }
  free(room->members);
  qel_internal_free(room->title, room);
  memset(room, 0, sizeof *room);
}

/** Reads an AllowChatReply. A member's name is never NULL. */
QEL_MUST_USE static inline qel_status_t qel_allow_chat_reply_read(qel_allow_chat_reply_t* room,
                                                                  const unsigned char* data,
                                                                  int size) {
  qel_status_t status = QEL_UNREADABLE;
  bool had_memory = true;
  int i = 0;
  qel_allow_chat_reply_release(room);
  if (!qel_internal_has_bytes(data, size)) {
    return status;
  }
  qel_internal_preset_reply(&room->reply);
  room->lastDeliveryAckTimestamp = QEL_ABSENT;
  room->lastReadAckTimestamp = QEL_ABSENT;
  room->title = qel_internal_unwritten(room);
  room->msgTtl = QEL_ABSENT;
  allow_chat_reply_deserialize(
      data, size, &room->reply.requestId, &room->reply.chatroomId, &room->reply.resultCode,
      &room->reply.resultMsg, &room->deliveryAckEntries, &room->deliveryAckCount,
      &room->lastDeliveryAckTimestamp, &room->readAckEntries, &room->readAckCount,
      &room->lastReadAckTimestamp, &room->members, &room->memberCount, &room->title, &room->msgTtl);
  had_memory = qel_internal_is_copied(&room->title, room);
  for (i = 0; i < room->memberCount; ++i) {
    had_memory = had_memory && room->members[i]->name;
  }
  status = qel_internal_reply_status(&room->reply, had_memory);
  if (status != QEL_OK) {
    qel_allow_chat_reply_release(room);
  }
  return status;
}

/** @} */

/** @addtogroup qel_unread
 *  @{ */

/** Writes a GetAllUnreadMessageRequest. */
QEL_MUST_USE static inline qel_status_t qel_get_all_unread_message_request_write(
    qel_buffer_t* buffer, int64_t requestId, const int* maxCount) {
  qel_buffer_release(buffer);
  return qel_internal_write_status(
      get_all_unread_message_request_serialize(requestId, maxCount, &buffer->data, &buffer->size),
      buffer);
}

/** Reads a GetAllUnreadMessageReply. */
QEL_MUST_USE static inline qel_status_t qel_get_all_unread_message_reply_read(
    qel_reply_t* reply, const unsigned char* data, int size) {
  return qel_internal_read_result(get_all_unread_message_reply_deserialize, reply, data, size);
}

/** @} */

/** @addtogroup qel_online_push
 *  @{ */

/** Writes a ForwardOnlineMessageReply. */
QEL_MUST_USE static inline qel_status_t qel_forward_online_message_reply_write(
    qel_buffer_t* buffer, int64_t requestId, int64_t chatroomId, const bool* markAsRead) {
  qel_buffer_release(buffer);
  return qel_internal_write_status(
      forward_online_message_reply_serialize(requestId, chatroomId, markAsRead, &buffer->data,
                                             &buffer->size),
      buffer);
}

/** A ForwardOnlineMessage. */
typedef struct qel_forward_online_message_get {
  int64_t requestId;                   /**< the push, for the acknowledgement */
  int64_t chatroomId;                  /**< the message's chatroom */
  int chatType;                        /**< a qel_chat_type_t */
  qel_message_inboxentry_t inboxEntry; /**< the message, with its chatroomId and chatType */
  bool skipReply;                      /**< whether to send no acknowledgement */
} qel_forward_online_message_get_t;

/** Releases the push. */
static inline void qel_forward_online_message_get_release(qel_forward_online_message_get_t* push) {
  free(push->inboxEntry.chatMsg);
  memset(push, 0, sizeof *push);
}

/** Reads a ForwardOnlineMessage. Its chatMsg is never NULL. */
QEL_MUST_USE static inline qel_status_t qel_forward_online_message_get_read(
    qel_forward_online_message_get_t* push, const unsigned char* data, int size) {
  qel_message_inboxentry_t* entry = &push->inboxEntry;
  int error_code = 0;
  char* error_msg = QEL_INTERNAL_NULL;
  qel_status_t status = QEL_UNREADABLE;
  qel_forward_online_message_get_release(push);
  if (!qel_internal_has_bytes(data, size)) {
    return status;
  }
  push->requestId = QEL_ABSENT;
  forward_online_message_get_deserialize(data, size, &push->requestId, &push->chatroomId,
                                         &push->chatType, &entry, &push->skipReply, &error_code,
                                         &error_msg);
  entry->chatroomId = push->chatroomId;
  entry->chatType = push->chatType;
  status = qel_internal_read_status(push->requestId, entry->chatMsg);
  if (status != QEL_OK) {
    qel_forward_online_message_get_release(push);
  }
  return status;
}

/** @} */

/** @addtogroup qel_unread_push
 *  @{ */

/**
 * Writes a ForwardUnreadMessageReply.
 *
 * @param nextPaginationKey  the key itself that came with the page; with NULL no key is sent
 */
QEL_MUST_USE static inline qel_status_t qel_forward_unread_message_reply_write(
    qel_buffer_t* buffer, int64_t requestId, const char* nextPaginationKey, const int* maxCount) {
  qel_buffer_release(buffer);
  return qel_internal_write_status(
      forward_unread_message_reply_serialize(requestId, &nextPaginationKey, maxCount, &buffer->data,
                                             &buffer->size),
      buffer);
}

/** A ForwardUnreadMessage. */
typedef struct qel_forward_unread_message {
  int64_t requestId;                       /**< the push, for the acknowledgement */
  qel_message_inboxentry_t** inboxEntries; /**< the messages of the page */
  int count;                               /**< how many */
  char* nextPaginationKey;                 /**< of the page that follows, or NULL */
} qel_forward_unread_message_t;

/** Releases the page. */
static inline void qel_forward_unread_message_release(qel_forward_unread_message_t* page) {
  int i = 0;
  for (i = 0; page->inboxEntries && i < page->count; ++i) {
    if (page->inboxEntries[i]) {
      free(page->inboxEntries[i]->chatMsg);
      free(page->inboxEntries[i]);
    }
  }
  free(page->inboxEntries);
  qel_internal_free(page->nextPaginationKey, page);
  memset(page, 0, sizeof *page);
}

/** Reads a ForwardUnreadMessage. A chatMsg is never NULL. */
QEL_MUST_USE static inline qel_status_t qel_forward_unread_message_read(
    qel_forward_unread_message_t* page, const unsigned char* data, int size) {
  qel_status_t status = QEL_UNREADABLE;
  bool had_memory = true;
  int i = 0;
  qel_forward_unread_message_release(page);
  if (!qel_internal_has_bytes(data, size)) {
    return status;
  }
  page->requestId = QEL_ABSENT;
  page->nextPaginationKey = qel_internal_unwritten(page);
  forward_unread_message_deserialize(data, size, &page->requestId, &page->inboxEntries,
                                     &page->count, &page->nextPaginationKey);
  had_memory = qel_internal_is_copied(&page->nextPaginationKey, page);
  if (!page->inboxEntries && page->count > 0) {
    page->count = 0;
    had_memory = false;
  }
  for (i = 0; i < page->count; ++i) {
    had_memory = had_memory && page->inboxEntries[i]->chatMsg;
  }
  status = qel_internal_read_status(page->requestId, had_memory);
  if (status != QEL_OK) {
    qel_forward_unread_message_release(page);
  }
  return status;
}

/** @} */

/** @addtogroup qel_read_message
 *  @{ */

/**
 * Writes a ReadMessageRequest.
 *
 * @param inboxEntry  the message; may be NULL, the request names none then. Of the record only
 *                    msgId, msgType, sender and sentTime are sent. A msgType that is no
 *                    qel_msg_type_t is refused.
 */
QEL_MUST_USE static inline qel_status_t qel_read_message_request_write(
    qel_buffer_t* buffer, int64_t requestId, int64_t chatroomId,
    const qel_message_inboxentry_t* inboxEntry) {
  qel_buffer_release(buffer);
  if (inboxEntry && !qel_is_msg_type(inboxEntry->msgType)) {
    return QEL_BAD_ARGUMENT;
  }
  return qel_internal_write_status(read_message_request_serialize(requestId, chatroomId, inboxEntry,
                                                                  &buffer->data, &buffer->size),
                                   buffer);
}

/** Reads a ReadMessageReply. */
QEL_MUST_USE static inline qel_status_t qel_read_message_reply_read(qel_reply_t* reply,
                                                                    const unsigned char* data,
                                                                    int size) {
  return qel_internal_read_chatroom_result(read_message_reply_deserialize, reply, data, size);
}

/** @} */

/** @addtogroup qel_end_chat
 *  @{ */

/**
 * Writes an EndChatRequest.
 *
 * @param entries  count records, in order; may be NULL if count is 0
 * @param count    may be 0; a negative number is refused
 */
QEL_MUST_USE static inline qel_status_t qel_end_chat_request_write(
    qel_buffer_t* buffer, int64_t requestId, const qel_message_endchatentry_t* entries, int count) {
  qel_buffer_release(buffer);
  if (!qel_internal_is_list(entries, count)) {
    return QEL_BAD_ARGUMENT;
  }
  return qel_internal_write_status(
      end_chat_request_serialize(requestId, entries, count, &buffer->data, &buffer->size), buffer);
}

/** Reads an EndChatReply. */
QEL_MUST_USE static inline qel_status_t qel_end_chat_reply_read(qel_reply_t* reply,
                                                                const unsigned char* data,
                                                                int size) {
  return qel_internal_read_result(end_chat_reply_deserialize, reply, data, size);
}

/** @} */

/** @addtogroup qel_invite
 *  @{ */

/**
 * Writes an InviteRequest.
 *
 * @param invitingMembers       the users to invite: invitingMembersCount ids, in order; may be NULL
 *                              if the count is 0
 * @param invitingMembersCount  the count itself; may be 0; a negative number is refused
 */
QEL_MUST_USE static inline qel_status_t qel_invite_chat_request_write(
    qel_buffer_t* buffer, int64_t requestId, int64_t chatroomId, const int64_t* invitingMembers,
    int invitingMembersCount) {
  qel_buffer_release(buffer);
  if (!qel_internal_is_list(invitingMembers, invitingMembersCount)) {
    return QEL_BAD_ARGUMENT;
  }
  return qel_internal_write_status(
      invite_chat_request_serialize(requestId, chatroomId, invitingMembers, &invitingMembersCount,
                                    &buffer->data, &buffer->size),
      buffer);
}

/** An InviteReply. */
typedef struct qel_invite_reply {
  qel_reply_t reply;                                 /**< the result */
  int64_t sentTime;                                  /**< of the invitations, or QEL_ABSENT */
  int64_t* invalidReceivers;                         /**< ids that are no receivers */
  int invalidReceiversCount;                         /**< how many */
  int64_t* interruptedReceivers;                     /**< users who are interrupted */
  int interruptedReceiversCount;                     /**< how many */
  int64_t* disabledReceivers;                        /**< users who are disabled */
  int disabledReceiversCount;                        /**< how many */
  int64_t* existingChatmembers;                      /**< users who are members already */
  int existingChatmembersCount;                      /**< how many */
  qel_message_didviolationuser_t* didViolationUsers; /**< pairs that are a DID violation */
  int didViolationUsersCount;                        /**< how many */
  int64_t* invitationDenied;                         /**< users who deny invitations */
  int invitationDeniedCount;                         /**< how many */
} qel_invite_reply_t;

/** Releases the reply. */
static inline void qel_invite_reply_release(qel_invite_reply_t* invited) {
  qel_internal_free(invited->reply.resultMsg, invited);
  qel_internal_free_list(invited->invalidReceivers);
  qel_internal_free_list(invited->interruptedReceivers);
  qel_internal_free_list(invited->disabledReceivers);
  qel_internal_free_list(invited->existingChatmembers);
  qel_internal_free_list(invited->didViolationUsers);
  qel_internal_free_list(invited->invitationDenied);
  memset(invited, 0, sizeof *invited);
}

/** Reads an InviteReply. */
QEL_MUST_USE static inline qel_status_t qel_invite_reply_read(qel_invite_reply_t* invited,
                                                              const unsigned char* data, int size) {
  qel_status_t status = QEL_UNREADABLE;
  qel_invite_reply_release(invited);
  if (!qel_internal_has_bytes(data, size)) {
    return status;
  }
  qel_internal_preset_reply(&invited->reply);
  invited->sentTime = QEL_ABSENT;
  invite_reply_deserialize(data, size, &invited->reply.requestId, &invited->reply.chatroomId,
                           &invited->sentTime, &invited->reply.resultCode,
                           &invited->reply.resultMsg, &invited->invalidReceivers,
                           &invited->invalidReceiversCount, &invited->interruptedReceivers,
                           &invited->interruptedReceiversCount, &invited->disabledReceivers,
                           &invited->disabledReceiversCount, &invited->existingChatmembers,
                           &invited->existingChatmembersCount, &invited->didViolationUsers,
                           &invited->didViolationUsersCount, &invited->invitationDenied,
                           &invited->invitationDeniedCount);
  status = qel_internal_reply_status(&invited->reply, true);
  if (status != QEL_OK) {
    qel_invite_reply_release(invited);
  }
  return status;
}

/** @} */

/** @addtogroup qel_current_time
 *  @{ */

/** Writes a CurrentTimeRequest. */
QEL_MUST_USE static inline qel_status_t qel_current_time_request_write(qel_buffer_t* buffer,
                                                                       int64_t requestId) {
  qel_buffer_release(buffer);
  return qel_internal_write_status(
      current_time_request_serialize(requestId, &buffer->data, &buffer->size), buffer);
}

/** A CurrentTimeReply. */
typedef struct qel_current_time {
  qel_reply_t reply;         /**< the result */
  int64_t currentTimeMillis; /**< the service's clock, or QEL_ABSENT */
} qel_current_time_t;

/** Releases the reply. */
static inline void qel_current_time_release(qel_current_time_t* now) {
  qel_reply_release(&now->reply);
  now->currentTimeMillis = 0;
}

/** Reads a CurrentTimeReply. */
QEL_MUST_USE static inline qel_status_t qel_current_time_read(qel_current_time_t* now,
                                                              const unsigned char* data, int size) {
  qel_status_t status = QEL_UNREADABLE;
  qel_current_time_release(now);
  if (!qel_internal_has_bytes(data, size)) {
    return status;
  }
  qel_internal_preset_reply(&now->reply);
  current_time_deserialize(data, size, &now->reply.requestId, &now->currentTimeMillis,
                           &now->reply.resultCode, &now->reply.resultMsg);
  if (now->currentTimeMillis == -1) { /* which stands for an absent one */
    now->currentTimeMillis = QEL_ABSENT;
  }
  status = qel_internal_reply_status(&now->reply, true);
  if (status != QEL_OK) {
    qel_current_time_release(now);
  }
  return status;
}

/** @} */

/** @addtogroup qel_unseal
 *  @{ */

/** Writes an UnsealMessageRequest. */
QEL_MUST_USE static inline qel_status_t qel_unseal_message_request_write(
    qel_buffer_t* buffer, int64_t requestId, int64_t chatroomId, int64_t sender, int64_t msgId,
    const char* msgDetail) {
  qel_buffer_release(buffer);
  return qel_internal_write_status(
      unseal_message_request_serialize(requestId, chatroomId, sender, msgId, msgDetail,
                                       &buffer->data, &buffer->size),
      buffer);
}

/** Reads an UnsealMessageReply. */
QEL_MUST_USE static inline qel_status_t qel_unseal_message_reply_read(qel_reply_t* reply,
                                                                      const unsigned char* data,
                                                                      int size) {
  return qel_internal_read_chatroom_result(unseal_message_reply_deserialize, reply, data, size);
}

/** @} */

/** @addtogroup qel_call_log
 *  @{ */

/** Writes a SaveCallLogRequest. NULL is refused. */
QEL_MUST_USE static inline qel_status_t qel_save_call_log_request_write(
    qel_buffer_t* buffer, int64_t requestId, int64_t chatroomId, const char* callId,
    const char* callLogType, int64_t sender, int64_t receiver, int conversationSeconds) {
  qel_buffer_release(buffer);
  if (!callId || !callLogType) {
    return QEL_BAD_ARGUMENT;
  }
  return qel_internal_write_status(
      save_call_log_request_serialize(requestId, chatroomId, callId, callLogType, sender, receiver,
                                      conversationSeconds, &buffer->data, &buffer->size),
      buffer);
}

/** Reads a SaveCallLogReply. */
QEL_MUST_USE static inline qel_status_t qel_save_call_log_reply_read(qel_reply_t* reply,
                                                                     const unsigned char* data,
                                                                     int size) {
  return qel_internal_read_result(save_call_log_reply_deserialize, reply, data, size);
}

/** @} */

/** @addtogroup qel_typing
 *  @{ */

/**
 * Writes an IsTyping.
 *
 * @param contentType  may be NULL, else points to a qel_content_type_t; any other number is refused
 */
QEL_MUST_USE static inline qel_status_t qel_is_typing_request_write(
    qel_buffer_t* buffer, int64_t requestId, int64_t chatroomId, const char* state,
    const int* contentType, const int* refresh) {
  qel_buffer_release(buffer);
  if (contentType && !qel_is_content_type(*contentType)) {
    return QEL_BAD_ARGUMENT;
  }
  is_typing_request_serialize(requestId, chatroomId, state, contentType, refresh, &buffer->data,
                              &buffer->size);
  return qel_internal_write_status(buffer->data ? 0 : -1, buffer);
}

/** A TypingUpdated. */
typedef struct qel_typing_updated {
  int64_t requestId;  /**< the push */
  int64_t chatroomId; /**< the chatroom */
  int64_t sender;     /**< who types, or QEL_ABSENT */
  char* state;        /**< a word that client and service agree on, or NULL */
  int contentType;    /**< a qel_content_type_t, or QEL_ABSENT */
  int refresh;        /**< QEL_ABSENT if the message has none */
} qel_typing_updated_t;

/** Releases the push. */
static inline void qel_typing_updated_release(qel_typing_updated_t* typing) {
  qel_internal_free(typing->state, typing);
  memset(typing, 0, sizeof *typing);
}

/** Reads a TypingUpdated. */
QEL_MUST_USE static inline qel_status_t qel_typing_updated_read(qel_typing_updated_t* typing,
                                                                const unsigned char* data,
                                                                int size) {
  qel_status_t status = QEL_UNREADABLE;
  qel_typing_updated_release(typing);
  if (!qel_internal_has_bytes(data, size)) {
    return status;
  }
  typing->requestId = QEL_ABSENT;
  typing->sender = QEL_ABSENT;
  typing->state = qel_internal_unwritten(typing);
  typing->contentType = QEL_ABSENT;
  typing->refresh = QEL_ABSENT;
  typing_updated_deserialize(data, size, &typing->requestId, &typing->chatroomId, &typing->sender,
                             &typing->state, &typing->contentType, &typing->refresh);
  status =
      qel_internal_read_status(typing->requestId, qel_internal_is_copied(&typing->state, typing));
  if (status != QEL_OK) {
    qel_typing_updated_release(typing);
  }
  return status;
}

/** @} */

/** @addtogroup qel_chatroom_meta
 *  @{ */

/** Writes a ChangeChatroomMetaRequest: the title, or else the lifetime. One is required. */
QEL_MUST_USE static inline qel_status_t qel_change_chatroom_meta_request_write(qel_buffer_t* buffer,
                                                                               int64_t requestId,
                                                                               int64_t chatroomId,
                                                                               const char* title,
                                                                               const int* msgTtl) {
  qel_buffer_release(buffer);
  return qel_internal_write_status(
      change_chatroom_meta_request_serialize(requestId, chatroomId, title, msgTtl, &buffer->data,
                                             &buffer->size),
      buffer);
}

/** Reads a ChangeChatroomMetaReply. */
QEL_MUST_USE static inline qel_status_t qel_change_chatroom_meta_reply_read(
    qel_reply_t* reply, const unsigned char* data, int size) {
  return qel_internal_read_chatroom_result(change_chatroom_meta_reply_deserialize, reply, data,
                                           size);
}

/** @} */

#ifdef __cplusplus
}
#endif

#endif
