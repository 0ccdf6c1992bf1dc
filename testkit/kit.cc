#include "kit.h"

#include <algorithm>
#include <utility>

#include "messages.h"
#include "service_scenario.h"

namespace testkit {
namespace {

using google::protobuf::FieldDescriptor;
using google::protobuf::Message;

// A message that is delivered belongs to the request, unless the scenario says otherwise.
void take_over(const char* name, const Message& request, const Pattern& pattern, Message* message) {
  const FieldDescriptor* from = request.GetDescriptor()->FindFieldByName(name);
  const FieldDescriptor* to = message->GetDescriptor()->FindFieldByName(name);
  if (from == nullptr || to == nullptr || message->GetReflection()->HasField(*message, to) ||
      !request.GetReflection()->HasField(request, from) ||
      pattern.absent.count({pattern.fields.get(), to}) > 0) {
    return;
  }
  message->GetReflection()->SetInt64(message, to, request.GetReflection()->GetInt64(request, from));
}

}  // namespace

Kit::Kit(const std::string& scenario) {
  parse_scenario(kServiceScenario, &scenario_);
  for (Statement& statement : scenario_.statements) {
    statement.where.clear();
  }
  parse_scenario(scenario, &scenario_);
  wrong().secrets.add(scenario_.world.accesstoken());
  service_.emplace(scenario_.world);
  play();
}

void Kit::check_rules(const Message& message) {
  std::vector<std::string> reasons = service_->complaints();
  for (Rule& rule : rules_) {
    const Statement& statement = *rule.statement;
    const bool is_over = statement.within >= 0 && now() - rule.since > statement.within;
    if (statement.type != message.GetDescriptor() || is_over) {
      continue;
    }
    const auto found = differences(statement.pattern, message, wrong().secrets);
    if (statement.kind == Statement::kAtMost) {
      count(message, found.empty(), &rule);
    } else if (statement.where.empty()) {
      reasons.insert(reasons.end(), found.begin(), found.end());
    } else {
      wrong().add(subject(message), "is not what " + statement.where + " requires", found);
    }
  }
  wrong().add(subject(message), "is wrong", reasons);
}

// Of many that are too many, the first is enough.
void Kit::count(const Message& message, bool is_counted, Rule* rule) {
  rule->count += is_counted ? 1 : 0;
  if (is_counted && rule->count == rule->statement->most + 1) {
    wrong().add(subject(message), "is one too many",
                {rule->statement->where + " allows " + std::to_string(rule->statement->most)});
  } else if (is_counted && rule->count > rule->statement->most) {
    wrong().add_another();
  }
}

// ---- What the plug-in sends

void Kit::take(const Message& message) {
  Messages said = service_->take(message);
  check_rules(message);
  meet(message, std::move(said));
  play();
}

const Statement* Kit::expected() const {
  return position_ < scenario_.statements.size() ? &scenario_.statements[position_] : nullptr;
}

void Kit::meet(const Message& message, Messages said) {
  const Statement* statement = expected();
  if (statement == nullptr || statement->type != message.GetDescriptor()) {
    if (is_strict_) {
      wrong().add(subject(message), "is not expected",
                  {statement == nullptr
                       ? "the scenario is over"
                       : statement->where + " expects " + with_article(statement->type->name())});
    }
    deliver_all(said, {});
    return;
  }
  wrong().add(subject(message), "is not what " + statement->where + " expects",
              differences(statement->pattern, message, wrong().secrets));
  ++position_;
  waiting_since_ = now();
  was_late_ = false;
  if (!statement->has_answer) {
    deliver_all(said, {});
    return;
  }
  request_.reset(message.New());
  request_->CopyFrom(message);
  said_ = std::move(said);
}

// ---- What it receives

// Up to the next statement that waits for the plug-in.
void Kit::play() {
  for (const Statement* statement = expected();
       statement != nullptr && statement->kind != Statement::kExpect; statement = expected()) {
    switch (statement->kind) {
      case Statement::kExpect:
        break;
      case Statement::kAnswer:
        answer(*statement);
        break;
      case Statement::kPush:
        push(*statement);
        break;
      case Statement::kAtMost:
      case Statement::kAlways:
        rules_.push_back({statement, now(), 0});
        break;
      case Statement::kStrict:
        is_strict_ = true;
        break;
    }
    ++position_;
  }
}

void Kit::answer(const Statement& statement) {
  const Pattern& pattern = statement.pattern;
  if (statement.type != nullptr) {
    const auto message = new_message(*statement.type);
    put(pattern, message.get());
    take_over("requestId", *request_, pattern, message.get());
    take_over("chatroomId", *request_, pattern, message.get());
    deliver(*message, statement.faults);
    return;
  }
  if (pattern.fields == nullptr || said_.empty()) {
    deliver_all(said_, statement.faults);
    return;
  }
  std::unique_ptr<Message> own(said_.front()->New());  // also for another answer
  own->CopyFrom(*said_.front());
  put(pattern, said_.front().get());
  deliver_all(said_, statement.faults);
  said_.front() = std::move(own);
}

void Kit::push(const Statement& statement) {
  const auto message = new_message(*statement.type);
  const FieldDescriptor* id = statement.type->FindFieldByName("requestId");
  const Pattern& pattern = statement.pattern;
  service_->number(message.get());
  if (id != nullptr && pattern.absent.count({pattern.fields.get(), id}) > 0) {
    message->GetReflection()->ClearField(message.get(), id);
  }
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
            now() + faults.after,
            nullptr};
  Delivery& delivery = sent.delivery;
  bool is_broken = !faults.name.empty();
  if (is_broken) {
    delivery.name = faults.name;
  }
  if (faults.cut_at >= 0 && static_cast<size_t>(faults.cut_at) < delivery.bytes.size()) {
    delivery.bytes.resize(static_cast<size_t>(faults.cut_at));
    is_broken = true;
  }
  if (faults.corrupt_byte >= 0 &&
      static_cast<size_t>(faults.corrupt_byte) < delivery.bytes.size()) {
    char& byte = delivery.bytes[static_cast<size_t>(faults.corrupt_byte)];
    byte = static_cast<char>(~static_cast<unsigned char>(byte));
    is_broken = true;
  }
  if (!is_broken) {
    sent.message.reset(message.New());
    sent.message->CopyFrom(message);
  }
  if (!faults.is_dropped) {
    for (int i = 0; i < (faults.is_twice ? 2 : 1); ++i) {
      put_in_line(sent, faults.is_swapped);
    }
  }
}

