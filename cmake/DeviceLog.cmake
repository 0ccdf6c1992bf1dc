# The target device-log: the log service with __dlog_print. It is the dlog that QEL_DLOG_LIBRARY
# names or that CMake finds, otherwise the workstation's stand-in.

set(QEL_DLOG_LIBRARY "" CACHE FILEPATH "The device's dlog library (empty: look for it)")

set(_dlog "${QEL_DLOG_LIBRARY}")
if(_dlog AND NOT EXISTS "${_dlog}")
  message(FATAL_ERROR "QEL_DLOG_LIBRARY names ${_dlog}, which does not exist.")
endif()
if(NOT _dlog)
  find_library(_dlog_found NAMES dlog NO_CACHE)
  if(_dlog_found)
    set(_dlog "${_dlog_found}")
  endif()
endif()

if(_dlog)
  add_library(device-log SHARED IMPORTED)
  set_target_properties(device-log PROPERTIES IMPORTED_LOCATION "${_dlog}")
  set(QEL_DLOG_USED "${_dlog}")
else()
  add_subdirectory(platform/dlog)
  add_library(device-log ALIAS dlog-standin)
  set(QEL_DLOG_USED "workstation stand-in (platform/dlog)")
endif()
