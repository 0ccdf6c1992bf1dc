#include "scenario.h"

#include "messages.h"

namespace testkit {
namespace {

using google::protobuf::Descriptor;

class Parser {
 public:
  Parser(const std::string& text, Scenario* scenario) : tokens_(text), scenario_(*scenario) {}

  void parse() {
    while (!tokens_.is_at_end()) {
      if (tokens_.take("world")) {
        put(parse_pattern(*World::descriptor(), &tokens_), &scenario_.world);
      } else {
        statement();
      }
    }
  }

 private:
  void statement() {
    Statement result{};
    const Place place = tokens_.place();
    const std::string word = tokens_.take();
    result.where = "line " + std::to_string(place.line);
    if (word == "expect") {
      result.kind = Statement::kExpect;
      message(&result);
      within(&result);
      if (!is_reply(*result.type)) {
        request_ = scenario_.statements.size();
      }
    } else if (word == "answer") {
      result.kind = Statement::kAnswer;
      answer(&result, place);
    } else if (word == "push") {
      result.kind = Statement::kPush;
      message(&result);
      require_no_bare_names(result.pattern, place);
      faults(&result.faults);
    } else if (word == "at") {
      tokens_.expect("most");
      result.kind = Statement::kAtMost;
      result.most = tokens_.number("expected how many");
      message(&result);
      within(&result);
    } else if (word == "never" || word == "always") {
      result.kind = word == "never" ? Statement::kAtMost : Statement::kAlways;
      message(&result);
      if (word == "never") {
        within(&result);
      }
    } else if (word == "strict") {
      result.kind = Statement::kStrict;
    } else {
      throw Misread{place,
                    "expected 'expect', 'answer', 'push', 'at most', 'never', 'always', "
                    "'strict' or 'world', but here is '" +
                        word + "'"};
    }
    scenario_.statements.push_back(std::move(result));
  }

  // The service's own, or some fields of it, or another message.
  void answer(Statement* result, const Place& place) {
    if (request_ == kNone) {
      throw Misread{place, "no request is expected before this answer"};
    }
    Statement& request = scenario_.statements[request_];
    request.has_answer = true;
    if (tokens_.is_at("{")) {
      result->type = reply_type(*request.type);
      if (result->type == nullptr) {
        tokens_.fail(request.type->name() + " has no reply, so this answer needs a name");
      }
      result->pattern = parse_pattern(*result->type, &tokens_);
      result->type = nullptr;
    } else if (tokens_.is_at_capital()) {
      message(result);
    }
    require_no_bare_names(result->pattern, place);
    faults(&result->faults);
  }

  const Descriptor* message_name() {
    const Place place = tokens_.place();
    const std::string name = tokens_.name("expected the name of a message");
    const Descriptor* type = message_type(name);
    if (type == nullptr) {
      throw Misread{place, "there is no message '" + name + "'"};
    }
    return type;
  }

  void message(Statement* result) {
    result->type = message_name();
    if (tokens_.is_at("{")) {
      result->pattern = parse_pattern(*result->type, &tokens_);
    } else {
      result->pattern.fields = new_message(*result->type);
    }
  }

  static void require_no_bare_names(const Pattern& pattern, const Place& place) {
    if (!pattern.present.empty()) {
      throw Misread{place, "the field '" + pattern.present.begin()->second->name() +
                               "' of a message to deliver needs a value"};
    }
  }

  void faults(Faults* result) {
    while (fault(result)) {
    }
  }

  bool fault(Faults* result) {
    if (tokens_.take("after")) {
      result->after = time();
    } else if (tokens_.take("twice")) {
      result->is_twice = true;
    } else if (tokens_.take("dropped")) {
      result->is_dropped = true;
    } else if (tokens_.take("swapped")) {
      tokens_.expect("with");
      tokens_.expect("the");
      tokens_.expect("next");
      result->is_swapped = true;
    } else if (tokens_.take("cut")) {
      tokens_.expect("at");
      result->cut_at = tokens_.number("expected a number of bytes");
    } else if (tokens_.take("corrupt")) {
      tokens_.expect("byte");
      result->corrupt_byte = tokens_.number("expected the index of a byte, from 0");
    } else if (tokens_.take("as")) {
      result->name = message_name()->name();
    } else {
      return false;
    }
    return true;
  }

  void within(Statement* result) {
    if (tokens_.take("within")) {
      result->within = time();
    }
  }

  // In milliseconds.
  int64_t time() {
    const int64_t number = tokens_.number("expected a time such as 5s or 200ms");
    if (tokens_.take("s")) {
      return number * 1000;
    }
    tokens_.expect("ms");
    return number;
  }

  static constexpr size_t kNone = static_cast<size_t>(-1);

  Tokens tokens_;
  Scenario& scenario_;
  size_t request_ = kNone;  // index of the last that is expected
};

}  // namespace

void parse_scenario(const std::string& text, Scenario* scenario) {
  Parser(text, scenario).parse();
}

}  // namespace testkit
