#include "forms.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/io/tokenizer.h>
#include <google/protobuf/text_format.h>
#include <google/protobuf/unknown_field_set.h>
#include <nettle/base16.h>
#include <nettle/base64.h>

#include <algorithm>
#include <cctype>
#include <iomanip>
#include <nlohmann/json.hpp>
#include <sstream>
#include <stdexcept>
#include <type_traits>
#include <utility>
#include <vector>

#include "token.h"

namespace qel_wire {
namespace {

using google::protobuf::EnumValueDescriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::Reflection;
using google::protobuf::TextFormat;
using google::protobuf::UnknownField;
using google::protobuf::UnknownFieldSet;
using Json = nlohmann::ordered_json;

// The first complaint.
class Complaint : public google::protobuf::io::ErrorCollector {
 public:
  void AddError(int line, int column, const std::string& message) override {
    if (!text_.has_value()) {
      text_ = (line < 0 ? "" : std::to_string(line + 1) + ":" + std::to_string(column + 1) + ": ") +
              message;
    }
  }
  void AddWarning(int /*line*/, int /*column*/, const std::string& /*message*/) override {}

  const std::optional<std::string>& text() const { return text_; }

 private:
  std::optional<std::string> text_;
};

// The value of a field, or of one of its elements (index >= 0), handed to take as a bool, a number,
// a text, an EnumValueDescriptor or a Message.
template <typename Take>
void take_value(const Message& message, const FieldDescriptor& field, int index, Take take) {
  const Reflection& fields = *message.GetReflection();
  const bool is_element = index >= 0;
  switch (field.cpp_type()) {
    case FieldDescriptor::CPPTYPE_INT32:
      return take(is_element ? fields.GetRepeatedInt32(message, &field, index)
                             : fields.GetInt32(message, &field));
    case FieldDescriptor::CPPTYPE_INT64:
      return take(is_element ? fields.GetRepeatedInt64(message, &field, index)
                             : fields.GetInt64(message, &field));
    case FieldDescriptor::CPPTYPE_BOOL:
      return take(is_element ? fields.GetRepeatedBool(message, &field, index)
                             : fields.GetBool(message, &field));
    case FieldDescriptor::CPPTYPE_ENUM:
      return take(*(is_element ? fields.GetRepeatedEnum(message, &field, index)
                               : fields.GetEnum(message, &field)));
    case FieldDescriptor::CPPTYPE_STRING:
      return take(is_element ? fields.GetRepeatedString(message, &field, index)
                             : fields.GetString(message, &field));
    case FieldDescriptor::CPPTYPE_MESSAGE:
      return take(is_element ? fields.GetRepeatedMessage(message, &field, index)
                             : fields.GetMessage(message, &field));
    default:
      throw std::logic_error(field.full_name() + " has a type that no other field has");
  }
}

// Hands over each value that the message has, in the order of the numbers: take(field, index), with
// the index as take_value() has it.
template <typename Take>
void for_each_value(const Message& message, Take take) {
  const Reflection& fields = *message.GetReflection();
  std::vector<const FieldDescriptor*> present;
  fields.ListFields(message, &present);
  for (const FieldDescriptor* field : present) {
    if (!field->is_repeated()) {
      take(*field, -1);
      continue;
    }
    for (int i = 0; i < fields.FieldSize(message, field); ++i) {
      take(*field, i);
    }
  }
}

// ---- Text

class TextWriter {
 public:
  explicit TextWriter(const Colours& colours) : colours_(colours) {}

  void write(const Message& message) {
    for_each_value(message, [&](const FieldDescriptor& field, int index) {
      take_value(message, field, index, [&](const auto& value) { write_value(field, value); });
    });
    write_unknown(message.GetReflection()->GetUnknownFields(message));
  }

  std::string text() && { return std::move(text_); }

 private:
  template <typename Value>
  void write_value(const FieldDescriptor& field, const Value& value) {
    if constexpr (std::is_same_v<Value, Message>) {
      open(field.name());
      write(value);
      close();
    } else if constexpr (std::is_same_v<Value, EnumValueDescriptor>) {
      line(field.name(), value.name());
    } else if constexpr (std::is_same_v<Value, std::string>) {
      line(field.name(), in_quotes(value));
    } else if constexpr (std::is_same_v<Value, bool>) {
      line(field.name(), value ? "true" : "false");
    } else {
      line(field.name(), std::to_string(value));
    }
  }

