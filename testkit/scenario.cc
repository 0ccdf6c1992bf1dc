#include "scenario.h"

#include <map>
#include <utility>

#include "messages.h"

namespace testkit {
namespace {

using google::protobuf::Descriptor;

constexpr char kWords[] =
    "expected 'expect', 'in any order', 'answer', 'push', 'at most', 'never', 'always', 'strict' "
    "or 'world'";

class Parser {
 public:
  Parser(const std::string& text, Scenario* scenario) : tokens_(text), scenario_(*scenario) {}

  void parse() {
    while (!tokens_.is_at_end()) {
      if (tokens_.take("world")) {
        world();
      } else if (tokens_.is_at("in")) {
        scenario_.script.push_back(any_order());
      } else {
        scenario_.script.push_back(statement());
      }
    }
  }

 private:
  void world() {
    const Place place = tokens_.place();
    const Pattern pattern = parse_pattern(*World::descriptor(), &tokens_);
    require_values(pattern, place);
    if (!pattern.fields->GetReflection()->GetUnknownFields(*pattern.fields).empty()) {
      throw Misread{place, "the world has no fields by their numbers"};
    }
    put(pattern, &scenario_.world);
  }

  Statement any_order() {
    Statement result{where(), AnyOrder{}};
    for (const char* word : {"in", "any", "order", "{"}) {
      tokens_.expect(word);
    }
    auto& scripts = std::get<AnyOrder>(result.what).scripts;
    do {
      if (tokens_.is_at("expect")) {
        scripts.emplace_back();
      } else if (scripts.empty()) {
        tokens_.fail("expected 'expect'");
      }
      scripts.back().push_back(statement());
    } while (!tokens_.take("}"));
    return result;
  }

  Statement statement() {
    const std::string place = where();
    const std::string also = std::exchange(may_follow_, "");
    if (tokens_.take("expect")) {
      return {place, expect()};
    }
    if (tokens_.is_at("answer")) {
      return {place, answer()};
    }
    if (tokens_.is_at("push")) {
      return {place, push()};
    }
    if (tokens_.take("at")) {
      tokens_.expect("most");
      return {place, at_most(tokens_.number("expected how many"))};
    }
    if (tokens_.take("never")) {
      return {place, at_most(0)};
    }
    if (tokens_.take("always")) {
      return {place, Always{message_of_plugin()}};
    }
    if (tokens_.take("strict")) {
      return {place, Strict{}};
    }
    tokens_.fail(kWords + also);
  }

  Expect expect() {
    Expect result;
    result.pattern = message_of_plugin();
    result.number = ++expectations_;
    if (!is_reply(result.pattern.type())) {
      last_request_ = result.number;
      requests_[result.number] = &result.pattern.type();
    }
    for (bool goes_on = true; goes_on;) {
      if (tokens_.take("called")) {
        call(result.number);
      } else if (tokens_.take("within")) {
        result.within = time();
      } else {
        goes_on = false;
      }
    }
    may_follow_ = ", or behind an expectation 'within' or 'called'";
    return result;
  }

  // Gives the request a name.
  void call(int expectation) {
    const Place place = tokens_.place();
    const std::string name = tokens_.name("expected a name for the request");
    if (requests_.count(expectation) == 0 || !names_.emplace(name, expectation).second) {
      throw Misread{place, "the name '" + name + "' is that of another request, or of a reply"};
    }
  }

  // The service's own, or some fields of it, or another message.
  Answer answer() {
    const Place place = tokens_.place();
    Answer result;
    result.faults.where = where();
    tokens_.expect("answer");
    result.request = tokens_.take("to") ? named_request() : last_request_;
    if (result.request == 0) {
      throw Misread{place, "no request is expected before this answer"};
    }
    scenario_.answered.insert(result.request);
    const Descriptor& request = *requests_[result.request];
    const Descriptor* type = reply_type(request);
    result.is_another = tokens_.is_at_capital();
    if (result.is_another) {
      result.pattern = message();
    } else if (tokens_.is_at("{") && type == nullptr) {
      tokens_.fail(request.name() + " has no reply, so this answer needs a name");
    } else if (tokens_.is_at("{")) {
      result.pattern = parse_pattern(*type, &tokens_);
    }
    require_deliverable(result.pattern, place);
    faults(&result.faults);
    return result;
  }

  int named_request() {
    const Place place = tokens_.place();
    const std::string name = tokens_.name("expected the name of a request");
    const auto found = names_.find(name);
    if (found == names_.end()) {
      throw Misread{place, "no request before is called '" + name + "'"};
    }
    return found->second;
  }

