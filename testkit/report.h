// What went wrong, said in sentences that never have an access token.
#ifndef TESTKIT_REPORT_H
#define TESTKIT_REPORT_H

#include <google/protobuf/descriptor.h>

#include <cstddef>
#include <set>
#include <string>
#include <vector>

namespace testkit {

// The texts that are not to be shown, wherever they stand.
class Secrets {
 public:
  // Stands in the place of a token.
  static constexpr char kHidden[] = "(not shown)";
  // A text of fewer bytes may be a part of any sentence, and is shown.
  static constexpr size_t kLeast = 8;

  // Of an access token.
  void add(const std::string& token);
  // The text with something else in the place of each token.
  std::string hidden_in(std::string text) const;

 private:
  // One may begin another, so the longest is the first.
  struct IsLonger {
    bool operator()(const std::string& one, const std::string& other) const {
      return one.size() != other.size() ? one.size() > other.size() : one < other;
    }
  };

  std::set<std::string, IsLonger> tokens_;
};

// A number of the plug-in's messages, and what it is.
struct Subject {
  int number;
  const google::protobuf::Descriptor* type;
};

class Report {
 public:
  // What was said before is only counted.
  void add(const std::string& sentence);
  // The reasons may be none: then nothing is wrong. Those that were said of this message are not
  // said again.
  void add(const Subject& subject, const std::string& what,
           const std::vector<std::string>& reasons);
  // Of something that was said before, and is wrong again.
  void add_another() { ++complaints_; }

  // A plug-in in an endless loop comes to an end after so many.
  bool is_full() const { return complaints_ >= kMost; }
  // One sentence in each line.
  std::string text() const;

  Secrets secrets;

 private:
  static constexpr int kMost = 20;

  struct Line {
    std::string sentence;
    std::string kind;  // what it has in common with others
    int others;        // of that kind, which came later
  };

  void put(const std::string& sentence, const std::string& kind);

  std::vector<Line> lines_;
  int complaints_ = 0;
  int subject_ = 0;  // the last
  std::set<std::string> said_of_subject_;
};

// The text with something else in all the places of a part.
std::string replaced(std::string text, const std::string& part, const std::string& other);

// "a ChatRequest"
std::string with_article(const std::string& name);

// The same text with a capital at its beginning.
std::string with_capital(std::string text);

// In quotes, or what it is instead if it is no name, and may be anything.
std::string quoted_name(const std::string& name);

}  // namespace testkit

#endif
