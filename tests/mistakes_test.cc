// What docs/mistakes.md shows: its right functions do what it says of them, its wrong ones fail as
// it says. Compiled from the page, and declared in a header that is made of it too.

#include <gtest/gtest.h>

#include <cstdlib>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "doubles.h"
#include "mistakes_examples.h"
#include "support/fields.h"
#include "support/process_death.h"

namespace {

using contract::Allocator;
using support::Fields;
using support::read;

Fields broken() {
  return Fields(support::hex("58"));  // a field without its value
}

// Has no memory for arrays, records and messages.
class NoCalloc : public contract::Observer {
  bool on_request(Allocator allocator, size_t /*count*/, size_t /*size*/,
                  const char* /*text*/) override {
    return allocator != Allocator::kCalloc;
  }
};

// The blocks that were handed out and are still there.
class HandedOut : public contract::Observer {
 public:
  const std::set<void*>& blocks() const { return blocks_; }

 private:
  void on_block(Allocator allocator, void* block, size_t /*size*/) override {
    if (allocator != Allocator::kNew) {
      blocks_.insert(block);
    }
  }
  void on_release(Allocator /*allocator*/, void* block) override { blocks_.erase(block); }

  std::set<void*> blocks_;
};

// How many blocks the calls lose.
template <typename Calls>
size_t blocks_lost(Calls calls) {
  HandedOut seen;
  {
    const contract::Observation observation(&seen);
    calls();
  }
  for (void* block : seen.blocks()) {
    std::free(block);
  }
  return seen.blocks().size();
}

// A message, released in the end.
struct Message {
  unsigned char* data = nullptr;
  int size = 0;

  Message() = default;
  Message(const Message&) = delete;
  Message& operator=(const Message&) = delete;
  ~Message() { std::free(data); }

