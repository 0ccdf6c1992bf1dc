// Messages as a file that Wireshark reads without a plug-in of ours.
#ifndef QEL_WIRE_EXPORT_H
#define QEL_WIRE_EXPORT_H

#include <ostream>

#include "input.h"
#include "session.h"

namespace qel_wire {

// Writes pcapng, of which each packet is a message that another program has taken out of its
// packets (LINKTYPE_WIRESHARK_UPPER_PDU): Wireshark hands it to its dissector of Protocol Buffers.
// That knows the message by its port. What may be the access token is overwritten with '*'.
void write_head(std::ostream* out);
void write_packet(const Entry& entry, const Found& found, std::ostream* out);

// Which port stands for which message, as Wireshark keeps it in a file of preferences.
void write_ports(std::ostream* out);

}  // namespace qel_wire

#endif
