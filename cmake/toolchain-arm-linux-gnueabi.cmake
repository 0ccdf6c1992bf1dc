# ARMv7-A with floating-point arguments in core registers: the ABI of Debian's armel, without its
# support for older processors.
set(CMAKE_LIBRARY_ARCHITECTURE arm-linux-gnueabi)
set(CMAKE_C_FLAGS_INIT "-march=armv7-a")
include("${CMAKE_CURRENT_LIST_DIR}/toolchain-arm-linux.cmake")
