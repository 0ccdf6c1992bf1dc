// What the tests of every exchange start from.
#ifndef TESTS_SUPPORT_EXCHANGE_H
#define TESTS_SUPPORT_EXCHANGE_H

#include <google/protobuf/io/coded_stream.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <string>

#include "support/log_capture.h"
#include "support/received.h"
#include "support/sentinels.h"
#include "support/wire.h"

namespace support {

// The ends of what ids, times, counts and codes can be.
constexpr int64_t kSmallest = std::numeric_limits<int64_t>::min();
constexpr int64_t kLargest = std::numeric_limits<int64_t>::max();
constexpr int kSmallestInt = std::numeric_limits<int>::min();
constexpr int kLargestInt = std::numeric_limits<int>::max();

// What a bool should not hold, and does where callers have left it unset.
constexpr unsigned char kBytesOfNoBool[] = {2, 0x80, 0xff};

// Starts every test with an empty log.
class ExchangeTest : public ::testing::Test {
 protected:
  void SetUp() override { clear_log(); }
};

// The block that a deserializer keeps.
constexpr size_t kStreamSize = sizeof(google::protobuf::io::CodedInputStream);

// The two error texts of a parse.
inline const char kMergeError[] = "merge error : Could not parse the received data!";
inline const char kStreamError[] = "ConsumedEntireMessage error :Could not parse the received data";

// The encoding as it is when a serializer logs its exit.
template <typename Call>
std::string encoding_at_exit(const Encoded& out, Call call) {
  std::string encoding;
  const LogObserver observer([&](const LogCall& line) {
    if (line.format.find("%s: exit") != std::string::npos) {
      encoding = out.bytes();
    }
  });
  call();
  return encoding;
}

}  // namespace support

#endif
