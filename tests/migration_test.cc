// What docs/migration.md shows: its right functions do what it says of them, its wrong ones fail as
// it says. Compiled from the page.

#include <cstdlib>
#include <vector>

#include "migration_examples.h"
#include "support/exchange.h"
#include "support/heap.h"
#include "support/process_death.h"

namespace {

using support::FailingCalloc;
using support::HeapWatch;
using support::Received;
using support::Wire;

using Migration = support::ExchangeTest;
using MigrationDeathTest = support::ExchangeTest;

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

// ---- 1. Telling failure from success

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

TEST_F(Migration, WhenAZeroIsTakenForSuccess_BrokenBytesAreAClock) {
  const Clock clock(clock_of_any_bytes, kBroken);
  EXPECT_TRUE(clock.is_there);
}

TEST_F(Migration, WhenTheRequestIdStartsAtASentinel_BrokenBytesAreNoClock) {
  const Clock clock(clock_of_a_reply, kBroken);
  EXPECT_FALSE(clock.is_there);
}

TEST_F(Migration, WhenTheClockStartsAtASentinel_AReplyWithoutIsNoClock) {
  const Clock clock(clock_of_a_reply, Wire().number(11, 7).bytes());
  EXPECT_FALSE(clock.is_there);
}

TEST_F(Migration, WhenTheReplyHasAClock_ItIsRead) {
  const Clock clock(clock_of_a_reply, clock_at(0));
  EXPECT_TRUE(clock.is_there);
  EXPECT_EQ(clock.now, 0);
}

TEST_F(Migration, WhenALengthIsTakenForSuccess_AFailedAllocationIsAMessage) {
  Message message;
  const FailingCalloc failure(1);
  EXPECT_TRUE(typing_by_its_length(2, &message.data, &message.size));
  EXPECT_EQ(message.data, nullptr);
}

TEST_F(Migration, WhenTheBufferOfTypingIsLookedAt_AFailedAllocationIsNoMessage) {
  Message message;
  const FailingCalloc failure(1);
  EXPECT_FALSE(typing_by_its_buffer(2, &message.data, &message.size));
}

TEST_F(Migration, WhenTheBufferOfTypingIsLookedAt_AnEncodingIsAMessage) {
  Message message;
  EXPECT_TRUE(typing_by_its_buffer(2, &message.data, &message.size));
  EXPECT_EQ(message.bytes(), Wire().number(11, 1).number(12, 2).text(13, "on").bytes());
}

std::string chat(const std::string& text) {
  const Wire param = Wire().number(1, 3).number(2, 0).text(3, text).number(4, 60);
  return Wire().number(11, 1).number(12, 2).message(13, param).bytes();
}

TEST_F(Migration, WhenTheBufferIsTakenForSuccess_ARefusedTextIsTheMessageBefore) {
  Message message;
  ASSERT_TRUE(chat_by_its_status("before", &message.data, &message.size));
  EXPECT_TRUE(chat_by_its_buffer(nullptr, &message.data, &message.size));
  EXPECT_EQ(message.bytes(), chat("before"));
}

TEST_F(Migration, WhenTheStatusIsLookedAt_ARefusedTextIsNoMessage) {
  unsigned char before = 0;
  unsigned char* data = &before;
  int size = 0;
  EXPECT_FALSE(chat_by_its_status(nullptr, &data, &size));
  EXPECT_EQ(data, nullptr);
}

TEST_F(Migration, WhenTheStatusIsLookedAt_AFailedAllocationIsNoMessage) {
  Message message;
  const FailingCalloc failure(1);
  EXPECT_FALSE(chat_by_its_status("hi", &message.data, &message.size));
}

TEST_F(Migration, WhenTheStatusIsLookedAt_AnEncodingIsAMessage) {
  Message message;
  EXPECT_TRUE(chat_by_its_status("hi", &message.data, &message.size));
  EXPECT_EQ(message.bytes(), chat("hi"));
}

// ---- 2. Counts and arrays

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

TEST_F(MigrationDeathTest, WhenACountIsTakenForAnArray_ReadsThroughNull) {
  const Received received(refused_under(1000));
  EXPECT_EXIT(sum_of_counted_receivers(received.data(), received.size()), support::faults, "");
}

TEST_F(Migration, WhenTheArrayIsLookedFor_ACountAloneHasNoIds) {
  const Refused refused(1000);
  EXPECT_EQ(refused.count, 2);
  EXPECT_EQ(refused.sum, 0);
}

TEST_F(Migration, WhenTheArrayIsThere_ItsIdsAreRead) {
  const Refused refused(1001);
  EXPECT_EQ(refused.count, 2);
  EXPECT_EQ(refused.sum, 42);
}

TEST_F(Migration, WhenTheCodeHandsOutNoDetails_TheCountIsTheZeroBeforeTheCall) {
  const Refused refused(2000);
  EXPECT_EQ(refused.count, 0);
  EXPECT_EQ(refused.sum, 0);
}

TEST_F(Migration, WhenAllListsAreThere_NoneIsLeft) {
  EXPECT_EQ(Refused(1001).blocks_left, 0);
}

// ---- 3. Outputs that are not written

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

TEST_F(Migration, WhenTheKeyIsNotSetAnew_TheLastPageAsksForAnother) {
  EXPECT_TRUE(last_page_asks_for_another(asks_for_a_page_by_an_old_key));
}

TEST_F(Migration, WhenTheKeyIsSetAnew_TheLastPageIsTheLast) {
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

TEST_F(MigrationDeathTest, WhenTheKeyIsNotSetAnew_TheOldOneIsLost) {
  expect_blocks_lost(1, [] { read_two_pages_with_keys(asks_for_a_page_by_an_old_key); });
}

TEST_F(Migration, WhenTheKeyIsSetAnew_NothingIsLeftOfThePages) {
  EXPECT_EQ(blocks_left([] { read_two_pages_with_keys(asks_for_a_page_by_its_key); }), 0);
}

TEST_F(Migration, WhenAPageHasNoMemoryForItsRecords_ItEndsThePages) {
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

TEST_F(Migration, WhenTheCodeIsNotSetAnew_AReplyWithoutAResultHasTheOneBefore) {
  EXPECT_EQ(code_after_seven(code_of_the_last_result), 7);
}

TEST_F(Migration, WhenTheCodeIsSetAnew_AReplyWithoutAResultHasNone) {
  EXPECT_EQ(code_after_seven(code_of_this_result), -1);
}

// ---- 4. Who frees what

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

TEST_F(MigrationDeathTest, WhenArraysAloneAreFreed_RecordsAndNamesAreLost) {
  const int marks = 2;
  const int members_and_their_names = 4;
  expect_blocks_lost(marks + members_and_their_names,
                     [] { count_members(members_of_a_leaking_reply); });
}

TEST_F(Migration, WhenNamesRecordsAndArraysAreFreed_NothingIsLeftOfTheReply) {
  EXPECT_EQ(blocks_left([] { count_members(members_of_a_reply); }), 0);
}

TEST_F(Migration, WhenAReplyIsFreed_ItsMembersHaveBeenCounted) {
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

TEST_F(MigrationDeathTest, WhenARecordIsFilledAgain_ItsTextIsLost) {
  expect_blocks_lost(1, [] {
    qel_message_inboxentry_t record = {};
    read_two_pushes(next_push_over_the_last, &record);
  });
}

TEST_F(Migration, WhenARecordsTextIsFreedBeforeTheNextPush_NothingIsLeft) {
  qel_message_inboxentry_t record = {};
  EXPECT_EQ(blocks_left([&] { read_two_pushes(next_push_instead_of_the_last, &record); }), 0);
}

TEST_F(Migration, WhenARecordIsClearedBeforeTheNextPush_NothingOfTheLastOneShows) {
  qel_message_inboxentry_t record = {};
  read_two_pushes(next_push_instead_of_the_last, &record);
  EXPECT_EQ(record.msgId, 2);
  EXPECT_EQ(record.sender, 0);
}

// Two of them. There is no memory for the second array if that is asked for.
int count_confirmations(ReadCode count, bool second_array_fails) {
  const Wire entry = Wire().number(1, 3).number(2, 4);
  const Received reply(Wire().message(14, entry).message(14, entry).bytes());
  const FailingCalloc failure(second_array_fails ? 2 : 0);
  return count(reply.data(), reply.size());
}

TEST_F(MigrationDeathTest, WhenArraysAreFreedByTheirCount_TheOneOfAFailureIsLost) {
  expect_blocks_lost(1, [] { count_confirmations(confirmations_by_their_count, true); });
}

TEST_F(Migration, WhenBothArraysAreFreed_TheOneOfAFailureIsNotLeft) {
  EXPECT_EQ(blocks_left([] { count_confirmations(confirmations_of_a_reply, true); }), 0);
}

TEST_F(Migration, WhenBothArraysAreFreed_NeitherIsLeft) {
  EXPECT_EQ(blocks_left([] { count_confirmations(confirmations_of_a_reply, false); }), 0);
}

TEST_F(Migration, WhenArraysAreFreed_ConfirmationsHaveBeenCounted) {
  EXPECT_EQ(count_confirmations(confirmations_of_a_reply, false), 2);
}

// ---- 5. Enumerations

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

TEST_F(MigrationDeathTest, WhenATypeOfMessageIsLeftToTheCall_AGapEndsTheProcess) {
  Message message;
  EXPECT_EXIT(chat_of_any_type(7, "hi", &message.data, &message.size), support::aborts,
              support::refused_by_setter("ChatMessageParam", "msgtype", "MsgType"));
}

TEST_F(Migration, WhenATypeOfMessageIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return chat_of_a_type(type, "hi", &message->data, &message->size) == 0;
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3, 4, 5, 6, 10, 30}));
}

TEST_F(Migration, WhenATypeOfChatIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return chatroom_of_a_type(type, 5, &message->data, &message->size) == 0;
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3, 4}));
}

TEST_F(Migration, WhenATypeOfContentIsLookedAtBefore_MembersAloneAreEncoded) {
  const auto taken = numbers_taken([](int type, Message* message) {
    return typing_of_a_type(type, &message->data, &message->size);
  });
  EXPECT_EQ(taken, (std::vector<int>{0, 1, 2, 3}));
}

}  // namespace
