#include "token.h"

#include <google/protobuf/wire_format_lite.h>

#include <algorithm>
#include <utility>

#include "msgspec_frontend.pb.h"
#include "text.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::FieldDescriptor;
using google::protobuf::internal::WireFormatLite;

// So many characters in a row may be a piece of a token.
constexpr size_t kFewestCharacters = 4;

// A request whose numbers are small may be nothing but characters, but is no longer.
constexpr size_t kLongestSmallRequest = 11;

struct Run {
  size_t characters = 0;
  size_t bytes = 0;

  bool is_telling() const { return characters >= kFewestCharacters; }
};

// The characters that the bytes begin with, up to what is none or is a control character.
Run characters_at(std::string_view bytes) {
  Run run;
  while (const size_t size = size_of_character(bytes.substr(run.bytes))) {
    ++run.characters;
    run.bytes += size;
  }
  return run;
}

// Calls take(begin, end) for each run of characters that is long enough to tell something.
template <typename Take>
void for_each_telling_run(std::string_view bytes, Take take) {
  for (size_t at = 0; at < bytes.size();) {
    const Run run = characters_at(bytes.substr(at));
    if (run.is_telling()) {
      take(at, at + run.bytes);
    }
    at += std::max<size_t>(run.bytes, 1);
  }
}

bool has_telling_run(std::string_view bytes) {
  bool found = false;
  for_each_telling_run(bytes, [&](size_t /*begin*/, size_t /*end*/) { found = true; });
  return found;
}

// Whether it may have been typed: UTF-8 without control characters but those of lines and columns.
bool is_typed(std::string_view text) {
  return is_utf8(text) && std::none_of(text.begin(), text.end(), [](char c) {
           const auto byte = static_cast<unsigned char>(c);
           return byte == 0x7f || (byte < 0x20 && c != '\t' && c != '\n' && c != '\r');
         });
}

// Finds what is hidden.
class Search : public Visitor {
 public:
  Search(std::string_view bytes, const Descriptor& type) : bytes_(bytes), levels_(1) {
    levels_.back().type = &type;
    if (may_be_end_of_token(bytes, type)) {
      hide(0, bytes.size());
    }
  }

  void begin(const Piece& piece) override {
    is_clean_ = is_clean_ && piece.is_known && !piece.is_odd();
    if (piece.is_container()) {
      levels_.emplace_back();
    }
    switch (piece.kind) {
      case Piece::kMessage:
        levels_.back().type = piece.field->message_type();
        return;
      case Piece::kVarint:
        levels_.back().note_number(piece);
        return;
      case Piece::kBytes:
        if (is_token(piece) || may_hold_token(piece)) {
          hide(piece.value_offset, piece.end);
        }
        return;
      default:
        return;
    }
  }

  void end(const Piece& /*piece*/) override { levels_.pop_back(); }

  // To be called after the walk.
  std::vector<bool> found(bool is_whole) && {
    // A request whose token has become another field by damage has no token.
    const bool lacks_token =
        levels_.front().type == ChannelAuthRequest::descriptor() && !has_token_;
    if (!is_whole || !is_clean_ || lacks_token) {
      for_each_telling_run(bytes_, [this](size_t begin, size_t end) { hide(begin, end); });
    }
    return std::move(hidden_);
  }

 private:
  struct Level {
    const Descriptor* type = nullptr;  // of a message
    bool has_receiver = false;
    bool has_time = false;
    bool has_plausible_time = false;

    void note_number(const Piece& piece) {
      if (type == InboxEntry::descriptor()) {
        const bool is_time = piece.number == InboxEntry::kSentTimeFieldNumber;
        has_receiver |= piece.number == InboxEntry::kReceiverFieldNumber;
        has_time |= is_time;
        has_plausible_time |= is_time && is_plausible_time(static_cast<int64_t>(piece.value));
      }
    }

    // A request without appId has the fields of an entry, but no time at which it was sent.
    bool looks_like_request() const {
      return type == InboxEntry::descriptor() && !has_plausible_time && !(has_time && has_receiver);
    }
  };

  bool is_token(const Piece& piece) {
    const bool is_token =
        piece.number == ChannelAuthRequest::kAccessTokenFieldNumber &&
        (!piece.is_known || piece.field->containing_type() == ChannelAuthRequest::descriptor());
    has_token_ |= is_token && !piece.bytes.empty();
    return is_token;
  }

  // Whether a text may hold a whole request, or be the token of a request that is read as an entry.
  bool may_hold_token(const Piece& piece) const {
    if (!is_typed(piece.bytes)) {
      return has_telling_run(piece.bytes);
    }
    return piece.number == InboxEntry::kChatMsgFieldNumber && levels_.back().looks_like_request();
  }

  // Whether the bytes, tags and lengths included, are rather the end of a token.
  static bool may_be_end_of_token(std::string_view bytes, const Descriptor& type) {
    const Run run = characters_at(bytes);
    if (!run.is_telling() || run.bytes != bytes.size()) {
      return false;
    }
    const FieldDescriptor* request_id = type.FindFieldByName("requestId");
    const bool begins_with_it =
        request_id != nullptr &&
        static_cast<unsigned char>(bytes[0]) ==
            WireFormatLite::MakeTag(request_id->number(), WireFormatLite::WIRETYPE_VARINT);
    return !begins_with_it || bytes.size() > kLongestSmallRequest;
  }

  void hide(size_t begin, size_t end) {
    hidden_.resize(bytes_.size());
    std::fill(hidden_.begin() + static_cast<std::ptrdiff_t>(begin),
              hidden_.begin() + static_cast<std::ptrdiff_t>(end), true);
  }

  std::string_view bytes_;
  std::vector<bool> hidden_;
  bool is_clean_ = true;  // known fields alone, in their order
  bool has_token_ = false;
  std::vector<Level> levels_;  // of nesting
};

}  // namespace

Hidden::Hidden(std::string_view bytes, const Descriptor& type, bool show_token) {
  if (show_token) {
    return;
  }
  Search search(bytes, type);
  const bool is_whole = !walk(bytes, type, &search).has_value();
  hidden_ = std::move(search).found(is_whole);
}

bool Hidden::hides(const Piece& piece) const {
  // A tag alone, behind a text, tells one character at the most; but groups are nothing but tags.
  const bool is_tag_shown = piece.kind != Piece::kGroup && !piece.is_element();
  return any(
      piece.kind == Piece::kBytes ? piece.value_offset : piece.offset + (is_tag_shown ? 1 : 0),
      piece.is_container() ? piece.value_offset : piece.end);
}

bool Hidden::hides_end(const Piece& piece) const {
  return any(piece.end_tag, piece.end);
}

bool Hidden::any(size_t begin, size_t end) const {
  if (hidden_.empty()) {
    return false;
  }
  const auto last = hidden_.begin() + static_cast<std::ptrdiff_t>(end);
  return std::find(hidden_.begin() + static_cast<std::ptrdiff_t>(begin), last, true) != last;
}

}  // namespace qel_wire
