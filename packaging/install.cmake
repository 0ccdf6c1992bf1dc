# What 'cmake --install' installs, and where. packaging/debian/rules says which component is in which
# package.

include(CMakePackageConfigHelpers)
set(_made "${CMAKE_CURRENT_BINARY_DIR}/packaging")
set(_headers "${CMAKE_INSTALL_INCLUDEDIR}/${PROJECT_NAME}")
set(_pkgconfig "${CMAKE_INSTALL_LIBDIR}/pkgconfig")
set(_cmake_package "${CMAKE_INSTALL_LIBDIR}/cmake/${PROJECT_NAME}")

# With the name that has no number: programs on devices may name it so.
install(TARGETS qel-message-protosvc LIBRARY COMPONENT runtime)

if(TARGET qel-trace)
  install(TARGETS qel-trace LIBRARY COMPONENT trace)
endif()

install(
  FILES proto-lib/qel-message.h proto-lib/qel-message-serialize.h
    "${PROJECT_BINARY_DIR}/proto-lib/msgspec_frontend.pb.h"
  DESTINATION "${_headers}" COMPONENT development)
install(FILES "${QEL_CONTRACT}"
  DESTINATION "${CMAKE_INSTALL_DATADIR}/${PROJECT_NAME}" COMPONENT development)
install(FILES contract/schema.json RENAME contract.schema.json
  DESTINATION "${CMAKE_INSTALL_DATADIR}/${PROJECT_NAME}" COMPONENT development)
install(FILES proto-lib/msgspec_frontend.proto
  DESTINATION "${CMAKE_INSTALL_DATADIR}/${PROJECT_NAME}" COMPONENT development)

# Tells valgrind which blocks the deserializers keep on purpose: their input streams, which are the
# only ones of operator new. Outputs come from malloc and calloc. The library itself tells
# LeakSanitizer.
set(_valgrind "# Memcheck: what libqel-message-protosvc keeps allocated on purpose.\n")
set(_deserializers "${QEL_FUNCTIONS}")
list(FILTER _deserializers INCLUDE REGEX "_deserialize$")
foreach(_function IN LISTS _deserializers)
  string(APPEND _valgrind "{\n  input stream of ${_function}\n  Memcheck:Leak\n"
    "  fun:_Znw*\n  ...\n  fun:${_function}\n}\n")
endforeach()
file(CONFIGURE OUTPUT "${_made}/valgrind.supp" CONTENT "${_valgrind}" @ONLY)
install(FILES "${_made}/valgrind.supp"
  DESTINATION "${CMAKE_INSTALL_DATADIR}/${PROJECT_NAME}" COMPONENT development)

# The .pc files name the prefix relative to themselves, so that an installed tree may be moved.
set(_prefix_from_pc "/prefix")
cmake_path(RELATIVE_PATH _prefix_from_pc BASE_DIRECTORY "/prefix/${_pkgconfig}")
foreach(_name ${PROJECT_NAME} ${PROJECT_NAME}-classes)
  configure_file("packaging/${_name}.pc.in" "${_made}/${_name}.pc" @ONLY)
  install(FILES "${_made}/${_name}.pc" DESTINATION "${_pkgconfig}" COMPONENT development)
endforeach()

# The test kit is for workstations.
if(TARGET qel-testkit)
  install(TARGETS qel-message-testkit qel-message-testlog qel-testkit
    LIBRARY COMPONENT testkit
    ARCHIVE COMPONENT testkit
    RUNTIME COMPONENT testkit)
  install(FILES testkit/qel-testkit.h testkit/qel-testlog.h
    DESTINATION "${_headers}" COMPONENT testkit)
  install(DIRECTORY testkit/scenarios DESTINATION "${CMAKE_INSTALL_DATADIR}/${PROJECT_NAME}"
    COMPONENT testkit)
  install(FILES testkit/service.scenario testkit/world.proto
    DESTINATION "${CMAKE_INSTALL_DATADIR}/${PROJECT_NAME}" COMPONENT testkit)
  foreach(_name qel-message-testkit qel-message-testlog)
    configure_file("packaging/${_name}.pc.in" "${_made}/${_name}.pc" @ONLY)
    install(FILES "${_made}/${_name}.pc" DESTINATION "${_pkgconfig}" COMPONENT testkit)
  endforeach()
endif()

# Not made by install(EXPORT): such a target would also name the runtime and the log service, with
# which users of the library do not link.
configure_package_config_file(packaging/${PROJECT_NAME}-config.cmake.in
  "${_made}/${PROJECT_NAME}-config.cmake"
  INSTALL_DESTINATION "${_cmake_package}"
  PATH_VARS CMAKE_INSTALL_LIBDIR _headers)
write_basic_package_version_file("${_made}/${PROJECT_NAME}-config-version.cmake"
  COMPATIBILITY SameMajorVersion)
install(
  FILES "${_made}/${PROJECT_NAME}-config.cmake" "${_made}/${PROJECT_NAME}-config-version.cmake"
  DESTINATION "${_cmake_package}" COMPONENT development)

# Workstations have neither this runtime nor the log service. So both are installed beside the
# library, which finds them in its own folder. A device has both.
if(TARGET dlog-standin)
  set_target_properties(qel-message-protosvc PROPERTIES INSTALL_RPATH "$ORIGIN")
  if(TARGET qel-message-testkit)
    set_target_properties(qel-message-testkit PROPERTIES INSTALL_RPATH "$ORIGIN")
  endif()
  foreach(_program qel-wire qel-testkit)
    if(TARGET ${_program})
      set_target_properties(${_program} PROPERTIES
        INSTALL_RPATH "$ORIGIN/../${CMAKE_INSTALL_LIBDIR}")
    endif()
  endforeach()
  install(TARGETS dlog-standin LIBRARY COMPONENT workstation)
  cmake_path(GET QEL_PROTOBUF_LIBRARY PARENT_PATH _folder)
  file(GLOB _runtime "${_folder}/libprotobuf.so.9*") # an SDK may keep it elsewhere
  install(FILES ${_runtime} DESTINATION "${CMAKE_INSTALL_LIBDIR}" COMPONENT workstation)
  install(FILES "${QEL_PROTOBUF_PREFIX}/share/doc/protobuf/LICENSE"
    DESTINATION "${CMAKE_INSTALL_DATADIR}/doc/${PROJECT_NAME}-workstation"
    RENAME LICENSE.protobuf COMPONENT workstation OPTIONAL)
endif()

# The example's sources, without what builds them in this tree.
file(GLOB _example examples/*.c examples/*.h examples/*.cc examples/*.scenario)
install(FILES ${_example} DESTINATION "${CMAKE_INSTALL_DATADIR}/doc/${PROJECT_NAME}/examples"
  COMPONENT documentation)

# Builds what is installed.
add_custom_target(packaged DEPENDS qel-message-protosvc contract)
if(TARGET qel-testkit)
  add_dependencies(packaged qel-testkit-says qel-message-testlog)
endif()
foreach(_target qel-trace qel-wire qel-wire-says docs)
  if(TARGET ${_target})
    add_dependencies(packaged ${_target})
  endif()
endforeach()
