// An account of a call: what it does, in order, as far as its caller can see. It tells what becomes
// of the call when a block that it asks for is refused.
#ifndef TESTS_SUPPORT_CALL_ACCOUNT_H
#define TESTS_SUPPORT_CALL_ACCOUNT_H

#include <map>
#include <new>
#include <optional>
#include <string>
#include <type_traits>
#include <vector>

#include "qel-message-serialize.h"
#include "support/exchange.h"
#include "support/heap.h"
#include "support/log_capture.h"
#include "support/wire.h"

namespace support {

// The outputs that were written, by name, each value as text.
using Written = std::map<std::string, std::string>;

// What a call leaves behind. Its end is "returns" or "throws", or "returns" and a status, or
// "faults", of which only the lines can be seen.
struct Outcome {
  std::string end;
  Written written;
  std::vector<size_t> kept;  // sizes of the blocks of operator new
  std::vector<Line> lines;
};

// The n-th block that is asked of the allocator, n from 1. None with 0.
struct Refusal {
  Allocator allocator = Allocator::kNew;
  int n = 0;
};

// The steps of one function's call, in order.
class Steps {
 public:
  explicit Steps(std::string function);

  Steps& logs(Line line);
  // With the function's name for the text's %s.
  Steps& logs_name(Line line);
  Steps& writes(std::string output, std::string value);
  // Fills objects of the schema, which ask operator new for any number of blocks, at least one.
  Steps& fills_objects();
  // Makes its input stream, one block of operator new, and keeps it.
  Steps& makes_stream();
  Steps& releases_stream();
  // Writes a block of a C allocator to the output. NULL in its place, if it is refused.
  Steps& hands_out(Allocator allocator, std::string output, std::string value);
  // The same, but looks whether it was refused and then does other things instead of the rest.
  Steps& hands_out_or(Allocator allocator, std::string output, std::string value, Steps instead);
  // Writes to a block that it asked a C allocator for, and faults here if that was refused.
  Steps& uses_block_of(Allocator allocator);
  Steps& returns();
  Steps& returns(int status);

  // Steps that many functions share.

  // Parses a message that has more than numbers in it.
  Steps& parses();
  Steps& hands_out_result(int code, const std::string& text);
  // Hands out the message's bytes and returns 0, or -1 if there is no memory.
  Steps& encodes(const Wire& message);
  Steps& exits();  // of a deserializer, with a line

  const std::string& function() const { return function_; }
  // How many blocks it asks of a C allocator.
  int blocks_of(Allocator allocator) const;

  // What comes of it; for the refusal of a block of a C allocator, or of none.
  Outcome outcome(const Refusal& refusal = {}) const;
  // What comes of it when operator new throws: in each of the steps that use it, in order.
  std::vector<Outcome> outcomes_of_throws() const;

 private:
  struct Step;

  Steps& add(Step step);
  // Does the steps, from what there is so far.
  void follow(const Refusal& refusal, Outcome* so_far) const;

  std::string function_;
  std::vector<Step> steps_;
};

struct Steps::Step {
  enum class Kind {
    kLogs,
    kWrites,
    kFills,
    kMakesStream,
    kReleasesStream,
    kHandsOut,
    kUses,
    kEnds
  };

  Kind kind;
  Allocator allocator = {};
  std::string output = {};
  std::string value = {};  // of the output, or the end
  Line line = {};
  std::vector<Steps> instead = {};  // of the rest, if the block is refused; one or none
};

// One observed call and what it left behind.
class Observation {
 public:
  explicit Observation(const Refusal& refusal) : refusal_(refusal) {}

  // Makes the call. What was written and what it allocated is shown afterwards.
  template <typename Call>
  void of(Call call) {
    watch_.emplace();
    const FailingAllocation refused(refusal_.allocator, refusal_.n);
    bool threw = false;
    std::optional<int> status;
    try {
      if constexpr (std::is_void_v<decltype(call())>) {
        call();
      } else {
        status = call();
      }
    } catch (const std::bad_alloc&) {
      threw = true;
    }
    refused_ = refused.happened();
    const HeapPause pause;
    end_ = threw ? "throws" : "returns";
    end_ += status ? " " + std::to_string(*status) : "";
  }

  // An output after the call. One that holds its sentinel was not written.
  void shows(const std::string& name, int64_t value);
  void shows(const std::string& name, int value);
  void shows(const std::string& name, const FlagOutput& flag);
  void shows(const std::string& name, const TextOutput& text);
  template <typename Element>
  void shows(const std::string& name, const BlockOutput<Element>& array, int count) {
    const HeapPause pause;
    if (array.block == nullptr) {
      written_[name] = "NULL";
    } else if (!array.untouched()) {
      written_[name] = "";
      for (int i = 0; i < count; ++i) {
        written_[name] += (i > 0 ? " " : "") + printed(array.block[i]);
      }
    }
  }
  // An array and its count, which is named after it.
  template <typename Element>
  void shows(const std::string& name, const ListOutput<Element>& list) {
    shows(name + "Count", list.count);
    shows(name, list.array, list.count);
  }
  // The text of a record that was handed out.
  void shows_text(const std::string& name, const char* text);

  // To be called when all that was handed out is released.
  void stop() { watch_->stop(); }

  bool refused() const { return refused_; }
  // Whether it left behind what the outcome says, but for the log.
  bool agrees_with(const Outcome& outcome) const;
  // The same and the log, as test failures. Clears the log.
  void expect(const std::string& function, const Outcome& outcome) const;

 private:
  static std::string printed(unsigned char byte);
  static std::string printed(int64_t id);
  static std::string printed(const qel_message_didviolationuser_t& pair);
  // The numbers of a record.
  static std::string printed(const qel_message_watermarkentry_t* mark);
  static std::string printed(const qel_message_chatroommember_t* member);
  static std::string printed(const qel_message_inboxentry_t* entry);

  Refusal refusal_;
  std::optional<HeapWatch> watch_;
  bool refused_ = false;
  std::string end_;
  Written written_;
};

}  // namespace support

#endif
