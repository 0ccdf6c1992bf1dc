#include "cases.h"

#include <cstdlib>
#include <fstream>

namespace contract {
namespace {

const nlohmann::json& whole() {
  static const nlohmann::json contract = [] {
    const char* named = std::getenv("QEL_CONTRACT");
    std::ifstream file(named != nullptr ? named : QEL_CONTRACT_FILE);
    return nlohmann::json::parse(file);
  }();
  return contract;
}

}  // namespace

const nlohmann::json& cases() {
  return whole().at("cases");
}

const nlohmann::json& messages() {
  return whole().at("messages");
}

}  // namespace contract
