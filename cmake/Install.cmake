# Headers under include/tolmonetsync/ mirroring the source tree, the library,
# a CMake package (tolmonetsync::tolmonetsync) and a pkg-config file.
include(CMakePackageConfigHelpers)

foreach(dir foundation/core foundation/net foundation/json foundation/ui foundation/tessel assets sync tarnvault identity)
  install(DIRECTORY ${PROJECT_SOURCE_DIR}/${dir}/
    DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/tolmonetsync/${dir}
    FILES_MATCHING PATTERN "*.h" PATTERN "*Private.h" EXCLUDE)
endforeach()
install(FILES ${PROJECT_SOURCE_DIR}/lib/tolmonetsync.h DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/tolmonetsync)

install(TARGETS tolmonetsync EXPORT tolmonetsyncTargets
  LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
  ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR}
  RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
install(EXPORT tolmonetsyncTargets NAMESPACE tolmonetsync::
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/tolmonetsync)

configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/tolmonetsyncConfig.cmake.in
  ${PROJECT_BINARY_DIR}/tolmonetsyncConfig.cmake
  INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/tolmonetsync)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/tolmonetsyncConfigVersion.cmake
  COMPATIBILITY SameMajorVersion)
install(FILES ${PROJECT_BINARY_DIR}/tolmonetsyncConfig.cmake ${PROJECT_BINARY_DIR}/tolmonetsyncConfigVersion.cmake
  DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/tolmonetsync)

file(RELATIVE_PATH PC_RELATIVE_PREFIX ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig ${CMAKE_INSTALL_PREFIX})
configure_file(${PROJECT_SOURCE_DIR}/cmake/tolmonetsync.pc.in ${PROJECT_BINARY_DIR}/tolmonetsync.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/tolmonetsync.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
