#include "support/call_account.h"

#include <algorithm>

namespace support {
namespace {

std::string in_braces(const std::vector<int64_t>& numbers) {
  std::string text;
  for (const int64_t number : numbers) {
    text += (text.empty() ? "{" : ", ") + std::to_string(number);
  }
  return text + "}";
}

}  // namespace

Steps::Steps(std::string function) : function_(std::move(function)) {}

Steps& Steps::add(Step step) {
  steps_.push_back(std::move(step));
  return *this;
}

Steps& Steps::logs(Line line) {
  Step step{Step::Kind::kLogs};
  step.line = std::move(line);
  return add(std::move(step));
}

Steps& Steps::logs_name(Line line) {
  line.arguments = {function_};
  return logs(std::move(line));
}

Steps& Steps::writes(std::string output, std::string value) {
  return add({Step::Kind::kWrites, {}, std::move(output), std::move(value)});
}

Steps& Steps::fills_objects() {
  return add({Step::Kind::kFills});
}

Steps& Steps::makes_stream() {
  return add({Step::Kind::kMakesStream});
}

Steps& Steps::releases_stream() {
  return add({Step::Kind::kReleasesStream});
}

Steps& Steps::hands_out(Allocator allocator, std::string output, std::string value) {
  return add({Step::Kind::kHandsOut, allocator, std::move(output), std::move(value)});
}

Steps& Steps::hands_out_or(Allocator allocator, std::string output, std::string value,
                           Steps instead) {
  return add({Step::Kind::kHandsOut,
              allocator,
              std::move(output),
              std::move(value),
              {},
              {std::move(instead)}});
}

Steps& Steps::uses_block_of(Allocator allocator) {
  return add({Step::Kind::kUses, allocator});
}

Steps& Steps::returns() {
  return add({Step::Kind::kEnds, {}, {}, "returns"});
}

Steps& Steps::returns(int status) {
  return add({Step::Kind::kEnds, {}, {}, "returns " + std::to_string(status)});
}

Steps& Steps::parses() {
  return makes_stream().fills_objects();
}

Steps& Steps::hands_out_result(int code, const std::string& text) {
  return writes("resultCode", std::to_string(code))
      .hands_out(Allocator::kStrdup, "resultMsg", text);
}

Steps& Steps::encodes(const Wire& message) {
  const std::string& bytes = message.bytes();
  return writes("size", std::to_string(bytes.size()))
      .hands_out_or(
          Allocator::kCalloc, "serialized_data", to_hex(bytes),
          Steps(function_).logs(error("Could not allocate memory for serialized data")).returns(-1))
      .logs_name(debug("%s: exit"))
      .returns(0);
}

Steps& Steps::exits() {
  return logs_name(warn("%s: exit")).returns();
}

int Steps::blocks_of(Allocator allocator) const {
  return static_cast<int>(std::count_if(steps_.begin(), steps_.end(), [&](const Step& step) {
    return (step.kind == Step::Kind::kHandsOut || step.kind == Step::Kind::kUses) &&
           step.allocator == allocator;
  }));
}

Outcome Steps::outcome(const Refusal& refusal) const {
  Outcome outcome;
  follow(refusal, &outcome);
  return outcome;
}

std::vector<Outcome> Steps::outcomes_of_throws() const {
  std::vector<Outcome> outcomes;
  Steps before(function_);
  for (const Step& step : steps_) {
    if (step.kind == Step::Kind::kFills || step.kind == Step::Kind::kMakesStream) {
      outcomes.push_back(before.outcome());
      outcomes.back().end = "throws";
    }
    before.steps_.push_back(step);
  }
  return outcomes;
}

void Steps::follow(const Refusal& refusal, Outcome* so_far) const {
  int left = refusal.n;  // to go until the refused block
  for (const Step& step : steps_) {
    const bool asks = step.kind == Step::Kind::kHandsOut || step.kind == Step::Kind::kUses;
    const bool refused = asks && step.allocator == refusal.allocator && --left == 0;
    switch (step.kind) {
      case Step::Kind::kLogs:
        so_far->lines.push_back(step.line);
        break;
      case Step::Kind::kWrites:
        so_far->written[step.output] = step.value;
        break;
      case Step::Kind::kFills:
        break;
      case Step::Kind::kMakesStream:
        so_far->kept = {kStreamSize};
        break;
      case Step::Kind::kReleasesStream:
        so_far->kept = {};
        break;
      case Step::Kind::kHandsOut:
        so_far->written[step.output] = refused ? "NULL" : step.value;
        if (refused && !step.instead.empty()) {
          step.instead[0].follow({}, so_far);
          return;
        }
        break;
      case Step::Kind::kUses:
        if (refused) {
          so_far->end = "faults";
          return;
        }
        break;
      case Step::Kind::kEnds:
        so_far->end = step.value;
        return;
    }
  }
}

void Observation::shows(const std::string& name, int64_t value) {
  const HeapPause pause;
  if (value != kLongSentinel) {
    written_[name] = std::to_string(value);
  }
}

void Observation::shows(const std::string& name, int value) {
  const HeapPause pause;
  if (value != kIntSentinel) {
    written_[name] = std::to_string(value);
  }
}

void Observation::shows(const std::string& name, const FlagOutput& flag) {
  const HeapPause pause;
  if (!flag.untouched()) {
    written_[name] = std::to_string(flag.value());
  }
}

void Observation::shows(const std::string& name, const TextOutput& text) {
  if (!text.untouched()) {
    shows_text(name, text.block);
  }
}

void Observation::shows_text(const std::string& name, const char* text) {
  const HeapPause pause;
  written_[name] = text != nullptr ? text : "NULL";
}

std::string Observation::printed(unsigned char byte) {
  return to_hex(&byte, 1);
}
std::string Observation::printed(int64_t id) {
  return std::to_string(id);
}
std::string Observation::printed(const qel_message_didviolationuser_t& pair) {
  return in_braces({pair.userA, pair.userB});
}
std::string Observation::printed(const qel_message_watermarkentry_t* mark) {
  return in_braces({mark->userId, mark->msgId, mark->timestamp});
}
std::string Observation::printed(const qel_message_chatroommember_t* member) {
  return in_braces({member->userId, member->available});
}
std::string Observation::printed(const qel_message_inboxentry_t* entry) {
  return in_braces({entry->msgId, entry->msgType, entry->sender, entry->receiver, entry->sentTime,
                    entry->chatroomId, entry->chatType, entry->msgTtl});
}

bool Observation::agrees_with(const Outcome& outcome) const {
  return end_ == outcome.end && written_ == outcome.written && watch_->kept() == outcome.kept &&
         watch_->not_freed().empty();
}

void Observation::expect(const std::string& function, const Outcome& outcome) const {
  EXPECT_EQ(end_, outcome.end);
  EXPECT_EQ(written_, outcome.written);
  EXPECT_EQ(watch_->kept(), outcome.kept);
  EXPECT_EQ(watch_->not_freed(), std::vector<size_t>{});
  expect_log(function, outcome.lines);
}

}  // namespace support
