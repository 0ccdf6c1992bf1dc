// Ways in which a process ends, for EXPECT_EXIT.
#ifndef TESTS_SUPPORT_PROCESS_DEATH_H
#define TESTS_SUPPORT_PROCESS_DEATH_H

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <csignal>

namespace support {

inline bool aborts(int status) {
  return WIFSIGNALED(status) && WTERMSIG(status) == SIGABRT;
}

// A NULL pointer that is read or written through.
inline bool faults(int status) {
#ifdef __SANITIZE_ADDRESS__
  return status != 0;  // the sanitizers end the process in ways of their own
#else
  return WIFSIGNALED(status) && WTERMSIG(status) == SIGSEGV;
#endif
}

}  // namespace support

#endif
