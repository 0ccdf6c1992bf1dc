// What a plug-in talks to in a test: a scenario with the service, or a recorded session.
#ifndef TESTKIT_PLAYER_H
#define TESTKIT_PLAYER_H

#include <google/protobuf/message.h>

#include <cstdint>
#include <optional>
#include <string>

#include "report.h"

namespace testkit {

struct Delivery {
  std::string name;
  std::string bytes;
};

class Player {
 public:
  virtual ~Player() = default;
  Player() = default;
  Player(const Player&) = delete;
  Player& operator=(const Player&) = delete;

  void sent(const std::string& name, const std::string& bytes);
  // What is due, or nothing.
  std::optional<Delivery> next();
  // When there will be something, or -1.
  int64_t next_after() const;
  void wait(int64_t milliseconds);
  void end();
  std::string report() const { return report_.text(); }

 protected:
  Subject subject(const google::protobuf::Message& message) const {
    return {messages_, message.GetDescriptor()};
  }
  int64_t now() const { return now_; }  // milliseconds from the beginning
  Report& wrong() { return report_; }

 private:
  virtual void take(const google::protobuf::Message& message) = 0;
  virtual std::optional<Delivery> next_due() = 0;
  // When something is due on the player's clock, or -1.
  virtual int64_t next_time() const = 0;
  virtual void time_passed() = 0;
  // Complains of what is missing.
  virtual void finish() = 0;

  Report report_;
  int64_t now_ = 0;
  int messages_ = 0;  // of the plug-in
  bool is_over_ = false;
};

}  // namespace testkit

#endif
