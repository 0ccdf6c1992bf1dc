/**
 * @file
 * @brief The wire protocol of the chat service, for the message plug-in.
 *
 * For each exchange that the plug-in takes part in, a ..._serialize function turns arguments into
 * the bytes of one protocol message, and a ..._deserialize function turns received bytes into
 * outputs. What follows holds for all functions. The notes at a function say only what is different
 * there.
 *
 * @par Transport
 * The library opens no connection. The caller sends and receives the buffers, with any framing
 * around them, and finds the request of a reply by its requestId. The transport must carry the kind
 * of each message: the bytes do not say it, and many functions succeed with those of another kind.
 *
 * @par Types
 * Identifiers and times are int64_t; times are in milliseconds. 32-bit values, counts and lengths
 * are int. Received bytes are data, and size is their number. A bool that the caller passes is
 * false if its byte is 0, and true otherwise. Text is UTF-8 and NUL-terminated; its length is in
 * bytes. Text that is not UTF-8 passes through unchanged, and the protocol runtime writes a line
 * about it on standard error.
 *
 * @par
 * The service defines what result codes mean, the unit of lifetimes (msgTtl), and the moment from
 * which times count.
 *
 * @par Serializers
 * They return 0, or -1 after one error line in the log. The last two arguments receive the encoded
 * message: a pointer to its first byte, and its length. The buffer has exactly that length, without
 * a terminating NUL or a length prefix; release it with free(). A failed check of an argument
 * leaves both outputs as they were. If the buffer cannot be allocated, *size holds the length and
 * *serialized_data is NULL. If the length is below 1, *size holds it and *serialized_data is as it
 * was; this happens to messages of more than 2 GiB, whose length overflows.
 *
 * @par
 * What is passed by value is always sent, 0 included. A number or a bool that is passed by pointer
 * is optional: NULL leaves the field out. A text is required unless the function says that it may
 * be NULL; the empty text "" is sent. A message's userId and deviceId stay unset unless the
 * function takes them.
 *
 * @par Deserializers
 * They return nothing. An output is written only if the bytes could be parsed to their end.
 * Otherwise every output keeps what the caller left in it, and the log has the reason. To notice a
 * failure, set an output before the call to a value that the service never sends. A field that is
 * absent from the message reads as 0 unless the function says otherwise. Empty input (size 0) is a
 * valid message without fields. A message that was cut between two fields is valid too: only the
 * transport can tell that a message is whole. Input of more than 64 MiB (67108864 bytes) or of more
 * than 100 nested levels fails.
 *
 * @par
 * Strings, arrays and records that are written belong to the caller; release each with free(). A
 * string ends at the first NUL of the received text. If there is no memory for a string, the output
 * is NULL. If there is none for an array or a record, the call faults unless the function says
 * otherwise.
 *
 * @par Lists
 * A list is an array and its count. The count is written even if it is 0. The array is written only
 * if it has elements, so set it to NULL before the call.
 *
 * @par Results
 * The result of a reply is written to *resultCode and *resultMsg. Unless the function says
 * otherwise, either pointer may be NULL, *resultCode is written only if the reply has a result, and
 * *resultMsg only if that result has a text. So set both before the call.
 *
 * @par Pointers
 * No pointer may be NULL unless these notes say so. The others are not tested: the call faults when
 * it reads or writes through NULL.
 *
 * @par Memory
 * Each call of a deserializer leaves one small block (its input stream) allocated for good, unless
 * the function says that it is released. So a process grows with each message that it receives.
 *
 * @par Enumerations
 * An argument that is no member of its enumeration ends the process with an assertion failure
 * (SIGABRT), unless the function says that it checks the range. A received number that is no member
 * reads as if the field were absent. So a message whose type is newer than this library has the
 * msgType 0 and cannot be told from a TEXT. qel-message.h has names of the members.
 *
 * @par Exceptions
 * C++ exceptions of the protocol runtime are not caught, for example std::bad_alloc while a text is
 * copied. If the caller is written in C, they end the process.
 *
 * @par Threads
 * Any thread may call any function at any time.
 *
 * @par Log
 * Each call logs its entry, its exit and its failures through __dlog_print, with the tag
 * MESSAGE_PLUGIN and the calling thread's id. A line at error level is not always a failure. The
 * access token is never logged.
 */
