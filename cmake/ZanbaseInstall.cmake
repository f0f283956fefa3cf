# The install tree: headers, library, CMake package, pkg-config file, and documents. While the folders are relative to
# the prefix, nothing in it holds an absolute path, so the tree can be moved.

include(GNUInstallDirs)
include(CMakePackageConfigHelpers)

# The same modes whatever the umask is of whoever installs.
set(CMAKE_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS
    OWNER_READ OWNER_WRITE OWNER_EXECUTE GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)

# What programs need at run time is a component of its own; all else is for building them.
set(CMAKE_INSTALL_DEFAULT_COMPONENT_NAME development)
install(TARGETS zanbase EXPORT zanbaseTargets
    RUNTIME COMPONENT runtime
    LIBRARY COMPONENT runtime NAMELINK_COMPONENT development
    ARCHIVE COMPONENT development)
install(DIRECTORY include/zanbase ${PROJECT_BINARY_DIR}/include/zanbase DESTINATION ${CMAKE_INSTALL_INCLUDEDIR})
install(EXPORT zanbaseTargets NAMESPACE zanbase:: DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/zanbase)

configure_package_config_file(cmake/zanbaseConfig.cmake.in zanbaseConfig.cmake
    INSTALL_DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/zanbase)
# Before 1.0 a minor version may change the interface.
write_basic_package_version_file(zanbaseConfigVersion.cmake COMPATIBILITY SameMinorVersion)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/zanbaseConfig.cmake ${CMAKE_CURRENT_BINARY_DIR}/zanbaseConfigVersion.cmake
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/cmake/zanbase)

# Sets `result` to the install folder `folder` as the pkg-config file states it: relative to its own place if it can be.
function(zanbase_pkg_config_folder result folder)
    if(IS_ABSOLUTE "${folder}")
        set(${result} ${folder} PARENT_SCOPE)
    elseif(IS_ABSOLUTE "${CMAKE_INSTALL_LIBDIR}")
        set(${result} ${CMAKE_INSTALL_PREFIX}/${folder} PARENT_SCOPE)
    else()
        file(RELATIVE_PATH prefix /prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig /prefix)
        set(${result} "\${pcfiledir}/${prefix}${folder}" PARENT_SCOPE)
    endif()
endfunction()
zanbase_pkg_config_folder(ZANBASE_PC_LIBDIR "${CMAKE_INSTALL_LIBDIR}")
zanbase_pkg_config_folder(ZANBASE_PC_INCLUDEDIR "${CMAKE_INSTALL_INCLUDEDIR}")
configure_file(cmake/zanbase.pc.in zanbase.pc @ONLY)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/zanbase.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

# As a subproject it has no share in the documents of its parent.
if(PROJECT_IS_TOP_LEVEL)
    install(FILES README.md CHANGELOG.md CONTRIBUTING.md LICENSE DESTINATION ${CMAKE_INSTALL_DOCDIR})
    install(DIRECTORY docs DESTINATION ${CMAKE_INSTALL_DOCDIR}
        FILES_MATCHING PATTERN "*.md" PATTERN "*.svg" PATTERN "*.json")
    install(DIRECTORY examples DESTINATION ${CMAKE_INSTALL_DOCDIR}
        FILES_MATCHING PATTERN "*.cpp" PATTERN "*.po")
    # The documents link the headers.
    file(RELATIVE_PATH headers ${CMAKE_INSTALL_FULL_DOCDIR} ${CMAKE_INSTALL_FULL_INCLUDEDIR})
    file(MAKE_DIRECTORY ${PROJECT_BINARY_DIR}/documents)
    file(CREATE_LINK ${headers} ${PROJECT_BINARY_DIR}/documents/include SYMBOLIC)
    install(FILES ${PROJECT_BINARY_DIR}/documents/include DESTINATION ${CMAKE_INSTALL_DOCDIR})
endif()
