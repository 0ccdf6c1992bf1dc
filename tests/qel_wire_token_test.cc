// The access token, which qel-wire hides in whatever it is asked to show.

#include <google/protobuf/descriptor.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <random>
#include <sstream>
#include <string>
#include <vector>

#include "decode.h"
#include "explain.h"
#include "forms.h"
#include "msgspec_frontend.pb.h"
#include "schema.h"
#include "support/wire.h"

namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using qel_wire::Notation;
using support::hex;
using support::Wire;

constexpr char kToken[] = "a-secret";

std::string auth_request() {
  return Wire().number(1, 7).text(5, "app").text(6, kToken).bytes();
}

std::string explained(const Descriptor& type, const std::string& bytes, bool show_token = false) {
  qel_wire::ExplainOptions options;
  options.show_all = true;
  options.show_token = show_token;
  std::ostringstream out;
  qel_wire::explain(bytes, type, options, &out);
  return out.str();
}

std::string explained(const std::string& message, const std::string& bytes) {
  return explained(*qel_wire::message_named(message), bytes);
}

// All that the command prints, in the order of its lines.
std::string decoded(const Descriptor& type, const std::string& bytes, bool as_json,
                    bool show_token = false) {
  qel_wire::DecodeOptions options;
  options.as_json = as_json;
  options.show_token = show_token;
  const qel_wire::Decoded decoded = qel_wire::decode(bytes, type, options);
  std::string text = decoded.text;
  for (const std::string& note : decoded.notes) {
    text += note + "\n";
  }
  return text + (decoded.problem.has_value() ? decoded.problem->reason + "\n" : "");
}

std::string decoded(const std::string& message, const std::string& bytes, bool as_json = false) {
  return decoded(*qel_wire::message_named(message), bytes, as_json);
}

// ---- What is shown of one request

TEST(AccessToken, WhenExplained_IsNotShown) {
  EXPECT_EQ(explained("ChannelAuthRequest", auth_request()),
            "000000  08 07                    1 requestId int64 = 7\n"
            "000002  2a 03 61 70 70           5 appId string = \"app\", 3 bytes\n"
            "000007  32 08                    6 accessToken string = (not shown), 8 bytes\n");
}

TEST(AccessToken, WhenExplainedAsAnotherMessage_IsNotShown) {
  EXPECT_EQ(
      explained("ClientEcho", auth_request()),
      "000000  08 07                    1 requestId int64 = 7\n"
      "000002  2a 03                    5 ? length-delimited = (not shown), 3 bytes  ! unknown "
      "field\n"
      "000007  ** 08                    6 ? length-delimited = (not shown), 8 bytes  ! unknown "
      "field\n");
}

// A byte of the head is lost: the rest of the token is read as fields.
TEST(AccessToken, WhenItIsReadAsFields_HasOneRowWithoutThem) {
  EXPECT_EQ(
      explained("ChannelAuthRequest", hex("08 07 18 03 10") + "secretsX"),
      "000000  08 07                    1 requestId int64 = 7\n"
      "000002  18 03                    3 deviceId int64 = 3\n"
      "000004                           ? = (not shown), 8 bytes\n"
      "00000c  **                         broken at offset 13: the input ends within the number "
      "of field 11\n");
}

TEST(AccessToken, WhenItIsAPackedList_IsNotShown) {
  EXPECT_EQ(explained("WrongReceiverDetail", Wire().text(6, "secret").bytes()),
            "000000  32 06                    6 invitationDenied int64, packed, 6 bytes\n"
            "000002                             ? = (not shown), 6 bytes\n");
}

TEST(AccessToken, WhenItIsCut_IsNotShown) {
  const std::string whole = auth_request();
  EXPECT_EQ(explained("ChannelAuthRequest", whole.substr(0, whole.size() - 1)),
            "000000  08 07                    1 requestId int64 = 7\n"
            "000002  2a 03                    5 appId string = (not shown), 3 bytes\n"
            "000007  ** 08                    broken at offset 9: the input ends within field 6: "
            "its length is 8 bytes, of which 7 are there\n");
}

TEST(AccessToken, InText_IsReplaced) {
  EXPECT_EQ(decoded("ChannelAuthRequest", auth_request()),
            "requestId: 7\nappId: \"app\"\naccessToken: \"(not shown)\"\n");
}

TEST(AccessToken, InJson_IsReplaced) {
  EXPECT_EQ(decoded("ChannelAuthRequest", Wire().text(6, kToken).bytes(), true),
            "{\n  \"accessToken\": \"(not shown)\"\n}\n");
}

