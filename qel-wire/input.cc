#include "input.h"

#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <iostream>
#include <memory>
#include <utility>
#include <vector>

#include "framing.h"
#include "listing.h"
#include "misread.h"
#include "packets.h"
#include "pcap_file.h"
#include "text.h"
#include "walk.h"

namespace qel_wire {
namespace {

std::string read_bytes(const std::string& name, Notation notation) {
  if (notation == Notation::kRaw) {
    return read_file(name);
  }
  if (name != "-" && access(name.c_str(), F_OK) != 0) {
    // The bytes, if that is what they are, may hold a token.
    throw Failure{kNoAccess,
                  "there is no such file; bytes in the call itself are written --hex=BYTES, "
                  "--base64=BYTES"};
  }
  return from_notation(read_file(name), notation);
}

std::string read_source(const Call& call, const std::string& name) {
  const Notation notation = call.notation();
  try {
    return call.has_bytes()
               ? from_notation(notation == Notation::kHex ? call.hex : call.base64, notation)
               : read_bytes(name, notation);
  } catch (const Misread& misread) {
    const std::string what = call.files.size() > 1 ? named(name) : "the input";
    throw Failure{kBroken, what + " is no " + (notation == Notation::kHex ? "hex" : "base64") +
                               ": " + misread.text()};
  }
}

// Waits a moment for more of a file. False if the user ends that (Ctrl-C), or nobody reads the
// output any more.
bool wait_for_more() {
  constexpr timespec kMoment = {0, 400'000'000};
  sigset_t interrupt;
  sigemptyset(&interrupt);
  sigaddset(&interrupt, SIGINT);
  sigprocmask(SIG_BLOCK, &interrupt, nullptr);  // it is taken here, and ends nothing halfway
  pollfd output = {STDOUT_FILENO, 0, 0};
  return std::cout.flush() && poll(&output, 1, 0) == 0 &&
         sigtimedwait(&interrupt, nullptr, &kMoment) != SIGINT;
}

// Hands over the messages of the files, with their places if there may be more than one.
class Messages {
 public:
  Messages(const Call& call, const std::function<int(const Found&)>& take)
      : call_(call), take_(take), is_many_(!call.frames.empty() || call.files.size() > 1) {}

  void of_file(const std::string& name) {
    const std::string bytes = read_source(call_, name);
    const std::string source = call_.files.size() > 1 ? name + ", " : "";
    const bool is_of_packets = is_capture(bytes);
    is_many_ = is_many_ || is_of_packets;
    if (is_of_packets && is_recording(bytes)) {
      of_recording(name, read_recording(bytes), source);
    } else if (call_.follow) {
      throw Failure{kWrongCall, "--follow takes a session file, which this is not"};
    } else if (is_of_packets) {
      of_capture(bytes, source);
    } else if (call_.frames.empty()) {
      take(bytes, {0, bytes.size(), ""}, source, {});
    } else {
      blame(source,
            cut(bytes, call_.frames, [&](const Frame& frame) { take(bytes, frame, source, {}); }));
    }
  }

  int status() const { return status_; }
  bool has_found() const { return has_found_; }

 private:
  void take(std::string_view bytes, const Frame& frame, const std::string& source, Found found) {
    found.bytes = bytes.substr(frame.offset, frame.size);
    found.name = frame.name;
    ++count_;
    if (is_many_) {
      found.number = count_;
      found.place = "message " + std::to_string(found.number) + ": " +
                    (found.time.has_value() ? utc(found.milliseconds()) + ", " : "") + source +
                    "offset " + std::to_string(frame.offset) + ", " + counted(frame.size, "byte");
    }
    hand_over(found);
  }

  void hand_over(const Found& found) {
    if (call_.number == 0 || call_.number == count_) {
      has_found_ = true;
      status_ = std::max(status_, take_(found));
    }
  }

  void blame(const std::string& source, const std::string& problem) {
    if (!problem.empty()) {
      complain(source + problem);
      status_ = std::max(status_, kBroken);
    }
  }

  // ---- Session files

  // What was handed over of a session file.
  struct Shown {
    size_t before = 0;    // the number of the last message of the files before
    uint32_t last = 0;    // record
    uint32_t waited = 0;  // records up to there have had time to end
  };

  void take(const Record& record, size_t before, const std::string& source) {
    Found found;
    const auto* const type = message_of_function(record.name);
    found.function = type != nullptr ? record.name : "";
    found.name = type != nullptr ? type->name() : record.name;
    found.bytes = record.bytes;
    found.missing = record.missing;
    found.use = record.use;
    found.outcome = record.outcome;
    found.time = record.time;
    found.connection = connections_;
    found.number = count_ = before + record.number;
    found.place = "message " + std::to_string(found.number) + ": " + utc(found.milliseconds()) +
                  ", " + source + way_of(found) + ", " + size_of(found);
    hand_over(found);
  }

  // Hands over what is new. A call that has not ended may do so in a moment, and a record that is
  // not there may have been written while the file was read, so that is waited for once.
  void take_new(const Recording& recording, const std::string& source, bool is_waiting,
                Shown* shown) {
    const std::vector<Record>& records = recording.records;
    if (!records.empty() && records.back().number < shown->last && recording.notes.empty()) {
      complain(source + "the file was begun anew");
      ++connections_;
      *shown = {count_, 0, 0};
    }
    const uint32_t begin = shown->last;
    for (const Record& record : records) {
      if (record.number <= begin) {
        continue;
      }
      const bool may_change =
          record.outcome == Outcome::kNotEnded || record.number - shown->last > 1;
      if (is_waiting && may_change && record.number > shown->waited) {
        shown->waited = records.back().number;
        return;
      }
      note_gap(*shown, record.number, source);
      shown->last = record.number;
      take(record, shown->before, source);
    }
  }

