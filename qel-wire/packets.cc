#include "packets.h"

#include <arpa/inet.h>
#include <net/ethernet.h>
#include <netinet/ip.h>
#include <netinet/ip6.h>
#include <netinet/tcp.h>
#include <pcap/pcap.h>
#include <pcap/sll.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <deque>
#include <map>
#include <optional>
#include <utility>

#include "failure.h"
#include "pcap_file.h"
#include "text.h"

namespace qel_wire {
namespace {

// ---- From a packet to what TCP or UDP carries in it

struct Packet {
  Arrival arrival;
  std::string_view rest;  // what is not read yet, as far as it was captured
  size_t missing = 0;     // bytes behind it that were not
  std::string from, to;   // address, and then port
  bool from_higher = false;
  std::optional<tcphdr> tcp;
};

// What is said of packets, behind how many they are.
using Remark = std::string_view;
constexpr Remark kWhole;
constexpr Remark kOther = " left out: of other protocols than TCP and UDP";
constexpr Remark kFragment = " left out: fragments of IP packets, which are not put together";
constexpr Remark kBrokenHeader = " left out: headers that are broken or not captured whole";
constexpr Remark kIncomplete = " not captured whole";

// Whether the packet goes on with such a header; it still does after that.
template <typename Header>
bool look(const Packet& packet, Header* header) {
  if (packet.rest.size() < sizeof *header) {
    return false;
  }
  std::memcpy(header, packet.rest.data(), sizeof *header);
  return true;
}

bool skip(size_t size, Packet* packet) {
  if (packet->rest.size() < size) {
    return false;
  }
  packet->rest.remove_prefix(size);
  return true;
}

// Skips a header, and ends the packet where the header says, as padding may follow. The length is 0
// if it is too large to tell: the network card divides such a packet.
bool enter(size_t header_size, size_t length, Packet* packet) {
  if (length != 0) {
    packet->rest = packet->rest.substr(0, length);
    packet->missing = length - packet->rest.size();
  }
  return skip(header_size, packet);
}

uint16_t number_at(size_t offset, std::string_view bytes) {
  uint16_t number = 0;
  std::memcpy(&number, bytes.data() + offset, sizeof number);
  return ntohs(number);
}

Remark read_transport(int protocol, Packet* packet) {
  if (protocol != IPPROTO_TCP && protocol != IPPROTO_UDP) {
    return kOther;
  }
  constexpr size_t kUdpHeader = 8;  // the ports, which both begin with, and the length
  const std::string_view header = packet->rest;
  if (header.size() < kUdpHeader) {
    return kBrokenHeader;
  }
  packet->from_higher = number_at(0, header) >= number_at(2, header);
  packet->from += ":" + std::to_string(number_at(0, header));
  packet->to += ":" + std::to_string(number_at(2, header));
  if (protocol == IPPROTO_UDP) {
    return enter(kUdpHeader, number_at(4, header), packet) ? kWhole : kBrokenHeader;
  }
  tcphdr tcp;
  if (!look(*packet, &tcp) || tcp.th_off < 5 || !skip(tcp.th_off * size_t{4}, packet)) {
    return kBrokenHeader;
  }
  packet->tcp = tcp;
  return kWhole;
}

template <typename Address>
std::string text_of(int family, const Address& address) {
  std::array<char, INET6_ADDRSTRLEN> text{};
  inet_ntop(family, &address, text.data(), text.size());
  return text.data();
}

Remark read_ipv4(Packet* packet) {
  ip header;
  if (!look(*packet, &header) || header.ip_hl < 5 ||
      !enter(header.ip_hl * size_t{4}, ntohs(header.ip_len), packet)) {
    return kBrokenHeader;
  }
  if ((ntohs(header.ip_off) & (IP_MF | IP_OFFMASK)) != 0) {
    return kFragment;
  }
  packet->from = text_of(AF_INET, header.ip_src);
  packet->to = text_of(AF_INET, header.ip_dst);
  return read_transport(header.ip_p, packet);
}

Remark read_ipv6(Packet* packet) {
  ip6_hdr header;
  if (!look(*packet, &header)) {
    return kBrokenHeader;
  }
  const size_t length = ntohs(header.ip6_plen);
  if (!enter(sizeof header, length == 0 ? 0 : sizeof header + length, packet)) {
    return kBrokenHeader;
  }
  int protocol = header.ip6_nxt;
  while (protocol == IPPROTO_HOPOPTS || protocol == IPPROTO_ROUTING ||
         protocol == IPPROTO_DSTOPTS || protocol == IPPROTO_FRAGMENT) {
    ip6_frag extension;  // the others have their size where it has a 0
    if (!look(*packet, &extension) || !skip((extension.ip6f_reserved + size_t{1}) * 8, packet)) {
      return kBrokenHeader;
    }
    if (protocol == IPPROTO_FRAGMENT &&
        (extension.ip6f_offlg & (IP6F_OFF_MASK | IP6F_MORE_FRAG)) != 0) {
      return kFragment;
    }
    protocol = extension.ip6f_nxt;
  }
  packet->from = "[" + text_of(AF_INET6, header.ip6_src) + "]";
  packet->to = "[" + text_of(AF_INET6, header.ip6_dst) + "]";
  return read_transport(protocol, packet);
}

// What comes before IP.
struct Link {
  int type;
  size_t size;
  std::optional<size_t> protocol;  // where it stands
};

constexpr Link kLinks[] = {
    {DLT_EN10MB, sizeof(ether_header), offsetof(ether_header, ether_type)},
    {DLT_LINUX_SLL, sizeof(sll_header), offsetof(sll_header, sll_protocol)},
    {DLT_LINUX_SLL2, sizeof(sll2_header), offsetof(sll2_header, sll2_protocol)},
    {DLT_NULL, 4, {}},
    {DLT_LOOP, 4, {}},
    {DLT_RAW, 0, {}},
    {DLT_IPV4, 0, {}},
    {DLT_IPV6, 0, {}},
};

Remark read_packet(const Link& link, Packet* packet) {
  std::string_view header = packet->rest;
  if (!skip(link.size, packet)) {
    return kBrokenHeader;
  }
  if (link.protocol.has_value()) {
    uint16_t protocol = number_at(*link.protocol, header);
    while (protocol == ETHERTYPE_VLAN || protocol == 0x88a8) {  // which may be around a VLAN
      header = packet->rest;
      if (!skip(4, packet)) {
        return kBrokenHeader;
      }
      protocol = number_at(2, header);
    }
    if (protocol != ETHERTYPE_IP && protocol != ETHERTYPE_IPV6) {
      return kOther;
    }
  }
  const int version = packet->rest.empty() ? 0 : (packet->rest.front() >> 4) & 0xf;
  return version == 4 ? read_ipv4(packet) : version == 6 ? read_ipv6(packet) : kBrokenHeader;
}

// ---- From there to streams

// What one end sent to the other.
struct Sent {
  struct Piece {
    int64_t offset;
    size_t at, size;  // in the bytes
    Arrival arrival;
  };

