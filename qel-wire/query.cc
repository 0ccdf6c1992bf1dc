#include "query.h"

#include <strings.h>

#include <algorithm>
#include <functional>
#include <optional>
#include <unordered_map>
#include <utility>

#include "failure.h"
#include "merged.h"
#include "print.h"
#include "scan.h"
#include "schema.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::EnumValueDescriptor;
using google::protobuf::FieldDescriptor;

// Knows the path to each field that it is shown.
class Paths : public Visitor {
 public:
  void begin(const Piece& piece) final {
    const size_t index = levels_.back().counts[{piece.number, piece.is_known}]++;
    const std::string name = piece.is_known ? piece.field->name() : std::to_string(piece.number);
    const bool is_counted = index > 0 || (piece.is_known && piece.field->is_repeated());
    const std::string dot = levels_.size() > 1 ? "." : "";
    const std::string path = levels_.back().path + dot + name;
    const std::string place =
        levels_.back().place + dot + name + (is_counted ? "[" + std::to_string(index) + "]" : "");
    levels_.back().is_empty = false;
    field(path, place, piece);
    if (piece.is_container()) {
      levels_.push_back({path, place, {}, true});
    }
  }

  void end(const Piece& /*piece*/) final {
    if (levels_.back().is_empty) {
      nothing_in(levels_.back().place);
    }
    levels_.pop_back();
  }

 protected:
  Paths() : levels_(1) {}

  // The path has names alone, the place the indices of repeated fields too.
  virtual void field(const std::string& path, const std::string& place, const Piece& piece) = 0;
  virtual void nothing_in(const std::string& /*place*/) {}

 private:
  struct Level {
    std::string path;
    std::string place;
    std::map<std::pair<uint32_t, bool>, size_t> counts;  // by number, and whether it is known
    bool is_empty = true;
  };

  std::vector<Level> levels_;
};

// ---- Conditions

// The fields that the path leads to in the message, or in all messages.
std::vector<const FieldDescriptor*> fields_of(const Descriptor* type, const std::string& path) {
  std::vector<const Descriptor*> types{type};
  if (type == nullptr) {
    types.clear();
    for (int i = 0; i < schema_file().message_type_count(); ++i) {
      types.push_back(schema_file().message_type(i));
    }
  }
  std::vector<const FieldDescriptor*> fields;
  for (size_t begin = 0; begin <= path.size();) {
    const size_t end = std::min(path.find('.', begin), path.size());
    const std::string name = path.substr(begin, end - begin);
    fields.clear();
    std::vector<std::string> others;
    for (const Descriptor* each : types) {
      if (each == nullptr) {
        continue;
      }
      if (const FieldDescriptor* field = field_named(*each, name)) {
        fields.push_back(field);
      }
      const std::vector<std::string> names = field_names(*each);
      others.insert(others.end(), names.begin(), names.end());
    }
    if (fields.empty()) {
      throw Failure{kWrongCall,
                    (types.size() == 1 && types[0] != nullptr ? types[0]->name() + " has no field '"
                                                              : "no message has a field '") +
                        name + "'" + did_you_mean(name, others)};
    }
    types.clear();
    for (const FieldDescriptor* field : fields) {
      types.push_back(field->message_type());
    }
    begin = end + 1;
  }
  return fields;
}

// Where the first step of the path begins that is the number of an unknown field; what is behind it
// has numbers alone. If there is none, where one would begin behind the path.
size_t begin_of_unknown(const std::string& path) {
  size_t begin = 0;
  while (begin <= path.size() && !is_decimal(path[begin])) {
    begin = std::min(path.find('.', begin), path.size()) + 1;
  }
  if (begin < path.size() && path.find_first_not_of("0123456789.", begin) != std::string::npos) {
    throw Failure{kWrongCall, "'" + path + "': unknown fields have numbers, and no names"};
  }
  return begin;
}

// Of an unknown field, as decode writes it.
std::optional<int64_t> unknown_number_in(std::string_view text) {
  const bool is_hex = take_prefix("0x", &text);
  const auto value = number<uint64_t>(text, is_hex ? 16 : 10);
  return value.has_value() ? std::optional(static_cast<int64_t>(*value)) : number<int64_t>(text);
}

