// The record of a call.

#include <new>

#include "qel-message-serialize.h"
#include "support/exchange.h"
#include "support/heap.h"
#include "support/process_death.h"

namespace {

using support::Encoded;
using support::ExchangeTest;
using support::kLargest;
using support::kLargestInt;
using support::kSmallest;
using support::kSmallestInt;
using support::to_hex;
using support::Wire;

class SaveCallLogRequestSerialize : public ExchangeTest {
 protected:
  Encoded out_;

  void call(int64_t request, int64_t chatroom, const char* id, const char* type, int64_t sender,
            int64_t receiver, int seconds) {
    out_.status = save_call_log_request_serialize(request, chatroom, id, type, sender, receiver,
                                                  seconds, &out_.data.block, &out_.size);
  }
};

TEST_F(SaveCallLogRequestSerialize, WhenCalled_EncodesTheSevenArguments) {
  call(1, 2, "id", "voice", 3, 4, 300);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()),
            "58 01 60 02 a2 01 02 69 64 aa 01 05 76 6f 69 63 65 b0 01 03 b8 01 04 c8 01 ac 02");
}

TEST_F(SaveCallLogRequestSerialize, WhenValuesAreZeroAndEmpty_EncodesThemAsPresent) {
  call(0, 0, "", "", 0, 0, 0);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()), "58 00 60 00 a2 01 00 aa 01 00 b0 01 00 b8 01 00 c8 01 00");
}

TEST_F(SaveCallLogRequestSerialize, WhenValuesAreExtreme_EncodesThemWhole) {
  call(-1, kSmallest, "", "", kLargest, -2, kSmallestInt);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()),
            "58 ff ff ff ff ff ff ff ff ff 01 60 80 80 80 80 80 80 80 80 80 01 a2 01 00 aa 01 00 "
            "b0 01 ff ff ff ff ff ff ff ff 7f b8 01 fe ff ff ff ff ff ff ff ff 01 "
            "c8 01 80 80 80 80 f8 ff ff ff ff 01");
}

TEST_F(SaveCallLogRequestSerialize, WhenSecondsAreLargest_EncodesThemWhole) {
  call(1, 2, "", "", 3, 4, kLargestInt);
  ASSERT_EQ(out_.status, 0);
  EXPECT_EQ(to_hex(out_.bytes()),
            "58 01 60 02 a2 01 00 aa 01 00 b0 01 03 b8 01 04 c8 01 ff ff ff ff 07");
}

TEST_F(SaveCallLogRequestSerialize, WhenTextsAreLong_EncodesAllOfThem) {
  const std::string id(70000, 'x');
  const std::string type(50000, 'y');
  call(1, 2, id.c_str(), type.c_str(), 3, 4, 5);
  ASSERT_EQ(out_.status, 0);
  const Wire ids = Wire().number(11, 1).number(12, 2);
  EXPECT_EQ(
      out_.bytes(),
      Wire(ids).text(20, id).text(21, type).number(22, 3).number(23, 4).number(25, 5).bytes());
}

TEST_F(SaveCallLogRequestSerialize, WhenCallIdIsNull_Faults) {
  EXPECT_EXIT(call(1, 2, nullptr, "", 3, 4, 5), support::faults, "");
}

TEST_F(SaveCallLogRequestSerialize, WhenCallLogTypeIsNull_Faults) {
  EXPECT_EXIT(call(1, 2, "", nullptr, 3, 4, 5), support::faults, "");
}

TEST_F(SaveCallLogRequestSerialize, WhenTheSecondTextCannotBeCopied_ThrowsAndKeepsNothing) {
  support::HeapWatch watch;
  {
    const support::FailingNew fault(2);
    EXPECT_THROW(call(1, 2, "id", "voice", 3, 4, 5), std::bad_alloc);
  }
  watch.stop();
  EXPECT_EQ(watch.kept(), std::vector<size_t>{});
  EXPECT_TRUE(out_.untouched());
}

}  // namespace
