// The command line: one table of commands and options, from which help, man page and the
// completion of shells are made.
#ifndef QEL_WIRE_CLI_H
#define QEL_WIRE_CLI_H

#include <string>
#include <vector>

#include "failure.h"
#include "notation.h"

namespace qel_wire {

struct Call {
  std::string answer;  // to be printed, and nothing else: help, version, or a shell's completion
  std::string command;
  std::string message;             // MESSAGE, or the NAME that is looked up
  std::vector<std::string> files;  // '-' is standard input
  std::string hex, base64;         // what the option was given
  std::string frames;
  std::string bytes;
  std::string colour = "auto";
  std::vector<std::string> where;
  std::vector<std::string> messages;  // of which all others are left out
  size_t number = 0;                  // of the one message that is wanted; 0: all
  bool all = false;
  bool follow = false;
  bool json = false;
  bool partial = false;
  bool ports = false;
  bool received = false;
  bool sent = false;
  bool show_token = false;

  Notation notation() const;
  // Whether the bytes stand in the call itself, instead of files: in hex or base64.
  bool has_bytes() const;
};

// Throws Failure if it is called wrongly.
Call read_call(int argc, char** argv);

}  // namespace qel_wire

#endif
