#include "guess.h"

#include <algorithm>
#include <map>
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

// What the messages of the schema have in common.
struct Schema {
  struct Message {
    const Descriptor* type;
    Use use;
    bool is_record;
    std::vector<size_t> fields;  // the indices of those that it has
  };

  Schema() {
    for (int i = 0; i < schema_file().message_type_count(); ++i) {
      const Descriptor& type = *schema_file().message_type(i);
      messages.push_back({&type, use_of(type), is_record(type), {}});
      for (int f = 0; f < type.field_count(); ++f) {
        messages.back().fields.push_back(index_of(*type.field(f)));
      }
    }
  }

  std::vector<Message> messages;
  // Of fields that messages have alike, as they read their bytes in the same way, one.
  std::vector<const FieldDescriptor*> fields;
  std::vector<std::vector<size_t>> by_number;  // their indices

 private:
  size_t index_of(const FieldDescriptor& field) {
    const auto number = static_cast<size_t>(field.number());
    by_number.resize(std::max(by_number.size(), number + 1));
    for (const size_t index : by_number[number]) {
      if (are_alike(*fields[index], field)) {
        return index;
      }
    }
    by_number[number].push_back(fields.size());
    fields.push_back(&field);
    return fields.size() - 1;
  }

  static bool are_alike(const FieldDescriptor& one, const FieldDescriptor& other) {
    return one.type() == other.type() && one.is_repeated() == other.is_repeated() &&
           one.enum_type() == other.enum_type() && one.message_type() == other.message_type();
  }
};

// What the bytes have of a field.
struct Field {
  size_t count = 0;  // how often it was there
  size_t odd = 0;    // how often no encoder writes it so, wherever it stands
  Fitting fitting;
  bool is_broken = false;  // no message that has it reads on
};

bool takes(const FieldDescriptor& field, Piece::Kind kind) {
  const auto type = field.cpp_type();
  const bool is_number =
      type != FieldDescriptor::CPPTYPE_STRING && type != FieldDescriptor::CPPTYPE_MESSAGE;
  return kind == Piece::kVarint ? is_number
                                : kind == Piece::kBytes && (!is_number || field.is_packable());
}

// Reads the bytes once, for all messages: there are 81, and captures are large.
class Race {
 public:
  Race(const Schema& schema, std::string_view bytes)
      : schema_(schema),
        bytes_(bytes),
        fields_(schema.fields.size()),
        fits_(schema.messages.size()) {}

  // How well each message fits.
  std::vector<Fit> run() && {
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
    for (size_t message = 0; message < fits_.size(); ++message) {
      if (!fits_[message].is_broken) {
        finish(message, bytes_.substr(end));
      }
    }
    return std::move(fits_);
  }

 private:
  void take(const Piece& piece) {
    ++count_;
    odd_ += piece.is_odd() ? 1 : 0;
    const bool is_late = piece.number < highest_;
    highest_ = std::max(highest_, piece.number);
    if (piece.number >= schema_.by_number.size()) {
      return;
    }
    for (const size_t index : schema_.by_number[piece.number]) {
      if (!fields_[index].is_broken && takes(*schema_.fields[index], piece.kind)) {
        take(piece, is_late, index);
      }
    }
  }

  void take(const Piece& piece, bool is_late, size_t index) {
    Field& field = fields_[index];
    Piece known = piece;
    known.field = schema_.fields[index];
    known.is_known = true;
    known.is_late = is_late;
    if (field.count > 0 && !known.field->is_repeated()) {
      known.earlier = 0;  // or anywhere
    }
    ++field.count;
    field.odd += piece.is_odd() ? 1 : 0;
    if (piece.kind == Piece::kBytes && known.field->cpp_type() != FieldDescriptor::CPPTYPE_STRING) {
      known.kind = known.field->message_type() != nullptr ? Piece::kMessage : Piece::kPacked;
    }
    field.fitting.begin(known);
    if (known.is_container() && !walk_content(bytes_, known, &field.fitting)) {
      field.is_broken = true;
      end_all_with(index);
    }
  }

