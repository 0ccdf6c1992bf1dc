// Ways in which a process ends, for EXPECT_EXIT.
#ifndef TESTS_SUPPORT_PROCESS_DEATH_H
#define TESTS_SUPPORT_PROCESS_DEATH_H

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <csignal>
#include <string>

#include "address_sanitizer.h"

namespace support {

inline bool aborts(int status) {
  return WIFSIGNALED(status) && WTERMSIG(status) == SIGABRT;
}

// What the abort of an enum setter says, for EXPECT_EXIT: the file, the setter and the assertion.
inline std::string refused_by_setter(const std::string& message, const std::string& field,
                                     const std::string& type) {
#ifdef __clang__
  const std::string argument = "::" + type;  // its way of naming the function
#else
  const std::string argument = type;
#endif
  return ": proto-lib/msgspec_frontend\\.pb\\.h:[0-9]+: void " + message + "::set_" + field +
         "\\(" + argument + "\\): Assertion `::" + type + "_IsValid\\(value\\)' failed\\.";
}

// A NULL pointer that is read or written through.
inline bool faults(int status) {
  if (has_address_sanitizer()) {  // which ends the process in ways of its own
    return status != 0;
  }
  return WIFSIGNALED(status) && WTERMSIG(status) == SIGSEGV;
}

}  // namespace support

#endif
