// A recorded session.
#ifndef TESTKIT_SESSION_H
#define TESTKIT_SESSION_H

#include <string>
#include <string_view>
#include <vector>

#include "notation.h"

namespace testkit {

// Thrown: why the bytes are no session that can be replayed.
struct Unreadable {
  std::string reason;
};

// A message that was sent by the plug-in, or received.
struct Step {
  bool was_sent;
  std::string where;  // "record 3"
  const google::protobuf::Descriptor* type;
  std::string bytes;
  Pattern message;  // if it was sent
};

// What the plug-in sent and received, in that order. A file that is cut off ends with its last
// whole record.
std::vector<Step> read_session(std::string_view bytes);

}  // namespace testkit

#endif
