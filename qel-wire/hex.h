// Hex, as people and tools write it.
#ifndef QEL_WIRE_HEX_H
#define QEL_WIRE_HEX_H

#include <string>
#include <string_view>

namespace qel_wire {

// The bytes of a text in one of these forms, which it tells apart by itself. Throws Misread.
//
//   dumps     lines that begin with an offset, with or without characters beside the bytes: xxd,
//             hexdump, od, tcpdump, tshark, gdb. Groups of more than a byte are in their order if
//             there is a colon behind the offset (xxd, tcpdump), and else have their lowest byte
//             last (hexdump, od). Offsets count in what they grow by: hex, octal or decimal.
//   strings   in quotes, with escapes: C, Python, JSON; or escapes alone
//   lists     digits in groups or not, with what people put around them: blanks, commas, colons,
//             dashes, 0x, h, brackets, quotes, a declaration, comments
//
// What may be read in two ways is refused, where the text shows it.
std::string from_hex(std::string_view text);

}  // namespace qel_wire

#endif
