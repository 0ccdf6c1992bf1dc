# The folders of an installation.

# Debian's layout, unless a device's SDK has another.
if(CMAKE_LIBRARY_ARCHITECTURE AND
    (NOT CMAKE_SYSROOT OR IS_DIRECTORY "${CMAKE_SYSROOT}/usr/lib/${CMAKE_LIBRARY_ARCHITECTURE}"))
  # Not of the type PATH, which would make a relative name absolute.
  set(CMAKE_INSTALL_LIBDIR "lib/${CMAKE_LIBRARY_ARCHITECTURE}" CACHE STRING
    "Folder of libraries in the prefix")
endif()
include(GNUInstallDirs)

# CMake makes folders with the permissions of the umask. An installation makes those that it adds
# readable for all, and leaves alone those that were there.
set(_folders
  "${CMAKE_INSTALL_BINDIR}"
  "${CMAKE_INSTALL_INCLUDEDIR}/${PROJECT_NAME}"
  "${CMAKE_INSTALL_LIBDIR}/pkgconfig"
  "${CMAKE_INSTALL_LIBDIR}/cmake/${PROJECT_NAME}"
  "${CMAKE_INSTALL_DATADIR}/${PROJECT_NAME}"
  "${CMAKE_INSTALL_DATADIR}/${PROJECT_NAME}/scenarios"
  "${CMAKE_INSTALL_DATADIR}/bash-completion/completions"
  "${CMAKE_INSTALL_DATADIR}/fish/vendor_completions.d"
  "${CMAKE_INSTALL_DATADIR}/wireshark/protobuf"
  "${CMAKE_INSTALL_DATADIR}/zsh/vendor-completions"
  "${CMAKE_INSTALL_LIBDIR}/wireshark/plugins"
  "${CMAKE_INSTALL_DOCDIR}/html"
  "${CMAKE_INSTALL_DOCDIR}/examples"
  "${CMAKE_INSTALL_DOCDIR}-workstation"
  "${CMAKE_INSTALL_MANDIR}/man1"
  "${CMAKE_INSTALL_MANDIR}/man3")
install(CODE "set(qel_folders \"${_folders}\")" ALL_COMPONENTS)
install(CODE [[
  set(qel_made "")
  foreach(folder IN LISTS qel_folders)
    set(path "$ENV{DESTDIR}${CMAKE_INSTALL_PREFIX}/${folder}")
    while(NOT EXISTS "${path}")
      list(APPEND qel_made "${path}")
      cmake_path(GET path PARENT_PATH path)
    endwhile()
  endforeach()]] ALL_COMPONENTS)
cmake_language(DEFER CALL install CODE [[
  foreach(path IN LISTS qel_made)
    if(EXISTS "${path}")
      file(CHMOD "${path}" PERMISSIONS OWNER_READ OWNER_WRITE OWNER_EXECUTE GROUP_READ GROUP_EXECUTE
        WORLD_READ WORLD_EXECUTE)
    endif()
  endforeach()]] ALL_COMPONENTS)
