// What docs/mistakes.md shows: its right functions do what it says of them, its wrong ones fail as
// it says. Compiled from the page.

#include <cstdlib>
#include <vector>

#include "mistakes_examples.h"
#include "support/exchange.h"
#include "support/heap.h"
#include "support/process_death.h"

namespace {

using support::FailingCalloc;
using support::HeapWatch;
using support::Received;
using support::Wire;

using Mistakes = support::ExchangeTest;
using MistakesDeathTest = support::ExchangeTest;

const char kBroken[] = "\x58";  // a field without its value

// How many of the blocks that were handed out the calls leave.
template <typename Calls>
int blocks_left(Calls calls) {
  HeapWatch watch;
  calls();
  watch.stop();
  return static_cast<int>(watch.not_freed().size());
}

// In a process of its own, which ends with their number: nobody could free them later.
template <typename Calls>
void expect_blocks_lost(int number, Calls calls) {
  EXPECT_EXIT(std::_Exit(blocks_left(calls)), ::testing::ExitedWithCode(number), "");
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
const std::string kChatReply = support::hex(
    "58 07 60 2a 6a 0c 08 00 12 08 61 63 63 65 70 74 65 64 72 09 08 09 10 80 d0 95 ff bc 31");

TEST_F(Mistakes, WhenTheKindIsGuessed_AChatReplyOf29BytesIsTyping) {
  const Received reply(kChatReply);
  EXPECT_TRUE(typing_if_it_can_be_read(reply.data(), reply.size()));
}

TEST_F(Mistakes, WhenTheKindIsCarried_AChatReplyIsNoTyping) {
  const Received reply(kChatReply);
  EXPECT_FALSE(typing_if_it_is_called_so("ChatReply", reply.data(), reply.size()));
}

TEST_F(Mistakes, WhenTheKindIsCarried_TypingIsTyping) {
  const Received push(Wire().number(11, 7).text(14, "on").bytes());
  EXPECT_TRUE(typing_if_it_is_called_so("TypingUpdated", push.data(), push.size()));
}

// ---- 2. Telling failure from success

struct Clock {
  int64_t now = 0;
  bool is_there = false;

  template <typename Read>
  Clock(Read read, const std::string& bytes) {
    const Received received(bytes);
    is_there = read(received.data(), received.size(), &now);
  }
};

std::string clock_at(int64_t now) {
  return Wire().number(11, 7).number(13, now).bytes();
}

TEST_F(Mistakes, WhenAZeroIsTakenForSuccess_BrokenBytesAreAClock) {
  const Clock clock(clock_of_any_bytes, kBroken);
  EXPECT_TRUE(clock.is_there);
}

TEST_F(Mistakes, WhenTheRequestIdStartsAtASentinel_BrokenBytesAreNoClock) {
  const Clock clock(clock_of_a_reply, kBroken);
  EXPECT_FALSE(clock.is_there);
}

TEST_F(Mistakes, WhenTheClockStartsAtASentinel_AReplyWithoutIsNoClock) {
  const Clock clock(clock_of_a_reply, Wire().number(11, 7).bytes());
  EXPECT_FALSE(clock.is_there);
}

TEST_F(Mistakes, WhenTheReplyHasAClock_ItIsRead) {
  const Clock clock(clock_of_a_reply, clock_at(0));
  EXPECT_TRUE(clock.is_there);
  EXPECT_EQ(clock.now, 0);
}

TEST_F(Mistakes, WhenALengthIsTakenForSuccess_AFailedAllocationIsAMessage) {
  Message message;
  const FailingCalloc failure(1);
  EXPECT_TRUE(typing_by_its_length(2, &message.data, &message.size));
  EXPECT_EQ(message.data, nullptr);
}

TEST_F(Mistakes, WhenTheBufferOfTypingIsLookedAt_AFailedAllocationIsNoMessage) {
  Message message;
  const FailingCalloc failure(1);
  EXPECT_FALSE(typing_by_its_buffer(2, &message.data, &message.size));
}

TEST_F(Mistakes, WhenTheBufferOfTypingIsLookedAt_AnEncodingIsAMessage) {
  Message message;
  EXPECT_TRUE(typing_by_its_buffer(2, &message.data, &message.size));
  EXPECT_EQ(message.bytes(), Wire().number(11, 1).number(12, 2).text(13, "on").bytes());
}

std::string chat(const std::string& text) {
  const Wire param = Wire().number(1, 3).number(2, 0).text(3, text).number(4, 60);
  return Wire().number(11, 1).number(12, 2).message(13, param).bytes();
}

TEST_F(Mistakes, WhenTheBufferIsTakenForSuccess_ARefusedTextIsTheMessageBefore) {
  Message message;
  ASSERT_TRUE(chat_by_its_status("before", &message.data, &message.size));
  EXPECT_TRUE(chat_by_its_buffer(nullptr, &message.data, &message.size));
  EXPECT_EQ(message.bytes(), chat("before"));
}

TEST_F(Mistakes, WhenTheStatusIsLookedAt_ARefusedTextIsNoMessage) {
  unsigned char before = 0;
  unsigned char* data = &before;
  int size = 0;
  EXPECT_FALSE(chat_by_its_status(nullptr, &data, &size));
  EXPECT_EQ(data, nullptr);
}

TEST_F(Mistakes, WhenTheStatusIsLookedAt_AFailedAllocationIsNoMessage) {
  Message message;
  const FailingCalloc failure(1);
  EXPECT_FALSE(chat_by_its_status("hi", &message.data, &message.size));
}

TEST_F(Mistakes, WhenTheStatusIsLookedAt_AnEncodingIsAMessage) {
  Message message;
  EXPECT_TRUE(chat_by_its_status("hi", &message.data, &message.size));
  EXPECT_EQ(message.bytes(), chat("hi"));
}

// ---- 3. Logins

TEST_F(Mistakes, WhenTheCodeIsTakenForALogin_EmptyBytesAreOne) {
  EXPECT_TRUE(logged_in_by_the_code(nullptr, 0));
}

TEST_F(Mistakes, WhenTheCodeIsTakenForALogin_AChatReplyIsOne) {
  const Received reply(kChatReply);
  EXPECT_TRUE(logged_in_by_the_code(reply.data(), reply.size()));
}

TEST_F(Mistakes, WhenTheRequestIsCompared_EmptyBytesAreNoLogin) {
  EXPECT_FALSE(logged_in_by_the_reply("ChannelAuthReply", nullptr, 0, 7));
}

TEST_F(Mistakes, WhenTheKindIsCompared_AnEchoProbeWithTheSameIdIsNoLogin) {
  const Received probe(support::hex("08 07"));
  EXPECT_FALSE(logged_in_by_the_reply("ClientEcho", probe.data(), probe.size(), 7));
}

// Whether it answers the request 7.
bool is_login(int code) {
  const Received reply(Wire().number(1, 7).message(2, Wire().number(1, code)).bytes());
  return logged_in_by_the_reply("ChannelAuthReply", reply.data(), reply.size(), 7);
}

TEST_F(Mistakes, WhenTheRequestIsCompared_AReplyWithTheCodeZeroIsALogin) {
  EXPECT_TRUE(is_login(0));
}

TEST_F(Mistakes, WhenTheRequestIsCompared_ARefusalIsNoLogin) {
  EXPECT_FALSE(is_login(1));
}

// ---- 4. Counts and arrays

std::string refused_under(int code) {
  const Wire detail = Wire().number(1, 40).number(1, 2).number(3, 5).number(6, 6).message(
      20, Wire().number(1, 7).number(2, 8));
  return Wire().message(13, Wire().number(1, code).message(3, detail)).bytes();
}

struct Refused {
  int64_t sum = 0;
  int count = -1;
  int blocks_left = 0;

  explicit Refused(int code) {
    const Received received(refused_under(code));
    blocks_left = ::blocks_left(
        [&] { sum = sum_of_listed_receivers(received.data(), received.size(), &count); });
  }
};

TEST_F(MistakesDeathTest, WhenACountIsTakenForAnArray_ReadsThroughNull) {
  const Received received(refused_under(1000));
  EXPECT_EXIT(sum_of_counted_receivers(received.data(), received.size()), support::faults, "");
}

TEST_F(Mistakes, WhenTheArrayIsLookedFor_ACountAloneHasNoIds) {
  const Refused refused(1000);
  EXPECT_EQ(refused.count, 2);
  EXPECT_EQ(refused.sum, 0);
}

TEST_F(Mistakes, WhenTheArrayIsThere_ItsIdsAreRead) {
  const Refused refused(1001);
  EXPECT_EQ(refused.count, 2);
  EXPECT_EQ(refused.sum, 42);
}

TEST_F(Mistakes, WhenTheCodeHandsOutNoDetails_TheCountIsTheZeroBeforeTheCall) {
  const Refused refused(2000);
  EXPECT_EQ(refused.count, 0);
  EXPECT_EQ(refused.sum, 0);
}

TEST_F(Mistakes, WhenAllListsAreThere_NoneIsLeft) {
  EXPECT_EQ(Refused(1001).blocks_left, 0);
}

// ---- 5. Outputs that are not written

using ReadPage = bool (*)(const unsigned char*, int, char**);

// Two pages, of which the first alone has a key. Whether the second asks for a further one.
bool last_page_asks_for_another(ReadPage read) {
  const Wire entry = Wire().number(1, 9).text(6, "hi");
  const Received first(Wire().number(11, 1).message(12, entry).text(13, "key").bytes());
  const Received last(Wire().number(11, 2).message(12, entry).bytes());
  char* key = nullptr;
  EXPECT_TRUE(read(first.data(), first.size(), &key));
  const bool another = read(last.data(), last.size(), &key);
  std::free(key);
  return another;
}

TEST_F(Mistakes, WhenTheKeyIsNotSetAnew_TheLastPageAsksForAnother) {
  EXPECT_TRUE(last_page_asks_for_another(asks_for_a_page_by_an_old_key));
}

TEST_F(Mistakes, WhenTheKeyIsSetAnew_TheLastPageIsTheLast) {
  EXPECT_FALSE(last_page_asks_for_another(asks_for_a_page_by_its_key));
}

// Both have two records and a key.
void read_two_pages_with_keys(ReadPage read) {
  const Wire entry = Wire().number(1, 9).text(6, "hi");
  const Received page(Wire().message(12, entry).message(12, entry).text(13, "key").bytes());
  char* key = nullptr;
  read(page.data(), page.size(), &key);
  read(page.data(), page.size(), &key);
  std::free(key);
}

TEST_F(MistakesDeathTest, WhenTheKeyIsNotSetAnew_TheOldOneIsLost) {
  expect_blocks_lost(1, [] { read_two_pages_with_keys(asks_for_a_page_by_an_old_key); });
}

TEST_F(Mistakes, WhenTheKeyIsSetAnew_NothingIsLeftOfThePages) {
  EXPECT_EQ(blocks_left([] { read_two_pages_with_keys(asks_for_a_page_by_its_key); }), 0);
}

TEST_F(Mistakes, WhenAPageHasNoMemoryForItsRecords_ItEndsThePages) {
  const Received page(Wire().message(12, Wire().number(1, 9)).text(13, "key").bytes());
  char* key = nullptr;
  const FailingCalloc failure(1);
  EXPECT_FALSE(asks_for_a_page_by_its_key(page.data(), page.size(), &key));
}

using ReadCode = int (*)(const unsigned char*, int);

// Of a reply without a result, after one with the code 7.
int code_after_seven(ReadCode read) {
  const Received seven(Wire().message(12, Wire().number(1, 7)).bytes());
  const Received none(Wire().number(11, 1).bytes());
  EXPECT_EQ(read(seven.data(), seven.size()), 7);
  return read(none.data(), none.size());
}

TEST_F(Mistakes, WhenTheCodeIsNotSetAnew_AReplyWithoutAResultHasTheOneBefore) {
  EXPECT_EQ(code_after_seven(code_of_the_last_result), 7);
}

TEST_F(Mistakes, WhenTheCodeIsSetAnew_AReplyWithoutAResultHasNone) {
  EXPECT_EQ(code_after_seven(code_of_this_result), -1);
}

// ---- 6. Who frees what

using CountMembers = int (*)(const unsigned char*, int);

// With two members, a mark of either kind, a title and a result's text.
int count_members(CountMembers count) {
  const Wire mark = Wire().number(1, 5).number(2, 6).number(3, 7);
  const Received reply(Wire()
                           .message(13, Wire().number(1, 0).text(2, "ok"))
                           .message(16, Wire().number(1, 5).text(3, "a"))
                           .message(16, Wire().number(1, 6).text(3, "b"))
                           .message(17, mark)
                           .text(18, "room")
                           .message(20, mark)
                           .bytes());
  return count(reply.data(), reply.size());
}

TEST_F(MistakesDeathTest, WhenArraysAloneAreFreed_RecordsAndNamesAreLost) {
  const int marks = 2;
  const int members_and_their_names = 4;
  expect_blocks_lost(marks + members_and_their_names,
                     [] { count_members(members_of_a_leaking_reply); });
}

TEST_F(Mistakes, WhenNamesRecordsAndArraysAreFreed_NothingIsLeftOfTheReply) {
  EXPECT_EQ(blocks_left([] { count_members(members_of_a_reply); }), 0);
}

TEST_F(Mistakes, WhenAReplyIsFreed_ItsMembersHaveBeenCounted) {
  EXPECT_EQ(count_members(members_of_a_reply), 2);
}

using ReadPush = void (*)(const unsigned char*, int, qel_message_inboxentry_t*);

// Into one record, whose last text is freed.
void read_two_pushes(ReadPush read, qel_message_inboxentry_t* record) {
  const Received first(
      Wire().message(14, Wire().number(1, 1).number(3, 33).text(6, "first")).bytes());
  const Received second(Wire().message(14, Wire().number(1, 2).text(6, "second")).bytes());
  read(first.data(), first.size(), record);
  read(second.data(), second.size(), record);
  std::free(record->chatMsg);
  record->chatMsg = nullptr;
}

TEST_F(MistakesDeathTest, WhenARecordIsFilledAgain_ItsTextIsLost) {
  expect_blocks_lost(1, [] {
    qel_message_inboxentry_t record = {};
    read_two_pushes(next_push_over_the_last, &record);
  });
}

TEST_F(Mistakes, WhenARecordsTextIsFreedBeforeTheNextPush_NothingIsLeft) {
  qel_message_inboxentry_t record = {};
  EXPECT_EQ(blocks_left([&] { read_two_pushes(next_push_instead_of_the_last, &record); }), 0);
}

TEST_F(Mistakes, WhenARecordIsClearedBeforeTheNextPush_NothingOfTheLastOneShows) {
  qel_message_inboxentry_t record = {};
  read_two_pushes(next_push_instead_of_the_last, &record);
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

TEST_F(MistakesDeathTest, WhenATypeOfMessageIsLeftToTheCall_AGapEndsTheProcess) {
  Message message;
  EXPECT_EXIT(chat_of_any_type(7, "hi", &message.data, &message.size), support::aborts,
              support::refused_by_setter("ChatMessageParam", "msgtype", "MsgType"));
}

TEST_F(Mistakes, WhenATypeOfMessageIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return chat_of_a_type(type, "hi", &message->data, &message->size) == 0;
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3, 4, 5, 6, 10, 30}));
}

