// count_calls CASE CALLS: makes so many calls and prints what they took: blocks allocated, blocks
// kept, and log lines; 0 for what the program is not linked to count. Some calls before them bring
// the heap and the C library's caches into their usual state. To count instructions, compare runs
// of different length.

#include <cstdio>
#include <cstdlib>
#include <string>

#include "cases.h"
#include "counters.h"

namespace {

constexpr int kCallsBefore = 20;

void repeat(const Case& one, long calls) {
  for (long i = 0; i < calls; ++i) {
    one.call();
  }
}

struct Counts {
  struct allocations blocks;
  long lines;
};

Counts counts() {
  Counts now = {};
  if (allocations != nullptr) {
    now.blocks = allocations();
  }
  if (log_lines != nullptr) {
    now.lines = log_lines();
  }
  return now;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: count_calls CASE CALLS\n");
    return 2;
  }
  const Case one = make_case(argv[1]);
  const long calls = std::strtol(argv[2], nullptr, 10);
  repeat(one, kCallsBefore);
  const Counts before = counts();
  repeat(one, calls);
  const Counts after = counts();
  std::printf("%ld %ld %ld\n", after.blocks.made - before.blocks.made,
              after.blocks.kept - before.blocks.kept, after.lines - before.lines);
  return 0;
}
