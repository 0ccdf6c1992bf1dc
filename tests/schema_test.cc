// The schema that the library registers, against a table that is kept apart from the .proto.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/descriptor.pb.h>
#include <google/protobuf/message.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <memory>
#include <set>
#include <string>
#include <typeinfo>
#include <vector>

#include "msgspec_frontend.pb.h"
#include "support/process_death.h"

// ---- What the generated code asks the runtime when the library is loaded

namespace {

struct VersionCheck {
  int generated;
  int least_runtime;
  const char* file;
};
VersionCheck version_check;  // zero before any code runs

}  // namespace

// In the program itself, so that the library's initialiser comes here.
void google::protobuf::internal::VerifyVersion(int headerVersion, int minLibraryVersion,
                                               const char* filename) {
  if (std::string(filename).find("msgspec_frontend") != std::string::npos) {
    version_check = {headerVersion, minLibraryVersion, filename};
  }
}

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

std::vector<const Descriptor*> every_message() {
  std::vector<const Descriptor*> messages;
  for (int i = 0; i < schema().message_type_count(); ++i) {
    messages.push_back(schema().message_type(i));
  }
  return messages;
}

std::unique_ptr<Message> new_message(const Descriptor* type) {
  return std::unique_ptr<Message>(MessageFactory::generated_factory()->GetPrototype(type)->New());
}

// ---- The table

// A declaration of the table as one line.
std::vector<std::string> declarations_of_the_table() {
  std::vector<std::string> declarations;
  std::ifstream table(QEL_SCHEMA_TABLE);
  for (std::string line; std::getline(table, line);) {
    const size_t indent = line.find_first_not_of(' ');
    if (line.empty() || line[0] == '#') {
      continue;
    }
    if (indent == 0) {
      declarations.push_back(line);
    } else {
      declarations.back() += line.substr(indent - 1);
    }
  }
  return declarations;
}

std::string type_of(const FieldDescriptor& field) {
  return field.type() == FieldDescriptor::TYPE_MESSAGE ? field.message_type()->full_name()
         : field.type() == FieldDescriptor::TYPE_ENUM  ? field.enum_type()->full_name()
                                                       : field.type_name();
}

// As the table has it.
std::string declaration(const Descriptor& message) {
  std::string line = "message " + message.full_name() + ":";
  for (int i = 0; i < message.field_count(); ++i) {
    const FieldDescriptor& field = *message.field(i);
    line += (i > 0 ? ", " : " ") + std::to_string(field.number()) + " " + field.name() +
            (field.is_repeated()   ? " repeated "
             : field.is_required() ? " required "
                                   : " ") +
            type_of(field);
  }
  return line;
}
std::string declaration(const EnumDescriptor& enumeration) {
  std::string line = "enum " + enumeration.full_name() + ":";
  for (int i = 0; i < enumeration.value_count(); ++i) {
    line += (i > 0 ? ", " : " ") + std::to_string(enumeration.value(i)->number()) + " " +
            enumeration.value(i)->name();
  }
  return line;
}

TEST(Schema, Declarations_AreThoseOfTheTableInItsOrder) {
  std::vector<std::string> registered;
  for (const Descriptor* message : every_message()) {
    registered.push_back(declaration(*message));
  }
  for (int i = 0; i < schema().enum_type_count(); ++i) {
    registered.push_back(declaration(*schema().enum_type(i)));
  }
  const std::vector<std::string> table = declarations_of_the_table();
  for (size_t i = 0; i < std::min(registered.size(), table.size()); ++i) {
    EXPECT_EQ(registered[i], table[i]);
  }
  EXPECT_EQ(registered.size(), table.size());
}

TEST(Schema, File_HasNothingElse) {
  EXPECT_EQ(schema().package(), "");
  EXPECT_EQ(schema().dependency_count(), 0);
  EXPECT_EQ(schema().service_count(), 0);
  EXPECT_EQ(schema().extension_count(), 0);
  EXPECT_EQ(schema().options().ByteSize(), 0);
}

TEST(Schema, NoMessage_HasNestedTypesExtensionsOneofsOrOptions) {
  for (const Descriptor* message : every_message()) {
    SCOPED_TRACE(message->name());
    EXPECT_EQ(message->nested_type_count(), 0);
    EXPECT_EQ(message->enum_type_count(), 0);
    EXPECT_EQ(message->extension_count(), 0);
    EXPECT_EQ(message->extension_range_count(), 0);
    EXPECT_EQ(message->oneof_decl_count(), 0);
    EXPECT_EQ(message->options().ByteSize(), 0);
  }
}

