// Any bytes into qel-wire. As a message of the schema that the first byte chooses: what it reads
// from them is what the message's class reads, what it prints is fit for a terminal, and is taken
// back. And as what people have: hex, streams of messages, captures of packets.

#include <google/protobuf/descriptor.h>
#include <google/protobuf/message.h>

#include <memory>
#include <nlohmann/json.hpp>
#include <sstream>
#include <vector>

#include "decode.h"
#include "encode.h"
#include "explain.h"
#include "failure.h"
#include "framing.h"
#include "guess.h"
#include "misread.h"
#include "notation.h"
#include "packets.h"
#include "pcap_file.h"
#include "print.h"
#include "recording.h"
#include "session.h"
#include "target.h"
#include "text.h"
#include "token.h"
#include "walk.h"

namespace fuzz {
namespace {

using google::protobuf::Descriptor;
using google::protobuf::Message;
using qel_wire::Notation;

// Nothing that a terminal obeys or cannot show, but the ends of lines.
void expect_fit_for_terminals(const std::string& text) {
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    if (qel_wire::readable(line) != line) {
      fail("not fit for a terminal: " + qel_wire::readable(line));
    }
  }
}

// Bytes that are written so are read again, and anything else is refused or read.
void check_notation(const std::string& input, Notation notation) {
  if (qel_wire::from_notation(qel_wire::to_notation(input, notation), notation) != input) {
    fail("a notation is not read as it was written");
  }
  try {
    qel_wire::from_notation(input, notation);
  } catch (const qel_wire::Misread& misread) {
    expect_fit_for_terminals(misread.text());
  }
}

// Every byte is in one line.
void expect_all_explained(std::string_view bytes, const Descriptor& type) {
  qel_wire::ExplainOptions options;
  options.as_json = true;
  std::ostringstream explanation;
  qel_wire::explain(bytes, type, options, &explanation);
  expect_fit_for_terminals(explanation.str());
  size_t end = 0;
  std::istringstream lines(explanation.str());
  for (std::string text; std::getline(lines, text);) {
    const auto line = nlohmann::json::parse(text);
    if (line["offset"] != end) {
      fail("a byte is explained twice or never: " + text);
    }
    end = line["end"];
  }
  if (end != bytes.size()) {
    fail("the last bytes are not explained");
  }
}

// Of broken bytes, the fields before the place.
void check_partial(const std::string& bytes, const Message& message, size_t readable) {
  const std::unique_ptr<Message> beginning(message.New());
  if (!beginning->ParseFromString(bytes.substr(0, readable))) {
    fail("what comes before the place is broken, too");
  }
}

// What decode writes, encode takes. JSON has no unknown fields, and no texts that are no UTF-8.
void check_there_and_back(const std::string& bytes, Message* message) {
  const Descriptor& type = *message->GetDescriptor();
  for (const auto form : {qel_wire::BytesForm::kUsual, qel_wire::BytesForm::kHex}) {
    const qel_wire::Colours none(false);
    std::ostringstream text;
    qel_wire::print_text(bytes, type, qel_wire::Hidden(), form, none, &text);
    expect_fit_for_terminals(text.str());
    const std::unique_ptr<Message> again(message->New());
    if (text.str().find(qel_wire::kNotShown) == std::string::npos) {
      qel_wire::parse_text(text.str(), again.get());
      if (again->SerializeAsString() != message->SerializeAsString()) {
        fail("the text form is not taken back:\n" + text.str());
      }
    }
    std::ostringstream json;
    const auto lost = qel_wire::print_json(bytes, type, qel_wire::Hidden(), form, none, &json);
    expect_fit_for_terminals(json.str());
    if (lost.unknown == 0 && lost.replaced == 0 &&
        text.str().find(qel_wire::kNotShown) == std::string::npos) {
      again->Clear();
      qel_wire::parse_json(json.str(), form, again.get());
      if (again->SerializeAsString() != message->SerializeAsString()) {
        fail("JSON is not taken back:\n" + json.str());
      }
    }
  }
}

void take_any_text(const std::string& text, Message* message) {
  try {
    qel_wire::parse_text(text, message);
  } catch (const qel_wire::Misread& misread) {
    expect_fit_for_terminals(qel_wire::readable(misread.text()));
  }
  try {
    message->Clear();
    qel_wire::parse_json(text, qel_wire::BytesForm::kUsual, message);
  } catch (const qel_wire::Misread& misread) {
    expect_fit_for_terminals(qel_wire::readable(misread.text()));
  }
}

// Each frame lies behind the one before it, and all of a run is in one of them.
void check_frames(const std::string& input, const std::string& frames) {
  size_t end = 0;
  size_t sum = 0;
  qel_wire::cut(input, frames, [&](const qel_wire::Frame& frame) {
    if (frame.offset < end || frame.size > input.size() - frame.offset) {
      fail("a frame of " + frames + " lies outside its place");
    }
    end = frame.offset + frame.size;
    sum += frame.size;
  });
  if (frames == "split" && sum != input.size()) {
    fail("a run has bytes in no message");
  }
}

// Records are in order, and what is said of them is fit for a terminal.
void check_recording(const qel_wire::Recording& recording) {
  uint32_t last = 1;
  for (const qel_wire::Record& record : recording.records) {
    if (record.number < last) {
      fail("records are not in order");
    }
    last = record.number;
  }
  for (const std::string& note : recording.notes) {
    expect_fit_for_terminals(note);
  }
}

}  // namespace

