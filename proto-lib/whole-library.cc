// The whole library in one translation unit, so that the module's calls of the small functions of
// generated code can be inlined. Link-time optimisation would do the same, but drops inline
// functions of the classes that other modules may have been linked with.

#include "msgspec_frontend.pb.cc"    // NOLINT(bugprone-suspicious-include)
#include "qel-message-serialize.cc"  // NOLINT(bugprone-suspicious-include)
