// The cases of the program's implementation, by name: "echo_reply", or a call and how much of it is
// asked: "chat_request/40000" is one with a text of 40,000 bytes, "message_page/500" one with 500
// messages.
#ifndef BENCH_CASES_H
#define BENCH_CASES_H

#include <functional>
#include <string>
#include <vector>

struct Case {
  // The call as a user would make it, what it hands out freed.
  std::function<void()> call;
  // Whether what it hands out is right.
  std::function<bool()> is_right;
};

// Those that the implementation has.
std::vector<std::string> case_names();

Case make_case(const std::string& name);

#endif
