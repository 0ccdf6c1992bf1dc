#include "dump.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <utility>
#include <vector>

#include "scan.h"
#include "text.h"
#include "walk.h"

namespace qel_wire {
namespace {

// A line: "0000000 0708", "00000000: 0807", "0x0000:  0807", "0x4010 <name+8>: 0x08".
struct DumpRow {
  std::string_view offset;  // its digits, or nothing if none begins the line
  bool has_colon = false;   // behind the offset
  size_t gap = 0;           // the blanks behind it
  std::string_view groups;  // and what is behind them
};

DumpRow row_of(std::string_view line) {
  DumpRow row;
  take_prefix("0x", &line);
  const std::string_view offset = take_while(is_digit, &line);
  if (take_prefix(" <", &line)) {
    take(line.find('>') + 1, &line);
  }
  row.has_colon = take_prefix(":", &line);
  row.gap = take_while(is_blank, &line).size();
  row.groups = line;
  if (offset.size() >= (row.has_colon ? 2 : 4) && (row.gap > 0 || line.empty())) {
    row.offset = offset;
  }
  return row;
}

// What a column of characters shows of bytes, without blanks.
std::string visible(std::string_view bytes) {
  std::string result;
  for (const char c : bytes) {
    if (c != ' ') {
      result += c > ' ' && c <= '~' ? c : '.';
    }
  }
  return result;
}

class Dump {
 public:
  explicit Dump(std::string_view text) : rest_(text), first_(row_of(take_line(&text))) {
    digits_ = count_while(is_digit, first_.groups);
    if (!first_.has_colon && digits_ != 2) {
      base_ = digits_ % 3 == 0 ? 8 : 16;
    }
    size_ = std::max<size_t>(digits_ / (base_ == 8 ? 3 : 2), 1);
    if (has_seven_digits()) {
      bases_ = {16, 8, 10};
    } else if (first_.has_colon) {
      bases_ = {16, 10};
    }
  }

  // Whether an offset begins the first line. One without a colon has more digits than the bytes,
  // and is zero or stands apart; or the next one follows from it.
  bool begins() {
    if (first_.offset.empty() || first_.groups.empty() || first_.has_colon) {
      return !first_.offset.empty() && !first_.groups.empty();
    }
    const bool is_of_bytes = digits_ == 2 && begins_with_pairs(first_.groups);
    return (is_zero() && has_seven_digits()) || (is_of_bytes && (is_zero() || first_.gap > 1)) ||
           (size_ <= kLargest && is_continued());
  }

  std::string read() {
    check_numbers();
    const char* const end = rest_.data() + rest_.size();
    while (!rest_.empty()) {
      read_line();
    }
    if (row_ == 0 && !is_over_ && !first_.has_colon && !is_zero()) {
      throw Stop{first_.offset.data(),
                 "an offset, or bytes? a colon behind it, or single blanks would tell"};
    }
    if (is_order_open_) {
      throw Stop{first_.groups.data(), kOrder};
    }
    if (is_repeated_ || (base_ != 0 && size_ > 1 && !is_over_ && bytes_.back() == '\0')) {
      throw Stop{end, "the last line is missing, whose offset tells how many bytes are above"};
    }
    return std::move(bytes_);
  }

 private:
  static constexpr size_t kLargest = 8;  // bytes of a number
  static constexpr char kAnother[] = "another dump begins: only one is read";

  bool is_zero() const { return first_.offset.find_first_not_of('0') == std::string_view::npos; }

  bool is_power_of_two() const { return (size_ & (size_ - 1)) == 0; }

  // Such offsets are of od or hexdump; only od's may be octal or decimal.
  bool has_seven_digits() const { return !first_.has_colon && first_.offset.size() == 7; }

  // Whether hexdump prints no such groups.
  bool is_of_od() const {
    return has_seven_digits() && first_.gap == 1 && digits_ != 3 && digits_ != 4;
  }

  bool is_continued() {
    try {
      read_line();
      read_line();
    } catch (const Stop&) {
      return false;
    }
    return is_repeated_ || is_over_ || row_ > 0;
  }

