#include "support/heap.h"

#include <dlfcn.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <new>

namespace {

using support::Allocator;

constexpr size_t kMost = 4096;

// Plain arrays: nothing here may allocate.

// Blocks that are in use, and their sizes.
struct Blocks {
  size_t count = 0;
  std::array<std::pair<void*, size_t>, kMost> all = {};

  void add(void* block, size_t size) {
    if (count < kMost) {
      all[count++] = {block, size};
    }
  }
  void remove(void* block) {
    for (size_t i = 0; i < count; ++i) {
      if (all[i].first == block) {
        all[i] = all[--count];
        return;
      }
    }
  }
  std::vector<size_t> sizes() const {
    std::vector<size_t> sizes;
    for (size_t i = 0; i < count; ++i) {
      sizes.push_back(all[i].second);
    }
    std::sort(sizes.begin(), sizes.end());
    return sizes;
  }
};

struct Record {
  bool on = false;
  size_t callocs = 0;
  std::array<support::HeapWatch::Block, kMost> calloc_blocks = {};
  size_t mallocs = 0;
  std::array<size_t, kMost> malloc_sizes = {};
  size_t news = 0;  // ever
  Blocks of_new;
  Blocks of_c;  // of calloc, malloc and strdup
};

thread_local Record record;
thread_local std::array<int, 4> blocks_until_failure = {};  // of each allocator
thread_local bool paused = false;

int& until_failure(Allocator allocator) {
  return blocks_until_failure[static_cast<size_t>(allocator)];
}

// Asked once for each block that is wanted.
bool fails(Allocator allocator) {
  return !paused && until_failure(allocator) > 0 && --until_failure(allocator) == 0;
}

bool watched() {
  return record.on && !paused;
}

using Calloc = void* (*)(size_t, size_t);
using Malloc = void* (*)(size_t);
using Free = void (*)(void*);

// Serves the dynamic loader's own wishes while it looks the real functions up.
alignas(16) char early_blocks[65536];
void* early_memory(size_t size) {
  static size_t used = 0;
  const size_t at = used;
  used += (size + 15) / 16 * 16;
  return used <= sizeof early_blocks ? early_blocks + at : nullptr;
}
bool is_early(const void* block) {
  const std::less<const void*> before;
  return !before(block, early_blocks) && before(block, early_blocks + sizeof early_blocks);
}

// The function that the program's own one stands before, or nullptr while it is looked up.
template <typename Function>
Function real(const char* name) {
  static Function found = nullptr;
  static bool searching = false;
  if (found == nullptr && !searching) {
    searching = true;
    void* symbol = dlsym(RTLD_NEXT, name);
    std::memcpy(&found, &symbol, sizeof found);
    searching = false;
  }
  return found;
}

}  // namespace

// AddressSanitizer asks here: a size that no allocator can serve is refused with NULL, as it is
// without the sanitizer.
extern "C" const char* __asan_default_options() {
  return "allocator_may_return_null=1";
}

// In the program itself, so that every library's calls come here.
extern "C" void* calloc(size_t elements, size_t element_size) noexcept {
  const auto real_calloc = real<Calloc>("calloc");
  if (real_calloc == nullptr) {
    return early_memory(elements * element_size);
  }
  if (fails(Allocator::kCalloc)) {
    return nullptr;
  }
  void* block = real_calloc(elements, element_size);
  if (watched() && record.callocs < kMost) {
    record.calloc_blocks[record.callocs++] = {elements, element_size};
  }
  if (watched() && block != nullptr) {
    record.of_c.add(block, elements * element_size);
  }
  return block;
}

extern "C" void* malloc(size_t size) noexcept {
  const auto real_malloc = real<Malloc>("malloc");
  if (real_malloc == nullptr) {
    return early_memory(size);
  }
  if (fails(Allocator::kMalloc)) {
    return nullptr;
  }
  void* block = real_malloc(size);
  if (watched() && record.mallocs < kMost) {
    record.malloc_sizes[record.mallocs++] = size;
  }
  if (watched() && block != nullptr) {
    record.of_c.add(block, size);
    std::memset(block, support::HeapWatch::kFreshByte, size);
  }
  return block;
}

// Does without malloc above, whatever the C library's own one does.
extern "C" char* strdup(const char* text) noexcept {
  if (fails(Allocator::kStrdup)) {
    return nullptr;
  }
  const size_t size = std::strlen(text) + 1;
  void* block = real<Malloc>("malloc")(size);
  if (block == nullptr) {
    return nullptr;
  }
  if (watched()) {
    record.of_c.add(block, size);
  }
  return static_cast<char*>(std::memcpy(block, text, size));
}

extern "C" void free(void* block) noexcept {
  const auto real_free = real<Free>("free");
  if (real_free == nullptr || is_early(block)) {
    return;
  }
  if (record.on) {
    record.of_c.remove(block);
  }
  real_free(block);
}

void* operator new(size_t size) {
  void* block = fails(Allocator::kNew) ? nullptr : real<Malloc>("malloc")(size > 0 ? size : 1);
  if (block == nullptr) {
    throw std::bad_alloc();
  }
  if (watched()) {
    ++record.news;
    record.of_new.add(block, size);
  }
  return block;
}

void operator delete(void* block) noexcept {
  if (record.on) {
    record.of_new.remove(block);
  }
  real<Free>("free")(block);
}

void operator delete(void* block, size_t /*size*/) noexcept {
  operator delete(block);
}

void* operator new[](size_t size) {
  return operator new(size);
}

void operator delete[](void* block) noexcept {
  operator delete(block);
}

void operator delete[](void* block, size_t /*size*/) noexcept {
  operator delete(block);
}

namespace support {

FailingAllocation::FailingAllocation(Allocator allocator, int n) : allocator_(allocator), n_(n) {
  until_failure(allocator_) = n_;
}
FailingAllocation::~FailingAllocation() {
  until_failure(allocator_) = 0;
}
bool FailingAllocation::happened() const {
  return n_ > 0 && until_failure(allocator_) == 0;
}

HeapWatch::HeapWatch() {
  record.callocs = 0;
  record.mallocs = 0;
  record.news = 0;
  record.of_new.count = 0;
  record.of_c.count = 0;
  record.on = true;
}

void HeapWatch::stop() {
  if (!record.on) {
    return;
  }
  record.on = false;  // before the vectors below allocate
  callocs_.assign(record.calloc_blocks.begin(), record.calloc_blocks.begin() + record.callocs);
  mallocs_.assign(record.malloc_sizes.begin(), record.malloc_sizes.begin() + record.mallocs);
  news_ = record.news;
  kept_ = record.of_new.sizes();
  not_freed_ = record.of_c.sizes();
}

HeapPause::HeapPause() {
  paused = true;
}
HeapPause::~HeapPause() {
  paused = false;
}

}  // namespace support
