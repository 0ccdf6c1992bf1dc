#include "listing.h"

#include <google/protobuf/descriptor.h>

#include <iomanip>
#include <nlohmann/json.hpp>

#include "token.h"

namespace qel_wire {
namespace {

using Object = nlohmann::ordered_json;

const char* direction_of(Use use) {
  return use == Use::kSends ? "sent" : use == Use::kReceives ? "received" : "?";
}

// Adds the ids of a message that are not hidden, as texts, as the JSON form has them.
class Ids : public Visitor {
 public:
  Ids(const Hidden& hidden, Object* object) : hidden_(hidden), object_(*object) {}

  void begin(const Piece& piece) override {
    if (piece.depth == 0 && piece.is_known && !hidden_.hides(piece) &&
        (piece.field->name() == "requestId" || piece.field->name() == "chatroomId")) {
      object_[piece.field->name()] = std::to_string(static_cast<int64_t>(piece.value));
    }
  }

 private:
  const Hidden& hidden_;
  Object& object_;
};

void print(const Object& object, std::ostream* out) {
  *out << object.dump() << '\n';
}

}  // namespace

const char* outcome_of(const Found& found) {
  switch (*found.outcome) {
    case Outcome::kDone:
      return found.use == Use::kSends ? "written" : "taken";
    case Outcome::kRefused:
      return "refused";
    case Outcome::kNotEnded:
      return "not ended";
    default:
      return "end not known";
  }
}

std::string way_of(const Found& found) {
  return direction_of(found.use) + (found.function.empty() ? "" : " by " + found.function) + ", " +
         outcome_of(found);
}

std::string size_of(const Found& found) {
  return found.missing == 0 ? counted(found.bytes.size(), "byte")
                            : too_long(found.size(), found.bytes.size());
}

void print_entry(const Entry& entry, const Found& found, const std::optional<Problem>& problem,
                 const Colours& colours, std::ostream* out) {
  *out << std::setw(5) << entry.number << "  "
       << (found.time.has_value() ? utc(found.milliseconds()) + "  " : "") << std::left
       << std::setw(8) << direction_of(entry.use) << std::right << "  " << colours.name
       << entry.types.front()->name() << colours.end << (entry.is_guess ? "?" : "") << ", "
       << size_of(found);
  if (entry.request_id.has_value()) {
    *out << ", requestId " << *entry.request_id;
  }
  if (entry.answers.has_value()) {
    *out << ", answers " << *entry.answers;
  }
  if (found.outcome.has_value()) {
    const bool is_good = *found.outcome == Outcome::kDone;
    *out << ", " << (is_good ? "" : colours.wrong) << outcome_of(found)
         << (is_good ? "" : colours.end);
  }
  if (problem.has_value()) {
    *out << "  " << colours.wrong << "broken at offset " << problem->offset << ": "
         << problem->reason << colours.end;
  }
  *out << '\n';
}

void print_unanswered(const Entry& entry, std::ostream* out) {
  *out << "no answer to " << entry.number << ", " << entry.types.front()->name() << '\n';
}

void print_entry_json(const Entry& entry, const Found& found, const std::optional<Problem>& problem,
                      std::ostream* out) {
  const google::protobuf::Descriptor& type = *entry.types.front();
  Object object;
  object["number"] = entry.number;
  if (found.time.has_value()) {
    object["time"] = rfc3339(found.milliseconds());
  }
  if (entry.use != Use::kNone) {
    object["direction"] = direction_of(entry.use);
  }
  object["message"] = type.name();
  if (entry.is_guess) {
    object["guess"] = true;
  }
  if (!found.function.empty()) {
    object["function"] = found.function;
  }
  object["size"] = found.size();
  if (found.missing > 0) {
    object["missing"] = found.missing;
  }
  const Hidden hidden(found.bytes, type);
  Ids ids(hidden, &object);
  walk(found.bytes, type, &ids);
  if (entry.answers.has_value()) {
    object["answers"] = *entry.answers;
  }
  if (found.outcome.has_value()) {
    object["outcome"] = outcome_of(found);
  }
  if (problem.has_value()) {
    object["broken"] = {{"offset", problem->offset}, {"reason", problem->reason}};
  }
  print(object, out);
}

void print_unanswered_json(const Entry& entry, std::ostream* out) {
  Object object;
  object["unanswered"] = entry.number;
  object["message"] = entry.types.front()->name();
  if (entry.request_id.has_value()) {
    object["requestId"] = std::to_string(*entry.request_id);
  }
  print(object, out);
}

}  // namespace qel_wire
