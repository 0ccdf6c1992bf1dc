// The heap under observation: callocs that fail on demand, and the blocks of operator new.
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

// Watches the calling thread from its construction until stop().
class HeapWatch {
 public:
  struct Block {
    size_t elements;
    size_t element_size;
  };

  HeapWatch();
  ~HeapWatch() { stop(); }
  HeapWatch(const HeapWatch&) = delete;
  HeapWatch& operator=(const HeapWatch&) = delete;

  void stop();

  // Every calloc, in order.
  const std::vector<Block>& callocs() const { return callocs_; }
  // Sizes of the blocks that operator new made and operator delete did not release.
  const std::vector<size_t>& kept() const { return kept_; }

 private:
  std::vector<Block> callocs_;
  std::vector<size_t> kept_;
};

// While it lives, the watch does not see what the calling thread does: for the tests' own blocks.
class HeapPause {
 public:
  HeapPause();
  ~HeapPause();
  HeapPause(const HeapPause&) = delete;
  HeapPause& operator=(const HeapPause&) = delete;

 private:
  bool was_on_;
};

}  // namespace support

#endif
