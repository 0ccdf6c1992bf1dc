#include "session.h"

#include <algorithm>
#include <set>
#include <string_view>

#include "guess.h"
#include "token.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using Types = std::vector<const Descriptor*>;

class RequestId : public Visitor {
 public:
  void begin(const Piece& piece) override {
    if (piece.depth == 0 && piece.is_known && piece.field->name() == "requestId") {
      value = static_cast<int64_t>(piece.value);
    }
    is_sound = is_sound && piece.is_known && !piece.is_odd() && !piece.is_doubtful();
  }

  std::optional<int64_t> value;
  bool is_sound = true;
};

// Notes the ids of a message that are not hidden.
class ShownIds : public Visitor {
 public:
  ShownIds(const Hidden& hidden, Entry* entry) : hidden_(hidden), entry_(*entry) {}

  void begin(const Piece& piece) override {
    if (piece.depth > 0 || !piece.is_known || hidden_.hides(piece)) {
      return;
    }
    if (piece.field->name() == "requestId") {
      entry_.shown_request_id = static_cast<int64_t>(piece.value);
    } else if (piece.field->name() == "chatroomId") {
      entry_.shown_chatroom_id = static_cast<int64_t>(piece.value);
    }
  }

 private:
  const Hidden& hidden_;
  Entry& entry_;
};

std::optional<int64_t> request_id_in(std::string_view bytes, const Descriptor& type) {
  RequestId id;
  walk(bytes, type, &id);
  return id.value;
}

// Whether an encoder may have written the bytes as such a message with that requestId.
bool may_be(std::string_view bytes, const Descriptor& type, std::optional<int64_t> request_id) {
  RequestId id;
  return !walk(bytes, type, &id).has_value() && id.is_sound && id.value == request_id;
}

// What may be the bytes' requestId, whatever message they are.
std::set<int64_t> possible_request_ids(std::string_view bytes) {
  std::set<int64_t> ids;
  Reader reader(bytes);
  Level level(nullptr, bytes.size(), 0);
  for (Piece piece; reader.next(&level, &piece); reader.skip(&piece, level)) {
    if (may_be_request_id(piece.number)) {
      ids.insert(static_cast<int64_t>(piece.value));
    }
  }
  return ids;
}

// Null if nothing answers it.
const Descriptor* reply_to(const Descriptor& type) {
  constexpr std::string_view kRequest = "Request";
  std::string name = type.name();
  if (name.size() > kRequest.size() && name.substr(name.size() - kRequest.size()) == kRequest) {
    name.resize(name.size() - kRequest.size());
  }
  return message_named(name + "Reply");
}

// What the message is if it answers the request, or null. Its type is null if it is not known.
const Descriptor* reply_among(const Entry& request, const Found& found, const Descriptor* type) {
  for (const Descriptor* possible : request.types) {
    const Descriptor* reply = reply_to(*possible);
    if (reply != nullptr &&
        (type == nullptr
             ? may_be(found.bytes, *reply, request.request_id)
             : type == reply && request_id_in(found.bytes, *reply) == request.request_id)) {
      return reply;
    }
  }
  return nullptr;
}

bool is_from_other_end(const Entry& request, const Found& found) {
  return request.end == Use::kNone || found.use == Use::kNone || request.end != found.use;
}

Use other(Use use) {
  return use == Use::kSends ? Use::kReceives : use == Use::kReceives ? Use::kSends : Use::kNone;
}

}  // namespace

// The last of them is answered; null if none is. The type is null if it is not known.
Session::Alike* Session::requests_answered_by(const Found& found, const Descriptor* type) {
  for (const int64_t id : possible_request_ids(found.bytes)) {
    const auto open = open_.find({found.connection, id});
    if (open == open_.end()) {
      continue;
    }
    Alike* answered = nullptr;
    for (auto& [ignored, requests] : open->second) {
      if (!requests.empty() && is_from_other_end(requests.back(), found) &&
          (answered == nullptr || answered->back().number < requests.back().number) &&
          reply_among(requests.back(), found, type) != nullptr) {
        answered = &requests;
      }
    }
    if (answered != nullptr) {
      return answered;
    }
  }
  return nullptr;
}

// A message that only one of the ends sends tells more than the ports. A record knows.
Use Session::use_of_sender(const Found& found, const Descriptor* type) {
  if (found.use == Use::kNone || found.outcome.has_value()) {
    return found.use;
  }
  if (type != nullptr && use_of(*type) != Use::kNone) {
    if (use_of(*type) == found.use) {
      turned_.erase(found.connection);
    } else {
      turned_.insert(found.connection);
    }
  }
  return turned_.count(found.connection) > 0 ? other(found.use) : found.use;
}

Entry Session::add(const Found& found) {
  Entry entry;
  entry.number = last_ = found.number > 0 ? found.number : last_ + 1;
  entry.connection = found.connection;
  entry.end = found.use;
  const Descriptor* type = message_named(found.name);
  const Use use = use_of_sender(found, type);
  Alike* const requests = requests_answered_by(found, type);
  const Entry* const request = requests != nullptr ? &requests->back() : nullptr;
  entry.is_guess = type == nullptr && (request == nullptr || request->is_guess);
  if (type == nullptr && request != nullptr) {
    type = reply_among(*request, found, nullptr);
  }
  entry.types = type == nullptr ? guess(found.bytes, use).front().types : Types{type};
  type = entry.types.front();
  entry.request_id = request_id_in(found.bytes, *type);
  const Hidden hidden(found.bytes, *type);
  ShownIds ids(hidden, &entry);
  walk(found.bytes, *type, &ids);
  entry.use = use != Use::kNone ? use : use_of(*type);
  if (request != nullptr) {
    entry.answers = request->number;
    entry.use = entry.use != Use::kNone ? entry.use : other(request->use);
    requests->pop_back();
  } else if (reply_to(*type) != nullptr && !found.is_unsent() &&
             (found.missing > 0 || !problem_of(found.bytes, *type).has_value())) {
    open_[{entry.connection, entry.request_id}][{entry.end, entry.types}].push_back(entry);
  }
  return entry;
}

std::vector<Entry> Session::unanswered() const {
  std::vector<Entry> entries;
  for (const auto& [place, kinds] : open_) {
    for (const auto& [kind, requests] : kinds) {
      entries.insert(entries.end(), requests.begin(), requests.end());
    }
  }
  std::sort(entries.begin(), entries.end(),
            [](const Entry& a, const Entry& b) { return a.number < b.number; });
  return entries;
}

}  // namespace qel_wire
