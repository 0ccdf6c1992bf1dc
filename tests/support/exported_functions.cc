#include "support/exported_functions.h"

#include <fstream>

namespace support {
namespace {

std::set<std::string> working_functions(const std::string& ending) {
  std::set<std::string> names;
  for (const std::string& name : exported_functions()) {
    if (name.rfind("forward_stored_message_", 0) != 0 && name.size() > ending.size() &&
        name.compare(name.size() - ending.size(), ending.size(), ending) == 0) {
      names.insert(name);
    }
  }
  return names;
}

}  // namespace

std::set<std::string> exported_functions() {
  std::set<std::string> names;
  std::ifstream list(QEL_EXPORTED_FUNCTIONS);
  for (std::string name; std::getline(list, name);) {
    names.insert(name);
  }
  return names;
}

std::set<std::string> working_serializers() {
  return working_functions("_serialize");
}

std::set<std::string> working_deserializers() {
  return working_functions("_deserialize");
}

}  // namespace support
