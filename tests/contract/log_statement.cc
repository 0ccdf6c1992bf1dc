#include "log_statement.h"

#include <cstdlib>
#include <fstream>
#include <map>
#include <vector>

namespace contract {
namespace {

std::vector<std::string> module_source() {
  std::vector<std::string> lines;
  std::ifstream file(QEL_MODULE_SOURCE);
  for (std::string line; std::getline(file, line);) {
    lines.push_back(line);
  }
  return lines;
}

// Whether the statement has the text, or calls the shared step that logs it.
bool logs(const std::string& statement, const std::string& text) {
  static const std::map<std::string, std::string> kSharedSteps = {
      {"%s: exit", "encode("},
      {"Invalid serialized data size : %d", "encode("},
      {"Could not allocate memory for serialized data", "encode("},
      {"merge error : Could not parse the received data!", "parse("},
      {"ConsumedEntireMessage error :Could not parse the received data", "parse("},
  };
  std::string literal = "\"";
  for (const char c : text) {
    literal += c == '\n' ? "\\n" : std::string(1, c);
  }
  const auto step = kSharedSteps.find(text);
  return statement.find(literal + '"') != std::string::npos ||
         (step != kSharedSteps.end() && statement.find(step->second) != std::string::npos);
}

// The statement up to the line: compilers differ in which line of a call of several they name.
std::string statement_at(const std::vector<std::string>& source, size_t line) {
  std::string statement;
  for (size_t i = line; i > 0 && i <= source.size(); --i) {
    const std::string& text = source[i - 1];
    const bool ends_another =
        text.empty() || std::string(";{}").find(text.back()) != std::string::npos;
    if (ends_another && !statement.empty()) {
      break;
    }
    statement.insert(0, text);
  }
  return statement;
}

// The function in whose definition the line stands: every definition begins at a line's start.
bool is_in_function(const std::vector<std::string>& source, size_t line,
                    const std::string& function) {
  for (size_t i = line; i > 0 && i <= source.size(); --i) {
    const std::string& text = source[i - 1];
    if (text == "}") {
      return false;
    }
    if (text.rfind("int " + function + "(", 0) == 0 ||
        text.rfind("void " + function + "(", 0) == 0) {
      return true;
    }
  }
  return false;
}

}  // namespace

std::string other_statement(const std::string& function, const std::string& text, int line) {
  static const bool is_known = std::getenv("QEL_LIBRARY") == nullptr;
  static const std::vector<std::string> source = module_source();
  const auto place = static_cast<size_t>(line);
  if (!is_known ||
      (is_in_function(source, place, function) && logs(statement_at(source, place), text))) {
    return "";
  }
  return "line " + std::to_string(line) + " of the module, in " + function + ", does not log " +
         text;
}

}  // namespace contract
