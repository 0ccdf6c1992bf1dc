#include "token.h"

#include "msgspec_frontend.pb.h"
#include "walk.h"

namespace qel_wire {
namespace {

constexpr int kDeepestSearch = 4;

bool holds_access_token(std::string_view text, int depth);

class Search : public Visitor {
 public:
  explicit Search(int depth) : depth_(depth) {}

  void begin(const Piece& piece) override {
    if (piece.kind != Piece::kBytes) {
      return;
    }
    const bool is_token = piece.number == ChannelAuthRequest::kAccessTokenFieldNumber;
    found_ = found_ || is_token || (!piece.is_known && holds_access_token(piece.bytes, depth_ + 1));
  }

  bool found() const { return found_; }

 private:
  int depth_;
  bool found_ = false;
};

bool holds_access_token(std::string_view text, int depth) {
  if (depth > kDeepestSearch) {
    return false;
  }
  Search search(depth);
  const bool is_message = !walk(text, *ChannelAuthRequest::descriptor(), &search).has_value();
  return is_message && search.found();
}

}  // namespace

bool is_access_token(const google::protobuf::FieldDescriptor& field) {
  return field.number() == ChannelAuthRequest::kAccessTokenFieldNumber &&
         field.containing_type() == ChannelAuthRequest::descriptor();
}

bool may_hold_access_token(uint32_t number, std::string_view text) {
  return number == ChannelAuthRequest::kAccessTokenFieldNumber || holds_access_token(text, 0);
}

}  // namespace qel_wire
