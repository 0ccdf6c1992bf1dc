// What the tests of every exchange start from: sentinels in the outputs, and calls whose outputs
// are gathered and released.
#ifndef TESTS_SUPPORT_EXCHANGE_H
#define TESTS_SUPPORT_EXCHANGE_H

#include <google/protobuf/io/coded_stream.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "support/log_capture.h"
#include "support/wire.h"

namespace support {

// Values that outputs hold before a call; whoever finds one after it knows that it was not written.
constexpr int kIntSentinel = -77707;
constexpr int64_t kLongSentinel = -7770777077707;
inline char text_sentinel[] = "sentinel";
inline unsigned char buffer_sentinel[] = "sentinel";
inline int64_t array_sentinel[] = {kLongSentinel};

// The outputs of one serializer call.
struct Encoded {
  int status = kIntSentinel;
  unsigned char* data = buffer_sentinel;
  int size = kIntSentinel;

  Encoded() = default;
  Encoded(const Encoded&) = delete;
  Encoded& operator=(const Encoded&) = delete;
  ~Encoded() {
    if (data != buffer_sentinel) {
      std::free(data);
    }
  }

  // Valid after a success only.
  std::string bytes() const {
    return {reinterpret_cast<const char*>(data), static_cast<size_t>(size)};
  }
  bool untouched() const { return data == buffer_sentinel && size == kIntSentinel; }
};

// A text output and a list output: what was written is released, what was not is the sentinel.
struct TextOutput {
  char* text = text_sentinel;

  TextOutput() = default;
  TextOutput(const TextOutput&) = delete;
  TextOutput& operator=(const TextOutput&) = delete;
  ~TextOutput() {
    if (!untouched()) {
      std::free(text);
    }
  }
  bool untouched() const { return text == text_sentinel; }
};

struct IdListOutput {
  int64_t* ids = array_sentinel;

  IdListOutput() = default;
  IdListOutput(const IdListOutput&) = delete;
  IdListOutput& operator=(const IdListOutput&) = delete;
  ~IdListOutput() {
    if (!untouched()) {
      std::free(ids);
    }
  }
  bool untouched() const { return ids == array_sentinel; }
};

// A copy of received bytes in a block of exactly their size, so that reading beyond it shows.
class Received {
 public:
  explicit Received(const std::string& bytes)
      : data_(new unsigned char[bytes.size()]), size_(static_cast<int>(bytes.size())) {
    std::copy(bytes.begin(), bytes.end(), data_);
  }
  ~Received() { delete[] data_; }
  Received(const Received&) = delete;
  Received& operator=(const Received&) = delete;
  const unsigned char* data() const { return data_; }
  int size() const { return size_; }

 private:
  unsigned char* data_;
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
