// What was sent by TCP and UDP, from a capture of packets as tcpdump and Wireshark write it.
#ifndef QEL_WIRE_PACKETS_H
#define QEL_WIRE_PACKETS_H

#include <chrono>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace qel_wire {

struct Arrival {
  size_t packet = 0;                   // its number in the capture, from 1
  std::chrono::nanoseconds time = {};  // since 1970
};

// The bytes that a packet brought: a datagram of UDP, or what is new of a segment of TCP.
struct Segment {
  size_t offset = 0;  // in the stream
  // Of the packet with which all of the stream up to here was there. So its number is never less
  // than that of the segment before.
  Arrival arrival;
};

// Bytes that one end sent to the other. Where the capture lacks some of them, of a connection or at
// the end of a datagram, a stream ends, and another one begins behind the gap.
struct Stream {
  std::string from, to;   // 192.0.2.1:9000, [2001:db8::1]:9000
  size_t connection = 0;  // from 1; both directions have the same
  // Whether the sender opened the connection, or has the higher port if the capture does not tell.
  bool from_client = false;
  bool is_cut = false;    // whether bytes before it are missing: it may begin within a message
  bool is_reset = false;  // whether one of the ends broke the connection off
  std::string bytes;      // at least one
  std::vector<Segment> segments;
  std::vector<std::string> notes;  // what is missing before it and behind it

  // The one that the byte is of.
  const Segment& segment_at(size_t offset) const;
};

struct Capture {
  std::vector<Stream> streams;     // by connection; in there first the client's, by their offsets
  std::vector<std::string> notes;  // what was left out, and why reading ends early
  bool is_broken = false;          // whether it does
};

// Throws a Failure, which has none of the bytes, if the bytes are no capture, or one of another
// kind of network. Of a file that breaks off, it reads what is before that.
Capture read_capture(const std::string& file);

}  // namespace qel_wire

#endif
