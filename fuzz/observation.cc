#include "observation.h"

#include <google/protobuf/io/coded_stream.h>
#include <sanitizer/allocator_interface.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdio>

#include "support/heap.h"
#include "target.h"

namespace {

using fuzz::kDebug;
using fuzz::kError;
using google::protobuf::io::CodedInputStream;

fuzz::LogWatch* log_watch = nullptr;

bool is_watching = false;
bool is_paused = false;
// The first block of a stream's size that the call allocates: the stream comes before the message.
const volatile void* stream = nullptr;
bool is_stream_live = false;

void note_malloc(const volatile void* block, size_t size) {
  if (is_watching && !is_paused && stream == nullptr && size == sizeof(CodedInputStream)) {
    stream = block;
    is_stream_live = true;
  }
}

void note_free(const volatile void* block) {
  if (block == stream) {
    is_stream_live = false;
  }
}

// Every line's frame: the file, the function, a line of it, the priority's colour, the thread.
std::string start_of_line(const std::string& function) {
  return "qel-message-serialize.cc: " + function + "(";
}

std::string middle_of_line(int priority) {
  constexpr const char* kColours[] = {"32", "34", "33", "31"};
  if (priority < kDebug || priority > kError) {
    fuzz::fail("a log line of priority " + std::to_string(priority));
  }
  return std::string(") > \033[") + kColours[priority - kDebug] + "m[" +
         std::to_string(syscall(SYS_gettid)) + "]";
}

const char kEndOfLine[] = "\033[0m";

bool stands_at(const std::string& text, size_t at, const std::string& part) {
  return text.compare(at, part.size(), part) == 0;
}

}  // namespace

namespace support {

// What the tests' own code allocates during a call.
HeapPause::HeapPause() {
  is_paused = true;
}
HeapPause::~HeapPause() {
  is_paused = false;
}

}  // namespace support

namespace fuzz {

LogWatch::LogWatch(std::string function) : function_(std::move(function)) {
  log_watch = this;
}
LogWatch::~LogWatch() {
  log_watch = nullptr;
}

void LogWatch::take(int priority, const std::string& line) {
  const std::string start = start_of_line(function_);
  const std::string middle = middle_of_line(priority);
  const std::string end = kEndOfLine;
  const size_t number_end = line.find_first_not_of("0123456789", start.size());
  if (!stands_at(line, 0, start) || number_end == start.size() ||
      !stands_at(line, number_end, middle) ||
      line.size() < number_end + middle.size() + end.size() ||
      !stands_at(line, line.size() - end.size(), end)) {
    fail("a log line in another frame: " + line);
  }
  const size_t text = number_end + middle.size();
  lines_.push_back({priority, line.substr(text, line.size() - end.size() - text)});
}

StreamWatch::StreamWatch() {
  [[maybe_unused]] static const int installed =
      __sanitizer_install_malloc_and_free_hooks(note_malloc, note_free);
  stream = nullptr;
  is_stream_live = false;
  is_watching = true;
}
StreamWatch::~StreamWatch() {
  is_watching = false;
}

bool StreamWatch::release() {
  is_watching = false;
  if (!is_stream_live) {
    return false;
  }
  delete static_cast<CodedInputStream*>(const_cast<void*>(stream));
  return true;
}

}  // namespace fuzz

// In the program itself, so that the library finds it before any log service.
extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...) {
  const support::HeapPause pause;
  char line[512];
  va_list arguments;
  va_start(arguments, format);
  const int length = std::vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  if (log_watch == nullptr || log_id != 0 || std::string(tag) != "MESSAGE_PLUGIN" || length < 0 ||
      length >= static_cast<int>(sizeof line)) {
    fuzz::fail("an unexpected log line: " + std::string(format));
  }
  log_watch->take(priority, line);
  return length;
}
