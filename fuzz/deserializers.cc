// Any bytes into any deserializer: it succeeds exactly where the message's class takes all of them,
// hands out what the class reads in them, and otherwise touches no output.

#include "support/deserializers.h"

#include <google/protobuf/io/coded_stream.h>

#include <algorithm>
#include <type_traits>

#include "observation.h"
#include "support/agreement.h"
#include "target.h"

namespace fuzz {
namespace {

using google::protobuf::io::CodedInputStream;

// How a function's calls begin and end.
struct Frame {
  std::string function;
  std::vector<LogLine> entry;
  bool has_exit = true;
  bool releases_stream = false;  // after a success
};

Frame frame_of(const std::string& function) {
  Frame frame = {function, {{kWarn, function + ": start"}}};
  if (function == "channel_auth_reply_deserialize") {
    frame.entry = {{kWarn, function + " start"}};
    frame.has_exit = false;
    frame.releases_stream = true;
  } else if (function == "client_echo_deserialize") {
    frame.entry = {{kWarn, function + " start"}};
    frame.releases_stream = true;
  } else if (function == "create_chatroom_reply_deserialize") {
    frame.entry = {{kWarn, function + ": enter"}};
  } else if (function == "forward_online_message_get_deserialize") {
    frame.entry = {{kError, "check "}, {kWarn, function + ": start"}};
  }
  return frame;
}

// Fails unless these are the lines of a success: the entry first, the exit last, and neither an
// error nor another exit between them.
void check_lines_of_success(const Frame& frame, const std::vector<LogLine>& lines) {
  const LogLine exit = {kWarn, frame.function + ": exit"};
  if (lines.size() < frame.entry.size() ||
      !std::equal(frame.entry.begin(), frame.entry.end(), lines.begin())) {
    fail("another entry line");
  }
  if (frame.has_exit && !(lines.back() == exit)) {
    fail("no exit line after a success");
  }
  const size_t end = lines.size() - (frame.has_exit ? 1 : 0);
  for (size_t i = frame.entry.size(); i < end; ++i) {
    if (lines[i].text.find("error") != std::string::npos || lines[i].text == exit.text) {
      fail("a line that does not belong to a success: " + lines[i].text);
    }
  }
}

void check_lines_of_failure(const Frame& frame, const std::vector<LogLine>& lines, bool parsed,
                            bool consumed) {
  std::vector<LogLine> expected = frame.entry;
  if (!parsed) {
    expected.push_back({kError, "merge error : Could not parse the received data!"});
  }
  if (!consumed) {
    expected.push_back({kError, "ConsumedEntireMessage error :Could not parse the received data"});
  }
  if (!(lines == expected)) {
    fail("other lines than a failure's: " + std::to_string(lines.size()) + " instead of " +
         std::to_string(expected.size()));
  }
}

// Calls the function and compares everything that it did.
template <typename Outputs, typename Message>
void check(const Frame& frame, const std::string& bytes) {
  Outputs outputs;
  Message message;
  CodedInputStream stream(reinterpret_cast<const unsigned char*>(bytes.data()),
                          static_cast<int>(bytes.size()));
  const bool parsed = message.ParseFromCodedStream(&stream);
  const bool consumed = stream.ConsumedEntireMessage();
  const bool succeeds = parsed && consumed;

  const LogWatch log(frame.function);
  StreamWatch watch;
  outputs.read(bytes);
  const bool kept_stream = watch.release();

  if (succeeds) {
    const std::string difference = support::disagreement(outputs, message);
    if (!difference.empty()) {
      fail(difference + "message: " + message.ShortDebugString());
    }
    check_lines_of_success(frame, log.lines());
  } else {
    if (!outputs.untouched()) {
      fail("an output was written although the call failed");
    }
    check_lines_of_failure(frame, log.lines(), parsed, consumed);
  }
  if (kept_stream == (succeeds && frame.releases_stream)) {
    fail(kept_stream ? "the stream was kept" : "the stream was released");
  }
}

// Of a caller that brings no record.
struct OutputsWithoutRecord : support::ForwardOnlineMessageOutputs {
  OutputsWithoutRecord() { entry = nullptr; }
  bool untouched() {
    const bool is_entry_untouched = entry == nullptr;
    entry = &record;
    return is_entry_untouched && ForwardOnlineMessageOutputs::untouched();
  }
};

template <typename Outputs, typename Message>
Target target(const support::Deserializer<Outputs, Message>& deserializer) {
  const Frame frame = frame_of(deserializer.name);
  return {deserializer.name, [frame](const std::string& bytes) {
            check<Outputs, Message>(frame, bytes);
            if constexpr (std::is_same_v<Outputs, support::ForwardOnlineMessageOutputs>) {
              check<OutputsWithoutRecord, Message>(frame, bytes);
            }
          }};
}

}  // namespace

std::vector<Target> deserializer_targets() {
  return std::apply([](const auto&... each) { return std::vector<Target>{target(each)...}; },
                    support::kDeserializers);
}

}  // namespace fuzz
