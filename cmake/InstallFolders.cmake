# Where things are installed, in the prefix.

# Debian's layout, so that what is installed in /usr serves as a package of any machine; but a device
# has its SDK's.
if(CMAKE_LIBRARY_ARCHITECTURE AND NOT CMAKE_SYSROOT)
  # As PATH, a name that is given for it would become absolute.
  set(CMAKE_INSTALL_LIBDIR "lib/${CMAKE_LIBRARY_ARCHITECTURE}" CACHE STRING
    "Folder of libraries in the prefix")
endif()
include(GNUInstallDirs)
