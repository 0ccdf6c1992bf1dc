// Every message of the schema against the independent peer, filled in many ways: our classes and
// the peer make the same bytes of the same values, and read the same values from them.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/io/coded_stream.h>
#include <google/protobuf/io/zero_copy_stream_impl_lite.h>
#include <google/protobuf/text_format.h>
#include <google/protobuf/unknown_field_set.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "msgspec_frontend.pb.h"
#include "support/peer.h"
#include "support/samples.h"
#include "support/wire.h"

namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::FileDescriptor;
using google::protobuf::Message;
using support::Filling;
using support::PeerItem;
using support::Sample;
using support::Wire;

const FileDescriptor& schema() {
  return *ChatRequest::descriptor()->file();
}

// ---- Samples and what the peer makes of them

struct Corpus {
  std::vector<Sample> samples;
  std::vector<std::string> ours;          // the bytes that our classes make of a sample
  std::vector<std::string> peers;         // those that the peer makes of its text
  std::vector<std::string> peer_reading;  // the text that the peer reads from our bytes
};

Corpus make_corpus(const std::string& peer_schema, const std::vector<Filling>& fillings) {
  Corpus corpus;
  std::vector<PeerItem> texts;
  std::vector<PeerItem> encodings;
  for (int i = 0; i < schema().message_type_count(); ++i) {
    for (const Filling& filling : fillings) {
      corpus.samples.push_back(make_sample(*schema().message_type(i), filling));
      const Sample& sample = corpus.samples.back();
      corpus.ours.push_back(sample.message->SerializeAsString());
      texts.push_back({sample.type(), sample.text});
      encodings.push_back({sample.type(), corpus.ours.back()});
    }
  }
  corpus.peers = peer_encode_all(peer_schema, texts);
  corpus.peer_reading = peer_decode_all(peer_schema, encodings);
  return corpus;
}

// Made once for all tests of the program: starting the peer is what takes time.
const Corpus& corpus() {
  static const Corpus made = make_corpus(support::library_schema(), support::fillings());
  return made;
}
const Corpus& later_corpus() {
  static const Corpus made = make_corpus(support::later_schema(), support::later_fillings());
  return made;
}

// ---- Comparing

// Around the first byte that differs, as whole samples may be megabytes.
testing::AssertionResult same_bytes(const std::string& expected, const std::string& actual) {
  if (actual == expected) {
    return testing::AssertionSuccess();
  }
  const auto shorter = std::min(expected.size(), actual.size());
  const auto differs =
      std::mismatch(expected.begin(), expected.begin() + static_cast<std::ptrdiff_t>(shorter),
                    actual.begin())
          .first;
  const auto at = static_cast<size_t>(differs - expected.begin());
  const size_t from = at < 64 ? 0 : at - 64;
  return testing::AssertionFailure()
         << "bytes differ at " << at << "; from byte " << from << " on,\n  of " << expected.size()
         << " expected: " << support::to_hex(expected.substr(from, 128)) << "\n  of "
         << actual.size() << " actual:   " << support::to_hex(actual.substr(from, 128));
}

// The line that differs, with the number that it has in the text form, and its message.
testing::AssertionResult same_text(const std::string& expected, const std::string& actual) {
  if (actual == expected) {
    return testing::AssertionSuccess();
  }
  std::istringstream expected_lines(expected);
  std::istringstream actual_lines(actual);
  std::string expected_line;
  std::string actual_line;
  int number = 0;
  do {
    ++number;
    expected_line = actual_line = "(end)";
    std::getline(expected_lines, expected_line);
    std::getline(actual_lines, actual_line);
  } while (expected_line == actual_line);
  return testing::AssertionFailure()
         << "line " << number << " differs:\n  expected: " << expected_line.substr(0, 200)
         << "\n  actual:   " << actual_line.substr(0, 200);
}

// Every field that is set, by number, with its value; unknown fields by their number.
std::string text_of(const Message& message) {
  std::string text;
  google::protobuf::TextFormat::PrintToString(message, &text);
  return text;
}

std::unique_ptr<Message> parsed(const Sample& sample, const std::string& bytes) {
  std::unique_ptr<Message> message(sample.message->New());
  EXPECT_TRUE(message->ParseFromString(bytes));
  return message;
}

// ---- Every sample

// The parameter is a sample's place in its corpus.
template <const Corpus& (*made_corpus)()>
class SampleTest : public testing::TestWithParam<size_t> {
 protected:
  const Sample& sample() const { return made_corpus().samples[GetParam()]; }
  const std::string& ours() const { return made_corpus().ours[GetParam()]; }
  const std::string& peers() const { return made_corpus().peers[GetParam()]; }
  const std::string& peer_reading() const { return made_corpus().peer_reading[GetParam()]; }
};
class EveryMessage : public SampleTest<corpus> {};
class EveryMessageOfALaterSchema : public SampleTest<later_corpus> {};

TEST_P(EveryMessage, Filled_HoldsTheValues) {
  EXPECT_TRUE(same_text(sample().text, text_of(*sample().message)));
}

