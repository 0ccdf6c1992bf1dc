#include "query.h"

#include <algorithm>
#include <charconv>
#include <optional>

#include "failure.h"
#include "merged.h"
#include "notation.h"
#include "print.h"
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
    const size_t index = levels_.back().counts[piece.number]++;
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
    std::map<uint32_t, size_t> counts;  // of fields, by their numbers
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
    for (const std::string& name : message_names()) {
      types.push_back(message_named(name));
    }
  }
  std::vector<const FieldDescriptor*> fields;
  for (size_t begin = 0; begin <= path.size();) {
    const size_t end = std::min(path.find('.', begin), path.size());
    const std::string name = path.substr(begin, end - begin);
    fields.clear();
    std::vector<std::string> others;
    for (const Descriptor* each : types) {
      for (int i = 0; each != nullptr && i < each->field_count(); ++i) {
        others.push_back(each->field(i)->name());
        if (each->field(i)->name() == name) {
          fields.push_back(each->field(i));
        }
      }
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

std::optional<int64_t> number_in(const std::string& text) {
  int64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return error == std::errc() && end == text.data() + text.size() ? std::optional(number)
                                                                  : std::nullopt;
}

// As a number that values of the field can be compared with.
std::optional<int64_t> number_for(const FieldDescriptor& field, const std::string& text) {
  if (field.type() == FieldDescriptor::TYPE_BOOL) {
    return text == "true"    ? std::optional<int64_t>(1)
           : text == "false" ? std::optional<int64_t>(0)
                             : std::nullopt;
  }
  if (field.enum_type() != nullptr) {
    const EnumValueDescriptor* member = field.enum_type()->FindValueByName(text);
    if (member != nullptr) {
      return member->number();
    }
  }
  return number_in(text);
}

bool is_text(const FieldDescriptor& field) {
  return field.cpp_type() == FieldDescriptor::CPPTYPE_STRING;
}

std::string text_of(const Piece& piece) {
  const bool is_bytes = piece.is_known && piece.field->type() == FieldDescriptor::TYPE_BYTES;
  return is_bytes && !piece.is_hidden ? to_notation(piece.bytes, Notation::kBase64)
                                      : std::string(piece.bytes);
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
    return text_of(piece).compare(text);
  }
  const auto number = piece.is_known ? number_for(*piece.field, text) : number_in(text);
  if (piece.is_container() || !number.has_value()) {
    return std::nullopt;
  }
  const int64_t value = number_of(piece);
  return value < *number ? -1 : value > *number ? 1 : 0;
}

class Matching : public Paths {
 public:
  Matching(const std::string& path, const std::string& sign, const std::string& value)
      : path_(path), sign_(sign), value_(value) {}

  bool found() const { return found_; }

 private:
  void field(const std::string& path, const std::string& /*place*/, const Piece& piece) override {
    found_ = found_ || (path == path_ && takes(piece));
  }

  bool takes(const Piece& piece) const {
    if (sign_.empty() || sign_ == "!") {
      return true;
    }
    if (sign_ == "~") {
      return piece.kind == Piece::kBytes && text_of(piece).find(value_) != std::string::npos;
    }
    const std::optional<int> order = compare(piece, value_);
    if (!order.has_value()) {
      return false;
    }
    const char first = sign_[0];
    const bool takes_equal = first == '=' || (first != '!' && sign_.size() == 2);
    return *order == 0
               ? takes_equal
               : first == '!' || (first == '<' && *order < 0) || (first == '>' && *order > 0);
  }

  const std::string& path_;
  const std::string& sign_;
  const std::string& value_;
  bool found_ = false;
};

// ---- Differences

class Values : public Paths {
 public:
  explicit Values(std::vector<std::pair<std::string, std::string>>* values) : values_(*values) {}

 private:
  void field(const std::string& /*path*/, const std::string& place, const Piece& piece) override {
    if (!piece.is_container()) {
      values_.emplace_back(place, value_in_text(piece, BytesForm::kUsual));
    }
  }

  void nothing_in(const std::string& place) override { values_.emplace_back(place, "{}"); }

  std::vector<std::pair<std::string, std::string>>& values_;
};

// Where two messages have their values, in this order.
std::vector<std::pair<std::string, std::string>> values_of(std::string_view bytes,
                                                           const Descriptor& type,
                                                           bool show_token) {
  std::vector<std::pair<std::string, std::string>> values{{"message", type.name()}};
  Values visitor(&values);
  walk_merged(bytes, type, show_token ? Hidden() : Hidden(bytes, type), &visitor);
  return values;
}

}  // namespace

Condition::Condition(const std::string& text, const Descriptor* type) {
  const size_t end = text.find_first_of("=!<>~", 1);
  if (text[0] == '!') {
    sign_ = "!";
    path_ = text.substr(1);
  } else if (end == std::string::npos) {
    path_ = text;
  } else {
    const size_t size = text[end] != '=' && text[end] != '~' && text[end + 1] == '=' ? 2 : 1;
    path_ = text.substr(0, end);
    sign_ = text.substr(end, size);
    value_ = text.substr(end + size);
  }
  if (path_.empty() || (path_[path_.rfind('.') + 1] >= '0' && path_[path_.rfind('.') + 1] <= '9')) {
    return;  // of an unknown field, about which nothing is known
  }
  const auto fields = fields_of(type, path_);
  if (sign_.empty() || sign_ == "!") {
    return;
  }
  const bool is_possible =
      std::any_of(fields.begin(), fields.end(), [this](const FieldDescriptor* field) {
        return is_text(*field) || (sign_ != "~" && field->message_type() == nullptr &&
                                   number_for(*field, value_).has_value());
      });
  if (!is_possible) {
    throw Failure{kWrongCall, "'" + path_ + "' cannot be compared with that"};
  }
}

bool Condition::holds(std::string_view bytes, const Descriptor& type, const Hidden& hidden) const {
  Matching search(path_, sign_, value_);
  walk_merged(bytes, type, hidden, &search);
  return search.found() != (sign_ == "!");
}

bool diff(std::string_view first, const Descriptor& first_type, std::string_view second,
          const Descriptor& second_type, bool show_token, const Colours& colours,
          std::ostream* out) {
  const auto before = values_of(first, first_type, show_token);
  const auto after = values_of(second, second_type, show_token);
  const std::map<std::string, std::string> old_values(before.begin(), before.end());
  const std::map<std::string, std::string> new_values(after.begin(), after.end());
  bool is_different = false;
  const auto write = [&](char sign, const std::string& colour, const auto& value) {
    is_different = true;
    *out << colour << sign << ' ' << value.first << ": " << value.second << colours.end << '\n';
  };
  for (const auto& value : before) {
    const auto other = new_values.find(value.first);
    if (other == new_values.end() || other->second != value.second) {
      write('-', colours.wrong, value);
    }
    if (other != new_values.end() && other->second != value.second) {
      write('+', colours.value, *other);
    }
  }
  for (const auto& value : after) {
    if (old_values.count(value.first) == 0) {
      write('+', colours.value, value);
    }
  }
  return is_different;
}

}  // namespace qel_wire