#ifndef QEL_MESSAGE_SERIALIZE_H
#define QEL_MESSAGE_SERIALIZE_H

#include <stdbool.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/** @defgroup qel_records Records
 *  @{ */

/** Two users whose combination the service refuses. An id that the service left out is 0. */
typedef struct qel_message_didviolationuser_t {
  int64_t userA; /**< one of the two */
  int64_t userB; /**< the other */
} qel_message_didviolationuser_t;

/** The last message that a member of a chatroom has acknowledged, as read or as delivered. */
typedef struct qel_message_watermarkentry_t {
  int64_t userId;    /**< the member */
  int64_t msgId;     /**< the message */
  int64_t timestamp; /**< when the member acknowledged it */
} qel_message_watermarkentry_t;

/** A member of a chatroom. */
typedef struct qel_message_chatroommember_t {
  int64_t userId;    /**< the member */
  int64_t available; /**< 1 or 0 */
  char* name;        /**< the member's name, "" if there is none */
} qel_message_chatroommember_t;

/** A message in the inbox. */
typedef struct qel_message_inboxentry_t {
  int64_t msgId;      /**< the message */
  int32_t msgType;    /**< a MsgType; a received TEXT may be of a type unknown here */
  int64_t sender;     /**< who sent it */
  int64_t receiver;   /**< whom it is for */
  int64_t sentTime;   /**< when it was sent */
  char* chatMsg;      /**< the text; in a received message "" if there is none */
  int64_t chatroomId; /**< the message's chatroom */
  int32_t chatType;   /**< a ChatType */
  int32_t msgTtl;     /**< the message's lifetime */
} qel_message_inboxentry_t;

/** A chat to end. */
typedef struct qel_message_endchatentry_t {
  int64_t chatroomId;  /**< the chatroom */
  bool denyInvitation; /**< whether to refuse further invitations into it */
} qel_message_endchatentry_t;

/** @} */

/** @defgroup qel_stored Stored messages: placeholders
 *  @{ */

/**
 * Does nothing at all: no message, no output, no log line. Any pointer may be NULL.
 *
 * @param requestId,nextPaginationKey,maxCount,serialized_data,size  ignored
 */
void forward_stored_message_reply_serialize(int64_t requestId, const char** nextPaginationKey,
                                            const int* maxCount, unsigned char** serialized_data,
                                            int* size);

/**
 * Does nothing at all: no message, no output, no log line. Any pointer may be NULL.
 *
 * @param data,size,requestId,inboxEntries,count,nextPaginationKey  ignored
 */
void forward_stored_message_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                        qel_message_inboxentry_t*** inboxEntries, int* count,
                                        char** nextPaginationKey);

/** @} */

/** @defgroup qel_channel_auth Channel authentication
 *  @{ */

/**
 * ChannelAuthRequest: authenticates the channel after connecting.
 *
 * @param requestId             the request's id
 * @param userId,deviceId       the user, and the user's device
 * @param appId                 the calling application
 * @param accessToken           the user's credential
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int channel_auth_request_serialize(int64_t requestId, int64_t userId, int64_t deviceId,
                                   const char* appId, const char* accessToken,
                                   unsigned char** serialized_data, int* size);

/**
 * ChannelAuthReply. All three outputs are written on success, and none of the pointers may be
 * NULL. Without a result *resultCode is 0, and without a text *resultMsg is NULL. So empty bytes
 * and most other messages read as a reply with the code 0. Check the message's kind, compare
 * *requestId with the request's id, and give no request the id 0.
 *
 * @param data,size             the received bytes
 * @param requestId             the id of the request that is answered
 * @param resultCode,resultMsg  the result
 *
 * Logs no exit line. The input stream is released on success and kept on failure.
 */
void channel_auth_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                    int* resultCode, char** resultMsg);