  std::string bytes;  // as they came
  std::vector<Piece> pieces;
  std::optional<uint32_t> base;  // the sequence number of offset 0
  bool has_begin = false;        // whether nothing was sent before that
  int64_t end = 0;               // of all that was sent
  int64_t taken = 0;             // up to there it is in streams
};

using Ends = std::pair<std::string, std::string>;  // the lesser first

struct Connection {
  const Ends* ends;
  size_t client;  // which of the ends
  bool is_reset = false;
  std::array<Sent, 2> sent = {};  // by which end
};

bool has(const tcphdr& header, int flag) {
  return (header.th_flags & flag) != 0;
}

// Of a packet that has bytes or tells where they end. Others may repeat the number of a byte.
void add_bytes(const Packet& packet, uint32_t number, Sent* sent) {
  if (!sent->base.has_value()) {
    sent->base = number;
  }
  // Numbers start again at 0, offsets do not: it is the one that is nearest to the end.
  const uint32_t from_end = number - *sent->base - static_cast<uint32_t>(sent->end);
  const int64_t offset = sent->end + static_cast<int32_t>(from_end);
  const size_t size = packet.rest.size();
  sent->pieces.push_back({offset, sent->bytes.size(), size, packet.arrival});
  sent->bytes += packet.rest;
  sent->end = std::max(sent->end, offset + static_cast<int64_t>(size + packet.missing));
}

void add_segment(const Packet& packet, size_t side, Connection* connection) {
  const tcphdr& header = *packet.tcp;
  Sent& sent = connection->sent.at(side);
  uint32_t number = ntohl(header.th_seq);
  if (has(header, TH_RST)) {  // it has no bytes, and may have any number
    connection->is_reset = true;
    return;
  }
  if (has(header, TH_SYN)) {
    connection->client = has(header, TH_ACK) ? 1 - side : side;
    sent.base = ++number;
    sent.has_begin = true;
  }
  if (!packet.rest.empty() || packet.missing > 0 || has(header, TH_FIN)) {
    add_bytes(packet, number, &sent);
  }
}

// Whether the segment is of a later connection between the same ends.
bool opens_another(const tcphdr& header, size_t side, const Connection& connection) {
  const std::optional<uint32_t>& base = connection.sent.at(side).base;
  if (!has(header, TH_SYN)) {
    return false;
  }
  return base.has_value() ? *base != ntohl(header.th_seq) + 1
                          : !has(header, TH_ACK) && !connection.sent.at(1 - side).has_begin;
}

// Adds what is new of the piece. Of bytes that came twice, it has those of the packet that begins
// further in front, or else came first.
void append(const Sent::Piece& piece, Sent* sent, Stream* stream) {
  const auto known = static_cast<size_t>(sent->taken - piece.offset);
  if (known >= piece.size) {
    return;
  }
  Arrival arrival = piece.arrival;
  if (!stream->segments.empty() && stream->segments.back().arrival.packet > arrival.packet) {
    arrival = stream->segments.back().arrival;
  }
  stream->segments.push_back({stream->bytes.size(), arrival});
  stream->bytes.append(sent->bytes, piece.at + known, piece.size - known);
  sent->taken = piece.offset + static_cast<int64_t>(piece.size);
}

std::string gap_of(int64_t size) {
  return "a gap of " + counted(static_cast<size_t>(size), "byte");
}

// Appends all that was sent, in streams that begin as the empty one does.
void append_streams(const Stream& empty, Sent* sent, std::vector<Stream>* streams) {
  std::stable_sort(sent->pieces.begin(), sent->pieces.end(),
                   [](const auto& one, const auto& other) { return one.offset < other.offset; });
  auto piece = sent->pieces.begin();
  while (piece != sent->pieces.end()) {
    Stream stream = empty;
    if (!sent->has_begin) {
      stream.notes.emplace_back("begins in the middle of the connection");
    } else if (piece->offset > sent->taken) {
      stream.notes.push_back("begins behind " + gap_of(piece->offset - sent->taken));
    }
    stream.is_cut = !stream.notes.empty();
    if (stream.is_cut) {
      sent->taken = piece->offset;
      sent->has_begin = true;
    }
    // The memory of one copy, where there is no gap.
    stream.bytes.reserve(piece == sent->pieces.begin() ? sent->bytes.size() : 0);
    for (; piece != sent->pieces.end() && piece->offset <= sent->taken; ++piece) {
      append(*piece, sent, &stream);
    }
    const int64_t next = piece == sent->pieces.end() ? sent->end : piece->offset;
    if (next > sent->taken) {
      stream.notes.push_back("ends at " + gap_of(next - sent->taken));
    }
    if (!stream.segments.empty()) {
      streams->push_back(std::move(stream));
    }
  }
}

class Connections {
 public:
  void add(const Packet& packet) {
    const size_t side = packet.to < packet.from ? 1 : 0;
    Connection& connection = connection_of(packet, side);
    if (packet.tcp.has_value()) {
      add_segment(packet, side, &connection);
    } else {
      Sent& sent = connection.sent.at(side);
      sent.has_begin = true;
      add_bytes(packet, static_cast<uint32_t>(sent.end), &sent);
    }
  }

