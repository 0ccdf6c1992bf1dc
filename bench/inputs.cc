#include "inputs.h"

namespace {

void put_varint(std::string* out, uint64_t value) {
  for (; value >= 0x80; value >>= 7) {
    out->push_back(static_cast<char>((value & 0x7f) | 0x80));
  }
  out->push_back(static_cast<char>(value));
}

// Writes a message: its fields stand in the order of the calls.
class Message {
 public:
  void number(int field, int64_t value) {
    put_varint(&bytes_, static_cast<uint64_t>(field) << 3);
    put_varint(&bytes_, static_cast<uint64_t>(value));
  }
  void bytes(int field, const std::string& value) {
    put_varint(&bytes_, static_cast<uint64_t>(field) << 3 | 2);
    put_varint(&bytes_, value.size());
    bytes_ += value;
  }
  const std::string& encoding() const { return bytes_; }

 private:
  std::string bytes_;
};

// Ids and times of the size that the service uses.
constexpr int64_t kFirstUser = 1000000007;
constexpr int64_t kFirstMessage = 1419876543210000;
constexpr int64_t kFirstTime = 1419876543210;
constexpr int kSuccess = 1000;
const char* const kSuccessText = "success";

std::string result_bytes(struct digest* digest) {
  Message result;
  result.number(1, kSuccess);
  result.bytes(2, kSuccessText);
  digest_number(digest, kSuccess);
  digest_text(digest, kSuccessText);
  return result.encoding();
}

std::string watermark_bytes(int i, int64_t behind, struct digest* digest) {
  const int64_t values[] = {kFirstUser + i, kFirstMessage - behind - i, kFirstTime - behind + i};
  Message mark;
  for (int field = 1; field <= 3; ++field) {
    mark.number(field, values[field - 1]);
    digest_number(digest, values[field - 1]);
  }
  return mark.encoding();
}

}  // namespace

std::string text_of(int length) {
  std::string text;
  for (int i = 0; i < length; ++i) {
    text.push_back(static_cast<char>(i % 7 == 6 ? ' ' : 'a' + i % 26));
  }
  return text;
}

std::string echo_reply_bytes() {
  Message reply;
  reply.number(1, kRequestId);
  return reply.encoding();
}

std::string chat_request_bytes(const std::string& text) {
  Message param;
  param.number(1, kMessageId);
  param.number(2, kMessageType);
  param.bytes(3, text);
  param.number(4, kMessageTtl);
  Message request;
  request.number(11, kRequestId);
  request.number(12, kChatroomId);
  request.bytes(13, param.encoding());
  return request.encoding();
}

Received chat_reply_of(int entries) {
  struct digest digest = {0};
  Message reply;
  reply.number(11, kRequestId);
  reply.number(12, kChatroomId);
  digest_number(&digest, kRequestId);
  digest_number(&digest, kChatroomId);
  reply.bytes(13, result_bytes(&digest));
  digest_number(&digest, entries);
  for (int i = 0; i < entries; ++i) {
    Message entry;
    entry.number(1, kFirstMessage + i);
    entry.number(2, kFirstTime + i);
    digest_number(&digest, kFirstMessage + i);
    digest_number(&digest, kFirstTime + i);
    reply.bytes(14, entry.encoding());
  }
  return {reply.encoding(), digest};
}

Received message_page_of(int messages) {
  const std::string text = text_of(100);
  struct digest digest = {0};
  Message push;
  push.number(11, kRequestId);
  digest_number(&digest, kRequestId);
  digest_number(&digest, messages);
  for (int i = 0; i < messages; ++i) {
    Message entry;
    const auto number = [&](int field, int64_t value) {
      entry.number(field, value);
      digest_number(&digest, value);
    };
    number(1, kFirstMessage + i);
    number(2, kMessageType);
    number(3, kFirstUser + i);
    number(4, kFirstUser - 1);
    number(5, kFirstTime + i);
    entry.bytes(6, text);
    digest_text(&digest, text.c_str());
    entry.number(7, kMessageTtl);
    number(10, kChatroomId);
    number(11, 1);
    digest_number(&digest, kMessageTtl);
    push.bytes(12, entry.encoding());
  }
  const char* const next = "1419876543210499_1419876543209";
  push.bytes(13, next);
  digest_text(&digest, next);
  return {push.encoding(), digest};
}

// The fields stand in the order of their numbers, which is not that of the digest.
Received chatroom_entry_of(int members) {
  struct digest digest = {0};
  const auto number = [&](Message* to, int field, int64_t value) {
    to->number(field, value);
    digest_number(&digest, value);
  };
  Message head, delivery_time, delivery, read_time, read, list, title, ttl;

  number(&head, 11, kRequestId);
  number(&head, 12, kChatroomId);
  head.bytes(13, result_bytes(&digest));

  number(&delivery_time, 21, kFirstTime - 5);
  digest_number(&digest, members);
  for (int i = 0; i < members; ++i) {
    delivery.bytes(20, watermark_bytes(i, 1, &digest));
  }

  number(&read_time, 14, kFirstTime - 9);
  digest_number(&digest, members);
  for (int i = 0; i < members; ++i) {
    read.bytes(17, watermark_bytes(i, 2, &digest));
  }

  digest_number(&digest, members);
  for (int i = 0; i < members; ++i) {
    Message member;
    number(&member, 1, kFirstUser + i);
    number(&member, 2, i % 2);
    const std::string name = "Member " + std::to_string(i);
    member.bytes(3, name);
    digest_text(&digest, name.c_str());
    list.bytes(16, member.encoding());
  }

  title.bytes(18, "A room of many");
  digest_text(&digest, "A room of many");
  number(&ttl, 22, kMessageTtl);

  return {head.encoding() + read_time.encoding() + list.encoding() + read.encoding() +
              title.encoding() + delivery.encoding() + delivery_time.encoding() + ttl.encoding(),
          digest};
}

Received echo_received() {
  struct digest digest = {0};
  Message echo;
  echo.number(1, kRequestId);
  digest_number(&digest, kRequestId);
  return {echo.encoding(), digest};
}

Received end_of_chats_received() {
  struct digest digest = {0};
  Message reply;
  reply.number(11, kRequestId);
  digest_number(&digest, kRequestId);
  reply.bytes(12, result_bytes(&digest));
  return {reply.encoding(), digest};
}
