// How the module writes its log lines, which all have the same form.
#ifndef QEL_LOG_LINE_H
#define QEL_LOG_LINE_H

#include <stdint.h>
#include <sys/syscall.h>
#include <unistd.h>

// The device's log service.
extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

namespace {

// The place that a log line names: an exported function, and a line number in the module.
struct CallSite {
  const char* function;
  int line;
};

// The place of the call. As a default argument it is the place of the call that leaves the argument
// out. Do not log in a lambda: the line would not name the exported function.
constexpr CallSite here(const char* function = __builtin_FUNCTION(), int line = __builtin_LINE()) {
  return {function, line};
}

// The kernel is asked each time, because a remembered id would be wrong after a fork.
int thread_id() {
  return static_cast<int>(syscall(SYS_gettid));
}

constexpr int kMainLogBuffer = 0;

// The dlog priority of each level. The level's colour is below.
enum LogPriority { kLogDebug = 3, kLogInfo = 4, kLogWarn = 5, kLogError = 6 };

// An id for %lld: int64_t is long on some machines and long long on others.
constexpr long long lld(int64_t id) {
  return id;
}

}  // namespace

#define QEL_COLOUR_kLogDebug "\033[32m"
#define QEL_COLOUR_kLogInfo "\033[34m"
#define QEL_COLOUR_kLogWarn "\033[33m"
#define QEL_COLOUR_kLogError "\033[31m"

// Logs a line that names the place where the macro stands. A macro makes the whole format one
// literal, which the compiler checks against the arguments.
#define QEL_LOG(PRIORITY, TEXT, ...) QEL_LOG_AT(PRIORITY, here(), TEXT __VA_OPT__(, ) __VA_ARGS__)

// The same with the place as an argument, for the steps that functions share.
#define QEL_LOG_AT(PRIORITY, SITE, TEXT, ...)                               \
  __dlog_print(kMainLogBuffer, PRIORITY, "MESSAGE_PLUGIN",                  \
               "%s: %s(%d) > " QEL_COLOUR_##PRIORITY "[%d]" TEXT "\033[0m", \
               "qel-message-serialize.cc", (SITE).function, (SITE).line,    \
               thread_id() __VA_OPT__(, ) __VA_ARGS__)

#endif
