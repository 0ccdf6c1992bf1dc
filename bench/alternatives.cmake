# Libraries of Debian that a user could take instead of this one. Each compiles the schema with a
# compiler of its own, into a folder of its own, as several give the generated file the same name.

find_program(QEL_REFERENCE_PROTOC NAMES protoc REQUIRED
  DOC "protoc of another implementation, 3.0 or later (Debian's protobuf-compiler)")
set(_schema "${PROJECT_SOURCE_DIR}/proto-lib/msgspec_frontend.proto")

# qel_compile_schema(IMPLEMENTATION FILE COMMAND...): the library IMPLEMENTATION-schema of FILE,
# which the command makes of the schema in the folder IMPLEMENTATION.
function(qel_compile_schema implementation file)
  set(folder "${CMAKE_CURRENT_BINARY_DIR}/${implementation}")
  file(MAKE_DIRECTORY "${folder}")
  add_custom_command(OUTPUT "${folder}/${file}"
    COMMAND ${ARGN} "--proto_path=${PROJECT_SOURCE_DIR}/proto-lib" "${_schema}"
    DEPENDS "${_schema}" nanopb.options
    COMMENT "Compiling the schema for ${implementation}"
    VERBATIM)
  add_library(${implementation}-schema STATIC "${folder}/${file}")
  target_compile_options(${implementation}-schema PRIVATE ${schema_options})
  target_include_directories(${implementation}-schema SYSTEM PUBLIC "${folder}")
endfunction()

execute_process(COMMAND "${QEL_REFERENCE_PROTOC}" --version OUTPUT_VARIABLE _protoc_version)
if(NOT _protoc_version MATCHES "^libprotoc 3\\.21\\.") # the report calls it so
  message(FATAL_ERROR "The benchmark compares with Protocol Buffers 3.21, but ${QEL_REFERENCE_PROTOC} is '${_protoc_version}'.")
endif()

# Without assertions, as its users build for release. Then it does not check texts for UTF-8 either.
find_library(QEL_PROTOBUF3 NAMES protobuf REQUIRED)
qel_compile_schema(protobuf3 msgspec_frontend.pb.cc
  "${QEL_REFERENCE_PROTOC}" "--cpp_out=${CMAKE_CURRENT_BINARY_DIR}/protobuf3")
target_compile_definitions(protobuf3-schema PUBLIC NDEBUG)
target_link_libraries(protobuf3-schema PUBLIC "${QEL_PROTOBUF3}" Threads::Threads)
qel_bench_programs(protobuf3 classes.cc protobuf3-schema)
target_include_directories(protobuf3-calls PRIVATE ../proto-lib)
target_compile_definitions(protobuf3-calls PRIVATE QEL_BENCH_NAME="Protocol Buffers 3.21")

find_program(QEL_PROTOC_C NAMES protoc-c REQUIRED)
find_library(QEL_PROTOBUF_C NAMES protobuf-c REQUIRED)
qel_compile_schema(protobuf_c msgspec_frontend.pb-c.c
  "${QEL_PROTOC_C}" "--c_out=${CMAKE_CURRENT_BINARY_DIR}/protobuf_c")
target_link_libraries(protobuf_c-schema PUBLIC "${QEL_PROTOBUF_C}")
qel_bench_programs(protobuf_c protobuf_c.c protobuf_c-schema)

# With PB_ENABLE_MALLOC nanopb can allocate texts and lists on the heap.
find_program(QEL_PROTOC_NANOPB NAMES protoc-gen-nanopb REQUIRED)
find_library(QEL_NANOPB NAMES protobuf-nanopb REQUIRED)
qel_compile_schema(nanopb msgspec_frontend.pb.c
  "${QEL_REFERENCE_PROTOC}" "--plugin=protoc-gen-nanopb=${QEL_PROTOC_NANOPB}"
  "--nanopb_out=${CMAKE_CURRENT_BINARY_DIR}/nanopb"
  "--nanopb_opt=-f${CMAKE_CURRENT_SOURCE_DIR}/nanopb.options")
target_compile_definitions(nanopb-schema PUBLIC PB_ENABLE_MALLOC)
target_link_libraries(nanopb-schema PUBLIC "${QEL_NANOPB}")
qel_bench_programs(nanopb nanopb.c nanopb-schema)
