#include "hex.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <utility>

#include "dump.h"
#include "misread.h"
#include "scan.h"
#include "text.h"

namespace qel_wire {
namespace {

constexpr std::string_view kQuotes = "\"'";

// Strings in quotes, and lists of numbers.
class List {
 public:
  explicit List(std::string_view text) : rest_(text) {}

  std::string read() {
    if (may_be_of_od(rest_)) {
      throw Stop{rest_.data(), kOrder};
    }
    skip_introduction();
    has_strings_ = has_strings();
    while (skip_space(), !rest_.empty()) {
      read_item();
    }
    if ((is_bracketed_ || has_commas_) && !is_hex_ && plain_ != nullptr) {
      throw Stop{plain_, kDecimal};
    }
    if (plain_ != nullptr && numbers_ > (has_commas_ ? 0 : 1)) {
      throw Stop{plain_, "no 0x before this number, as before others"};
    }
    if (numbers_ > 1 && wide_ != nullptr) {
      throw Stop{wide_, kOrder};
    }
    return std::move(bytes_);
  }

 private:
  static constexpr char kRepeated[] =
      "without offsets, it is not clear how much * stands for: use od -v";
  static constexpr char kDecimal[] = "a list of decimal numbers: write them in hex, with 0x";

  // Whether od may have printed numbers of several bytes without offsets: with a blank before each.
  static bool may_be_of_od(std::string_view text) {
    const bool has_blank = is_blank(char_at(text, 0));
    std::string_view line = take_line(&text);
    const size_t size = count_while(is_digit, line);
    size_t count = 0;
    for (; count_while(is_digit, line) == size && size >= 4; ++count) {
      take(size, &line);
      take_while(is_blank, &line);
    }
    return has_blank && count > 1 && line.empty();
  }

  // And comments.
  void skip_space() {
    while (take_while(is_space, &rest_), is_comment()) {
      const bool is_block = take_prefix("/*", &rest_);
      const size_t end = rest_.find(is_block ? "*/" : "\n");
      if (is_block && end == std::string_view::npos) {
        throw Stop{rest_.data() - 2, "a comment without an end"};
      }
      take(is_block ? end + 2 : end, &rest_);
    }
  }

  // Or what od prints beside bytes: ">...<".
  bool is_comment() const {
    std::string_view rest = rest_;
    const char first = char_at(rest, 0);
    const char second = char_at(rest, 1);
    return first == '#' || (first == '/' && is_in("/*", second)) ||
           (first == '>' && is_in("<>", take_line(&rest).back()));
  }

  // "char name[] = ", "new byte[] {", "[]byte{", "bytes.fromhex(".
  void skip_introduction() {
    skip_space();
    skip_words("={}\"'/#\n", "=");
    take_prefix("=", &rest_);
    skip_space();
    skip_words("{(\"'/#\n", "{(\"'");
    take_prefix("vec!", &rest_);  // Rust's
    take_prefix("&", &rest_);
  }

  // Up to one of the ends, unless another of the stops or bytes come first.
  void skip_words(std::string_view stops, std::string_view ends) {
    constexpr size_t kMost = 1000;
    const std::string_view head = rest_.substr(0, kMost);
    const size_t stop = head.find_first_of(stops);
    const std::string_view words = head.substr(0, stop);
    const char end = char_at(head, stop);
    if (is_in(ends, end) && !begins_with_pairs(words) && (end == '=' || !is_of_hex(words))) {
      take(stop, &rest_);
    }
  }

  // Whether quotes are around characters and escapes. Without escapes they are around hex, unless
  // Python's b'' has other characters.
  bool has_strings() const {
    const size_t quote = std::min(rest_.find_first_of(kQuotes), rest_.size());
    for (size_t at = quote; (at = rest_.find('\\', at)) != std::string_view::npos; ++at) {
      if (!is_space(char_at(rest_, at + 1))) {
        return true;
      }
    }
    std::string_view string = rest_.substr(quote);
    take(1, &string);
    const bool is_even = take_while(is_digit, &string).size() % 2 == 0;
    return quote > 0 && is_in("bB", rest_[quote - 1]) && !string.empty() &&
           !(is_even && string[0] == rest_[quote]);
  }

  void read_item() {
    const char c = rest_[0];
    const char next = char_at(rest_, 1);
    if (take_prefix("byte)", &rest_)) {  // Java's cast, whose first bracket was read before
      return;
    }
    if ((is_digit(c) && !is_in(kQuotes, next)) || !read_other(c, next)) {
      read_number();
    }
  }

  // What is no number, if that comes next.
  bool read_other(char c, char next) {
    if (has_strings_ && is_in(kQuotes, c)) {
      read_string();
    } else if (is_between(c, next)) {
      take(1, &rest_);
    } else if (c == '\\' && (next != 'x' || count_while(is_digit, rest_.substr(2)) <= 2)) {
      read_escape();
      ++numbers_;
    } else if (take_prefix("unsigned int ", &rest_)) {
      read_length();
    } else {
      return false;
    }
    return true;
  }

  // Brackets and the like, a prefix of a string, a backslash that ends a line.
  bool is_between(char c, char next) {
    is_bracketed_ = is_bracketed_ || is_in("[{(", c);
    has_commas_ = has_commas_ || is_in("[{(,", c);
    has_quotes_ = has_quotes_ || is_in(kQuotes, c);
    return is_in(",;+()[]{}<\"'", c) || (is_in("bBxX", c) && is_in(kQuotes, next)) ||
           (c == '\\' && is_space(next));
  }

