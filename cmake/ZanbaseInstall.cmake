# The install tree: headers, library, CMake package, pkg-config file, and the examples as documentation. Nothing
# in it holds an absolute path, so the tree can be moved.

include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

install(TARGETS zanbase EXPORT zanbaseTargets)
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
