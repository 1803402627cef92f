# Debian packages, one a component. scripts/package runs this.
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME kyvisatester)
set(CPACK_PACKAGE_VENDOR Oltrava)
set(CPACK_PACKAGE_CONTACT "The KyVisaTester developers <developers@oltrava.example>")
set(CPACK_PACKAGE_VERSION ${PROJECT_VERSION})
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_PACKAGE_DIRECTORY ${PROJECT_BINARY_DIR}/../packages)
set(CPACK_COMPONENTS_ALL library development simulator)
if(TARGET KyVisaTester)
  list(APPEND CPACK_COMPONENTS_ALL tester)
endif()
set(CPACK_COMPONENTS_GROUPING ONE_PER_GROUP)
set(CPACK_STRIP_FILES ON)
set(CPACK_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS
  OWNER_READ OWNER_WRITE OWNER_EXECUTE GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)

set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SOURCE kyvisatester)
set(CPACK_DEBIAN_PACKAGE_RELEASE 1)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# The program finds the library of the same build; what that is called as a package is told below.
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${CMAKE_LIBRARY_OUTPUT_DIRECTORY})
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_COMPRESSION_TYPE xz)
set(same_version "(= ${PROJECT_VERSION}-${CPACK_DEBIAN_PACKAGE_RELEASE})")

set(CPACK_DEBIAN_LIBRARY_PACKAGE_NAME libkyvisa)
set(CPACK_DEBIAN_LIBRARY_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_LIBRARY_PACKAGE_CONTROL_EXTRA
  "${CMAKE_CURRENT_LIST_DIR}/debian/triggers;${CMAKE_CURRENT_LIST_DIR}/debian/symbols")
set(CPACK_DEBIAN_LIBRARY_DESCRIPTION "VISA library for instruments over LAN, serial lines and GPIB gateways
A library with the published VISA C interface, for programs that control
measurement instruments. It speaks HiSLIP, VXI-11, raw TCP sockets and serial
lines, reaches GPIB instruments through LAN/GPIB gateways, and finds
instruments in the LAN. It needs no kernel driver and no service.")

set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libkyvisa-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS "libkyvisa ${same_version}")
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SUGGESTS "kyvisasimulator, pkg-config")
set(CPACK_DEBIAN_DEVELOPMENT_DESCRIPTION "VISA library for instruments over LAN (development files)
A library with the published VISA C interface, for programs that control
measurement instruments.
.
This package has its headers, the files for pkg-config and CMake, a manual
page and example programs.")

set(CPACK_DEBIAN_SIMULATOR_PACKAGE_NAME kyvisasimulator)
set(CPACK_DEBIAN_SIMULATOR_PACKAGE_SECTION electronics)
set(CPACK_DEBIAN_SIMULATOR_DESCRIPTION "simulated measurement instrument for VISA programs
An instrument without hardware: a program that answers IEEE 488.2 and SCPI
over HiSLIP, VXI-11, a raw TCP socket, a serial port and a LAN/GPIB gateway.
It can be another instrument by a profile, and misbehave on demand to show
what a client makes of it.")

set(CPACK_DEBIAN_TESTER_PACKAGE_NAME kyvisatester)
set(CPACK_DEBIAN_TESTER_PACKAGE_SECTION electronics)
set(CPACK_DEBIAN_TESTER_PACKAGE_DEPENDS "libkyvisa ${same_version}")
set(CPACK_DEBIAN_TESTER_PACKAGE_SUGGESTS kyvisasimulator)
set(CPACK_DEBIAN_TESTER_DESCRIPTION "desktop tool that drives measurement instruments through VISA
Finds and opens instruments, writes, reads and queries, polls the status
byte, sets attributes, locks, waits for events, controls a GPIB bus and runs
stress tests, each call timed and logged.
.
It works with the VISA library of another maker in place of its own.")

include(CPack)
