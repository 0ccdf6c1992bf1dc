// What the tests of every exchange start from: sentinels in the outputs, and outputs that release
// what was written.
#ifndef TESTS_SUPPORT_EXCHANGE_H
#define TESTS_SUPPORT_EXCHANGE_H

#include <google/protobuf/io/coded_stream.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdlib>
#include <limits>
#include <string>
#include <type_traits>
#include <vector>

#include "support/log_capture.h"
#include "support/wire.h"

namespace support {

// Values that outputs hold before a call; whoever finds one after it knows that it was not written.
constexpr int kIntSentinel = -77707;
constexpr int64_t kLongSentinel = -7770777077707;

// The ends of what ids, times, counts and codes can be.
constexpr int64_t kSmallest = std::numeric_limits<int64_t>::min();
constexpr int64_t kLargest = std::numeric_limits<int64_t>::max();
constexpr int kSmallestInt = std::numeric_limits<int>::min();
constexpr int kLargestInt = std::numeric_limits<int>::max();

// An output that receives a block: what was written is released in the end.
template <typename T>
struct BlockOutput {
  T* block = sentinel();

  BlockOutput() = default;
  BlockOutput(const BlockOutput&) = delete;
  BlockOutput& operator=(const BlockOutput&) = delete;
  ~BlockOutput() {
    if (!untouched()) {
      std::free(block);
    }
  }

  bool untouched() const { return block == sentinel(); }

 private:
  static T* sentinel() {
    if constexpr (std::is_same_v<T, char>) {
      static char text[] = "not written";  // so that it is no empty text
      return text;
    } else {
      static T unit{};
      return &unit;
    }
  }
};

using TextOutput = BlockOutput<char>;
using IdListOutput = BlockOutput<int64_t>;

// An array and its count.
template <typename T>
struct ListOutput {
  BlockOutput<T> array;
  int count = kIntSentinel;

  bool untouched() const { return array.untouched() && count == kIntSentinel; }
  // Those of the array, if one was written.
  std::vector<T> elements() const {
    return array.untouched() ? std::vector<T>{} : std::vector<T>(array.block, array.block + count);
  }
};

// A bool with a neighbour on either side.
class FlagOutput {
 public:
  bool* pointer() { return reinterpret_cast<bool*>(&bytes_[1]); }
  bool untouched() const { return bytes_[1] == kSentinel; }
  bool neighbours_untouched() const { return bytes_[0] == kSentinel && bytes_[2] == kSentinel; }
  int value() const { return bytes_[1]; }  // 1 or 0, once it is written

 private:
  static constexpr unsigned char kSentinel = 0xa5;
  unsigned char bytes_[3] = {kSentinel, kSentinel, kSentinel};
};

// The outputs of one serializer call.
struct Encoded {
  int status = kIntSentinel;
  BlockOutput<unsigned char> data;
  int size = kIntSentinel;

  // Valid after a success only.
  std::string bytes() const {
    return {reinterpret_cast<const char*>(data.block), static_cast<size_t>(size)};
  }
  bool untouched() const { return data.untouched() && size == kIntSentinel; }
};

// A copy of received bytes in a block of exactly their size, so that reading beyond it shows.
class Received {
 public:
  explicit Received(const std::string& bytes);
  ~Received();
  Received(const Received&) = delete;
  Received& operator=(const Received&) = delete;

  const unsigned char* data() const { return data_; }
  int size() const { return size_; }

 private:
  unsigned char* data_ = nullptr;
  int size_;
};

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

}  // namespace support

#endif
