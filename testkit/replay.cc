#include "replay.h"

#include <utility>

#include "messages.h"
#include "notation.h"

namespace testkit {
namespace {

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

Replay::Replay(std::vector<Step> session, std::set<std::string> ignored)
    : steps_(std::move(session)), ignored_(std::move(ignored)) {
  for (Step& step : steps_) {
    if (step.was_sent) {
      forget_masked_token(&step.message);
    }
  }
  play();
}

// Up to the next message that the plug-in has to send.
void Replay::play() {
  for (; position_ < steps_.size() && !steps_[position_].was_sent; ++position_) {
    line_.push_back({steps_[position_].type->name(), steps_[position_].bytes});
  }
}

const Step* Replay::expected() const {
  return position_ < steps_.size() ? &steps_[position_] : nullptr;
}

void Replay::take(const google::protobuf::Message& message) {
  const Step* step = expected();
  if (step == nullptr || step->type != message.GetDescriptor()) {
    wrong().add(subject(message), "is not expected",
                {step == nullptr ? "the session is over"
                                 : step->where + " expects " + with_article(step->type->name())});
    return;
  }
  wrong().add(subject(message), "is not what " + step->where + " expects",
              differences(step->message, message, wrong().secrets, true, ignored_));
  ++position_;
  play();
}

std::optional<Delivery> Replay::next_due() {
  if (line_.empty()) {
    return std::nullopt;
  }
  Delivery delivery = std::move(line_.front());
  line_.pop_front();
  return delivery;
}

void Replay::finish() {
  if (const Step* step = expected()) {
    wrong().add(with_capital(step->where) + " expects " + with_article(step->type->name()) +
                ", which never came.");
  }
}

}  // namespace testkit
