// The heap under observation: allocations that fail on demand, and the blocks of operator new.
#ifndef TESTS_SUPPORT_HEAP_H
#define TESTS_SUPPORT_HEAP_H

#include <cstddef>
#include <vector>

namespace support {

// While it lives, the n-th calloc of this thread from its construction on fails, n from 1.
class FailingCalloc {
 public:
  explicit FailingCalloc(int n);
  ~FailingCalloc();
  FailingCalloc(const FailingCalloc&) = delete;
  FailingCalloc& operator=(const FailingCalloc&) = delete;
};

// While it lives, the n-th malloc of this thread from its construction on fails, n from 1. Does not
// count what operator new allocates; whether it counts strdup is the C library's choice.
class FailingMalloc {
 public:
  explicit FailingMalloc(int n);
  ~FailingMalloc();
  FailingMalloc(const FailingMalloc&) = delete;
  FailingMalloc& operator=(const FailingMalloc&) = delete;
};

// While it lives, the n-th operator new of this thread from its construction on throws, n from 1.
class FailingNew {
 public:
  explicit FailingNew(int n);
  ~FailingNew();
  FailingNew(const FailingNew&) = delete;
  FailingNew& operator=(const FailingNew&) = delete;
};

// Watches the calling thread from its construction until stop(). Meanwhile malloc hands out blocks
// filled with kFreshByte, so that what is not written shows.
class HeapWatch {
 public:
  struct Block {
    size_t elements;
    size_t element_size;
  };

  static constexpr unsigned char kFreshByte = 0xc7;

  HeapWatch();
  ~HeapWatch() { stop(); }
  HeapWatch(const HeapWatch&) = delete;
  HeapWatch& operator=(const HeapWatch&) = delete;

  void stop();

  // Every calloc, in order.
  const std::vector<Block>& callocs() const { return callocs_; }
  // Sizes of every malloc, in order, counted as FailingMalloc does.
  const std::vector<size_t>& mallocs() const { return mallocs_; }
  // How many blocks operator new made.
  size_t news() const { return news_; }
  // Sizes of the blocks that operator new made and operator delete did not release.
  const std::vector<size_t>& kept() const { return kept_; }

 private:
  std::vector<Block> callocs_;
  std::vector<size_t> mallocs_;
  size_t news_ = 0;
  std::vector<size_t> kept_;
};

// While it lives, the calling thread's allocations neither fail nor show: for the tests' own.
class HeapPause {
 public:
  HeapPause();
  ~HeapPause();
  HeapPause(const HeapPause&) = delete;
  HeapPause& operator=(const HeapPause&) = delete;
};

}  // namespace support

#endif