  // What od and hexdump print are numbers of 1, 2, 4 or 8 bytes. Decimal ones stand further apart.
  void check_numbers() const {
    const bool is_whole = digits_ % (base_ == 8 ? 3 : 2) == 0 && digits_ > 0 && size_ <= kLargest;
    const bool is_decimal = has_seven_digits() && first_.gap > 1 && size_ == 1;
    if (is_decimal || (base_ != 0 && (!is_whole || !is_power_of_two()))) {
      throw Stop{first_.groups.data(), "no bytes in hex or octal: use od -tx1 or hexdump -C"};
    }
    if (base_ != 0 && size_ > 1 && !has_seven_digits() && first_.offset.size() != 6) {
      throw Stop{first_.groups.data(), kOrder};
    }
  }

  void read_line() {
    const std::string_view line = take_line(&rest_);
    if (line == "*") {
      is_repeated_ = true;
    } else if (!line.empty()) {
      read_row(line);
    }
  }

  void read_row(std::string_view line) {
    const DumpRow row = row_of(line);
    if (row.offset.empty()) {
      throw Stop{line.data(), is_before_another()
                                  ? kAnother
                                  : "no offset before the bytes, as in the lines above"};
    }
    take_offset(row);
    if (base_ == 0 && size_ > 1 && row.has_colon && row.gap > 2) {  // as "xxd -e" has the last one
      throw Stop{row.groups.data(), kOrder};
    }
    is_over_ = row.groups.empty();
    if (!is_over_) {
      row_ = bytes_.size();
      read_groups(row.groups);
    }
  }

  // How many bytes are above, by the offset.
  std::optional<uint64_t> above(const DumpRow& row, int base) const {
    const std::optional<uint64_t> from = number(first_.offset, base);
    const std::optional<uint64_t> to = number(row.offset, base);
    return from.has_value() && to >= from ? std::optional(*to - *from) : std::nullopt;
  }

  bool fits(const DumpRow& row, int base) const {
    const std::optional<uint64_t> count = above(row, base);
    const bool is_last = row.groups.empty();
    if (is_repeated_) {
      return count >= bytes_.size() &&
             ((is_last && base == 16) || (*count - bytes_.size()) % (bytes_.size() - row_) == 0);
    }
    // The last one tells how much of the last number are bytes.
    return count.has_value() && *count <= bytes_.size() &&
           bytes_.size() - *count < (is_last && base_ != 0 ? size_ : 1);
  }

  // Whether one of the next lines has the first offset again, as behind the summary of a packet.
  bool is_before_another() const {
    constexpr int kMostLines = 3;
    std::string_view rest = rest_;
    bool is_there = false;
    for (int i = 0; i < kMostLines; ++i) {
      is_there = is_there || row_of(take_line(&rest)).offset == first_.offset;
    }
    return is_there;
  }

  void take_offset(const DumpRow& row) {
    const auto end =
        std::remove_if(bases_.begin(), bases_.end(), [&](int base) { return !fits(row, base); });
    if (end == bases_.begin()) {
      throw Stop{row.offset.data(), above(row, bases_.front()) == 0
                                        ? kAnother
                                        : "an offset that does not follow from the " +
                                              counted(bytes_.size(), "byte") + " above"};
    }
    bases_.erase(end, bases_.end());
    if (is_repeated_ && is_of_od() && bases_.size() > 1 && bases_.front() == 16) {
      bases_.erase(bases_.begin());
    }
    const std::optional<uint64_t> count = above(row, bases_.front());
    if (is_repeated_ && has_seven_digits() && count != above(row, bases_.back())) {
      throw Stop{row.offset.data(), "offsets that may be hex, octal or decimal: use the option -v"};
    }
    if (count > kMostBytes) {
      throw Stop{row.offset.data(), "an offset beyond 64 MiB, which no call takes"};
    }
    for (const size_t repeated = bytes_.size() - row_; bytes_.size() < count;) {
      bytes_ += bytes_[bytes_.size() - repeated];
    }
    bytes_.resize(static_cast<size_t>(*count));
    is_repeated_ = false;
  }