// As a number that values of the field can be compared with.
std::optional<int64_t> number_for(const FieldDescriptor& field, const std::string& text) {
  if (field.type() == FieldDescriptor::TYPE_BOOL) {
    return text == "true"    ? std::optional<int64_t>(1)
           : text == "false" ? std::optional<int64_t>(0)
                             : std::nullopt;
  }
  if (field.enum_type() != nullptr) {
    if (const EnumValueDescriptor* member = member_named(*field.enum_type(), text)) {
      return member->number();
    }
  }
  return number<int64_t>(text);
}

bool is_text(const FieldDescriptor& field) {
  return field.cpp_type() == FieldDescriptor::CPPTYPE_STRING;
}

int64_t number_of(const Piece& piece) {
  if (!piece.is_known || piece.field->type() == FieldDescriptor::TYPE_INT64) {
    return static_cast<int64_t>(piece.value);
  }
  return piece.field->type() == FieldDescriptor::TYPE_BOOL ? int64_t{piece.value != 0}
                                                           : piece.low_32_bits();
}

// Less than 0, 0, or more, as the value is less than the text, equal to it, or more.
std::optional<int> compare(const Piece& piece, const std::string& text) {
  if (piece.kind == Piece::kBytes) {
    return text_in_json(piece, BytesForm::kUsual).compare(text);
  }
  const auto number = piece.is_known ? number_for(*piece.field, text) : unknown_number_in(text);
  if (piece.is_container() || !number.has_value()) {
    return std::nullopt;
  }
  const int64_t value = number_of(piece);
  return value < *number ? -1 : value > *number ? 1 : 0;
}

// ---- Differences

struct Value {
  std::string text;
  bool is_hidden = false;    // and so not shown
  bool is_left_out = false;  // together with its place
};

// Calls take(place, value) for each field of a message.
class Values : public Paths {
 public:
  using Take = std::function<void(const std::string& place, const Value& value)>;

  Values(const Hidden& hidden, Take take) : hidden_(hidden), take_(std::move(take)) {}

 private:
  void field(const std::string& /*path*/, const std::string& place, const Piece& piece) override {
    if (group_left_out_.has_value() && piece.depth <= *group_left_out_) {
      group_left_out_.reset();  // it is over
    }
    const bool is_hidden = piece.kind != Piece::kMessage && hidden_.hides(piece);
    if (!piece.is_container()) {
      take_(place, {value_in_text(piece, BytesForm::kUsual), is_hidden,
                    group_left_out_.has_value() || (is_hidden && piece.kind != Piece::kBytes)});
    } else if (is_hidden && !group_left_out_.has_value()) {
      group_left_out_ = piece.depth;
    }
  }

  void nothing_in(const std::string& place) override {
    take_(place, {"{}", false, group_left_out_.has_value()});
  }

  const Hidden& hidden_;
  Take take_;
  std::optional<int> group_left_out_;  // the depth of the one around the last piece, or it is that
};

}  // namespace

// Whether a field that the message has is the one, with such a value.
class Condition::Search : public Paths {
 public:
  explicit Search(const Condition& condition) : condition_(condition) {}

  bool found() const { return found_; }

 private:
  void field(const std::string& path, const std::string& /*place*/, const Piece& piece) override {
    found_ = found_ || (strcasecmp(path.c_str(), condition_.path_.c_str()) == 0 && takes(piece));
  }

  bool takes(const Piece& piece) const {
    const Sign sign = condition_.sign_;
    if (sign == Sign::kIsThere || sign == Sign::kIsAbsent || piece.is_hidden) {
      return sign == Sign::kIsThere || sign == Sign::kIsAbsent;
    }
    if (sign == Sign::kHasWithin) {
      return piece.kind == Piece::kBytes &&
             text_in_json(piece, BytesForm::kUsual).find(condition_.value_) != std::string::npos;
    }
    const std::optional<int> order = compare(piece, condition_.value_);
    return order.has_value() && fits(sign, *order);
  }

  static bool fits(Sign sign, int order) {
    switch (sign) {
      case Sign::kEqual:
        return order == 0;
      case Sign::kDifferent:
        return order != 0;
      case Sign::kLess:
        return order < 0;
      case Sign::kLessOrEqual:
        return order <= 0;
      case Sign::kMore:
        return order > 0;
      default:
        return order >= 0;
    }
  }

  const Condition& condition_;
  bool found_ = false;
};

