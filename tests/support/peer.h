// The independent peer: another implementation of Protocol Buffers, Debian's protoc, which turns
// the text form of a message into bytes and back.
#ifndef TESTS_SUPPORT_PEER_H
#define TESTS_SUPPORT_PEER_H

#include <string>
#include <vector>

namespace support {

std::string peer_encode(const std::string& message, const std::string& text);
std::string peer_decode(const std::string& message, const std::string& bytes);

// Many messages at a time, in their order: it is the peer's start that takes time. The peer knows
// the messages from the given schema, the text of a .proto file.
struct PeerItem {
  std::string message;
  std::string content;  // text form or bytes
};
std::vector<std::string> peer_encode_all(const std::string& schema,
                                         const std::vector<PeerItem>& texts);
std::vector<std::string> peer_decode_all(const std::string& schema,
                                         const std::vector<PeerItem>& encodings);

// The library's own.
std::string library_schema();

}  // namespace support

#endif
