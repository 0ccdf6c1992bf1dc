// Two threads at once.
#ifndef TESTS_SUPPORT_THREADS_H
#define TESTS_SUPPORT_THREADS_H

#include <atomic>
#include <cstddef>
#include <functional>
#include <thread>

namespace support {

// Two threads at once, numbered 0 and 1, call many times; returns how many calls were not right.
inline int wrong_calls_of_two_threads(const std::function<bool(size_t thread)>& call_is_right) {
  std::atomic<int> wrong = 0;
  const auto call_often = [&](size_t thread) {
    for (int n = 0; n < 5000; ++n) {
      wrong += call_is_right(thread) ? 0 : 1;
    }
  };
  std::thread first(call_often, 0);
  std::thread second(call_often, 1);
  first.join();
  second.join();
  return wrong;
}

}  // namespace support

#endif
