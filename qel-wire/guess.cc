#include "guess.h"

#include <algorithm>
#include <map>
#include <memory>
#include <tuple>

#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;

// Counts what the bytes of one field have in them.
class Fitting : public Visitor {
 public:
  void begin(const Piece& piece) override {
    if (!piece.is_known) {
      ++unknown;
    } else if (!piece.is_element()) {
      ++known;
      last_number = piece.depth == 0 ? piece.number : last_number;
    }
    doubtful += (piece.is_doubtful() ? 1U : 0U) + (piece.is_odd() ? 1U : 0U);
  }

  size_t known = 0;
  size_t unknown = 0;
  size_t doubtful = 0;
  uint32_t last_number = 0;  // of a known field of the message itself
};

// A field that many messages have alike: they read its bytes in the same way.
struct Field {
  const FieldDescriptor* descriptor;  // of one of them
  size_t count = 0;                   // how often it was there
  size_t odd = 0;                     // how often no encoder writes it so
  size_t first = 0;                   // when it was there first
  Fitting fitting;
  std::vector<size_t> counts;  // of all fields, when it was there first
  bool is_broken = false;      // no message that has it reads on

  bool is_like(const FieldDescriptor& other) const {
    return other.number() == descriptor->number() && other.type() == descriptor->type() &&
           other.is_repeated() == descriptor->is_repeated() &&
           other.enum_type() == descriptor->enum_type() &&
           other.message_type() == descriptor->message_type();
  }

  bool takes(Piece::Kind kind) const {
    const auto type = descriptor->cpp_type();
    const bool is_number =
        type != FieldDescriptor::CPPTYPE_STRING && type != FieldDescriptor::CPPTYPE_MESSAGE;
    return kind == Piece::kVarint
               ? is_number
               : kind == Piece::kBytes && (!is_number || descriptor->is_packable());
  }
};

struct Candidate {
  const Descriptor* type;
  std::vector<size_t> fields;  // their indices, by their numbers
  bool is_over = false;        // broken before the end
  Fit fit;
};

// Reads the bytes once, for all messages: there are 81, and captures are large.
class Race {
 public:
  Race() {
    for (int i = 0; i < schema_file().message_type_count(); ++i) {
      enter(*schema_file().message_type(i));
    }
  }

  std::vector<Candidate> run(std::string_view bytes) && {
    bytes_ = bytes;
    Reader reader(bytes_);
    Level level(nullptr, bytes_.size(), 0);
    size_t end = 0;
    for (Piece piece; reader.next(&level, &piece); end = piece.end) {
      reader.skip(&piece, level);
      if (reader.problem().has_value()) {
        break;
      }
      take(piece);
    }
    for (Candidate& candidate : candidates_) {
      if (!candidate.is_over) {
        finish(&candidate, bytes_.substr(end));
      }
    }
    return std::move(candidates_);
  }

 private:
  void enter(const Descriptor& type) {
    Candidate candidate{&type, {}, false, {}};
    for (int i = 0; i < type.field_count(); ++i) {
      const FieldDescriptor& descriptor = *type.field(i);
      const auto alike = std::find_if(fields_.begin(), fields_.end(), [&](const Field& field) {
        return field.is_like(descriptor);
      });
      candidate.fields.push_back(static_cast<size_t>(alike - fields_.begin()));
      if (alike == fields_.end()) {
        const auto number = static_cast<size_t>(descriptor.number());
        by_number_.resize(std::max(by_number_.size(), number + 1));
        by_number_[number].push_back(fields_.size());
        fields_.push_back({&descriptor, 0, 0, 0, {}, {}});
      }
    }
    candidates_.push_back(candidate);
  }

  void take(const Piece& piece) {
    ++count_;
    odd_ += piece.is_odd() ? 1 : 0;
    if (piece.number >= by_number_.size()) {
      return;
    }
    for (const size_t index : by_number_[piece.number]) {
      if (!fields_[index].is_broken && fields_[index].takes(piece.kind)) {
        take(piece, index);
      }
    }
  }

  void take(const Piece& piece, size_t index) {
    Field& field = fields_[index];
    if (field.count == 0) {
      field.first = count_;
      for (const Field& other : fields_) {
        field.counts.push_back(other.count);
      }
    }
    ++field.count;
    field.odd += piece.is_odd() ? 1 : 0;
    Piece known = piece;
    known.field = field.descriptor;
    known.is_known = true;
    if (piece.kind == Piece::kBytes &&
        field.descriptor->cpp_type() != FieldDescriptor::CPPTYPE_STRING) {
      known.kind = field.descriptor->message_type() != nullptr ? Piece::kMessage : Piece::kPacked;
    }
    field.fitting.begin(known);
    if (known.is_container() && !walk_content(bytes_, known, &field.fitting)) {
      field.is_broken = true;
      end_all_with(index);
    }
  }

