#include "doubles.h"

#include <dlfcn.h>
#include <sys/syscall.h>

#include <atomic>
#include <cstdarg>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>
#include <stdexcept>

namespace contract {
namespace {

thread_local Observer* observer = nullptr;
thread_local bool is_paused = false;
thread_local int fresh_thread_id = 0;

// Invented, and another one each time: a line that repeats an earlier answer shows.
std::atomic<int> next_thread_id = 1'000'000;

Observer* active() {
  return is_paused ? nullptr : observer;
}

// While the observer itself, or a test's double, is at work.
class Pause {
 public:
  Pause() : before_(is_paused) { is_paused = true; }
  ~Pause() { is_paused = before_; }
  Pause(const Pause&) = delete;
  Pause& operator=(const Pause&) = delete;

 private:
  bool before_;
};

// Whether the block is to be had.
bool asks(Allocator allocator, size_t count, size_t size, const char* text = nullptr) {
  Observer* seen_by = active();
  const Pause pause;
  return seen_by == nullptr || seen_by->on_request(allocator, count, size, text);
}

void* hands_out(Allocator allocator, void* block, size_t size) {
  Observer* seen_by = active();
  if (seen_by != nullptr && block != nullptr) {
    const Pause pause;
    seen_by->on_block(allocator, block, size);
  }
  return block;
}

// Also while an exception unwinds.
void releases(Allocator allocator, void* block) {
  if (observer != nullptr && block != nullptr) {
    const Pause pause;
    observer->on_release(allocator, block);
  }
}

// Serves the dynamic loader's own wishes while it looks the real functions up.
alignas(16) char early_blocks[65536];
void* early_memory(size_t size) {
  static size_t used = 0;
  const size_t at = used;
  used += (size + 15) / 16 * 16;
  return used <= sizeof early_blocks ? early_blocks + at : nullptr;
}
bool is_early(const void* block) {
  // Without a template of the standard library, which a sanitizer has in a version of its own.
  const auto place = reinterpret_cast<uintptr_t>(block);
  const auto first = reinterpret_cast<uintptr_t>(early_blocks);
  return place >= first && place < first + sizeof early_blocks;
}

// The function that the program's own one stands before, which is a sanitizer's if there is one; or
// nullptr while the thread looks it up.
template <typename Function>
Function real(const char* name, const char* interceptor = nullptr) {
  static Function found = nullptr;
  static thread_local bool searching = false;
  if (found == nullptr && !searching) {
    searching = true;
    void* symbol = interceptor == nullptr ? nullptr : dlsym(RTLD_DEFAULT, interceptor);
    if (symbol == nullptr) {
      symbol = dlsym(RTLD_NEXT, name);
    }
    std::memcpy(&found, &symbol, sizeof found);
    searching = false;
  }
  return found;
}

void* real_malloc(size_t size) {
  const auto function = real<void* (*)(size_t)>("malloc", "__interceptor_malloc");
  return function == nullptr ? early_memory(size) : function(size);
}

void real_free(void* block) {
  const auto function = real<void (*)(void*)>("free", "__interceptor_free");
  if (function != nullptr && !is_early(block)) {
    function(block);
  }
}

nlohmann::json read_arguments(const std::string& format, va_list list) {
  nlohmann::json arguments = nlohmann::json::array();
  for (size_t at = format.find('%'); at != std::string::npos; at = format.find('%', at + 1)) {
    if (format.compare(at, 2, "%s") == 0) {
      arguments.push_back(va_arg(list, const char*));
    } else if (format.compare(at, 2, "%d") == 0) {
      arguments.push_back(va_arg(list, int));
    } else if (format.compare(at, 4, "%lld") == 0) {
      arguments.push_back(va_arg(list, long long));
    } else {
      throw std::invalid_argument("a conversion that no log line has: " + format);
    }
  }
  return arguments;
}

}  // namespace

Observation::Observation(Observer* observer_of_thread) {
  observer = observer_of_thread;
  fresh_thread_id = 0;
}
Observation::~Observation() {
  observer = nullptr;
}

}  // namespace contract

// In the program itself, so that every library's calls come here.

// AddressSanitizer asks here: a size that no allocator can serve is refused with NULL, as it is
// without the sanitizer.
extern "C" const char* __asan_default_options() {
  return "allocator_may_return_null=1";
}

extern "C" void* calloc(size_t count, size_t size) noexcept {
  using contract::Allocator;
  const auto real_calloc =
      contract::real<void* (*)(size_t, size_t)>("calloc", "__interceptor_calloc");
  if (real_calloc == nullptr) {
    return contract::early_memory(count * size);
  }
  if (!contract::asks(Allocator::kCalloc, count, size)) {
    return nullptr;
  }
  return contract::hands_out(Allocator::kCalloc, real_calloc(count, size), count * size);
}

extern "C" void* malloc(size_t size) noexcept {
  using contract::Allocator;
  if (contract::active() == nullptr) {
    return contract::real_malloc(size);
  }
  if (!contract::asks(Allocator::kMalloc, 1, size)) {
    return nullptr;
  }
  void* block = contract::real_malloc(size);
  if (block != nullptr) {
    std::memset(block, contract::kFreshByte, size);
  }
  return contract::hands_out(Allocator::kMalloc, block, size);
}

extern "C" char* strdup(const char* text) noexcept {
  using contract::Allocator;
  const size_t size = std::strlen(text) + 1;
  if (!contract::asks(Allocator::kStrdup, 1, size, text)) {
    return nullptr;
  }
  void* block = contract::real_malloc(size);
  if (block == nullptr) {
    return nullptr;
  }
  std::memcpy(block, text, size);
  return static_cast<char*>(contract::hands_out(Allocator::kStrdup, block, size));
}

extern "C" void free(void* block) noexcept {
  contract::releases(contract::Allocator::kMalloc, block);
  contract::real_free(block);
}

void* operator new(size_t size) {
  using contract::Allocator;
  if (!contract::asks(Allocator::kNew, 1, size)) {
    const contract::Pause pause;  // the exception is a block too
    throw std::bad_alloc();
  }
  void* block = contract::real_malloc(size > 0 ? size : 1);
  if (block == nullptr) {
    throw std::bad_alloc();
  }
  return contract::hands_out(Allocator::kNew, block, size);
}

void operator delete(void* block) noexcept {
  contract::releases(contract::Allocator::kNew, block);
  contract::real_free(block);
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

extern "C" long syscall(long number, ...) noexcept {
  va_list list;
  va_start(list, number);
  long arguments[6];
  for (long& argument : arguments) {
    argument = va_arg(list, long);
  }
  va_end(list);
  if (number == SYS_gettid && contract::active() != nullptr) {
    contract::fresh_thread_id = contract::next_thread_id.fetch_add(1, std::memory_order_relaxed);
    return contract::fresh_thread_id;
  }
  return contract::real<long (*)(long, ...)>("syscall")(
      number, arguments[0], arguments[1], arguments[2], arguments[3], arguments[4], arguments[5]);
}

extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

// What a log service answers is of no interest to the library.
extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...) {
  contract::Observer* observer = contract::active();
  if (observer == nullptr) {
    return -1;
  }
  const contract::Pause pause;
  va_list list;
  va_start(list, format);
  const contract::LogLine line = {log_id,
                                  priority,
                                  tag,
                                  format,
                                  contract::read_arguments(format, list),
                                  contract::fresh_thread_id};
  va_end(list);
  contract::fresh_thread_id = 0;
  observer->on_line(line);
  return -1;
}
