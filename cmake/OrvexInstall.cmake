# Installation: the libraries, public headers (the library's and the
# platform layer's), generated schema headers, a CMake package giving
# orvex::orvex_base, and a pkg-config file. Both find Android's base
# libraries where Debian installs them (cmake/OrvexAndroidPlatform.cmake).
include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

# orvex_host_trace records trace markers on a host (the orvex tool's --trace);
# it is exported too, for host programs that want to record traces.
install(TARGETS orvex_base orvex_platform orvex_host_trace
  EXPORT orvexTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR}
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})

install(DIRECTORY ${PROJECT_SOURCE_DIR}/orvex/
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/orvex
  FILES_MATCHING PATTERN "*.h"
  PATTERN "*_test.h" EXCLUDE)
install(DIRECTORY ${PROJECT_SOURCE_DIR}/platform/include/
                  ${PROJECT_SOURCE_DIR}/platform/host_include/
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/orvex/platform
  FILES_MATCHING PATTERN "*.h")
# Generated headers (Protocol Buffers schema) under the build tree.
install(DIRECTORY ${PROJECT_BINARY_DIR}/orvex/
  DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/orvex
  FILES_MATCHING PATTERN "*.pb.h"
  PATTERN "CMakeFiles" EXCLUDE)

install(EXPORT orvexTargets
  NAMESPACE orvex::
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/orvex)
configure_package_config_file(
  ${PROJECT_SOURCE_DIR}/cmake/orvexConfig.cmake.in
  ${PROJECT_BINARY_DIR}/orvexConfig.cmake
  INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/orvex)
write_basic_package_version_file(
  ${PROJECT_BINARY_DIR}/orvexConfigVersion.cmake
  COMPATIBILITY SameMinorVersion)
install(FILES
  ${PROJECT_BINARY_DIR}/orvexConfig.cmake
  ${PROJECT_BINARY_DIR}/orvexConfigVersion.cmake
  ${PROJECT_SOURCE_DIR}/cmake/OrvexAndroidPlatform.cmake
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/orvex)

# The .pc file finds its prefix relative to its own directory, so the
# installed tree can be moved.
file(RELATIVE_PATH ORVEX_PC_TO_PREFIX "/${CMAKE_INSTALL_LIBDIR}/pkgconfig" "/")
configure_file(${PROJECT_SOURCE_DIR}/cmake/orvex.pc.in ${PROJECT_BINARY_DIR}/orvex.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/orvex.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
