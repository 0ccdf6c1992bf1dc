#ifndef QEL_WIRE_MISREAD_H
#define QEL_WIRE_MISREAD_H

#include <algorithm>
#include <cstddef>
#include <string>
#include <string_view>

namespace qel_wire {

// Thrown: where a text is not what it should be. Lines and columns count from 1; columns are bytes,
// but a tab of the text form goes to the next multiple of 8. A line of 0: the place is not known.
struct Misread {
  size_t line = 0;
  size_t column = 0;
  std::string reason;

  std::string text() const {
    return (line == 0 ? "" : std::to_string(line) + ":" + std::to_string(column) + ": ") + reason;
  }
};

inline Misread misread_at(std::string_view text, size_t offset, const std::string& reason) {
  const std::string_view before = text.substr(0, offset);
  const auto line = static_cast<size_t>(std::count(before.begin(), before.end(), '\n')) + 1;
  const size_t end_of_line = before.rfind('\n');
  return {line, end_of_line == std::string_view::npos ? offset + 1 : offset - end_of_line, reason};
}

}  // namespace qel_wire

#endif
