# Installation of the library as a package: the CMake package (vrx::vrx),
# the pkg-config file, the man pages, the user documentation and the
# embedding example.
include(CMakePackageConfigHelpers)

set(VRX_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/vrx)
install(EXPORT vrxTargets NAMESPACE vrx:: DESTINATION ${VRX_CMAKE_DIR})
configure_package_config_file(${CMAKE_CURRENT_LIST_DIR}/vrxConfig.cmake.in
  ${CMAKE_BINARY_DIR}/vrxConfig.cmake INSTALL_DESTINATION ${VRX_CMAKE_DIR})
write_basic_package_version_file(${CMAKE_BINARY_DIR}/vrxConfigVersion.cmake
  VERSION ${PROJECT_VERSION} COMPATIBILITY SameMajorVersion)
install(FILES ${CMAKE_BINARY_DIR}/vrxConfig.cmake ${CMAKE_BINARY_DIR}/vrxConfigVersion.cmake
  DESTINATION ${VRX_CMAKE_DIR})

set(VRX_PC_DIR ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
file(RELATIVE_PATH VRX_PC_TO_PREFIX /prefix/${VRX_PC_DIR} /prefix)
configure_file(${CMAKE_CURRENT_LIST_DIR}/vrx.pc.in ${CMAKE_BINARY_DIR}/vrx.pc @ONLY)
install(FILES ${CMAKE_BINARY_DIR}/vrx.pc DESTINATION ${VRX_PC_DIR})

install(FILES ${PROJECT_SOURCE_DIR}/docs/man/vrx2hxb.1 ${PROJECT_SOURCE_DIR}/docs/man/hxb2vrx.1
  DESTINATION ${CMAKE_INSTALL_MANDIR}/man1)
install(FILES ${PROJECT_SOURCE_DIR}/README.md ${PROJECT_SOURCE_DIR}/docs/format.md
  DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(DIRECTORY ${PROJECT_SOURCE_DIR}/examples/ DESTINATION ${CMAKE_INSTALL_DOCDIR}/examples
  PATTERN CMakeLists.txt EXCLUDE)
install(FILES ${PROJECT_SOURCE_DIR}/examples/host/CMakeLists.txt
  DESTINATION ${CMAKE_INSTALL_DOCDIR}/examples/host)
