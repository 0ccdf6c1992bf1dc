// Plays a scenario with a service.
#ifndef TESTKIT_KIT_H
#define TESTKIT_KIT_H

#include <google/protobuf/message.h>

#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
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
  // A statement that holds from now on.
  struct Rule {
    const Statement* statement;
    int64_t since;
    int count;
  };

  // A message on its way.
  struct Sent {
    Delivery delivery;
    int64_t due;  // when, on the kit's clock
    // What the plug-in has to answer, if it comes to it as it should.
    std::shared_ptr<google::protobuf::Message> message;
  };

  void take(const google::protobuf::Message& message) override;
  std::optional<Delivery> next_due() override;
  int64_t next_time() const override { return line_.empty() ? -1 : line_.front().due; }
  void time_passed() override;
  void finish() override;

  void play();
  void meet(const google::protobuf::Message& message, Messages said);
  void count(const google::protobuf::Message& message, bool is_counted, Rule* rule);
  void check_rules(const google::protobuf::Message& message);
  const Statement* expected() const;
  void answer(const Statement& statement);
  void push(const Statement& statement);
  void deliver(const google::protobuf::Message& message, const Faults& faults);
  void deliver_all(const Messages& messages, const Faults& faults);
  void put_in_line(Sent sent, bool is_swapped);

  Scenario scenario_;
  std::optional<Service> service_;
  size_t position_ = 0;  // of the statement that waits
  int64_t waiting_since_ = 0;
  bool was_late_ = false;  // of the statement that waits
  bool is_strict_ = false;
  std::vector<Rule> rules_;
  // The request that was expected last, and what the service says to it.
  std::unique_ptr<google::protobuf::Message> request_;
  Messages said_;
  std::deque<Sent> line_;          // in the order of their times
  std::optional<Sent> held_back_;  // until the next one
};

}  // namespace testkit

#endif