TEST(Schema, NoField_HasADefaultOrOptions) {
  for (const Descriptor* message : every_message()) {
    for (int i = 0; i < message->field_count(); ++i) {
      SCOPED_TRACE(message->field(i)->full_name());
      EXPECT_FALSE(message->field(i)->has_default_value());
      EXPECT_EQ(message->field(i)->options().ByteSize(), 0);
    }
  }
}

// How many levels of embedded messages the type has, if fewer than the bound.
int levels(const Descriptor& type, int bound) {
  int deepest = 0;
  for (int i = 0; i < type.field_count() && bound > 0; ++i) {
    const Descriptor* embedded = type.field(i)->message_type();
    if (embedded != nullptr) {
      deepest = std::max(deepest, 1 + levels(*embedded, bound - 1));
    }
  }
  return deepest;
}

TEST(Schema, NoMessage_ContainsItself) {
  constexpr int kMoreThanThereAre = 10;
  for (const Descriptor* message : every_message()) {
    EXPECT_LT(levels(*message, kMoreThanThereAre), kMoreThanThereAre) << message->name();
  }
}

// ---- The generated classes

TEST(Schema, EveryMessage_ParsesFromNoBytesWithEveryFieldAbsent) {
  for (const Descriptor* type : every_message()) {
    SCOPED_TRACE(type->name());
    const std::unique_ptr<Message> message = new_message(type);
    EXPECT_TRUE(message->ParseFromString(""));
    std::vector<const FieldDescriptor*> present;
    message->GetReflection()->ListFields(*message, &present);
    EXPECT_TRUE(present.empty());
    EXPECT_EQ(message->ByteSize(), 0);
  }
}

struct Enumeration {
  const EnumDescriptor* descriptor;
  bool (*is_valid)(int number);
};

const Enumeration kEnumerations[] = {
    {ProxyOption_descriptor(), &ProxyOption_IsValid},
    {ChatType_descriptor(), &ChatType_IsValid},
    {MsgType_descriptor(), &MsgType_IsValid},
    {NotiType_descriptor(), &NotiType_IsValid},
    {IsTypingContentType_descriptor(), &IsTypingContentType_IsValid},
    {ConnectionResetCause_descriptor(), &ConnectionResetCause_IsValid},
};

TEST(Enumerations, OfTheGeneratedCode_AreTheRegisteredOnes) {
  ASSERT_EQ(std::size(kEnumerations), static_cast<size_t>(schema().enum_type_count()));
  for (int i = 0; i < schema().enum_type_count(); ++i) {
    EXPECT_EQ(kEnumerations[i].descriptor, schema().enum_type(i));
  }
}

TEST(Enumerations, WhenANumberIsChecked_AcceptTheirMembersAlone) {
  for (const Enumeration& enumeration : kEnumerations) {
    for (int number = -300; number <= 300; ++number) {
      EXPECT_EQ(enumeration.is_valid(number),
                enumeration.descriptor->FindValueByNumber(number) != nullptr)
          << enumeration.descriptor->name() << " " << number;
    }
  }
}

// A setter as other modules call it, which no function of the interface comes to.
TEST(EnumerationSettersDeathTest, WhenANumberIsNoMember_Abort) {
  const volatile int number = 5;  // the compiler would refuse one that it sees
  EXPECT_EXIT(InboxEntry().set_chattype(static_cast<ChatType>(number)), support::aborts,
              support::refused_by_setter("InboxEntry", "chattype", "ChatType"));
}

TEST(Generated, FieldNumberConstants_AreTheNumbers) {
  EXPECT_EQ(+ChatRequest::kChatMessageParamsFieldNumber, 13);
}

TEST(Generated, FileFunction_CanBeCalledByUsers) {
  protobuf_AddDesc_msgspec_5ffrontend_2eproto();  // a second time does no harm
  EXPECT_EQ(ChatRequest::descriptor(), schema().FindMessageTypeByName("ChatRequest"));
}

TEST(Generated, AMessageMadeByTheLibrary_IsOfItsClassInOtherModules) {
  const std::unique_ptr<Message> made = new_message(ChatRequest::descriptor());
  const Message& message = *made;
  EXPECT_EQ(typeid(message), typeid(ChatRequest));
  EXPECT_EQ(dynamic_cast<const ChatRequest*>(&message), &message);
}

}  // namespace
