// Any arguments that a serializer may be given: it refuses what it says that it refuses, and puts
// everything else on the wire as an encoder of our own does.

#include <cstring>
#include <optional>

#include "observation.h"
#include "qel-message-serialize.h"
#include "support/sentinels.h"
#include "support/wire.h"
#include "target.h"

namespace fuzz {
namespace {

using support::Encoded;
using support::Wire;

// A text in a block of exactly its size, so that reading beyond it shows.
using Text = std::vector<char>;

// Takes arguments from the input; what it lacks is 0, "" or absent.
class Arguments {
 public:
  explicit Arguments(const std::string& input) : input_(input) {}

  unsigned char byte() {
    return at_ < input_.size() ? static_cast<unsigned char>(input_[at_++]) : '\0';
  }
  bool flag() { return byte() % 2 == 1; }
  // Of any magnitude: a byte says how many bytes of it follow.
  int64_t number() { return number_of(byte() % (kLongest + 1)); }
  // Of any magnitude too, and often one at the ends of a page's sizes.
  int small_number() {
    constexpr int kEnds[] = {0, 1, -1, 500, 501};
    const size_t choice = byte() % (kLongest + 1 + std::size(kEnds));
    return choice > kLongest ? kEnds[choice - kLongest - 1] : static_cast<int>(number_of(choice));
  }
  // Short ones, and long ones about the longest that is accepted anywhere.
  Text text() {
    const unsigned char length = byte();
    Text text;
    if (length == 255) {
      text.assign(39999 + byte() % 3U, 'x');
    }
    for (unsigned char i = 0; length < 255 && i < length; ++i) {
      text.push_back(static_cast<char>(byte()));
    }
    text.push_back('\0');
    return {text.data(), text.data() + std::strlen(text.data()) + 1};
  }
  std::optional<Text> optional_text() {
    return flag() ? std::optional<Text>(text()) : std::nullopt;
  }
  std::optional<int> optional_number() {
    return flag() ? std::optional<int>(small_number()) : std::nullopt;
  }
  std::vector<int64_t> numbers() {
    std::vector<int64_t> numbers(byte() % 8U);
    for (int64_t& value : numbers) {
      value = number();
    }
    return numbers;
  }
  // A list's own count, or one that leaves the list out.
  int count_of(size_t elements) { return flag() ? -(byte() % 2) : static_cast<int>(elements); }

 private:
  static constexpr size_t kLongest = 8;  // bytes of a number

  int64_t number_of(size_t length) {
    uint64_t value = 0;
    for (size_t i = 0; i < length; ++i) {
      value |= static_cast<uint64_t>(byte()) << (8 * i);
    }
    const bool negative = length > 0 && length < kLongest && (value >> (8 * length - 1)) == 1;
    return static_cast<int64_t>(negative ? value | ~uint64_t{0} << (8 * length) : value);
  }

