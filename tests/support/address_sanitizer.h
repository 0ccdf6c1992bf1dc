// Whether AddressSanitizer is in the process.
#ifndef TESTS_SUPPORT_ADDRESS_SANITIZER_H
#define TESTS_SUPPORT_ADDRESS_SANITIZER_H

#include <dlfcn.h>

namespace support {

inline bool has_address_sanitizer() {
  return dlsym(RTLD_DEFAULT, "__asan_init") != nullptr;
}

}  // namespace support

#endif
