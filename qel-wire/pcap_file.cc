#include "pcap_file.h"

#include <pcap/pcap.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdio>
#include <new>

#include "failure.h"

namespace qel_wire {

bool is_capture(std::string_view bytes) {
  constexpr std::array<std::string_view, 4> kPcap = {
      "\xa1\xb2\xc3\xd4", "\xd4\xc3\xb2\xa1",   // with microseconds
      "\xa1\xb2\x3c\x4d", "\x4d\x3c\xb2\xa1"};  // with nanoseconds
  // A message may begin as pcapng does, but does not go on so.
  constexpr std::array<std::string_view, 2> kPcapngOrder = {"\x1a\x2b\x3c\x4d", "\x4d\x3c\x2b\x1a"};
  const auto is_one_of = [](const auto& texts, std::string_view text) {
    return std::find(texts.begin(), texts.end(), text) != texts.end();
  };
  return is_one_of(kPcap, bytes.substr(0, 4)) ||
         (bytes.size() >= 12 && bytes.substr(0, 4) == "\x0a\x0d\x0d\x0a" &&
          is_one_of(kPcapngOrder, bytes.substr(8, 4)));
}

Pcap open_pcap(std::string_view file) {
  std::unique_ptr<std::FILE, int (*)(std::FILE*)> input(
      fmemopen(const_cast<char*>(file.data()), file.size(), "r"), std::fclose);
  if (input == nullptr) {
    throw std::bad_alloc();
  }
  std::array<char, PCAP_ERRBUF_SIZE> reason{};
  Pcap pcap(pcap_fopen_offline_with_tstamp_precision(input.get(), PCAP_TSTAMP_PRECISION_NANO,
                                                     reason.data()),
            pcap_close);
  if (pcap == nullptr) {
    throw Failure{kBroken, reason.data()};
  }
  static_cast<void>(input.release());  // it is closed with the other
  return pcap;
}

std::chrono::nanoseconds time_of(const timeval& time) {
  constexpr int64_t kMost = 9'000'000'000;
  return std::max<std::chrono::nanoseconds>(
      std::chrono::nanoseconds(0), std::chrono::seconds(std::min<int64_t>(time.tv_sec, kMost)) +
                                       std::chrono::nanoseconds(time.tv_usec));
}

}  // namespace qel_wire
