// A recorded session as a scenario.
#ifndef TESTKIT_SESSION_H
#define TESTKIT_SESSION_H

#include <string>
#include <string_view>
#include <vector>

#include "scenario.h"

namespace testkit {

// Thrown: why the bytes are no session that can be replayed.
struct Unreadable {
  std::string reason;
};

// What the plug-in sent as expectations, and what it received as pushes. A file that is cut off
// ends with its last whole record.
std::vector<Statement> read_session(std::string_view bytes);

}  // namespace testkit

#endif
