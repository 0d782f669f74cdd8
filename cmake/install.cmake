# cmake --install: the plug-in, the xtok-host command, the contract headers
# and a CMake package, so that another host builds against the same slots:
#   find_package(xtokline) ... target_link_libraries(myhost PRIVATE xtokline::sdk)
# The package also names the installed plug-in, as xtokline_PLUGIN.
include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

set(XTOK_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/xtokline)

install(TARGETS xtok LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR})
if(XTOK_BUILD_HOST)
    install(TARGETS xtok-host RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
endif()

install(DIRECTORY sdk/xtokline DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}
    FILES_MATCHING PATTERN "*.h")
set_target_properties(xtok_sdk PROPERTIES EXPORT_NAME sdk)
install(TARGETS xtok_sdk EXPORT xtoklineTargets)
install(EXPORT xtoklineTargets NAMESPACE xtokline:: DESTINATION ${XTOK_CMAKE_DIR})

configure_package_config_file(cmake/xtoklineConfig.cmake.in
    ${CMAKE_CURRENT_BINARY_DIR}/xtoklineConfig.cmake
    INSTALL_DESTINATION ${XTOK_CMAKE_DIR}
    PATH_VARS CMAKE_INSTALL_LIBDIR)
write_basic_package_version_file(${CMAKE_CURRENT_BINARY_DIR}/xtoklineConfigVersion.cmake
    COMPATIBILITY SameMajorVersion ARCH_INDEPENDENT)
install(FILES
    ${CMAKE_CURRENT_BINARY_DIR}/xtoklineConfig.cmake
    ${CMAKE_CURRENT_BINARY_DIR}/xtoklineConfigVersion.cmake
    DESTINATION ${XTOK_CMAKE_DIR})
