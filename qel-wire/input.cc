#include "input.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <iostream>
#include <memory>
#include <vector>

#include "framing.h"
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

// Hands over the messages of the files, with their places if there may be more than one.
class Messages {
 public:
  Messages(const Call& call, const std::function<int(const Found&)>& take)
      : call_(call), take_(take), is_many_(!call.frames.empty() || call.files.size() > 1) {}

  void of_file(const std::string& name) {
    const std::string bytes = read_source(call_, name);
    const std::string source = call_.files.size() > 1 ? name + ", " : "";
    if (is_capture(bytes)) {
      is_many_ = true;
      of_capture(bytes, source);
    } else if (call_.frames.empty()) {
      take(bytes, {0, bytes.size(), ""}, source, {});
    } else {
      blame(source,
            cut(bytes, call_.frames, [&](const Frame& frame) { take(bytes, frame, source, {}); }));
    }
  }

  int status() const { return status_; }

 private:
  void take(std::string_view bytes, const Frame& frame, const std::string& source, Found found) {
    found.bytes = bytes.substr(frame.offset, frame.size);
    found.name = frame.name;
    if (is_many_) {
      found.number = ++count_;
      found.place = "message " + std::to_string(found.number) + ": " +
                    (found.time.has_value() ? utc(*found.time) + ", " : "") + source + "offset " +
                    std::to_string(frame.offset) + ", " + counted(frame.size, "byte");
    }
    status_ = std::max(status_, take_(found));
  }

  void blame(const std::string& source, const std::string& problem) {
    if (!problem.empty()) {
      complain(source + problem);
      status_ = std::max(status_, kBroken);
    }
  }

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
      found.time =
          std::chrono::duration_cast<std::chrono::milliseconds>(arrived.arrival.time).count();
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
  size_t count_ = 0;
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
  Messages messages(call, take);
  if (call.files.empty()) {
    messages.of_file("-");
  }
  for (const std::string& file : call.files) {
    messages.of_file(file);
  }
  return messages.status();
}

void complain(const std::string& text) {
  std::cerr << "qel-wire: " << readable(text) << '\n';
}

}  // namespace qel_wire
