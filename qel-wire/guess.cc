#include "guess.h"

#include <algorithm>
#include <bitset>
#include <tuple>

#include "msgspec_frontend.pb.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FileDescriptor;

class Fitting : public Visitor {
 public:
  explicit Fitting(Fit* fit) : fit_(*fit) {}

  void begin(const Piece& piece) override {
    if (!piece.is_known) {
      ++fit_.unknown;
    } else if (!piece.is_element()) {
      ++fit_.known;
      if (piece.depth == 0) {
        different_.set(static_cast<size_t>(piece.field->index()));
      }
    }
    // Packed lists are taken and never written.
    if (piece.kind == Piece::kPacked || piece.is_doubtful()) {
      ++fit_.doubtful;
    }
    // Encoders write fields in the order of their numbers.
    if (piece.earlier.has_value() || piece.is_late) {
      ++fit_.doubtful;
    }
  }

  // Of the message itself: how many of its fields it had.
  size_t different_fields() const { return different_.count(); }

 private:
  Fit& fit_;
  std::bitset<64> different_;  // by their indices; no message of the schema has more fields
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
