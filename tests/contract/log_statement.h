// Where in the module a log line stands.
#ifndef TESTS_CONTRACT_LOG_STATEMENT_H
#define TESTS_CONTRACT_LOG_STATEMENT_H

#include <string>

namespace contract {

// Empty if the statement on that line of the module is the one that logs the text, or ends in the
// shared step that does; otherwise what is wrong. Of another library than the tree's, the sources
// are unknown, and so is the answer: empty.
std::string other_statement(const std::string& function, const std::string& text, int line);

}  // namespace contract

#endif
