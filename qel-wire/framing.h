// Many messages in one stream of bytes.
#ifndef QEL_WIRE_FRAMING_H
#define QEL_WIRE_FRAMING_H

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>

namespace qel_wire {

// The ways to tell where a message ends, parted by '|': by its length, which stands before it as
// varint, u16, u16le, u32 or u32le, or as grpc or the example's framing has it; or by split.
inline constexpr char kFramings[] = "varint|u16|u16le|u32|u32le|grpc|example|split";

struct Frame {
  size_t offset = 0;  // of the message
  size_t size = 0;
  std::string name;  // of the message, where the framing has it
};

using TakeFrame = std::function<void(const Frame& frame)>;

// Where the first frame begins in a stream that may begin within a message, if its framing has the
// names of messages, by which frames are found; otherwise 0.
size_t first_frame(std::string_view stream, const std::string& frames);

// Lets take have each message, from the offset on. Split takes messages that follow each other with
// nothing between them, and cuts before a field with a lower number than the one before it, and
// before a requestId that comes again. Returns why there is no further frame although there are
// bytes, or nothing.
std::string cut(std::string_view stream, const std::string& frames, const TakeFrame& take,
                size_t begin = 0);

}  // namespace qel_wire

#endif
