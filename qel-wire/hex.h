// Hex, as people and tools write it.
#ifndef QEL_WIRE_HEX_H
#define QEL_WIRE_HEX_H

#include <string>
#include <string_view>

namespace qel_wire {

// The bytes of a text in one of these forms, which it tells apart by itself; throws Misread.
//
//   dumps     lines that begin with an offset, with or without characters beside the bytes: xxd,
//             hexdump, od, tcpdump, tshark, gdb. The bytes of a group of four or more digits stand
//             in their order if there is a colon behind the offset (xxd), and else in reverse
//             (hexdump, od). Offsets count in what they grow by: hex, octal or decimal.
//   strings   in quotes, with escapes: C, Python, JSON
//   lists     hex digits in groups or not, with what people put around them: blanks, commas,
//             colons, dashes, 0x, \x, brackets, quotes, a declaration, comments
//
// What can be read in two ways is refused, but for these: groups without offsets are in their
// order, and a first group of digits is an offset only if the others show it.
std::string from_hex(std::string_view text);

}  // namespace qel_wire

#endif
