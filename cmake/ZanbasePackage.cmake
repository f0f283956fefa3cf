# Packages of the install tree, made by scripts/package: libzanbase0, libzanbase-dev and zanbase-record for Debian, and
# an archive that can be unpacked anywhere.

set(CPACK_PACKAGE_NAME zanbase)
set(CPACK_PACKAGE_VENDOR "The zanbase authors")
set(CPACK_PACKAGE_CONTACT "The zanbase authors <zanbase@example.org>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "${PROJECT_DESCRIPTION}")
set(CPACK_PACKAGE_FILE_NAME zanbase-${PROJECT_VERSION}-${CMAKE_SYSTEM_NAME}-${CMAKE_SYSTEM_PROCESSOR})
set(CPACK_PACKAGE_DIRECTORY ${PROJECT_BINARY_DIR}/packages)
set(CPACK_STRIP_FILES ON)
set(CPACK_COMPONENTS_ALL runtime development record)
set(CPACK_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS ${CMAKE_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS})

set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)

# cpack before 3.31 has no variable for the field Multi-Arch, and writes this one as it stands.
set(multi_arch "optional\nMulti-Arch: same")

set(CPACK_DEBIAN_RUNTIME_PACKAGE_NAME libzanbase0)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_SECTION libs)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_PRIORITY ${multi_arch})
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_EXTRA
    ${PROJECT_BINARY_DIR}/symbols ${PROJECT_BINARY_DIR}/shlibs ${PROJECT_BINARY_DIR}/triggers)
file(WRITE ${PROJECT_BINARY_DIR}/shlibs "libzanbase 0 libzanbase0 (>= ${PROJECT_VERSION})\n")
file(WRITE ${PROJECT_BINARY_DIR}/triggers "activate-noawait ldconfig\n")
file(WRITE ${PROJECT_BINARY_DIR}/overrides/libzanbase0
    "# cpack adds these scripts to every package with a library, beside the trigger that makes them superfluous.\n\
libzanbase0: maintscript-calls-ldconfig *\n")
install(FILES ${PROJECT_BINARY_DIR}/overrides/libzanbase0
    DESTINATION ${CMAKE_INSTALL_DATAROOTDIR}/lintian/overrides COMPONENT runtime)
set(CPACK_COMPONENT_RUNTIME_DISPLAY_NAME "shared library")
set(about "Portable locks and thread objects, allocators that retry, accounts of
memory, disk operations and time with printed reports, text without
allocation, OpenMP settings and a sort.")
set(CPACK_COMPONENT_RUNTIME_DESCRIPTION "${about}\nThis package has the shared library.")

set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libzanbase-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_PRIORITY ${multi_arch})
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS "libzanbase0 (= ${PROJECT_VERSION})")
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SHLIBDEPS OFF)
# For code that reads the tracker's tables, which needs the very version that the library was built with.
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SUGGESTS "libboost${Boost_VERSION_MAJOR}.${Boost_VERSION_MINOR}-dev")
set(CPACK_COMPONENT_DEVELOPMENT_DISPLAY_NAME "development files")
set(CPACK_COMPONENT_DEVELOPMENT_DESCRIPTION "${about}\nThis package has the headers, the CMake package, the
pkg-config file, the documents and the examples.")

set(CPACK_DEBIAN_RECORD_PACKAGE_NAME zanbase-record)
set(CPACK_DEBIAN_RECORD_PACKAGE_SECTION devel)
set(CPACK_COMPONENT_RECORD_DISPLAY_NAME "recorder of memory and disk use")
set(CPACK_COMPONENT_RECORD_DESCRIPTION "Runs a program, which is neither changed nor built anew, and reports its
leaks, its memory use by file and line, and its disk operations by file.
Compares two runs and checks budgets.")

# zanbase_document(COMPONENT NAME TEXT): TEXT becomes the file NAME among the documents of the component's package.
function(zanbase_document component name text)
    string(TOUPPER ${component} upper)
    set(package ${CPACK_DEBIAN_${upper}_PACKAGE_NAME})
    set(file ${PROJECT_BINARY_DIR}/documents/${package}/${name})
    file(WRITE ${file} "${text}")
    if(name MATCHES "^changelog")
        execute_process(COMMAND gzip -9nf ${file} COMMAND_ERROR_IS_FATAL ANY)
        string(APPEND file .gz)
    endif()
    install(FILES ${file} COMPONENT ${component} DESTINATION ${CMAKE_INSTALL_DATAROOTDIR}/doc/${package})
endfunction()

# The licence in the form that Debian wants: indented, with a point on each empty line.
file(READ LICENSE license)
string(STRIP "${license}" license)
string(REPLACE "\n\n" "\n.\n" license "${license}")
string(REPLACE "\n" "\n " license "${license}")
string(TIMESTAMP date "%a, %d %b %Y %H:%M:%S +0000" UTC)  # SOURCE_DATE_EPOCH, if it is set
foreach(component IN LISTS CPACK_COMPONENTS_ALL)
    zanbase_document(${component} copyright
        "Format: https://www.debian.org/doc/packaging-manuals/copyright-format/1.0/\nUpstream-Name: zanbase\n\n\
Files: *\nCopyright: 2026 The zanbase authors\nLicense: Expat\n ${license}\n")
    zanbase_document(${component} changelog "zanbase (${PROJECT_VERSION}) unstable; urgency=medium\n\n\
  * CHANGELOG.md, among the documents of libzanbase-dev, lists what changed.\n\n\
 -- ${CPACK_PACKAGE_CONTACT}  ${date}\n")
endforeach()
install(FILES docs/record.md DESTINATION ${CMAKE_INSTALL_DATAROOTDIR}/doc/zanbase-record COMPONENT record)

include(CPack)