/** @} */

/** @defgroup qel_echo Echo: the service probes, the client answers
 *  @{ */

/**
 * ClientEchoReply.
 *
 * @param requestId             the id of the ClientEcho that is answered
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int client_echo_reply_serialize(int64_t requestId, unsigned char** serialized_data, int* size);

/**
 * ClientEcho. The input stream is released on success and kept on failure.
 *
 * @param data,size  the received bytes
 * @param requestId  the probe's id, for the answer
 */
void client_echo_deserialize(const unsigned char* data, int size, int64_t* requestId);

/** @} */

/** @defgroup qel_create_chatroom Creating a chatroom
 *  @{ */

/**
 * CreateChatroomRequest.
 *
 * @param requestId             the request's id
 * @param chatType              a ChatType; any other value ends the process
 * @param receivers             the users to bring into it: receiversCount ids, in order. With NULL
 *                              the call fails, whatever receiversCount is.
 * @param receiversCount        0 or less sends no receivers
 * @param chatroomTitle         may be NULL; no title is sent then
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int create_chatroom_request_serialize(int64_t requestId, int chatType, const int64_t* receivers,
                                      int receiversCount, const char* chatroomTitle,
                                      unsigned char** serialized_data, int* size);

/**
 * CreateChatroomReply: the new chatroom, and the receivers whom the service refused.
 *
 * @param data,size             the received bytes
 * @param requestId             the id of the request that is answered
 * @param chatroomId            the new chatroom
 * @param msgTtl                the lifetime of its messages. Not written if the reply has none.
 * @param resultCode,resultMsg  the result. resultCode must not be NULL if the result carries
 *                              details of refused receivers: whether they are written depends on
 *                              the code, which is read through this pointer.
 *
 * The details are four lists. They are written, counts included, only if the reply carries details
 * and its code is 1000, 1001 or 3009:
 *
 * @param invalidReceivers,invalidReceiversCount    ids that are no receivers. With the codes 1000
 *                                                  and 3009 only their count is written.
 * @param disabledReceivers,disabledReceiversCount  users who are disabled
 * @param didViolationUsers,didViolationUsersCount  pairs of users that are a DID violation
 * @param invitationDenied,invitationDeniedCount    users who deny invitations
 */
void create_chatroom_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                       int64_t* chatroomId, int* msgTtl, int* resultCode,
                                       char** resultMsg, int64_t** invalidReceivers,
                                       int* invalidReceiversCount, int64_t** disabledReceivers,
                                       int* disabledReceiversCount,
                                       qel_message_didviolationuser_t** didViolationUsers,
                                       int* didViolationUsersCount, int64_t** invitationDenied,
                                       int* invitationDeniedCount);

/** @} */

/** @defgroup qel_chat Sending chat messages
 *  @{ */

/**
 * ChatRequest: sends one message into a chatroom.
 *
 * @param requestId             the request's id
 * @param chatroomId            the chatroom
 * @param msgId                 the caller's id of the message; the reply confirms it by this id
 * @param msgType               a MsgType: 0 to 6, 10 or 30. Below 0 or above 30 the call fails; 7,
 *                              8, 9 and 11 to 29 end the process.
 * @param chatMsg               at most 40000 bytes; it may be empty. With more, or with NULL, the
 *                              call fails. msgType is checked before it.
 * @param msgTtl                the message's lifetime
 * @param reserved              ignored
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int chat_request_serialize(int64_t requestId, int64_t chatroomId, int64_t msgId, int msgType,
                           const char* chatMsg, int msgTtl, int reserved,
                           unsigned char** serialized_data, int* size);

/**
 * ChatReply: the result, and the messages that the service processed.
 *
 * @param data,size             the received bytes
 * @param requestId,chatroomId  the id of the request that is answered, and its chatroom; both may
 *                              be NULL
 * @param resultCode,resultMsg  the result
 * @param count                 the number of processed messages, 0 if there are none
 * @param msgIds,sentTimes      two arrays of *count elements: each message's id, and the time at
 *                              which the service recorded it (0 where absent). Not written if there
 *                              are no messages. If there are any, neither pointer may be NULL.
 *
 * If an array cannot be allocated, *count is 0, the outputs before it have been written, and no
 * exit line is logged. The other array may have been allocated: set both to NULL before the call
 * and release both after it, whatever *count says.
 */
