#include "export.h"

#include <google/protobuf/descriptor.h>

#include <cstdint>
#include <string>
#include <utility>

#include "listing.h"
#include "schema.h"
#include "text.h"
#include "token.h"

namespace qel_wire {
namespace {

using google::protobuf::Descriptor;

// Of the first message of the schema, whose messages stay in their order. So many ports are free
// there, and no system chooses them for outgoing connections.
constexpr int kFirstPort = 23101;

// Wireshark reads no packet that is longer.
constexpr size_t kMostCaptured = 262144;

template <typename Number>
std::string little_endian(Number number) {
  std::string bytes;
  for (size_t i = 0; i < sizeof number; ++i) {
    bytes += static_cast<char>(number >> (8 * i));
  }
  return bytes;
}

template <typename Number>
std::string big_endian(Number number) {
  const std::string bytes = little_endian(number);
  return {bytes.rbegin(), bytes.rend()};
}

std::string padded(std::string bytes) {
  bytes.resize((bytes.size() + 3) / 4 * 4);
  return bytes;
}

std::string block(uint32_t type, const std::string& body) {
  const std::string size = little_endian(static_cast<uint32_t>(body.size() + 12));
  return little_endian(type) + size + body + size;
}

std::string option(uint16_t code, const std::string& value) {
  return little_endian(code) + little_endian(static_cast<uint16_t>(value.size())) + padded(value);
}

const std::string& end_of_options() {
  static const std::string end(4, '\0');
  return end;
}

// What stands before the message. Numbers are big-endian here.
std::string tag(uint16_t code, const std::string& value) {
  return big_endian(code) + big_endian(static_cast<uint16_t>(value.size())) + value;
}

uint32_t port_of(const Descriptor& type) {
  return static_cast<uint32_t>(kFirstPort + type.index());
}

// The dissector's name, and the ends: the port of the service tells the message, that of the
// plug-in the connection.
std::string tags(const Entry& entry) {
  struct Place {
    uint32_t address;
    uint32_t port;
  };
  Place source = {0x0a000001, 40000 + static_cast<uint32_t>(entry.connection)};
  Place target = {0x0a000002, port_of(*entry.types.front())};
  if (entry.use == Use::kReceives) {
    std::swap(source, target);
  }
  constexpr uint32_t kUdp = 3;
  return tag(12, "protobuf") + tag(20, big_endian(source.address)) +
         tag(21, big_endian(target.address)) + tag(24, big_endian(kUdp)) +
         tag(25, big_endian(source.port)) + tag(26, big_endian(target.port)) + end_of_options();
}

std::string masked(const Entry& entry, const Found& found) {
  std::string bytes(found.bytes);
  const Hidden hidden(found.bytes, *entry.types.front());
  for (size_t i = 0; i < bytes.size(); ++i) {
    bytes[i] = hidden.at(i) ? '*' : bytes[i];
  }
  return bytes;
}

std::string comment_on(const Entry& entry, const Found& found, size_t there) {
  return "message " + std::to_string(entry.number) +
         (found.outcome.has_value() ? ", " + way_of(found) : "") +
         (entry.is_guess ? ", a guess" : "") +
         (entry.answers.has_value() ? ", answers " + std::to_string(*entry.answers) : "") +
         (there < found.size() ? ", " + too_long(found.size(), there) : "");
}

}  // namespace

void write_head(std::ostream* out) {
  constexpr uint16_t kUpperPdu = 252;
  *out << block(0x0a0d0d0a, little_endian(0x1a2b3c4dU) + little_endian(uint16_t{1}) +
                                little_endian(uint16_t{0}) + std::string(8, '\xff'))
       << block(1, little_endian(kUpperPdu) + little_endian(uint16_t{0}) +
                       little_endian(static_cast<uint32_t>(kMostCaptured)) +
                       option(9, "\x09") +  // times in nanoseconds
                       end_of_options());
}

void write_packet(const Entry& entry, const Found& found, std::ostream* out) {
  const auto time = static_cast<uint64_t>(found.time.has_value() ? found.time->count() : 0);
  const std::string head = tags(entry);
  const std::string bytes = masked(entry, found).substr(0, kMostCaptured - head.size());
  // Of a packet that says that it is longer, the dissector shows nothing.
  const std::string size = little_endian(static_cast<uint32_t>(head.size() + bytes.size()));
  const uint32_t direction = entry.use == Use::kReceives ? 1 : entry.use == Use::kSends ? 2 : 0;
  *out << block(6, little_endian(uint32_t{0}) + little_endian(static_cast<uint32_t>(time >> 32U)) +
                       little_endian(static_cast<uint32_t>(time)) + size + size +
                       padded(head + bytes) + option(1, comment_on(entry, found, bytes.size())) +
                       option(2, little_endian(direction)) + end_of_options());
}

void write_ports(std::ostream* out) {
  for (int i = 0; i < schema_file().message_type_count(); ++i) {
    const Descriptor& type = *schema_file().message_type(i);
    *out << '"' << port_of(type) << "\",\"" << type.name() << "\"\n";
  }
}

}  // namespace qel_wire
