#include "decode.h"

#include "token.h"

namespace qel_wire {
namespace {

// Looks for fields that no encoder writes there, and counts numbers and groups that are hidden.
class Notes : public Visitor {
 public:
  explicit Notes(const Hidden& hidden) : hidden_(hidden) {}

  void begin(const Piece& piece) override {
    const bool is_odd = piece.earlier.has_value() || piece.is_late;
    if (is_odd && count_++ == 0) {
      first_ = piece.offset;
    }
    const bool may_be_left_out = piece.kind != Piece::kBytes && piece.kind != Piece::kMessage &&
                                 piece.kind != Piece::kPacked;
    const bool is_left_out = may_be_left_out && hidden_.hides(piece);
    left_out_ += is_left_out && hidden_groups_ == 0 ? 1 : 0;
    if (piece.kind == Piece::kGroup && (is_left_out || hidden_groups_ > 0)) {
      ++hidden_groups_;
    }
  }

  void end(const Piece& piece) override {
    if (piece.kind == Piece::kGroup && hidden_groups_ > 0) {
      --hidden_groups_;
    }
  }

  void add_to(std::vector<std::string>* notes) const {
    if (count_ > 0) {
      notes->push_back(counted(count_, "field") + " again or out of order, the first at offset " +
                       std::to_string(first_) +
                       ": these may be two messages, of which the later one's values are kept "
                       "('qel-wire explain' marks them)");
    }
    if (left_out_ > 0) {
      notes->push_back("without " + counted(left_out_, "field") +
                       " that may be a piece of an access token: --show-token shows them");
    }
  }

 private:
  const Hidden& hidden_;
  size_t count_ = 0;
  size_t first_ = 0;  // offset
  size_t left_out_ = 0;
  size_t hidden_groups_ = 0;  // around the next piece
};

}  // namespace

std::optional<Problem> check(std::string_view bytes, const google::protobuf::Descriptor& type,
                             const Hidden& hidden, std::vector<std::string>* notes) {
  Notes visitor(hidden);
  std::optional<Problem> problem = walk(bytes, type, &visitor);
  visitor.add_to(notes);
  return problem;
}

Decoded decode(std::string_view bytes, const google::protobuf::Descriptor& type,
               const DecodeOptions& options, std::ostream* out) {
  Decoded result;
  const Hidden hidden(bytes, type, options.show_token);
  result.problem = check(bytes, type, hidden, &result.notes);
  if (result.problem.has_value()) {
    if (!options.is_partial) {
      return {{}, result.problem};
    }
    bytes = bytes.substr(0, result.problem->readable);
  }
  if (!options.as_json) {
    print_text(bytes, type, hidden, options.bytes_form, options.colours, out);
    return result;
  }
  const NotInJson lost = print_json(bytes, type, hidden, options.bytes_form, options.colours, out);
  if (lost.unknown > 0) {
    result.notes.push_back("without " + counted(lost.unknown, "unknown field") +
                           ", which JSON has no place for");
  }
  if (lost.replaced > 0) {
    result.notes.push_back("with replacements in " + counted(lost.replaced, "text") +
                           " that JSON cannot have, as it is not UTF-8");
  }
  return result;
}

}  // namespace qel_wire
