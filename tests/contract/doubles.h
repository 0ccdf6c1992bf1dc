// What the library calls beside the protocol's runtime, in the tests' own versions: the log
// service, the allocators and syscall. A test sees each of those calls, and may refuse a block.
#ifndef TESTS_CONTRACT_DOUBLES_H
#define TESTS_CONTRACT_DOUBLES_H

#include <cstddef>
#include <nlohmann/json.hpp>
#include <string>

namespace contract {

// What malloc hands out while a thread is observed, so that it shows what was never written.
constexpr unsigned char kFreshByte = 0xc7;

enum class Allocator { kCalloc, kMalloc, kStrdup, kNew };

struct LogLine {
  int log_id;
  int priority;
  std::string tag;
  std::string format;
  nlohmann::json arguments;  // numbers and texts, as the format's conversions say
  int fresh_thread_id;       // what syscall(SYS_gettid) has answered since the line before; or 0
};

// Sees the calls of one thread. Its own allocations are not observed.
class Observer {
 public:
  virtual ~Observer() = default;
  virtual void on_line(const LogLine& /*line*/) {}
  // Whether the block is to be had. The text is what strdup copies.
  virtual bool on_request(Allocator /*allocator*/, size_t /*count*/, size_t /*size*/,
                          const char* /*text*/) {
    return true;
  }
  virtual void on_block(Allocator /*allocator*/, void* /*block*/, size_t /*size*/) {}
  // Of free, or of delete: kNew.
  virtual void on_release(Allocator /*allocator*/, void* /*block*/) {}
};

// While it lives, the observer sees what the calling thread does. One at a time in a thread.
class Observation {
 public:
  explicit Observation(Observer* observer);
  ~Observation();
  Observation(const Observation&) = delete;
  Observation& operator=(const Observation&) = delete;
};

}  // namespace contract

#endif
