# cmake --install: the plug-in, the xtok-host command, the contract headers
# and a CMake package, so that another host builds against the same slots:
#   find_package(xtokline) ... target_link_libraries(myhost PRIVATE xtokline::sdk)
# The package also names the installed plug-in, as xtokline_PLUGIN.
include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

set(XTOK_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/xtokline)

# A Windows DLL goes to bin/ beside the programs that load it, as Windows
# finds DLLs; elsewhere the plug-in goes to lib/.
install(TARGETS xtok LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}
    RUNTIME DESTINATION ${CMAKE_INSTALL_BINDIR})
if(WIN32)
    set(XTOK_PLUGIN_DIR ${CMAKE_INSTALL_BINDIR})
    set(XTOK_PLUGIN_FILE xtok.dll)
else()
    set(XTOK_PLUGIN_DIR ${CMAKE_INSTALL_LIBDIR})
    set(XTOK_PLUGIN_FILE ${CMAKE_SHARED_LIBRARY_PREFIX}xtok${CMAKE_SHARED_LIBRARY_SUFFIX})
endif()
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
    PATH_VARS XTOK_PLUGIN_DIR)
write_basic_package_version_file(${CMAKE_CURRENT_BINARY_DIR}/xtoklineConfigVersion.cmake
    COMPATIBILITY SameMajorVersion ARCH_INDEPENDENT)
install(FILES
    ${CMAKE_CURRENT_BINARY_DIR}/xtoklineConfig.cmake
    ${CMAKE_CURRENT_BINARY_DIR}/xtoklineConfigVersion.cmake
    DESTINATION ${XTOK_CMAKE_DIR})
