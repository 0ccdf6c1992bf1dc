// The messages of a session, a line for each.
#ifndef QEL_WIRE_LISTING_H
#define QEL_WIRE_LISTING_H

#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include "input.h"
#include "session.h"
#include "text.h"
#include "walk.h"

namespace qel_wire {

// How the call ended that made or took a message of a session file, in a word or two.
const char* outcome_of(const Found& found);

// The same with what it did, and the function: "received by chat_reply_deserialize, taken".
std::string way_of(const Found& found);

// "12 bytes", and how many of them are there.
std::string size_of(const Found& found);

// The problem is that of the bytes, if they are broken.
void print_entry(const Entry& entry, const Found& found, const std::optional<Problem>& problem,
                 const Colours& colours, std::ostream* out);
void print_unanswered(const Entry& entry, std::ostream* out);

// As objects.
void print_entry_json(const Entry& entry, const Found& found, const std::optional<Problem>& problem,
                      std::ostream* out);
void print_unanswered_json(const Entry& entry, std::ostream* out);

}  // namespace qel_wire

#endif
