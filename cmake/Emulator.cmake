# The variable emulator: the command that tests put in front of the programs that they start. It is
# empty if this machine runs them itself. For the tests' own programs ctest uses the emulator.
set(emulator "")
if(CMAKE_CROSSCOMPILING_EMULATOR)
  set(emulator "${PROJECT_BINARY_DIR}/emulate")
  list(JOIN CMAKE_CROSSCOMPILING_EMULATOR "' '" _words)
  file(GENERATE OUTPUT "${emulator}" CONTENT "#!/bin/sh\nexec '${_words}' \"$@\"\n"
    FILE_PERMISSIONS OWNER_READ OWNER_WRITE OWNER_EXECUTE)
endif()
