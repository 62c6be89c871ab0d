# The installed tree: headers below include/vexg, the library, the host, a CMake package, vexg.pc.
include(CMakePackageConfigHelpers)

install(TARGETS vexg EXPORT vexgTargets
        LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
install(DIRECTORY ${PROJECT_SOURCE_DIR}/src/ DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/vexg
        FILES_MATCHING PATTERN "*.h" PATTERN "*_body.h" EXCLUDE
        REGEX "platform/(file_descriptor|message_frame|pipe_directory).h" EXCLUDE)
install(DIRECTORY ${PROJECT_SOURCE_DIR}/resources/ DESTINATION ${CMAKE_INSTALL_DATADIR}/vexg)
install(EXPORT vexgTargets NAMESPACE vexg:: DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/vexg)

configure_package_config_file(${PROJECT_SOURCE_DIR}/cmake/vexgConfig.cmake.in
  ${PROJECT_BINARY_DIR}/vexgConfig.cmake INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/vexg)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/vexgConfigVersion.cmake
  COMPATIBILITY SameMinorVersion)
install(FILES ${PROJECT_BINARY_DIR}/vexgConfig.cmake ${PROJECT_BINARY_DIR}/vexgConfigVersion.cmake
        DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/vexg)

# Relative, so that the tree can be moved.
file(RELATIVE_PATH VEXG_PREFIX_FROM_PKGCONFIG /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
configure_file(${PROJECT_SOURCE_DIR}/cmake/vexg.pc.in ${PROJECT_BINARY_DIR}/vexg.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/vexg.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
