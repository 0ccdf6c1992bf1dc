// The log line: one shape for every line of the module.
#ifndef QEL_LOG_LINE_H
#define QEL_LOG_LINE_H

#include <stdint.h>
#include <sys/syscall.h>
#include <unistd.h>

// The device's log service.
extern "C" int __dlog_print(int log_id, int priority, const char* tag, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

namespace {

// Where a line says that it was logged: the exported function, and the line in the module of the
// step concerned.
struct CallSite {
  const char* function;
  int line;
};

// The caller's own place. As a default argument: the place of the call that leaves it out. In a
// lambda it names the lambda, so log from the exported function's own body.
constexpr CallSite here(const char* function = __builtin_FUNCTION(), int line = __builtin_LINE()) {
  return {function, line};
}

// Asked of the kernel for each line: a cached id would be wrong in a forked process.
int thread_id() {
  return static_cast<int>(syscall(SYS_gettid));
}

constexpr int kMainLogBuffer = 0;

// A level's dlog priority; its colour is bound to it.
enum LogPriority { kLogDebug = 3, kLogInfo = 4, kLogWarn = 5, kLogError = 6 };

// An id as %lld takes it: int64_t is another type on some machines.
constexpr long long lld(int64_t id) {
  return id;
}

}  // namespace

#define QEL_COLOUR_kLogDebug "\033[32m"
#define QEL_COLOUR_kLogInfo "\033[34m"
#define QEL_COLOUR_kLogWarn "\033[33m"
#define QEL_COLOUR_kLogError "\033[31m"

// Logs a line of the exported function in which it stands. A macro, so that the whole format is one
// literal and the compiler checks it against the arguments.
#define QEL_LOG(PRIORITY, TEXT, ...) QEL_LOG_AT(PRIORITY, here(), TEXT __VA_OPT__(, ) __VA_ARGS__)

// The same for a shared step, which knows its call's place.
#define QEL_LOG_AT(PRIORITY, SITE, TEXT, ...)                               \
  __dlog_print(kMainLogBuffer, PRIORITY, "MESSAGE_PLUGIN",                  \
               "%s: %s(%d) > " QEL_COLOUR_##PRIORITY "[%d]" TEXT "\033[0m", \
               "qel-message-serialize.cc", (SITE).function, (SITE).line,    \
               thread_id() __VA_OPT__(, ) __VA_ARGS__)

#endif
