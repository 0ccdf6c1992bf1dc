// The exported functions as the contract calls them: by name, with arguments by name.
#ifndef TESTS_CONTRACT_ADAPTERS_H
#define TESTS_CONTRACT_ADAPTERS_H

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "call.h"

namespace contract {

enum class Kind {
  kId,             // int64_t
  kNumber,         // int
  kFlag,           // bool
  kText,           // const char*
  kTextPointer,    // const char**
  kNumberPointer,  // const int*
  kFlagPointer,    // const bool*
  kIds,            // const int64_t*
  kChats,          // const qel_message_endchatentry_t*
  kEntry,          // const qel_message_inboxentry_t*
  kReceived,       // const unsigned char*
  kOutput,
};

struct Parameter {
  std::string name;
  Kind kind;
};

// All functions, by name.
std::vector<std::string> function_names();

const std::vector<Parameter>& parameters_of(const std::string& function);

// The call itself, which allocates nothing of its own. The status, if the function has one.
using Invocation = std::function<std::optional<int>()>;

// Loads the library under test, if it has not been: the one that this program is linked with, or
// that the environment's QEL_LIBRARY names, or that was built beside this program.
void load_library();

// Finds the function in it. The arguments are kept in the call.
Invocation invocation_of(const std::string& function, Call* call);

}  // namespace contract

#endif
