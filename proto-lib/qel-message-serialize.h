/*
 * qel-message-serialize.h - the wire protocol of the chat service, for the message plug-in.
 *
 * For each exchange that the plug-in takes part in, a ..._serialize function turns arguments into
 * the bytes of one protocol message, and a ..._deserialize function turns received bytes into
 * outputs. What follows holds for all of them; the notes at each function say only what it adds or
 * does differently.
 *
 * Transport. The library opens no connection. How buffers travel, any framing around them, and
 * which reply belongs to which request (by requestId) are the caller's business.
 *
 * Types. Identifiers and times are int64_t; 32-bit values, counts and lengths are int; received
 * bytes are data and size, their length in bytes. Text is NUL-terminated, UTF-8, and measured in
 * bytes.
 *
 * Serializers. They return 0, or -1 after one error line in the log. The last two arguments
 * receive the encoded message: its first byte and its length. The buffer has exactly that length,
 * no terminating NUL and no length prefix; release it with free(). A failed check of an argument
 * leaves both outputs as they were. If the buffer cannot be allocated, *size holds the length and
 * *serialized_data is NULL. If the length is below 1, which no message of these functions is, *size
 * holds it and *serialized_data is as it was. Values passed by value are always put on the wire, 0
 * and "" included. userId and deviceId of a message stay unset unless the function takes them.
 *
 * Deserializers. They return nothing. An output is written only after the bytes were parsed and
 * consumed whole; otherwise every output keeps what the caller left in it, and the log has the
 * reason. To tell the two apart, set an output before the call to a value that the service never
 * sends. Fields that are absent from the message read as 0 unless the function says otherwise;
 * empty input (size 0) is a valid message without fields, and so is one that was cut between two
 * fields: only the transport can tell that a message is whole. Input of more than 64 MiB (67108864
 * bytes) or of more than 100 nested levels fails. Strings and arrays that are written belong to the
 * caller; release each with free(). A string ends at the first NUL of the received text.
 *
 * Results. A reply's outcome comes back as resultCode and resultMsg. Unless the function says
 * otherwise either pointer may be NULL, *resultCode is written only if the reply has a result, and
 * *resultMsg only if that result has a text: set both before the call.
 *
 * Pointers. None may be NULL unless the function says so, and none is tested: a NULL pointer
 * faults.
 *
 * Memory. Every deserializer keeps one small block (its input stream) allocated for good, except
 * where the function says that it is released.
 *
 * Enumerations. A value outside the message's enumeration ends the process with an assertion
 * failure (SIGABRT), unless the function says that it checks the range.
 *
 * Exceptions. C++ exceptions out of the protocol runtime, for example std::bad_alloc while a text
 * is copied, are not caught.
 *
 * Threads. Any thread may call any function at any time.
 *
 * Log. Each call logs its entry, its exit and its failures through __dlog_print, with the tag
 * MESSAGE_PLUGIN and the calling thread's id. The access token is never logged.
 */
#ifndef QEL_MESSAGE_SERIALIZE_H
#define QEL_MESSAGE_SERIALIZE_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* ---- Channel authentication ---- */

/*
 * ChannelAuthRequest: authenticates the channel after connecting.
 *
 * appId        the calling application
 * accessToken  the user's credential
 */
int channel_auth_request_serialize(int64_t requestId, int64_t userId, int64_t deviceId,
                                   const char* appId, const char* accessToken,
                                   unsigned char** serialized_data, int* size);

/*
 * ChannelAuthReply. All three outputs are written on success, and none of the pointers may be
 * NULL: without a result *resultCode is 0, and without a text *resultMsg is NULL.
 *
 * Logs no exit line. The input stream is released on success and kept on failure.
 */
void channel_auth_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                                    int* resultCode, char** resultMsg);

/* ---- Echo: the service probes, the client answers ---- */

/*
 * ClientEchoReply.
 *
 * requestId  that of the ClientEcho which is answered
 */
int client_echo_reply_serialize(int64_t requestId, unsigned char** serialized_data, int* size);

/* ClientEcho. The input stream is released on success and kept on failure. */
void client_echo_deserialize(const unsigned char* data, int size, int64_t* requestId);

/* ---- Sending chat messages ---- */

/*
 * ChatRequest: sends one message into a chatroom.
 *
 * msgId     the caller's id of the message; the reply confirms it by this id
 * msgType   a MsgType: 0 to 6, 10 or 30. Below 0 or above 30 the call fails; 7, 8, 9 and 11 to 29
 *           end the process.
 * chatMsg   at most 40000 bytes, or the call fails. May be empty. With NULL the call fails; msgType
 *           is looked at first.
 * msgTtl    the message's lifetime
 * reserved  ignored
 */
int chat_request_serialize(int64_t requestId, int64_t chatroomId, int64_t msgId, int msgType,
                           const char* chatMsg, int msgTtl, int reserved,
                           unsigned char** serialized_data, int* size);

/*
 * ChatReply: the service's verdict, and the messages that it processed.
 *
 * requestId, chatroomId  may be NULL
 * count                  the number of processed messages, 0 if there are none
 * msgIds, sentTimes      two arrays of *count elements, index by index about the same message: its
 *                        id, and the time at which the service recorded it (0 where absent). Not
 *                        written if there are none. Both are required as soon as there are any.
 *
 * If an array cannot be allocated *count is 0, the outputs before it have been written, and no exit
 * line is logged. One of the two arrays may have been allocated all the same: set both to NULL
 * before the call and release both after it, whatever *count says.
 */
void chat_reply_deserialize(const unsigned char* data, int size, int64_t* requestId,
                            int64_t* chatroomId, int* resultCode, char** resultMsg, int* count,
                            int64_t** msgIds, int64_t** sentTimes);

/* ---- The service's clock ---- */

/* CurrentTimeRequest. */
int current_time_request_serialize(int64_t requestId, unsigned char** serialized_data, int* size);

/*
 * CurrentTimeReply.
 *
 * currentTimeMillis  the service's clock in milliseconds, -1 if the reply has none
 */
void current_time_deserialize(const unsigned char* data, int size, int64_t* requestId,
                              int64_t* currentTimeMillis, int* resultCode, char** resultMsg);

#ifdef __cplusplus
}
#endif

#endif
