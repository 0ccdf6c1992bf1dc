// The tests' own __dlog_print: keeps every call with all its arguments.
#ifndef TESTS_SUPPORT_LOG_CAPTURE_H
#define TESTS_SUPPORT_LOG_CAPTURE_H

#include <functional>
#include <ostream>
#include <string>
#include <variant>
#include <vector>

namespace support {

// One variadic argument, of the type that its conversion names: %d, %lld, %s.
using LogArgument = std::variant<int, long long, std::string>;

struct LogCall {
  int log_id;
  int priority;
  std::string tag;
  std::string format;
  std::vector<LogArgument> arguments;
  int thread;  // that called
};

// What is expected of one line, but for the frame that all lines share.
struct Line {
  int priority;
  std::string text;
  std::vector<LogArgument> arguments;
  bool next_round = false;  // of a loop, so that the line's number may go back
};

Line debug(std::string text, std::vector<LogArgument> arguments = {});
Line info(std::string text, std::vector<LogArgument> arguments = {});
Line warn(std::string text, std::vector<LogArgument> arguments = {});
Line error(std::string text, std::vector<LogArgument> arguments = {});
Line next_round(Line line);

// A line's format, with the frame that all lines share.
std::string whole_format(const Line& line);

// All calls since the last clear_log(), of all threads, in order.
std::vector<LogCall> logged_calls();
void clear_log();

// While it lives, this thread's lines come here instead of into the list of all, and without a
// lock, which would put the threads that log into an order and hide their races. One at a time.
class ThreadLog {
 public:
  ThreadLog();
  ~ThreadLog();
  ThreadLog(const ThreadLog&) = delete;
  ThreadLog& operator=(const ThreadLog&) = delete;

  void add(LogCall call) { calls_.push_back(std::move(call)); }
  const std::vector<LogCall>& calls() const { return calls_; }

 private:
  std::vector<LogCall> calls_;
};

// While it lives, is shown each line that this thread logs, at that moment. One at a time.
class LogObserver {
 public:
  explicit LogObserver(std::function<void(const LogCall&)> observe);
  ~LogObserver();
  LogObserver(const LogObserver&) = delete;
  LogObserver& operator=(const LogObserver&) = delete;
};

// An observer that prints to stderr, so that a death test sees what was logged before the end.
void print_format(const LogCall& call);

// Whether this is that line of the function, logged by the calling thread; its number may be any.
bool is_line(const LogCall& call, const std::string& function, const Line& line);

// The log holds exactly these lines: each in the frame of its priority, naming the module, the
// function, the line of the statement that logs it or of the shared step that does, and the calling
// thread; the lines' numbers do not go back, but for a loop's next round. Clears the log.
void expect_log(const std::string& function, const std::vector<Line>& lines);

}  // namespace support

#endif
