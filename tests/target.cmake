# What the tests need of the machine that they run on.

# In the emulator the two threads' calls take a minute, if what counts them is not optimised.
if(CMAKE_CROSSCOMPILING)
  set_source_files_properties(support/heap.cc support/log_capture.cc PROPERTIES COMPILE_OPTIONS -O2)
endif()

# What the tests that compile something themselves hand to the compiler, as the build does.
foreach(language C CXX)
  separate_arguments(${language}_flags UNIX_COMMAND "${CMAKE_${language}_FLAGS}")
  if(CMAKE_SYSROOT)
    list(APPEND ${language}_flags "--sysroot=${CMAKE_SYSROOT}")
  endif()
endforeach()