TEST_P(EveryMessage, ParsedFromThePeersBytes_HoldsTheValues) {
  EXPECT_TRUE(same_text(sample().text, text_of(*parsed(sample(), peers()))));
}

TEST_P(EveryMessage, ParsedFromThePeersBytesOneByOne_HoldsTheValues) {
  google::protobuf::io::ArrayInputStream one_by_one(peers().data(),
                                                    static_cast<int>(peers().size()), 1);
  std::unique_ptr<Message> message(sample().message->New());
  ASSERT_TRUE(message->ParseFromZeroCopyStream(&one_by_one));
  EXPECT_TRUE(same_text(sample().text, text_of(*message)));
}

TEST_P(EveryMessage, ParsedFromThePeersBytes_ComesBackByteForByte) {
  EXPECT_TRUE(same_bytes(peers(), parsed(sample(), peers())->SerializeAsString()));
}

TEST_P(EveryMessage, Filled_IsSerializedToThePeersBytes) {
  EXPECT_TRUE(same_bytes(peers(), ours()));
}

TEST_P(EveryMessage, Filled_IsSerializedToThePeersBytesOneByOne) {
  std::string bytes(peers().size(), '\0');
  google::protobuf::io::ArrayOutputStream one_by_one(&bytes[0], static_cast<int>(bytes.size()), 1);
  ASSERT_TRUE(sample().message->SerializeToZeroCopyStream(&one_by_one));
  EXPECT_TRUE(same_bytes(peers(), bytes));
}

// From this text the peer made its bytes, so that encoding it again makes ours.
TEST_P(EveryMessage, Filled_IsReadByThePeerAsTheValues) {
  EXPECT_TRUE(same_text(sample().text, peer_reading()));
}

TEST_P(EveryMessageOfALaterSchema, ParsedFromThePeersBytes_HoldsWhatIsKnownAndKeepsTheRest) {
  EXPECT_TRUE(same_text(text_of(*sample().message), text_of(*parsed(sample(), peers()))));
}

// Other bytes than the peer's, as what is unknown comes last in its message, but no fewer.
TEST_P(EveryMessageOfALaterSchema, ParsedFromThePeersBytes_ComesBackAsItWasFilled) {
  EXPECT_TRUE(same_bytes(ours(), parsed(sample(), peers())->SerializeAsString()));
  EXPECT_EQ(ours().size(), peers().size());
}

TEST_P(EveryMessageOfALaterSchema, Filled_IsReadByThePeerAsItsOwnValues) {
  EXPECT_TRUE(same_text(sample().text, peer_reading()));
}

std::string sample_name(size_t place, const std::vector<Filling>& fillings) {
  const auto message = static_cast<int>(place / fillings.size());
  return schema().message_type(message)->name() + "_" + fillings[place % fillings.size()].name;
}

size_t count_of_samples(const std::vector<Filling>& fillings) {
  return static_cast<size_t>(schema().message_type_count()) * fillings.size();
}

INSTANTIATE_TEST_SUITE_P(Filled, EveryMessage,
                         testing::Range(size_t{0}, count_of_samples(support::fillings())),
                         [](const auto& place) {
                           return sample_name(place.param, support::fillings());
                         });
INSTANTIATE_TEST_SUITE_P(Filled, EveryMessageOfALaterSchema,
                         testing::Range(size_t{0}, count_of_samples(support::later_fillings())),
                         [](const auto& place) {
                           return sample_name(place.param, support::later_fillings());
                         });

// ---- What the samples rest on

TEST(Samples, AreOfAllMessages) {
  EXPECT_EQ(schema().message_type_count(), 81);
}

// A filling sets all that a message holds, down to its innermost records.
TEST(Samples, OfNoMessage_WouldEndlesslyHoldOneOfItsKind) {
  for (int i = 0; i < schema().message_type_count(); ++i) {
    std::set<const Descriptor*> inside;
    std::vector<const Descriptor*> to_visit = {schema().message_type(i)};
    while (!to_visit.empty()) {
      const Descriptor* type = to_visit.back();
      to_visit.pop_back();
      for (int j = 0; j < type->field_count(); ++j) {
        const Descriptor* embedded = type->field(j)->message_type();
        if (embedded != nullptr && inside.insert(embedded).second) {
          to_visit.push_back(embedded);
        }
      }
    }
    EXPECT_EQ(inside.count(schema().message_type(i)), 0U) << schema().message_type(i)->name();
  }
}

// On all levels, of all elements.
void expect_all_fields(const Message& message) {
  const auto* fields = message.GetReflection();
  const Descriptor& type = *message.GetDescriptor();
  for (int i = 0; i < type.field_count(); ++i) {
    const FieldDescriptor* field = type.field(i);
    const int elements = field->is_repeated() ? fields->FieldSize(message, field) : 1;
    EXPECT_TRUE(field->is_repeated() ? elements > 0 : fields->HasField(message, field))
        << field->full_name();
    for (int j = 0; field->message_type() != nullptr && j < elements; ++j) {
      expect_all_fields(field->is_repeated() ? fields->GetRepeatedMessage(message, field, j)
                                             : fields->GetMessage(message, field));
    }
  }
}

