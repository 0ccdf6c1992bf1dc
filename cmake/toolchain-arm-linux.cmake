# What the toolchains for 32-bit ARM have in common. The file that includes this one names the
# target's triple in CMAKE_LIBRARY_ARCHITECTURE and its processor in CMAKE_C_FLAGS_INIT. Debian's
# cross compiler is used unless CC and CXX in the environment, or CMAKE_C_COMPILER and
# CMAKE_CXX_COMPILER, name a device SDK's.

set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR armv7-a)
set(CMAKE_CXX_FLAGS_INIT "${CMAKE_C_FLAGS_INIT} -Wno-psabi") # which tells of compilers before GCC 7

if(NOT CMAKE_C_COMPILER AND "$ENV{CC}" STREQUAL "")
  set(CMAKE_C_COMPILER "${CMAKE_LIBRARY_ARCHITECTURE}-gcc")
endif()
if(NOT CMAKE_CXX_COMPILER AND "$ENV{CXX}" STREQUAL "")
  set(CMAKE_CXX_COMPILER "${CMAKE_LIBRARY_ARCHITECTURE}-g++")
endif()

# Where the target's files lie: the SDK's CMAKE_SYSROOT, or Debian's folder, whose compiler finds it
# by itself.
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

# ctest runs the target's programs with it.
if(NOT CMAKE_CROSSCOMPILING_EMULATOR)
  set(CMAKE_CROSSCOMPILING_EMULATOR qemu-arm -L "${_target_root}")
endif()
