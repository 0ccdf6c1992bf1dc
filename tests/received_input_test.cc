// What received bytes can cost.

#include <gtest/gtest.h>
#include <malloc.h>

#include <functional>
#include <ostream>
#include <string>
#include <utility>

#include "doubles.h"
#include "qel-message-serialize.h"
#include "support/address_sanitizer.h"
#include "support/fields.h"

namespace {

using support::Fields;
using support::hex;

// The outputs of the calls below. What is handed out is not freed: its size is what counts.
int64_t number = 0;
int64_t* numbers = nullptr;
int code = 0;
int count = 0;
char* text = nullptr;
qel_message_didviolationuser_t* pairs = nullptr;
qel_message_inboxentry_t** entries = nullptr;
qel_message_watermarkentry_t** marks = nullptr;
qel_message_chatroommember_t** members = nullptr;

using Read = void (*)(const unsigned char* data, int size);

void read_page(const unsigned char* data, int size) {
  forward_unread_message_deserialize(data, size, &number, &entries, &count, &text);
}
void read_chat_reply(const unsigned char* data, int size) {
  int64_t* times = nullptr;
  chat_reply_deserialize(data, size, &number, &number, &code, &text, &count, &numbers, &times);
}
void read_room(const unsigned char* data, int size) {
  allow_chat_reply_deserialize(data, size, &number, &number, &code, &text, &marks, &count, &number,
                               &marks, &count, &number, &members, &count, &text, &code);
}
void read_echo(const unsigned char* data, int size) {
  client_echo_deserialize(data, size, &number);
}
void read_invitation(const unsigned char* data, int size) {
  invite_reply_deserialize(data, size, &number, &number, &number, &code, &text, &numbers, &count,
                           &numbers, &count, &numbers, &count, &numbers, &count, &pairs, &count,
                           &numbers, &count);
}

// Reads the bytes, and looks at each line of the log.
class Reading : public contract::Observer {
 public:
  Reading(Read read, const std::string& bytes, std::function<void()> look)
      : look_(std::move(look)) {
    const contract::Observation observation(this);
    read(reinterpret_cast<const unsigned char*>(bytes.data()), static_cast<int>(bytes.size()));
  }

 private:
  void on_line(const contract::LogLine& /*line*/) override { look_(); }

  std::function<void()> look_;
};

// ---- Length

// Whether a message of that many bytes is read, a field that is unknown.
bool is_read(size_t size) {
  const size_t tag_and_length = 6;
  const Fields message = Fields().text(1000, std::string(size - tag_and_length, 'x'));
  EXPECT_EQ(message.bytes().size(), size);
  number = -1;
  support::read(client_echo_deserialize, message, &number);
  return number == 0;
}

TEST(ReceivedInput, MayHave64MiBAndNoByteMore) {
  EXPECT_TRUE(is_read(64 << 20));
  EXPECT_FALSE(is_read((64 << 20) + 1));
}

// ---- Memory

size_t heap_in_use() {
  const auto heap = mallinfo2();
  return heap.uordblks + heap.hblkhd;
}

// One field over and over, in as few bytes as it takes.
struct CostlyInput {
  const char* name;
  const char* field;
  Read read;
};

const CostlyInput kCostlyInputs[] = {
    {"EntriesOfAPage", "62 00", read_page}, {"ProcessedMessages", "72 00", read_chat_reply},
    {"Members", "82 01 00", read_room},     {"Marks", "8a 01 00", read_room},
    {"UnknownTexts", "12 00", read_echo},   {"UnknownGroups", "13 14", read_echo},
};

void PrintTo(const CostlyInput& input, std::ostream* out) {
  *out << input.name;
}

class ReceivedInput : public ::testing::TestWithParam<CostlyInput> {};

// The bounds of SECURITY.md.
constexpr size_t kMostMemoryPerByte = sizeof(void*) == 4 ? 100 : 130;

TEST_P(ReceivedInput, WhenOfEmptyElements_TakesLessMemoryPerByteThanCallersCountOn) {
  if (support::has_address_sanitizer()) {
    GTEST_SKIP() << "the sanitizer's heap is another";
  }
  std::string input;
  for (int i = 0; i < 20000; ++i) {
    input += hex(GetParam().field);
  }
  // At the last line the message and the outputs are both there.
  size_t at_the_last_line = 0;
  const size_t before = heap_in_use();
  const Reading reading(GetParam().read, input, [&] { at_the_last_line = heap_in_use(); });
  const size_t cost = (at_the_last_line - before) / input.size();
  EXPECT_GT(cost, 10u);  // or nothing was measured
  EXPECT_LE(cost, kMostMemoryPerByte);
}

INSTANTIATE_TEST_SUITE_P(Security, ReceivedInput, ::testing::ValuesIn(kCostlyInputs),
                         [](const auto& row) { return row.param.name; });

// ---- Log lines

// The shortest user there is: an id below 128 in a packed list.
TEST(LogLines, WhenUsersAreRefused_AreOneForEachByteOfThem) {
  const std::string users(1000, '\1');
  const Fields result = Fields().number(1, 1000).message(3, Fields().text(1, users));
  size_t lines = 0;
  const Reading reading(read_invitation, Fields().message(13, result).bytes(), [&] { ++lines; });
  EXPECT_EQ(lines, users.size() + 3);  // entry, exit and their number
}

}  // namespace
