// The user's credential, which is in a ChannelAuthRequest and is shown only if that is asked for.
#ifndef QEL_WIRE_TOKEN_H
#define QEL_WIRE_TOKEN_H

#include <google/protobuf/descriptor.h>

#include <cstdint>
#include <string_view>

namespace qel_wire {

bool is_access_token(const google::protobuf::FieldDescriptor& field);

// Whether a text that no field is known for may be one or hold one, because the bytes are read as
// another message or begin elsewhere: it has the token's number, or is a ChannelAuthRequest with a
// token, or has a field in which one is.
bool may_hold_access_token(uint32_t number, std::string_view text);

}  // namespace qel_wire

#endif