  // A field is broken, and so are the messages that have it.
  void end_all_with(size_t index) {
    for (size_t message = 0; message < fits_.size(); ++message) {
      const auto& fields = schema_.messages[message].fields;
      if (!fits_[message].is_broken &&
          std::find(fields.begin(), fields.end(), index) != fields.end()) {
        finish(message, "");
        fits_[message].is_broken = true;
      }
    }
  }

  using Tail = std::pair<Fitting, bool>;  // and whether it is broken

  // Read once for all messages that have its field alike, or not at all.
  const Tail& tail_of(const Schema::Message& message, std::string_view rest) {
    Piece piece;
    Level level(nullptr, rest.size(), 0);
    Reader(rest).next(&level, &piece);
    const auto field =
        std::find_if(message.fields.begin(), message.fields.end(), [&](size_t index) {
          return schema_.fields[index]->number() == static_cast<int>(piece.number);
        });
    const auto [tail, is_new] =
        tails_.try_emplace(field == message.fields.end() ? fields_.size() : *field);
    if (is_new) {
      tail->second.second = walk(rest, *message.type, &tail->second.first).has_value();
    }
    return tail->second;
  }

  // The rest is a field that reaches behind the end, which messages and lists may do.
  void finish(size_t message, std::string_view rest) {
    const Schema::Message& of = schema_.messages[message];
    Fit& fit = fits_[message];
    fit.is_record = of.is_record;
    Fitting all;
    if (!rest.empty()) {
      std::tie(all, fit.is_broken) = tail_of(of, rest);
    }
    const auto number_in_rest = static_cast<int>(all.last_number);
    size_t unknown = count_;
    size_t odd = odd_;  // of unknown fields; of others it is counted with them
    for (const size_t index : of.fields) {
      const Field& field = fields_[index];
      if (field.count == 0) {
        fit.absent += schema_.fields[index]->number() != number_in_rest ? 1 : 0;
        continue;
      }
      all.known += field.fitting.known;
      all.unknown += field.fitting.unknown;
      all.doubtful += field.fitting.doubtful;
      unknown -= field.count;
      odd -= field.odd;
    }
    fit.known = all.known;
    fit.unknown = all.unknown + unknown;
    fit.doubtful = all.doubtful + odd;
  }

  const Schema& schema_;
  std::string_view bytes_;
  std::vector<Field> fields_;     // by their indices
  std::vector<Fit> fits_;         // of each message
  std::map<size_t, Tail> tails_;  // by the field's index
  size_t count_ = 0;              // of fields in the bytes
  size_t odd_ = 0;
  uint32_t highest_ = 0;  // number
};

auto quality(const Fit& fit) {
  return std::tuple(fit.is_broken, fit.is_record, fit.unknown + fit.doubtful, fit.unknown,
                    fit.absent, -static_cast<int64_t>(fit.known));
}

}  // namespace

std::vector<Fit> guess(std::string_view bytes, Use use) {
  static const Schema schema;
  const std::vector<Fit> fits = Race(schema, bytes).run();
  // Of those that fit equally well, the C interface's come first, and then the schema's first one.
  std::vector<std::tuple<decltype(quality(Fit())), bool, size_t>> ranks;
  ranks.reserve(fits.size());
  for (size_t i = 0; i < fits.size(); ++i) {
    const Use usual = schema.messages[i].use;
    if (use == Use::kNone || usual == Use::kNone || usual == use) {
      ranks.emplace_back(quality(fits[i]), usual == Use::kNone, i);
    }
  }
  std::sort(ranks.begin(), ranks.end());
  std::vector<Fit> result;
  for (const auto& [how_well, is_other, i] : ranks) {
    if (result.empty() || quality(result.back()) != how_well) {
      result.push_back(fits[i]);
    }
    result.back().types.push_back(schema.messages[i].type);
  }
  return result;
}

}  // namespace qel_wire
