# The common part of the toolchains for 32-bit ARM. The file that includes this one sets
# CMAKE_LIBRARY_ARCHITECTURE to the target's triple and CMAKE_C_FLAGS_INIT to its processor.
# README.md explains the settings for a device SDK.

set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR armv7-a)
set(CMAKE_CXX_FLAGS_INIT "${CMAKE_C_FLAGS_INIT} -Wno-psabi") # notes about compilers before GCC 7

if(NOT CMAKE_C_COMPILER AND "$ENV{CC}" STREQUAL "")
  set(CMAKE_C_COMPILER "${CMAKE_LIBRARY_ARCHITECTURE}-gcc")
endif()
if(NOT CMAKE_CXX_COMPILER AND "$ENV{CXX}" STREQUAL "")
  set(CMAKE_CXX_COMPILER "${CMAKE_LIBRARY_ARCHITECTURE}-g++")
endif()

# The folder of the target's files: the SDK's sysroot, or Debian's folder, which Debian's compiler
# finds itself.
if(CMAKE_SYSROOT)
  set(_target_root "${CMAKE_SYSROOT}")
else()
  set(_target_root "/usr/${CMAKE_LIBRARY_ARCHITECTURE}")
  set(CMAKE_FIND_ROOT_PATH "${_target_root}")
endif()
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)

# ctest runs the target's programs with this emulator.
if(NOT CMAKE_CROSSCOMPILING_EMULATOR)
  set(CMAKE_CROSSCOMPILING_EMULATOR qemu-arm -L "${_target_root}")
endif()