TEST(AccessToken, InAKnownTextOfBytes_IsReplacedInJsonAsItself) {
  EXPECT_EQ(decoded("ChatMessageParam", Wire().text(10, auth_request()).bytes(), true),
            "{\n  \"secureChatMsg\": \"(not shown)\"\n}\n");
}

TEST(AccessToken, WhenTextHasNoPlaceForWhatIsHidden_IsTold) {
  EXPECT_EQ(decoded("WrongReceiverDetail", Wire().number(1, 7).text(6, "secret").bytes()),
            "invalidReceivers: 7\nwithout 6 fields that may be a piece of an access token: "
            "--show-token shows them\n");
}

TEST(AccessToken, WhenAskedFor_IsShown) {
  const Descriptor& type = *ChannelAuthRequest::descriptor();
  for (const std::string& text :
       {explained(type, auth_request(), true), decoded(type, auth_request(), false, true),
        decoded(type, auth_request(), true, true)}) {
    EXPECT_NE(text.find(kToken), std::string::npos) << text;
  }
}

// ---- What is shown beside it

// A message as an encoder writes it.
TEST(HiddenTexts, OfWhatIsReadWithoutDoubt_AreNone) {
  const std::string bytes = Wire()
                                .number(11, 7)
                                .message(13, Wire().number(1, 0).text(2, "d\xc3\xa9j\xc3\xa0 vu\n"))
                                .bytes();
  EXPECT_EQ(decoded("ChatReply", bytes),
            "requestId: 7\nresult {\n  code: 0\n  msg: \"d\xc3\xa9j\xc3\xa0 vu\\n\"\n}\n");
}

// No encoder writes what follows the text, so the bytes may be anything.
TEST(HiddenTexts, OfWhatNoEncoderWrites_AreThoseOfFourCharacters) {
  const std::pair<const char*, std::string> kOdd[] = {
      {"an unknown field", Wire().number(99, 1).bytes()},
      {"a field out of order", Wire().number(1, 1).bytes()},
      {"a field again", Wire().text(2, "x").bytes()},
      {"a packed list", Wire().message(3, Wire().text(1, "\x01")).bytes()},
      {"less than its length", hex("1a 02")},
      {"the beginning of a field", hex("1a")},
  };
  for (const auto& [what, odd] : kOdd) {
    const std::string bytes = Wire().text(2, "fine").bytes() + odd;
    EXPECT_EQ(explained("Result", bytes).find("fine"), std::string::npos) << what;
  }
  const std::string bytes = Wire().text(2, "bad").number(99, 1).bytes();
  EXPECT_EQ(decoded("Result", bytes), "msg: \"bad\"\n99: 1\n");
}

// As "sS\x01Tt" would be, a character a row.
TEST(HiddenTexts, ThatAreReadAsGroups_HaveOneRow) {
  EXPECT_EQ(explained("Result", "cC;{|<Dd"),
            "000000                           ? = (not shown), 8 bytes\n");
}

// Another byte for the tag of the token makes it the device's number.
TEST(HiddenTexts, OfARequestWithoutToken_AreNotShown) {
  for (const char* end : {"", "32 00"}) {
    const std::string bytes = Wire().number(1, 7).text(4, kToken).bytes() + hex(end);
    EXPECT_NE(decoded("ChannelAuthRequest", bytes).find("IMEI: \"(not shown)\"\n"),
              std::string::npos);
  }
}

TEST(HiddenTexts, OfNumber6_NeedNoFourCharacters) {
  EXPECT_EQ(decoded("ClientEcho", Wire().text(6, "abc").bytes()), "6: \"(not shown)\"\n");
}

TEST(HiddenTexts, ThatNobodyTypes_AreNotShown) {
  for (const char* odd : {"\x01", "\x7f", "\xc3"}) {
    const std::string bytes = Wire().text(2, std::string("fine") + odd).bytes();
    EXPECT_EQ(decoded("Result", bytes), "msg: \"(not shown)\"\n") << odd;
  }
  EXPECT_EQ(decoded("Result", Wire().text(2, "fine\t\r\n").bytes()),
            "msg: \"fine\\011\\015\\n\"\n");
}

// The end of a token whose first character is a tag, 'b', and whose second is the length of the
// rest.
TEST(HiddenTexts, OfAMessageThatIsAllCharacters_AreNotShown) {
  const std::string end = "b!" + std::string(33, 'x');
  EXPECT_EQ(decoded("NotificationReply", end), "notiId: \"(not shown)\"\n");
  // Numbers can be characters too.
  EXPECT_EQ(decoded("WrongReceiverDetail", "PpP2"),
            "without 2 fields that may be a piece of an access token: --show-token shows them\n");
  EXPECT_EQ(decoded("GetAllUnreadMessageRequest", hex("58 28 60 64")),
            "requestId: 40\nmaxCount: 100\n");
}

