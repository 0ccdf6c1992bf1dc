// Repeats a recorded session.
#ifndef TESTKIT_REPLAY_H
#define TESTKIT_REPLAY_H

#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "player.h"
#include "session.h"

namespace testkit {

// The asterisks of the session by the access tokens that stand there now.
using Masks = std::map<std::string, std::string>;

// Expects the messages that were sent then, and delivers those that were received, at once.
class Replay : public Player {
 public:
  // The fields of these names are not compared. Throws Unreadable if there is no such field.
  Replay(std::vector<Step> session, std::set<std::string> ignored);

 private:
  void take(const google::protobuf::Message& message) override;
  std::optional<Delivery> next_due() override;
  int64_t next_time() const override { return line_.empty() ? -1 : now(); }
  void time_passed() override {}
  void finish() override;

  void play();
  // Those of a received message. A reply has the requestId that the request has now.
  std::string bytes_now(const Step& step) const;
  // What may differ from the step's is as it was then: a request's id, and the access token. Both
  // are remembered.
  std::unique_ptr<google::protobuf::Message> as_recorded(const Step& step,
                                                         const google::protobuf::Message& message);
  void take_over_id(const Step& step, google::protobuf::Message* message);
  Masks masks_for(const Step& step, const google::protobuf::Message& message);
  const Step* expected() const;

  std::vector<Step> steps_;
  std::set<std::string> ignored_;
  size_t position_ = 0;  // of the message that the plug-in has to send
  std::deque<Delivery> line_;
  // Of the requests: now, by the type of their replies and the id of then.
  std::map<std::pair<const google::protobuf::Descriptor*, int64_t>, int64_t> ids_;
  Masks masks_;
};

}  // namespace testkit

#endif
