# ARMv7-A with floating-point arguments in floating-point registers: Debian's armhf.
set(CMAKE_LIBRARY_ARCHITECTURE arm-linux-gnueabihf)
set(CMAKE_C_FLAGS_INIT "-march=armv7-a -mfpu=vfpv3-d16")
include("${CMAKE_CURRENT_LIST_DIR}/toolchain-arm-linux.cmake")
