// What received bytes can cost, and what they cannot reach.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/descriptor.pb.h>
#include <malloc.h>

#include <ostream>

#include "msgspec_frontend.pb.h"
#include "support/exchange.h"
#include "support/outputs.h"
#include "support/wire.h"

namespace {

using support::hex;

// ---- Memory

size_t heap_in_use() {
  const auto heap = mallinfo2();
  return heap.uordblks + heap.hblkhd;
}

// Heap in use for each byte of the input when the function has read it and is about to return: the
// message and the outputs are both there then.
template <typename Outputs>
size_t cost_of(const std::string& input) {
  Outputs out;
  const size_t before = heap_in_use();
  size_t at_the_exit_line = 0;
  {
    const support::LogObserver observer([&](const auto&) { at_the_exit_line = heap_in_use(); });
    out.read(input);
  }
  support::clear_log();
  return (at_the_exit_line - before - input.size()) / input.size();
}

// One field over and over, in as few bytes as it takes.
struct CostlyInput {
  std::string name;
  std::string field;
  size_t (*cost)(const std::string& input);
};

const CostlyInput kCostlyInputs[] = {
    {"EntriesOfAPage", hex("62 00"), cost_of<support::ForwardUnreadMessageOutputs>},
    {"ProcessedMessages", hex("72 00"), cost_of<support::ChatReplyOutputs>},
    {"Members", hex("82 01 00"), cost_of<support::AllowChatReplyOutputs>},
    {"Marks", hex("8a 01 00"), cost_of<support::AllowChatReplyOutputs>},
    {"UnknownTexts", hex("12 00"), cost_of<support::ClientEchoOutputs>},
    {"UnknownGroups", hex("13 14"), cost_of<support::ClientEchoOutputs>},
};

void PrintTo(const CostlyInput& input, std::ostream* out) {
  *out << input.name;
}

class ReceivedInput : public support::ExchangeTest,
                      public ::testing::WithParamInterface<CostlyInput> {};

// The bounds of SECURITY.md.
constexpr size_t kMostMemoryPerByte = sizeof(void*) == 4 ? 100 : 130;

TEST_P(ReceivedInput, WhenOfEmptyElements_TakesLessMemoryPerByteThanCallersCountOn) {
#ifdef __SANITIZE_ADDRESS__
  GTEST_SKIP() << "the sanitizer's heap is another";
#endif
  std::string input;
  for (int i = 0; i < 20000; ++i) {
    input += GetParam().field;
  }
  const size_t cost = GetParam().cost(input);
  EXPECT_GT(cost, 10u);  // or nothing was measured
  EXPECT_LE(cost, kMostMemoryPerByte);
}

INSTANTIATE_TEST_SUITE_P(Security, ReceivedInput, ::testing::ValuesIn(kCostlyInputs),
                         [](const auto& row) { return row.param.name; });

// ---- Log lines

// The shortest user there is: an id below 128 in a packed list.
TEST(LogLines, WhenUsersAreRefused_AreOneForEachByteOfThem) {
  const std::string users(1000, '\1');
  const support::Wire result =
      support::Wire().number(1, 1000).message(3, support::Wire().text(1, users));
  support::clear_log();
  support::InviteReplyOutputs out;
  out.read(support::Wire().message(13, result).bytes());
  EXPECT_EQ(support::logged_calls().size(), users.size() + 3);  // entry, exit and their number
}

// ---- Parts of the runtime

TEST(Schema, HasNoMessageSetAndNoExtensions) {
  const google::protobuf::FileDescriptor* file = InboxEntry::descriptor()->file();
  ASSERT_EQ(file->message_type_count(), 81);
  EXPECT_EQ(file->extension_count(), 0);
  for (int i = 0; i < file->message_type_count(); ++i) {
    const google::protobuf::Descriptor* message = file->message_type(i);
    EXPECT_EQ(message->extension_range_count(), 0) << message->full_name();
    EXPECT_FALSE(message->options().message_set_wire_format()) << message->full_name();
  }
}

}  // namespace
