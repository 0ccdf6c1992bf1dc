#ifndef QEL_WIRE_GUESS_H
#define QEL_WIRE_GUESS_H

#include <google/protobuf/descriptor.h>

#include <string_view>
#include <vector>

#include "schema.h"

namespace qel_wire {

// How well bytes fit messages. Less is better of everything but known fields.
struct Fit {
  // That fit equally well; those of the C interface first, then in the order of the schema.
  std::vector<const google::protobuf::Descriptor*> types;
  bool is_broken = false;
  bool is_record = false;  // never sent alone
  size_t unknown = 0;      // fields that the message does not know
  // Fields that no encoder of this protocol writes so: numbers outside their enumeration or their
  // 32 bits, texts that are no UTF-8, packed lists, a field again that is not repeated, one behind
  // a field with a higher number, varints with more bytes than they need.
  size_t doubtful = 0;
  size_t absent = 0;  // the message's own fields that the bytes do not have
  size_t known = 0;   // fields that it knows
};

// All messages of the schema, the best first; but for those that a plug-in sends, if it has
// received the bytes, and the other way round.
std::vector<Fit> guess(std::string_view bytes, Use use = Use::kNone);

}  // namespace qel_wire

#endif