TEST(HiddenNumbers, BehindAHiddenText_AreShown) {
  EXPECT_EQ(decoded("InboxEntry", Wire().text(6, "fine").number(10, 200).number(99, 1).bytes()),
            "chatMsg: \"(not shown)\"\nchatroomId: 200\n99: 1\n");
}

// The requestId, and tag and length of the result, are characters by chance.
TEST(HiddenNumbers, WithTheHeadOfARecord_LeaveTheRecord) {
  EXPECT_EQ(
      decoded("ChatReply", hex("58 41 6a 21 08 07 12 1d") + std::string(29, 'x') + hex("98 06 01")),
      "result {\n  code: 7\n  msg: \"(not shown)\"\n}\n99: 1\n"
      "without 1 field that may be a piece of an access token: --show-token shows them\n");
}

// A request without appId is an entry too, but for the time.
TEST(HiddenTexts, OfAnEntry_AreShownIfItTellsWhenItWasSent) {
  EXPECT_EQ(decoded("InboxEntry", Wire().number(3, 7).text(6, "hello").bytes()),
            "sender: 7\nchatMsg: \"(not shown)\"\n");
  EXPECT_EQ(decoded("InboxEntry", Wire().number(5, 1700000000000).text(6, "hello").bytes()),
            "sentTime: 1700000000000\nchatMsg: \"hello\"\n");
  EXPECT_EQ(decoded("InboxEntry", Wire().number(5, 1700000000).text(6, "hello").bytes()),
            "sentTime: 1700000000\nchatMsg: \"(not shown)\"\n");
  EXPECT_EQ(decoded("InboxEntry", Wire().number(4, 7).number(5, 1).text(6, "hello").bytes()),
            "receiver: 7\nsentTime: 1\nchatMsg: \"hello\"\n");
  EXPECT_EQ(decoded("ForwardUnreadMessage", Wire().message(12, Wire().text(6, "hello")).bytes()),
            "inboxEntries {\n  chatMsg: \"(not shown)\"\n}\n");
}

// ---- Whatever carries it

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
  Wire request;
  request.number(1, some_id(random)).number(2, some_id(random)).number(3, some_id(random));
  if (one_in(4, random)) {
    request.text(4, "356938035643809");
  }
  if (!one_in(3, random)) {
    request.text(5, "app" + std::to_string(below(1000, random)));
  }
  request.text(6, token);
  if (one_in(4, random)) {
    request.number(11, 0);
  }
  return request.bytes();
}

