// The heap under observation: allocations that fail on demand, and the blocks of operator new.
#ifndef TESTS_SUPPORT_HEAP_H
#define TESTS_SUPPORT_HEAP_H

#include <cstddef>
#include <vector>

namespace support {

enum class Allocator { kCalloc, kMalloc, kStrdup, kNew };

// While it lives, the n-th block that this thread asks of the allocator from its construction on is
// refused: NULL, or an exception of operator new. From 1; with 0 none is. An allocator counts what
// is asked of itself alone: malloc, for one, not what operator new or strdup takes.
class FailingAllocation {
 public:
  FailingAllocation(Allocator allocator, int n);
  ~FailingAllocation();
  FailingAllocation(const FailingAllocation&) = delete;
  FailingAllocation& operator=(const FailingAllocation&) = delete;

  // Whether it has come to the n-th.
  bool happened() const;

 private:
  Allocator allocator_;
  int n_;
};

template <Allocator allocator>
class Failing : public FailingAllocation {
 public:
  explicit Failing(int n) : FailingAllocation(allocator, n) {}
};
using FailingCalloc = Failing<Allocator::kCalloc>;
using FailingMalloc = Failing<Allocator::kMalloc>;
using FailingStrdup = Failing<Allocator::kStrdup>;
using FailingNew = Failing<Allocator::kNew>;

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
  // Sizes of every malloc, in order; strdup and operator new are none.
  const std::vector<size_t>& mallocs() const { return mallocs_; }
  // How many blocks operator new made.
  size_t news() const { return news_; }
  // Sizes of the blocks that operator new made and operator delete did not release, least first.
  const std::vector<size_t>& kept() const { return kept_; }
  // Sizes of the blocks of calloc, malloc and strdup that were not freed, least first.
  const std::vector<size_t>& not_freed() const { return not_freed_; }

 private:
  std::vector<Block> callocs_;
  std::vector<size_t> mallocs_;
  size_t news_ = 0;
  std::vector<size_t> kept_;
  std::vector<size_t> not_freed_;
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
