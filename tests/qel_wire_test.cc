// What qel-wire reads from bytes and says about them. Its program is tested by qel_wire_test.sh.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>
#include <gtest/gtest.h>

#include <fstream>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "explain.h"
#include "forms.h"
#include "guess.h"
#include "msgspec_frontend.pb.h"
#include "schema.h"
#include "support/peer.h"
#include "support/wire.h"
#include "walk.h"

namespace {

using google::protobuf::Message;
using qel_wire::ExplainOptions;
using qel_wire::Fit;
using qel_wire::Notation;
using support::hex;
using support::Wire;

std::string explained(const std::string& message, const std::string& bytes,
                      const ExplainOptions& options = {}) {
  std::ostringstream out;
  qel_wire::explain(bytes, *qel_wire::message_named(message), options, &out);
  return out.str();
}

std::unique_ptr<Message> parsed(const std::string& name, const std::string& bytes) {
  std::unique_ptr<Message> message = qel_wire::new_message(*qel_wire::message_named(name));
  EXPECT_TRUE(message->ParseFromString(bytes)) << name;
  return message;
}

std::vector<std::string> message_names() {
  std::vector<std::string> names;
  std::istringstream lines(qel_wire::schema_names());
  for (std::string line; std::getline(lines, line) && line != "ProxyOption";) {
    names.push_back(line);
  }
  return names;
}

// A message of that name with all its fields, as the peer has encoded it.
std::string whole_message(const std::string& name) {
  std::ifstream file(QEL_SEEDS "/round_trip/" + name, std::ios::binary);
  std::ostringstream content;
  content << file.rdbuf();
  EXPECT_FALSE(content.str().empty()) << name;
  return content.str().substr(1);
}

// ---- explain

TEST(Explain, OfAMessage_HasARowForEachFieldWithOffsetBytesAndMeaning) {
  EXPECT_EQ(explained("ChatRequest", hex("58 07 60 ff ff ff ff ff ff ff ff ff 01")),
            "000000  58 07                    11 requestId int64 = 7\n"
            "000002  60 ff ff ff ff ff ff ff  12 chatroomId int64 = -1\n"
            "00000a  ff ff 01\n");
}

TEST(Explain, OfAnEmbeddedMessage_IndentsItsFields) {
  EXPECT_EQ(explained("ChatReply", hex("6a 07 08 e9 07 12 02 6f 6b")),
            "000000  6a 07                    13 result Result, 7 bytes\n"
            "000002  08 e9 07                   1 code int32 = 1001\n"
            "000005  12 02 6f 6b                2 msg string = \"ok\", 2 bytes\n");
}

TEST(Explain, OfEnumerationsAndBools_NamesTheirValues) {
  EXPECT_EQ(explained("AlternativePushRequest", hex("68 04 88 01 1e 98 01 01")),
            "000000  68 04                    13 chatType ChatType = MONOLOGUE (4)\n"
            "000002  88 01 1e                 17 msgType MsgType = VOIP_CALL_SETUP (30)\n"
            "000005  98 01 01                 19 truncated bool = true\n");
}

TEST(Explain, OfAFieldThatIsUnknown_MarksIt) {
  EXPECT_EQ(explained("ClientEcho", hex("50 07 59 08 07 06 05 04 03 02 01 65 01 00 00 00")),
            "000000  50 07                    10 ? varint = 7  ! unknown field\n"
            "000002  59 08 07 06 05 04 03 02  11 ? 8 bytes = 0x0102030405060708  ! unknown field\n"
            "00000a  01\n"
            "00000b  65 01 00 00 00           12 ? 4 bytes = 0x00000001  ! unknown field\n");
}

TEST(Explain, OfAnUnknownGroup_ShowsItsFieldsAndItsEnd) {
  EXPECT_EQ(explained("ClientEcho", hex("3b 08 01 3c")),
            "000000  3b                       7 ? group  ! unknown field\n"
            "000001  08 01                      1 ? varint = 1  ! unknown field\n"
            "000003  3c                       7 end of group\n");
}

TEST(Explain, OfAnotherWireType_SaysWhatTheFieldIs) {
  EXPECT_EQ(explained("Result", hex("10 07")),
            "000000  10 07                    2 msg varint = 7  ! unknown field: msg is string\n");
}

TEST(Explain, OfANumberOutsideItsEnumeration_MarksIt) {
  EXPECT_EQ(explained("InboxEntry", hex("10 07")),
            "000000  10 07                    2 msgType MsgType = 7  ! not in MsgType, reads as "
            "absent\n");
}

TEST(Explain, OfMoreThan32Bits_ShowsWhatIsKept) {
  EXPECT_EQ(explained("Result", hex("08 81 80 80 80 10")),
            "000000  08 81 80 80 80 10        1 code int32 = 1  ! more than 32 bits: 4294967297\n");
}

TEST(Explain, OfABoolThatIsNeither_MarksIt) {
  EXPECT_EQ(explained("ConnectionStatus", hex("10 02")),
            "000000  10 02                    2 connected bool = true  ! neither 0 nor 1\n");
}

TEST(Explain, OfATextThatIsNoUtf8_MarksIt) {
  EXPECT_EQ(explained("Result", hex("12 02 61 c3")),
            "000000  12 02 61 c3              2 msg string = \"a\\303\", 2 bytes  ! not UTF-8\n");
}

TEST(Explain, OfBytesThatAreNoUtf8_DoesNotMarkThem) {
  EXPECT_EQ(explained("ChatMessageParam", hex("52 01 c3")),
            "000000  52 01 c3                 10 secureChatMsg bytes = \"\\303\", 1 byte\n");
}

TEST(Explain, OfAPackedList_ShowsEachElement) {
  EXPECT_EQ(explained("WrongReceiverDetail", hex("0a 03 01 ac 02")),
            "000000  0a 03                    1 invalidReceivers int64, packed, 3 bytes\n"
            "000002  01                         int64 = 1\n"
            "000003  ac 02                      int64 = 300\n");
}

TEST(Explain, OfTwoMessagesInOne_MarksWhatIsReplacedAndMerged) {
  EXPECT_EQ(explained("ChatReply", hex("58 07 6a 02 08 01 58 08 6a 02 08 02")),
            "000000  58 07                    11 requestId int64 = 7\n"
            "000002  6a 02                    13 result Result, 2 bytes\n"
            "000004  08 01                      1 code int32 = 1\n"
            "000006  58 08                    11 requestId int64 = 8  ! again, replaces that at "
            "offset 0\n"
            "000008  6a 02                    13 result Result, 2 bytes  ! again, merged with that "
            "at offset 2\n"
            "00000a  08 02                      1 code int32 = 2\n");
}

TEST(Explain, OfAFieldOutOfOrder_MarksIt) {
  EXPECT_EQ(explained("ChatReply", hex("60 2a 58 07")),
            "000000  60 2a                    12 chatroomId int64 = 42\n"
            "000002  58 07                    11 requestId int64 = 7  ! behind a field with a "
            "higher number\n");
}

TEST(Explain, OfAFieldThatIsDoubtfulAndThereAgain_SaysBoth) {
  EXPECT_EQ(explained("ConnectionStatus", hex("10 01 10 02")),
            "000000  10 01                    2 connected bool = true\n"
            "000002  10 02                    2 connected bool = true  ! neither 0 nor 1; again, "
            "replaces that at offset 0\n");
}

// The runtime takes it, because the input ends between two fields.
TEST(Explain, OfAnEmbeddedMessageThatWasCutBetweenFields_SaysThatItIsShort) {
  EXPECT_EQ(explained("ChatReply", hex("6a 07 08 00")),
            "000000  6a 07                    13 result Result, 2 bytes  ! its length is 7, more "
            "than there is\n"
            "000002  08 00                      1 code int32 = 0\n");
}

TEST(Explain, OfALongText_ShowsTheBeginning) {
  const std::string bytes = Wire().text(2, std::string(40, 'a')).bytes();
  EXPECT_EQ(explained("Result", bytes), "000000  12 28 61 61 61 61 61 61  2 msg string = \"" +
                                            std::string(32, 'a') +
                                            "\"..., 40 bytes\n"
                                            "000008  61 61 61 61 61 61 61 61\n"
                                            "000010  61 61 61 61 61 61 61 61\n"
                                            "000018  61 61 61 61 61 61 61 61\n"
                                            "        ... 10 more bytes\n");
}

TEST(Explain, WhenAllIsAskedFor_ShowsALongTextWhole) {
  ExplainOptions options;
  options.show_all = true;
  const std::string text =
      explained("Result", Wire().text(2, std::string(40, 'a')).bytes(), options);
  EXPECT_NE(text.find("\"" + std::string(40, 'a') + "\", 40 bytes"), std::string::npos) << text;
  EXPECT_NE(text.find("000028  61 61\n"), std::string::npos) << text;
}

TEST(Explain, OfALongText_IsNotCutWithinACharacter) {
  const std::string bytes = Wire().text(2, std::string(31, 'a') + "\xc3\xbc" + "b").bytes();
  EXPECT_NE(explained("Result", bytes).find("\"" + std::string(31, 'a') + "\"..."),
            std::string::npos);
}

// A terminal obeys the first two; the others turn the writing round and back.
TEST(Explain, OfControlCharacters_EscapesThem) {
  const std::string text = explained(
      "Result", Wire().text(2, "\033[2J\xc2\x9b\xe2\x80\xae\xe2\x80\xac\xc3\xbc").bytes());
  EXPECT_NE(text.find("\"\\033[2J\\302\\233\\342\\200\\256\\342\\200\\254\xc3\xbc\""),
            std::string::npos)
      << text;
}

// Of each kind the first and the last: C0 and DEL, C1, marks of direction, separators of lines.
TEST(Quoted, CharactersThatATerminalObeys_AreEscaped) {
  for (const char* bytes : {"01", "1f", "7f", "c2 80", "c2 9f", "d8 9c", "e2 80 8e", "e2 80 8f",
                            "e2 80 a8", "e2 80 ae", "e2 81 a6", "e2 81 a9", "ef bb bf"}) {
    const std::string text = hex(bytes);
    EXPECT_EQ(qel_wire::in_quotes(text).find(text), std::string::npos) << bytes;
  }
}

// Their neighbours.
TEST(Quoted, CharactersThatATerminalShows_StayAsTheyAre) {
  for (const char* bytes : {"20", "7e", "c2 a0", "d8 9b", "e2 80 8d", "e2 80 90", "e2 80 a7",
                            "e2 80 af", "e2 81 a5", "e2 81 aa", "ef bb be", "f0 9f 98 80"}) {
    const std::string text = hex(bytes);
    EXPECT_EQ(qel_wire::in_quotes(text), "\"" + text + "\"") << bytes;
  }
}

TEST(Readable, TextWithoutQuotes_HasTheSameEscapes) {
  EXPECT_EQ(qel_wire::readable("a \"b\" \\ \033[2J\n"), "a \"b\" \\ \\033[2J\\012");
}

TEST(Utf8, AtItsBounds_IsToldFromWhatIsNone) {
  for (const char* text : {"", "a", "\xc2\x80", "\xdf\xbf", "\xe0\xa0\x80", "\xed\x9f\xbf",
                           "\xee\x80\x80", "\xf0\x90\x80\x80", "\xf4\x8f\xbf\xbf"}) {
    EXPECT_TRUE(qel_wire::is_utf8(text)) << support::to_hex(text);
  }
  // Overlong, surrogates, too large, a lead or a continuation without the other.
  for (const char* text :
       {"\xc0\x80", "\xc1\xbf", "\xe0\x9f\xbf", "\xf0\x8f\xbf\xbf", "\xed\xa0\x80", "\xed\xbf\xbf",
        "\xf4\x90\x80\x80", "\xf8\x88\x80\x80\x80", "\x80", "\xc2", "\xc2\x41", "\xe2\x80"}) {
    EXPECT_FALSE(qel_wire::is_utf8(text)) << support::to_hex(text);
  }
}

TEST(Explain, WithColours_ClosesEachThatItOpens) {
  ExplainOptions options;
  options.colours = qel_wire::Colours(true);
  EXPECT_EQ(explained("ClientEcho", hex("08 07"), options),
            "\033[2m000000\033[0m  08 07                    1 \033[36mrequestId\033[0m int64 = "
            "\033[32m7\033[0m\n");
}

// ---- Broken bytes

struct BrokenBytes {
  const char* name;
  const char* message;
  const char* bytes;
  size_t offset;
  const char* reason;
};

class Broken : public testing::TestWithParam<BrokenBytes> {};

TEST_P(Broken, Bytes_AreToldByOffsetAndReason) {
  const BrokenBytes& broken = GetParam();
  qel_wire::Visitor nobody;
  const auto problem =
      qel_wire::walk(hex(broken.bytes), *qel_wire::message_named(broken.message), &nobody);
  ASSERT_TRUE(problem.has_value());
  EXPECT_EQ(problem->offset, broken.offset);
  EXPECT_EQ(problem->reason, broken.reason);
}

INSTANTIATE_TEST_SUITE_P(
    Of, Broken,
    testing::Values(
        BrokenBytes{"ACutTag", "Result", "08 01 e0", 2, "the input ends within a tag"},
        BrokenBytes{"ALongTag", "Result", "88 80 80 80 80 80 80 80 80 80 00", 0,
                    "a tag has more than 10 bytes"},
        BrokenBytes{"AZeroTag", "Result", "08 01 00", 2, "a tag of 0 is no field"},
        BrokenBytes{"ACutNumber", "Result", "08 80", 1,
                    "the input ends within the number of field 1"},
        BrokenBytes{"ALongNumber", "Result", "08 80 80 80 80 80 80 80 80 80 80 00", 1,
                    "the number of field 1 has more than 10 bytes"},
        BrokenBytes{"ACutLength", "Result", "12 80", 1,
                    "the input ends within the length of field 2"},
        BrokenBytes{"ACutText", "Result", "12 05 61", 2,
                    "the input ends within field 2: its length is 5 bytes, of which 1 is there"},
        BrokenBytes{"ACutTextInAMessage", "ChatReply", "6a 04 12 05 61 62 58 07", 4,
                    "the message around it ends within field 2: its length is 5 bytes, of which 2 "
                    "are there"},
        BrokenBytes{"ACutFixed32", "Result", "7d 01 02", 1,
                    "the input ends within the number of field 15"},
        BrokenBytes{"ACutFixed64", "Result", "79 01 02", 1,
                    "the input ends within the number of field 15"},
        BrokenBytes{"ACutElement", "WrongReceiverDetail", "0a 02 01 80", 3,
                    "the input ends within a number of field 1"},
        BrokenBytes{"AGroupWithoutEnd", "Result", "7b 08 01", 3,
                    "the input ends within the group of field 15"},
        BrokenBytes{"AnEndWithoutGroup", "Result", "08 01 7c", 2,
                    "the end of a group, field 15, that did not begin"},
        BrokenBytes{"AnotherEnd", "Result", "7b 0c", 1,
                    "the group of field 15 ends as another one"},
        BrokenBytes{"AWireTypeThatIsNone", "Result", "7e", 0,
                    "field 15 has the wire type 6, which there is not"}),
    [](const auto& info) { return std::string(info.param.name); });

TEST(Explain, OfBrokenBytes_ShowsWhatComesBeforeAndTheFieldThatIsBroken) {
  EXPECT_EQ(
      explained("Result", hex("08 01 12 05 61")),
      "000000  08 01                    1 code int32 = 1\n"
      "000002  12 05                    broken at offset 4: the input ends within field 2: its "
      "length is 5 bytes, of which 1 is there\n");
}

TEST(Walk, OfMoreThan100Levels_IsBroken) {
  const auto* type = qel_wire::message_named("Result");
  qel_wire::Visitor nobody;
  const std::string levels_100 = std::string(100, '\x7b') + std::string(100, '\x7c');
  EXPECT_FALSE(qel_wire::walk(levels_100, *type, &nobody).has_value());
  const std::string levels_101 = std::string(101, '\x7b') + std::string(101, '\x7c');
  const auto problem = qel_wire::walk(levels_101, *type, &nobody);
  ASSERT_TRUE(problem.has_value());
  EXPECT_EQ(problem->offset, 100U);
  EXPECT_EQ(problem->reason, "more than 100 levels of nesting");
}

TEST(Walk, OfMoreThan64MiB_IsBroken) {
  const auto* type = qel_wire::message_named("Result");
  qel_wire::Visitor nobody;
  const size_t content =
      qel_wire::kMostBytes - 6;  // behind the tag, two bytes, and the length, four
  const std::string most = Wire().text(1000, std::string(content, 'a')).bytes();
  ASSERT_EQ(most.size(), qel_wire::kMostBytes);
  EXPECT_FALSE(qel_wire::walk(most, *type, &nobody).has_value());
  const auto problem = qel_wire::walk(most + most.substr(0, 1), *type, &nobody);
  ASSERT_TRUE(problem.has_value());
  EXPECT_EQ(problem->reason, "more than 64 MiB, which no call takes");
}

// ---- Text, JSON, hex, base64

TEST(TextForm, OfEveryMessage_IsThePeers) {
  std::vector<support::PeerItem> items;
  for (const std::string& name : message_names()) {
    items.push_back({name, whole_message(name)});
  }
  ASSERT_EQ(items.size(), 81U);
  const auto texts = support::peer_decode_all(support::library_schema(), items);
  for (size_t i = 0; i < items.size(); ++i) {
    EXPECT_EQ(qel_wire::text_form(*parsed(items[i].message, items[i].content)), texts[i]);
  }
}

TEST(TextForm, OfEveryMessage_IsTakenBack) {
  for (const std::string& name : message_names()) {
    const auto message = parsed(name, whole_message(name));
    const std::string text = qel_wire::text_form(*message);
    message->Clear();
    EXPECT_EQ(qel_wire::parse_text(text, message.get()).value_or(""), "");
    EXPECT_EQ(message->SerializeAsString(), whole_message(name)) << name;
  }
}

TEST(TextForm, OfAnotherLanguage_IsReadable) {
  EXPECT_EQ(
      qel_wire::text_form(*parsed("Result", Wire().text(2, "\xec\x95\x88\xeb\x85\x95").bytes())),
      "msg: \"\xec\x95\x88\xeb\x85\x95\"\n");
}

// As the runtime prints them, but that texts are not taken apart.
TEST(TextForm, OfUnknownFields_HasThemByTheirNumbers) {
  EXPECT_EQ(qel_wire::text_form(*parsed("ClientEcho", Wire()
                                                          .number(2, -1)
                                                          .fixed32(3, 7)
                                                          .fixed64(4, 8)
                                                          .group(5, Wire().number(1, 1))
                                                          .text(7, hex("08 01"))
                                                          .bytes())),
            "2: 18446744073709551615\n3: 0x00000007\n4: 0x0000000000000008\n5 {\n  1: 1\n}\n"
            "7: \"\\010\\001\"\n");
}

// Each level would be a line of its own, indented by all levels before.
TEST(TextForm, OfAnUnknownTextThatNestsDeep_IsNotMuchLonger) {
  std::string bytes = hex("08 01");
  for (int level = 0; level < 10000; ++level) {
    bytes = Wire().text(9, bytes).bytes();
  }
  EXPECT_LT(qel_wire::text_form(*parsed("ClientEcho", bytes)).size(), 5 * bytes.size());
}

TEST(TextForm, WithColours_HasThemOfNamesAndValues) {
  EXPECT_EQ(qel_wire::text_form(*parsed("ClientEcho", hex("08 07")), qel_wire::Colours(true)),
            "\033[36mrequestId\033[0m: \033[32m7\033[0m\n");
}

TEST(JsonForm, WithColours_HasThemOfNames) {
  EXPECT_EQ(qel_wire::json_form(*parsed("Result", Wire().text(2, "a\": b").bytes()),
                                qel_wire::Colours(true)),
            "{\n  \033[36m\"msg\"\033[0m: \"a\\\": b\"\n}\n");
}

TEST(ParseText, OfAFieldThatIsNotThere_SaysWhere) {
  Result result;
  EXPECT_EQ(qel_wire::parse_text("code: 1\nkode: 2\n", &result).value_or("taken"),
            "2:5: Message type \"Result\" has no field named \"kode\".");
}

TEST(JsonForm, OfEachType_IsAsOtherImplementationsWriteIt) {
  const auto message =
      parsed("AllowChatReply",
             Wire().number(11, 7).message(13, Wire().number(1, -3).text(2, "a\"b")).bytes());
  EXPECT_EQ(qel_wire::json_form(*message),
            "{\n"
            "  \"requestId\": \"7\",\n"
            "  \"result\": {\n"
            "    \"code\": -3,\n"
            "    \"msg\": \"a\\\"b\"\n"
            "  }\n"
            "}\n");
}

TEST(JsonForm, OfATextThatIsNoUtf8_ReplacesWhatIsNone) {
  EXPECT_EQ(qel_wire::json_form(*parsed("Result", Wire().text(2, "a\xc3").bytes())),
            "{\n  \"msg\": \"a\\ufffd\"\n}\n");
}

TEST(UnknownFields, OnAllLevels_AreCounted) {
  const auto message = parsed(
      "ChatReply", Wire().number(99, 1).message(13, Wire().number(98, 1).number(97, 1)).bytes());
  EXPECT_EQ(qel_wire::unknown_fields(*message), 3);
}

TEST(Hex, WithSeparators_IsRead) {
  for (const char* text :
       {"0a0B0c", "0a 0B\n0c", "0a:0b:0c", "0x0a, 0x0b, 0x0c", "\\x0a\\x0b\\x0c", "0X0a0b0c"}) {
    EXPECT_EQ(qel_wire::from_notation(text, Notation::kHex).value_or("refused"), "\x0a\x0b\x0c")
        << text;
  }
}

TEST(Hex, ThatIsNone_IsRefused) {
  for (const char* text : {"0", "0a0", "zz", "0a-0b", "10x5"}) {
    EXPECT_FALSE(qel_wire::from_notation(text, Notation::kHex).has_value()) << text;
  }
}

// Padded or not, of both alphabets, broken into lines.
TEST(Base64, OfEveryKind_IsRead) {
  for (const char* text : {"+/8BAg==", "+/8BAg", "-_8BAg==", "-_8BAg", "+/8B\nAg==\n"}) {
    EXPECT_EQ(qel_wire::from_notation(text, Notation::kBase64).value_or("refused"),
              "\xfb\xff\x01\x02")
        << text;
  }
}

TEST(Base64, ThatIsNone_IsRefused) {
  for (const char* text : {"A", "AB=C", "!!!!"}) {
    EXPECT_FALSE(qel_wire::from_notation(text, Notation::kBase64).has_value()) << text;
  }
}

TEST(Notation, OfBytes_IsWritten) {
  EXPECT_EQ(qel_wire::to_notation("\xfb\xff\x01\x02", Notation::kHex), "fbff0102");
  EXPECT_EQ(qel_wire::to_notation("\xfb\xff\x01\x02", Notation::kBase64), "+/8BAg==");
}

// ---- guess

std::vector<std::string> of_rank(const std::vector<Fit>& fits, int rank) {
  std::vector<std::string> names;
  for (const Fit& fit : fits) {
    if (fit.rank == rank) {
      names.push_back(fit.type->name());
    }
  }
  return names;
}

bool is_length_delimited(const google::protobuf::FieldDescriptor& field) {
  return field.type() == google::protobuf::FieldDescriptor::TYPE_STRING ||
         field.type() == google::protobuf::FieldDescriptor::TYPE_BYTES ||
         field.message_type() != nullptr;
}

// Whether the two have the same numbers with the same wire types, so that no bytes tell them apart.
bool look_alike(const google::protobuf::Descriptor& a, const google::protobuf::Descriptor& b) {
  bool alike = a.field_count() == b.field_count();
  for (int i = 0; alike && i < a.field_count(); ++i) {
    const auto* other = b.FindFieldByNumber(a.field(i)->number());
    alike = other != nullptr && is_length_delimited(*a.field(i)) == is_length_delimited(*other);
  }
  return alike;
}

TEST(Guess, OfEveryMessageWithAllItsFields_RanksItFirst) {
  for (const std::string& name : message_names()) {
    const auto* type = qel_wire::message_named(name);
    bool is_first = false;
    for (const std::string& first : of_rank(qel_wire::guess(whole_message(name)), 1)) {
      is_first = is_first || first == name;
      EXPECT_TRUE(look_alike(*qel_wire::message_named(first), *type)) << name << ", " << first;
    }
    EXPECT_TRUE(is_first) << name;
  }
}

TEST(Guess, OfAChatRequest_RanksItAlone) {
  const std::string bytes =
      Wire().number(11, 7).number(12, 42).message(13, Wire().number(1, 1).text(3, "hi")).bytes();
  EXPECT_EQ(of_rank(qel_wire::guess(bytes), 1), std::vector<std::string>{"ChatRequest"});
}

TEST(Guess, OfMessagesThatLookAlike_GivesOneRank) {
  EXPECT_EQ(
      of_rank(qel_wire::guess(hex("08 07")), 1),
      (std::vector<std::string>{"ClientEcho", "ClientEchoReply", "ServerEcho", "ServerEchoReply"}));
}

const Fit& fit_of(const std::vector<Fit>& fits, const std::string& name) {
  for (const Fit& fit : fits) {
    if (fit.type->name() == name) {
      return fit;
    }
  }
  throw std::out_of_range(name);
}

TEST(Guess, CountsWhatSpeaksForAndAgainst) {
  const auto fits = qel_wire::guess(
      Wire().number(4, 1).number(1, 1).number(1, 2).text(2, "\xff").number(99, 1).bytes());
  const Fit& fit = fit_of(fits, "Result");
  EXPECT_EQ(fit.known, 4U);
  EXPECT_EQ(fit.absent, 1U);    // wrongReceiverDetail
  EXPECT_EQ(fit.unknown, 1U);   // 99
  EXPECT_EQ(fit.doubtful, 4U);  // 1, 1 and 2 behind 4, the second 1 for both reasons; no UTF-8
}

TEST(Guess, OfBrokenBytes_RanksMessagesThatTakeThemFirst) {
  // As a text of field 2 it is cut; as a number of no field 2 it is unknown.
  const auto fits = qel_wire::guess(hex("08 07 10 80"));
  EXPECT_TRUE(fits.front().is_broken);
  const auto cut = qel_wire::guess(hex("08 07 12 02 08"));
  EXPECT_FALSE(cut.front().is_broken);
  EXPECT_TRUE(fit_of(cut, "ClientEcho").is_broken);
}

// ---- schema

TEST(Schema, NamesAllMessagesAndEnumerations) {
  std::istringstream names(qel_wire::schema_names());
  std::vector<std::string> lines;
  for (std::string line; std::getline(names, line);) {
    lines.push_back(line);
  }
  ASSERT_EQ(lines.size(), 87U);
  EXPECT_EQ(lines.front(), "ConnectionStatus");
  EXPECT_EQ(lines.back(), "ConnectionResetCause");
}

TEST(Schema, OfAMessage_HasWhatItContainsOnce) {
  EXPECT_EQ(qel_wire::schema_of("EndChatRequest"),
            "message EndChatRequest {\n"
            "  optional int64 userId = 1;\n"
            "  optional int64 deviceId = 2;\n"
            "  optional int64 requestId = 11;\n"
            "  repeated .EndChatEntry endChatEntries = 12;\n"
            "}\n"
            "\n"
            "message EndChatEntry {\n"
            "  optional int64 chatroomId = 1;\n"
            "  optional bool secureKeyLost = 10;\n"
            "  optional bool denyInvitation = 11;\n"
            "}\n");
}

TEST(Schema, OfAnEnumeration_HasItsMembers) {
  EXPECT_EQ(qel_wire::schema_of("ProxyOption"), "enum ProxyOption {\n  GATEWAY_MODE = 0;\n}\n");
}

TEST(Schema, WithColours_HasThemOfNames) {
  EXPECT_EQ(qel_wire::schema_of("ProxyOption", qel_wire::Colours(true)),
            "enum ProxyOption {\n  \033[36mGATEWAY_MODE\033[0m = 0;\n}\n");
}

TEST(Schema, OfNothing_IsEmpty) {
  EXPECT_EQ(qel_wire::schema_of("Nothing"), "");
}

}  // namespace
