#include "replay.h"

#include <algorithm>
#include <utility>

#include "messages.h"
#include "notation.h"

namespace testkit {
namespace {

using google::protobuf::FieldDescriptor;
using google::protobuf::Message;
using google::protobuf::Reflection;

constexpr char kId[] = "requestId";

// Of a login, or null.
const std::string* token_of(const Message& message) {
  const auto* login = dynamic_cast<const ChannelAuthRequest*>(&message);
  return login != nullptr && !login->accesstoken().empty() ? &login->accesstoken() : nullptr;
}

bool is_mask(const std::string& token) {
  return token.find_first_not_of('*') == std::string::npos;
}

std::string masked(std::string text, const Masks& masks) {
  for (const auto& [token, mask] : masks) {
    text = replaced(std::move(text), token, mask);
  }
  return text;
}

// In all texts of the message. The schema has no lists of texts.
void mask_in(Message* message, const Masks& masks) {
  const Reflection& fields = *message->GetReflection();
  std::vector<const FieldDescriptor*> filled;
  fields.ListFields(*message, &filled);
  for (const FieldDescriptor* field : filled) {
    const bool is_list = field->is_repeated();
    if (field->cpp_type() == FieldDescriptor::CPPTYPE_STRING && !is_list) {
      fields.SetString(message, field, masked(fields.GetString(*message, field), masks));
    } else if (field->message_type() != nullptr) {
      for (int i = 0; i < (is_list ? fields.FieldSize(*message, field) : 1); ++i) {
        mask_in(is_list ? fields.MutableRepeatedMessage(message, field, i)
                        : fields.MutableMessage(message, field),
                masks);
      }
    }
  }
}

bool is_field(const std::string& name) {
  const auto& schema = *ChannelAuthRequest::descriptor()->file();
  for (int i = 0; i < schema.message_type_count(); ++i) {
    if (schema.message_type(i)->FindFieldByName(name) != nullptr) {
      return true;
    }
  }
  return false;
}

}  // namespace

Replay::Replay(std::vector<Step> session, std::set<std::string> ignored)
    : steps_(std::move(session)), ignored_(std::move(ignored)) {
  for (const std::string& name : ignored_) {
    if (!is_field(name)) {
      throw Unreadable{"there is no field " + quoted_name(name)};
    }
  }
  for (const Step& step : steps_) {
    const std::string* token = step.was_sent ? token_of(*step.message.fields) : nullptr;
    if (token != nullptr && !is_mask(*token)) {
      wrong().secrets.add(*token);
    }
  }
  play();
}

// Up to the next message that the plug-in has to send.
void Replay::play() {
  for (; position_ < steps_.size() && !steps_[position_].was_sent; ++position_) {
    line_.push_back({steps_[position_].type->name(), bytes_now(steps_[position_])});
  }
}

std::string Replay::bytes_now(const Step& step) const {
  const auto message = new_message(*step.type);
  if (!message->ParseFromString(step.bytes) || !has(*message, kId)) {
    return step.bytes;
  }
  const int64_t id = number_in(*message, kId);
  const auto id_now = ids_.find({step.type, id});
  if (id_now == ids_.end() || id_now->second == id) {
    return step.bytes;
  }
  set_number(message.get(), kId, id_now->second);
  return message->SerializeAsString();
}

std::unique_ptr<Message> Replay::as_recorded(const Step& step, const Message& message) {
  std::unique_ptr<Message> result = copy_of(message);
  take_over_id(step, result.get());
  mask_in(result.get(), masks_for(step, message));
  return result;
}

void Replay::take_over_id(const Step& step, Message* message) {
  const Message& recorded = *step.message.fields;
  const bool is_request = is_from_plugin(*step.type) && !is_reply(*step.type);
  if (is_request && has(recorded, kId) && has(*message, kId)) {
    const int64_t id = number_in(recorded, kId);
    ids_[{reply_type(*step.type), id}] = number_in(*message, kId);
    set_number(message, kId, id);
  }
}

// A short token is masked in its login alone, as the recorder does.
Masks Replay::masks_for(const Step& step, const Message& message) {
  Masks masks = masks_;
  const std::string* token = token_of(message);
  const std::string* mask = token_of(*step.message.fields);
  if (token != nullptr && mask != nullptr && is_mask(*mask)) {
    masks[*token] = *mask;
    if (std::min(token->size(), mask->size()) >= Secrets::kLeast) {
      masks_ = masks;
    }
  }
  return masks;
}

const Step* Replay::expected() const {
  return position_ < steps_.size() ? &steps_[position_] : nullptr;
}

void Replay::take(const Message& message) {
  const Step* step = expected();
  if (step == nullptr || step->type != message.GetDescriptor()) {
    wrong().add(subject(message), "is not expected",
                {step == nullptr ? "the session is over"
                                 : step->where + " expects " + with_article(step->type->name())});
    return;
  }
  wrong().add(
      subject(message), "is not what " + step->where + " expects",
      differences(step->message, *as_recorded(*step, message), wrong().secrets, true, ignored_));
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
