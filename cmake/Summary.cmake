# The last lines of the configuration: what the build uses.
message(STATUS "qel-message-protosvc ${PROJECT_VERSION}: ${CMAKE_BUILD_TYPE}, ${CMAKE_SYSTEM_PROCESSOR}")
message(STATUS "  compiler           ${CMAKE_CXX_COMPILER_ID} ${CMAKE_CXX_COMPILER_VERSION}")
message(STATUS "  Protocol Buffers   ${QEL_PROTOBUF_VERSION} (${QEL_PROTOBUF_LIBRARY})")
message(STATUS "  schema compiler    ${QEL_PROTOC_COMMAND}")
message(STATUS "  log service        ${QEL_DLOG_USED}")
if(QEL_SANITIZE)
  message(STATUS "  sanitizers         ${QEL_SANITIZE}")
endif()
