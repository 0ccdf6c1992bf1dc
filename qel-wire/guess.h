#ifndef QEL_WIRE_GUESS_H
#define QEL_WIRE_GUESS_H

#include <google/protobuf/descriptor.h>

#include <string_view>
#include <vector>

namespace qel_wire {

// How well bytes fit a message of a type. Less is better of everything but known bytes.
struct Fit {
  const google::protobuf::Descriptor* type = nullptr;
  bool is_broken = false;
  size_t unknown = 0;  // fields that the message does not know
  // Numbers outside their enumeration or their 32 bits, texts that are no UTF-8, packed lists, a
  // field again that is not repeated, one behind a field with a higher number.
  size_t doubtful = 0;
  size_t absent = 0;  // the message's own fields that the bytes do not have
  size_t known = 0;   // fields that it knows
  int rank = 0;       // from 1; the same for those that fit equally well
};

// All messages of the schema, the best first; equals in the order of the schema.
std::vector<Fit> guess(std::string_view bytes);

}  // namespace qel_wire

#endif
