// qel-message.h beyond a single call: the mistakes that the functions below it invite, and names.

#include <gtest/gtest.h>

#include <cstdlib>
#include <new>
#include <set>
#include <string>
#include <vector>

#include "doubles.h"
#include "msgspec_frontend.pb.h"
#include "qel-message.h"
#include "support/fields.h"

namespace {

using contract::Allocator;
using support::Fields;

// What is handed out and not released.
class Watch : public contract::Observer {
 public:
  size_t blocks() const { return blocks_.size(); }

 private:
  void on_block(Allocator allocator, void* block, size_t /*size*/) override {
    if (allocator != Allocator::kNew) {
      blocks_.insert(block);
    }
  }
  void on_release(Allocator /*allocator*/, void* block) override { blocks_.erase(block); }

  std::set<void*> blocks_;
};

// What the calls leave behind.
template <typename Calls>
Watch watched(Calls calls) {
  Watch watch;
  const contract::Observation observation(&watch);
  calls();
  return watch;
}

// Reads the message into the record.
template <typename Read, typename Record>
qel_status_t read(Read function, Record* record, const Fields& message) {
  return function(record, reinterpret_cast<const unsigned char*>(message.bytes().data()),
                  static_cast<int>(message.bytes().size()));
}

Fields unreadable() {
  return Fields(support::hex("58"));  // a field without its value
}

// ---- What cannot be told

TEST(Message, WhenTheKindIsGuessed_AChatReplyOf29BytesIsTyping) {
  qel_typing_updated_t typing = {};
  // requestId 7, chatroomId 42, result { code 0, msg "accepted" },
  // processedMessageEntries { msgId 9, sentTime 1700000000000 }
  EXPECT_EQ(
      read(qel_typing_updated_read, &typing,
           Fields(support::hex("58 07 60 2a 6a 0c 08 00 12 08 61 63 63 65 70 74 65 64 72 09 08 "
                               "09 10 80 d0 95 ff bc 31"))),
      QEL_OK);
  qel_typing_updated_release(&typing);
}

// ---- Telling failure from success

TEST(Message, WhenBytesAreUnreadable_TheStatusSaysSoAndNoNumberIsLeft) {
  qel_current_time_t now = {};
  ASSERT_EQ(read(qel_current_time_read, &now, Fields().number(11, 7).number(13, 9)), QEL_OK);
  EXPECT_EQ(read(qel_current_time_read, &now, unreadable()), QEL_UNREADABLE);
  EXPECT_EQ(now.currentTimeMillis, 0);
}

TEST(Message, WhenTheMessageIsEmpty_ItNeedsNoBytes) {
  qel_client_echo_t echo = {};
  EXPECT_EQ(qel_client_echo_read(&echo, nullptr, 0), QEL_OK);
  EXPECT_EQ(echo.requestId, 0);
}

TEST(Message, WhenALoginHasNoReply_EmptyBytesHaveNoCode) {
  qel_reply_t reply = {};
  ASSERT_EQ(read(qel_channel_auth_reply_read, &reply, Fields()), QEL_OK);
  EXPECT_EQ(reply.resultCode, QEL_ABSENT);
}

// ---- Counts and lists

TEST(Message, WhenACodeHasTheNumberOfReceiversAlone_TheirListIsEmpty) {
  QEL_SCOPED(create_chatroom_reply, created);
  const Fields detail = Fields().number(1, 40).number(1, 2);
  ASSERT_EQ(
      read(qel_create_chatroom_reply_read, &created,
           Fields().message(13, Fields().number(1, QEL_RESULT_REFUSED_1000).message(3, detail))),
      QEL_OK);
  EXPECT_EQ(created.invalidReceivers, nullptr);
  EXPECT_EQ(created.invalidReceiversCount, 0);
  EXPECT_EQ(created.unlistedInvalidReceivers, 2);
}

// ---- What was there before

TEST(Message, WhenAPageIsReadIntoTheRecordOfThePageBefore_ItHasNoKeyOfThat) {
  const Fields page = Fields().number(11, 1).message(12, Fields().number(1, 9).text(6, "hi"));
  const Watch watch = watched([&] {
    QEL_SCOPED(forward_unread_message, record);
    ASSERT_EQ(read(qel_forward_unread_message_read, &record, Fields(page).text(13, "key")), QEL_OK);
    ASSERT_STREQ(record.nextPaginationKey, "key");
    ASSERT_EQ(read(qel_forward_unread_message_read, &record, page), QEL_OK);
    EXPECT_EQ(record.nextPaginationKey, nullptr);
  });
  EXPECT_EQ(watch.blocks(), 0u);
}

TEST(Message, WhenAReplyWithoutAResultFollowsOneWithACode_ItHasNone) {
  QEL_SCOPED(reply, reply);
  ASSERT_EQ(read(qel_end_chat_reply_read, &reply, Fields().message(12, Fields().number(1, 7))),
            QEL_OK);
  ASSERT_EQ(reply.resultCode, 7);
  ASSERT_EQ(read(qel_end_chat_reply_read, &reply, Fields().number(11, 1)), QEL_OK);
  EXPECT_EQ(reply.resultCode, QEL_ABSENT);
}

TEST(Message, WhenARefusedTextFollowsAMessage_TheBufferHasNoMessage) {
  qel_buffer_t buffer = {};
  const Watch watch = watched([&] {
    ASSERT_EQ(qel_chat_request_write(&buffer, 1, 2, 3, QEL_MSG_TYPE_TEXT, "before", 60), QEL_OK);
    EXPECT_EQ(qel_chat_request_write(&buffer, 1, 2, 3, QEL_MSG_TYPE_TEXT, nullptr, 60),
              QEL_BAD_ARGUMENT);
  });
  EXPECT_EQ(buffer.data, nullptr);
  EXPECT_EQ(watch.blocks(), 0u);
}

// ---- Who frees what

TEST(Message, WhenAPushIsReadIntoTheRecordOfThePushBefore_NothingIsLostOrLeft) {
  const Watch watch = watched([] {
    QEL_SCOPED(forward_online_message_get, push);
    for (const Fields& entry :
         {Fields().number(1, 1).number(3, 33).text(6, "a"), Fields().number(1, 2).text(6, "b")}) {
      ASSERT_EQ(read(qel_forward_online_message_get_read, &push, Fields().message(14, entry)),
                QEL_OK);
    }
    EXPECT_STREQ(push.inboxEntry.chatMsg, "b");
    EXPECT_EQ(push.inboxEntry.sender, 0);
  });
  EXPECT_EQ(watch.blocks(), 0u);
}

TEST(Message, WhenARecordLeavesItsScope_MembersMarksAndTextsAreReleased) {
  const Fields mark = Fields().number(1, 5).number(2, 6).number(3, 7);
  const Fields room = Fields()
                          .message(13, Fields().number(1, 0).text(2, "ok"))
                          .message(16, Fields().number(1, 5).text(3, "a"))
                          .message(16, Fields().number(1, 6).text(3, "b"))
                          .message(17, mark)
                          .text(18, "room")
                          .message(20, mark);
  const Watch watch = watched([&] {
    QEL_SCOPED(allow_chat_reply, record);
    ASSERT_EQ(read(qel_allow_chat_reply_read, &record, room), QEL_OK);
    EXPECT_EQ(record.memberCount, 2);
  });
  EXPECT_EQ(watch.blocks(), 0u);
}

TEST(Message, WhenATextIsTakenFromItsRecord_ItStays) {
  char* state = nullptr;
  {
    QEL_SCOPED(typing_updated, typing);
    ASSERT_EQ(read(qel_typing_updated_read, &typing, Fields().text(14, "on")), QEL_OK);
    state = typing.state;
    typing.state = nullptr;
  }
  EXPECT_STREQ(state, "on");
  std::free(state);
}

TEST(Message, WhenAnEntryOrItsListIsTaken_ItStays) {
  QEL_SCOPED(forward_unread_message, page);
  const Fields entry = Fields().number(1, 9).text(6, "hi");
  ASSERT_EQ(
      read(qel_forward_unread_message_read, &page, Fields().message(12, entry).message(12, entry)),
      QEL_OK);
  qel_message_inboxentry_t* first = page.inboxEntries[0];
  page.inboxEntries[0] = nullptr;
  qel_forward_unread_message_t rest = page;
  page.inboxEntries = nullptr;
  qel_forward_unread_message_release(&page);
  EXPECT_STREQ(first->chatMsg, "hi");
  EXPECT_STREQ(rest.inboxEntries[1]->chatMsg, "hi");
  std::free(first->chatMsg);
  std::free(first);
  qel_forward_unread_message_release(&rest);
}

TEST(Message, WhenMembersAndMarksAreTaken_TheyStay) {
  QEL_SCOPED(allow_chat_reply, room);
  const Fields member = Fields().number(1, 5).text(3, "a");
  const Fields mark = Fields().number(1, 5);
  ASSERT_EQ(
      read(qel_allow_chat_reply_read, &room,
           Fields().message(16, member).message(16, member).message(17, mark).message(20, mark)),
      QEL_OK);
  qel_message_chatroommember_t* first = room.members[0];
  room.members[0] = nullptr;
  qel_allow_chat_reply_t rest = room;
  room.members = nullptr;
  room.deliveryAckEntries = nullptr;
  room.readAckEntries = nullptr;
  qel_allow_chat_reply_release(&room);
  EXPECT_STREQ(first->name, "a");
  EXPECT_STREQ(rest.members[1]->name, "a");
  EXPECT_EQ(rest.readAckEntries[0]->userId, 5);
  std::free(first->name);
  std::free(first);
  qel_allow_chat_reply_release(&rest);
}

// ---- Numbers outside their enumerations

template <typename Write>
std::vector<int> numbers_taken(Write write) {
  std::vector<int> taken;
  for (int number = -1; number <= 31; ++number) {
    QEL_SCOPED(buffer, buffer);
    const qel_status_t status = write(&buffer, number);
    EXPECT_TRUE(status == QEL_OK || status == QEL_BAD_ARGUMENT) << number;
    if (status == QEL_OK) {
      taken.push_back(number);
    }
  }
  return taken;
}

std::vector<int> numbers_of(const google::protobuf::EnumDescriptor* enumeration) {
  std::vector<int> numbers;
  for (int i = 0; i < enumeration->value_count(); ++i) {
    numbers.push_back(enumeration->value(i)->number());
  }
  return numbers;
}

TEST(Message, WhenATypeIsNoMember_NoChatMessageIsWritten) {
  EXPECT_EQ(numbers_taken([](qel_buffer_t* buffer, int type) {
              return qel_chat_request_write(buffer, 1, 2, 3, type, "hi", 60);
            }),
            numbers_of(MsgType_descriptor()));
}

TEST(Message, WhenATypeIsNoMember_NoReceiptIsWritten) {
  EXPECT_EQ(numbers_taken([](qel_buffer_t* buffer, int type) {
              qel_message_inboxentry_t entry = {};
              entry.msgType = type;
              return qel_read_message_request_write(buffer, 1, 2, &entry);
            }),
            numbers_of(MsgType_descriptor()));
}

TEST(Message, WhenATypeIsNoMember_NoChatroomIsWritten) {
  EXPECT_EQ(numbers_taken([](qel_buffer_t* buffer, int type) {
              const int64_t receiver = 5;
              return qel_create_chatroom_request_write(buffer, 1, type, &receiver, 1, nullptr);
            }),
            numbers_of(ChatType_descriptor()));
}

TEST(Message, WhenATypeIsNoMember_NoTypingIsWritten) {
  EXPECT_EQ(numbers_taken([](qel_buffer_t* buffer, int type) {
              return qel_is_typing_request_write(buffer, 1, 2, "on", &type, nullptr);
            }),
            numbers_of(IsTypingContentType_descriptor()));
}

// The numbers are in the order of the schema.
void expect_names(const google::protobuf::EnumDescriptor* enumeration,
                  const std::vector<int>& named) {
  EXPECT_EQ(numbers_of(enumeration), named) << enumeration->name();
}

TEST(Message, EnumerationsInC_AreThoseOfTheSchema) {
  expect_names(ChatType_descriptor(),
               {QEL_CHAT_TYPE_SINGLE, QEL_CHAT_TYPE_GROUP, QEL_CHAT_TYPE_BROADCAST,
                QEL_CHAT_TYPE_SECURE, QEL_CHAT_TYPE_MONOLOGUE});
  expect_names(MsgType_descriptor(),
               {QEL_MSG_TYPE_TEXT, QEL_MSG_TYPE_MEDIA, QEL_MSG_TYPE_CUSTOM, QEL_MSG_TYPE_RECALL,
                QEL_MSG_TYPE_NOTI, QEL_MSG_TYPE_READ_ACK, QEL_MSG_TYPE_DELIVERY_ACK,
                QEL_MSG_TYPE_UNSEAL, QEL_MSG_TYPE_VOIP_CALL_SETUP});
  expect_names(IsTypingContentType_descriptor(), {QEL_CONTENT_TYPE_TEXT, QEL_CONTENT_TYPE_IMAGE,
                                                  QEL_CONTENT_TYPE_VIDEO, QEL_CONTENT_TYPE_AUDIO});
}

TEST(Message, CodesOfRefusedUsers_AreThoseWithTheirLists) {
  for (const int code : {QEL_RESULT_REFUSED_1000, QEL_RESULT_REFUSED_1001, QEL_RESULT_REFUSED_3003,
                         QEL_RESULT_REFUSED_3009}) {
    QEL_SCOPED(invite_reply, invited);
    const Fields result = Fields().number(1, code).message(3, Fields().number(1, 40));
    ASSERT_EQ(read(qel_invite_reply_read, &invited, Fields().message(13, result)), QEL_OK);
    EXPECT_EQ(invited.invalidReceiversCount, 1) << code;
  }
}

TEST(Message, MinusOne_IsANumberLikeOthers) {
  QEL_SCOPED(reply, reply);
  const Fields result = Fields().number(1, -1);
  ASSERT_EQ(read(qel_end_chat_reply_read, &reply, Fields().number(11, -1).message(12, result)),
            QEL_OK);
  EXPECT_EQ(reply.requestId, -1);
  EXPECT_EQ(reply.resultCode, -1);
}

// ---- Exceptions

// Has no memory for what is copied behind the result's text.
class NoCopy : public contract::Observer {
  bool on_request(Allocator allocator, size_t /*count*/, size_t /*size*/,
                  const char* /*text*/) override {
    has_text_ = has_text_ || allocator == Allocator::kStrdup;
    return !has_text_ || allocator != Allocator::kNew;
  }
  void on_block(Allocator allocator, void* block, size_t /*size*/) override {
    text_ = allocator == Allocator::kStrdup ? block : text_;
  }
  void on_release(Allocator /*allocator*/, void* block) override {
    text_ = block == text_ ? nullptr : text_;
  }

  bool has_text_ = false;
  void* text_ = nullptr;

 public:
  bool has_lost_text() const { return text_ != nullptr; }
};

TEST(Message, WhenAnExceptionPassesThrough_TheRecordIsReleased) {
  const Fields detail = Fields().number(1, 40);
  const Fields reply = Fields().message(
      13, Fields().number(1, QEL_RESULT_REFUSED_1001).text(2, "no").message(3, detail));
  NoCopy memory;
  const contract::Observation observation(&memory);
  const auto read_reply = [&] {
    QEL_SCOPED(create_chatroom_reply, created);
    return read(qel_create_chatroom_reply_read, &created, reply);
  };
  EXPECT_THROW(read_reply(), std::bad_alloc);
  EXPECT_FALSE(memory.has_lost_text());
}

}  // namespace
