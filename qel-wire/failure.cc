#include "failure.h"

#include <strings.h>

#include <algorithm>
#include <numeric>
#include <string_view>

#include "token.h"

namespace qel_wire {
namespace {

// In how many places letters have to be changed, added or taken away, whatever their case.
size_t distance(std::string_view a, std::string_view b) {
  std::vector<size_t> row(b.size() + 1);
  std::iota(row.begin(), row.end(), size_t{0});
  for (const char letter : a) {
    size_t diagonal = row[0]++;
    for (size_t i = 0; i < b.size(); ++i) {
      const bool is_same = strncasecmp(&letter, &b[i], 1) == 0;
      const size_t replaced = diagonal + (is_same ? 0 : 1);
      diagonal = row[i + 1];
      row[i + 1] = std::min({replaced, diagonal + 1, row[i] + 1});
    }
  }
  return row.back();
}

// The word that was meant, or nothing if none is like it.
std::string closest(std::string_view word, const std::vector<std::string>& words) {
  std::string result;
  size_t least = std::max<size_t>(word.size() / 3, 1);  // more is another word
  for (const std::string& other : words) {
    const size_t away = distance(word, other);
    if (away <= least && (result.empty() || away < least)) {
      least = away;
      result = other;
    }
  }
  return result;
}

}  // namespace

std::string named(const std::string& argument) {
  const bool is_hex =
      argument.find_first_not_of("0123456789abcdefABCDEF :,x\\") == std::string::npos;
  return is_hex && argument.size() >= 8 ? kNotShown : "'" + argument + "'";
}

std::string did_you_mean(const std::string& word, const std::vector<std::string>& words) {
  const std::string found = closest(word, words);
  return found.empty() ? "" : "; did you mean '" + found + "'?";
}

}  // namespace qel_wire
