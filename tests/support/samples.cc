#include "support/samples.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/unknown_field_set.h>

#include <algorithm>
#include <limits>
#include <numeric>
#include <sstream>
#include <stdexcept>

#include "support/peer.h"

namespace support {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::EnumDescriptor;
using google::protobuf::EnumValueDescriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::UnknownFieldSet;

// ---- What only the later schema knows

constexpr int32_t kLaterMember = 1000;
constexpr int32_t kEarlierMember = std::numeric_limits<int32_t>::min();

// No message of the schema has these numbers; the first four are among those that it has.
struct LaterField {
  int number;
  const char* declaration;
  const char* text;
  void (*add_to)(UnknownFieldSet* fields);
};

const LaterField kLaterFields[] = {
    {8, "optional uint64 laterNumber = 8;", "laterNumber: 18446744073709551615\n",
     [](UnknownFieldSet* fields) { fields->AddVarint(8, 18446744073709551615U); }},
    {9, "optional fixed64 laterLong = 9;", "laterLong: 72623859790382856\n",
     [](UnknownFieldSet* fields) { fields->AddFixed64(9, 0x0102030405060708); }},
    {24, "optional bytes laterBytes = 24;", "laterBytes: \"\\377\\000\"\n",
     [](UnknownFieldSet* fields) { fields->AddLengthDelimited(24)->assign("\xff\0", 2); }},
    {26, "optional group LaterGroup = 26 { optional int32 number = 1; }",
     "LaterGroup {\n  number: -1\n}\n",
     [](UnknownFieldSet* fields) { fields->AddGroup(26)->AddVarint(1, ~uint64_t{0}); }},
    {536870911, "optional fixed32 laterInt = 536870911;", "laterInt: 16909060\n",
     [](UnknownFieldSet* fields) { fields->AddFixed32(536870911, 0x01020304); }},
};

// ---- Text form

// As the peer writes it: what is not printable ASCII as three octal digits.
std::string quoted(const std::string& value) {
  static const std::string kEscaped = "\n\r\t\"'\\";
  static const std::string kLetters = "nrt\"'\\";
  std::string text = "\"";
  for (const char c : value) {
    const size_t escape = kEscaped.find(c);
    const auto byte = static_cast<unsigned char>(c);
    if (escape != std::string::npos) {
      text += '\\';
      text += kLetters[escape];
    } else if (byte < 0x20 || byte > 0x7e) {
      text += '\\';
      for (const int shift : {6, 3, 0}) {
        text += static_cast<char>('0' + (byte >> shift & 7));
      }
    } else {
      text += c;
    }
  }
  return text + '"';
}

// ---- Filling

void put(Message* message, const FieldDescriptor* field, int64_t value) {
  const auto* fields = message->GetReflection();
  field->is_repeated() ? fields->AddInt64(message, field, value)
                       : fields->SetInt64(message, field, value);
}
void put(Message* message, const FieldDescriptor* field, int32_t value) {
  const auto* fields = message->GetReflection();
  field->is_repeated() ? fields->AddInt32(message, field, value)
                       : fields->SetInt32(message, field, value);
}
void put(Message* message, const FieldDescriptor* field, bool value) {
  const auto* fields = message->GetReflection();
  field->is_repeated() ? fields->AddBool(message, field, value)
                       : fields->SetBool(message, field, value);
}
void put(Message* message, const FieldDescriptor* field, const std::string& value) {
  const auto* fields = message->GetReflection();
  field->is_repeated() ? fields->AddString(message, field, value)
                       : fields->SetString(message, field, value);
}
void put(Message* message, const FieldDescriptor* field, const EnumValueDescriptor* value) {
  const auto* fields = message->GetReflection();
  field->is_repeated() ? fields->AddEnum(message, field, value)
                       : fields->SetEnum(message, field, value);
}
Message* put_message(Message* message, const FieldDescriptor* field) {
  const auto* fields = message->GetReflection();
  return field->is_repeated() ? fields->AddMessage(message, field)
                              : fields->MutableMessage(message, field);
}

UnknownFieldSet* unknown_fields(Message* message) {
  return message->GetReflection()->MutableUnknownFields(message);
}

// Walks a message's fields by number, and writes the text while it sets them.
class Filler {
 public:
  explicit Filler(const Filling& filling) : filling_(filling) {}

  void fill(Message* message, bool in_element) {
    const Descriptor& type = *message->GetDescriptor();
    const LaterField* later = std::begin(kLaterFields);
    const auto fill_later_below = [&](int number) {
      for (; later != std::end(kLaterFields) && later->number < number; ++later) {
        if (filling_.has_later_fields) {
          write(later->text);
          later->add_to(unknown_fields(message));
        }
      }
    };
    for (int i = 0; i < type.field_count(); ++i) {
      fill_later_below(type.field(i)->number());
      fill_field(message, type.field(i), in_element);
    }
    fill_later_below(std::numeric_limits<int>::max());
  }

  std::string take_text() { return std::move(text_); }