void chat_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                            int64_t* chatroomId, int* resultCode, char** resultMsg, int* count,
                            int64_t** msgIds, int64_t** sentTimes);

/** @} */

/** @defgroup qel_allow_chat Entering a chatroom
 *  @{ */

/**
 * AllowChatRequest: enters a chatroom and asks for its state. No argument is refused.
 *
 * @param requestId                      the request's id
 * @param chatroomId                     the chatroom
 * @param isAutoAllow                    may be NULL
 * @param maxCount                       the most entries to reply with: 1 to 500; any other number
 *                                       is sent as 500
 * @param needDeliveryAck                whether to reply with delivery marks
 * @param lastDeliveryAckTimestamp       reply with newer ones than this; sent only if
 *                                       needDeliveryAck is true
 * @param needReadAck                    whether to reply with read marks
 * @param lastReadAckTimestamp           reply with newer ones than this; sent only if
 *                                       needReadAck is true
 * @param needOrderedChatroomMemberList  whether to reply with the members
 * @param needChatroomMeta               whether to reply with title and lifetime
 * @param serialized_data,size           the encoded message
 * @return 0, or -1 after an error
 */
int allow_chat_request_serialize(int64_t requestId, int64_t chatroomId, const bool* isAutoAllow,
                                 int maxCount, bool needDeliveryAck,
                                 int64_t lastDeliveryAckTimestamp, bool needReadAck,
                                 int64_t lastReadAckTimestamp, bool needOrderedChatroomMemberList,
                                 bool needChatroomMeta, unsigned char** serialized_data, int* size);

/**
 * AllowChatReply: the chatroom's state.
 *
 * @param data,size                            the received bytes
 * @param requestId                            the id of the request that is answered
 * @param chatroomId                           the chatroom
 * @param resultCode,resultMsg                 the result. resultCode must not be NULL if the reply
 *                                             has a result.
 * @param deliveryAckEntries,deliveryAckCount  deliveryAckCount pointers to one record each
 * @param lastDeliveryAckTimestamp             not written if the reply has none
 * @param readAckEntries,readAckCount          readAckCount pointers to one record each
 * @param lastReadAckTimestamp                 not written if the reply has none
 * @param members,memberCount                  memberCount pointers to one record each, in the
 *                                             service's order
 * @param title,msgTtl                         not written if the reply has none
 *
 * Each of the three arrays, each record that it points to and each member's name is a block of its
 * own. Release names, records and array, in this order.
 */
void allow_chat_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                  int64_t* chatroomId, int* resultCode, char** resultMsg,
                                  qel_message_watermarkentry_t*** deliveryAckEntries,
                                  int* deliveryAckCount, int64_t* lastDeliveryAckTimestamp,
                                  qel_message_watermarkentry_t*** readAckEntries, int* readAckCount,
                                  int64_t* lastReadAckTimestamp,
                                  qel_message_chatroommember_t*** members, int* memberCount,
                                  char** title, int* msgTtl);

/** @} */

/** @defgroup qel_unread Fetching unread messages
 *  @{ */

/**
 * GetAllUnreadMessageRequest: asks for the messages that the service has stored. It pushes them as
 * ForwardUnreadMessage.
 *
 * @param requestId             the request's id
 * @param maxCount              the most messages in a page, may be NULL: 1 to 500; any other number
 *                              is sent as 500
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int get_all_unread_message_request_serialize(int64_t requestId, const int* maxCount,
                                             unsigned char** serialized_data, int* size);

/**
 * GetAllUnreadMessageReply.
 *
 * @param data,size             the received bytes
 * @param requestId             the id of the request that is answered
 * @param resultCode,resultMsg  the result
 */
