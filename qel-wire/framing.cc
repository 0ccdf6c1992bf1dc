#include "framing.h"

#include <google/protobuf/io/coded_stream.h>

#include <algorithm>
#include <cctype>

#include "schema.h"
#include "text.h"
#include "walk.h"

namespace qel_wire {
namespace {

// What stands before a message.
struct Head {
  size_t size = 0;    // of the head itself
  size_t length = 0;  // of the message
  std::string name;
  std::string problem;  // why it is none
};

Head number_of(std::string_view bytes, size_t size, bool is_little_endian) {
  Head head{size, 0, "", ""};
  for (size_t i = 0; i < size && size <= bytes.size(); ++i) {
    const char byte = bytes[is_little_endian ? size - 1 - i : i];
    head.length = head.length << 8U | static_cast<unsigned char>(byte);
  }
  return head;
}

Head varint(std::string_view bytes) {
  google::protobuf::io::CodedInputStream input(
      reinterpret_cast<const google::protobuf::uint8*>(bytes.data()),
      static_cast<int>(bytes.size()));
  google::protobuf::uint64 length = 0;
  if (input.ReadVarint64(&length)) {
    return {static_cast<size_t>(input.CurrentPosition()), length, "", ""};
  }
  // It goes on behind the bytes, or too far.
  return {bytes.size() + 1, 0, "", bytes.size() >= 10 ? "a length has more than 10 bytes" : ""};
}

// A byte says whether the message is compressed.
Head grpc(std::string_view bytes) {
  Head head = number_of(bytes.substr(std::min<size_t>(bytes.size(), 1)), 4, false);
  ++head.size;
  if (!bytes.empty() && bytes[0] != 0) {
    head.problem = bytes[0] == 1 ? "the message is compressed" : "no frame of gRPC begins so";
  }
  return head;
}

// The length of the name, the name, the length of the message.
Head example(std::string_view bytes) {
  const size_t name = bytes.empty() ? 0 : static_cast<unsigned char>(bytes[0]);
  if (bytes.size() < name + 1) {
    return {name + 5, 0, "", ""};
  }
  Head head = number_of(bytes.substr(name + 1), 4, false);
  head.size += name + 1;
  head.name = std::string(bytes.substr(1, name));
  if (std::any_of(head.name.begin(), head.name.end(),
                  [](unsigned char c) { return std::isalnum(c) == 0; })) {
    head.problem = "a name has other characters than letters and digits";
  }
  return head;
}

Head head_of(std::string_view bytes, const std::string& frames) {
  if (frames == "varint") {
    return varint(bytes);
  }
  if (frames == "grpc") {
    return grpc(bytes);
  }
  if (frames == "example") {
    return example(bytes);
  }
  return number_of(bytes, frames.substr(0, 3) == "u16" ? 2 : 4, frames.substr(3) == "le");
}

// Why a frame cannot be read, or nothing. So many bytes are left from its head on.
std::string problem_of_head(const Head& head, size_t left) {
  if (!head.problem.empty()) {
    return head.problem;
  }
  if (left < head.size) {
    return "the input ends before its message";
  }
  const size_t there = left - head.size;
  return there >= head.length ? "" : "the length of its message is " + too_long(head.length, there);
}

std::string cut_frames(std::string_view stream, const std::string& frames, const TakeFrame& take,
                       size_t begin) {
  for (size_t at = begin; at < stream.size();) {
    const Head head = head_of(stream.substr(at), frames);
    const std::string problem = problem_of_head(head, stream.size() - at);
    if (!problem.empty()) {
      return "the frame at offset " + std::to_string(at) + " cannot be read: " + problem;
    }
    take({at + head.size, head.length, head.name});
    at += head.size + head.length;
  }
  return "";
}

void cut_run(std::string_view stream, const TakeFrame& take) {
  Reader reader(stream);
  Level level(nullptr, stream.size(), 0);
  size_t begin = 0;
  uint32_t last = 0;
  for (Piece piece; reader.next(&level, &piece);) {
    reader.skip(&piece, level);
    if (piece.number < last ||
        (piece.number == last && piece.kind == Piece::kVarint && may_be_request_id(piece.number))) {
      take({begin, piece.offset - begin, ""});
      begin = piece.offset;
    }
    last = piece.number;
  }
  if (begin < stream.size()) {
    take({begin, stream.size() - begin, ""});
  }
}

}  // namespace

size_t first_frame(std::string_view stream, const std::string& frames) {
  if (frames != "example") {
    return 0;
  }
  const Head first = example(stream);
  if (!first.name.empty() && problem_of_head(first, stream.size()).empty()) {
    return 0;  // whatever its name
  }
  for (size_t at = 1; at + 1 < stream.size(); ++at) {
    const std::string_view name = stream.substr(at + 1, static_cast<unsigned char>(stream[at]));
    if (!name.empty() && std::isupper(static_cast<unsigned char>(name.front())) != 0 &&
        schema_file().FindMessageTypeByName(std::string(name)) != nullptr) {
      return at;
    }
  }
  return 0;
}

std::string cut(std::string_view stream, const std::string& frames, const TakeFrame& take,
                size_t begin) {
  if (frames != "split") {
    return cut_frames(stream, frames, take, begin);
  }
  cut_run(stream, take);
  return "";
}

}  // namespace qel_wire
