// Repeats a recorded session.
#ifndef TESTKIT_REPLAY_H
#define TESTKIT_REPLAY_H

#include <cstdint>
#include <deque>
#include <set>
#include <string>
#include <vector>

#include "player.h"
#include "session.h"

namespace testkit {

// Expects the messages that were sent then, and delivers those that were received, at once.
class Replay : public Player {
 public:
  // The names of fields are not compared.
  Replay(std::vector<Step> session, std::set<std::string> ignored);

 private:
  void take(const google::protobuf::Message& message) override;
  std::optional<Delivery> next_due() override;
  int64_t next_time() const override { return line_.empty() ? -1 : now(); }
  void time_passed() override {}
  void finish() override;

  void play();
  const Step* expected() const;

  std::vector<Step> steps_;
  std::set<std::string> ignored_;
  size_t position_ = 0;  // of the message that the plug-in has to send
  std::deque<Delivery> line_;
};

}  // namespace testkit

#endif
