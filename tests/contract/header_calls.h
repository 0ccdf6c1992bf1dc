// The calls of qel-message.h, for cases of the functions that they stand on.
#ifndef TESTS_CONTRACT_HEADER_CALLS_H
#define TESTS_CONTRACT_HEADER_CALLS_H

#include <functional>
#include <string>

#include "adapters.h"

namespace contract {

struct HeaderCall {
  Invocation invocation;          // its status is a qel_status_t
  std::function<void()> release;  // of the record or the buffer
  std::function<void()> fill;     // it, as an earlier call might have
};

// The call that stands on the function, with what the case gives. Its outputs are those of the
// function, in a record or a buffer that begins zeroed.
HeaderCall header_call_of(const std::string& function, Call* call);

// The functions that have none.
std::vector<std::string> functions_without_header_call();

}  // namespace contract

#endif
