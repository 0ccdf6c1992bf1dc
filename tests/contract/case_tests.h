// The tests of a case: as it is, and with each block that it asks for refused in turn.
#ifndef TESTS_CONTRACT_CASE_TESTS_H
#define TESTS_CONTRACT_CASE_TESTS_H

#include <functional>
#include <memory>

#include "run.h"

namespace contract {

using MakeRun = std::function<std::unique_ptr<CaseRun>(const Json& contract_case,
                                                       const Course& course, int refused_new)>;

// Registers them. The case is to live as long as they do.
void add_case_tests(const Json& contract_case, const Course& course, const MakeRun& make_run);

}  // namespace contract

#endif