std::string some_bytes(size_t count, Random* random) {
  std::string bytes;
  while (bytes.size() < count) {
    bytes += static_cast<char>(below(256, random));
  }
  return bytes;
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

std::string nested(std::string bytes, Random* random) {
  for (size_t levels = 1 + below(12, random); levels > 0; --levels) {
    const int number = 1 + static_cast<int>(below(40, random));
    Wire around;
    if (one_in(2, random)) {
      around.number(number, some_id(random));
    }
    bytes = around.text(number, bytes).bytes();
  }
  return bytes;
}

const std::vector<const FieldDescriptor*>& known_texts() {
  static const std::vector<const FieldDescriptor*> texts = [] {
    std::vector<const FieldDescriptor*> found;
    const auto& file = *ChannelAuthRequest::descriptor()->file();
    for (int i = 0; i < file.message_type_count(); ++i) {
      for (int j = 0; j < file.message_type(i)->field_count(); ++j) {
        const FieldDescriptor* field = file.message_type(i)->field(j);
        if (field->cpp_type() == FieldDescriptor::CPPTYPE_STRING) {
          found.push_back(field);
        }
      }
    }
    return found;
  }();
  return texts;
}

std::string in_front_of(const std::string& bytes, Random* random) {
  switch (below(4, random)) {
    case 0:
      return some_bytes(1 + below(8, random), random);
    case 1:
      return Wire().text(1, bytes).bytes().substr(1, bytes.size() < 128 ? 1 : 2);  // its length
    case 2:
      return std::string(3, '\0') + static_cast<char>(bytes.size());
    default:
      return Wire().number(11, some_id(random)).bytes();
  }
}

// Bytes with a request in them, and a message as which they are read.
struct Carrier {
  const Descriptor* type;
  std::string bytes;
};

Carrier some_carrier(const std::string& token, Random* random) {
  const auto& file = *ChannelAuthRequest::descriptor()->file();
  const auto count = static_cast<size_t>(file.message_type_count());
  Carrier carrier{file.message_type(static_cast<int>(below(count, random))),
                  some_request(token, random)};
  if (one_in(3, random)) {
    carrier.type = ChannelAuthRequest::descriptor();
  } else if (one_in(4, random)) {
    carrier.type = InboxEntry::descriptor();
  }
  if (one_in(3, random)) {
    carrier.bytes = damaged(carrier.bytes, random);
  }
  if (one_in(3, random)) {
    const FieldDescriptor* field = known_texts()[below(known_texts().size(), random)];
    carrier = {field->containing_type(),
               Wire().number(1, some_id(random)).text(field->number(), carrier.bytes).bytes()};
  }
  if (one_in(4, random)) {
    carrier.bytes = nested(carrier.bytes, random);
  }
  if (one_in(4, random)) {
    carrier.bytes = in_front_of(carrier.bytes, random) + carrier.bytes;
  }
  if (one_in(4, random)) {
    carrier.bytes = damaged(carrier.bytes, random);
  }
  if (one_in(4, random)) {
    const size_t from = below(2, random) * below(carrier.bytes.size() + 1, random);
    carrier.bytes = carrier.bytes.substr(from, below(carrier.bytes.size() + 1, random));
  }
  return carrier;
}

// ---- What an output tells

// Octal escapes are the bytes that they stand for, others the character behind the backslash.
std::string unescaped(const std::string& text) {
  std::string result;
  for (size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '\\') {
      result += text[i];
    } else if (text.find_first_not_of("01234567", i + 1) > i + 3) {
      result += static_cast<char>(std::stoi(text.substr(i + 1, 3), nullptr, 8));
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
  constexpr size_t kHexEnds = kHexBegins + 3 * 8;
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
  const size_t mark = line.find("= ") != std::string::npos ? line.find("= ") : line.find(": ");
  const size_t begin = line.find_first_not_of(" \"", mark == std::string::npos ? 0 : mark + 1);
  return begin == std::string::npos ? ""
                                    : line.substr(begin, line.find_first_of(" \",", begin) - begin);
}

// The bytes that a value is, as a number in decimal or hexadecimal notation or in base64.
std::string bytes_of(const std::string& value) {
  const bool is_number = value.find_first_not_of("0123456789") == std::string::npos;
  if (is_number && !value.empty() && value.size() <= 3) {
    return std::string(1, static_cast<char>(std::stoi(value)));
  }
  if (value.substr(0, 2) == "0x") {
    const std::string big = hex(value.substr(2));
    return '\0' + big + '\0' + std::string(big.rbegin(), big.rend()) + '\0';
  }
  return '\0' + qel_wire::from_notation(value, Notation::kBase64).value_or("") + '\0';
}

// All that the output tells, in whatever notation.
std::string told_bytes(const std::string& output) {
  std::string rows;
  std::string values;
  std::istringstream lines(output);
  for (std::string line; std::getline(lines, line);) {
    if (std::isxdigit(line[0]) != 0) {
      add_row(line, &rows);
    }
    values += bytes_of(value_of(line));
  }
  return unescaped(output) + '\0' + rows + '\0' + values;
}

// The first four successive bytes of the token that the output tells, or nothing.
std::string told(const std::string& output, const std::string& token) {
  const std::string bytes = told_bytes(output);
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
        "x: 0x41624364\n", "x = 0x64436241  x\n", "  \"x\": \"QWJDZA==\",\n"}) {
    EXPECT_EQ(told(output, token), token) << output;
  }
  EXPECT_EQ(told("000000  41 62 43\n000008  64\n", token), "");
}

TEST(AccessToken, OfTenThousandCarriers_IsNotTold) {
  Random random(20261122);
  for (int i = 0; i < 10000; ++i) {
    const std::string token = some_token(&random);
    const Carrier carrier = some_carrier(token, &random);
    for (const Descriptor* type : {carrier.type, ChannelAuthRequest::descriptor(),
                                   InboxEntry::descriptor(), WrongReceiverDetail::descriptor()}) {
      for (const std::string& output :
           {explained(*type, carrier.bytes), decoded(*type, carrier.bytes, false),
            decoded(*type, carrier.bytes, true)}) {
        ASSERT_EQ(told(output, token), "")
            << type->name() << " " << support::to_hex(carrier.bytes) << "\n"
            << output;
      }
    }
  }
}

}  // namespace
