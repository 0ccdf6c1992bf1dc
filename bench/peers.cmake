# What a user could take instead, from Debian's packages: each with code that its own compiler makes of
# the schema, in a folder of its own, as several give it the same name.

find_program(QEL_PEER_PROTOC NAMES protoc REQUIRED
  DOC "protoc of another implementation, 3.0 or later (Debian's protobuf-compiler)")
set(_schema "${PROJECT_SOURCE_DIR}/proto-lib/msgspec_frontend.proto")

# qel_peer_schema(PEER FILE COMMAND...): the library PEER-schema of FILE and its header, which the
# command makes of the schema in the folder PEER.
function(qel_peer_schema peer file)
  set(folder "${CMAKE_CURRENT_BINARY_DIR}/${peer}")
  file(MAKE_DIRECTORY "${folder}")
  add_custom_command(OUTPUT "${folder}/${file}"
    COMMAND ${ARGN} "--proto_path=${PROJECT_SOURCE_DIR}/proto-lib" "${_schema}"
    DEPENDS "${_schema}" nanopb.options
    COMMENT "Compiling the schema for ${peer}"
    VERBATIM)
  add_library(${peer}-schema STATIC "${folder}/${file}")
  target_include_directories(${peer}-schema SYSTEM PUBLIC "${folder}")
endfunction()

execute_process(COMMAND "${QEL_PEER_PROTOC}" --version OUTPUT_VARIABLE _peer_version)
if(NOT _peer_version MATCHES "^libprotoc 3\\.21\\.") # under which name it is published
  message(FATAL_ERROR "The benchmark compares with Protocol Buffers 3.21, but ${QEL_PEER_PROTOC} is '${_peer_version}'.")
endif()

# Without assertions, as its users build for release; with that goes its check of texts for UTF-8.
find_library(QEL_PEER_PROTOBUF NAMES protobuf REQUIRED)
qel_peer_schema(protobuf3 msgspec_frontend.pb.cc
  "${QEL_PEER_PROTOC}" "--cpp_out=${CMAKE_CURRENT_BINARY_DIR}/protobuf3")
target_compile_definitions(protobuf3-schema PUBLIC NDEBUG)
target_link_libraries(protobuf3-schema PUBLIC "${QEL_PEER_PROTOBUF}" Threads::Threads)
qel_bench_programs(protobuf3 classes.cc protobuf3-schema)
target_include_directories(protobuf3-calls PRIVATE ../proto-lib)
target_compile_definitions(protobuf3-calls PRIVATE QEL_BENCH_NAME="Protocol Buffers 3.21")

find_program(QEL_PROTOC_C NAMES protoc-c REQUIRED)
find_library(QEL_PROTOBUF_C NAMES protobuf-c REQUIRED)
qel_peer_schema(protobuf_c msgspec_frontend.pb-c.c
  "${QEL_PROTOC_C}" "--c_out=${CMAKE_CURRENT_BINARY_DIR}/protobuf_c")
target_link_libraries(protobuf_c-schema PUBLIC "${QEL_PROTOBUF_C}")
qel_bench_programs(protobuf_c protobuf_c.c protobuf_c-schema)

# Debian's library takes blocks of the heap for texts and lists, if it is asked to.
find_program(QEL_PROTOC_NANOPB NAMES protoc-gen-nanopb REQUIRED)
find_library(QEL_NANOPB NAMES protobuf-nanopb REQUIRED)
qel_peer_schema(nanopb msgspec_frontend.pb.c
  "${QEL_PEER_PROTOC}" "--plugin=protoc-gen-nanopb=${QEL_PROTOC_NANOPB}"
  "--nanopb_out=${CMAKE_CURRENT_BINARY_DIR}/nanopb"
  "--nanopb_opt=-f${CMAKE_CURRENT_SOURCE_DIR}/nanopb.options")
target_compile_definitions(nanopb-schema PUBLIC PB_ENABLE_MALLOC)
target_link_libraries(nanopb-schema PUBLIC "${QEL_NANOPB}")
qel_bench_programs(nanopb nanopb.c nanopb-schema)
