#include "call.h"

#include <algorithm>

namespace contract {
namespace {

bool is_utf8(const std::string& text) {
  try {
    Json(text).dump();
    return true;
  } catch (const Json::type_error&) {
    return false;
  }
}

template <typename T>
void add(Reader* reader, const char* name, const T& field, Json* record) {
  Json value = reader->read(field);
  if (value != Reader::kUnwritten) {
    (*record)[name] = std::move(value);
  }
}

}  // namespace

std::string bytes_of(const std::string& hex) {
  std::string bytes;
  for (size_t i = 0; i + 1 < hex.size(); i += 2) {
    bytes.push_back(static_cast<char>(std::stoi(hex.substr(i, 2), nullptr, 16)));
  }
  return bytes;
}

std::string hex_of(const std::string& bytes) {
  const char digits[] = "0123456789abcdef";
  std::string hex;
  for (const char c : bytes) {
    hex.push_back(digits[static_cast<unsigned char>(c) >> 4]);
    hex.push_back(digits[c & 15]);
  }
  return hex;
}

std::string text_of(const Json& value) {
  return value.is_object() ? bytes_of(value.at("hex")) : value.get<std::string>();
}

Json json_of_text(const std::string& text) {
  return is_utf8(text) ? Json(text) : Json({{"hex", hex_of(text)}});
}

unsigned char byte_of(const Json& flag) {
  return flag.is_boolean() ? static_cast<unsigned char>(flag.get<bool>())
                           : flag.get<unsigned char>();
}

bool Reader::is_fresh(const void* memory, size_t size) {
  const auto* bytes = static_cast<const unsigned char*>(memory);
  return std::all_of(bytes, bytes + size, [](unsigned char byte) { return byte == kFreshByte; });
}

Json Reader::read_record(const qel_message_didviolationuser_t& pair) {
  Json record = Json::object();
  add(this, "userA", pair.userA, &record);
  add(this, "userB", pair.userB, &record);
  return record;
}

Json Reader::read_record(const qel_message_watermarkentry_t& mark) {
  Json record = Json::object();
  add(this, "userId", mark.userId, &record);
  add(this, "msgId", mark.msgId, &record);
  add(this, "timestamp", mark.timestamp, &record);
  return record;
}

Json Reader::read_record(const qel_message_chatroommember_t& member) {
  Json record = Json::object();
  add(this, "userId", member.userId, &record);
  add(this, "available", member.available, &record);
  add(this, "name", member.name, &record);
  return record;
}

Json Reader::read_record(const qel_message_inboxentry_t& entry) {
  Json record = Json::object();
  add(this, "msgId", entry.msgId, &record);
  add(this, "msgType", entry.msgType, &record);
  add(this, "sender", entry.sender, &record);
  add(this, "receiver", entry.receiver, &record);
  add(this, "sentTime", entry.sentTime, &record);
  add(this, "chatMsg", entry.chatMsg, &record);
  add(this, "chatroomId", entry.chatroomId, &record);
  add(this, "chatType", entry.chatType, &record);
  add(this, "msgTtl", entry.msgTtl, &record);
  return record;
}

Call::Call(const Json& given, const std::string& received) : given_(given), received_(received) {}

Json Call::given(const std::string& name) {
  names_.push_back(name);
  return given_.contains(name) ? given_[name] : Json();
}

char* Call::keep_text(const Json& text) {
  const std::string bytes = text_of(text);
  return keep(std::vector<char>(bytes.c_str(), bytes.c_str() + bytes.size() + 1));
}

qel_message_inboxentry_t Call::inbox_entry(const Json& fields) {
  qel_message_inboxentry_t entry = {};
  entry.msgId = fields.value("msgId", int64_t{0});
  entry.msgType = fields.value("msgType", 0);
  entry.sender = fields.value("sender", int64_t{0});
  entry.receiver = fields.value("receiver", int64_t{0});
  entry.sentTime = fields.value("sentTime", int64_t{0});
  entry.chatroomId = fields.value("chatroomId", int64_t{0});
  entry.chatType = fields.value("chatType", 0);
  entry.msgTtl = fields.value("msgTtl", 0);
  if (fields.contains("chatMsg")) {
    entry.chatMsg = keep_text(fields["chatMsg"]);
  }
  return entry;
}

template <>
qel_message_inboxentry_t** Call::argument<qel_message_inboxentry_t**>(const std::string& name) {
  names_.push_back(name);
  const bool is_given = given_.contains(name);  // null, or {to: null}: a pointer to NULL
  if (is_given && given_[name].is_null()) {
    return nullptr;
  }
  qel_message_inboxentry_t* record = nullptr;
  if (!is_given) {
    record = keep(std::vector<qel_message_inboxentry_t>(1));
    std::memset(record, kFreshByte, sizeof *record);
  }
  auto* pointer = keep(std::vector<qel_message_inboxentry_t*>{record});
  outputs_.emplace_back(name, [=](Reader* reader, Json* shown) {
    if (*pointer != record) {
      (*shown)[name] = "another record than the caller's";
    } else if (record != nullptr) {
      Json fields = reader->read(*record);
      if (fields != Reader::kUnwritten) {
        (*shown)[name] = std::move(fields);
      }
    }
  });
  return pointer;
}

void Call::expect_guards(const std::string& name, const unsigned char (&guard)[16],
                         Json* shown) const {
  if (std::any_of(std::begin(guard), std::end(guard),
                  [](unsigned char byte) { return byte != kFreshByte; })) {
    (*shown)["bytes beside " + name] = "were written";
  }
}

Json Call::outputs(Reader* reader) const {
  Json shown = Json::object();
  for (const auto& [name, show] : outputs_) {
    show(reader, &shown);
  }
  return shown;
}

Json Call::blank(const std::string& path, size_t size, unsigned char byte) const {
  const size_t end = path.find('[');
  const std::vector<unsigned char> memory(size, byte);
  return blanks_.at(path.substr(0, end))(memory.data(), size, end != std::string::npos);
}

void Call::set(const std::string& output, int value) const {
  *numbers_.at(output) = value;
}

std::vector<std::string> Call::unknown_names() const {
  std::vector<std::string> unknown;
  for (const auto& [name, value] : given_.items()) {
    if (std::find(names_.begin(), names_.end(), name) == names_.end()) {
      unknown.push_back(name);
    }
  }
  return unknown;
}

}  // namespace contract