TEST(Samples, FilledWithEverything_HaveEveryFieldOnAllLevels) {
  for (const Sample& sample : corpus().samples) {
    if (sample.filling == "Everything") {
      expect_all_fields(*sample.message);
    }
  }
}

TEST(Samples, FilledWithNothing_AreOfNoBytes) {
  for (size_t i = 0; i < corpus().samples.size(); ++i) {
    if (corpus().samples[i].filling == "Nothing") {
      EXPECT_EQ(corpus().peers[i], "");
    }
  }
}

TEST(Samples, FilledWithLaterFields_HaveOneOfEachWireTypeBeyondTheirOwn) {
  for (const Sample& sample : later_corpus().samples) {
    if (sample.filling == "LaterFields") {
      const auto& unknown = sample.message->GetReflection()->GetUnknownFields(*sample.message);
      std::set<int> types;
      for (int i = 0; i < unknown.field_count(); ++i) {
        types.insert(unknown.field(i).type());
      }
      EXPECT_EQ(types.size(), 5U) << sample.type();
    }
  }
}

// ---- The order of unknown fields, by hand

template <typename T>
std::string sent_back(const Wire& received) {
  T message;
  EXPECT_TRUE(message.ParseFromString(received.bytes()));
  return support::to_hex(message.SerializeAsString());
}

TEST(UnknownFields, AmongKnownOnes_AreSentBackBehindThemInTheirOrder) {
  const Wire received = Wire()
                            .text(9, "later")
                            .number(1, 5)
                            .fixed32(26, 0x01020304)
                            .number(2, 6)
                            .group(24, Wire().number(1, -1))
                            .fixed64(8, 0x0102030405060708);
  EXPECT_EQ(sent_back<ProcessedMessageEntry>(received),
            "08 05 10 06 "                                   // 1 and 2
            "4a 05 6c 61 74 65 72 "                          // 9
            "d5 01 04 03 02 01 "                             // 26
            "c3 01 08 ff ff ff ff ff ff ff ff ff 01 c4 01 "  // 24, a group
            "41 08 07 06 05 04 03 02 01");                   // 8
}

TEST(UnknownFields, OfAnEmbeddedMessage_AreSentBackInsideIt) {
  const Wire received =
      Wire().number(9, 1).message(2, Wire().number(8, 2).number(1, 3)).number(1, 4);
  EXPECT_EQ(sent_back<ChannelAuthReply>(received), "08 04 12 04 08 03 40 02 48 01");
}

TEST(EnumerationsNumbers, ThatAreNoMembers_AreNotSetAndSentBackBehindTheOtherFields) {
  const Wire received = Wire().number(1, 5).number(2, 7).text(3, "a").number(4, 6);
  ChatMessageParam param;
  ASSERT_TRUE(param.ParseFromString(received.bytes()));
  EXPECT_FALSE(param.has_msgtype());
  EXPECT_EQ(sent_back<ChatMessageParam>(received), "08 05 1a 01 61 20 06 10 07");
}

TEST(EnumerationsNumbers, ThatAreNegative_AreSentBackInTenBytes) {
  EXPECT_EQ(sent_back<IsTyping>(Wire().number(14, -1)), "70 ff ff ff ff ff ff ff ff ff 01");
}

TEST(EnumerationsNumbers, OfARepeatedFieldThatAreNoMembers_AreSentBackBehindTheMembers) {
  const Wire received = Wire().number(11, 1).number(11, 0).number(11, 2).number(11, 0);
  ChannelAuthRequest request;
  ASSERT_TRUE(request.ParseFromString(received.bytes()));
  EXPECT_EQ(request.proxyoptions_size(), 2);
  EXPECT_EQ(sent_back<ChannelAuthRequest>(received), "58 00 58 00 58 01 58 02");
}

// As a later schema may have it that packs them.
TEST(PackedNumbers, OfARepeatedField_AreReadToo) {
  ShutdownConnectionRequest request;
  ASSERT_TRUE(request.ParseFromString(support::hex("62 04 05 ac 02 00")));
  ASSERT_EQ(request.resetdeviceids_size(), 3);
  EXPECT_EQ(request.resetdeviceids(0), 5);
  EXPECT_EQ(request.resetdeviceids(1), 300);
  EXPECT_EQ(request.resetdeviceids(2), 0);
}

TEST(PackedNumbers, OfARepeatedEnumeration_AreReadToo) {
  EXPECT_EQ(sent_back<ChannelAuthRequest>(Wire().text(11, support::hex("00 00"))), "58 00 58 00");
}

TEST(EnumerationsNumbers, WithAMemberAndThenAnother_KeepTheMember) {
  const Wire received = Wire().number(2, 1).number(2, 7);
  ChatMessageParam param;
  ASSERT_TRUE(param.ParseFromString(received.bytes()));
  EXPECT_EQ(param.msgtype(), MEDIA);
  EXPECT_EQ(sent_back<ChatMessageParam>(received), "10 01 10 07");
}

}  // namespace
