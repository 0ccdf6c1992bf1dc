// The whole library in one translation unit, so that the compiler can inline small functions of the
// generated code into the module. Link-time optimisation would do that too, but it removes inline
// functions of the classes from the library, which other modules may be linked with.

#include "msgspec_frontend.pb.cc"
#include "qel-message-serialize.cc"
