// Read receipts, and the request to unseal a message.

#include <limits>
#include <new>

#include "qel-message-serialize.h"
#include "support/exchange.h"
#include "support/heap.h"
#include "support/process_death.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::expect_log;
using support::FailingNew;
using support::HeapWatch;
using support::kLargest;
using support::kSmallest;
using support::to_hex;
using support::Wire;

// ---- read_message_request_serialize

class ReadMessageRequestSerialize : public ExchangeTest {
 protected:
  const std::string name_ = "read_message_request_serialize";
  char text_[5] = "text";
  // Those of its fields that are not sent have values too.
  qel_message_inboxentry_t entry_ = {5, 1, 6, 7, 300, text_, 8, 2, 9};
  Encoded out_;

  void call(int64_t request, int64_t chatroom, const qel_message_inboxentry_t* entry) {
    out_.status =
        read_message_request_serialize(request, chatroom, entry, &out_.data.block, &out_.size);
  }
  void call_with_type(int type) {
    entry_.msgType = type;
    call(1, 2, &entry_);
  }

  void expect_refused() {
    EXPECT_EQ(out_.status, -1);
    EXPECT_TRUE(out_.untouched());
    expect_log(name_, {support::debug("%s start", {name_}),
                       support::error("msgType is out of range(0~6)")});
  }
};

TEST_F(ReadMessageRequestSerialize, WhenTheRecordIsFull_EncodesFourOfItsFields) {
  call(1, 2, &entry_);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 6a 09 08 05 10 01 18 06 28 ac 02");
}

TEST_F(ReadMessageRequestSerialize, WhenTheRecordsTextIsNull_EncodesTheSame) {
  entry_.chatMsg = nullptr;
  call(1, 2, &entry_);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 6a 09 08 05 10 01 18 06 28 ac 02");
}

TEST_F(ReadMessageRequestSerialize, WhenTheRecordIsNull_EncodesTheIdsAlone) {
  call(1, 2, nullptr);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02");
}

TEST_F(ReadMessageRequestSerialize, WhenTheRecordIsNull_LogsEntryAndExit) {
  call(1, 2, nullptr);
  expect_log(name_, {support::debug("%s start", {name_}), support::debug("%s: exit", {name_})});
}

TEST_F(ReadMessageRequestSerialize, WhenValuesAreZero_EncodesThemAsPresent) {
  entry_ = {};
  call(0, 0, &entry_);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 00 60 00 6a 08 08 00 10 00 18 00 28 00");
}

TEST_F(ReadMessageRequestSerialize, WhenValuesAreExtreme_EncodesThemWhole) {
  entry_.msgId = -2;
  entry_.msgType = 30;
  entry_.sender = kLargest;
  entry_.sentTime = kSmallest;
  call(-1, kSmallest, &entry_);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()),
            "58 ff ff ff ff ff ff ff ff ff 01 60 80 80 80 80 80 80 80 80 80 01 "
            "6a 22 08 fe ff ff ff ff ff ff ff ff 01 10 1e 18 ff ff ff ff ff ff ff ff 7f "
            "28 80 80 80 80 80 80 80 80 80 01");
}

TEST_F(ReadMessageRequestSerialize, WhenTypeIsAMember_EncodesIt) {
  for (const int type : {0, 1, 2, 3, 4, 5, 6, 10, 30}) {
    Encoded out;
    entry_.msgType = type;
    out.status = read_message_request_serialize(1, 2, &entry_, &out.data.block, &out.size);
    ASSERT_EQ(out.status, 0) << type;
    const Wire entry = Wire().number(1, 5).number(2, type).number(3, 6).number(5, 300);
    EXPECT_EQ(to_hex(out.bytes()),
              to_hex(Wire().number(11, 1).number(12, 2).message(13, entry).bytes()));
  }
}

TEST_F(ReadMessageRequestSerialize, WhenTypeIsAbove30_IsRefused) {
  call_with_type(31);
  expect_refused();
}

TEST_F(ReadMessageRequestSerialize, WhenTypeIsLargest_IsRefused) {
  call_with_type(std::numeric_limits<int>::max());
  expect_refused();
}

TEST_F(ReadMessageRequestSerialize, WhenTypeIsMinusOne_IsRefused) {
  call_with_type(-1);
  expect_refused();
}

TEST_F(ReadMessageRequestSerialize, WhenTypeIsSmallest_IsRefused) {
  call_with_type(std::numeric_limits<int>::min());
  expect_refused();
}

TEST_F(ReadMessageRequestSerialize, WhenRefused_AllocatesNoBufferAndKeepsNothing) {
  HeapWatch watch;
  call_with_type(31);
  watch.stop();
  EXPECT_TRUE(watch.callocs().empty());
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
}

TEST_F(ReadMessageRequestSerialize, WhenTypeIsInRangeButNoMember_Aborts) {
  for (int type = 7; type < 30; ++type) {
    if (type != 10) {
      SCOPED_TRACE(type);
      EXPECT_EXIT(call_with_type(type), support::aborts,
                  support::refused_by_setter("InboxEntry", "msgtype", "MsgType"));
    }
  }
}

TEST_F(ReadMessageRequestSerialize, WhenTheEntryCannotBeAllocated_ThrowsAndKeepsNothing) {
  HeapWatch watch;
  {
    const FailingNew fault(1);
    EXPECT_THROW(call(1, 2, &entry_), std::bad_alloc);
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_TRUE(out_.untouched());
}

// ---- unseal_message_request_serialize

class UnsealMessageRequestSerialize : public ExchangeTest {
 protected:
  Encoded out_;

  void call(int64_t request, int64_t chatroom, int64_t sender, int64_t id, const char* detail) {
    out_.status = unseal_message_request_serialize(request, chatroom, sender, id, detail,
                                                   &out_.data.block, &out_.size);
  }
};

TEST_F(UnsealMessageRequestSerialize, WhenCalled_EncodesTheFiveArguments) {
  call(1, 2, 3, 300, "why");
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 68 03 70 ac 02 7a 03 77 68 79");
}

TEST_F(UnsealMessageRequestSerialize, WhenDetailIsNull_EncodesTheOthersAlone) {
  call(1, 2, 3, 4, nullptr);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 01 60 02 68 03 70 04");
}

TEST_F(UnsealMessageRequestSerialize, WhenValuesAreZeroAndEmpty_EncodesThemAsPresent) {
  call(0, 0, 0, 0, "");
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 00 60 00 68 00 70 00 7a 00");
}

TEST_F(UnsealMessageRequestSerialize, WhenIdsAreExtreme_EncodesThemWhole) {
  call(-1, kSmallest, kLargest, -2, nullptr);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()),
            "58 ff ff ff ff ff ff ff ff ff 01 60 80 80 80 80 80 80 80 80 80 01 "
            "68 ff ff ff ff ff ff ff ff 7f 70 fe ff ff ff ff ff ff ff ff 01");
}

TEST_F(UnsealMessageRequestSerialize, WhenDetailIsLong_EncodesAllOfIt) {
  const std::string detail(100000, 'x');
  call(1, 2, 3, 4, detail.c_str());
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(
      out_.bytes(),
      Wire().number(11, 1).number(12, 2).number(13, 3).number(14, 4).text(15, detail).bytes());
}

TEST_F(UnsealMessageRequestSerialize, WhenDetailCannotBeCopied_ThrowsAndKeepsNothing) {
  HeapWatch watch;
  {
    const FailingNew fault(1);
    EXPECT_THROW(call(1, 2, 3, 4, "why"), std::bad_alloc);
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_TRUE(out_.untouched());
}

}  // namespace
