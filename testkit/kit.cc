#include "kit.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "service_scenario.h"

namespace testkit {
namespace {

using google::protobuf::FieldDescriptor;
using google::protobuf::Message;

// A plug-in in an endless loop comes to an end after so many.
constexpr int kMostComplaints = 20;

// "a ChatRequest"
std::string with_article(const std::string& name) {
  const bool is_vowel = std::string("AEIOU").find(name[0]) != std::string::npos;
  return (is_vowel ? "an " : "a ") + name;
}

std::string joined(const std::vector<std::string>& parts) {
  std::string text;
  for (const std::string& part : parts) {
    text += (text.empty() ? "" : "; ") + part;
  }
  return text;
}

std::string with_capital(std::string text) {
  text[0] = static_cast<char>(text[0] - 'a' + 'A');
  return text;
}

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

// A masked token stands for any.
void forget_masked_token(Pattern* pattern) {
  auto* auth = dynamic_cast<ChannelAuthRequest*>(pattern->fields.get());
  if (auth != nullptr && auth->has_accesstoken() &&
      auth->accesstoken().find_first_not_of('*') == std::string::npos) {
    auth->clear_accesstoken();
    pattern->present.emplace(auth, auth->GetDescriptor()->FindFieldByName("accessToken"));
  }
}

}  // namespace

Kit::Kit(const std::string& scenario) {
  parse_scenario(kServiceScenario, &scenario_);
  for (Statement& statement : scenario_.statements) {
    statement.where.clear();
  }
  parse_scenario(scenario, &scenario_);
  hide(scenario_.world.accesstoken());
  service_.emplace(scenario_.world);
  play();
}

Kit::Kit(std::vector<Statement> session, std::set<std::string> ignored)
    : ignored_(std::move(ignored)), is_strict_(true) {
  scenario_.statements = std::move(session);
  for (Statement& statement : scenario_.statements) {
    if (statement.kind == Statement::kExpect) {
      forget_masked_token(&statement.pattern);
    }
  }
  play();
}

// ---- What is wrong

void Kit::complain(const std::string& sentence) {
  ++complaints_;
  if (complaints_ < kMostComplaints) {
    report_ += sentence.empty() ? "" : without_tokens(sentence) + "\n";
  } else if (complaints_ == kMostComplaints) {
    report_ += "There is more, and nothing is delivered any longer.\n";
    line_.clear();
  }
}

// Wherever a plug-in sends them.
std::string Kit::without_tokens(std::string text) const {
  for (const std::string& token : tokens_) {
    for (size_t at = 0; (at = text.find(token, at)) != std::string::npos;) {
      text.replace(at, token.size(), kNotShown);
    }
  }
  return text;
}

void Kit::hide(const std::string& token) {
  constexpr size_t kLeast = 8;  // a shorter one may be a part of any sentence
  if (token.size() >= kLeast) {
    tokens_.insert(token);
  }
}

void Kit::complain_of(const Message& message, const std::string& what,
                      const std::vector<std::string>& reasons) {
  if (!reasons.empty()) {
    complain("Message " + std::to_string(messages_) + " of the plug-in, " +
             with_article(message.GetDescriptor()->name()) + ", " + what + ": " + joined(reasons) +
             ".");
  }
}

void Kit::check_rules(const Message& message) {
  std::vector<std::string> wrong;
  if (service_.has_value()) {
    wrong = service_->complaints();
  }
  for (Rule& rule : rules_) {
    const Statement& statement = *rule.statement;
    const bool is_over = statement.within >= 0 && now_ - rule.since > statement.within;
    if (statement.type != message.GetDescriptor() || is_over) {
      continue;
    }
    const auto found = differences(statement.pattern, message);
    if (statement.kind == Statement::kAtMost) {
      count(message, found.empty(), &rule);
    } else if (statement.where.empty()) {
      wrong.insert(wrong.end(), found.begin(), found.end());
    } else {
      complain_of(message, "is not what " + statement.where + " requires", found);
    }
  }
  complain_of(message, "is wrong", wrong);
}

// Of many that are too many, the first is enough.
void Kit::count(const Message& message, bool is_counted, Rule* rule) {
  rule->count += is_counted ? 1 : 0;
  if (is_counted && rule->count == rule->statement->most + 1) {
    complain_of(message, "is one too many",
                {rule->statement->where + " allows " + std::to_string(rule->statement->most)});
  } else if (is_counted && rule->count > rule->statement->most) {
    complain("");
  }
}

// ---- What the plug-in sends

void Kit::sent(const std::string& name, const std::string& bytes) {
  if (is_over_) {
    return;
  }
  ++messages_;
  const auto* type = message_type(name);
  if (type == nullptr) {
    complain("Message " + std::to_string(messages_) + " of the plug-in has a name " +
             quoted_name(name) + ", which is that of no message.");
    return;
  }
  const std::unique_ptr<Message> message = new_message(*type);
  if (!message->ParseFromString(bytes)) {
    complain_of(*message, "cannot be read", {"its bytes are broken, or those of another message"});
    return;
  }
  if (const auto* auth = dynamic_cast<const ChannelAuthRequest*>(message.get())) {
    hide(auth->accesstoken());
  }
  Messages said;
  if (service_.has_value()) {
    said = service_->take(*message);
  }
  check_rules(*message);
  meet(*message, std::move(said));
  play();
}

const Statement* Kit::expected() const {
  return position_ < scenario_.statements.size() ? &scenario_.statements[position_] : nullptr;
}

void Kit::meet(const Message& message, Messages said) {
  const Statement* statement = expected();
  if (statement == nullptr || statement->type != message.GetDescriptor()) {
    if (is_strict_) {
      complain_of(message, "is not expected",
                  {statement == nullptr
                       ? "the scenario is over"
                       : statement->where + " expects " + with_article(statement->type->name())});
    }
    deliver_all(said, {});
    return;
  }
  complain_of(message, "is not what " + statement->where + " expects",
              differences(statement->pattern, message, statement->is_replayed, ignored_));
  ++position_;
  waiting_since_ = now_;
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
        rules_.push_back({statement, now_, 0});
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
  if (statement.is_replayed) {
    put_in_line({statement.type->name(), statement.bytes, now_, nullptr}, false);
    return;
  }
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
  Delivery delivery{message.GetDescriptor()->name(), message.SerializeAsString(),
                    now_ + faults.after, nullptr};
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
    delivery.message.reset(message.New());
    delivery.message->CopyFrom(message);
  }
  if (!faults.is_dropped) {
    for (int i = 0; i < (faults.is_twice ? 2 : 1); ++i) {
      put_in_line(delivery, faults.is_swapped);
    }
  }
}

