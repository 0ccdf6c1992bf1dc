// What is made of the table of commands and options, for others to read.
#ifndef QEL_WIRE_MANUAL_H
#define QEL_WIRE_MANUAL_H

#include <CLI/App.hpp>
#include <string>

namespace qel_wire {

// The man page.
std::string man_page(const CLI::App& app);

// What bash, zsh or fish needs to complete the commands and options of the table, their values, and
// the names of messages.
std::string completion(const CLI::App& app, const std::string& shell);

}  // namespace qel_wire

#endif