void get_all_unread_message_reply_deserialize(const unsigned char* data, int size,
                                              int64_t* requestId, int* resultCode,
                                              char** resultMsg);

/** @} */

/** @defgroup qel_online_push Push of one message, which the client acknowledges
 *  @{ */

/**
 * ForwardOnlineMessageReply.
 *
 * @param requestId             the id of the ForwardOnlineMessage that is acknowledged
 * @param chatroomId            the chatroom
 * @param markAsRead            may be NULL
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int forward_online_message_reply_serialize(int64_t requestId, int64_t chatroomId,
                                           const bool* markAsRead, unsigned char** serialized_data,
                                           int* size);

/**
 * ForwardOnlineMessage.
 *
 * @param data,size            the received bytes
 * @param requestId            the push's id, for the acknowledgement
 * @param chatroomId,chatType  the message's chatroom
 * @param inboxEntry           *inboxEntry points to a record of the caller. Its msgId, msgType,
 *                             sentTime and chatMsg are always written; sender, receiver and msgTtl
 *                             only if the message has them; chatroomId and chatType never. What is
 *                             not written keeps its value. A chatMsg that was there is overwritten,
 *                             not released. Release the new one.
 * @param skipReply            whether to send no acknowledgement; false if the message does not say
 * @param errorCode,errorMsg   written only if *inboxEntry is NULL: 18, and a text to release. In
 *                             this case requestId, chatroomId, chatType and skipReply are written
 *                             too.
 *
 * Logs some values at error level even if the call succeeds.
 */
void forward_online_message_get_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                            int64_t* chatroomId, int* chatType,
                                            qel_message_inboxentry_t** inboxEntry, bool* skipReply,
                                            int* errorCode, char** errorMsg);

/** @} */

/** @defgroup qel_unread_push Push of a page of stored messages, which the client acknowledges
 *  @{ */

/**
 * ForwardUnreadMessageReply: acknowledges the page and asks for the next one.
 *
 * @param requestId             the id of the ForwardUnreadMessage that is acknowledged
 * @param nextPaginationKey     points to the key that came with the page. If it is NULL or points
 *                              to NULL, no key is sent.
 * @param maxCount              the most messages in a page, may be NULL: 1 to 500; any other number
 *                              is sent as 500. The number is logged.
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int forward_unread_message_reply_serialize(int64_t requestId, const char** nextPaginationKey,
                                           const int* maxCount, unsigned char** serialized_data,
                                           int* size);

/**
 * ForwardUnreadMessage.
 *
 * @param data,size           the received bytes
 * @param requestId           the push's id, for the acknowledgement
 * @param inboxEntries,count  count pointers to one record each; chatroomId, chatType and msgTtl of
 *                            a record are 0 where the message has none
 * @param nextPaginationKey   may be NULL. Not written if the service sent none.
 *
 * Each record's chatMsg, each record and the array is a block of its own. If the array cannot be
 * allocated, *inboxEntries is NULL, *requestId and *count have been written, *nextPaginationKey has
 * not, and no exit line is logged.
 */
void forward_unread_message_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                        qel_message_inboxentry_t*** inboxEntries, int* count,
                                        char** nextPaginationKey);

/** @} */

/** @defgroup qel_read_message Read receipt
 *  @{ */

/**
 * ReadMessageRequest: tells that a message was read.
 *
 * @param requestId             the request's id
 * @param chatroomId            the chatroom
 * @param inboxEntry            the message; may be NULL, the request names none then. Of the record
 *                              only msgId, msgType, sender and sentTime are sent. A msgType below 0
 *                              or above 30 makes the call fail; 7, 8, 9 and 11 to 29 end the
 *                              process.
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int read_message_request_serialize(int64_t requestId, int64_t chatroomId,
                                   const qel_message_inboxentry_t* inboxEntry,
                                   unsigned char** serialized_data, int* size);

/**
 * ReadMessageReply.
 *
 * @param data,size             the received bytes
 * @param requestId,chatroomId  the id of the request that is answered, and its chatroom
 * @param resultCode,resultMsg  the result
 */
