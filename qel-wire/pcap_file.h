// Files of pcap and pcapng, which libpcap reads.
#ifndef QEL_WIRE_PCAP_FILE_H
#define QEL_WIRE_PCAP_FILE_H

#include <sys/time.h>

#include <chrono>
#include <memory>
#include <string_view>

struct pcap;  // libpcap's

namespace qel_wire {

using Pcap = std::unique_ptr<pcap, void (*)(pcap*)>;

// Whether the bytes begin as a file of pcap or pcapng does.
bool is_capture(std::string_view bytes);

// With times in nanoseconds. The bytes have to stay. Throws a Failure, which has none of them, if
// they are no such file.
Pcap open_pcap(std::string_view file);

// Since 1970, of a packet of such a file. A damaged one may have any numbers.
std::chrono::nanoseconds time_of(const timeval& time);

}  // namespace qel_wire

#endif