  std::string bytes() const {
    return {reinterpret_cast<const char*>(data), static_cast<size_t>(size)};
  }
};

// ---- 1. The kind of a message

// requestId 7, chatroomId 42, result { code 0, msg "accepted" },
// processedMessageEntries { msgId 9, sentTime 1700000000000 }
Fields chat_reply() {
  return Fields(
      support::hex("58 07 60 2a 6a 0c 08 00 12 08 61 63 63 65 70 74 65 64 72 09 08 09 10 "
                   "80 d0 95 ff bc 31"));
}

TEST(Mistakes, WhenTheKindIsGuessed_AChatReplyOf29BytesIsTyping) {
  EXPECT_TRUE(read(typing_if_it_can_be_read, chat_reply()));
}

bool is_typing(const char* kind, const Fields& message) {
  return read([&](auto... given) { return typing_if_it_is_called_so(kind, given...); }, message);
}

TEST(Mistakes, WhenTheKindIsCarried_AChatReplyIsNoTyping) {
  EXPECT_FALSE(is_typing("ChatReply", chat_reply()));
}

TEST(Mistakes, WhenTheKindIsCarried_TypingIsTyping) {
  EXPECT_TRUE(is_typing("TypingUpdated", Fields().number(11, 7).text(14, "on")));
}

// ---- 2. Telling failure from success

TEST(Mistakes, WhenAZeroIsTakenForSuccess_BrokenBytesAreAClock) {
  int64_t now = 0;
  EXPECT_TRUE(read(clock_of_any_bytes, broken(), &now));
}

TEST(Mistakes, WhenTheOutputsStartAtSentinels_WhatHasNoClockIsNone) {
  int64_t now = 0;
  EXPECT_FALSE(read(clock_of_a_reply, broken(), &now));
  EXPECT_FALSE(read(clock_of_a_reply, Fields().number(11, 7), &now));
}

TEST(Mistakes, WhenTheReplyHasAClock_ItIsRead) {
  int64_t now = -5;
  EXPECT_TRUE(read(clock_of_a_reply, Fields().number(11, 7).number(13, 0), &now));
  EXPECT_EQ(now, 0);
}

TEST(Mistakes, WhenALengthIsTakenForSuccess_AFailedAllocationIsAMessage) {
  Message message;
  NoCalloc memory;
  const contract::Observation observation(&memory);
  EXPECT_TRUE(typing_by_its_length(2, &message.data, &message.size));
  EXPECT_EQ(message.data, nullptr);
}

TEST(Mistakes, WhenTheBufferOfTypingIsLookedAt_AFailedAllocationIsNoMessage) {
  Message message;
  NoCalloc memory;
  const contract::Observation observation(&memory);
  EXPECT_FALSE(typing_by_its_buffer(2, &message.data, &message.size));
}

TEST(Mistakes, WhenTheBufferOfTypingIsLookedAt_AnEncodingIsAMessage) {
  Message message;
  EXPECT_TRUE(typing_by_its_buffer(2, &message.data, &message.size));
  EXPECT_EQ(message.bytes(), Fields().number(11, 1).number(12, 2).text(13, "on").bytes());
}

std::string chat(const std::string& text) {
  const Fields param = Fields().number(1, 3).number(2, 0).text(3, text).number(4, 60);
  return Fields().number(11, 1).number(12, 2).message(13, param).bytes();
}

TEST(Mistakes, WhenTheBufferIsTakenForSuccess_ARefusedTextIsTheMessageBefore) {
  Message message;
  ASSERT_TRUE(chat_by_its_status("before", &message.data, &message.size));
  EXPECT_TRUE(chat_by_its_buffer(nullptr, &message.data, &message.size));
  EXPECT_EQ(message.bytes(), chat("before"));
}

TEST(Mistakes, WhenTheStatusIsLookedAt_ARefusedTextIsNoMessage) {
  unsigned char before = 0;
  unsigned char* data = &before;
  int size = 0;
  EXPECT_FALSE(chat_by_its_status(nullptr, &data, &size));
  EXPECT_EQ(data, nullptr);
}

TEST(Mistakes, WhenTheStatusIsLookedAt_AFailedAllocationIsNoMessage) {
  Message message;
  NoCalloc memory;
  const contract::Observation observation(&memory);
  EXPECT_FALSE(chat_by_its_status("hi", &message.data, &message.size));
}

TEST(Mistakes, WhenTheStatusIsLookedAt_AnEncodingIsAMessage) {
  Message message;
  EXPECT_TRUE(chat_by_its_status("hi", &message.data, &message.size));
  EXPECT_EQ(message.bytes(), chat("hi"));
}

// ---- 3. Logins

TEST(Mistakes, WhenTheCodeIsTakenForALogin_EmptyBytesAndAChatReplyAre) {
  EXPECT_TRUE(read(logged_in_by_the_code, Fields()));
  EXPECT_TRUE(read(logged_in_by_the_code, chat_reply()));
}

// Whether it answers the request 7.
bool is_login(const char* kind, const Fields& message) {
  return read([&](auto... given) { return logged_in_by_the_reply(kind, given..., 7); }, message);
}

TEST(Mistakes, WhenKindAndRequestAreCompared_OnlyTheReplyThatSaysSoIsALogin) {
  const Fields reply = Fields().number(1, 7).message(2, Fields().number(1, 0));
  EXPECT_TRUE(is_login("ChannelAuthReply", reply));
  EXPECT_FALSE(
      is_login("ChannelAuthReply", Fields().number(1, 7).message(2, Fields().number(1, 1))));
  EXPECT_FALSE(is_login("ChannelAuthReply", Fields()));
  EXPECT_FALSE(is_login("ClientEcho", Fields().number(1, 7)));
}

// ---- 4. Counts and arrays

Fields refused_under(int code) {
  const Fields detail = Fields().number(1, 40).number(1, 2).number(3, 5).number(6, 6).message(
      20, Fields().number(1, 7).number(2, 8));
  return Fields().message(13, Fields().number(1, code).message(3, detail));
}

// The sum of the receivers' ids, and how many there are.
std::pair<int64_t, int> listed_receivers(int code) {
  int count = -1;
  const int64_t sum = read(sum_of_listed_receivers, refused_under(code), &count);
  return {sum, count};
}

TEST(MistakesDeathTest, WhenACountIsTakenForAnArray_ReadsThroughNull) {
  EXPECT_EXIT(read(sum_of_counted_receivers, refused_under(1000)), support::faults, "");
}

TEST(Mistakes, WhenTheArrayIsLookedFor_ACountAloneHasNoIds) {
  EXPECT_EQ(listed_receivers(1000), std::pair(int64_t{0}, 2));
}

TEST(Mistakes, WhenTheArrayIsThere_ItsIdsAreRead) {
  EXPECT_EQ(listed_receivers(1001), std::pair(int64_t{42}, 2));
}

TEST(Mistakes, WhenTheCodeHandsOutNoDetails_TheCountIsTheZeroBeforeTheCall) {
  EXPECT_EQ(listed_receivers(2000), std::pair(int64_t{0}, 0));
}

TEST(Mistakes, WhenAllListsAreThere_NoneIsLost) {
  EXPECT_EQ(blocks_lost([] { listed_receivers(1001); }), 0u);
}

// ---- 5. Outputs that are not written

using ReadPage = bool (*)(const unsigned char*, int, char**);

Fields page() {
  return Fields().number(11, 1).message(12, Fields().number(1, 9).text(6, "hi"));
}

// Whether the last page, after one with a key, asks for a further one.
bool last_page_asks_for_another(ReadPage read_page) {
  char* key = nullptr;
  EXPECT_TRUE(read(read_page, page().text(13, "key"), &key));
  const bool another = read(read_page, page(), &key);
  std::free(key);
  return another;
}

TEST(Mistakes, WhenTheKeyIsNotSetAnew_TheLastPageAsksForAnother) {
  EXPECT_TRUE(last_page_asks_for_another(asks_for_a_page_by_an_old_key));
}

TEST(Mistakes, WhenTheKeyIsSetAnew_TheLastPageIsTheLast) {
  EXPECT_FALSE(last_page_asks_for_another(asks_for_a_page_by_its_key));
}

void read_two_pages_with_keys(ReadPage read_page) {
  char* key = nullptr;
  read(read_page, page().text(13, "key"), &key);
  read(read_page, page().text(13, "key"), &key);
  std::free(key);
}

TEST(Mistakes, WhenTheKeyIsNotSetAnew_TheOldOneIsLost) {
  EXPECT_EQ(blocks_lost([] { read_two_pages_with_keys(asks_for_a_page_by_an_old_key); }), 1u);
}

TEST(Mistakes, WhenTheKeyIsSetAnew_NothingOfThePagesIsLost) {
  EXPECT_EQ(blocks_lost([] { read_two_pages_with_keys(asks_for_a_page_by_its_key); }), 0u);
}

TEST(Mistakes, WhenAPageHasNoMemoryForItsRecords_ItEndsThePages) {
  char* key = nullptr;
  NoCalloc memory;
  const contract::Observation observation(&memory);
  EXPECT_FALSE(read(asks_for_a_page_by_its_key, page().text(13, "key"), &key));
}

using ReadCode = int (*)(const unsigned char*, int);

// Of a reply without a result, after one with the code 7.
int code_after_seven(ReadCode read_code) {
  EXPECT_EQ(read(read_code, Fields().message(12, Fields().number(1, 7))), 7);
  return read(read_code, Fields().number(11, 1));
}

TEST(Mistakes, WhenTheCodeIsNotSetAnew_AReplyWithoutAResultHasTheOneBefore) {
  EXPECT_EQ(code_after_seven(code_of_the_last_result), 7);
}

TEST(Mistakes, WhenTheCodeIsSetAnew_AReplyWithoutAResultHasNone) {
  EXPECT_EQ(code_after_seven(code_of_this_result), -1);
}

// ---- 6. Who frees what

// With two members, a mark of either kind, a title and a result's text.
Fields room() {
  const Fields mark = Fields().number(1, 5).number(2, 6).number(3, 7);
  return Fields()
      .message(13, Fields().number(1, 0).text(2, "ok"))
      .message(16, Fields().number(1, 5).text(3, "a"))
      .message(16, Fields().number(1, 6).text(3, "b"))
      .message(17, mark)
      .text(18, "room")
      .message(20, mark);
}

TEST(Mistakes, WhenArraysAloneAreFreed_MarksMembersAndTheirNamesAreLost) {
  EXPECT_EQ(blocks_lost([] { read(members_of_a_leaking_reply, room()); }), 6u);
}

TEST(Mistakes, WhenNamesRecordsAndArraysAreFreed_NothingIsLost) {
  EXPECT_EQ(blocks_lost([] { read(members_of_a_reply, room()); }), 0u);
}

TEST(Mistakes, WhenAReplyIsFreed_ItsMembersHaveBeenCounted) {
  EXPECT_EQ(read(members_of_a_reply, room()), 2);
}

using ReadPush = void (*)(const unsigned char*, int, qel_message_inboxentry_t*);

// Two pushes into one record, of which the first has a sender. The last one's text is freed.
qel_message_inboxentry_t record_of_two_pushes(ReadPush read_push) {
  qel_message_inboxentry_t record = {};
  read(read_push, Fields().message(14, Fields().number(1, 1).number(3, 33).text(6, "a")), &record);
  read(read_push, Fields().message(14, Fields().number(1, 2).text(6, "b")), &record);
  std::free(record.chatMsg);
  return record;
}

TEST(Mistakes, WhenARecordIsFilledAgain_ItsTextIsLost) {
  EXPECT_EQ(blocks_lost([] { record_of_two_pushes(next_push_over_the_last); }), 1u);
}

TEST(Mistakes, WhenARecordsTextIsFreedBeforeTheNextPush_NothingIsLost) {
  EXPECT_EQ(blocks_lost([] { record_of_two_pushes(next_push_instead_of_the_last); }), 0u);
}

TEST(Mistakes, WhenARecordIsClearedBeforeTheNextPush_NothingOfTheLastOneShows) {
  const auto record = record_of_two_pushes(next_push_instead_of_the_last);
  EXPECT_EQ(record.msgId, 2);
  EXPECT_EQ(record.sender, 0);
}

// ---- 7. Enumerations

// The numbers around and in the enumeration that the function makes a message of.
template <typename Encode>
std::vector<int> numbers_taken(Encode encode) {
  std::vector<int> taken;
  for (int number = -1; number <= 31; ++number) {
    Message message;
    if (encode(number, &message)) {
      taken.push_back(number);
    }
  }
  return taken;
}

TEST(MistakesDeathTest, WhenATypeOfMessageIsLeftToTheCall_AGapEndsTheProcess) {
  Message message;
  EXPECT_EXIT(chat_of_any_type(7, "hi", &message.data, &message.size), support::aborts,
              support::refused_by_setter("ChatMessageParam", "msgtype", "MsgType"));
}

TEST(Mistakes, WhenATypeOfMessageIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return chat_of_a_type(type, "hi", &message->data, &message->size) == 0;
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3, 4, 5, 6, 10, 30}));
}

