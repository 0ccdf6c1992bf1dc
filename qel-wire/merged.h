// What the message's class holds once it has read the bytes, in the order in which it writes it:
// known fields by their numbers, of fields that come again the last, embedded messages that come
// again as one, unknown fields at last. The message is never built, so this takes no memory.
#ifndef QEL_WIRE_MERGED_H
#define QEL_WIRE_MERGED_H

#include <google/protobuf/descriptor.h>

#include <string_view>

#include "token.h"
#include "walk.h"

namespace qel_wire {

// Shows the visitor these fields of bytes that are read whole: not packed lists, but their
// elements; numbers outside their enumeration as unknown fields; without what is hidden, but for
// texts, whose bytes are kNotShown.
void walk_merged(std::string_view bytes, const google::protobuf::Descriptor& type,
                 const Hidden& hidden, Visitor* visitor);

}  // namespace qel_wire

#endif
