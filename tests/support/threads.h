// Threads at once.
#ifndef TESTS_SUPPORT_THREADS_H
#define TESTS_SUPPORT_THREADS_H

#include <atomic>
#include <cstddef>
#include <functional>
#include <thread>
#include <vector>

namespace support {

// Threads, numbered from 0, call often, numbered from 0 too, all at once; returns how many calls
// were not right. Between the beginning and the end they share nothing, which would put them into
// an order.
inline int wrong_calls_of_threads(
    size_t threads, int calls, const std::function<bool(size_t thread, int call)>& call_is_right) {
  std::atomic<size_t> ready = 0;
  std::vector<int> wrong(threads);
  const auto call_often = [&](size_t thread) {
    int own_wrong = 0;
    for (++ready; ready < threads;) {
      std::this_thread::yield();
    }
    for (int call = 0; call < calls; ++call) {
      own_wrong += call_is_right(thread, call) ? 0 : 1;
    }
    wrong[thread] = own_wrong;
  };
  std::vector<std::thread> running;
  for (size_t thread = 0; thread < threads; ++thread) {
    running.emplace_back(call_often, thread);
  }
  int sum = 0;
  for (size_t thread = 0; thread < threads; ++thread) {
    running[thread].join();
    sum += wrong[thread];
  }
  return sum;
}

}  // namespace support

#endif
