# What every folder of tests needs: GoogleTest, and how bats cases become tests of CTest.

# Debian has GoogleTest's library for this machine alone, and its source.
if(CMAKE_CROSSCOMPILING)
  set(QEL_GOOGLETEST_SOURCE /usr/src/googletest CACHE PATH
    "Source of GoogleTest, to be built for the target")
  add_subdirectory("${QEL_GOOGLETEST_SOURCE}/googletest" googletest EXCLUDE_FROM_ALL SYSTEM)
  target_compile_options(gtest PRIVATE -O0) # run less than it is built
else()
  find_package(GTest REQUIRED)
endif()

# qel_bats_tests(FILE... ENVIRONMENT VARIABLE=VALUE...): a test for each file of bats cases, which has the
# file's name. The cases are named in the file alone.
function(qel_bats_tests)
  cmake_parse_arguments(PARSE_ARGV 0 arg "" "" "ENVIRONMENT")
  find_program(QEL_BATS bats REQUIRED DOC "bats 1.5 or later, which runs shell tests")
  foreach(file IN LISTS arg_UNPARSED_ARGUMENTS)
    add_test(NAME ${file}
      COMMAND "${QEL_BATS}" --print-output-on-failure "${CMAKE_CURRENT_SOURCE_DIR}/${file}")
    set_tests_properties(${file} PROPERTIES ENVIRONMENT "${arg_ENVIRONMENT}")
  endforeach()
endfunction()
