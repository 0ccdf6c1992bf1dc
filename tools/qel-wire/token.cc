#include "token.h"

#include <google/protobuf/io/coded_stream.h>
#include <google/protobuf/wire_format_lite.h>

#include <algorithm>
#include <utility>

#include "msgspec_frontend.pb.h"
#include "text.h"
#include "walk.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::internal::WireFormatLite;
using google::protobuf::io::CodedOutputStream;

// So many characters in a row may be a piece of a token.
constexpr size_t kFewestCharacters = 4;

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

// A time of this century, in milliseconds.
bool is_plausible_time(uint64_t value) {
  return value > 946684800000 && value < 4102444800000;
}

// Finds what is hidden.
class Search : public Visitor {
 public:
  Search(std::string_view bytes, const Descriptor& type) : bytes_(bytes), levels_(1) {
    levels_.back().type = &type;
    hide_if_all_characters(0, bytes.size());
  }

  void begin(const Piece& piece) override {
    is_clean_ = is_clean_ && piece.is_known && piece.kind != Piece::kPacked &&
                !piece.earlier.has_value() && !piece.is_late && !piece.is_short();
    if (piece.is_container()) {
      levels_.emplace_back();
    }
    switch (piece.kind) {
      case Piece::kMessage:
        levels_.back().type = piece.field->message_type();
        hide_if_all_characters(piece.value_offset, piece.end);
        return;
      case Piece::kVarint:
        levels_.back().note_number(piece);
        return;
      case Piece::kBytes:
        if (is_token(piece) || may_be_request(piece)) {
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
    // What damage makes of a request may be read whole, but has no token where it belongs.
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
        has_plausible_time |= is_time && is_plausible_time(piece.value);
      }
    }

    // A request without appId looks like an entry, but an entry tells when it was sent.
    bool may_be_request() const {
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

  // Whether a text may hold a request, or be the token of one that is read as another message.
  bool may_be_request(const Piece& piece) const {
    if (!is_typed(piece.bytes)) {
      return has_telling_run(piece.bytes);
    }
    return piece.number == InboxEntry::kChatMsgFieldNumber && levels_.back().may_be_request();
  }

  // Of a message: the end of a token may begin with what looks like a field.
  void hide_if_all_characters(size_t begin, size_t end) {
    const Run run = characters_at(bytes_.substr(begin, end - begin));
    if (run.is_telling() && run.bytes == end - begin) {
      hide(begin, end);
    }
  }

  void hide(size_t begin, size_t end) {
    hidden_.resize(bytes_.size());
    std::fill(hidden_.begin() + static_cast<std::ptrdiff_t>(begin),
              hidden_.begin() + static_cast<std::ptrdiff_t>(end), true);
  }

  std::string_view bytes_;
  std::vector<bool> hidden_;
  bool is_clean_ = true;  // as an encoder writes it
  bool has_token_ = false;
  std::vector<Level> levels_;  // of nesting
};

// Writes the fields again, but for what is hidden.
class Censor : public Visitor {
 public:
  Censor(std::string_view bytes, const Hidden& hidden)
      : bytes_(bytes), hidden_(hidden), contents_(1) {}

  void begin(const Piece& piece) override {
    const bool is_text = piece.kind == Piece::kBytes;
    const size_t head_end = piece.is_container() ? piece.value_offset : piece.end;
    const bool is_left_out = !is_text && hidden_.any(piece.offset, head_end);
    left_out_ += is_left_out ? 1 : 0;
    if (piece.is_container()) {
      contents_.push_back({is_left_out, {}});
    } else if (is_text && hidden_.any(piece.value_offset, piece.end)) {
      append_with_length(piece.number, kNotShown);
    } else if (!is_left_out) {
      append(piece.offset, piece.end);
    }
  }

  void end(const Piece& piece) override {
    const Content content = std::move(contents_.back());
    contents_.pop_back();
    if (content.is_left_out) {
      return;
    }
    if (piece.kind == Piece::kGroup) {
      append(piece.offset, piece.value_offset);
      contents_.back().bytes += content.bytes;
      append(piece.end_tag, piece.end);
    } else {
      append_with_length(piece.number, content.bytes);
    }
  }

  Censored result() && { return {std::move(contents_.front().bytes), left_out_}; }

 private:
  struct Content {
    bool is_left_out = false;
    std::string bytes;
  };

  void append(size_t begin, size_t end) {
    contents_.back().bytes += bytes_.substr(begin, end - begin);
  }

  void append_with_length(uint32_t number, std::string_view value) {
    google::protobuf::uint8 head[20];
    auto* end = CodedOutputStream::WriteTagToArray(
        WireFormatLite::MakeTag(static_cast<int>(number),
                                WireFormatLite::WIRETYPE_LENGTH_DELIMITED),
        head);
    end = CodedOutputStream::WriteVarint32ToArray(static_cast<uint32_t>(value.size()), end);
    contents_.back().bytes.append(head, end).append(value);
  }

  std::string_view bytes_;
  const Hidden& hidden_;
  std::vector<Content> contents_;
  size_t left_out_ = 0;
};

}  // namespace

Hidden::Hidden(std::string_view bytes, const Descriptor& type) {
  Search search(bytes, type);
  const bool is_whole = !walk(bytes, type, &search).has_value();
  hidden_ = std::move(search).found(is_whole);
}

bool Hidden::any(size_t begin, size_t end) const {
  for (size_t at = begin; at < end; ++at) {
    if (this->at(at)) {
      return true;
    }
  }
  return false;
}

Censored censored(std::string_view bytes, const Descriptor& type, const Hidden& hidden) {
  Censor censor(bytes, hidden);
  walk(bytes, type, &censor);
  return std::move(censor).result();
}

}  // namespace qel_wire
