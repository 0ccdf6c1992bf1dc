# The language versions, options and warnings of all code of this repository.

set(CMAKE_C_STANDARD 99)
set(CMAKE_CXX_STANDARD 17)
set(CMAKE_C_STANDARD_REQUIRED ON)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)

if(NOT CMAKE_BUILD_TYPE AND NOT CMAKE_CONFIGURATION_TYPES)
  set(CMAKE_BUILD_TYPE Release CACHE STRING "Debug or Release" FORCE)
endif()

# The setters' assertions are part of the interface, so no build type may compile them out.
foreach(language C CXX)
  foreach(type RELEASE RELWITHDEBINFO MINSIZEREL)
    string(REGEX REPLACE "(^| )[-/]DNDEBUG($| )" " " CMAKE_${language}_FLAGS_${type}
      "${CMAKE_${language}_FLAGS_${type}}")
  endforeach()
endforeach()

set(QEL_SANITIZE "" CACHE STRING "Sanitizers to build with: 'address,undefined', 'thread' or none")
if(QEL_SANITIZE)
  set(QEL_SANITIZE_FLAGS -fsanitize=${QEL_SANITIZE})
  add_compile_options(${QEL_SANITIZE_FLAGS} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  add_link_options(${QEL_SANITIZE_FLAGS})
  if(QEL_SANITIZE MATCHES "undefined" AND CMAKE_CXX_COMPILER_ID MATCHES "Clang")
    # The runtime of vptr is not linked into C programs. Any int is an enumeration's, as the setters test it.
    add_compile_options(-fno-sanitize=vptr,enum)
  endif()
endif()

# The fuzzer sees which paths an input takes through our code and the generated code.
option(QEL_FUZZ "Build the fuzz targets (clang, with QEL_SANITIZE)" OFF)
if(QEL_FUZZ)
  add_compile_options(-fsanitize=fuzzer-no-link)
endif()

# name_files_below(FOLDER): aborts and debug information name its files relative to it, so that a build is
# the same in every folder. If several folders fit, the compiler takes the last one. Counters of coverage
# keep whole names, which gcov needs.
function(name_files_below folder)
  add_compile_options(
    "-fmacro-prefix-map=${folder}/=" "-fdebug-prefix-map=${folder}=." "-fdebug-prefix-map=${folder}/=")
endfunction()

# A generated file is named as if it lay beside its source.
if(CMAKE_SYSROOT)
  name_files_below("${CMAKE_SYSROOT}")
endif()
name_files_below("${PROJECT_SOURCE_DIR}")
name_files_below("${PROJECT_BINARY_DIR}")

add_library(qel-own-code INTERFACE)
target_compile_options(qel-own-code INTERFACE -Wall -Wextra -Wconversion -Wredundant-decls -Werror
  $<$<COMPILE_LANGUAGE:CXX>:-Wsuggest-override -Wzero-as-null-pointer-constant>)