  void read_groups(std::string_view groups) {
    while (!groups.empty()) {
      read_group(&groups);
      const size_t gap = take_while(is_blank, &groups).size();
      const bool is_over = base_ != 0 ? char_at(groups, 0) == '>' : gap > 1 && !groups.empty();
      if (is_over && !(gap == 2 && is_second_half(groups))) {
        check_characters(groups);
        return;
      }
    }
  }

  void read_group(std::string_view* groups) {
    const bool is_number = take_prefix("0x", groups);
    const std::string_view digits = take_while(is_digit, groups);
    if (digits.empty() || !is_space(char_at(*groups, 0))) {
      throw Stop{groups->data(), kStray};
    }
    if (is_number && digits.size() > 2) {
      throw Stop{digits.data(), kOrder};
    }
    if (base_ == 0) {
      append_pairs(digits, &bytes_);
    } else {
      append_number(digits);
    }
  }

  // As od and hexdump print it: its lowest byte comes first.
  void append_number(std::string_view digits) {
    const std::optional<uint64_t> value = number(digits, base_);
    const size_t bits = 8 * size_;
    if (digits.size() != digits_ || !value.has_value() || (bits < 64 && *value >> bits != 0)) {
      throw Stop{digits.data(), "no number of " + counted(size_, "byte") + " like the first one"};
    }
    for (size_t shift = 0; shift < bits; shift += 8) {
      bytes_ += static_cast<char>(*value >> shift);
    }
  }

  std::string_view last_row() const { return std::string_view(bytes_).substr(row_); }

  // Many leave a wider gap behind the eighth byte.
  bool is_second_half(std::string_view rest) const {
    return last_row().size() == 8 && count_while(is_digit, rest) == 2 && begins_with_pairs(rest) &&
           visible(rest) != visible(last_row());
  }

  // The column beside the bytes may differ from them, if it hides some or is not in ASCII. But it
  // must not look like bytes, nor contradict their order.
  void check_characters(std::string_view column) {
    const bool is_framed = column.size() > 1 && is_in("|>", column.front());
    const std::string beside = visible(is_framed ? column.substr(1, column.size() - 2) : column);
    const std::string shown = visible(last_row());
    std::string reversed(last_row());
    for (size_t i = 0; i + size_ <= reversed.size(); i += size_) {
      std::reverse(reversed.data() + i, reversed.data() + i + size_);
    }
    const bool may_be_reversed = beside == visible(reversed);
    if (beside == shown) {
      // Both "xxd -g4" and "xxd -e" print such groups.
      const bool may_be_open = base_ == 0 && size_ > 2 && is_power_of_two() && !is_order_shown_;
      is_order_shown_ = is_order_shown_ || !may_be_reversed;
      is_order_open_ = may_be_open && may_be_reversed;
      return;
    }
    if (may_be_reversed) {
      throw Stop{column.data(), "characters that show another order of the bytes in a group"};
    }
    if (!is_framed && (begins_with_pairs(column) || 4 * beside.size() <= shown.size())) {
      throw Stop{column.data(), "neither bytes nor the characters of those before"};
    }
  }

  std::string_view rest_;
  DumpRow first_;
  size_t digits_ = 0;              // of the first group
  size_t size_ = 1;                // its bytes
  int base_ = 0;                   // of groups that are numbers; 0: bytes in their order
  std::vector<int> bases_ = {16};  // which the offsets may have
  size_t row_ = 0;                 // the last row's first byte
  bool is_order_shown_ = false;    // by the characters beside a row
  bool is_order_open_ = false;     // they might show another one as well
  bool is_repeated_ = false;       // the last row, by a line "*"
  bool is_over_ = false;           // by an offset alone
  std::string bytes_;
};

}  // namespace

std::string_view find_dump(std::string_view text) {
  constexpr int kMostLines = 1000;
  for (int i = 0; i < kMostLines && !text.empty(); ++i) {
    if (Dump(text).begins()) {
      return text;
    }
    const std::string_view line = take_line(&text);
    if (!line.empty() && is_of_hex(line)) {
      break;
    }
  }
  return {};
}

std::string read_dump(std::string_view dump) {
  return Dump(dump).read();
}

}  // namespace qel_wire