 private:
  bool is_present(int number) const {
    switch (filling_.presence) {
      case Presence::kNone:
        return false;
      case Presence::kOddNumbers:
        return number % 2 != 0;
      case Presence::kEvenNumbers:
        return number % 2 == 0;
      case Presence::kAll:
        break;
    }
    return true;
  }

  void fill_field(Message* message, const FieldDescriptor* field, bool in_element) {
    if (!is_present(field->number())) {
      return;
    }
    if (!field->is_repeated()) {
      fill_value(message, field, in_element);
      return;
    }
    const int elements = in_element ? std::min(filling_.elements, 1) : filling_.elements;
    for (int i = 0; i < elements; ++i) {
      fill_value(message, field, true);
    }
  }

  void fill_value(Message* message, const FieldDescriptor* field, bool in_element) {
    switch (field->type()) {
      case FieldDescriptor::TYPE_INT64: {
        const int64_t value = next(filling_.longs);
        put(message, field, value);
        write(field->name() + ": " + std::to_string(value));
        break;
      }
      case FieldDescriptor::TYPE_INT32: {
        const int32_t value = next(filling_.ints);
        put(message, field, value);
        write(field->name() + ": " + std::to_string(value));
        break;
      }
      case FieldDescriptor::TYPE_BOOL: {
        const bool value = next(filling_.ints) % 2 != 0;
        put(message, field, value);
        write(field->name() + (value ? ": true" : ": false"));
        break;
      }
      case FieldDescriptor::TYPE_STRING: {
        const std::string& value = next(filling_.texts);
        put(message, field, value);
        write(field->name() + ": " + quoted(value));
        break;
      }
      case FieldDescriptor::TYPE_BYTES: {
        const std::string& value = next(filling_.bytes);
        put(message, field, value);
        write(field->name() + ": " + quoted(value));
        break;
      }
      case FieldDescriptor::TYPE_ENUM:
        fill_member(message, field);
        break;
      case FieldDescriptor::TYPE_MESSAGE: {
        Message* embedded = put_message(message, field);
        write(field->name() + " {");
        indent_ += "  ";
        if (filling_.filled_inside) {
          fill(embedded, in_element);
        }
        indent_.resize(indent_.size() - 2);
        write("}");
        break;
      }
      default:
        throw std::logic_error(field->full_name() + ": no values for fields of its type");
    }
  }

  void fill_member(Message* message, const FieldDescriptor* field) {
    const EnumDescriptor& type = *field->enum_type();
    switch (filling_.member) {
      case Member::kLater:
        write(field->name() + ": LATER_" + type.name());
        unknown_fields(message)->AddVarint(field->number(), kLaterMember);
        return;
      case Member::kEarlier:
        write(field->name() + ": EARLIER_" + type.name());
        unknown_fields(message)->AddVarint(field->number(),
                                           static_cast<uint64_t>(int64_t{kEarlierMember}));
        return;
      case Member::kFirst:
        fill_member(message, field, *type.value(0));
        return;
      case Member::kLast:
        fill_member(message, field, *type.value(type.value_count() - 1));
        return;
      case Member::kInTurn:
        fill_member(message, field, *type.value(member_turn_++ % type.value_count()));
        return;
    }
  }

  void fill_member(Message* message, const FieldDescriptor* field,
                   const EnumValueDescriptor& member) {
    put(message, field, &member);
    write(field->name() + ": " + member.name());
  }

  template <typename T>
  const T& next(const std::vector<T>& values) {
    return values[turn_++ % values.size()];
  }

  // One line or several, on the present level.
  void write(const std::string& lines) {
    std::istringstream in(lines);
    for (std::string line; std::getline(in, line);) {
      text_.append(indent_).append(line).append("\n");
    }
  }

