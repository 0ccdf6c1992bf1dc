#include "listing.h"

#include <iomanip>
#include <nlohmann/json.hpp>

namespace qel_wire {
namespace {

using Object = nlohmann::ordered_json;

const char* direction_of(Use use) {
  return use == Use::kSends ? "sent" : use == Use::kReceives ? "received" : "?";
}

// int64 is a text in the JSON form.
void add_id(const char* name, const std::optional<int64_t>& id, Object* object) {
  if (id.has_value()) {
    (*object)[name] = std::to_string(*id);
  }
}

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
  if (entry.shown_request_id.has_value()) {
    *out << ", requestId " << *entry.shown_request_id;
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
  Object object;
  object["number"] = entry.number;
  if (found.time.has_value()) {
    object["time"] = rfc3339(found.milliseconds());
  }
  if (entry.use != Use::kNone) {
    object["direction"] = direction_of(entry.use);
  }
  object["message"] = entry.types.front()->name();
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
  add_id("requestId", entry.shown_request_id, &object);
  add_id("chatroomId", entry.shown_chatroom_id, &object);
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
  add_id("requestId", entry.shown_request_id, &object);
  print(object, out);
}

}  // namespace qel_wire
