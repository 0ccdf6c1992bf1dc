#include "log_statement.h"

#include <cstdlib>
#include <fstream>
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

// What stands in the source where the function logs the text.
std::string statement_of(const std::string& function, int priority, const std::string& text) {
  const bool ends_encode = priority == 3 && text == "%s: exit" &&
                           function != "is_typing_request_serialize";  // which does without
  if (ends_encode || text == "Invalid serialized data size : %d" ||
      text == "Could not allocate memory for serialized data") {
    return "encode(";
  }
  if (text == "merge error : Could not parse the received data!" ||
      text == "ConsumedEntireMessage error :Could not parse the received data") {
    return "parse(";
  }
  std::string literal = "\"";
  for (const char c : text) {
    literal += c == '\n' ? "\\n" : std::string(1, c);
  }
  return literal + '"';
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

std::string other_statement(const std::string& function, int priority, const std::string& text,
                            int line) {
  static const bool is_known = std::getenv("QEL_LIBRARY") == nullptr;
  static const std::vector<std::string> source = module_source();
  const auto place = static_cast<size_t>(line);
  if (!is_known || (is_in_function(source, place, function) &&
                    statement_at(source, place).find(statement_of(function, priority, text)) !=
                        std::string::npos)) {
    return "";
  }
  return "line " + std::to_string(line) + " of the module, in " + function + ", does not log " +
         text;
}

}  // namespace contract