  const Filling& filling_;
  size_t turn_ = 0;
  int member_turn_ = 0;  // another, so that the records of a list have different members
  std::string indent_;
  std::string text_;
};

// ---- Fillings

template <typename T>
std::vector<T> counted(T first, size_t count) {
  std::vector<T> numbers(count);
  std::iota(numbers.begin(), numbers.end(), first);
  return numbers;
}

std::vector<std::string> numbered(const std::string& text, int count) {
  std::vector<std::string> texts;
  for (int i = 0; i < count; ++i) {
    texts.push_back(text + std::to_string(i));
  }
  return texts;
}

// Every field differs from the others.
Filling distinct(const std::string& name) {
  Filling filling;
  filling.name = name;
  filling.longs = counted<int64_t>(1000, 499);
  filling.ints = counted<int32_t>(2000, 499);
  filling.texts = numbered("text ", 499);
  filling.bytes = numbered("bytes \xff ", 499);
  return filling;
}

// Every number the same.
Filling uniform(const std::string& name, int64_t long_number, int32_t number, Member member) {
  Filling filling = distinct(name);
  filling.longs = {long_number};
  filling.ints = {number};
  filling.member = member;
  filling.elements = 1;
  return filling;
}

Filling with_texts(const std::string& name, const std::vector<std::string>& texts,
                   const std::vector<std::string>& bytes) {
  Filling filling = distinct(name);
  filling.texts = texts;
  filling.bytes = bytes;
  filling.elements = 1;
  return filling;
}

// The largest number of each length on the wire, and the smallest of the next.
std::vector<int64_t> ends_of_wire_lengths() {
  std::vector<int64_t> numbers = {1};
  for (int bits = 7; bits < 63; bits += 7) {
    numbers.push_back((int64_t{1} << bits) - 1);
    numbers.push_back(int64_t{1} << bits);
  }
  return numbers;
}

std::string every_byte() {
  std::string bytes;
  for (int byte = 0; byte < 256; ++byte) {
    bytes += static_cast<char>(byte);
  }
  return bytes;
}

std::vector<Filling> make_fillings() {
  using Longs = std::numeric_limits<int64_t>;
  using Ints = std::numeric_limits<int32_t>;
  // One, two, three and four bytes a character.
  const std::string multi_byte = "a\u00e9\u0416\u20ac\u8a9e\U0001f600\U0010ffff";

  Filling nothing = distinct("Nothing");
  nothing.presence = Presence::kNone;

  Filling odd_numbers = distinct("OddNumbers");
  odd_numbers.presence = Presence::kOddNumbers;

  Filling even_numbers = distinct("EvenNumbers");
  even_numbers.presence = Presence::kEvenNumbers;

  Filling no_elements = distinct("NoElements");
  no_elements.elements = 0;

  Filling empty_inside = distinct("EmptyInside");
  empty_inside.filled_inside = false;

  Filling zeros = uniform("Zeros", 0, 0, Member::kFirst);
  zeros.texts = {""};
  zeros.bytes = {""};

  Filling wire_lengths = distinct("WireLengths");
  wire_lengths.longs = ends_of_wire_lengths();
  wire_lengths.ints = {127, 128, 16383, 16384, 2097151, 2097152, 268435455};
  wire_lengths.elements = 20;  // so that all come up, as their count is prime

  Filling five_hundred = distinct("FiveHundredElements");
  five_hundred.elements = 500;

  std::string long_multi_byte;
  while (long_multi_byte.size() < 40000) {
    long_multi_byte += "\u8a9e\u20ac\u0416\u00e9";  // ten bytes
  }

  return {
      nothing,
      distinct("Everything"),
      odd_numbers,
      even_numbers,
      no_elements,
      empty_inside,
      zeros,
      uniform("MinusOnes", -1, -1, Member::kLast),
      uniform("Smallest", Longs::min(), Ints::min(), Member::kFirst),
      uniform("Largest", Longs::max(), Ints::max(), Member::kLast),
      wire_lengths,
      five_hundred,
      with_texts("LongText", {std::string(40000, 'x')}, {std::string(40000, '\xfe')}),
      with_texts("LongMultiByteText", {long_multi_byte}, {long_multi_byte}),
      with_texts("MultiByteText", {multi_byte}, {multi_byte}),
      with_texts("EscapedText", {"\"'\\\n\r\t\a\x7f{}#", "\\377"}, {every_byte()}),
      with_texts("TextWithNul", {std::string("a\0b", 3)}, {std::string("\0", 1)}),
  };
}

std::vector<Filling> make_later_fillings() {
  Filling fields = distinct("LaterFields");
  fields.has_later_fields = true;

  Filling members = distinct("LaterMembers");
  members.member = Member::kLater;

  Filling negative_members = distinct("NegativeLaterMembers");
  negative_members.member = Member::kEarlier;

  Filling fields_and_members = distinct("LaterFieldsAndMembers");
  fields_and_members.has_later_fields = true;
  fields_and_members.member = Member::kLater;

  return {fields, members, negative_members, fields_and_members};
}

}  // namespace

const std::vector<Filling>& fillings() {
  static const std::vector<Filling> list = make_fillings();
  return list;
}

const std::vector<Filling>& later_fillings() {
  static const std::vector<Filling> list = make_later_fillings();
  return list;
}

Filling filling_with_code(int32_t code) {
  Filling filling = distinct("Code" + std::to_string(code));
  filling.ints = {code};
  return filling;
}

Sample make_sample(const Descriptor& type, const Filling& filling) {
  Sample sample;
  sample.filling = filling.name;
  sample.message.reset(
      google::protobuf::MessageFactory::generated_factory()->GetPrototype(&type)->New());
  Filler filler(filling);
  filler.fill(sample.message.get(), false);
  sample.text = filler.take_text();
  return sample;
}

std::string later_schema() {
  std::istringstream lines(library_schema());
  std::ostringstream later;
  std::string kind;
  std::string name;
  for (std::string line; std::getline(lines, line); later << line << '\n') {
    if (line == "}") {  // the end of a block; what is new goes before it
      if (kind == "enum") {
        later << "  LATER_" << name << " = " << kLaterMember << ";\n";
        later << "  EARLIER_" << name << " = " << kEarlierMember << ";\n";
      } else {
        for (const LaterField& field : kLaterFields) {
          later << "  " << field.declaration << '\n';
        }
      }
    } else if (line.rfind("message ", 0) == 0 || line.rfind("enum ", 0) == 0) {
      std::istringstream(line) >> kind >> name;
    }
  }
  return later.str();
}

}  // namespace support
