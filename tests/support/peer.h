// The independent peer: another implementation of Protocol Buffers, Debian's protoc, which turns
// the text form of a message into bytes and back.
#ifndef TESTS_SUPPORT_PEER_H
#define TESTS_SUPPORT_PEER_H

#include <string>

namespace support {

std::string peer_encode(const std::string& message, const std::string& text);
std::string peer_decode(const std::string& message, const std::string& bytes);

}  // namespace support

#endif
