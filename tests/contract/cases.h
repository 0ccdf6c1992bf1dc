// The contract's cases, as the build rendered them.
#ifndef TESTS_CONTRACT_CASES_H
#define TESTS_CONTRACT_CASES_H

#include <nlohmann/json.hpp>

namespace contract {

// All of them, in the contract's order.
const nlohmann::json& cases();

// The name of the message that each function makes or takes.
const nlohmann::json& messages();

}  // namespace contract

#endif
