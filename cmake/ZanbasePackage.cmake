# Packages of the install tree, made by scripts/package: libzanbase0 and libzanbase-dev for Debian, and an archive
# that can be unpacked anywhere.

set(CPACK_PACKAGE_NAME zanbase)
set(CPACK_PACKAGE_VENDOR "The zanbase authors")
set(CPACK_PACKAGE_CONTACT "The zanbase authors <zanbase@localhost>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "${PROJECT_DESCRIPTION}")
set(CPACK_PACKAGE_FILE_NAME zanbase-${PROJECT_VERSION}-${CMAKE_SYSTEM_NAME}-${CMAKE_SYSTEM_PROCESSOR})
set(CPACK_PACKAGE_DIRECTORY ${PROJECT_BINARY_DIR}/packages)
set(CPACK_STRIP_FILES ON)
set(CPACK_COMPONENTS_ALL runtime development)

set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)

set(CPACK_DEBIAN_RUNTIME_PACKAGE_NAME libzanbase0)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_EXTRA ${PROJECT_BINARY_DIR}/symbols)
set(CPACK_COMPONENT_RUNTIME_DESCRIPTION "The shared library.")

set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libzanbase-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS "libzanbase0 (= ${PROJECT_VERSION})")
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SHLIBDEPS ON)  # what the recorder needs
# For code that reads the tracker's tables, which needs the very version that the library was built with.
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SUGGESTS "libboost${Boost_VERSION_MAJOR}.${Boost_VERSION_MINOR}-dev")
set(CPACK_COMPONENT_DEVELOPMENT_DESCRIPTION "Headers, CMake package, pkg-config file, recorder, and examples.")

# The licence in the form that Debian wants: indented, with a point on each empty line.
file(READ LICENSE license)
string(STRIP "${license}" license)
string(REPLACE "\n\n" "\n.\n" license "${license}")
string(REPLACE "\n" "\n " license "${license}")
file(WRITE ${PROJECT_BINARY_DIR}/copyright
    "Format: https://www.debian.org/doc/packaging-manuals/copyright-format/1.0/\nUpstream-Name: zanbase\n\n"
    "Files: *\nCopyright: 2026 The zanbase authors\nLicense: Expat\n ${license}\n")
foreach(component IN ITEMS RUNTIME DEVELOPMENT)
    string(TOLOWER ${component} lower)
    install(FILES ${PROJECT_BINARY_DIR}/copyright COMPONENT ${lower}
        DESTINATION ${CMAKE_INSTALL_DATAROOTDIR}/doc/${CPACK_DEBIAN_${component}_PACKAGE_NAME})
endforeach()

include(CPack)
