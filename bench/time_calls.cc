// Times the cases of the program's implementation. The arguments are those of Google Benchmark.

#include <benchmark/benchmark.h>

#include "cases.h"

namespace {

void time_case(benchmark::State& state, const std::string& name) {
  const Case one = make_case(name);
  for (auto _ : state) {
    one.call();
  }
}

}  // namespace

int main(int argc, char** argv) {
  const std::vector<std::string> names = case_names();
  for (const std::string& name : names) {
    benchmark::RegisterBenchmark(name.c_str(), time_case, name);
  }
  // Cases that several threads call at once.
  for (const std::string& name : names) {
    if (name == "chat_request/100" || name == "chat_reply/1") {
      benchmark::RegisterBenchmark(("at_once/" + name).c_str(), time_case, name)
          ->Threads(1)
          ->Threads(2)
          ->UseRealTime();
    }
  }
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
    return 2;
  }
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
