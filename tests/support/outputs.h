// The outputs of each deserializer, set to sentinels before the call.
#ifndef TESTS_SUPPORT_OUTPUTS_H
#define TESTS_SUPPORT_OUTPUTS_H

#include <string>

#include "qel-message-serialize.h"
#include "support/exchange.h"

namespace support {

struct ChannelAuthReplyOutputs {
  int64_t request_id = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;

  void read(const std::string& bytes) {
    const Received received(bytes);
    channel_auth_reply_deserialize(received.data(), received.size(), &request_id, &code,
                                   &text.block);
  }
  bool untouched() const {
    return request_id == kLongSentinel && code == kIntSentinel && text.untouched();
  }
};

struct ClientEchoOutputs {
  int64_t request_id = kLongSentinel;

  void read(const std::string& bytes) {
    const Received received(bytes);
    client_echo_deserialize(received.data(), received.size(), &request_id);
  }
  bool untouched() const { return request_id == kLongSentinel; }
};

struct ChatReplyOutputs {
  int64_t request_id = kLongSentinel;
  int64_t chatroom_id = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;
  int count = kIntSentinel;
  IdListOutput ids;
  IdListOutput times;

  void read(const std::string& bytes) {
    const Received received(bytes);
    chat_reply_deserialize(received.data(), received.size(), &request_id, &chatroom_id, &code,
                           &text.block, &count, &ids.block, &times.block);
  }
  bool untouched() const {
    return request_id == kLongSentinel && chatroom_id == kLongSentinel && code == kIntSentinel &&
           text.untouched() && count == kIntSentinel && ids.untouched() && times.untouched();
  }
};

struct CurrentTimeOutputs {
  int64_t request_id = kLongSentinel;
  int64_t millis = kLongSentinel;
  int code = kIntSentinel;
  TextOutput text;

  void read(const std::string& bytes) {
    const Received received(bytes);
    current_time_deserialize(received.data(), received.size(), &request_id, &millis, &code,
                             &text.block);
  }
  bool untouched() const {
    return request_id == kLongSentinel && millis == kLongSentinel && code == kIntSentinel &&
           text.untouched();
  }
};

}  // namespace support

#endif
