// However a capture is read, damaged or cut, no output tells a piece of the access token in it.
// What is shown of single captures is in access_token.txt.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/stubs/common.h>
#include <google/protobuf/unknown_field_set.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <random>
#include <sstream>
#include <string>
#include <vector>

#include "decode.h"
#include "explain.h"
#include "export.h"
#include "listing.h"
#include "misread.h"
#include "msgspec_frontend.pb.h"
#include "notation.h"
#include "query.h"
#include "schema.h"
#include "session.h"

namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using qel_wire::Notation;

// ---- Captures with a token

using Random = std::mt19937;

// From 0 to the number before the bound.
size_t below(size_t bound, Random* random) {
  return std::uniform_int_distribution<size_t>(0, bound - 1)(*random);
}

bool one_in(size_t count, Random* random) {
  return below(count, random) == 0;
}

int64_t some_id(Random* random) {
  const auto id = static_cast<int64_t>((uint64_t{(*random)()} << 31U) ^ (*random)());
  return id >> below(60, random);
}

// Nothing else that is printed has a capital in each second place, but for what ends in OnOff.
std::string some_token(Random* random) {
  constexpr char kCapitals[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZ";
  constexpr char kOthers[] = "abcdefghijklmopqrstuvwxyz0123456789+/=-_.~`{|}()*\"' ";
  std::string token;
  const size_t size = 8 + below(one_in(4, random) ? 300 : 40, random);
  while (token.size() < size) {
    token += kCapitals[below(sizeof kCapitals - 1, random)];
    token += kOthers[below(sizeof kOthers - 1, random)];
  }
  return token;
}

std::string some_request(const std::string& token, Random* random) {
  ChannelAuthRequest request;
  request.set_requestid(some_id(random));
  request.set_userid(some_id(random));
  request.set_deviceid(some_id(random));
  if (one_in(4, random)) {
    request.set_imei("356938035643809");
  }
  if (!one_in(3, random)) {
    request.set_appid("app" + std::to_string(below(1000, random)));
  }
  request.set_accesstoken(token);
  if (one_in(4, random)) {
    request.add_proxyoptions(GATEWAY_MODE);
  }
  return request.SerializeAsString();
}

// The bytes as a field of any number, in some cases behind a number.
std::string in_field(int number, const std::string& bytes, Random* random) {
  ClientEcho echo;
  if (one_in(2, random)) {
    echo.mutable_unknown_fields()->AddVarint(number, static_cast<uint64_t>(some_id(random)));
  }
  echo.mutable_unknown_fields()->AddLengthDelimited(number, bytes);
  return echo.SerializeAsString();
}

// One, two or three bytes are lost or changed.
std::string damaged(std::string bytes, Random* random) {
  for (size_t count = 1 + below(3, random); count > 0 && !bytes.empty(); --count) {
    const size_t at = below(bytes.size(), random);
    if (one_in(2, random)) {
      bytes.erase(at, 1);
    } else {
      bytes[at] = static_cast<char>(below(256, random));
    }
  }
  return bytes;
}

std::string some_bytes(size_t count, Random* random) {
  std::string bytes(count, '\0');
  std::generate(bytes.begin(), bytes.end(), [=] { return static_cast<char>(below(256, random)); });
  return bytes;
}

const Descriptor& some_message(Random* random) {
  const auto& file = *ClientEcho::descriptor()->file();
  const auto count = static_cast<size_t>(file.message_type_count());
  return *file.message_type(static_cast<int>(below(count, random)));
}

const FieldDescriptor& some_known_text(Random* random) {
  for (;;) {
    const Descriptor& type = some_message(random);
    const auto count = static_cast<size_t>(type.field_count());
    const FieldDescriptor* field = type.field(static_cast<int>(below(count, random)));
    if (field->cpp_type() == FieldDescriptor::CPPTYPE_STRING) {
      return *field;
    }
  }
}

// Bytes with a request in them, and a message as which they are read.
struct Capture {
  const Descriptor* type;
  std::string bytes;
};

Capture some_capture(const std::string& token, Random* random) {
  Capture capture{&some_message(random), some_request(token, random)};
  if (one_in(3, random)) {
    capture.bytes = damaged(capture.bytes, random);
  }
  if (one_in(3, random)) {
    const FieldDescriptor& field = some_known_text(random);
    capture = {field.containing_type(), in_field(field.number(), capture.bytes, random)};
  }
  if (one_in(4, random)) {
    for (size_t levels = 1 + below(12, random); levels > 0; --levels) {
      capture.bytes = in_field(1 + static_cast<int>(below(40, random)), capture.bytes, random);
    }
  }
  if (one_in(4, random)) {  // as part of another capture, such as its length
    const auto size = static_cast<char>(capture.bytes.size());
    capture.bytes = (one_in(2, random) ? some_bytes(1 + below(8, random), random)
                                       : std::string(3, '\0') + size) +
                    capture.bytes;
  }
  if (one_in(4, random)) {
    capture.bytes = damaged(capture.bytes, random);
  }
  if (one_in(4, random)) {
    const size_t from = below(2, random) * below(capture.bytes.size() + 1, random);
    capture.bytes = capture.bytes.substr(from, below(capture.bytes.size() + 1, random));
  }
  return capture;
}

// ---- What an output tells

// Octal and hex escapes are the bytes that they stand for, others the character behind the
// backslash.
std::string unescaped(const std::string& text) {
  std::string result;
  for (size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '\\') {
      result += text[i];
    } else if (text.find_first_not_of("01234567", i + 1) > i + 3) {
      result += static_cast<char>(std::stoi(text.substr(i + 1, 3), nullptr, 8));
      i += 3;
    } else if (text[i + 1] == 'x') {
      result += static_cast<char>(std::stoi(text.substr(i + 2, 2), nullptr, 16));
      i += 3;
    } else {
      result += text[++i];
    }
  }
  return result;
}

