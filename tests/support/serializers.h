// The serializers, with plain arguments, for what they share.
#ifndef TESTS_SUPPORT_SERIALIZERS_H
#define TESTS_SUPPORT_SERIALIZERS_H

#include <cstdint>
#include <ostream>
#include <string>
#include <vector>

#include "qel-message-serialize.h"
#include "support/log_capture.h"

namespace support {

struct Serializer {
  std::string name;
  std::string entry;         // text
  std::vector<Line> detail;  // logged after the entry
  int length;                // of what call makes for a request id below 128
  size_t news;               // blocks that the message takes from operator new
  int (*call)(int64_t request_id, unsigned char** data, int* size);
};

// Those that follow the frame to its end.
inline const Serializer kSerializers[] = {
    {"channel_auth_request_serialize",
     "%s start",
     {},
     12,
     2,
     [](int64_t id, unsigned char** data, int* size) {
       return channel_auth_request_serialize(id, 2, 3, "a", "b", data, size);
     }},
    {"client_echo_reply_serialize",
     "%s start",
     {},
     2,
     0,
     [](int64_t id, unsigned char** data, int* size) {
       return client_echo_reply_serialize(id, data, size);
     }},
    {"create_chatroom_request_serialize",
     "%s start",
     {},
     11,
     2,
     [](int64_t id, unsigned char** data, int* size) {
       const int64_t receivers[] = {2, 3};
       return create_chatroom_request_serialize(id, 1, receivers, 2, "a", data, size);
     }},
    {"chat_request_serialize",
     "%s start",
     {},
     15,
     3,
     [](int64_t id, unsigned char** data, int* size) {
       return chat_request_serialize(id, 2, 3, 0, "a", 4, 0, data, size);
     }},
    {"allow_chat_request_serialize",
     "%s start",
     {},
     17,
     0,
     [](int64_t id, unsigned char** data, int* size) {
       return allow_chat_request_serialize(id, 2, nullptr, 3, false, 4, false, 5, true, true, data,
                                           size);
     }},
    {"get_all_unread_message_request_serialize",
     "%s start",
     {},
     4,
     0,
     [](int64_t id, unsigned char** data, int* size) {
       const int most = 5;
       return get_all_unread_message_request_serialize(id, &most, data, size);
     }},
    {"forward_online_message_reply_serialize",
     "%s start",
     {},
     6,
     0,
     [](int64_t id, unsigned char** data, int* size) {
       const bool read = true;
       return forward_online_message_reply_serialize(id, 2, &read, data, size);
     }},
    {"forward_unread_message_reply_serialize",
     "%s start",
     {warn("maxCount : %d", {5})},
     7,
     1,
     [](int64_t id, unsigned char** data, int* size) {
       const char* key = "a";
       const int most = 5;
       return forward_unread_message_reply_serialize(id, &key, &most, data, size);
     }},
    {"read_message_request_serialize",
     "%s start",
     {},
     14,
     1,
     [](int64_t id, unsigned char** data, int* size) {
       qel_message_inboxentry_t entry = {};
       entry.msgId = 3;
       return read_message_request_serialize(id, 2, &entry, data, size);
     }},
    {"end_chat_request_serialize",
     "%s start",
     {},
     8,
     2,
     [](int64_t id, unsigned char** data, int* size) {
       const qel_message_endchatentry_t entry = {2, true};
       return end_chat_request_serialize(id, &entry, 1, data, size);
     }},
    {"invite_chat_request_serialize",
     "%s start",
     {debug("in_invtingMemebersCount=%d\n", {1})},
     6,
     1,
     [](int64_t id, unsigned char** data, int* size) {
       const int64_t member = 3;
       const int count = 1;
       return invite_chat_request_serialize(id, 2, &member, &count, data, size);
     }},
    {"current_time_request_serialize",
     "%s: enter",
     {},
     2,
     0,
     [](int64_t id, unsigned char** data, int* size) {
       return current_time_request_serialize(id, data, size);
     }},
    {"unseal_message_request_serialize",
     "%s start",
     {},
     11,
     1,
     [](int64_t id, unsigned char** data, int* size) {
       return unseal_message_request_serialize(id, 2, 3, 4, "a", data, size);
     }},
    {"save_call_log_request_serialize",
     "%s start",
     {},
     21,
     2,
     [](int64_t id, unsigned char** data, int* size) {
       return save_call_log_request_serialize(id, 2, "a", "b", 3, 4, 5, data, size);
     }},
    {"change_chatroom_meta_request_serialize",
     "%s start",
     {debug("requestId: %lld", {1LL})},
     7,
     1,
     [](int64_t id, unsigned char** data, int* size) {
       return change_chatroom_meta_request_serialize(id, 2, "a", nullptr, data, size);
     }},
};

inline void PrintTo(const Serializer& function, std::ostream* out) {
  *out << function.name;
}

}  // namespace support

#endif