void Kit::put_in_line(Delivery delivery, bool is_swapped) {
  if (complaints_ >= kMostComplaints) {
    return;
  }
  if (is_swapped && !held_back_.has_value()) {
    held_back_ = std::move(delivery);
    return;
  }
  const int64_t due = delivery.due;
  const auto place =
      std::upper_bound(line_.begin(), line_.end(), due,
                       [](int64_t time, const Delivery& other) { return time < other.due; });
  line_.insert(place, std::move(delivery));
  if (held_back_.has_value()) {
    Delivery held = *std::exchange(held_back_, std::nullopt);
    held.due = std::max(held.due, due);
    put_in_line(std::move(held), false);
  }
}

std::optional<Delivery> Kit::next() {
  if (is_over_ || line_.empty() || line_.front().due > now_) {
    return std::nullopt;
  }
  Delivery delivery = std::move(line_.front());
  line_.pop_front();
  if (service_.has_value() && delivery.message != nullptr) {
    service_->note_delivery(*delivery.message);
  } else if (service_.has_value()) {
    service_->note_broken_delivery(delivery.name);
  }
  return delivery;
}

int64_t Kit::next_after() const {
  return is_over_ || line_.empty() ? -1 : std::max<int64_t>(line_.front().due - now_, 0);
}

// ---- Time

void Kit::wait(int64_t milliseconds) {
  if (is_over_ || milliseconds <= 0) {
    return;
  }
  now_ += std::min(milliseconds, std::numeric_limits<int64_t>::max() - now_);
  if (service_.has_value()) {
    service_->wait(milliseconds);
  }
  const Statement* statement = expected();
  if (statement != nullptr && statement->within >= 0 && !was_late_ &&
      now_ - waiting_since_ > statement->within) {
    was_late_ = true;
    complain("No " + statement->type->name() + " came within " + std::to_string(statement->within) +
             " ms, as " + statement->where + " expects.");
  }
}

void Kit::end() {
  if (is_over_) {
    return;
  }
  if (const Statement* statement = expected()) {
    complain(with_capital(statement->where) + " expects " + with_article(statement->type->name()) +
             ", which never came.");
  }
  if (held_back_.has_value()) {
    complain(with_capital(with_article(held_back_->name)) +
             " was to be swapped with the next message, but none came.");
  }
  for (const Delivery& delivery : line_) {
    if (delivery.due > now_) {
      complain(with_capital(with_article(delivery.name)) + " was due " +
               std::to_string(delivery.due - now_) + " ms later, but the test was over.");
    }
  }
  if (service_.has_value()) {
    for (const std::string& sentence : service_->unanswered()) {
      complain(sentence);
    }
  }
  is_over_ = true;
}

}  // namespace testkit
