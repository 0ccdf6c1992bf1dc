# For tests that start programs themselves: what to put in front, in the variable emulator. Empty where
# programs run as they are. ctest does that by itself.
set(emulator "")
if(CMAKE_CROSSCOMPILING_EMULATOR)
  set(emulator "${PROJECT_BINARY_DIR}/emulate")
  list(JOIN CMAKE_CROSSCOMPILING_EMULATOR "' '" _words)
  file(GENERATE OUTPUT "${emulator}" CONTENT "#!/bin/sh\nexec '${_words}' \"$@\"\n"
    FILE_PERMISSIONS OWNER_READ OWNER_WRITE OWNER_EXECUTE)
endif()
