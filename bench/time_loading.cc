// time_loading LIBRARY: prints how many nanoseconds it takes to load the library and its runtime,
// initialisers included. The C++ standard library is loaded already, as in all C++ processes.

#include <dlfcn.h>

#include <chrono>
#include <iostream>

int main(int argc, char** argv) {
  using Clock = std::chrono::steady_clock;
  if (argc != 2) {
    std::cerr << "usage: time_loading LIBRARY\n";
    return 2;
  }
  const Clock::time_point start = Clock::now();
  const void* library = dlopen(argv[1], RTLD_LAZY);
  const Clock::time_point end = Clock::now();
  if (library == nullptr) {
    std::cerr << dlerror() << '\n';
    return 1;
  }
  std::cout << std::chrono::nanoseconds(end - start).count() << '\n';
  return 0;
}