  static void note_gap(const Shown& shown, uint32_t number, const std::string& source) {
    const size_t first = shown.before + shown.last + 1;
    const size_t next = shown.before + number;
    if (next == first + 1) {
      complain(source + "message " + std::to_string(first) + " is not in the file");
    } else if (next > first) {
      complain(source + "messages " + std::to_string(first) + " to " + std::to_string(next - 1) +
               " are not in the file");
    }
  }

  void of_recording(const std::string& name, Recording recording, const std::string& source) {
    Shown shown = {count_, 0, 0};
    ++connections_;
    while (call_.follow) {
      take_new(recording, source, true, &shown);
      if (!wait_for_more()) {
        break;
      }
      try {
        recording = read_recording(read_file(name));
      } catch (const Failure&) {  // it is begun anew just now, or gone
      }
    }
    take_new(recording, source, false, &shown);
    for (const std::string& note : recording.notes) {
      blame(source, note);
    }
  }

  // ---- Captures of packets

  struct Arrived {
    const Stream* stream;
    Frame frame;
    Arrival arrival;  // of its last byte
  };

  static std::string place_of(const Stream& stream, const std::string& source) {
    return source + stream.from + " -> " + stream.to + ", ";
  }

  // In the order in which they were complete.
  void of_capture(const std::string& file, const std::string& source) {
    const Capture capture = read_capture(file);
    for (const std::string& note : capture.notes) {
      complain(source + note);
    }
    status_ = std::max(status_, capture.is_broken ? kBroken : kDone);
    std::vector<Arrived> all;
    for (const Stream& stream : capture.streams) {
      const std::string place = place_of(stream, source);
      for (const std::string& note : stream.notes) {
        complain(place + note);
      }
      if (stream.is_reset) {
        complain(place + "of a connection that was reset");
      }
      add(stream, place, &all);
    }
    std::stable_sort(all.begin(), all.end(), [](const Arrived& a, const Arrived& b) {
      return a.arrival.packet < b.arrival.packet;
    });
    for (const Arrived& arrived : all) {
      const Stream& stream = *arrived.stream;
      Found found;
      found.use = stream.from_client ? Use::kSends : Use::kReceives;
      found.connection = connections_ + stream.connection;
      found.time = arrived.arrival.time;
      take(stream.bytes, arrived.frame, place_of(stream, source), found);
    }
    connections_ += capture.streams.empty() ? 0 : capture.streams.back().connection;
  }

  void add(const Stream& stream, const std::string& place, std::vector<Arrived>* all) {
    const auto add_frame = [&](const Frame& frame) {
      const size_t last = frame.offset + frame.size - 1;  // of its head, if it is empty
      all->push_back({&stream, frame, stream.segment_at(last).arrival});
    };
    if (!call_.frames.empty()) {
      const size_t begin = stream.is_cut ? first_frame(stream.bytes, call_.frames) : 0;
      if (begin > 0) {
        complain(place + "without " + counted(begin, "byte") + " before the first frame");
      }
      blame(place, cut(stream.bytes, call_.frames, add_frame, begin));
      return;
    }
    for (size_t i = 0; i < stream.segments.size(); ++i) {
      const size_t begin = stream.segments[i].offset;
      const bool is_last = i + 1 == stream.segments.size();
      add_frame(
          {begin, (is_last ? stream.bytes.size() : stream.segments[i + 1].offset) - begin, ""});
    }
  }

  const Call& call_;
  const std::function<int(const Found&)>& take_;
  bool is_many_;
  size_t count_ = 0;        // number of the last message
  bool has_found_ = false;  // whether there was one that is wanted
  size_t connections_ = 0;  // of the captures before
  int status_ = kDone;
};

}  // namespace

std::string read_file(const std::string& name) {
  const bool is_standard_input = name == "-";
  const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(
      is_standard_input ? stdin : std::fopen(name.c_str(), "rb"), std::fclose);
  std::string content;
  struct stat status {};
  if (file != nullptr && fstat(fileno(file.get()), &status) == 0 && status.st_size > 0) {
    content.reserve(std::min(static_cast<size_t>(status.st_size), kMostBytes) + 1);
  }
  char block[65536];
  size_t size = 0;
  while (file != nullptr && content.size() <= kMostBytes &&
         (size = std::fread(block, 1, sizeof block, file.get())) > 0) {
    content.append(block, size);
  }
  if (file == nullptr || std::ferror(file.get()) != 0) {
    throw Failure{kNoAccess, "cannot read " + (is_standard_input ? "standard input" : named(name)) +
                                 ": " + std::strerror(errno)};
  }
  if (content.size() > kMostBytes) {
    throw Failure{kBroken, "the input has more than 64 MiB"};
  }
  return content;
}

int for_each_message(const Call& call, const std::function<int(const Found&)>& take) {
  if (call.has_bytes() && !call.files.empty()) {
    throw Failure{kWrongCall, "the bytes are in the call already: it takes no file"};
  }
  if (std::count(call.files.begin(), call.files.end(), "-") > 1) {
    throw Failure{kWrongCall, "standard input can be read once"};
  }
  if (call.follow && (call.files.size() != 1 || call.files.front() == "-")) {
    throw Failure{kWrongCall, "--follow takes one file"};
  }
  Messages messages(call, take);
  if (call.files.empty()) {
    messages.of_file("-");
  }
  for (const std::string& file : call.files) {
    messages.of_file(file);
  }
  if (call.number > 0 && !messages.has_found()) {
    throw Failure{kWrongCall, "there is no message " + std::to_string(call.number)};
  }
  return messages.status();
}

void complain(const std::string& text) {
  std::cerr << "qel-wire: " << readable(text) << '\n';
}

}  // namespace qel_wire
