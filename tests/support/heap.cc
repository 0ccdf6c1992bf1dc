#include "support/heap.h"

#include <dlfcn.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <new>

namespace {

constexpr size_t kMost = 4096;

// Plain arrays: nothing here may allocate.
struct Record {
  bool on = false;
  size_t callocs = 0;
  std::array<support::HeapWatch::Block, kMost> calloc_blocks = {};
  size_t mallocs = 0;
  std::array<size_t, kMost> malloc_sizes = {};
  size_t news = 0;  // ever
  size_t live = 0;
  std::array<std::pair<void*, size_t>, kMost> new_blocks = {};
};

thread_local Record record;
thread_local int callocs_until_failure = 0;
thread_local int mallocs_until_failure = 0;
thread_local int news_until_failure = 0;
thread_local bool paused = false;

using Calloc = void* (*)(size_t, size_t);
using Malloc = void* (*)(size_t);

// Serves the dynamic loader's own wishes while it looks the real functions up.
void* early_memory(size_t size) {
  alignas(16) static char memory[65536];
  static size_t used = 0;
  const size_t at = used;
  used += (size + 15) / 16 * 16;
  return used <= sizeof memory ? memory + at : nullptr;
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
  if (paused) {
    return real_calloc(elements, element_size);
  }
  if (callocs_until_failure > 0 && --callocs_until_failure == 0) {
    return nullptr;
  }
  if (record.on && record.callocs < kMost) {
    record.calloc_blocks[record.callocs++] = {elements, element_size};
  }
  return real_calloc(elements, element_size);
}

extern "C" void* malloc(size_t size) noexcept {
  const auto real_malloc = real<Malloc>("malloc");
  if (real_malloc == nullptr) {
    return early_memory(size);
  }
  if (paused) {
    return real_malloc(size);
  }
  if (mallocs_until_failure > 0 && --mallocs_until_failure == 0) {
    return nullptr;
  }
  void* block = real_malloc(size);
  if (record.on) {
    if (record.mallocs < kMost) {
      record.malloc_sizes[record.mallocs++] = size;
    }
    std::memset(block, support::HeapWatch::kFreshByte, size);
  }
  return block;
}

void* operator new(size_t size) {
  const bool fails = !paused && news_until_failure > 0 && --news_until_failure == 0;
  void* block = fails ? nullptr : real<Malloc>("malloc")(size > 0 ? size : 1);
  if (block == nullptr) {
    throw std::bad_alloc();
  }
  if (record.on && !paused) {
    ++record.news;
    if (record.live < kMost) {
      record.new_blocks[record.live++] = {block, size};
    }
  }
  return block;
}

void operator delete(void* block) noexcept {
  for (size_t i = 0; record.on && i < record.live; ++i) {
    if (record.new_blocks[i].first == block) {
      record.new_blocks[i] = record.new_blocks[--record.live];
      break;
    }
  }
  std::free(block);
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

FailingCalloc::FailingCalloc(int n) {
  callocs_until_failure = n;
}
FailingCalloc::~FailingCalloc() {
  callocs_until_failure = 0;
}

FailingMalloc::FailingMalloc(int n) {
  mallocs_until_failure = n;
}
FailingMalloc::~FailingMalloc() {
  mallocs_until_failure = 0;
}

FailingNew::FailingNew(int n) {
  news_until_failure = n;
}

FailingNew::~FailingNew() {
  news_until_failure = 0;
}

HeapWatch::HeapWatch() {
  record.callocs = 0;
  record.mallocs = 0;
  record.news = 0;
  record.live = 0;
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
  for (size_t i = 0; i < record.live; ++i) {
    kept_.push_back(record.new_blocks[i].second);
  }
  std::sort(kept_.begin(), kept_.end());
}

HeapPause::HeapPause() {
  paused = true;
}
HeapPause::~HeapPause() {
  paused = false;
}

}  // namespace support
