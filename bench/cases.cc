#include "cases.h"

#include <cstdlib>
#include <cstring>
#include <memory>
#include <stdexcept>

#include "calls.h"
#include "inputs.h"

namespace {

using Block = std::unique_ptr<unsigned char, decltype(&free)>;

// A call, and the amounts of its cases: bytes of text, or entries of a list.
struct Call {
  std::string name;
  bool is_implemented;
  std::vector<int> amounts;
  Case (*make)(int amount);
};

template <typename Serialize>
Case serializer(const std::string& bytes, Serialize serialize) {
  return {[serialize] {
            int size;
            free(serialize(&size));
          },
          [serialize, bytes] {
            int size = -1;
            const Block block(serialize(&size), &free);
            return std::string(reinterpret_cast<const char*>(block.get()),
                               static_cast<size_t>(size)) == bytes;
          }};
}

using Parse = void (*)(const unsigned char*, int, struct digest*);

Case parser(const Received& received, Parse parse) {
  const auto input = std::make_shared<const Received>(received);
  const auto call = [input, parse](struct digest* digest) {
    parse(reinterpret_cast<const unsigned char*>(input->bytes.data()),
          static_cast<int>(input->bytes.size()), digest);
  };
  return {[call] { call(nullptr); },
          [call, input] {
            struct digest digest = {0};
            call(&digest);
            return digest.value == input->digest.value;
          }};
}

Case echo_reply(int /*amount*/) {
  return serializer(echo_reply_bytes(),
                    [](int* size) { return implementation.echo_reply(kRequestId, size); });
}

Case chat_request(int length) {
  const std::string text = text_of(length);
  return serializer(chat_request_bytes(text),
                    [text](int* size) { return implementation.chat_request(text.c_str(), size); });
}

Case chat_reply(int entries) {
  return parser(chat_reply_of(entries), implementation.chat_reply);
}

Case message_page(int messages) {
  return parser(message_page_of(messages), implementation.message_page);
}

Case chatroom_entry(int members) {
  return parser(chatroom_entry_of(members), implementation.chatroom_entry);
}

Case small_echo(int /*amount*/) {
  return parser(echo_received(), echo);
}

Case small_end_of_chats(int /*amount*/) {
  return parser(end_of_chats_received(), end_of_chats);
}

Case small_invitation(int /*amount*/) {
  return parser(chat_reply_of(0), invitation);  // the bytes of both are the same
}

const std::vector<Call>& calls() {
  static const std::vector<Call> all = {
      {"echo_reply", implementation.echo_reply != nullptr, {0}, echo_reply},
      {"chat_request",
       implementation.chat_request != nullptr,
       {10, 100, 1000, 10000, 40000},
       chat_request},
      {"chat_reply", implementation.chat_reply != nullptr, {1, 10, 50, 100, 500, 5000}, chat_reply},
      {"message_page",
       implementation.message_page != nullptr,
       {1, 10, 100, 500, 5000},
       message_page},
      {"chatroom_entry",
       implementation.chatroom_entry != nullptr,
       {1, 10, 100, 500, 5000},
       chatroom_entry},
      {"echo", echo != nullptr, {0}, small_echo},
      {"end_of_chats", end_of_chats != nullptr, {0}, small_end_of_chats},
      {"invitation", invitation != nullptr, {0}, small_invitation}};
  return all;
}

std::string name_of(const Call& call, int amount) {
  return amount == 0 ? call.name : call.name + "/" + std::to_string(amount);
}

}  // namespace

std::vector<std::string> case_names() {
  std::vector<std::string> names;
  for (const Call& call : calls()) {
    for (const int amount : call.amounts) {
      if (call.is_implemented) {
        names.push_back(name_of(call, amount));
      }
    }
  }
  return names;
}

Case make_case(const std::string& name) {
  for (const Call& call : calls()) {
    for (const int amount : call.amounts) {
      if (call.is_implemented && name_of(call, amount) == name) {
        return call.make(amount);
      }
    }
  }
  throw std::invalid_argument("no such case: " + name);
}