  // A field is broken, and so are the messages that have it.
  void end_all_with(size_t index) {
    for (Candidate& candidate : candidates_) {
      const auto& fields = candidate.fields;
      if (!candidate.is_over && std::find(fields.begin(), fields.end(), index) != fields.end()) {
        finish(&candidate, "");
        candidate.fit.is_broken = candidate.is_over = true;
      }
    }
  }

  using Tail = std::pair<Fitting, bool>;  // and whether it is broken

  // Read once for all messages that have its field alike, or not at all.
  const Tail& tail_of(const Candidate& candidate, std::string_view rest) {
    Piece piece;
    Level level(nullptr, rest.size(), 0);
    Reader(rest).next(&level, &piece);
    const auto field =
        std::find_if(candidate.fields.begin(), candidate.fields.end(), [&](size_t index) {
          return fields_[index].descriptor->number() == static_cast<int>(piece.number);
        });
    const auto [tail, is_new] =
        tails_.try_emplace(field == candidate.fields.end() ? fields_.size() : *field);
    if (is_new) {
      tail->second.second = walk(rest, *candidate.type, &tail->second.first).has_value();
    }
    return tail->second;
  }

  // The rest is a field that reaches behind the end, which messages and lists may do.
  void finish(Candidate* candidate, std::string_view rest) {
    Fitting all;
    if (!rest.empty()) {
      std::tie(all, candidate->fit.is_broken) = tail_of(*candidate, rest);
    }
    const auto number_in_rest = static_cast<int>(all.last_number);
    size_t unknown = count_;
    size_t odd = odd_;  // of unknown fields; of others it is counted with them
    for (const size_t index : candidate->fields) {
      const Field& field = fields_[index];
      all.known += field.fitting.known;
      all.unknown += field.fitting.unknown;
      all.doubtful += field.fitting.doubtful + out_of_place(*candidate, field);
      unknown -= field.count;
      odd -= field.odd;
      const bool is_absent = field.count == 0 && field.descriptor->number() != number_in_rest;
      candidate->fit.absent += is_absent ? 1 : 0;
    }
    candidate->fit.known = all.known;
    candidate->fit.unknown = all.unknown + unknown;
    candidate->fit.doubtful = all.doubtful + odd;
  }

  // How often the field was there again, though it is not repeated, or behind one with a higher
  // number.
  size_t out_of_place(const Candidate& candidate, const Field& field) const {
    const Field* first_behind = nullptr;
    for (const size_t index : candidate.fields) {
      const Field& other = fields_[index];
      if (other.descriptor->number() > field.descriptor->number() && other.count > 0 &&
          (first_behind == nullptr || other.first < first_behind->first)) {
        first_behind = &other;
      }
    }
    if (field.count == 0) {
      return 0;
    }
    const auto index = static_cast<size_t>(&field - fields_.data());
    const size_t before = first_behind == nullptr ? field.count : first_behind->counts[index];
    const size_t late = field.count - before;
    return field.descriptor->is_repeated() ? late : field.count - (before == 0 ? 0 : 1);
  }

  std::string_view bytes_;
  std::vector<Field> fields_;
  std::vector<std::vector<size_t>> by_number_;
  std::vector<Candidate> candidates_;
  std::map<size_t, Tail> tails_;  // by the field's index
  size_t count_ = 0;              // of fields in the bytes
  size_t odd_ = 0;
};

auto quality(const Fit& fit) {
  return std::tuple(fit.is_broken, fit.is_record, fit.unknown + fit.doubtful, fit.unknown,
                    fit.absent, -static_cast<int64_t>(fit.known));
}

bool is_possible(const Descriptor& type, Use use) {
  const Use usual = use_of(type);
  return use == Use::kNone || usual == Use::kNone || usual == use;
}

}  // namespace

std::vector<Fit> guess(std::string_view bytes, Use use) {
  std::map<decltype(quality(Fit())), Fit> fits;
  static const Race start;  // to which all messages have come
  for (Candidate& candidate : Race(start).run(bytes)) {
    if (is_possible(*candidate.type, use)) {
      candidate.fit.is_record = is_record(*candidate.type);
      fits.emplace(quality(candidate.fit), candidate.fit)
          .first->second.types.push_back(candidate.type);
    }
  }
  std::vector<Fit> result;
  for (auto& [ignored, fit] : fits) {
    std::stable_partition(fit.types.begin(), fit.types.end(),
                          [](const Descriptor* type) { return use_of(*type) != Use::kNone; });
    result.push_back(fit);
  }
  return result;
}

}  // namespace qel_wire
