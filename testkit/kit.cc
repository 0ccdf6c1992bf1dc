#include "kit.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "messages.h"
#include "service_scenario.h"

namespace testkit {
namespace {

using google::protobuf::Message;

bool is_absent(const Pattern& pattern, const char* name) {
  return pattern.absent.count({pattern.fields.get(), pattern.type().FindFieldByName(name)}) > 0;
}

// A message that is delivered belongs to the request, unless the scenario says otherwise.
void take_over(const char* name, const Message& request, const Pattern& pattern, Message* message) {
  if (has(request, name) && !has(*message, name) && !is_absent(pattern, name)) {
    set_number(message, name, number_in(request, name));
  }
}

}  // namespace

Kit::Kit(const std::string& scenario) {
  Scenario of_service;
  parse_scenario(kServiceScenario, &of_service);
  std::vector<Pattern> required;
  for (Statement& statement : of_service.script) {
    required.push_back(std::move(std::get<Always>(statement.what).pattern));
  }
  scenario_.world = of_service.world;
  parse_scenario(scenario, &scenario_);
  wrong().secrets.add(scenario_.world.accesstoken());
  service_.emplace(scenario_.world, std::move(required));
  next_ = scenario_.script.begin();
  play();
}

// ---- What the plug-in sends

void Kit::take(const Message& message) {
  Said said = service_->take(message);
  wrong().add(subject(message), "is wrong", service_->complaints());
  check_rules(message);
  meet(message, std::move(said));
  play();
}

void Kit::check_rules(const Message& message) {
  for (Rule& rule : rules_) {
    if (const auto* always = std::get_if<Always>(&rule.statement->what)) {
      if (&always->pattern.type() == message.GetDescriptor()) {
        wrong().add(subject(message), "is not what " + rule.statement->where + " requires",
                    differences(always->pattern, message, wrong().secrets));
      }
    } else {
      count(message, std::get<AtMost>(rule.statement->what), &rule);
    }
  }
}

// Of many that are too many, the first is enough.
void Kit::count(const Message& message, const AtMost& most, Rule* rule) {
  const bool is_over = most.within != kNoLimit && now() - rule->since > most.within;
  if (is_over || &most.pattern.type() != message.GetDescriptor() ||
      !differences(most.pattern, message, wrong().secrets).empty()) {
    return;
  }
  ++rule->count;
  if (rule->count == most.count + 1) {
    wrong().add(subject(message), "is one too many",
                {rule->statement->where + " allows " + std::to_string(most.count)});
  } else if (rule->count > most.count) {
    wrong().add_another();
  }
}

std::string Kit::expectations() const {
  std::string text;
  for (const Expected& expected : expected_) {
    text += (text.empty() ? "" : ", ") + *expected.where + " expects " +
            with_article(expected.expect->pattern.type().name());
  }
  return text;
}

// The first expectation that the message fits, or else the first of its name. A request that comes
// again need not be one that is expected.
std::vector<Kit::Expected>::iterator Kit::find_expected(const Message& message, bool is_again,
                                                        std::vector<std::string>* differing) {
  auto found = expected_.end();
  for (auto it = expected_.begin(); it != expected_.end(); ++it) {
    if (&it->expect->pattern.type() == message.GetDescriptor()) {
      auto reasons = differences(it->expect->pattern, message, wrong().secrets);
      if (reasons.empty()) {
        differing->clear();
        return it;
      }
      if (found == expected_.end() && !is_again) {
        found = it;
        *differing = std::move(reasons);
      }
    }
  }
  return found;
}

void Kit::meet(const Message& message, Said said) {
  std::vector<std::string> differing;
  const auto found = find_expected(message, said.is_again, &differing);
  if (found == expected_.end()) {
    if (is_strict_) {
      wrong().add(subject(message), "is not expected",
                  {expected_.empty() ? "the scenario is over" : expectations()});
    }
    deliver_all(said.messages, {});
    return;
  }
  const Expected met = *found;
  expected_.erase(found);
  wrong().add(subject(message), "is not what " + *met.where + " expects", differing);
  waiting_since_ = now();
  if (scenario_.answered.count(met.expect->number) > 0) {
    asked_[met.expect->number] = {copy_of(message), std::move(said.messages)};
  } else {
    deliver_all(said.messages, {});
  }
  play(met.next, met.end);
}

// ---- What it receives

// Up to the next statement that waits for the plug-in.
void Kit::play() {
  const auto end = scenario_.script.end();
  while (expected_.empty() && next_ != end) {
    const Statement& statement = *next_++;
    if (const auto* any_order = std::get_if<AnyOrder>(&statement.what)) {
      for (const Script& script : any_order->scripts) {
        expect(script.front(), script.begin() + 1, script.end());
      }
    } else if (std::holds_alternative<Expect>(statement.what)) {
      expect(statement, end, end);
    } else {
      play(next_ - 1, next_);
    }
  }
}

void Kit::expect(const Statement& first, Script::const_iterator next, Script::const_iterator end) {
  expected_.push_back({&std::get<Expect>(first.what), &first.where, next, end});
}

void Kit::play(Script::const_iterator begin, Script::const_iterator end) {
  for (auto it = begin; it != end; ++it) {
    if (const auto* answer = std::get_if<Answer>(&it->what)) {
      this->answer(*answer);
    } else if (const auto* push = std::get_if<Push>(&it->what)) {
      this->push(*push);
    } else if (std::holds_alternative<Strict>(it->what)) {
      is_strict_ = true;
    } else {
      rules_.push_back({&*it, now(), 0});
    }
  }
}

void Kit::answer(const Answer& statement) {
  const auto asked = asked_.find(statement.request);
  if (asked == asked_.end()) {
    wrong().add(with_capital(statement.faults.where) + " answers a request that did not come yet.");
    return;
  }
  const auto& [request, said] = asked->second;
  const Pattern& pattern = statement.pattern;
  if (statement.is_another) {
    const auto message = new_message(pattern.type());
    put(pattern, message.get());
    take_over("requestId", *request, pattern, message.get());
    take_over("chatroomId", *request, pattern, message.get());
    deliver(*message, statement.faults);
    return;
  }
  const Messages messages = copies_of(said);
  if (pattern.fields != nullptr && !messages.empty()) {
    put(pattern, messages.front().get());
  }
  deliver_all(messages, statement.faults);
}

void Kit::push(const Push& statement) {
  if (!service_->is_signed_in()) {
    too_early_.push_back(&statement);
    return;
  }
  const Pattern& pattern = statement.pattern;
  const auto message = new_message(pattern.type());
  service_->number(message.get());
  put(pattern, message.get());
  deliver(*message, statement.faults);
}

void Kit::deliver_all(const Messages& messages, const Faults& faults) {
  Faults others;
  others.after = faults.after;
  for (const auto& message : messages) {
    deliver(*message, message == messages.front() ? faults : others);
  }
}

void Kit::deliver(const Message& message, const Faults& faults) {
  Sent sent{{message.GetDescriptor()->name(), message.SerializeAsString()},
            now() + std::min(faults.after, std::numeric_limits<int64_t>::max() - now()),
            false};
  sent.is_broken = break_as(faults, &sent.delivery);
  const int copies = faults.is_twice ? 2 : 1;
  for (int i = 0; i < copies && !faults.is_dropped; ++i) {
    put_in_line(sent, faults.is_swapped);
  }
}

// Whether it is another one now. Complains of what changes nothing.
bool Kit::break_as(const Faults& faults, Delivery* delivery) {
  const auto size = static_cast<int>(delivery->bytes.size());
  std::vector<std::string> useless;
  if (faults.cut_at >= size) {
    useless.push_back("cuts it at " + std::to_string(faults.cut_at));
  } else if (faults.cut_at >= 0) {
    delivery->bytes.resize(static_cast<size_t>(faults.cut_at));
  }
  if (faults.corrupt_byte >= static_cast<int>(delivery->bytes.size())) {
    useless.push_back("corrupts the byte " + std::to_string(faults.corrupt_byte));
  } else if (faults.corrupt_byte >= 0) {
    char& byte = delivery->bytes[static_cast<size_t>(faults.corrupt_byte)];
    byte = static_cast<char>(~static_cast<unsigned char>(byte));
  }
  if (faults.name == delivery->name) {
    useless.push_back("delivers it under its own name");
  }
  for (const std::string& fault : useless) {
    wrong().add(with_capital(faults.where) + " delivers " + with_article(delivery->name) + " of " +
                std::to_string(size) + " bytes, and " + fault + ", which changes nothing.");
  }
  delivery->name = faults.name.empty() ? delivery->name : faults.name;
  return faults.cut_at >= 0 || faults.corrupt_byte >= 0 || !faults.name.empty();
}

void Kit::put_in_line(Sent sent, bool is_swapped) {
  if (is_swapped) {
    held_back_.push_back(std::move(sent));
    return;
  }
  int64_t due = sent.due;
  held_back_.push_back(std::move(sent));
  while (!held_back_.empty()) {  // the last is the one that they wait for
    Sent next = std::move(held_back_.back());
    held_back_.pop_back();
    next.due = due = std::max(due, next.due);
    const auto place =
        std::upper_bound(line_.begin(), line_.end(), due,
                         [](int64_t time, const Sent& other) { return time < other.due; });
    line_.insert(place, std::move(next));
  }
}

std::optional<Delivery> Kit::next_due() {
  if (line_.empty() || line_.front().due > now()) {
    return std::nullopt;
  }
  Sent sent = std::move(line_.front());
  line_.pop_front();
  waiting_since_ = now();
  service_->note_delivery(sent.delivery.name, sent.delivery.bytes, !sent.is_broken);
  if (service_->is_signed_in()) {
    for (const Push* statement : std::exchange(too_early_, {})) {
      push(*statement);
    }
  }
  return std::move(sent.delivery);
}

// ---- Time

// What the plug-in has not received yet, it cannot answer.
void Kit::time_passed() {
  service_->set_time(now());
  for (Expected& expected : expected_) {
    const int64_t within = expected.expect->within;
    if (within != kNoLimit && line_.empty() && !expected.is_late &&
        now() - waiting_since_ > within) {
      expected.is_late = true;
      wrong().add("No " + expected.expect->pattern.type().name() + " came within " +
                  std::to_string(within) + " ms, as " + *expected.where + " expects.");
    }
  }
}

void Kit::finish() {
  std::set<std::string> missing;
  for (const Expected& expected : expected_) {
    const std::string& name = expected.expect->pattern.type().name();
    missing.insert(name);
    if (!expected.is_late) {
      wrong().add(with_capital(*expected.where) + " expects " + with_article(name) +
                  ", which never came.");
    }
  }
  for (const Sent& sent : held_back_) {
    wrong().add(with_capital(with_article(sent.delivery.name)) +
                " was to be swapped with the next message, but none came.");
  }
  for (const Sent& sent : line_) {
    const std::string name = with_capital(with_article(sent.delivery.name));
    wrong().add(sent.due > now() ? name + " was due " + std::to_string(sent.due - now()) +
                                       " ms later, but the test was over."
                                 : name + " was due, but the test did not take it.");
  }
  for (const Push* statement : too_early_) {
    wrong().add(with_capital(statement->faults.where) + " pushes " +
                with_article(statement->pattern.type().name()) +
                ", but the plug-in did not sign in.");
  }
  for (const Unanswered& push : service_->unanswered()) {
    if (missing.count(push.answer) == 0) {  // which was said
      wrong().add(push.sentence);
    }
  }
}

}  // namespace testkit