  const std::string& input_;
  size_t at_ = 0;
};

std::string sent(const Text& text) {
  return text.data();
}

const char* pointer(const std::optional<Text>& text) {
  return text ? text->data() : nullptr;
}
const int* pointer(const std::optional<int>& number) {
  return number ? &*number : nullptr;
}

// How many entries a page has at most.
int page_size(int wanted) {
  return wanted >= 1 && wanted <= 500 ? wanted : 500;
}

// A member of MsgType, or a number that is refused; any other ends the process.
int some_msg_type(Arguments* arguments) {
  constexpr int kTypes[] = {0, 1, 2, 3, 4, 5, 6, 10, 30, 31, -1};
  const size_t choice = arguments->byte();
  return choice < 200 ? kTypes[choice % std::size(kTypes)]
                      : -1 - (arguments->small_number() & 0xffff);
}
bool is_refused(int msg_type) {
  return msg_type < 0 || msg_type > 30;
}

void expect_refused(const Encoded& out, const LogWatch& log) {
  if (out.status != -1 || !out.untouched()) {
    fail("not refused: " + std::to_string(out.status));
  }
  if (log.lines().empty() || log.lines().back().priority != kError) {
    fail("refused without an error line");
  }
}

void expect_encoded(const Encoded& out, const LogWatch& log, const Wire& wire) {
  if (out.status != 0) {
    fail("status " + std::to_string(out.status));
  }
  if (out.bytes() != wire.bytes()) {
    fail("encoded\n" + support::to_hex(out.bytes()) + "\ninstead of\n" +
         support::to_hex(wire.bytes()));
  }
  for (const LogLine& line : log.lines()) {
    if (line.priority == kError) {
      fail("an error line beside a success: " + line.text);
    }
  }
  const size_t exit =
      log.lines().empty() ? std::string::npos : log.lines().back().text.rfind(": exit");
  if (exit == std::string::npos || log.lines().back().priority != kDebug) {
    fail("no exit line after a success");
  }
}

void check_channel_auth(Arguments* in) {
  const int64_t request = in->number();
  const int64_t user = in->number();
  const int64_t device = in->number();
  const Text app = in->text();
  const Text token = in->text();
  const LogWatch log("channel_auth_request_serialize");
  Encoded out;
  out.status = channel_auth_request_serialize(request, user, device, app.data(), token.data(),
                                              &out.data.block, &out.size);
  expect_encoded(out, log,
                 Wire()
                     .number(1, request)
                     .number(2, user)
                     .number(3, device)
                     .text(5, sent(app))
                     .text(6, sent(token)));
}

void check_client_echo_reply(Arguments* in) {
  const int64_t request = in->number();
  const LogWatch log("client_echo_reply_serialize");
  Encoded out;
  out.status = client_echo_reply_serialize(request, &out.data.block, &out.size);
  expect_encoded(out, log, Wire().number(1, request));
}

void check_current_time(Arguments* in) {
  const int64_t request = in->number();
  const LogWatch log("current_time_request_serialize");
  Encoded out;
  out.status = current_time_request_serialize(request, &out.data.block, &out.size);
  expect_encoded(out, log, Wire().number(11, request));
}

void check_create_chatroom(Arguments* in) {
  const int64_t request = in->number();
  const int type = in->byte() % 5;  // a ChatType
  const std::vector<int64_t> receivers = in->numbers();
  const std::optional<Text> title = in->optional_text();
  const int count = in->count_of(receivers.size());
  const LogWatch log("create_chatroom_request_serialize");
  Encoded out;
  out.status = create_chatroom_request_serialize(request, type, receivers.data(), count,
                                                 pointer(title), &out.data.block, &out.size);
  if (receivers.data() == nullptr) {
    expect_refused(out, log);
    return;
  }
  Wire wire;
  wire.number(11, request).number(12, type);
  for (int i = 0; i < count; ++i) {
    wire.number(13, receivers[static_cast<size_t>(i)]);
  }
  if (title) {
    wire.text(14, sent(*title));
  }
  expect_encoded(out, log, wire);
}

void check_chat(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const int64_t id = in->number();
  const int type = some_msg_type(in);
  const std::optional<Text> text = in->optional_text();
  const int ttl = in->small_number();
  const int reserved = in->small_number();
  const LogWatch log("chat_request_serialize");
  Encoded out;
  out.status = chat_request_serialize(request, chatroom, id, type, pointer(text), ttl, reserved,
                                      &out.data.block, &out.size);
  if (is_refused(type) || !text || sent(*text).size() > 40000) {
    expect_refused(out, log);
    return;
  }
  expect_encoded(
      out, log,
      Wire()
          .number(11, request)
          .number(12, chatroom)
          .message(13, Wire().number(1, id).number(2, type).text(3, sent(*text)).number(4, ttl)));
}

void check_allow_chat(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const std::optional<bool> auto_allow =
      in->flag() ? std::optional<bool>(in->flag()) : std::nullopt;
  const int most = in->small_number();
  const bool delivery = in->flag();
  const int64_t delivered = in->number();
  const bool read = in->flag();
  const int64_t last_read = in->number();
  const bool members = in->flag();
  const bool meta = in->flag();
  const LogWatch log("allow_chat_request_serialize");
  Encoded out;
  out.status = allow_chat_request_serialize(request, chatroom, auto_allow ? &*auto_allow : nullptr,
                                            most, delivery, delivered, read, last_read, members,
                                            meta, &out.data.block, &out.size);
  Wire wire;
  wire.number(11, request).number(12, chatroom);
  if (auto_allow) {
    wire.number(13, *auto_allow);
  }
  wire.number(14, page_size(most)).number(15, members).number(16, read);
  if (read) {
    wire.number(17, last_read);
  }
  wire.number(18, meta).number(19, delivery);
  if (delivery) {
    wire.number(20, delivered);
  }
  expect_encoded(out, log, wire);
}

void check_get_all_unread_message(Arguments* in) {
  const int64_t request = in->number();
  const std::optional<int> most = in->optional_number();
  const LogWatch log("get_all_unread_message_request_serialize");
  Encoded out;
  out.status =
      get_all_unread_message_request_serialize(request, pointer(most), &out.data.block, &out.size);
  Wire wire;
  wire.number(11, request);
  if (most) {
    wire.number(12, page_size(*most));
  }
  expect_encoded(out, log, wire);
}

void check_forward_online_message_reply(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const std::optional<bool> read = in->flag() ? std::optional<bool>(in->flag()) : std::nullopt;
  const LogWatch log("forward_online_message_reply_serialize");
  Encoded out;
  out.status = forward_online_message_reply_serialize(request, chatroom, read ? &*read : nullptr,
                                                      &out.data.block, &out.size);
  Wire wire;
  wire.number(11, request).number(12, chatroom);
  if (read) {
    wire.number(13, *read);
  }
  expect_encoded(out, log, wire);
}

void check_forward_unread_message_reply(Arguments* in) {
  const int64_t request = in->number();
  const bool has_key_pointer = in->flag();
  const std::optional<Text> key = in->optional_text();
  const std::optional<int> most = in->optional_number();
  const char* key_pointer = pointer(key);
  const LogWatch log("forward_unread_message_reply_serialize");
  Encoded out;
  out.status = forward_unread_message_reply_serialize(
      request, has_key_pointer ? &key_pointer : nullptr, pointer(most), &out.data.block, &out.size);
  Wire wire;
  wire.number(11, request);
  if (has_key_pointer && key) {
    wire.text(12, sent(*key));
  }
  if (most) {
    wire.number(13, page_size(*most));
  }
  expect_encoded(out, log, wire);
}

void check_read_message(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const bool has_record = in->flag();
  qel_message_inboxentry_t record = {};
  record.msgId = in->number();
  record.msgType = some_msg_type(in);
  record.sender = in->number();
  record.sentTime = in->number();
  record.receiver = in->number();
  const LogWatch log("read_message_request_serialize");
  Encoded out;
  out.status = read_message_request_serialize(request, chatroom, has_record ? &record : nullptr,
                                              &out.data.block, &out.size);
  if (has_record && is_refused(record.msgType)) {
    expect_refused(out, log);
    return;
  }
  Wire wire;
  wire.number(11, request).number(12, chatroom);
  if (has_record) {
    wire.message(13, Wire()
                         .number(1, record.msgId)
                         .number(2, record.msgType)
                         .number(3, record.sender)
                         .number(5, record.sentTime));
  }
  expect_encoded(out, log, wire);
}

void check_end_chat(Arguments* in) {
  const int64_t request = in->number();
  std::vector<qel_message_endchatentry_t> entries;
  for (const int64_t chatroom : in->numbers()) {
    entries.push_back({chatroom, in->flag()});
  }
  entries.shrink_to_fit();
  const int count = in->count_of(entries.size());
  const LogWatch log("end_chat_request_serialize");
  Encoded out;
  out.status =
      end_chat_request_serialize(request, entries.data(), count, &out.data.block, &out.size);
  Wire wire;
  wire.number(11, request);
  for (int i = 0; i < count; ++i) {
    const qel_message_endchatentry_t& entry = entries[static_cast<size_t>(i)];
    wire.message(12, Wire().number(1, entry.chatroomId).number(11, entry.denyInvitation));
  }
  expect_encoded(out, log, wire);
}

void check_invite(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const std::vector<int64_t> members = in->numbers();
  const bool has_count = in->flag();
  const int count = in->count_of(members.size());
  const LogWatch log("invite_chat_request_serialize");
  Encoded out;
  out.status = invite_chat_request_serialize(
      request, chatroom, members.data(), has_count ? &count : nullptr, &out.data.block, &out.size);
  Wire wire;
  wire.number(11, request).number(12, chatroom);
  for (int i = 0; has_count && i < count; ++i) {
    wire.number(13, members[static_cast<size_t>(i)]);
  }
  expect_encoded(out, log, wire);
}

void check_unseal_message(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const int64_t sender = in->number();
  const int64_t id = in->number();
  const std::optional<Text> detail = in->optional_text();
  const LogWatch log("unseal_message_request_serialize");
  Encoded out;
  out.status = unseal_message_request_serialize(request, chatroom, sender, id, pointer(detail),
                                                &out.data.block, &out.size);
  Wire wire;
  wire.number(11, request).number(12, chatroom).number(13, sender).number(14, id);
  if (detail) {
    wire.text(15, sent(*detail));
  }
  expect_encoded(out, log, wire);
}

void check_save_call_log(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const Text call = in->text();
  const Text type = in->text();
  const int64_t sender = in->number();
  const int64_t receiver = in->number();
  const int seconds = in->small_number();
  const LogWatch log("save_call_log_request_serialize");
  Encoded out;
  out.status = save_call_log_request_serialize(request, chatroom, call.data(), type.data(), sender,
                                               receiver, seconds, &out.data.block, &out.size);
  expect_encoded(out, log,
                 Wire()
                     .number(11, request)
                     .number(12, chatroom)
                     .text(20, sent(call))
                     .text(21, sent(type))
                     .number(22, sender)
                     .number(23, receiver)
                     .number(25, seconds));
}

void check_is_typing(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const std::optional<Text> state = in->optional_text();
  const std::optional<int> type = in->flag() ? std::optional<int>(in->byte() % 4) : std::nullopt;
  const std::optional<int> refresh = in->optional_number();
  const LogWatch log("is_typing_request_serialize");
  Encoded out;
  is_typing_request_serialize(request, chatroom, pointer(state), pointer(type), pointer(refresh),
                              &out.data.block, &out.size);
  out.status = 0;  // it has none
  Wire wire;
  wire.number(11, request).number(12, chatroom);
  if (state) {
    wire.text(13, sent(*state));
  }
  if (type) {
    wire.number(14, *type);
  }
  if (refresh) {
    wire.number(15, *refresh);
  }
  expect_encoded(out, log, wire);
}

void check_change_chatroom_meta(Arguments* in) {
  const int64_t request = in->number();
  const int64_t chatroom = in->number();
  const std::optional<Text> title = in->optional_text();
  const std::optional<int> ttl = in->optional_number();
  const LogWatch log("change_chatroom_meta_request_serialize");
  Encoded out;
  out.status = change_chatroom_meta_request_serialize(request, chatroom, pointer(title),
                                                      pointer(ttl), &out.data.block, &out.size);
  Wire wire;
  wire.number(11, request).number(12, chatroom);
  if (title && !sent(*title).empty()) {
    wire.text(13, sent(*title));
  } else if (ttl && *ttl >= 0) {
    wire.number(16, *ttl);
  } else {
    expect_refused(out, log);
    return;
  }
  expect_encoded(out, log, wire);
}

constexpr void (*kChecks[])(Arguments*) = {
    check_channel_auth,
    check_client_echo_reply,
    check_current_time,
    check_create_chatroom,
    check_chat,
    check_allow_chat,
    check_get_all_unread_message,
    check_forward_online_message_reply,
    check_forward_unread_message_reply,
    check_read_message,
    check_end_chat,
    check_invite,
    check_unseal_message,
    check_save_call_log,
    check_is_typing,
    check_change_chatroom_meta,
};

}  // namespace

void check_serializers(const std::string& bytes) {
  Arguments arguments(bytes);
  kChecks[arguments.byte() % std::size(kChecks)](&arguments);
}

}  // namespace fuzz