void read_message_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                    int64_t* chatroomId, int* resultCode, char** resultMsg);

/** @} */

/** @defgroup qel_end_chat Ending chats
 *  @{ */

/**
 * EndChatRequest: leaves chatrooms.
 *
 * @param requestId             the request's id
 * @param entries               count records, in order. May be NULL if count is 0 or less.
 * @param count                 0 or less sends no entries
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int end_chat_request_serialize(int64_t requestId, const qel_message_endchatentry_t* entries,
                               int count, unsigned char** serialized_data, int* size);

/**
 * EndChatReply.
 *
 * @param data,size             the received bytes
 * @param requestId             the id of the request that is answered
 * @param resultCode,resultMsg  the result
 */
void end_chat_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                int* resultCode, char** resultMsg);

/** @} */

/** @defgroup qel_invite Inviting members
 *  @{ */

/**
 * InviteRequest: invites further users into a chatroom.
 *
 * @param requestId             the request's id
 * @param chatroomId            the chatroom
 * @param invitingMembers       the users to invite: *invitingMembersCount ids, in order. May be
 *                              NULL if nobody is sent.
 * @param invitingMembersCount  may be NULL. With NULL, and with 0 or less, nobody is sent.
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int invite_chat_request_serialize(int64_t requestId, int64_t chatroomId,
                                  const int64_t* invitingMembers, const int* invitingMembersCount,
                                  unsigned char** serialized_data, int* size);

/**
 * InviteReply: when the invitations were sent, and the users whom the service refused.
 *
 * @param data,size             the received bytes
 * @param requestId,chatroomId  the id of the request that is answered, and its chatroom
 * @param sentTime              may be NULL. Not written if the reply has none.
 * @param resultCode,resultMsg  the result. resultCode must not be NULL if the result carries
 *                              details of refused users: whether they are written depends on the
 *                              code, which is read through this pointer.
 *
 * The details are six lists. They are written, counts included, only if the reply carries details
 * and its code is 1000, 1001, 3003 or 3009:
 *
 * @param invalidReceivers,invalidReceiversCount          ids that are no receivers
 * @param interruptedReceivers,interruptedReceiversCount  users who are interrupted
 * @param disabledReceivers,disabledReceiversCount        users who are disabled
 * @param existingChatmembers,existingChatmembersCount    users who are members already
 * @param didViolationUsers,didViolationUsersCount        pairs of users that are a DID violation
 * @param invitationDenied,invitationDeniedCount          users who deny invitations
 */
void invite_reply_deserialize(
    const unsigned char* data, int size, int64_t* requestId, int64_t* chatroomId, int64_t* sentTime,
    int* resultCode, char** resultMsg, int64_t** invalidReceivers, int* invalidReceiversCount,
    int64_t** interruptedReceivers, int* interruptedReceiversCount, int64_t** disabledReceivers,
    int* disabledReceiversCount, int64_t** existingChatmembers, int* existingChatmembersCount,
    qel_message_didviolationuser_t** didViolationUsers, int* didViolationUsersCount,
    int64_t** invitationDenied, int* invitationDeniedCount);

/** @} */

/** @defgroup qel_current_time The service's clock
 *  @{ */

/**
 * CurrentTimeRequest.
 *
 * @param requestId             the request's id
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int current_time_request_serialize(int64_t requestId, unsigned char** serialized_data, int* size);

/**
 * CurrentTimeReply.
 *
 * @param data,size             the received bytes
 * @param requestId             the id of the request that is answered
 * @param currentTimeMillis     the service's clock in milliseconds, -1 if the reply has none
 * @param resultCode,resultMsg  the result
 */
void current_time_deserialize(const unsigned char* data, int size, int64_t* requestId,
                              int64_t* currentTimeMillis, int* resultCode, char** resultMsg);

/** @} */

/** @defgroup qel_unseal Unsealing a message
 *  @{ */

