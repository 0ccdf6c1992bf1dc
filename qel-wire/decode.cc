#include "decode.h"

#include <google/protobuf/io/coded_stream.h>
#include <google/protobuf/message.h>

#include <limits>
#include <memory>
#include <stdexcept>

#include "forms.h"
#include "schema.h"
#include "token.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::Message;
using google::protobuf::io::CodedInputStream;

// Looks for fields that no encoder writes there.
class Order : public Visitor {
 public:
  void begin(const Piece& piece) override {
    const bool is_odd = piece.earlier.has_value() || piece.is_late;
    if (is_odd && count_++ == 0) {
      first_ = piece;
    }
  }

  std::optional<std::string> note() const {
    if (count_ == 0) {
      return std::nullopt;
    }
    return counted(count_, "field") + " again or out of order, the first at offset " +
           std::to_string(first_.offset) +
           ": these may be two messages, of which the later one's values are kept ('qel-wire "
           "explain' marks them)";
  }

 private:
  size_t count_ = 0;
  Piece first_;
};

std::unique_ptr<Message> parsed(std::string_view bytes, const Descriptor& type) {
  std::unique_ptr<Message> message = new_message(type);
  CodedInputStream stream(reinterpret_cast<const google::protobuf::uint8*>(bytes.data()),
                          static_cast<int>(bytes.size()));
  // What stands for hidden texts may be longer than they.
  stream.SetTotalBytesLimit(std::numeric_limits<int>::max(), -1);
  if (!message->ParseFromCodedStream(&stream)) {
    throw std::logic_error("the message's class does not take what was read");
  }
  return message;
}

}  // namespace

Decoded decode(std::string_view bytes, const Descriptor& type, const DecodeOptions& options) {
  Decoded result;
  Order order;
  result.problem = walk(bytes, type, &order);
  if (result.problem.has_value()) {
    return result;
  }
  if (const auto note = order.note()) {
    result.notes.push_back(*note);
  }
  const Hidden hidden = options.show_token ? Hidden() : Hidden(bytes, type);
  const Censored shown = censored(bytes, type, hidden);
  if (shown.left_out > 0) {
    result.notes.push_back("without " + counted(shown.left_out, "field") +
                           " that may be a piece of an access token: --show-token shows them");
  }
  const auto message = parsed(shown.bytes, type);
  if (!options.as_json) {
    result.text = text_form(*message, options.colours);
    return result;
  }
  result.text = json_form(*message, options.colours);
  if (const int unknown = unknown_fields(*message)) {
    result.notes.push_back("without " + counted(static_cast<size_t>(unknown), "unknown field") +
                           ", which JSON has no place for");
  }
  return result;
}

}  // namespace qel_wire
