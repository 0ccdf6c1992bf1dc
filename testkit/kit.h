// Plays a scenario with a service.
#ifndef TESTKIT_KIT_H
#define TESTKIT_KIT_H

#include <google/protobuf/message.h>

#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "scenario.h"
#include "service.h"

namespace testkit {

struct Delivery {
  std::string name;
  std::string bytes;
  int64_t due;  // when, on the kit's clock
  // What the plug-in has to answer, if it comes to it as it should.
  std::shared_ptr<google::protobuf::Message> message;
};

class Kit {
 public:
  // Throws Misread.
  explicit Kit(const std::string& scenario);
  // Of a session: nobody answers but the statements. The names of fields are not compared.
  Kit(std::vector<Statement> session, std::set<std::string> ignored);

  void sent(const std::string& name, const std::string& bytes);
  // What is due, or nothing.
  std::optional<Delivery> next();
  // When there will be something, or -1.
  int64_t next_after() const;
  void wait(int64_t milliseconds);
  void end();
  const std::string& report() const { return report_; }

 private:
  // A statement that holds from now on.
  struct Rule {
    const Statement* statement;
    int64_t since;
    int count;
  };

  // An empty sentence counts only.
  void complain(const std::string& sentence);
  std::string without_tokens(std::string text) const;
  void hide(const std::string& token);
  void complain_of(const google::protobuf::Message& message, const std::string& what,
                   const std::vector<std::string>& reasons);
  void play();
  void meet(const google::protobuf::Message& message, Messages said);
  void count(const google::protobuf::Message& message, bool is_counted, Rule* rule);
  void check_rules(const google::protobuf::Message& message);
  const Statement* expected() const;
  void answer(const Statement& statement);
  void push(const Statement& statement);
  void deliver(const google::protobuf::Message& message, const Faults& faults);
  void deliver_all(const Messages& messages, const Faults& faults);
  void put_in_line(Delivery delivery, bool is_swapped);

  Scenario scenario_;
  std::set<std::string> ignored_;
  std::optional<Service> service_;  // not of a session
  size_t position_ = 0;             // of the statement that waits
  int64_t now_ = 0;                 // milliseconds from the beginning
  int64_t waiting_since_ = 0;
  bool was_late_ = false;  // of the statement that waits
  bool is_strict_ = false;
  bool is_over_ = false;
  std::vector<Rule> rules_;
  // The request that was expected last, and what the service says to it.
  std::unique_ptr<google::protobuf::Message> request_;
  Messages said_;
  std::deque<Delivery> line_;          // in the order of their times
  std::optional<Delivery> held_back_;  // until the next one
  std::set<std::string> tokens_;       // not to be shown
  int messages_ = 0;                   // of the plug-in
  int complaints_ = 0;
  std::string report_;
};

}  // namespace testkit

#endif