  void read_string() {
    const char* const quote = take(1, &rest_).data();
    while (char_at(rest_, 0) != *quote) {
      if (char_at(rest_, 0) == '\n') {
        throw Stop{quote, "a quote that is not closed in its line"};
      }
      if (rest_[0] == '\\') {
        read_escape();
      } else {
        bytes_ += take(1, &rest_);
      }
    }
    take(1, &rest_);
  }

  void read_escape() {
    constexpr std::string_view kLetters = "abefnrtv\\\"'?/";
    constexpr std::string_view kMeanings = "\a\b\033\f\n\r\t\v\\\"'?/";
    const char c = char_at(rest_, 1);
    const size_t letter = kLetters.find(c);
    if (letter != std::string_view::npos) {
      bytes_ += kMeanings[letter];
      take(2, &rest_);
    } else if (is_in("\r\n", c)) {  // the string goes on in the next line
      take_line(&rest_);
    } else if (c == 'x') {
      read_code(2, 16, 2);
    } else if (c == 'u') {
      read_code(2, 16, 4);
    } else {
      read_code(1, 8, 3);
    }
  }

  // Behind so many characters; of at most so many digits. Four are of a character, which is a byte
  // in ASCII only.
  void read_code(size_t begin, int base, size_t most) {
    const std::string_view digits = rest_.substr(begin, most);
    unsigned code = 0;
    const char* const end = digits.data() + digits.size();
    const auto [stop, error] = std::from_chars(digits.data(), end, code, base);
    if (error != std::errc() || code > (most == 4 ? 0x7f : 0xff)) {
      throw Stop{rest_.data(), "an escape that is no byte"};
    }
    bytes_ += static_cast<char>(code);
    take(begin + static_cast<size_t>(stop - digits.data()), &rest_);
  }

  // Behind an array, as xxd -i prints it.
  void read_length() {
    take(rest_.find('='), &rest_);
    take_prefix("= ", &rest_);
    const std::string_view digits = take_while(is_digit, &rest_);
    if (number(digits, 10) != bytes_.size()) {
      throw Stop{digits.data(), "not the array's length: it has " + counted(bytes_.size(), "byte")};
    }
  }

  // "08", "0x08", "0x8", "0e9h", or many digits. Those behind 0x are bytes in their order, if there
  // is no second such number.
  void read_number() {
    const char* const begin = rest_.data();
    const bool has_0x =
        take_prefix("0x", &rest_) || take_prefix("0X", &rest_) || take_prefix("\\x", &rest_);
    std::string_view digits = take_while(is_digit, &rest_);
    const bool has_h = !has_0x && is_in("hH", char_at(rest_, 0));
    take(has_h ? 1 : 0, &rest_);
    take(has_0x && rest_.substr(0, 2) == "u8" ? 2 : 0, &rest_);  // Rust's
    if (digits.empty() || std::isalnum(static_cast<unsigned char>(char_at(rest_, 0))) != 0) {
      throw Stop{digits.empty() ? begin : rest_.data(), *begin == '*' ? kRepeated : kStray};
    }
    digits.remove_prefix(has_h && digits.size() == 3 && digits[0] == '0' ? 1 : 0);
    if (has_0x || has_h) {
      is_hex_ = true;
      ++numbers_;
      wide_ = wide_ == nullptr && digits.size() > 2 ? begin : wide_;
    } else if (!has_quotes_) {
      check_plain(digits);
    }
    if (digits.size() == 1 && (has_0x || has_h)) {
      bytes_ += static_cast<char>(*number(digits, 16));
    } else {
      append_pairs(digits, &bytes_);
    }
    const char next = char_at(rest_, 1);
    take(is_in(":-", char_at(rest_, 0)) && (is_digit(next) || is_in("\r\n", next)) ? 1 : 0, &rest_);
  }

  // Digits may be meant as decimal in a list, as long as none shows that it is hex.
  void check_plain(std::string_view digits) {
    plain_ = plain_ == nullptr ? digits.data() : plain_;
    is_hex_ = is_hex_ || digits.find_first_not_of("0123456789") != std::string_view::npos ||
              (digits[0] == '0' && digits.size() > 1);
    if (!is_hex_ && digits.size() % 2 != 0 && (has_commas_ || char_at(rest_, 0) == ',')) {
      throw Stop{digits.data(), kDecimal};
    }
  }

  std::string_view rest_;
  bool has_strings_ = false;
  bool is_bracketed_ = false;
  bool has_quotes_ = false;
  bool has_commas_ = false;      // or brackets
  bool is_hex_ = false;          // as an item shows
  size_t numbers_ = 0;           // with 0x or h
  const char* plain_ = nullptr;  // the first without
  const char* wide_ = nullptr;   // the first of more than a byte
  std::string bytes_;
};

}  // namespace

std::string from_hex(std::string_view text) {
  take_prefix("\xef\xbb\xbf", &text);  // the byte order mark of UTF-8
  try {
    const std::string_view dump = find_dump(text);
    return dump.empty() ? List(text).read() : read_dump(dump);
  } catch (const Stop& stop) {
    throw misread_at(text, static_cast<size_t>(stop.at - text.data()), stop.reason);
  }
}

}  // namespace qel_wire
