// The exported functions as the contract calls them: by name, with arguments by name.
#ifndef TESTS_CONTRACT_ADAPTERS_H
#define TESTS_CONTRACT_ADAPTERS_H

#include <functional>
#include <optional>
#include <string>

#include "call.h"

namespace contract {

// The call itself, which allocates nothing of its own. The status, if the function has one.
using Invocation = std::function<std::optional<int>()>;

// Finds the function in the library under test: the one that the environment's QEL_LIBRARY names,
// or else the one that was built beside this program. The arguments are kept in the call.
Invocation invocation_of(const std::string& function, Call* call);

}  // namespace contract

#endif
