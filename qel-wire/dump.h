// Bytes in lines that begin with their offset, as xxd, hexdump, od, tcpdump, tshark and gdb print
// them.
#ifndef QEL_WIRE_DUMP_H
#define QEL_WIRE_DUMP_H

#include <string>
#include <string_view>

namespace qel_wire {

// The text from the dump's first line on, or nothing if there is none. Lines before it, such as a
// command or a packet's summary, are no hex.
std::string_view find_dump(std::string_view text);

// The dump's bytes. Throws Stop.
std::string read_dump(std::string_view dump);

}  // namespace qel_wire

#endif
