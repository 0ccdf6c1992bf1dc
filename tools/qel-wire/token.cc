#include "token.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/unknown_field_set.h>

#include "msgspec_frontend.pb.h"
#include "text.h"

namespace qel_wire {

using google::protobuf::UnknownField;
using google::protobuf::UnknownFieldSet;

bool is_access_token(const Piece& piece) {
  if (piece.depth != 0 || piece.kind != Piece::kBytes ||
      piece.number != ChannelAuthRequest::kAccessTokenFieldNumber) {
    return false;
  }
  return !piece.is_known || piece.field->containing_type() == ChannelAuthRequest::descriptor();
}

void hide_access_token(google::protobuf::Message* message) {
  auto* request = dynamic_cast<ChannelAuthRequest*>(message);
  if (request != nullptr && request->has_accesstoken()) {
    request->set_accesstoken(kNotShown);
  }
  UnknownFieldSet* unknown = message->GetReflection()->MutableUnknownFields(message);
  for (int i = 0; i < unknown->field_count(); ++i) {
    UnknownField* field = unknown->mutable_field(i);
    if (field->number() == ChannelAuthRequest::kAccessTokenFieldNumber &&
        field->type() == UnknownField::TYPE_LENGTH_DELIMITED) {
      *field->mutable_length_delimited() = kNotShown;
    }
  }
}

}  // namespace qel_wire
