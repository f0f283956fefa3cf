# The install tree: headers, library, CMake package, pkg-config file, and the examples as documentation. Nothing
# in it holds an absolute path, so the tree can be moved.

include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

# What programs need at run time is a component of its own; all else is for building them.
set(CMAKE_INSTALL_DEFAULT_COMPONENT_NAME development)
install(TARGETS zanbase EXPORT zanbaseTargets
    RUNTIME COMPONENT runtime
    LIBRARY COMPONENT runtime NAMELINK_COMPONENT development
    ARCHIVE COMPONENT development)
install(DIRECTORY include/zanbase ${CMAKE_CURRENT_BINARY_DIR}/include/zanbase DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(EXPORT zanbaseTargets NAMESPACE zanbase:: DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/zanbase)

configure_package_config_file(cmake/zanbaseConfig.cmake.in zanbaseConfig.cmake
    INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/zanbase)
# Before 1.0 a minor version may change the interface.
write_basic_package_version_file(zanbaseConfigVersion.cmake COMPATIBILITY SameMinorVersion)
install(FILES
        ${CMAKE_CURRENT_BINARY_DIR}/zanbaseConfig.cmake
        ${CMAKE_CURRENT_BINARY_DIR}/zanbaseConfigVersion.cmake
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/zanbase)

file(RELATIVE_PATH ZANBASE_PREFIX_FROM_PC
    /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
configure_file(cmake/zanbase.pc.in zanbase.pc @ONLY)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/zanbase.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

install(FILES README.md LICENSE docs/snapshot.schema.json DESTINATION ${CMAKE_INSTALL_DOCDIR})
install(DIRECTORY examples DESTINATION ${CMAKE_INSTALL_DOCDIR} FILES_MATCHING PATTERN "*.cpp" PATTERN "*.po")
