# Installs what an author of packages needs: headers, the library, a CMake package and a pkg-config file.
# To be included where the target `webapi` exists.
include(CMakePackageConfigHelpers)
include(GNUInstallDirs)

set(package_directory ${CMAKE_INSTALL_LIBDIR}/cmake/webapi-ZELM5)
set(generated ${PROJECT_BINARY_DIR}/install)

install(DIRECTORY ${PROJECT_SOURCE_DIR}/include/webapi
    DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} FILES_MATCHING PATTERN "*.h")

install(TARGETS webapi EXPORT webapi-ZELM5Targets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(EXPORT webapi-ZELM5Targets NAMESPACE webapi:: DESTINATION ${package_directory})

configure_package_config_file(${CMAKE_CURRENT_LIST_DIR}/webapi-ZELM5Config.cmake.in
    ${generated}/webapi-ZELM5Config.cmake INSTALL_DESTINATION ${package_directory})
write_basic_package_version_file(${generated}/webapi-ZELM5ConfigVersion.cmake
    VERSION ${PROJECT_VERSION} COMPATIBILITY SameMajorVersion)
install(FILES
    ${generated}/webapi-ZELM5Config.cmake
    ${generated}/webapi-ZELM5ConfigVersion.cmake
    ${CMAKE_CURRENT_LIST_DIR}/WebapiPackage.cmake
    ${CMAKE_CURRENT_LIST_DIR}/WebapiDescription.cmake
    DESTINATION ${package_directory})

configure_file(${CMAKE_CURRENT_LIST_DIR}/webapi-ZELM5.pc.in ${generated}/webapi-ZELM5.pc @ONLY)
install(FILES ${generated}/webapi-ZELM5.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