  Push push() {
    const Place place = tokens_.place();
    Push result;
    result.faults.where = where();
    tokens_.expect("push");
    result.pattern = message();
    require_deliverable(result.pattern, place);
    faults(&result.faults);
    return result;
  }

  AtMost at_most(int count) {
    AtMost result{count, message_of_plugin(), kNoLimit};
    if (tokens_.take("within")) {
      result.within = time();
    }
    may_follow_ = ", or behind the message 'within'";
    return result;
  }

  // Parts of messages are none that could be sent.
  const Descriptor& message_name() {
    const Place place = tokens_.place();
    const std::string name = tokens_.name("expected the name of a message");
    const Descriptor* type = message_type(name);
    if (type == nullptr || type->FindFieldByName("requestId") == nullptr) {
      throw Misread{place, "there is no message '" + name + "'"};
    }
    return *type;
  }

  Pattern message() {
    const Descriptor& type = message_name();
    return tokens_.is_at("{") ? parse_pattern(type, &tokens_) : Pattern(type);
  }

  Pattern message_of_plugin() {
    const Place place = tokens_.place();
    Pattern result = message();
    if (!is_from_plugin(result.type())) {
      throw Misread{place, "a plug-in does not send '" + result.type().name() + "'"};
    }
    return result;
  }

  static void require_values(const Pattern& pattern, const Place& place) {
    if (!pattern.present.empty()) {
      throw Misread{
          place, "the field '" + pattern.present.begin()->second->name() + "' needs a value here"};
    }
  }

  static void require_deliverable(const Pattern& pattern, const Place& place) {
    require_values(pattern, place);
    if (pattern.fields != nullptr && is_from_plugin(pattern.type())) {
      throw Misread{place, "the service does not send '" + pattern.type().name() + "'"};
    }
  }

  void faults(Faults* result) {
    std::set<std::string> words;
    may_follow_ =
        ", or behind a message to deliver 'after', 'twice', 'dropped', 'swapped with the next', "
        "'cut at', 'corrupt byte' or 'as'";
    for (Place place = tokens_.place(); is_at_fault(); place = tokens_.place()) {
      const std::string word = tokens_.take();
      if (!words.insert(word).second) {
        throw Misread{place, "'" + word + "' is there twice"};
      }
      fault(word, result);
      if (words.count("dropped") > 0 && words.size() > 1) {
        throw Misread{place, "nothing else can happen to a message that is dropped"};
      }
      if (result->is_twice && result->is_swapped) {
        throw Misread{place, "a message that is swapped with the next comes once"};
      }
    }
  }

  bool is_at_fault() {
    for (const char* word : {"after", "twice", "dropped", "swapped", "cut", "corrupt", "as"}) {
      if (tokens_.is_at(word)) {
        return true;
      }
    }
    return false;
  }

  void fault(const std::string& word, Faults* result) {
    if (word == "after") {
      result->after = time();
    } else if (word == "twice") {
      result->is_twice = true;
    } else if (word == "dropped") {
      result->is_dropped = true;
    } else if (word == "swapped") {
      for (const char* next : {"with", "the", "next"}) {
        tokens_.expect(next);
      }
      result->is_swapped = true;
    } else if (word == "cut") {
      tokens_.expect("at");
      result->cut_at = tokens_.number("expected a number of bytes");
    } else if (word == "corrupt") {
      tokens_.expect("byte");
      result->corrupt_byte = tokens_.number("expected the index of a byte, from 0");
    } else {
      result->name = message_name().name();
    }
  }

  // In milliseconds.
  int64_t time() {
    constexpr int64_t kSecond = 1000;
    const int64_t number = tokens_.number("expected a time such as 5s or 200ms");
    if (tokens_.take("s")) {
      return number * kSecond;
    }
    if (!tokens_.take("ms")) {
      tokens_.fail("expected 's' or 'ms' behind the number");
    }
    return number;
  }

  std::string where() { return "line " + std::to_string(tokens_.place().line); }

  Tokens tokens_;
  Scenario& scenario_;
  std::string may_follow_;  // what else than a statement, in words
  int expectations_ = 0;
  int last_request_ = 0;                       // the number of its expectation, or 0
  std::map<int, const Descriptor*> requests_;  // by the same number
  std::map<std::string, int> names_;           // of requests
};

}  // namespace

void parse_scenario(const std::string& text, Scenario* scenario) {
  Parser(text, scenario).parse();
}

}  // namespace testkit
