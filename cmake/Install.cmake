# The install tree: headers, library, a CMake package (target TAVO::TAVO) and a pkg-config file.
include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

install(TARGETS TAVO EXPORT TAVOTargets
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR}
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
  INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(DIRECTORY include/TAVO DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} FILES_MATCHING PATTERN "*.h")
install(EXPORT TAVOTargets NAMESPACE TAVO:: DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/TAVO)
configure_package_config_file(cmake/TAVOConfig.cmake.in ${CMAKE_BINARY_DIR}/TAVOConfig.cmake
  INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/TAVO)
write_basic_package_version_file(${CMAKE_BINARY_DIR}/TAVOConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES ${CMAKE_BINARY_DIR}/TAVOConfig.cmake ${CMAKE_BINARY_DIR}/TAVOConfigVersion.cmake
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/TAVO)

# The Linux library takes wchar_t to have 16 bits; whoever includes its headers must too.
set(TAVO_PC_CFLAGS "")
if(NOT WIN32)
  set(TAVO_PC_CFLAGS "-fshort-wchar")
endif()
file(RELATIVE_PATH TAVO_PC_UP ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig ${CMAKE_INSTALL_PREFIX})
configure_file(cmake/TAVO.pc.in ${CMAKE_BINARY_DIR}/TAVO.pc @ONLY)
install(FILES ${CMAKE_BINARY_DIR}/TAVO.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
