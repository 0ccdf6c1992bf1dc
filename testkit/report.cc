#include "report.h"

#include <algorithm>
#include <cctype>
#include <string_view>
#include <utility>

namespace testkit {
namespace {

// The first few, as nobody reads thousands.
std::string joined(const std::vector<std::string>& parts) {
  constexpr size_t kMost = 5;
  std::string text;
  for (size_t i = 0; i < std::min(parts.size(), kMost); ++i) {
    text += (text.empty() ? "" : "; ") + parts[i];
  }
  if (parts.size() > kMost) {
    text += "; and " + std::to_string(parts.size() - kMost) + " more";
  }
  return text;
}

}  // namespace

void Secrets::add(const std::string& token) {
  if (token.size() >= kLeast) {
    tokens_.insert(token);
  }
}

std::string Secrets::hidden_in(std::string text) const {
  for (const std::string& token : tokens_) {
    text = replaced(std::move(text), token, kHidden);
  }
  return text;
}

void Report::put(const std::string& sentence, const std::string& kind) {
  const auto same = std::find_if(lines_.begin(), lines_.end(),
                                 [&kind](const Line& line) { return line.kind == kind; });
  ++complaints_;
  if (same != lines_.end()) {
    ++same->others;
  } else if (complaints_ < kMost) {
    lines_.push_back({sentence, kind, 0});
  }
}

void Report::add(const std::string& sentence) {
  put(sentence, sentence);
}

void Report::add(const Subject& subject, const std::string& what,
                 const std::vector<std::string>& reasons) {
  if (subject.number != subject_) {
    subject_ = subject.number;
    said_of_subject_.clear();
  }
  std::vector<std::string> news;
  for (const std::string& reason : reasons) {
    if (said_of_subject_.insert(reason).second) {
      news.push_back(reason);
    }
  }
  if (news.empty()) {
    return;
  }
  const std::string kind = with_article(subject.type->name()) + ", " + what + ": " + joined(news);
  put("Message " + std::to_string(subject.number) + " of the plug-in, " + kind + ".", kind);
}

std::string Report::text() const {
  std::string text;
  for (const Line& line : lines_) {
    text += line.sentence;
    if (line.others > 0) {
      text += " And " + std::to_string(line.others) +
              (line.others == 1 ? " more time." : " more times.");
    }
    text += "\n";
  }
  text += is_full() ? "There is more, and nothing is delivered any longer.\n" : "";
  return secrets.hidden_in(text);  // also a token that came later
}

std::string replaced(std::string text, const std::string& part, const std::string& other) {
  for (size_t at = 0; (at = text.find(part, at)) != std::string::npos; at += other.size()) {
    text.replace(at, part.size(), other);
  }
  return text;
}

std::string with_article(const std::string& name) {
  const bool is_vowel = std::string_view("AEIOU").find(name[0]) != std::string_view::npos;
  return (is_vowel ? "an " : "a ") + name;
}

std::string with_capital(std::string text) {
  text[0] = static_cast<char>(std::toupper(static_cast<unsigned char>(text[0])));
  return text;
}

std::string quoted_name(const std::string& name) {
  constexpr size_t kMost = 63;
  const bool is_name =
      name.size() <= kMost && std::all_of(name.begin(), name.end(), [](unsigned char c) {
        return std::isalnum(c) != 0 || c == '_';
      });
  return is_name ? "'" + name + "'" : "of other characters";
}

}  // namespace testkit