void Kit::put_in_line(Sent sent, bool is_swapped) {
  if (is_swapped && !held_back_.has_value()) {
    held_back_ = std::move(sent);
    return;
  }
  const int64_t due = sent.due;
  const auto place =
      std::upper_bound(line_.begin(), line_.end(), due,
                       [](int64_t time, const Sent& other) { return time < other.due; });
  line_.insert(place, std::move(sent));
  if (held_back_.has_value()) {
    Sent held = *std::exchange(held_back_, std::nullopt);
    held.due = std::max(held.due, due);
    put_in_line(std::move(held), false);
  }
}

std::optional<Delivery> Kit::next_due() {
  if (line_.empty() || line_.front().due > now()) {
    return std::nullopt;
  }
  const Sent sent = std::move(line_.front());
  line_.pop_front();
  if (sent.message != nullptr) {
    service_->note_delivery(*sent.message);
  } else {
    service_->note_broken_delivery(sent.delivery.name);
  }
  return sent.delivery;
}

// ---- Time

void Kit::time_passed() {
  service_->set_time(now());
  const Statement* statement = expected();
  if (statement != nullptr && statement->within >= 0 && !was_late_ &&
      now() - waiting_since_ > statement->within) {
    was_late_ = true;
    wrong().add("No " + statement->type->name() + " came within " +
                std::to_string(statement->within) + " ms, as " + statement->where + " expects.");
  }
}

void Kit::finish() {
  if (const Statement* statement = expected()) {
    wrong().add(with_capital(statement->where) + " expects " +
                with_article(statement->type->name()) + ", which never came.");
  }
  if (held_back_.has_value()) {
    wrong().add(with_capital(with_article(held_back_->delivery.name)) +
                " was to be swapped with the next message, but none came.");
  }
  for (const Sent& sent : line_) {
    if (sent.due > now()) {
      wrong().add(with_capital(with_article(sent.delivery.name)) + " was due " +
                  std::to_string(sent.due - now()) + " ms later, but the test was over.");
    }
  }
  for (const std::string& sentence : service_->unanswered()) {
    wrong().add(sentence);
  }
}

}  // namespace testkit