  void write_unknown(const UnknownFieldSet& fields) {
    for (int i = 0; i < fields.field_count(); ++i) {
      const UnknownField& field = fields.field(i);
      const std::string name = std::to_string(field.number());
      switch (field.type()) {
        case UnknownField::TYPE_VARINT:
          line(name, std::to_string(field.varint()));
          break;
        case UnknownField::TYPE_FIXED32:
          line(name, "0x" + in_hex(field.fixed32(), 8));
          break;
        case UnknownField::TYPE_FIXED64:
          line(name, "0x" + in_hex(field.fixed64(), 16));
          break;
        case UnknownField::TYPE_GROUP:
          open(name);
          write_unknown(field.group());
          close();
          break;
        default:
          // Not taken apart: a text that is no message looks like one often enough.
          line(name, in_quotes(field.length_delimited()));
      }
    }
  }

  static std::string in_hex(uint64_t number, int digits) {
    std::ostringstream text;
    text << std::hex << std::setfill('0') << std::setw(digits) << number;
    return text.str();
  }

  void begin_line(const std::string& name) {
    text_.append(2 * depth_, ' ').append(colours_.name).append(name);
    text_ += colours_.end;
  }

  void line(const std::string& name, const std::string& value) {
    begin_line(name);
    text_.append(": ").append(colours_.value).append(value);
    text_.append(colours_.end).append("\n");
  }

  void open(const std::string& name) {
    begin_line(name);
    text_ += " {\n";
    ++depth_;
  }

  void close() {
    --depth_;
    text_.append(2 * depth_, ' ').append("}\n");
  }

