// Every serializer, with plain arguments, for what they all share.
#ifndef TESTS_SUPPORT_SERIALIZERS_H
#define TESTS_SUPPORT_SERIALIZERS_H

#include <cstdint>
#include <ostream>
#include <string>

#include "qel-message-serialize.h"

namespace support {

struct Serializer {
  std::string name;
  std::string entry;  // text
  int length;         // of what call makes for a request id below 128
  size_t news;        // blocks that the message takes from operator new
  int (*call)(int64_t request_id, unsigned char** data, int* size);
};

inline const Serializer kSerializers[] = {
    {"channel_auth_request_serialize", "%s start", 12, 2,
     [](int64_t id, unsigned char** data, int* size) {
       return channel_auth_request_serialize(id, 2, 3, "a", "b", data, size);
     }},
    {"client_echo_reply_serialize", "%s start", 2, 0,
     [](int64_t id, unsigned char** data, int* size) {
       return client_echo_reply_serialize(id, data, size);
     }},
    {"chat_request_serialize", "%s start", 15, 3,
     [](int64_t id, unsigned char** data, int* size) {
       return chat_request_serialize(id, 2, 3, 0, "a", 4, 0, data, size);
     }},
    {"current_time_request_serialize", "%s: enter", 2, 0,
     [](int64_t id, unsigned char** data, int* size) {
       return current_time_request_serialize(id, data, size);
     }},
};

inline void PrintTo(const Serializer& function, std::ostream* out) {
  *out << function.name;
}

}  // namespace support

#endif
