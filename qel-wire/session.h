// What two ends told each other: messages in order, and which answers which.
#ifndef QEL_WIRE_SESSION_H
#define QEL_WIRE_SESSION_H

#include <google/protobuf/descriptor.h>

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "input.h"
#include "schema.h"

namespace qel_wire {

struct Entry {
  size_t number = 0;  // that of Found, or from 1
  // Of a guess all that fit equally well, otherwise one.
  std::vector<const google::protobuf::Descriptor*> types;
  bool is_guess = false;  // or answers a guess
  Use use = Use::kNone;   // whether the plug-in has sent or received it, as far as that is known
  Use end = Use::kNone;   // the same as the ports have it, which may turn it round
  size_t connection = 0;
  std::optional<int64_t> request_id;
  // Those that are not hidden.
  std::optional<int64_t> shown_request_id;
  std::optional<int64_t> shown_chatroom_id;
  std::optional<size_t> answers;  // the number of the request
};

class Session {
 public:
  // The next message. Its type is the one that its frame names, or that answers a request with the
  // same requestId from the other end, or the best guess.
  Entry add(const Found& found);

  // Requests that were sent and that no message has answered, the first one first.
  std::vector<Entry> unanswered() const;

 private:
  // Requests that are alike but for their numbers, in their order: there may be many.
  using Alike = std::vector<Entry>;
  using Kind = std::pair<Use, std::vector<const google::protobuf::Descriptor*>>;

  Alike* requests_answered_by(const Found& found, const google::protobuf::Descriptor* type);

  Use use_of_sender(const Found& found, const google::protobuf::Descriptor* type);

  size_t last_ = 0;          // the number of the last message
  std::set<size_t> turned_;  // connections whose ends are the other way round than they seemed
  // By their connections and requestIds; those without one are never answered.
  std::map<std::pair<size_t, std::optional<int64_t>>, std::map<Kind, Alike>> open_;
};

}  // namespace qel_wire

#endif
