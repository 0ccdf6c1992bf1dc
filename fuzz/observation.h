// A call under observation: what it logs, and the stream that it keeps.
#ifndef FUZZ_OBSERVATION_H
#define FUZZ_OBSERVATION_H

#include <string>
#include <vector>

namespace fuzz {

constexpr int kDebug = 3;
constexpr int kWarn = 5;
constexpr int kError = 6;

struct LogLine {
  int priority;
  std::string text;  // without the frame that all lines share
};

inline bool operator==(const LogLine& a, const LogLine& b) {
  return a.priority == b.priority && a.text == b.text;
}

// Takes what is logged while it lives. A finding is a line whose frame does not name the function,
// or is not that of its priority.
class LogWatch {
 public:
  explicit LogWatch(std::string function);
  ~LogWatch();
  LogWatch(const LogWatch&) = delete;
  LogWatch& operator=(const LogWatch&) = delete;

  const std::vector<LogLine>& lines() const { return lines_; }

  void take(int priority, const std::string& line);

 private:
  std::string function_;
  std::vector<LogLine> lines_;
};

// Watches one call of a deserializer, from its construction until release().
class StreamWatch {
 public:
  StreamWatch();
  ~StreamWatch();
  StreamWatch(const StreamWatch&) = delete;
  StreamWatch& operator=(const StreamWatch&) = delete;

  // Releases the input stream that the call left allocated; false if it left none. The interface
  // has it kept, but a run that keeps millions of them ends for want of memory.
  bool release();
};

}  // namespace fuzz

#endif