// The bytes of a row of explain, at their offsets; others are 0.
void add_row(const std::string& line, std::string* bytes) {
  constexpr size_t kHexBegins = 8;
  constexpr size_t kHexEnds = 32;
  if (line.size() < kHexBegins || line.substr(6, 2) != "  ") {
    return;
  }
  size_t offset = std::stoul(line, nullptr, 16);
  for (size_t i = kHexBegins; i < kHexEnds && i + 1 < line.size() && line[i] != ' '; i += 3) {
    bytes->resize(std::max(bytes->size(), offset + 1));
    (*bytes)[offset++] =
        line[i] == '*' ? '\0' : static_cast<char>(std::stoi(line.substr(i, 2), nullptr, 16));
  }
}

// What a line of any output has as its value: behind '=' or ':', or alone.
std::string value_of(const std::string& line) {
  constexpr char kJson[] = "\"value\":";
  const size_t mark = line.find(kJson) != std::string::npos  ? line.find(kJson) + sizeof kJson - 2
                      : line.find("= ") != std::string::npos ? line.find("= ")
                                                             : line.find(": ");
  const size_t begin = line.find_first_not_of(" \"", mark == std::string::npos ? 0 : mark + 1);
  return begin == std::string::npos
             ? ""
             : line.substr(begin, line.find_first_of(" \",}", begin) - begin);
}

// Nothing if it is not written so.
std::string read_as(const std::string& text, Notation notation) {
  try {
    return qel_wire::from_notation(text, notation);
  } catch (const qel_wire::Misread&) {
    return "";
  }
}

// The bytes that a value is, as a number in decimal or hexadecimal notation or in base64.
std::string bytes_of(const std::string& value) {
  const bool is_number = value.find_first_not_of("0123456789") == std::string::npos;
  if (is_number && !value.empty() && value.size() <= 3) {
    return std::string(1, static_cast<char>(std::stoi(value)));
  }
  if (value.substr(0, 2) == "0x") {
    const std::string big = read_as(value.substr(2), Notation::kHex);
    return '\0' + big + '\0' + std::string(big.rbegin(), big.rend()) + '\0';
  }
  return '\0' + read_as(value, Notation::kBase64) + '\0' + read_as(value, Notation::kHex) + '\0';
}

// The tags of groups whose numbers are steps of paths, or begin groups in the text form.
std::string group_tags_of(const std::string& line) {
  constexpr int kStartOfGroup = 3;
  std::string tags;
  int number = 0;
  for (size_t i = 0; i < line.size(); ++i) {
    if (line[i] == '[') {  // an index
      i = std::min(line.find(']', i), line.size());
      continue;
    }
    const bool is_digit = std::isdigit(static_cast<unsigned char>(line[i])) != 0;
    if (!is_digit && (line[i] == '.' || line.substr(i, 2) == " {" || line.substr(i, 4) == " end")) {
      tags += static_cast<char>(number << 3 | kStartOfGroup);
    }
    number = is_digit ? number % 100 * 10 + line[i] - '0' : 0;
  }
  return tags;
}

