// The cases of the program's implementation by name: "echo_reply", or a call and its amount.
// "chat_request/40000" has a text of 40,000 bytes, "message_page/500" has 500 messages.
#ifndef BENCH_CASES_H
#define BENCH_CASES_H

#include <functional>
#include <string>
#include <vector>

struct Case {
  // Makes the call as a user would, and frees what it hands out.
  std::function<void()> call;
  // Makes the call, and tells whether what it hands out is right.
  std::function<bool()> is_right;
};

// The cases of those calls that the implementation has.
std::vector<std::string> case_names();

Case make_case(const std::string& name);

#endif
