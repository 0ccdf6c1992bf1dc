// Captures of packets that are made here byte by byte, and what is put together from them.

#include "packets.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

#include "failure.h"
#include "numbers.h"
#include "pcap_file.h"

namespace {

using qel_wire::read_capture;
using qel_wire::Stream;
using namespace std::string_literals;

// ---- Packets

struct End {
  std::string address;
  uint16_t port;
};

const End kClient = {"\xc0\x00\x02\x01"s, 40000};
const End kServer = {"\xc0\x00\x02\x02"s, 9000};
const End kClient6 = {"\x20\x01\x0d\xb8\0\0\0\0\0\0\0\0\0\0\0\x01"s, 40000};
const End kServer6 = {"\x20\x01\x0d\xb8\0\0\0\0\0\0\0\0\0\0\0\x02"s, 9000};

constexpr uint8_t kTcp = 6, kUdp = 17;

enum Flags : uint8_t { kFin = 1, kSyn = 2, kRst = 4, kAck = 16, kSynAck = 18 };

// The header of IP has options if they are given; the length is what it says of itself.
std::string ipv4(const End& from, const End& to, uint8_t protocol, const std::string& rest,
                 const std::string& options = "", uint16_t fragment = 0) {
  const size_t header = 20 + options.size();
  return big_endian(0x40 + header / 4, 1) + big_endian(0, 1) + big_endian(header + rest.size(), 2) +
         big_endian(0, 2) + big_endian(fragment, 2) + big_endian(64, 1) + big_endian(protocol, 1) +
         big_endian(0, 2) + from.address + to.address + options + rest;
}

std::string ipv6(const End& from, const End& to, uint8_t next, const std::string& rest) {
  return big_endian(0x60000000, 4) + big_endian(rest.size(), 2) + big_endian(next, 1) +
         big_endian(64, 1) + from.address + to.address + rest;
}

std::string tcp(const End& from, const End& to, uint32_t number, uint8_t flags,
                const std::string& bytes) {
  return big_endian(from.port, 2) + big_endian(to.port, 2) + big_endian(number, 4) +
         big_endian(0, 4) + big_endian(0x50, 1) + big_endian(flags, 1) + big_endian(1000, 2) +
         big_endian(0, 4) + bytes;
}

std::string udp(const End& from, const End& to, const std::string& bytes) {
  return big_endian(from.port, 2) + big_endian(to.port, 2) + big_endian(8 + bytes.size(), 2) +
         big_endian(0, 2) + bytes;
}

std::string from_client(uint32_t number, uint8_t flags, const std::string& bytes = "") {
  return ipv4(kClient, kServer, kTcp, tcp(kClient, kServer, number, flags, bytes));
}

std::string from_server(uint32_t number, uint8_t flags, const std::string& bytes = "") {
  return ipv4(kServer, kClient, kTcp, tcp(kServer, kClient, number, flags, bytes));
}

std::string datagram(const End& from, const End& to, const std::string& bytes) {
  return ipv4(from, to, kUdp, udp(from, to, bytes));
}

// ---- Files

enum LinkType : uint32_t {
  kNull = 0,
  kEthernet = 1,
  kRaw = 101,
  kLoop = 108,
  kCooked = 113,
  kUsb = 189,
  kIpv4 = 228,
  kIpv6 = 229,
  kCooked2 = 276
};

using Integer = std::string (*)(uint64_t number, size_t size);

// The packets came a second after each other, the first at 1.
std::string pcap(const std::vector<std::string>& packets, uint32_t link = kRaw,
                 size_t limit = 262144, Integer integer = little_endian,
                 uint32_t magic = 0xa1b2c3d4) {
  std::string file = integer(magic, 4) + integer(2, 2) + integer(4, 2) + integer(0, 8) +
                     integer(limit, 4) + integer(link, 4);
  uint64_t second = 0;
  for (const std::string& packet : packets) {
    file += integer(++second, 4) + integer(5, 4) + integer(std::min(packet.size(), limit), 4) +
            integer(packet.size(), 4) + packet.substr(0, limit);
  }
  return file;
}

std::string pcapng(const std::vector<std::string>& packets, uint64_t begin = 5) {
  std::string file = block(0x0a0d0d0a, little_endian(0x1a2b3c4d, 4) + little_endian(1, 4) +
                                           std::string(8, '\xff')) +
                     block(1, little_endian(kRaw, 4) + little_endian(0, 4));
  uint64_t second = 0;
  for (const std::string& packet : packets) {
    const uint64_t time = ++second * 1000000 + begin;
    file +=
        block(6, little_endian(0, 4) + little_endian(time >> 32U, 4) + little_endian(time, 4) +
                     little_endian(packet.size(), 4) + little_endian(packet.size(), 4) + packet);
  }
  return file;
}

// ---- What is read

// A line for each stream: connection, > if it is the client's, bytes, notes.
std::string listed(const qel_wire::Capture& capture) {
  std::string text;
  for (const Stream& stream : capture.streams) {
    text += std::to_string(stream.connection) + (stream.from_client ? " > " : " < ") + stream.bytes;
    for (const std::string& note : stream.notes) {
      text += ", " + note;
    }
    text += '\n';
  }
  for (const std::string& note : capture.notes) {
    text += note + '\n';
  }
  return text;
}

std::string listed(const std::vector<std::string>& packets, uint32_t link = kRaw) {
  return listed(read_capture(pcap(packets, link)));
}

// The segments of the only stream: offset @ packet.
std::string arrivals(const std::vector<std::string>& packets) {
  std::string text;
  for (const Stream& stream : read_capture(pcap(packets)).streams) {
    for (const qel_wire::Segment& segment : stream.segments) {
      text += std::to_string(segment.offset) + "@" + std::to_string(segment.arrival.packet) + " ";
    }
  }
  return text;
}

std::string complaint_about(const std::string& file) {
  try {
    read_capture(file);
  } catch (const qel_wire::Failure& failure) {
    return failure.reason;
  }
  return "none";
}

const std::vector<std::string> kExchange = {
    from_client(99, kSyn),           from_server(499, kSynAck),      from_client(100, kAck),
    from_client(100, kAck, "hello"), from_server(500, kAck, "good"), from_client(105, kAck, "you"),
    from_client(108, kFin | kAck),   from_server(504, kFin | kAck),  from_client(109, kAck)};

// ---- TCP

TEST(Tcp, InOrder_IsAStreamOfEachEnd) {
  const qel_wire::Capture capture = read_capture(pcap(kExchange));
  EXPECT_EQ(listed(capture), "1 > helloyou\n1 < good\n");
  EXPECT_EQ(capture.streams[0].from, "192.0.2.1:40000");
  EXPECT_EQ(capture.streams[0].to, "192.0.2.2:9000");
  EXPECT_EQ(capture.streams[1].from, "192.0.2.2:9000");
  EXPECT_EQ(capture.streams[1].to, "192.0.2.1:40000");
  EXPECT_FALSE(capture.streams[0].is_cut);
  EXPECT_FALSE(capture.streams[0].is_reset);
}

TEST(Tcp, Segments_HaveOffsetPacketAndTime) {
  const Stream stream = read_capture(pcap(kExchange)).streams.at(0);
  ASSERT_EQ(stream.segments.size(), 2U);
  EXPECT_EQ(stream.segments[1].offset, 5U);
  EXPECT_EQ(stream.segments[1].arrival.packet, 6U);
  EXPECT_EQ(stream.segments[1].arrival.time, std::chrono::microseconds(6000005));
  EXPECT_EQ(&stream.segment_at(4), &stream.segments[0]);
  EXPECT_EQ(&stream.segment_at(5), &stream.segments[1]);
  EXPECT_EQ(&stream.segment_at(7), &stream.segments[1]);
}

TEST(Tcp, OutOfOrder_IsPutInOrder) {
  const std::vector<std::string> packets = {
      from_client(99, kSyn), from_client(105, kAck, "you"), from_client(108, kAck, "two"),
      from_client(100, kAck, "hello"), from_client(111, kAck, "!")};
  EXPECT_EQ(listed(packets), "1 > helloyoutwo!\n");
  // The receiver had none of it before the fourth packet came.
  EXPECT_EQ(arrivals(packets), "0@4 5@4 8@4 11@5 ");
}

TEST(Tcp, Retransmission_IsDropped) {
  const std::vector<std::string> packets = {
      from_client(99, kSyn),        from_client(100, kAck, "hello"),
      from_client(99, kSyn),        from_client(100, kAck, "HELLO"),
      from_client(102, kAck, "LL"), from_client(105, kAck, "you")};
  EXPECT_EQ(listed(packets), "1 > helloyou\n");
  EXPECT_EQ(arrivals(packets), "0@2 5@6 ");
}

TEST(Tcp, Overlap_GivesOnlyWhatIsNew) {
  const std::vector<std::string> packets = {from_client(99, kSyn), from_client(100, kAck, "hello"),
                                            from_client(110, kAck, "end"),
                                            from_client(103, kAck, "LOyou, ENDED")};
  EXPECT_EQ(listed(packets), "1 > helloyou, ENDED\n");
  EXPECT_EQ(arrivals(packets), "0@2 5@4 ");
}

TEST(Tcp, Gap_DividesTheStream) {
  const qel_wire::Capture capture = read_capture(
      pcap({from_client(99, kSyn), from_client(100, kAck, "hello"), from_client(106, kAck, "you"),
            from_client(119, kFin), from_client(100, kAck, "hello")}));
  EXPECT_EQ(listed(capture),
            "1 > hello, ends at a gap of 1 byte\n"
            "1 > you, begins behind a gap of 1 byte, ends at a gap of 10 bytes\n");
  EXPECT_FALSE(capture.streams[0].is_cut);
  EXPECT_TRUE(capture.streams[1].is_cut);
  EXPECT_EQ(capture.streams[1].segments.at(0).offset, 0U);
}

TEST(Tcp, GapBehindTheOpening_IsNoted) {
  EXPECT_EQ(listed({from_client(99, kSyn), from_client(102, kAck, "llo")}),
            "1 > llo, begins behind a gap of 2 bytes\n");
}

TEST(Tcp, SequenceNumbers_StartAgainAtZero) {
  EXPECT_EQ(listed({from_client(0xfffffffd, kSyn), from_client(3, kAck, "you"),
                    from_client(0xfffffffe, kAck, "hello")}),
            "1 > helloyou\n");
  EXPECT_EQ(listed({from_client(0xffffffff, kSyn), from_client(0, kAck, "hello")}), "1 > hello\n");
}

TEST(Tcp, MoreThanFourGiB_AreTold) {
  std::vector<std::string> packets = {from_client(0xffffffff, kSyn)};
  for (const uint32_t number : {0U, 0x60000000U, 0xc0000000U, 0x20000000U}) {
    packets.push_back(from_client(number, kAck, "some"));
  }
  EXPECT_EQ(listed(packets),
            "1 > some, ends at a gap of 1610612732 bytes\n"
            "1 > some, begins behind a gap of 1610612732 bytes, ends at a gap of 1610612732 bytes\n"
            "1 > some, begins behind a gap of 1610612732 bytes, ends at a gap of 1610612732 bytes\n"
            "1 > some, begins behind a gap of 1610612732 bytes\n");
}

TEST(Tcp, WithoutItsOpening_BeginsInTheMiddle) {
  const qel_wire::Capture capture = read_capture(
      pcap({from_server(500, kAck, "good"), from_client(105, kAck, "you"),
            from_client(100, kAck, "hello"), from_client(108, kFin), from_client(200, kAck)}));
  EXPECT_EQ(listed(capture),
            "1 > helloyou, begins in the middle of the connection\n"
            "1 < good, begins in the middle of the connection\n");
  EXPECT_TRUE(capture.streams[0].is_cut);
  EXPECT_EQ(listed({from_client(100, kAck, "hello"), from_client(106, kAck, "you")}),
            "1 > hello, begins in the middle of the connection, ends at a gap of 1 byte\n"
            "1 > you, begins behind a gap of 1 byte\n");
}

// The client has the lower port here.
TEST(Tcp, WhoOpenedTheConnection_IsTheClient) {
  EXPECT_EQ(listed({from_server(499, kSyn), from_client(99, kSynAck), from_client(100, kAck, "yes"),
                    from_server(500, kAck, "hi")}),
            "1 > hi\n1 < yes\n");
  EXPECT_EQ(listed({from_client(99, kSynAck), from_client(100, kAck, "hi")}), "1 < hi\n");
}

TEST(Tcp, ConnectionsOneAfterTheOther_AreApart) {
  std::vector<std::string> packets = kExchange;
  for (const std::string& packet :
       {from_client(999, kSyn), from_server(4999, kSynAck), from_client(1000, kAck, "again"),
        from_server(5000, kAck, "yes")}) {
    packets.push_back(packet);
  }
  EXPECT_EQ(listed(packets), "1 > helloyou\n1 < good\n2 > again\n2 < yes\n");
}

// Only the server's last bytes of the first are there.
TEST(Tcp, ConnectionBehindTheRestOfAnother_IsApart) {
  EXPECT_EQ(
      listed({from_server(500, kAck, "good"), from_client(99, kSyn), from_server(799, kSynAck),
              from_client(100, kAck, "hello"), from_server(800, kAck, "yes")}),
      "1 < good, begins in the middle of the connection\n2 > hello\n2 < yes\n");
}

TEST(Tcp, OpeningsOutOfOrder_AreOfOneConnection) {
  EXPECT_EQ(listed({from_server(499, kSynAck), from_client(99, kSyn),
                    from_client(100, kAck, "hello"), from_server(500, kAck, "yes")}),
            "1 > hello\n1 < yes\n");
  EXPECT_EQ(listed({from_client(100, kAck, "hello"), from_server(499, kSynAck),
                    from_server(500, kAck, "yes"), from_client(105, kAck, "you")}),
            "1 > helloyou, begins in the middle of the connection\n1 < yes\n");
}

TEST(Tcp, WithBytesInTheOpening_HasThem) {
  EXPECT_EQ(listed({from_client(99, kSyn, "hello"), from_client(105, kAck, "you")}),
            "1 > helloyou\n");
}

TEST(Tcp, ConnectionsThatCarryNothing_AreNotCounted) {
  EXPECT_EQ(listed({from_client(99, kSyn), from_server(0, kRst | kAck), from_client(199, kSyn),
                    from_client(200, kAck, "hello")}),
            "1 > hello\n");
}

TEST(Tcp, Reset_IsToldOfBothEnds) {
  const qel_wire::Capture capture =
      read_capture(pcap({from_client(99, kSyn), from_client(100, kAck, "hello"),
                         from_server(777, kRst, "why"), from_client(105, kAck, "you")}));
  EXPECT_EQ(listed(capture), "1 > helloyou\n");
  EXPECT_TRUE(capture.streams[0].is_reset);
}

// A byte before the first, and one before what comes next.
TEST(Tcp, ProbesWhetherTheOtherEndIsThere_AreDropped) {
  EXPECT_EQ(
      listed({from_client(99, kSyn), from_client(99, kAck, "x"), from_client(100, kAck, "hello"),
              from_client(104, kAck, "x"), from_client(105, kAck, "you")}),
      "1 > helloyou\n");
  EXPECT_EQ(listed({from_client(99, kSyn), from_client(99, kAck, "x")}), "");
}

TEST(Tcp, HeaderWithOptions_IsSkipped) {
  std::string segment = tcp(kClient, kServer, 100, kAck, std::string(12, '\x01') + "hello");
  segment[12] = '\x80';
  EXPECT_EQ(listed({from_client(99, kSyn), ipv4(kClient, kServer, kTcp, segment, "\1\1\1\1")}),
            "1 > hello\n");
}

// A network card divides what is larger than the length can tell.
TEST(Tcp, InAPacketWithoutALength_IsAllThatFollows) {
  std::string packet = from_client(100, kAck, "hello");
  packet.replace(2, 2, 2, '\0');
  EXPECT_EQ(listed({from_client(99, kSyn), packet}), "1 > hello\n");
  packet = ipv6(kClient6, kServer6, kTcp, tcp(kClient6, kServer6, 100, kSyn, "hello"));
  packet.replace(4, 2, 2, '\0');
  EXPECT_EQ(listed({packet}), "1 > hello\n");
}

// ---- UDP

TEST(Udp, Datagrams_AreASegmentEach) {
  const std::vector<std::string> packets = {
      datagram(kClient, kServer, "hello"), datagram(kServer, kClient, "good"),
      datagram(kClient, kServer, ""), datagram(kClient, kServer, "hello")};
  const qel_wire::Capture capture = read_capture(pcap(packets));
  EXPECT_EQ(listed(capture), "1 > hellohello\n1 < good\n");
  EXPECT_EQ(capture.streams[0].from, "192.0.2.1:40000");
  EXPECT_EQ(arrivals(packets), "0@1 5@4 0@2 ");
}

TEST(Udp, BetweenThePortsOfTcp_IsAnotherConnection) {
  EXPECT_EQ(listed({from_client(99, kSyn, "hello"), datagram(kClient, kServer, "you")}),
            "1 > hello\n2 > you\n");
}

// ---- Below

TEST(Link, OfEveryKind_IsRead) {
  const std::string packet = from_client(99, kSyn, "hello");
  const std::string macs(12, '\2');
  EXPECT_EQ(listed({packet}, kRaw), "1 > hello\n");
  EXPECT_EQ(listed({packet}, kIpv4), "1 > hello\n");
  EXPECT_EQ(listed({"\2\0\0\0"s + packet}, kNull), "1 > hello\n");
  EXPECT_EQ(listed({"\0\0\0\2"s + packet}, kLoop), "1 > hello\n");
  EXPECT_EQ(listed({macs + "\x08\0"s + packet + "padding"}, kEthernet), "1 > hello\n");
  EXPECT_EQ(listed({macs + "\x81\0\0\7\x08\0"s + packet}, kEthernet), "1 > hello\n");
  EXPECT_EQ(listed({macs + "\x88\xa8\0\7\x81\0\0\7\x08\0"s + packet}, kEthernet), "1 > hello\n");
  EXPECT_EQ(listed({std::string(14, '\0') + "\x08\0"s + packet}, kCooked), "1 > hello\n");
  EXPECT_EQ(listed({"\x08\0"s + std::string(18, '\0') + packet}, kCooked2), "1 > hello\n");
}

TEST(Ipv6, WithExtensions_IsRead) {
  const std::string segment = tcp(kClient6, kServer6, 99, kSyn, "hello");
  const std::string hops = "\x2b\0\0\0\0\0\0\0"s;               // and then a route
  const std::string route = "\x3c\1"s + std::string(14, '\0');  // and then options of the end
  const std::string end = "\x2c\0\0\0\0\0\0\0"s;                // and then a fragment
  const std::string whole = "\x06\0\0\0\0\0\0\1"s;              // that is all of it
  const std::string packet = ipv6(kClient6, kServer6, 0, hops + route + end + whole + segment);
  EXPECT_EQ(listed({packet}, kIpv6), "1 > hello\n");
  const qel_wire::Capture capture =
      read_capture(pcap({"\x86\xdd"s + std::string(18, '\0') + packet}, kCooked2));
  EXPECT_EQ(capture.streams.at(0).from, "[2001:db8::1]:40000");
  EXPECT_EQ(capture.streams.at(0).to, "[2001:db8::2]:9000");
}

TEST(Fragments, AreLeftOut) {
  const std::string segment = tcp(kClient, kServer, 99, kSyn, "hello");
  const std::string first = "\x06\0\0\1\0\0\0\1"s;
  const std::string last = "\x06\0\0\x08\0\0\0\1"s;
  EXPECT_EQ(listed({ipv4(kClient, kServer, kTcp, segment, "", 0x2000),
                    ipv4(kClient, kServer, kTcp, segment, "", 1),
                    ipv6(kClient6, kServer6, 44, first + segment),
                    ipv6(kClient6, kServer6, 44, last + segment)}),
            "4 packets left out: fragments of IP packets, which are not put together\n");
}

TEST(OtherPackets, AreCounted) {
  const std::string macs(12, '\2');
  EXPECT_EQ(listed({macs + "\x08\6"s + std::string(46, '\0'),
                    macs + "\x08\0"s + ipv4(kClient, kServer, 1, "ping")},
                   kEthernet),
            "2 packets left out: of other protocols than TCP and UDP\n");
}

// Each has nothing but headers, and is cut at each byte.
TEST(Headers, ThatAreNotWhole_AreLeftOut) {
  const std::string extension = "\x06\0\0\0\0\0\0\0"s;
  const std::string macs(12, '\2');
  for (const std::string& packet :
       {macs + "\x81\0\0\7\x08\0"s + from_client(99, kSyn),
        macs + "\x08\0"s + datagram(kClient, kServer, ""),
        macs + "\x86\xdd"s +
            ipv6(kClient6, kServer6, 0, extension + tcp(kClient6, kServer6, 99, kSyn, ""))}) {
    for (size_t size = 1; size < packet.size(); ++size) {
      EXPECT_EQ(listed(read_capture(pcap({packet}, kEthernet, size))),
                "1 packet left out: headers that are broken or not captured whole\n")
          << size;
    }
  }
}

TEST(Headers, ThatContradictThemselves_AreLeftOut) {
  const auto changed = [](std::string packet, size_t offset, char byte) {
    packet[offset] = byte;
    return packet;
  };
  const std::string segment = from_client(99, kSyn, "hello");
  const std::string shorter = segment.substr(0, 16) + segment.substr(20);
  const std::string segment6 =
      ipv6(kClient6, kServer6, kTcp, tcp(kClient6, kServer6, 99, kSyn, "hello"));
  EXPECT_EQ(listed({changed(shorter, 0, '\x44'), changed(segment, 0, '\x4f'),
                    changed(segment, 3, '\x13'), changed(segment, 32, '\x40'),
                    changed(segment, 32, '\xf0'), changed(segment6, 0, '\x50'),
                    changed(datagram(kClient, kServer, "hello"), 25, '\7')}),
            "7 packets left out: headers that are broken or not captured whole\n");
}

// ---- Files

TEST(Capture, OfEveryKind_IsOne) {
  for (const std::string& file :
       {pcap(kExchange), pcap(kExchange, kRaw, 262144, big_endian), pcapng(kExchange)}) {
    EXPECT_TRUE(qel_wire::is_capture(file));
    EXPECT_EQ(listed(read_capture(file)), "1 > helloyou\n1 < good\n");
    EXPECT_EQ(read_capture(file).streams[0].segments[1].arrival.time,
              std::chrono::microseconds(6000005));
  }
}

TEST(Capture, WithNanoseconds_HasThem) {
  for (const Integer integer : {little_endian, big_endian}) {
    const std::string file = pcap(kExchange, kRaw, 262144, integer, 0xa1b23c4d);
    EXPECT_TRUE(qel_wire::is_capture(file));
    EXPECT_EQ(read_capture(file).streams[0].segments[1].arrival.time,
              std::chrono::nanoseconds(6000000005));
  }
}

TEST(Capture, WithALimit_HasGaps) {
  const auto packets = {from_client(99, kSyn), from_client(100, kAck, "hello"),
                        from_client(105, kAck, "everybody"), from_client(114, kAck, "!")};
  EXPECT_EQ(listed(read_capture(pcap(packets, kRaw, 47))),
            "1 > helloeverybo, ends at a gap of 2 bytes\n"
            "1 > !, begins behind a gap of 2 bytes\n"
            "1 packet not captured whole\n");
  std::string with_options = tcp(kClient, kServer, 105, kAck, std::string(12, '\x01') + "you");
  with_options[12] = '\x80';
  EXPECT_EQ(listed(read_capture(
                pcap({from_client(99, kSyn), from_client(100, kAck, "hello"),
                      ipv4(kClient, kServer, kTcp, with_options), from_client(100, kAck, "hello")},
                     kRaw, 52))),
            "1 > hello, ends at a gap of 3 bytes\n"
            "1 packet not captured whole\n");
  EXPECT_EQ(
      listed(read_capture(pcap(
          {datagram(kClient, kServer, "hello"), datagram(kClient, kServer, "you")}, kRaw, 31))),
      "1 > hel, ends at a gap of 2 bytes\n"
      "1 > you, begins behind a gap of 2 bytes\n"
      "1 packet not captured whole\n");
}

TEST(Capture, WithALimitThatCutsPadding_IsWhole) {
  const std::string frame = std::string(12, '\2') + "\x08\0"s + from_client(99, kSyn, "hello");
  EXPECT_EQ(listed(read_capture(pcap({frame + "padding"}, kEthernet, frame.size() + 2))),
            "1 > hello\n");
}

TEST(Capture, WithATimeThatCannotBe_IsRead) {
  const std::string file = pcapng({from_client(99, kSyn, "hello")}, UINT64_MAX - 1000000);
  EXPECT_EQ(listed(read_capture(file)), "1 > hello\n");
  EXPECT_GE(read_capture(file).streams[0].segments[0].arrival.time, std::chrono::hours(2000000));
}

TEST(Capture, ThatBreaksOff_IsReadUpToThere) {
  const std::string file = pcap(kExchange);
  for (const size_t missing : {1U, 40U, 41U, 55U}) {  // in the last packet, and before it
    qel_wire::Capture capture = read_capture(file.substr(0, file.size() - missing));
    EXPECT_TRUE(capture.is_broken);
    ASSERT_EQ(capture.notes.size(), 1U);
    EXPECT_EQ(capture.notes[0].rfind("nothing is read behind packet 8: truncated", 0), 0U);
    capture.notes.clear();
    EXPECT_EQ(listed(capture), "1 > helloyou\n1 < good\n");
  }
}

TEST(Capture, WithoutPackets_IsEmpty) {
  EXPECT_EQ(listed(std::vector<std::string>{}), "");
}

TEST(Capture, ThatIsNone_IsRefused) {
  for (const std::string& file : {""s, "a"s, "\x0a\x02hi"s, pcap({}).substr(1)}) {
    EXPECT_FALSE(qel_wire::is_capture(file));
    EXPECT_NE(complaint_about(file), "none");
  }
  EXPECT_EQ(complaint_about("\x0a\x02hi"s), "unknown file format");
  EXPECT_EQ(complaint_about(pcap({}).substr(0, 23)).rfind("truncated dump file", 0), 0U);
}

TEST(Capture, OfAnotherKindOfNetwork_IsRefused) {
  EXPECT_EQ(complaint_about(pcap({}, kUsb)),
            "packets of this kind are not read: USB with Linux header");
}

}  // namespace
