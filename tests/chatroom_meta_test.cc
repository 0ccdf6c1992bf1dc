// Changing a chatroom's title or lifetime.

#include <new>
#include <optional>
#include <ostream>

#include "qel-message-serialize.h"
#include "support/exchange.h"
#include "support/heap.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::expect_log;
using support::kLargest;
using support::kLargestInt;
using support::kSmallest;
using support::kSmallestInt;
using support::Line;
using support::to_hex;
using support::Wire;

class ChangeChatroomMetaRequestSerialize : public ExchangeTest {
 protected:
  const std::string name_ = "change_chatroom_meta_request_serialize";
  Encoded out_;

  void call(int64_t request, int64_t chatroom, const char* title, const std::optional<int>& ttl) {
    out_.status = change_chatroom_meta_request_serialize(
        request, chatroom, title, ttl ? &*ttl : nullptr, &out_.data.block, &out_.size);
  }

  // The lines of a call, but for those that every call starts with.
  void expect_lines(int64_t request, const std::vector<Line>& rest) {
    std::vector<Line> lines = {
        support::debug("%s start", {name_}),
        support::debug("requestId: %lld", {static_cast<long long>(request)})};
    lines.insert(lines.end(), rest.begin(), rest.end());
    expect_log(name_, lines);
  }
  Line exit() const { return support::debug("%s: exit", {name_}); }
};

TEST_F(ChangeChatroomMetaRequestSerialize, WhenIdsAreZero_EncodesThemAsPresent) {
  call(0, 0, "t", {});
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 00 60 00 6a 01 74");
}

TEST_F(ChangeChatroomMetaRequestSerialize, WhenIdsAreExtreme_EncodesThemWhole) {
  call(kSmallest, kLargest, "t", {});
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()),
            "58 80 80 80 80 80 80 80 80 80 01 60 ff ff ff ff ff ff ff ff 7f 6a 01 74");
}

TEST_F(ChangeChatroomMetaRequestSerialize, WhenRequestIdIsSmallest_LogsItWhole) {
  call(kSmallest, 2, "t", {});
  expect_lines(kSmallest, {exit()});
}

TEST_F(ChangeChatroomMetaRequestSerialize, WhenRequestIdIsLargest_LogsItWhole) {
  call(kLargest, 2, "t", {});
  expect_lines(kLargest, {exit()});
}

TEST_F(ChangeChatroomMetaRequestSerialize, WhenTitleIsLong_EncodesAllOfIt) {
  const std::string title(100000, 'x');
  call(1, 2, title.c_str(), {});
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(out_.bytes(), Wire().number(11, 1).number(12, 2).text(13, title).bytes());
}

TEST_F(ChangeChatroomMetaRequestSerialize, WhenRefused_AllocatesNoBufferAndKeepsNothing) {
  support::HeapWatch watch;
  call(1, 2, "", -1);
  watch.stop();
  EXPECT_TRUE(watch.callocs().empty());
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
}

TEST_F(ChangeChatroomMetaRequestSerialize, WhenTitleCannotBeCopied_ThrowsAndKeepsNothing) {
  support::HeapWatch watch;
  {
    const support::FailingNew fault(1);
    EXPECT_THROW(call(1, 2, "t", {}), std::bad_alloc);
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_TRUE(out_.untouched());
}

// ---- Which of the two is sent

struct Properties {
  std::string name;
  const char* title;
  std::optional<int> ttl;
  std::string sent;  // after the ids
};

void PrintTo(const Properties& properties, std::ostream* out) {
  *out << properties.name;
}

class ChangeOf : public ChangeChatroomMetaRequestSerialize,
                 public ::testing::WithParamInterface<Properties> {
 protected:
  void call_with_properties() { call(1, 2, GetParam().title, GetParam().ttl); }
  void expect_sent() {
    ASSERT_EQ(out_.status, 0);
    EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 " + GetParam().sent);
  }
};

const auto kName = [](const auto& row) { return row.param.name; };

class ChangeOfBoth : public ChangeOf {};

TEST_P(ChangeOfBoth, WhenCalled_EncodesTheTitleAlone) {
  call_with_properties();
  expect_sent();
}

TEST_P(ChangeOfBoth, WhenCalled_WarnsThatTheLifetimeIsSkipped) {
  call_with_properties();
  expect_lines(
      1, {support::warn("both title and msgTtl are set, title is used, msgTtl skipped"), exit()});
}

const Properties kBoth[] = {
    {"ttl_30", "new", 30, "6a 03 6e 65 77"},
    {"ttl_0", "new", 0, "6a 03 6e 65 77"},
    {"largest_ttl", "new", kLargestInt, "6a 03 6e 65 77"},
    {"blank_title", " ", 30, "6a 01 20"},
};
INSTANTIATE_TEST_SUITE_P(ChatroomMeta, ChangeOfBoth, ::testing::ValuesIn(kBoth), kName);

class ChangeOfOne : public ChangeOf {};

TEST_P(ChangeOfOne, WhenCalled_EncodesItAlone) {
  call_with_properties();
  expect_sent();
}

TEST_P(ChangeOfOne, WhenCalled_LogsNoWarning) {
  call_with_properties();
  expect_lines(1, {exit()});
}

const Properties kOne[] = {
    {"title_and_null_ttl", "new", {}, "6a 03 6e 65 77"},
    {"title_and_ttl_minus_1", "new", -1, "6a 03 6e 65 77"},
    {"title_and_smallest_ttl", "new", kSmallestInt, "6a 03 6e 65 77"},
    {"multi_byte_title", "\xc3\xbc", {}, "6a 02 c3 bc"},
    {"null_title_and_ttl_30", nullptr, 30, "80 01 1e"},
    {"null_title_and_ttl_0", nullptr, 0, "80 01 00"},
    {"null_title_and_largest_ttl", nullptr, kLargestInt, "80 01 ff ff ff ff 07"},
    {"empty_title_and_ttl_30", "", 30, "80 01 1e"},
    {"empty_title_and_ttl_0", "", 0, "80 01 00"},
};
INSTANTIATE_TEST_SUITE_P(ChatroomMeta, ChangeOfOne, ::testing::ValuesIn(kOne), kName);

class ChangeOfNeither : public ChangeOf {};

TEST_P(ChangeOfNeither, WhenCalled_IsRefused) {
  call_with_properties();
  EXPECT_EQ(out_.status, -1);
  EXPECT_TRUE(out_.untouched());
}

TEST_P(ChangeOfNeither, WhenCalled_LogsTheErrorAndNoExit) {
  call_with_properties();
  expect_lines(1, {support::error("both title and msgTtl are empty")});
}

const Properties kNeither[] = {
    {"null_title_and_null_ttl", nullptr, {}, ""},
    {"null_title_and_ttl_minus_1", nullptr, -1, ""},
    {"null_title_and_smallest_ttl", nullptr, kSmallestInt, ""},
    {"empty_title_and_null_ttl", "", {}, ""},
    {"empty_title_and_ttl_minus_5", "", -5, ""},
};
INSTANTIATE_TEST_SUITE_P(ChatroomMeta, ChangeOfNeither, ::testing::ValuesIn(kNeither), kName);

}  // namespace