TEST(Mistakes, WhenATypeOfChatIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return chatroom_of_a_type(type, 5, &message->data, &message->size) == 0;
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3, 4}));
}

TEST(Mistakes, WhenATypeOfContentIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return typing_of_a_type(type, &message->data, &message->size);
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3}));
}

// ---- 8. Types that nobody knows

using Show = const char* (*)(const qel_message_inboxentry_t*);

// What is shown of a message that was pushed.
std::string shown(Show show, int type, const std::string& text) {
  qel_message_inboxentry_t record = {};
  read(next_push_instead_of_the_last, Fields().message(14, Fields().number(2, type).text(6, text)),
       &record);
  std::string what = show(&record);
  std::free(record.chatMsg);
  return what;
}

const int kNewType = 31;
const char kNoText[] = "\x0b\x02";
const char kNothing[] = "(cannot be shown)";

TEST(Mistakes, WhenTheTypeAloneIsLookedAt_AnUnknownOneIsShown) {
  EXPECT_EQ(shown(shown_by_its_type, kNewType, kNoText), kNoText);
}

TEST(Mistakes, WhenTheTextIsLookedAt_WhatIsNoneIsNotShown) {
  EXPECT_EQ(shown(shown_by_its_text, kNewType, kNoText), kNothing);
  EXPECT_EQ(shown(shown_by_its_text, kNewType, ""), kNothing);
}

TEST(Mistakes, WhenTheTextIsLookedAt_AKnownTypeThatIsNoTextIsNotShown) {
  EXPECT_EQ(shown(shown_by_its_text, 1, "picture"), kNothing);
}

TEST(Mistakes, WhenTheTextIsLookedAt_ATextIsShown) {
  const char text[] = "gr\xc3\xbc\xc3\x9f\n\tdich";
  EXPECT_EQ(shown(shown_by_its_text, 0, text), text);
}

}  // namespace
