// What decides for other tests whether outputs are right: it must agree with every deserializer,
// and name what differs.

#include "support/agreement.h"

#include "support/deserializers.h"
#include "support/exchange.h"

namespace {

using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using support::disagreement;
using support::Wire;

void fill(Message* message);

// Sets the field, or adds an element to it. 1001 is a code that hands out all details.
void put(Message* message, const FieldDescriptor* field, int number) {
  const auto* reflection = message->GetReflection();
  const bool repeated = field->is_repeated();
  switch (field->cpp_type()) {
    case FieldDescriptor::CPPTYPE_INT64:
      repeated ? reflection->AddInt64(message, field, number)
               : reflection->SetInt64(message, field, number);
      break;
    case FieldDescriptor::CPPTYPE_INT32:
      reflection->SetInt32(message, field, field->name() == "code" ? 1001 : number);
      break;
    case FieldDescriptor::CPPTYPE_BOOL:
      reflection->SetBool(message, field, true);
      break;
    case FieldDescriptor::CPPTYPE_ENUM:
      reflection->SetEnum(message, field, field->enum_type()->FindValueByNumber(1));
      break;
    case FieldDescriptor::CPPTYPE_STRING:
      reflection->SetString(message, field, "text");
      break;
    case FieldDescriptor::CPPTYPE_MESSAGE:
      fill(repeated ? reflection->AddMessage(message, field)
                    : reflection->MutableMessage(message, field));
      break;
    default:
      FAIL() << field->full_name() << " is of a type that no output had";
  }
}

// Every field of the message and of those in it, each with a number of its own, lists with two.
void fill(Message* message) {
  const auto* type = message->GetDescriptor();
  for (int i = 0; i < type->field_count(); ++i) {
    put(message, type->field(i), 2 * i + 1);
    if (type->field(i)->is_repeated()) {
      put(message, type->field(i), 2 * i + 2);
    }
  }
}

template <typename T>
class Agreement : public support::ExchangeTest {
 protected:
  typename T::Outputs outputs_;
  typename T::Message message_;
};

template <typename... Each>
::testing::Types<Each...> types_of(const std::tuple<Each...>& each);

using Deserializers = decltype(types_of(support::kDeserializers));
TYPED_TEST_SUITE(Agreement, Deserializers);

TYPED_TEST(Agreement, WhenEveryFieldIsThere_NothingDiffers) {
  fill(&this->message_);
  this->outputs_.read(this->message_.SerializeAsString());
  EXPECT_EQ(disagreement(this->outputs_, this->message_), "");
}

TYPED_TEST(Agreement, WhenNoFieldIsThere_NothingDiffers) {
  this->outputs_.read("");
  EXPECT_EQ(disagreement(this->outputs_, this->message_), "");
}

TYPED_TEST(Agreement, WhenNothingWasWritten_TheFirstOutputDiffers) {
  EXPECT_EQ(disagreement(this->outputs_, this->message_).find("request_id is -7770777077707 "), 0u);
}

TYPED_TEST(Agreement, WhenFieldsAreMissing_TheyDiffer) {
  fill(&this->message_);
  this->outputs_.read("");
  EXPECT_NE(disagreement(this->outputs_, this->message_), "");
}

TYPED_TEST(Agreement, WhenFieldsAreSurplus_TheyDiffer) {
  fill(&this->message_);
  this->outputs_.read(this->message_.SerializeAsString());
  EXPECT_NE(disagreement(this->outputs_, typename TypeParam::Message()), "");
}

using AgreementOfTexts = support::ExchangeTest;
using AgreementOfLists = support::ExchangeTest;
using AgreementOfGatedLists = support::ExchangeTest;
using AgreementOfTheCallersRecord = support::ExchangeTest;

TEST_F(AgreementOfTexts, WhenACopyEndsAtTheFirstNul_NothingDiffers) {
  EndChatReply message;
  message.mutable_result()->set_msg(std::string("a\0b", 3));
  support::EndChatReplyOutputs outputs;
  outputs.read(message.SerializeAsString());
  EXPECT_EQ(disagreement(outputs, message), "");
}

TEST_F(AgreementOfTexts, WhenOneDiffers_BothAreNamed) {
  support::EndChatReplyOutputs outputs;
  outputs.read(Wire().message(12, Wire().text(2, "a")).bytes());
  EndChatReply message;
  message.mutable_result()->set_msg("b");
  EXPECT_EQ(disagreement(outputs, message), "text is \"a\" instead of \"b\"; ");
}

TEST_F(AgreementOfLists, WhenAnElementDiffers_ItsPlaceIsNamed) {
  support::ForwardUnreadMessageOutputs outputs;
  outputs.read(Wire().message(12, Wire()).message(12, Wire().number(3, 5)).bytes());
  ForwardUnreadMessage message;
  message.add_inboxentries();
  message.add_inboxentries()->set_sender(6);
  EXPECT_EQ(disagreement(outputs, message), "entries[1].sender is 5 instead of 6; ");
}

TEST_F(AgreementOfLists, WhenTheCountDiffers_ElementsAreLeftAlone) {
  support::ForwardUnreadMessageOutputs outputs;
  outputs.read(Wire().message(12, Wire()).bytes());
  ForwardUnreadMessage message;
  message.add_inboxentries();
  message.add_inboxentries()->set_sender(6);
  EXPECT_EQ(disagreement(outputs, message), "entries is 1 instead of 2; ");
}

TEST_F(AgreementOfGatedLists, WhenTheCodeHandsOutCountsAlone_NothingDiffers) {
  CreateChatroomReply message;
  fill(&message);
  message.mutable_result()->set_code(3009);
  support::CreateChatroomReplyOutputs outputs;
  outputs.read(message.SerializeAsString());
  EXPECT_EQ(outputs.invalid.count, 2);
  EXPECT_EQ(disagreement(outputs, message), "");
}

TEST_F(AgreementOfTheCallersRecord, WhenThereIsNone_TheErrorIsWanted) {
  ForwardOnlineMessage message;
  fill(&message);
  support::ForwardOnlineMessageOutputs outputs;
  outputs.entry = nullptr;
  outputs.read(message.SerializeAsString());
  EXPECT_EQ(disagreement(outputs, message), "");
}

}  // namespace
