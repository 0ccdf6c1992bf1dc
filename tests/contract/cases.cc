#include "cases.h"

#include <cstdlib>
#include <fstream>

namespace contract {

const nlohmann::json& cases() {
  static const nlohmann::json contract = [] {
    const char* named = std::getenv("QEL_CONTRACT");
    std::ifstream file(named != nullptr ? named : QEL_CONTRACT_FILE);
    return nlohmann::json::parse(file);
  }();
  return contract.at("cases");
}

}  // namespace contract
