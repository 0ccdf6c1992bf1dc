#ifndef QEL_WIRE_FAILURE_H
#define QEL_WIRE_FAILURE_H

#include <string>
#include <vector>

namespace qel_wire {

// What the program exits with.
constexpr int kDone = 0;
constexpr int kBroken = 1;
constexpr int kWrongCall = 2;
constexpr int kNoAccess = 3;

// Thrown: ends the program with that status.
struct Failure {
  int status;
  std::string reason;
};

// An argument that a complaint names, but for bytes in the wrong place: these may hold a token.
std::string named(const std::string& argument);

// "; did you mean 'decode'?", or nothing if no word is like it.
std::string did_you_mean(const std::string& word, const std::vector<std::string>& words);

}  // namespace qel_wire

#endif