TEST_F(Mistakes, WhenATypeOfChatIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return chatroom_of_a_type(type, 5, &message->data, &message->size) == 0;
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3, 4}));
}

TEST_F(Mistakes, WhenATypeOfContentIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return typing_of_a_type(type, &message->data, &message->size);
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3}));
}

// ---- 8. Types that nobody knows

using Show = const char* (*)(const qel_message_inboxentry_t*);

// What is shown of a message that was pushed.
std::string shown(Show show, int type, const std::string& text) {
  const Received push(Wire().message(14, Wire().number(2, type).text(6, text)).bytes());
  qel_message_inboxentry_t record = {};
  next_push_instead_of_the_last(push.data(), push.size(), &record);
  std::string what = show(&record);
  std::free(record.chatMsg);
  return what;
}

const int kNewType = 31;
const char kNoText[] = "\x0b\x02";
const char kNothing[] = "(cannot be shown)";

TEST_F(Mistakes, WhenTheTypeAloneIsLookedAt_AnUnknownOneIsShown) {
  EXPECT_EQ(shown(shown_by_its_type, kNewType, kNoText), kNoText);
}

TEST_F(Mistakes, WhenTheTextIsLookedAt_WhatIsNoneIsNotShown) {
  EXPECT_EQ(shown(shown_by_its_text, kNewType, kNoText), kNothing);
}

TEST_F(Mistakes, WhenTheTextIsLookedAt_AnEmptyOneIsNotShown) {
  EXPECT_EQ(shown(shown_by_its_text, kNewType, ""), kNothing);
}

TEST_F(Mistakes, WhenTheTextIsLookedAt_AKnownTypeThatIsNoTextIsNotShown) {
  EXPECT_EQ(shown(shown_by_its_text, 1, "picture"), kNothing);
}

TEST_F(Mistakes, WhenTheTextIsLookedAt_ATextIsShown) {
  EXPECT_EQ(shown(shown_by_its_text, 0, "gr\xc3\xbc\xc3\x9f\n\tdich"),
            "gr\xc3\xbc\xc3\x9f\n\tdich");
}

}  // namespace
