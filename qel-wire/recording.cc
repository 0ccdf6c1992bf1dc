#include "recording.h"

#include <pcap/pcap.h>

#include <algorithm>
#include <cstdio>
#include <optional>
#include <string_view>
#include <utility>

#include "failure.h"
#include "pcap_file.h"
#include "text.h"

namespace qel_wire {
namespace {

// Reads section after section. Behind a place that cannot be read, the next section is looked for.
class Reading {
 public:
  explicit Reading(std::string_view file) : file_(file) {}

  Recording all() && {
    while (at_ < file_.size()) {
      read_sections();
    }
    finish();
    return std::move(recording_);
  }

 private:
  // Up to the end of the file, or to a place that cannot be read.
  void read_sections() {
    const std::string_view rest = file_.substr(at_);
    const Pcap pcap = open_pcap(rest);
    if (pcap_datalink(pcap.get()) != DLT_USER0) {
      throw Failure{kBroken, "it has other packets than those of a session"};
    }
    const size_t begin = at_;
    const auto go_on = [&] {
      at_ = begin + static_cast<size_t>(std::max(0L, std::ftell(pcap_file(pcap.get()))));
    };
    pcap_pkthdr* header = nullptr;
    const u_char* bytes = nullptr;
    int status = 0;
    for (go_on(); (status = pcap_next_ex(pcap.get(), &header, &bytes)) == 1; go_on()) {
      take(*header, {reinterpret_cast<const char*>(bytes), header->caplen});
    }
    if (status == PCAP_ERROR) {
      skip(pcap_geterr(pcap.get()));
    } else {
      at_ = file_.size();
    }
  }

  void take(const pcap_pkthdr& header, std::string_view packet) {
    const std::optional<session_file::Record> record = session_file::record_in(packet);
    if (!record.has_value()) {
      ++others_;
      is_of_other_version_ = packet.substr(0, 3) == "qel" && packet.substr(3, 1) != "\1";
      return;
    }
    recording_.records.push_back(
        {record->number,
         record->direction == session_file::Direction::kSent ? Use::kSends : Use::kReceives,
         record->outcome, time_of(header.ts), std::string(record->name),
         std::string(record->message), header.len - header.caplen});
  }

  // Goes to the next section that can be opened. What lies before it cannot be read for that
  // reason.
  void skip(const std::string& reason) {
    const size_t begin = at_;
    do {
      at_ = next_section();
    } while (at_ < file_.size() && !can_open());
    recording_.notes.push_back(counted(at_ - begin, "byte") + " from offset " +
                               std::to_string(begin) + " on cannot be read: " + reason);
  }

  size_t next_section() const {
    constexpr std::string_view kBegin = "\x0a\x0d\x0d\x0a";
    size_t at = file_.find(kBegin, at_ + 1);
    while (at < file_.size() && !is_capture(file_.substr(at))) {
      at = file_.find(kBegin, at + 1);
    }
    return std::min(at, file_.size());
  }

  bool can_open() const {
    try {
      return pcap_datalink(open_pcap(file_.substr(at_)).get()) == DLT_USER0;
    } catch (const Failure&) {
      return false;
    }
  }

  void finish() {
    std::vector<Record>& records = recording_.records;
    if (records.empty() && others_ > 0) {
      throw Failure{kBroken, is_of_other_version_
                                 ? "it is a session file of another version, which is not read"
                                 : "its packets are no messages of a session: it is of another use "
                                   "of this link type"};
    }
    if (others_ > 0) {
      recording_.notes.push_back(counted(others_, "packet") +
                                 " left out: no messages of a session");
    }
    std::stable_sort(records.begin(), records.end(),
                     [](const Record& a, const Record& b) { return a.number < b.number; });
  }

  std::string_view file_;
  size_t at_ = 0;
  Recording recording_;
  size_t others_ = 0;  // packets that are no records
  bool is_of_other_version_ = false;
};

}  // namespace

bool is_recording(const std::string& file) {
  return pcap_datalink(open_pcap(file).get()) == DLT_USER0;
}

Recording read_recording(const std::string& file) {
  return Reading(file).all();
}

}  // namespace qel_wire
