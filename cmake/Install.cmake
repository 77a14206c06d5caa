include(CMakePackageConfigHelpers)

install(TARGETS KviDaemonCore EXPORT KviDaemonCoreTargets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/KviDaemonCore)
install(DIRECTORY ${CMAKE_SOURCE_DIR}/include/
    DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/KviDaemonCore)
install(EXPORT KviDaemonCoreTargets
    NAMESPACE KviDaemonCore::
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/KviDaemonCore)

configure_package_config_file(${CMAKE_SOURCE_DIR}/cmake/KviDaemonCoreConfig.cmake.in
    ${CMAKE_BINARY_DIR}/KviDaemonCoreConfig.cmake
    INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/KviDaemonCore)
write_basic_package_version_file(${CMAKE_BINARY_DIR}/KviDaemonCoreConfigVersion.cmake
    COMPATIBILITY SameMajorVersion)
install(FILES ${CMAKE_BINARY_DIR}/KviDaemonCoreConfig.cmake
    ${CMAKE_BINARY_DIR}/KviDaemonCoreConfigVersion.cmake
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/KviDaemonCore)

configure_file(${CMAKE_SOURCE_DIR}/cmake/KviDaemonCore.pc.in
    ${CMAKE_BINARY_DIR}/KviDaemonCore.pc @ONLY)
install(FILES ${CMAKE_BINARY_DIR}/KviDaemonCore.pc
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
