// The functions of the interface by name, from the list by which the library exports them: what a
// test's table of functions must be complete against.
#ifndef TESTS_SUPPORT_EXPORTED_FUNCTIONS_H
#define TESTS_SUPPORT_EXPORTED_FUNCTIONS_H

#include <functional>
#include <set>
#include <string>

namespace support {

std::set<std::string> exported_functions();

// Without the placeholders, which do nothing.
std::set<std::string> working_serializers();
std::set<std::string> working_deserializers();

// The names in a table, of which a row's is what `name` gives.
template <typename Rows, typename Name>
std::set<std::string> names_in(const Rows& rows, Name name) {
  std::set<std::string> names;
  for (const auto& row : rows) {
    names.insert(std::invoke(name, row));
  }
  return names;
}

}  // namespace support

#endif
