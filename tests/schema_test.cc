// The schema that the library registers, against a table that is kept apart from the .proto.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/descriptor.pb.h>
#include <google/protobuf/message.h>
#include <gtest/gtest.h>

#include <fstream>
#include <memory>
#include <set>
#include <sstream>
#include <string>
#include <typeinfo>
#include <vector>

#include "msgspec_frontend.pb.h"
#include "support/process_death.h"
#include "support/wire.h"

// ---- What the generated code asks the runtime when the library is loaded

namespace {

struct VersionCheck {
  int generated;
  int least_runtime;
  const char* file;
};
VersionCheck version_check;  // zero before any code runs

}  // namespace

namespace google {
namespace protobuf {
namespace internal {

// In the program itself, so that the library's initialiser comes here.
void VerifyVersion(int headerVersion, int minLibraryVersion, const char* filename) {
  if (std::string(filename).find("msgspec_frontend") != std::string::npos) {
    version_check = {headerVersion, minLibraryVersion, filename};
  }
}

}  // namespace internal
}  // namespace protobuf
}  // namespace google

namespace {

using google::protobuf::Descriptor;
using google::protobuf::DescriptorPool;
using google::protobuf::EnumDescriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::FileDescriptor;
using google::protobuf::Message;
using google::protobuf::MessageFactory;

TEST(Schema, WhenLoaded_ChecksTheRuntimesVersion) {
  EXPECT_EQ(version_check.generated, 2006001);
  EXPECT_EQ(version_check.least_runtime, 2006000);
  EXPECT_STREQ(version_check.file, "proto-lib/msgspec_frontend.pb.cc");
}

const FileDescriptor& schema() {
  return *DescriptorPool::generated_pool()->FindFileByName("msgspec_frontend.proto");
}

TEST(Schema, WhenLoaded_IsRegistered) {
  ASSERT_NE(DescriptorPool::generated_pool()->FindFileByName("msgspec_frontend.proto"), nullptr);
}

// ---- The table

struct Row {
  int number = 0;
  std::string name;
  std::string label;  // of a field
  std::string type;   // of a field
  bool operator==(const Row& other) const {
    return number == other.number && name == other.name && label == other.label &&
           type == other.type;
  }
};

std::ostream& operator<<(std::ostream& out, const Row& row) {
  return out << row.number << ' ' << row.name << ' ' << row.label << ' ' << row.type;
}

struct Block {
  std::string kind;  // message or enum
  std::string name;
  std::vector<Row> rows;
};

std::vector<Block> read_table() {
  std::vector<Block> blocks;
  std::ifstream file(QEL_SCHEMA_TABLE);
  for (std::string line; std::getline(file, line);) {
    std::istringstream words(line);
    if (line.empty() || line[0] == '#') {
      continue;
    }
    if (line[0] == ' ') {
      Row row;
      words >> row.number >> row.name >> row.label >> row.type;
      blocks.back().rows.push_back(row);
    } else {
      Block block;
      words >> block.kind >> block.name;
      blocks.push_back(block);
    }
  }
  return blocks;
}

std::vector<Block> blocks_of(const std::string& kind) {
  std::vector<Block> blocks;
  for (const Block& block : read_table()) {
    if (block.kind == kind) {
      blocks.push_back(block);
    }
  }
  return blocks;
}

std::vector<std::string> names_of(const std::vector<Block>& blocks) {
  std::vector<std::string> names;
  for (const Block& block : blocks) {
    names.push_back(block.name);
  }
  return names;
}

std::string type_of(const FieldDescriptor& field) {
  switch (field.type()) {
    case FieldDescriptor::TYPE_MESSAGE:
      return field.message_type()->full_name();
    case FieldDescriptor::TYPE_ENUM:
      return field.enum_type()->full_name();
    default:
      return field.type_name();
  }
}

std::vector<Row> rows_of(const Descriptor& message) {
  std::vector<Row> rows;
  for (int i = 0; i < message.field_count(); ++i) {
    const FieldDescriptor& field = *message.field(i);
    const char* label = field.is_repeated()   ? "repeated"
                        : field.is_optional() ? "optional"
                                              : "required";
    rows.push_back({field.number(), field.name(), label, type_of(field)});
  }
  return rows;
}

std::vector<Row> rows_of(const EnumDescriptor& enumeration) {
  std::vector<Row> rows;
  for (int i = 0; i < enumeration.value_count(); ++i) {
    rows.push_back({enumeration.value(i)->number(), enumeration.value(i)->name(), "", ""});
  }
  return rows;
}

TEST(Schema, Table_Has81MessagesAnd6Enumerations) {
  EXPECT_EQ(blocks_of("message").size(), 81u);
  EXPECT_EQ(blocks_of("enum").size(), 6u);
}

TEST(Schema, Messages_AreThoseOfTheTableInItsOrder) {
  std::vector<std::string> names;
  for (int i = 0; i < schema().message_type_count(); ++i) {
    names.push_back(schema().message_type(i)->full_name());
  }
  EXPECT_EQ(names, names_of(blocks_of("message")));
}

TEST(Schema, Enumerations_AreThoseOfTheTableInItsOrder) {
  std::vector<std::string> names;
  for (int i = 0; i < schema().enum_type_count(); ++i) {
    names.push_back(schema().enum_type(i)->full_name());
  }
  EXPECT_EQ(names, names_of(blocks_of("enum")));
}

TEST(Schema, EveryMessage_HasTheFieldsOfTheTable) {
  for (const Block& block : blocks_of("message")) {
    const Descriptor* message = schema().FindMessageTypeByName(block.name);
    ASSERT_NE(message, nullptr) << block.name;
    EXPECT_EQ(rows_of(*message), block.rows) << block.name;
  }
}

TEST(Schema, EveryEnumeration_HasTheValuesOfTheTable) {
  for (const Block& block : blocks_of("enum")) {
    const EnumDescriptor* enumeration = schema().FindEnumTypeByName(block.name);
    ASSERT_NE(enumeration, nullptr) << block.name;
    EXPECT_EQ(rows_of(*enumeration), block.rows) << block.name;
  }
}

TEST(Schema, File_HasNothingElse) {
  EXPECT_EQ(schema().package(), "");
  EXPECT_EQ(schema().dependency_count(), 0);
  EXPECT_EQ(schema().service_count(), 0);
  EXPECT_EQ(schema().extension_count(), 0);
  EXPECT_EQ(schema().options().ByteSize(), 0);
}

TEST(Schema, NoMessage_HasNestedTypesExtensionsOneofsOrOptions) {
  for (int i = 0; i < schema().message_type_count(); ++i) {
    const Descriptor& message = *schema().message_type(i);
    SCOPED_TRACE(message.name());
    EXPECT_EQ(message.nested_type_count(), 0);
    EXPECT_EQ(message.enum_type_count(), 0);
    EXPECT_EQ(message.extension_count(), 0);
    EXPECT_EQ(message.extension_range_count(), 0);
    EXPECT_EQ(message.oneof_decl_count(), 0);
    EXPECT_EQ(message.options().ByteSize(), 0);
  }
}

TEST(Schema, NoField_HasADefaultOrOptions) {
  for (int i = 0; i < schema().message_type_count(); ++i) {
    const Descriptor& message = *schema().message_type(i);
    for (int j = 0; j < message.field_count(); ++j) {
      SCOPED_TRACE(message.field(j)->full_name());
      EXPECT_FALSE(message.field(j)->has_default_value());
      EXPECT_FALSE(message.field(j)->options().packed());
      EXPECT_EQ(message.field(j)->options().ByteSize(), 0);
    }
  }
}

// ---- The generated classes

std::vector<std::unique_ptr<Message>> every_message() {
  std::vector<std::unique_ptr<Message>> messages;
  for (int i = 0; i < schema().message_type_count(); ++i) {
    messages.emplace_back(
        MessageFactory::generated_factory()->GetPrototype(schema().message_type(i))->New());
  }
  return messages;
}

TEST(Schema, EveryMessage_ParsesFromNoBytesWithEveryFieldAbsent) {
  for (const auto& message : every_message()) {
    SCOPED_TRACE(message->GetTypeName());
    EXPECT_TRUE(message->ParseFromString(""));
    EXPECT_TRUE(message->IsInitialized());
    std::vector<const FieldDescriptor*> present;
    message->GetReflection()->ListFields(*message, &present);
    EXPECT_TRUE(present.empty());
    EXPECT_EQ(message->ByteSize(), 0);
  }
}

TEST(Schema, EveryMessage_KeepsAnUnknownFieldAndWritesItBack) {
  const std::string unknown = support::Wire().number(1000, -5).text(1001, "kept").bytes();
  for (const auto& message : every_message()) {
    SCOPED_TRACE(message->GetTypeName());
    ASSERT_TRUE(message->ParseFromString(unknown));
    EXPECT_EQ(message->GetReflection()->GetUnknownFields(*message).field_count(), 2);
    EXPECT_EQ(message->SerializeAsString(), unknown);
  }
}

TEST(Schema, RepeatedNumbers_AreEncodedOneTagAnElement) {
  WrongReceiverDetail detail;
  detail.add_invalidreceivers(1);
  detail.add_invalidreceivers(2);
  EXPECT_EQ(support::to_hex(detail.SerializeAsString()), "08 01 08 02");
}

TEST(Schema, RepeatedEnumerations_AreEncodedOneTagAnElement) {
  ChannelAuthRequest request;
  request.add_proxyoptions(GATEWAY_MODE);
  request.add_proxyoptions(GATEWAY_MODE);
  EXPECT_EQ(support::to_hex(request.SerializeAsString()), "58 00 58 00");
}

TEST(Schema, AnEnumerationsNumberFromTheWireThatIsNoMember_BecomesAnUnknownField) {
  ChatMessageParam param;
  ASSERT_TRUE(param.ParseFromString(support::hex("10 07")));
  EXPECT_FALSE(param.has_msgtype());
  EXPECT_EQ(support::to_hex(param.SerializeAsString()), "10 07");
}

// Which numbers of -300 to 300 a validity function accepts.
std::set<int> accepted(bool (*is_valid)(int)) {
  std::set<int> numbers;
  for (int number = -300; number <= 300; ++number) {
    if (is_valid(number)) {
      numbers.insert(number);
    }
  }
  return numbers;
}

TEST(IsValid, OfProxyOption_AcceptsItsMembersAlone) {
  EXPECT_EQ(accepted(&ProxyOption_IsValid), (std::set<int>{0}));
}

TEST(IsValid, OfChatType_AcceptsItsMembersAlone) {
  EXPECT_EQ(accepted(&ChatType_IsValid), (std::set<int>{0, 1, 2, 3, 4}));
}

TEST(IsValid, OfMsgType_AcceptsItsMembersAlone) {
  EXPECT_EQ(accepted(&MsgType_IsValid), (std::set<int>{0, 1, 2, 3, 4, 5, 6, 10, 30}));
}

TEST(IsValid, OfNotiType_AcceptsItsMembersAlone) {
  EXPECT_EQ(accepted(&NotiType_IsValid),
            (std::set<int>{0, 1, 2, 3, 4, 5, 6, 7, 20, 21, 22, 23, 24, 25, 30, 31, 32, 33}));
}

TEST(IsValid, OfIsTypingContentType_AcceptsItsMembersAlone) {
  EXPECT_EQ(accepted(&IsTypingContentType_IsValid), (std::set<int>{0, 1, 2, 3}));
}

TEST(IsValid, OfConnectionResetCause_AcceptsItsMembersAlone) {
  EXPECT_EQ(accepted(&ConnectionResetCause_IsValid), (std::set<int>{0, 1}));
}

// Setters as other modules call them. The C interface comes to all but one of these.

// A number that the compiler does not see: it would refuse one that is no member.
template <typename Enumeration>
Enumeration outside(volatile int number) {
  return static_cast<Enumeration>(number);
}

TEST(EnumerationSetters, OfCreateChatroomRequestChatType_AbortWithANumberThatIsNoMember) {
  EXPECT_EXIT(CreateChatroomRequest().set_chattype(outside<ChatType>(5)), support::aborts,
              support::refused_by_setter("CreateChatroomRequest", "chattype", "ChatType"));
}

TEST(EnumerationSetters, OfInboxEntryChatType_AbortWithANumberThatIsNoMember) {
  EXPECT_EXIT(InboxEntry().set_chattype(outside<ChatType>(5)), support::aborts,
              support::refused_by_setter("InboxEntry", "chattype", "ChatType"));
}

TEST(EnumerationSetters, OfChatMessageParamMsgType_AbortWithANumberThatIsNoMember) {
  EXPECT_EXIT(ChatMessageParam().set_msgtype(outside<MsgType>(7)), support::aborts,
              support::refused_by_setter("ChatMessageParam", "msgtype", "MsgType"));
}

TEST(EnumerationSetters, OfInboxEntryMsgType_AbortWithANumberThatIsNoMember) {
  EXPECT_EXIT(InboxEntry().set_msgtype(outside<MsgType>(7)), support::aborts,
              support::refused_by_setter("InboxEntry", "msgtype", "MsgType"));
}

TEST(EnumerationSetters, OfIsTypingContentType_AbortWithANumberThatIsNoMember) {
  EXPECT_EXIT(IsTyping().set_contenttype(outside<IsTypingContentType>(4)), support::aborts,
              support::refused_by_setter("IsTyping", "contenttype", "IsTypingContentType"));
}

TEST(Generated, FieldNumberConstants_AreTheNumbers) {
  EXPECT_EQ(+ChatRequest::kChatMessageParamsFieldNumber, 13);
  EXPECT_EQ(+ChannelAuthRequest::kProxyOptionsFieldNumber, 11);
  EXPECT_EQ(+InboxEntry::kSecureChatMsgFieldNumber, 20);
}

TEST(Generated, FileFunction_CanBeCalledByUsers) {
  protobuf_AddDesc_msgspec_5ffrontend_2eproto();  // a second time does no harm
  EXPECT_EQ(ChatRequest::descriptor(), schema().FindMessageTypeByName("ChatRequest"));
}

TEST(Generated, AMessageMadeByTheLibrary_IsOfItsClassInOtherModules) {
  const std::unique_ptr<const Message> made(
      MessageFactory::generated_factory()->GetPrototype(ChatRequest::descriptor())->New());
  const Message& message = *made;
  EXPECT_EQ(typeid(message), typeid(ChatRequest));
  EXPECT_EQ(dynamic_cast<const ChatRequest*>(&message), &message);
}

TEST(Descriptors, OfEnumerations_AreTheRegisteredOnes) {
  EXPECT_EQ(ProxyOption_descriptor(), schema().FindEnumTypeByName("ProxyOption"));
  EXPECT_EQ(ChatType_descriptor(), schema().FindEnumTypeByName("ChatType"));
  EXPECT_EQ(MsgType_descriptor(), schema().FindEnumTypeByName("MsgType"));
  EXPECT_EQ(NotiType_descriptor(), schema().FindEnumTypeByName("NotiType"));
  EXPECT_EQ(IsTypingContentType_descriptor(), schema().FindEnumTypeByName("IsTypingContentType"));
  EXPECT_EQ(ConnectionResetCause_descriptor(), schema().FindEnumTypeByName("ConnectionResetCause"));
}

}  // namespace
