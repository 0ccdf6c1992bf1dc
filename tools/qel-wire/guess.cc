#include "guess.h"

#include <algorithm>
#include <bitset>
#include <tuple>

#include "msgspec_frontend.pb.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::FileDescriptor;

class Fitting : public Visitor {
 public:
  explicit Fitting(Fit* fit) : fit_(*fit) { levels_.emplace_back(); }

  void begin(const Piece& piece) override {
    if (!piece.is_known) {
      ++fit_.unknown;
    } else if (!piece.is_element()) {
      ++fit_.known;
      check_order(*piece.field);
    }
    // Packed lists are taken and never written.
    if (piece.kind == Piece::kPacked || piece.is_doubtful()) {
      ++fit_.doubtful;
    }
    if (piece.is_container()) {
      levels_.emplace_back();
    }
  }

  void end(const Piece& /*piece*/) override { levels_.pop_back(); }

  // Of the message itself: how many of its fields it had.
  size_t different_fields() const { return std::bitset<64>(levels_.front().seen).count(); }

 private:
  // The fields that a message had so far. No message of the schema has 64.
  struct Level {
    uint64_t seen = 0;  // a bit each, by its index
    int highest = 0;    // number
  };

  // Encoders write fields in the order of their numbers.
  void check_order(const FieldDescriptor& field) {
    Level& level = levels_.back();
    const uint64_t bit = uint64_t{1} << static_cast<unsigned>(field.index());
    const bool is_again = (level.seen & bit) != 0 && !field.is_repeated();
    const bool is_late = field.number() < level.highest;
    if (is_again || is_late) {
      ++fit_.doubtful;
    }
    level.seen |= bit;
    level.highest = std::max(level.highest, field.number());
  }

  Fit& fit_;
  std::vector<Level> levels_;  // of nesting
};

Fit fit(std::string_view bytes, const Descriptor& type) {
  Fit result;
  result.type = &type;
  Fitting fitting(&result);
  result.is_broken = walk(bytes, type, &fitting).has_value();
  result.absent = static_cast<size_t>(type.field_count()) - fitting.different_fields();
  return result;
}

auto quality(const Fit& fit) {
  return std::tuple(fit.is_broken, fit.unknown + fit.doubtful, fit.unknown, fit.absent);
}

}  // namespace

std::vector<Fit> guess(std::string_view bytes) {
  const FileDescriptor& schema = *ChannelAuthRequest::descriptor()->file();
  std::vector<Fit> fits;
  for (int i = 0; i < schema.message_type_count(); ++i) {
    fits.push_back(fit(bytes, *schema.message_type(i)));
  }
  std::stable_sort(fits.begin(), fits.end(),
                   [](const Fit& a, const Fit& b) { return quality(a) < quality(b); });
  for (size_t i = 0; i < fits.size(); ++i) {
    const bool is_equal = i > 0 && quality(fits[i]) == quality(fits[i - 1]);
    fits[i].rank = is_equal ? fits[i - 1].rank : static_cast<int>(i) + 1;
  }
  return fits;
}

}  // namespace qel_wire
