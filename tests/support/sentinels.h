// Outputs that hold sentinels before a call and release what the call wrote.
#ifndef TESTS_SUPPORT_SENTINELS_H
#define TESTS_SUPPORT_SENTINELS_H

#include <cstdint>
#include <cstdlib>
#include <string>
#include <type_traits>
#include <vector>

namespace support {

// Values that outputs hold before a call; whoever finds one after it knows that it was not written.
constexpr int kIntSentinel = -77707;
constexpr int64_t kLongSentinel = -7770777077707;

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

}  // namespace support

#endif
