#include "player.h"

#include <algorithm>
#include <limits>
#include <memory>

#include "messages.h"

namespace testkit {

void Player::sent(const std::string& name, const std::string& bytes) {
  if (is_over_) {
    return;
  }
  ++messages_;
  const auto* type = message_type(name);
  if (type == nullptr) {
    report_.add("Message " + std::to_string(messages_) + " of the plug-in has a name " +
                quoted_name(name) + ", which is that of no message.");
    return;
  }
  const std::unique_ptr<google::protobuf::Message> message = new_message(*type);
  if (!message->ParseFromString(bytes)) {
    report_.add(subject(*message), "cannot be read",
                {"its bytes are broken, or those of another message"});
    return;
  }
  if (const auto* auth = dynamic_cast<const ChannelAuthRequest*>(message.get())) {
    report_.secrets.add(auth->accesstoken());
  }
  take(*message);
}

std::optional<Delivery> Player::next() {
  return is_over_ || report_.is_full() ? std::nullopt : next_due();
}

int64_t Player::next_after() const {
  const int64_t time = is_over_ || report_.is_full() ? -1 : next_time();
  return time < 0 ? -1 : std::max<int64_t>(time - now_, 0);
}

void Player::wait(int64_t milliseconds) {
  if (!is_over_ && milliseconds > 0) {
    now_ += std::min(milliseconds, std::numeric_limits<int64_t>::max() - now_);
    time_passed();
  }
}

void Player::end() {
  if (!is_over_) {
    finish();
    is_over_ = true;
  }
}

}  // namespace testkit
