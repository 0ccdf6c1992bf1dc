// What LeakSanitizer is told of the streams that are kept. A program of its own, as it stands in
// for LeakSanitizer.

#include <utility>

#include "support/deserializers.h"
#include "support/exchange.h"
#include "support/heap.h"

namespace {

using google::protobuf::io::CodedInputStream;

std::vector<void*> ignored;

}  // namespace

extern "C" void __lsan_ignore_object(const void* block) {
  const support::HeapPause pause;
  ignored.push_back(const_cast<void*>(block));
}

namespace {

// An input that every function begins to read and refuses.
const std::string kBroken = support::hex("08 01 0f");

template <typename Function>
void expect_to_ignore_the_stream(const Function& function) {
  SCOPED_TRACE(function.name);
  typename Function::Outputs out;
  ignored.clear();
  support::HeapWatch watch;
  out.read(kBroken);
  for (void* block : ignored) {
    auto* stream = static_cast<CodedInputStream*>(block);
    EXPECT_EQ(stream->CurrentPosition(), 0) << "points into the received bytes";
    delete stream;
  }
  watch.stop();
  EXPECT_EQ(ignored.size(), 1u);
  EXPECT_EQ(watch.kept(), std::vector<size_t>{}) << "another block is kept";
}

class LeakSanitizer : public support::ExchangeTest {};

TEST_F(LeakSanitizer, IsToldOfTheStreamOfEachDeserializer) {
  std::apply([](const auto&... all) { (expect_to_ignore_the_stream(all), ...); },
             support::kDeserializers);
}

}  // namespace