// The first four successive bytes of the token that the output tells in any notation, or nothing.
std::string told(const std::string& output, const std::string& token) {
  std::string rows;
  std::string values;
  std::string tags;
  std::istringstream lines(output);
  for (std::string line; std::getline(lines, line);) {
    if (std::isxdigit(line[0]) != 0) {
      add_row(line, &rows);
    }
    values += bytes_of(value_of(line));
    tags += group_tags_of(line);
  }
  const std::string bytes = unescaped(output) + '\0' + rows + '\0' + values + '\0' + tags;
  for (size_t i = 0; i + 4 <= token.size(); ++i) {
    if (bytes.find(token.substr(i, 4)) != std::string::npos) {
      return token.substr(i, 4);
    }
  }
  return "";
}

TEST(Told, OfEachNotation_IsSeen) {
  const std::string token = "AbCd";
  for (const char* output :
       {"x AbCd", "\"\\101\\142\\103\\144\"", "000008  ** 41 62 43  x\n00000c  64  x\n",
        "x = 65\nx = 98\nx = 67\nx = 100\n", "  \"65\",\n  \"98\",\n  \"67\",\n  \"100\"\n",
        "x: 0x41624364\n", "x = 0x64436241  x\n", "  \"x\": \"QWJDZA==\",\n",
        "\"\\x41\\x62\\x43\\x64\"", "  \"x\": \"41624364\"\n",
        "{\"value\":\"65\"}\n{\"value\":\"98\"}\n{\"value\":67}\n{\"value\":100}\n"}) {
    EXPECT_EQ(told(output, token), token) << output;
  }
}

TEST(Told, OfGroups_IsSeen) {
  for (const char* output :
       {"- 12.8.7.15.1: 1\n", "- 12[1].8.7.15[0].1: 1\n", "\"path\":\"12.8.7.15.1\"",
        "12 {\n  8 {\n    7 {\n      15 {\n",
        "12 end of group\n8 end of group\n7 end of group\n15 end of group\n"}) {
    EXPECT_EQ(told(output, "cC;{"), "cC;{") << output;
  }
}

TEST(Told, OfThreeBytes_IsNothing) {
  EXPECT_EQ(told("000000  41 62 43\n000008  64\n", "AbCd"), "");
}

// ---- All outputs

std::vector<std::string> outputs(const Descriptor& type, const std::string& bytes) {
  std::vector<std::string> texts;
  for (const bool in_hex : {false, true}) {
    const auto form = in_hex ? qel_wire::BytesForm::kHex : qel_wire::BytesForm::kUsual;
    for (const bool as_json : {false, true}) {
      std::ostringstream text;
      qel_wire::ExplainOptions explaining;
      explaining.show_all = true;
      explaining.as_json = as_json;
      explaining.bytes_form = form;
      qel_wire::explain(bytes, type, explaining, &text);
      qel_wire::DecodeOptions decoding;
      decoding.is_partial = true;
      decoding.as_json = as_json;
      decoding.bytes_form = form;
      const qel_wire::Decoded decoded = qel_wire::decode(bytes, type, decoding, &text);
      for (const std::string& note : decoded.notes) {
        text << note << '\n';
      }
      text << (decoded.problem.has_value() ? decoded.problem->reason : "");
      texts.push_back(text.str());
    }
  }
  std::ostringstream differences;
  if (!qel_wire::problem_of(bytes, type).has_value()) {
    const qel_wire::Side side{bytes, &type, qel_wire::Hidden(bytes, type)};
    const qel_wire::Side nothing{"", &type, {}};
    qel_wire::diff(side, nothing, qel_wire::Colours(false), &differences);
    qel_wire::diff(nothing, side, qel_wire::Colours(false), &differences);
  }
  texts.push_back(differences.str());
  qel_wire::Found found;
  found.bytes = bytes;
  found.name = type.name();
  const qel_wire::Entry entry = qel_wire::Session().add(found);
  std::ostringstream listed;
  qel_wire::print_entry(entry, found, {}, qel_wire::Colours(false), &listed);
  qel_wire::print_entry_json(entry, found, qel_wire::problem_of(bytes, type), &listed);
  qel_wire::write_packet(entry, found, &listed);
  texts.push_back(listed.str());
  return texts;
}

TEST(AccessToken, OfTenThousandCaptures_IsNotTold) {
  google::protobuf::SetLogHandler(nullptr);  // which complains of texts that are no UTF-8
  Random random(20261122);
  for (int i = 0; i < 10000; ++i) {
    const std::string token = some_token(&random);
    const Capture capture = some_capture(token, &random);
    for (const Descriptor* type : {capture.type, ChannelAuthRequest::descriptor(),
                                   InboxEntry::descriptor(), WrongReceiverDetail::descriptor()}) {
      for (const std::string& output : outputs(*type, capture.bytes)) {
        ASSERT_EQ(told(output, token), "")
            << type->name() << " " << qel_wire::to_notation(capture.bytes, Notation::kHex) << "\n"
            << output;
      }
    }
  }
}

}  // namespace
