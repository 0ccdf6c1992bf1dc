# What 'cpack' makes: a Debian package of each component, and an archive of all. ./dev package calls
# it.

set(CPACK_GENERATOR DEB TGZ)
set(CPACK_PACKAGE_CONTACT "The maintainers <maintainers@example.invalid>") # to be replaced
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "${PROJECT_DESCRIPTION}")
set(CPACK_PACKAGE_FILE_NAME "${PROJECT_NAME}-${PROJECT_VERSION}-${CMAKE_LIBRARY_ARCHITECTURE}")
# Packages have no debug information: it is five sixths of the library and names the build's
# folders. To read a core dump, use the build folder's library, which has the same build id.
set(CPACK_STRIP_FILES ON)
set(CPACK_PRE_BUILD_SCRIPTS "${PROJECT_SOURCE_DIR}/packaging/folder_permissions.cmake")
get_cmake_property(CPACK_COMPONENTS_ALL COMPONENTS)
list(REMOVE_ITEM CPACK_COMPONENTS_ALL Unspecified) # has no files, only steps of all components

set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
if(CMAKE_LIBRARY_ARCHITECTURE STREQUAL "arm-linux-gnueabihf")
  set(CPACK_DEBIAN_PACKAGE_ARCHITECTURE armhf)
elseif(CMAKE_LIBRARY_ARCHITECTURE STREQUAL "arm-linux-gnueabi")
  set(CPACK_DEBIAN_PACKAGE_ARCHITECTURE armel)
endif() # otherwise cpack takes this machine's

# The dependencies name the lowest versions of the base libraries that have all needed symbols.
# Tests compare.

set(_library_package libqel-message-protosvc${PROJECT_VERSION_MAJOR})
configure_file(packaging/shlibs.in packaging/shlibs @ONLY)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_NAME ${_library_package})
set(CPACK_DEBIAN_RUNTIME_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_DEPENDS
  "libc6 (>= 2.14), libgcc-s1 (>= 3.5), libstdc++6 (>= 5.2), libprotobuf9 (>= 2.6)")
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_EXTRA
  "${PROJECT_SOURCE_DIR}/packaging/triggers;${PROJECT_BINARY_DIR}/packaging/shlibs")
set(CPACK_COMPONENT_RUNTIME_DESCRIPTION "The shared library that message plug-ins are linked with.")

set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libqel-message-protosvc-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS "${_library_package} (= ${PROJECT_VERSION})")
# Users of the classes need the runtime's headers.
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SUGGESTS "libprotobuf-dev (>= 2.6.1), libprotobuf-dev (<< 2.7)")
set(CPACK_COMPONENT_DEVELOPMENT_DESCRIPTION
  "Headers, schema, pkg-config files and CMake package, for authors of plug-ins in C and of modules
that use the exported classes.")

set(CPACK_DEBIAN_TOOLS_PACKAGE_NAME qel-wire)
set(CPACK_DEBIAN_TOOLS_PACKAGE_SECTION utils)
set(CPACK_DEBIAN_TOOLS_PACKAGE_DEPENDS
  "libc6 (>= 2.34), libgcc-s1 (>= 3.5), libstdc++6 (>= 11), libprotobuf9 (>= 2.6), libnettle8, \
${_library_package} (= ${PROJECT_VERSION})")
set(CPACK_COMPONENT_TOOLS_DESCRIPTION "A command that shows and makes the protocol's messages.")

# libprotobuf9 was Debian's last package of this runtime.
set(CPACK_DEBIAN_WORKSTATION_PACKAGE_NAME ${PROJECT_NAME}-workstation)
set(CPACK_DEBIAN_WORKSTATION_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_WORKSTATION_PACKAGE_DEPENDS "libc6 (>= 2.17), libgcc-s1 (>= 3.5), libstdc++6 (>= 11)")
set(CPACK_DEBIAN_WORKSTATION_PACKAGE_CONTROL_EXTRA "${PROJECT_SOURCE_DIR}/packaging/triggers")
set(CPACK_COMPONENT_WORKSTATION_DESCRIPTION
  "What the library needs and a workstation has not: the runtime of Protocol Buffers
${QEL_PROTOBUF_VERSION} and a stand-in for the device's log service.")
if(TARGET dlog-standin)
  string(APPEND CPACK_DEBIAN_RUNTIME_PACKAGE_DEPENDS ", ${PROJECT_NAME}-workstation")
endif()
if(_runtime) # is installed with this component
  set(CPACK_DEBIAN_WORKSTATION_PACKAGE_PROVIDES "libprotobuf9 (= ${QEL_PROTOBUF_VERSION})")
  set(CPACK_DEBIAN_WORKSTATION_PACKAGE_CONFLICTS libprotobuf9)
  set(CPACK_DEBIAN_WORKSTATION_PACKAGE_REPLACES libprotobuf9)
endif()

# Builds what the packages contain.
add_custom_target(packaged DEPENDS qel-message-protosvc)
foreach(_target qel-wire docs)
  if(TARGET ${_target})
    add_dependencies(packaged ${_target})
  endif()
endforeach()

include(CPack)