/**
 * UnsealMessageRequest: asks for a sealed message to be opened.
 *
 * @param requestId             the request's id
 * @param chatroomId            the chatroom
 * @param sender,msgId          the message's sender, and its id
 * @param msgDetail             may be NULL
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int unseal_message_request_serialize(int64_t requestId, int64_t chatroomId, int64_t sender,
                                     int64_t msgId, const char* msgDetail,
                                     unsigned char** serialized_data, int* size);

/**
 * UnsealMessageReply.
 *
 * @param data,size             the received bytes
 * @param requestId,chatroomId  the id of the request that is answered, and its chatroom
 * @param resultCode,resultMsg  the result
 */
void unseal_message_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                      int64_t* chatroomId, int* resultCode, char** resultMsg);

/** @} */

/** @defgroup qel_call_log Call log
 *  @{ */

/**
 * SaveCallLogRequest: stores the record of a call in a chatroom.
 *
 * @param requestId             the request's id
 * @param chatroomId            the chatroom
 * @param callId                the call
 * @param callLogType           the kind of call, in a word that client and service agree on
 * @param sender,receiver       the users who called and who was called
 * @param conversationSeconds   its duration in seconds
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 */
int save_call_log_request_serialize(int64_t requestId, int64_t chatroomId, const char* callId,
                                    const char* callLogType, int64_t sender, int64_t receiver,
                                    int conversationSeconds, unsigned char** serialized_data,
                                    int* size);

/**
 * SaveCallLogReply.
 *
 * @param data,size             the received bytes
 * @param requestId             the id of the request that is answered
 * @param resultCode,resultMsg  the result
 */
void save_call_log_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                     int* resultCode, char** resultMsg);

/** @} */

/** @defgroup qel_typing Typing status
 *  @{ */

/**
 * IsTyping: tells that the user is typing. There is no reply.
 *
 * @param requestId             the message's id
 * @param chatroomId            the chatroom
 * @param state                 may be NULL; a word that client and service agree on
 * @param contentType           may be NULL, else points to an IsTypingContentType; any other value
 *                              ends the process
 * @param refresh               may be NULL
 * @param serialized_data,size  the encoded message
 *
 * Returns nothing. To notice a failure, set *serialized_data to NULL before the call. If the buffer
 * cannot be allocated, *serialized_data is NULL, *size holds the length, and the log line is at
 * debug level. That the length is below 1 is not tested: a buffer of that length is asked for.
 */
void is_typing_request_serialize(int64_t requestId, int64_t chatroomId, const char* state,
                                 const int* contentType, const int* refresh,
                                 unsigned char** serialized_data, int* size);

/**
 * TypingUpdated: the service's push that another member is typing.
 *
 * @param data,size                         the received bytes
 * @param requestId                         the push's id
 * @param chatroomId                        the chatroom
 * @param sender,state,contentType,refresh  not written if the message has none
 */
void typing_updated_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                int64_t* chatroomId, int64_t* sender, char** state,
                                int* contentType, int* refresh);

/** @} */

/** @defgroup qel_chatroom_meta Changing a chatroom's title or lifetime
 *  @{ */

/**
 * ChangeChatroomMetaRequest: changes one of the two.
 *
 * @param requestId             the request's id
 * @param chatroomId            the chatroom
 * @param title                 may be NULL or empty; no title is sent then
 * @param msgTtl                the lifetime of the chatroom's messages; may be NULL or point to a
 *                              negative number, no lifetime is sent then
 * @param serialized_data,size  the encoded message
 * @return 0, or -1 after an error
 *
 * With both, only the title is sent, and a warning is logged. With neither, the call fails.
 */
int change_chatroom_meta_request_serialize(int64_t requestId, int64_t chatroomId, const char* title,
                                           const int* msgTtl, unsigned char** serialized_data,
                                           int* size);

/**
 * ChangeChatroomMetaReply.
 *
 * @param data,size             the received bytes
 * @param requestId,chatroomId  the id of the request that is answered, and its chatroom
 * @param resultCode,resultMsg  the result
 */
void change_chatroom_meta_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                            int64_t* chatroomId, int* resultCode, char** resultMsg);

/** @} */

#ifdef __cplusplus
}
#endif

#endif