  const Colours& colours_;
  size_t depth_ = 0;
  std::string text_;
};

// ---- JSON

Json json_object(const Message& message);

template <typename Value>
Json json_value(const FieldDescriptor& field, const Value& value) {
  if constexpr (std::is_same_v<Value, Message>) {
    return json_object(value);
  } else if constexpr (std::is_same_v<Value, EnumValueDescriptor>) {
    return value.name();
  } else if constexpr (std::is_same_v<Value, std::string>) {
    const bool is_encoded = field.type() == FieldDescriptor::TYPE_BYTES && value != kNotShown;
    return is_encoded ? to_notation(value, Notation::kBase64) : value;
  } else if constexpr (std::is_same_v<Value, google::protobuf::int64>) {
    return std::to_string(value);
  } else {
    return value;
  }
}

Json json_object(const Message& message) {
  Json object = Json::object();
  for_each_value(message, [&](const FieldDescriptor& field, int index) {
    take_value(message, field, index, [&](const auto& value) {
      Json& place = object[field.name()];
      if (index >= 0) {
        place.push_back(json_value(field, value));
      } else {
        place = json_value(field, value);
      }
    });
  });
  return object;
}

// The key that a line of JSON begins with.
std::pair<size_t, size_t> find_key(const std::string& line) {
  const size_t begin = line.find_first_not_of(' ');
  const size_t colon = line.find("\": ");
  const bool has_key =
      begin != std::string::npos && line[begin] == '"' && colon != std::string::npos;
  return has_key ? std::pair(begin, colon + 1) : std::pair<size_t, size_t>(0, 0);
}

// ---- Hex and base64

bool is_hex_digit(char c) {
  return std::isxdigit(static_cast<unsigned char>(c)) != 0;
}

std::string without_separators(std::string_view hex) {
  std::string digits;
  for (size_t i = 0; i < hex.size(); ++i) {
    const std::string_view two = hex.substr(i, 2);
    const bool is_within_digits = i > 0 && is_hex_digit(hex[i - 1]);
    if (two == "\\x" || ((two == "0x" || two == "0X") && !is_within_digits)) {
      ++i;
    } else if (hex[i] != ':' && hex[i] != ',') {
      digits += hex[i];
    }
  }
  return digits;
}

// By one of Nettle's decoders.
template <typename Context>
std::optional<std::string> decoded(const std::string& digits, size_t most,
                                   void (*init)(Context* context),
                                   int (*update)(Context* context, size_t* size, uint8_t* bytes,
                                                 size_t digit_count, const char* digits),
                                   int (*finish)(Context* context)) {
  std::vector<uint8_t> bytes(most);
  size_t size = bytes.size();
  Context context;
  init(&context);
  if (update(&context, &size, bytes.data(), digits.size(), digits.data()) != 1 ||
      finish(&context) != 1) {
    return std::nullopt;
  }
  return std::string(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(size));
}

std::optional<std::string> from_hex(std::string_view text) {
  const std::string digits = without_separators(text);
  return decoded(digits, BASE16_DECODE_LENGTH(digits.size()) + 1, base16_decode_init,
                 base16_decode_update, base16_decode_final);
}

std::optional<std::string> from_base64(std::string_view text) {
  std::string digits;
  std::copy_if(text.begin(), text.end(), std::back_inserter(digits), [](char c) {
    return std::string_view(" \t\r\n\f\v").find(c) == std::string_view::npos;
  });
  std::replace(digits.begin(), digits.end(), '-', '+');
  std::replace(digits.begin(), digits.end(), '_', '/');
  if (digits.size() % 4 == 1) {  // six bits are no byte
    return std::nullopt;
  }
  digits.append((4 - digits.size() % 4) % 4, '=');
  return decoded(digits, BASE64_DECODE_LENGTH(digits.size()), base64_decode_init,
                 base64_decode_update, base64_decode_final);
}

}  // namespace

std::string text_form(const Message& message, const Colours& colours) {
  TextWriter writer(colours);
  writer.write(message);
  return std::move(writer).text();
}

std::string json_form(const Message& message, const Colours& colours) {
  // Characters outside ASCII are escaped, as most printers of JSON do; what is no UTF-8 is
  // replaced.
  const std::string json = json_object(message).dump(2, ' ', true, Json::error_handler_t::replace);
  return with_coloured_names(json, colours, find_key);
}

int unknown_fields(const Message& message) {
  int count = message.GetReflection()->GetUnknownFields(message).field_count();
  for_each_value(message, [&](const FieldDescriptor& field, int index) {
    if (field.message_type() != nullptr) {
      take_value(message, field, index, [&](const auto& value) {
        if constexpr (std::is_base_of_v<Message, std::decay_t<decltype(value)>>) {
          count += unknown_fields(value);
        }
      });
    }
  });
  return count;
}

bool lacks_hidden_text(const Message& message) {
  bool found = false;
  for_each_value(message, [&](const FieldDescriptor& field, int index) {
    take_value(message, field, index, [&](const auto& value) {
      using Value = std::decay_t<decltype(value)>;
      if constexpr (std::is_same_v<Value, Message>) {
        found = found || lacks_hidden_text(value);
      } else if constexpr (std::is_same_v<Value, std::string>) {
        found = found || value == kNotShown;
      }
    });
  });
  return found;
}

std::optional<std::string> parse_text(const std::string& text, Message* message) {
  Complaint complaint;
  TextFormat::Parser parser;
  parser.RecordErrorsTo(&complaint);
  if (parser.ParseFromString(text, message)) {
    return std::nullopt;
  }
  return complaint.text().value_or("no message");
}

std::optional<std::string> from_notation(std::string_view text, Notation notation) {
  switch (notation) {
    case Notation::kHex:
      return from_hex(text);
    case Notation::kBase64:
      return from_base64(text);
    default:
      return std::string(text);
  }
}

std::string to_notation(std::string_view bytes, Notation notation) {
  const auto* data = reinterpret_cast<const uint8_t*>(bytes.data());
  std::string text;
  switch (notation) {
    case Notation::kHex:
      text.resize(BASE16_ENCODE_LENGTH(bytes.size()));
      base16_encode_update(text.data(), bytes.size(), data);
      return text;
    case Notation::kBase64:
      text.resize(BASE64_ENCODE_RAW_LENGTH(bytes.size()));
      base64_encode_raw(text.data(), bytes.size(), data);
      return text;
    default:
      return std::string(bytes);
  }
}

}  // namespace qel_wire
