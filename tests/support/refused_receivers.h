// What the tests of the two replies with refused receivers start from.
#ifndef TESTS_SUPPORT_REFUSED_RECEIVERS_H
#define TESTS_SUPPORT_REFUSED_RECEIVERS_H

#include <string>
#include <utility>
#include <vector>

#include "support/exchange.h"

namespace support {

template <typename Outputs>
class RefusedReceiversTest : public ExchangeTest {
 protected:
  using Pair = std::pair<int64_t, int64_t>;

  Outputs out_;

  static Wire reply(int code, const Wire& detail) {
    return Wire().message(13, Wire().number(1, code).message(3, detail));
  }
  static Wire pair(int64_t a, int64_t b) { return Wire().number(1, a).number(2, b); }

  void read(int code, const Wire& detail) { out_.read(reply(code, detail).bytes()); }
  void read_pairs(const std::vector<Wire>& pairs) {
    Wire detail;
    for (const Wire& pair : pairs) {
      detail.message(20, pair);
    }
    read(1001, detail);
  }

  std::vector<Pair> pairs() const {
    std::vector<Pair> pairs;
    for (const auto& violation : out_.violations.elements()) {
      pairs.emplace_back(violation.userA, violation.userB);
    }
    return pairs;
  }

  static Line pairs_found(int n) { return warn("%d didViolationUsers are detected", {n}); }
  static Line user_a(long long id) { return warn("did violation usera's id : %lld", {id}); }
  static Line user_b(long long id) { return warn("did violation userb's id : %lld", {id}); }
};

}  // namespace support

#endif