void Condition::parse(const std::string& text) {
  static constexpr std::pair<const char*, Sign> kSigns[] = {
      {"==", Sign::kEqual},       {"!=", Sign::kDifferent}, {"<=", Sign::kLessOrEqual},
      {">=", Sign::kMoreOrEqual}, {"=", Sign::kEqual},      {"<", Sign::kLess},
      {">", Sign::kMore},         {"~", Sign::kHasWithin}};
  const bool is_absent = !text.empty() && text[0] == '!';
  const size_t begin = is_absent ? 1 : 0;
  const size_t end = std::min(text.find_first_of("=!<>~", begin), text.size());
  path_ = text.substr(begin, end - begin);
  sign_ = is_absent ? Sign::kIsAbsent : Sign::kIsThere;
  const auto* found = std::find_if(std::begin(kSigns), std::end(kSigns), [&](const auto& sign) {
    return text.compare(end, std::string_view(sign.first).size(), sign.first) == 0;
  });
  const bool has_sign = end < text.size();
  if (path_.find_first_not_of(' ') == std::string::npos ||
      (has_sign && (is_absent || found == std::end(kSigns)))) {
    throw Failure{kWrongCall, "a condition is PATH, !PATH or PATH=VALUE, not '" + text + "'"};
  }
  if (has_sign) {
    sign_ = found->second;
    value_ = text.substr(end + std::string_view(found->first).size());
  }
}

Condition::Condition(const std::string& text, const Descriptor* type) {
  parse(text);
  const size_t unknown = begin_of_unknown(path_);
  const auto fields = unknown > 0 ? fields_of(type, path_.substr(0, unknown - 1))
                                  : std::vector<const FieldDescriptor*>();
  if (unknown <= path_.size()) {  // nothing is known of it, but of what it lies in
    if (!fields.empty() && std::all_of(fields.begin(), fields.end(), [](const auto* field) {
          return field->message_type() == nullptr;
        })) {
      throw Failure{kWrongCall, "'" + path_.substr(0, unknown - 1) + "' has no fields"};
    }
    return;
  }
  if (sign_ == Sign::kIsThere || sign_ == Sign::kIsAbsent) {
    return;
  }
  std::vector<std::string> members;
  for (const FieldDescriptor* field : fields) {
    const bool is_number = sign_ != Sign::kHasWithin && field->message_type() == nullptr;
    if (is_text(*field) || (is_number && number_for(*field, value_).has_value())) {
      return;
    }
    if (field->enum_type() != nullptr) {
      const std::vector<std::string> names = member_names(*field->enum_type());
      members.insert(members.end(), names.begin(), names.end());
    }
  }
  throw Failure{kWrongCall, sign_ == Sign::kHasWithin
                                ? "'" + path_ + "' is no text, which '~' looks into"
                                : "'" + path_ + "' has no value such as '" + value_ + "'" +
                                      did_you_mean(value_, members)};
}

bool Condition::holds(std::string_view bytes, const Descriptor& type, const Hidden& hidden) const {
  Search search(*this);
  walk_merged(bytes, type, hidden, &search);
  return search.found() != (sign_ == Sign::kIsAbsent);
}

bool diff(const Side& first, const Side& second, const Colours& colours, std::ostream* out) {
  const auto for_each_value = [](const Side& side, const Values::Take& take) {
    take("message", {side.type->name()});
    Values values(side.hidden, take);
    walk_merged(side.bytes, *side.type, Hidden(), &values);
  };
  bool is_different = false;
  const auto write = [&](char sign, const std::string& place, const Value& value) {
    is_different = true;
    if (!value.is_left_out) {
      *out << (sign == '-' ? colours.wrong : colours.value) << sign << ' ' << place << ": "
           << (value.is_hidden ? '"' + std::string(kNotShown) + '"' : value.text) << colours.end
           << '\n';
    }
  };
  std::unordered_map<std::string, Value> others;  // of the second that the first has not had yet
  for_each_value(
      second, [&](const std::string& place, const Value& value) { others.emplace(place, value); });
  for_each_value(first, [&](const std::string& place, const Value& value) {
    const auto other = others.find(place);
    if (other == others.end()) {
      write('-', place, value);
      return;
    }
    if (other->second.text != value.text) {
      write('-', place, value);
      write('+', place, other->second);
    }
    others.erase(other);
  });
  for_each_value(second, [&](const std::string& place, const Value& value) {
    if (others.count(place) > 0) {
      write('+', place, value);
    }
  });
  return is_different;
}

}  // namespace qel_wire