void check_qel_wire(const std::string& input) {
  if (input.empty()) {
    return;
  }
  const auto read = new_message(static_cast<unsigned char>(input[0]));
  const Descriptor& type = *read->GetDescriptor();
  const std::string bytes = input.substr(1);
  take_any_text(bytes, std::unique_ptr<Message>(read->New()).get());

  std::ostringstream explanation;
  const bool is_read = qel_wire::explain(bytes, type, {}, &explanation);
  expect_fit_for_terminals(explanation.str());
  qel_wire::ExplainOptions whole;
  whole.show_token = true;
  whole.show_all = true;
  std::ostringstream whole_explanation;
  qel_wire::explain(bytes, type, whole, &whole_explanation);
  expect_fit_for_terminals(whole_explanation.str());
  expect_all_explained(bytes, type);
  if (is_read != read->ParseFromString(bytes)) {
    fail("the class takes it otherwise than:\n" + explanation.str());
  }

  qel_wire::DecodeOptions options;
  options.is_partial = true;
  std::ostringstream decoded;
  const auto problem = qel_wire::decode(bytes, type, options, &decoded).problem;
  expect_fit_for_terminals(decoded.str());
  if (is_read && qel_wire::guess(bytes).front().is_broken) {
    fail("a message that does not take it is guessed first");
  }
  if (!is_read) {
    check_partial(bytes, *read, problem->readable);
    return;
  }
  check_there_and_back(bytes, read.get());
}

void check_qel_wire_input(const std::string& input) {
  check_notation(input, Notation::kHex);
  check_notation(input, Notation::kBase64);
  std::istringstream framings(qel_wire::kFramings);
  for (std::string frames; std::getline(framings, frames, '|');) {
    check_frames(input, frames);
  }
  if (qel_wire::is_capture(input)) {
    try {
      if (qel_wire::is_recording(input)) {
        check_recording(qel_wire::read_recording(input));
      } else {
        qel_wire::read_capture(input);
      }
    } catch (const qel_wire::Failure& failure) {
      expect_fit_for_terminals(failure.reason);
    }
  }
  qel_wire::Session session;
  qel_wire::cut(input, "split", [&](const qel_wire::Frame& frame) {
    qel_wire::Found found;
    found.bytes = std::string_view(input).substr(frame.offset, frame.size);
    session.add(found);
  });
}

}  // namespace fuzz
