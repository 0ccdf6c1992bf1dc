#include "support/log_capture.h"

#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <fstream>
#include <map>
#include <mutex>
#include <stdexcept>

#include "support/heap.h"

namespace support {
namespace {

std::mutex mutex;
std::vector<LogCall> calls;
thread_local std::function<void(const LogCall&)> observer;
thread_local ThreadLog* thread_log = nullptr;

std::vector<LogArgument> read_arguments(const std::string& format, va_list list) {
  std::vector<LogArgument> arguments;
  for (size_t at = format.find('%'); at != std::string::npos; at = format.find('%', at + 1)) {
    if (format.compare(at, 2, "%s") == 0) {
      arguments.emplace_back(std::string(va_arg(list, const char*)));
    } else if (format.compare(at, 2, "%d") == 0) {
      arguments.emplace_back(va_arg(list, int));
    } else if (format.compare(at, 4, "%lld") == 0) {
      arguments.emplace_back(va_arg(list, long long));
    } else {
      throw std::invalid_argument("a conversion that the log capture does not know: " + format);
    }
  }
  return arguments;
}

const std::vector<std::string>& module_source() {
  static const std::vector<std::string> lines = [] {
    std::vector<std::string> read;
    std::ifstream file(QEL_MODULE_SOURCE);
    for (std::string line; std::getline(file, line);) {
      read.push_back(line);
    }
    return read;
  }();
  return lines;
}

// First and last line of a function's definition, from 1; {0, 0} if there is none.
std::pair<int, int> lines_of(const std::string& function) {
  const auto& source = module_source();
  int first = 0;
  for (size_t i = 0; i < source.size(); ++i) {
    const std::string& line = source[i];
    if (line.rfind("int " + function + "(", 0) == 0 ||
        line.rfind("void " + function + "(", 0) == 0) {
      first = static_cast<int>(i) + 1;
    }
    if (first != 0 && line == "}") {
      return {first, static_cast<int>(i) + 1};
    }
  }
  return {0, 0};
}

// A text as it is written in the source.
std::string literal(const std::string& text) {
  std::string written = "\"";
  for (const char c : text) {
    written += c == '\n' ? "\\n" : std::string(1, c);
  }
  return written + '"';
}

// What stands in the source where the function logs the line.
std::string statement_of(const std::string& function, const Line& line) {
  const bool ends_encode = line.priority == 3 && line.text == "%s: exit" &&
                           function != "is_typing_request_serialize";  // which does without
  if (ends_encode || line.text == "Invalid serialized data size : %d" ||
      line.text == "Could not allocate memory for serialized data") {
    return "encode(";
  }
  if (line.text == "merge error : Could not parse the received data!" ||
      line.text == "ConsumedEntireMessage error :Could not parse the received data") {
    return "parse(";
  }
  return literal(line.text);
}

// The module's statement on a line, from its beginning up to that line: compilers differ in which
// line of a call of several they name.
std::string statement_at(int line) {
  const auto& source = module_source();
  std::string statement;
  for (size_t i = static_cast<size_t>(line); i > 0; --i) {
    const std::string& text = source[i - 1];
    const bool ends_another =
        text.empty() || std::string(";{}").find(text.back()) != std::string::npos;
    if (ends_another && !statement.empty()) {
      break;
    }
    statement.insert(0, text);
  }
  return statement;
}

std::string printed(const std::vector<LogArgument>& arguments) {
  std::string text;
  for (const LogArgument& argument : arguments) {
    text += text.empty() ? "" : ", ";
    if (const auto* number = std::get_if<int>(&argument)) {
      text += std::to_string(*number);
    } else if (const auto* wide = std::get_if<long long>(&argument)) {
      text += std::to_string(*wide) + "LL";
    } else {
      text += "\"" + std::get<std::string>(argument) + "\"";
    }
  }
  return text;
}

}  // namespace

Line debug(std::string text, std::vector<LogArgument> arguments) {
  return {3, std::move(text), std::move(arguments)};
}
Line info(std::string text, std::vector<LogArgument> arguments) {
  return {4, std::move(text), std::move(arguments)};
}
Line warn(std::string text, std::vector<LogArgument> arguments) {
  return {5, std::move(text), std::move(arguments)};
}
Line error(std::string text, std::vector<LogArgument> arguments) {
  return {6, std::move(text), std::move(arguments)};
}

Line next_round(Line line) {
  line.next_round = true;
  return line;
}

std::string whole_format(const Line& line) {
  static const std::map<int, std::string> colours = {
      {3, "\033[32m"}, {4, "\033[34m"}, {5, "\033[33m"}, {6, "\033[31m"}};
  return "%s: %s(%d) > " + colours.at(line.priority) + "[%d]" + line.text + "\033[0m";
}

std::vector<LogCall> logged_calls() {
  const std::lock_guard<std::mutex> lock(mutex);
  return calls;
}

void clear_log() {
  const std::lock_guard<std::mutex> lock(mutex);
  calls.clear();
}

ThreadLog::ThreadLog() {
  thread_log = this;
}
ThreadLog::~ThreadLog() {
  thread_log = nullptr;
}

LogObserver::LogObserver(std::function<void(const LogCall&)> observe) {
  observer = std::move(observe);
}
LogObserver::~LogObserver() {
  observer = nullptr;
}

void print_format(const LogCall& call) {
  std::fprintf(stderr, "%s\n", call.format.c_str());
}

bool is_line(const LogCall& call, const std::string& function, const Line& line) {
  if (call.log_id != 0 || call.priority != line.priority || call.tag != "MESSAGE_PLUGIN" ||
      call.format != whole_format(line) || call.arguments.size() != 4 + line.arguments.size()) {
    return false;
  }
  const auto& arguments = call.arguments;
  return arguments[0] == LogArgument("qel-message-serialize.cc") &&
         arguments[1] == LogArgument(function) && std::holds_alternative<int>(arguments[2]) &&
         arguments[3] == LogArgument(static_cast<int>(syscall(SYS_gettid))) &&
         std::equal(line.arguments.begin(), line.arguments.end(), arguments.begin() + 4);
}

void expect_log(const std::string& function, const std::vector<Line>& lines) {
  const std::vector<LogCall> logged = logged_calls();
  clear_log();
  const auto [first, last] = lines_of(function);
  ASSERT_NE(first, 0) << function << " is not in the module";

  int line_before = first;
  for (size_t i = 0; i < logged.size() && i < lines.size(); ++i) {
    SCOPED_TRACE(function + ", log line " + std::to_string(i));
    const LogCall& call = logged[i];
    EXPECT_EQ(call.log_id, 0);
    EXPECT_EQ(call.priority, lines[i].priority);
    EXPECT_EQ(call.tag, "MESSAGE_PLUGIN");
    EXPECT_EQ(call.format, whole_format(lines[i]));
    ASSERT_GE(call.arguments.size(), 4u);
    const int* line = std::get_if<int>(&call.arguments[2]);
    ASSERT_NE(line, nullptr);
    ASSERT_GE(*line, lines[i].next_round ? first : line_before);
    ASSERT_LE(*line, last);
    EXPECT_NE(statement_at(*line).find(statement_of(function, lines[i])), std::string::npos)
        << "line " << *line << " does not log " << lines[i].text;
    line_before = *line;

    std::vector<LogArgument> expected = {std::string("qel-message-serialize.cc"), function, *line,
                                         call.thread};
    expected.insert(expected.end(), lines[i].arguments.begin(), lines[i].arguments.end());
    EXPECT_TRUE(call.arguments == expected)
        << "logged:   " << printed(call.arguments) << "\nexpected: " << printed(expected);
  }
  for (size_t i = lines.size(); i < logged.size(); ++i) {
    ADD_FAILURE() << function << ", surplus log line: " << logged[i].format;
  }
  for (size_t i = logged.size(); i < lines.size(); ++i) {
    ADD_FAILURE() << function << ", missing log line: " << whole_format(lines[i]);
  }
}

}  // namespace support

// In the program itself, so that the library finds it before any log service.
extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...) {
  const support::HeapPause pause;
  va_list list;
  va_start(list, format);
  support::LogCall call{log_id,
                        priority,
                        tag,
                        format,
                        support::read_arguments(format, list),
                        static_cast<int>(syscall(SYS_gettid))};
  va_end(list);
  if (support::observer) {
    support::observer(call);
  }
  if (support::thread_log != nullptr) {
    support::thread_log->add(std::move(call));
    return 0;
  }
  const std::lock_guard<std::mutex> lock(support::mutex);
  support::calls.push_back(std::move(call));
  return 0;
}