  // None is left here.
  std::vector<Stream> take_streams() {
    std::vector<Stream> streams;
    for (Connection& connection : all_) {
      const size_t number = streams.empty() ? 1 : streams.back().connection + 1;
      for (const size_t side : {connection.client, 1 - connection.client}) {
        Stream empty;
        empty.from = side == 0 ? connection.ends->first : connection.ends->second;
        empty.to = side == 0 ? connection.ends->second : connection.ends->first;
        empty.connection = number;
        empty.from_client = side == connection.client;
        empty.is_reset = connection.is_reset;
        append_streams(empty, &connection.sent.at(side), &streams);
        connection.sent.at(side) = {};
      }
    }
    return streams;
  }

 private:
  Connection& connection_of(const Packet& packet, size_t side) {
    const bool is_tcp = packet.tcp.has_value();
    const auto [place, is_new] =
        latest_.try_emplace({is_tcp, std::minmax(packet.from, packet.to)}, all_.size());
    if (is_new || (is_tcp && opens_another(*packet.tcp, side, all_[place->second]))) {
      place->second = all_.size();
      all_.push_back({&place->first.second, packet.from_higher ? side : 1 - side});
    }
    return all_[place->second];
  }

  std::deque<Connection> all_;
  std::map<std::pair<bool, Ends>, size_t> latest_;  // between these ends, by TCP or not
};

// ---- The file

const Link& link_of(pcap_t* pcap) {
  const int type = pcap_datalink(pcap);
  for (const Link& link : kLinks) {
    if (link.type == type) {
      return link;
    }
  }
  throw Failure{kBroken, std::string("packets of this kind are not read: ") +
                             pcap_datalink_val_to_description_or_dlt(type)};
}

}  // namespace

const Segment& Stream::segment_at(size_t offset) const {
  return *std::prev(std::upper_bound(
      segments.begin(), segments.end(), offset,
      [](size_t wanted, const Segment& segment) { return wanted < segment.offset; }));
}

Capture read_capture(const std::string& file) {
  const Pcap pcap = open_pcap(file);
  const Link& link = link_of(pcap.get());
  Connections connections;
  std::map<Remark, size_t> remarks;
  size_t count = 0;
  pcap_pkthdr* header = nullptr;
  const u_char* bytes = nullptr;
  int status = 0;
  while ((status = pcap_next_ex(pcap.get(), &header, &bytes)) == 1) {
    Packet packet;
    packet.arrival = {++count, time_of(header->ts)};
    packet.rest = {reinterpret_cast<const char*>(bytes), header->caplen};
    Remark remark = read_packet(link, &packet);
    if (remark == kWhole) {
      connections.add(packet);
      remark = packet.missing > 0 ? kIncomplete : kWhole;
    }
    ++remarks[remark];
  }
  Capture capture;
  capture.streams = connections.take_streams();
  remarks.erase(kWhole);
  for (const auto& [remark, packets] : remarks) {
    capture.notes.push_back(counted(packets, "packet") + std::string(remark));
  }
  capture.is_broken = status == PCAP_ERROR;
  if (capture.is_broken) {
    capture.notes.push_back("nothing is read behind packet " + std::to_string(count) + ": " +
                            pcap_geterr(pcap.get()));
  }
  return capture;
}

}  // namespace qel_wire
