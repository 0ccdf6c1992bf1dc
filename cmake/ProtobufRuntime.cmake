# Protocol Buffers 2.6.1, or a later one of the series: the target protobuf26 (headers and shared
# library) and the compiler of the schema, QEL_PROTOC_COMMAND. They are those that ./dev builds in
# .deps, for ARM and for this machine, unless QEL_PROTOBUF_ROOT and QEL_PROTOC name others.

set(QEL_PROTOBUF_ROOT "" CACHE PATH "Installation of Protocol Buffers 2.6.1 (empty: the one of ./dev)")
set(QEL_PROTOC "" CACHE FILEPATH "Compiler of the schema (empty: the installation's, or the one of ./dev when cross-compiling)")

set(_build_command "./dev setup")
set(QEL_PROTOBUF_PREFIX "${PROJECT_SOURCE_DIR}/.deps/protobuf-2.6.1")
set(_protoc "${QEL_PROTOBUF_PREFIX}/bin/protoc")
if(CMAKE_CROSSCOMPILING)
  set(_build_command "./dev arm")
  string(APPEND QEL_PROTOBUF_PREFIX "-${CMAKE_LIBRARY_ARCHITECTURE}")
endif()
if(QEL_PROTOBUF_ROOT)
  set(QEL_PROTOBUF_PREFIX "${QEL_PROTOBUF_ROOT}")
  if(NOT CMAKE_CROSSCOMPILING)
    set(_protoc "${QEL_PROTOBUF_PREFIX}/bin/protoc")
  endif()
endif()
if(QEL_PROTOC)
  set(_protoc "${QEL_PROTOC}")
endif()

set(_version_header "${QEL_PROTOBUF_PREFIX}/include/google/protobuf/stubs/common.h")
if(NOT EXISTS "${_version_header}")
  if(QEL_PROTOBUF_ROOT)
    set(_advice "let QEL_PROTOBUF_ROOT name an installation's folder, or leave it out and run '${_build_command}'")
  else()
    set(_advice "run '${_build_command}', or let QEL_PROTOBUF_ROOT name an installation")
  endif()
  message(FATAL_ERROR "No Protocol Buffers in ${QEL_PROTOBUF_PREFIX}: ${_advice}.")
endif()
file(STRINGS "${_version_header}" _line REGEX "#define GOOGLE_PROTOBUF_VERSION [0-9]+")
string(REGEX MATCH "[0-9]+$" _number "${_line}")
math(EXPR _major "${_number} / 1000000")
math(EXPR _minor "${_number} / 1000 % 1000")
math(EXPR _patch "${_number} % 1000")
set(QEL_PROTOBUF_VERSION "${_major}.${_minor}.${_patch}")
if(NOT QEL_PROTOBUF_VERSION MATCHES "^2\\.6\\.[1-9]")
  message(FATAL_ERROR "This library needs Protocol Buffers 2.6.1, but ${QEL_PROTOBUF_PREFIX} has ${QEL_PROTOBUF_VERSION}.")
endif()

execute_process(COMMAND "${_protoc}" --version
  OUTPUT_VARIABLE _line ERROR_QUIET RESULT_VARIABLE _status OUTPUT_STRIP_TRAILING_WHITESPACE)
if(NOT _status EQUAL 0)
  message(FATAL_ERROR "The schema's compiler ${_protoc} does not run here: let QEL_PROTOC name a protoc 2.6.1 of this machine.")
endif()
string(REGEX MATCH "[0-9.]+$" _protoc_version "${_line}")
if(NOT _protoc_version MATCHES "^2\\.6\\.[1-9]")
  message(FATAL_ERROR "This library needs the compiler of Protocol Buffers 2.6.1, but ${_protoc} is of ${_protoc_version}.")
endif()
set(QEL_PROTOC_COMMAND "${_protoc}")

# A device SDK's sysroot has the library in a multiarch folder.
find_library(QEL_PROTOBUF_LIBRARY NAMES libprotobuf.so
  HINTS "${QEL_PROTOBUF_PREFIX}" PATH_SUFFIXES lib lib64 "lib/${CMAKE_LIBRARY_ARCHITECTURE}"
  NO_DEFAULT_PATH NO_CACHE NO_CMAKE_FIND_ROOT_PATH)
if(NOT QEL_PROTOBUF_LIBRARY)
  message(FATAL_ERROR "No libprotobuf.so in ${QEL_PROTOBUF_PREFIX}/lib: the runtime is linked dynamically, because other modules share its descriptor pool.")
endif()

find_package(Threads REQUIRED)
add_library(protobuf26 SHARED IMPORTED)
set_target_properties(protobuf26 PROPERTIES
  IMPORTED_LOCATION "${QEL_PROTOBUF_LIBRARY}"
  INTERFACE_INCLUDE_DIRECTORIES "${QEL_PROTOBUF_PREFIX}/include"
  INTERFACE_LINK_LIBRARIES Threads::Threads)

# The runtime's headers are named as they are included.
name_files_below("${QEL_PROTOBUF_PREFIX}/include")
