// Plays a scenario with a service.
#ifndef TESTKIT_KIT_H
#define TESTKIT_KIT_H

#include <google/protobuf/message.h>

#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "player.h"
#include "scenario.h"
#include "service.h"

namespace testkit {

class Kit : public Player {
 public:
  // Throws Misread.
  explicit Kit(const std::string& scenario);

 private:
  // An expectation that may be met now, and what follows when it is.
  struct Expected {
    const Expect* expect;
    const std::string* where;
    Script::const_iterator next;
    Script::const_iterator end;
    bool is_late = false;
  };

  // A request whose answers are statements, and what the service says to it.
  struct Asked {
    std::unique_ptr<google::protobuf::Message> request;
    Messages said;
  };

  // Holds from some statement on.
  struct Rule {
    const Statement* statement;
    int64_t since;
    int count;
  };

  // A message on its way.
  struct Sent {
    Delivery delivery;
    int64_t due;  // when, on the kit's clock
    bool is_broken;
  };

  void take(const google::protobuf::Message& message) override;
  std::optional<Delivery> next_due() override;
  int64_t next_time() const override { return line_.empty() ? -1 : line_.front().due; }
  void time_passed() override;
  void finish() override;

  void play();
  void play(Script::const_iterator begin, Script::const_iterator end);
  void expect(const Statement& first, Script::const_iterator next, Script::const_iterator end);
  std::vector<Expected>::iterator find_expected(const google::protobuf::Message& message,
                                                bool is_again, std::vector<std::string>* differing);
  void meet(const google::protobuf::Message& message, Said said);
  std::string expectations() const;
  void check_rules(const google::protobuf::Message& message);
  void count(const google::protobuf::Message& message, const AtMost& most, Rule* rule);
  void answer(const Answer& statement);
  void push(const Push& statement);
  void deliver(const google::protobuf::Message& message, const Faults& faults);
  void deliver_all(const Messages& messages, const Faults& faults);
  bool break_as(const Faults& faults, Delivery* delivery);
  void put_in_line(Sent sent, bool is_swapped);

  Scenario scenario_;
  std::optional<Service> service_;
  Script::const_iterator next_;     // of the statements that were not played yet
  std::vector<Expected> expected_;  // each of them is to be met
  int64_t waiting_since_ = 0;
  bool is_strict_ = false;
  std::vector<Rule> rules_;
  std::map<int, Asked> asked_;          // by the number of the expectation
  std::vector<const Push*> too_early_;  // until the plug-in has signed in
  std::deque<Sent> line_;               // in the order of their times
  std::vector<Sent> held_back_;         // until the next one
};

}  // namespace testkit

#endif
