// What LeakSanitizer is told of the streams that are kept. A program of its own, as it stands in
// for LeakSanitizer.

#include <google/protobuf/io/coded_stream.h>
#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

#include "adapters.h"
#include "doubles.h"

namespace {

using google::protobuf::io::CodedInputStream;

std::vector<const void*> ignored;

}  // namespace

extern "C" void __lsan_ignore_object(const void* block) {
  ignored.push_back(block);
}

namespace {

// The blocks of operator new that are still there.
class NewBlocks : public contract::Observer {
 public:
  const std::set<void*>& all() const { return blocks_; }

 private:
  void on_block(contract::Allocator allocator, void* block, size_t /*size*/) override {
    if (allocator == contract::Allocator::kNew) {
      blocks_.insert(block);
    }
  }
  void on_release(contract::Allocator /*allocator*/, void* block) override { blocks_.erase(block); }

  std::set<void*> blocks_;
};

TEST(LeakSanitizer, WhenADeserializerFails_IsToldOfItsStreamAlone) {
  ignored.reserve(10);  // not among the blocks
  for (const std::string& function : contract::function_names()) {
    if (function.find("_deserialize") == std::string::npos ||
        function == "forward_stored_message_deserialize") {  // which does nothing
      continue;
    }
    SCOPED_TRACE(function);
    contract::Call call(contract::Json::object(), "\x08\x01\x0f");
    const contract::Invocation invocation = contract::invocation_of(function, &call);
    ignored.clear();
    NewBlocks blocks;
    {
      const contract::Observation observation(&blocks);
      invocation();
    }
    ASSERT_EQ(ignored.size(), 1u);
    ASSERT_EQ(blocks.all().size(), 1u);
    auto* stream = static_cast<CodedInputStream*>(*blocks.all().begin());
    EXPECT_EQ(stream, ignored[0]);
    EXPECT_EQ(stream->CurrentPosition(), 0) << "points into the received bytes";
    delete stream;
  }
}

}  // namespace
