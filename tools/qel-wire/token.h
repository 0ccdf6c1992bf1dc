// The user's credential, which is in a ChannelAuthRequest and is shown only if that is asked for.
#ifndef QEL_WIRE_TOKEN_H
#define QEL_WIRE_TOKEN_H

#include <google/protobuf/message.h>

#include "walk.h"

namespace qel_wire {

// Also what may be one, because the bytes are read as another message: an unknown text of the same
// number.
bool is_access_token(const Piece& piece);

// Puts kNotShown in its place.
void hide_access_token(google::protobuf::Message* message);

}  // namespace qel_wire

#endif
