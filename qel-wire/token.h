// The user's credential, which is in a ChannelAuthRequest and is shown only if that is asked for.
#ifndef QEL_WIRE_TOKEN_H
#define QEL_WIRE_TOKEN_H

#include <google/protobuf/descriptor.h>

#include <cstddef>
#include <string_view>
#include <vector>

#include "walk.h"

namespace qel_wire {

// In place of what is hidden.
inline constexpr char kNotShown[] = "(not shown)";

// Makes the piece say that its text is hidden.
inline void hide_text(Piece* piece) {
  piece->is_hidden = true;
  piece->bytes = kNotShown;
}

// Which bytes of the input are not shown, because they may be the access token's.
//
// A capture may be read as another message than it is, begin or end anywhere, or be damaged, so a
// field's name says little. If the bytes are read whole, and have only known fields in their order,
// they are taken for what they seem to be, and most texts are shown. If not, whatever may be a
// piece of a text is hidden, wherever it is: a token is text.
class Hidden {
 public:
  Hidden() = default;  // nothing
  // Nothing, too, if the token is to be shown.
  Hidden(std::string_view bytes, const google::protobuf::Descriptor& type, bool show_token = false);

  bool hides_any() const { return !hidden_.empty(); }
  bool at(size_t offset) const { return !hidden_.empty() && hidden_[offset]; }
  // Whether the text of a piece is hidden, or the number, or what a container begins with.
  bool hides(const Piece& piece) const;
  // Whether the end of a group is.
  bool hides_end(const Piece& piece) const;

 private:
  bool any(size_t begin, size_t end) const;

  std::vector<bool> hidden_;  // for each byte, or empty if none is
};

}  // namespace qel_wire

#endif
