#include "forms.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/io/tokenizer.h>
#include <google/protobuf/text_format.h>
#include <google/protobuf/unknown_field_set.h>
#include <nettle/base16.h>
#include <nettle/base64.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <vector>

#include "text.h"

namespace qel_wire {
namespace {

using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::Reflection;
using google::protobuf::TextFormat;
using Json = nlohmann::ordered_json;

class ReadableTexts : public TextFormat::FieldValuePrinter {
 public:
  std::string PrintString(const std::string& text) const override { return in_quotes(text); }
  std::string PrintBytes(const std::string& bytes) const override { return in_quotes(bytes); }
};

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

Json json_object(const Message& message);

// The value of a field, or of one of its elements (index >= 0).
Json json_value(const Message& message, const FieldDescriptor& field, int index) {
  const Reflection& fields = *message.GetReflection();
  const bool is_element = index >= 0;
  switch (field.cpp_type()) {
    case FieldDescriptor::CPPTYPE_INT32:
      return is_element ? fields.GetRepeatedInt32(message, &field, index)
                        : fields.GetInt32(message, &field);
    case FieldDescriptor::CPPTYPE_INT64:
      return std::to_string(is_element ? fields.GetRepeatedInt64(message, &field, index)
                                       : fields.GetInt64(message, &field));
    case FieldDescriptor::CPPTYPE_BOOL:
      return is_element ? fields.GetRepeatedBool(message, &field, index)
                        : fields.GetBool(message, &field);
    case FieldDescriptor::CPPTYPE_ENUM:
      return (is_element ? fields.GetRepeatedEnum(message, &field, index)
                         : fields.GetEnum(message, &field))
          ->name();
    case FieldDescriptor::CPPTYPE_STRING: {
      const std::string text = is_element ? fields.GetRepeatedString(message, &field, index)
                                          : fields.GetString(message, &field);
      return field.type() == FieldDescriptor::TYPE_BYTES ? to_notation(text, Notation::kBase64)
                                                         : text;
    }
    case FieldDescriptor::CPPTYPE_MESSAGE:
      return json_object(is_element ? fields.GetRepeatedMessage(message, &field, index)
                                    : fields.GetMessage(message, &field));
    default:
      throw std::logic_error(field.full_name() + " has a type that no other field has");
  }
}

// In the order of the numbers.
Json json_object(const Message& message) {
  const Reflection& fields = *message.GetReflection();
  std::vector<const FieldDescriptor*> present;
  fields.ListFields(message, &present);
  Json object = Json::object();
  for (const FieldDescriptor* field : present) {
    Json& value = object[field->name()];
    if (!field->is_repeated()) {
      value = json_value(message, *field, -1);
      continue;
    }
    for (int i = 0; i < fields.FieldSize(message, field); ++i) {
      value.push_back(json_value(message, *field, i));
    }
  }
  return object;
}

std::string without_separators(std::string_view hex) {
  std::string digits;
  for (size_t i = 0; i < hex.size(); ++i) {
    const std::string_view two = hex.substr(i, 2);
    if (two == "0x" || two == "\\x") {
      ++i;
    } else if (hex[i] != ':' && hex[i] != ',') {
      digits += hex[i];
    }
  }
  return digits;
}

std::optional<std::string> from_hex(std::string_view text) {
  const std::string digits = without_separators(text);
  std::vector<uint8_t> bytes(BASE16_DECODE_LENGTH(digits.size()) + 1);
  size_t size = bytes.size();
  base16_decode_ctx context;
  base16_decode_init(&context);
  if (base16_decode_update(&context, &size, bytes.data(), digits.size(), digits.data()) != 1 ||
      base16_decode_final(&context) != 1) {
    return std::nullopt;
  }
  return std::string(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(size));
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
  std::vector<uint8_t> bytes(BASE64_DECODE_LENGTH(digits.size()));
  size_t size = bytes.size();
  base64_decode_ctx context;
  base64_decode_init(&context);
  if (base64_decode_update(&context, &size, bytes.data(), digits.size(), digits.data()) != 1 ||
      base64_decode_final(&context) != 1) {
    return std::nullopt;
  }
  return std::string(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(size));
}

}  // namespace

std::string text_form(const Message& message) {
  TextFormat::Printer printer;
  printer.SetDefaultFieldValuePrinter(new ReadableTexts);  // which the printer owns
  std::string text;
  printer.PrintToString(message, &text);
  return text;
}

std::string json_form(const Message& message) {
  // Characters outside ASCII are escaped, as most printers of JSON do; what is no UTF-8 is
  // replaced.
  return json_object(message).dump(2, ' ', true, Json::error_handler_t::replace) + "\n";
}

int unknown_fields(const Message& message) {
  const Reflection& fields = *message.GetReflection();
  int count = fields.GetUnknownFields(message).field_count();
  std::vector<const FieldDescriptor*> present;
  fields.ListFields(message, &present);
  for (const FieldDescriptor* field : present) {
    if (field->message_type() == nullptr) {
      continue;
    }
    if (!field->is_repeated()) {
      count += unknown_fields(fields.GetMessage(message, field));
      continue;
    }
    for (int i = 0; i < fields.FieldSize(message, field); ++i) {
      count += unknown_fields(fields.GetRepeatedMessage(message, field, i));
    }
  }
  return count;
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
