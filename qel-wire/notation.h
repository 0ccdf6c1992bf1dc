// How bytes are written.
#ifndef QEL_WIRE_NOTATION_H
#define QEL_WIRE_NOTATION_H

#include <string>
#include <string_view>

namespace qel_wire {

enum class Notation { kRaw, kHex, kBase64 };

// From and to one of the others than kRaw: hex as it is found, base64 of either alphabet, padded or
// not. Throws Misread.
std::string from_notation(std::string_view text, Notation notation);
std::string to_notation(std::string_view bytes, Notation notation);

}  // namespace qel_wire

#endif
