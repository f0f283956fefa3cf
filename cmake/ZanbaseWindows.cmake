# What the DLL has beyond the objects of the library: its entry point, which no other program may get, and its version;
# and the C runtime, of which the public headers know the name.

include(CheckCXXSourceCompiles)
check_cxx_source_compiles("
    #include <cstdlib>
    #if !defined(_UCRT)
    #error
    #endif
    int main() {}" ZANBASE_COMPILER_HAS_UCRT)
set(ZANBASE_FOR_UCRT 0)
if(ZANBASE_COMPILER_HAS_UCRT)
    set(ZANBASE_FOR_UCRT 1)
endif()
configure_file(${PROJECT_SOURCE_DIR}/cmake/windows_runtime.h.in
    ${PROJECT_BINARY_DIR}/include/zanbase/windows_runtime.h @ONLY)

enable_language(RC)
configure_file(platform/windows/version.rc.in version.rc @ONLY)
target_sources(zanbase PRIVATE platform/windows/library.cpp ${CMAKE_CURRENT_BINARY_DIR}/version.rc)
target_include_directories(zanbase PRIVATE ${CMAKE_CURRENT_SOURCE_DIR})

if(NOT ZANBASE_INSTALL)
    return()
endif()

# Windows has no common place for libraries: what the DLL needs of the compiler and of gettext is installed beside it.
option(ZANBASE_INSTALL_RUNTIME_DLLS "Install the DLLs of the compiler and of gettext, too" ON)
set(CMAKE_INSTALL_DOCDIR doc CACHE PATH "Documents")
include(GNUInstallDirs)
foreach(dll IN ITEMS libstdc++-6 libgcc_s_seh-1 libgomp-1 libwinpthread-1 libintl-8)
    if(NOT ZANBASE_INSTALL_RUNTIME_DLLS)
        break()
    endif()
    find_file(ZANBASE_${dll} ${dll}.dll PATH_SUFFIXES bin lib)
    if(NOT ZANBASE_${dll})
        message(WARNING "${dll}.dll is not installed: there is none in bin or lib of ${CMAKE_FIND_ROOT_PATH}")
        continue()
    endif()
    file(REAL_PATH ${ZANBASE_${dll}} file)
    install(FILES ${file} DESTINATION ${CMAKE_INSTALL_BINDIR} COMPONENT runtime)
endforeach()

# cpack -G ZIP: a folder that can be unpacked anywhere.
if(PROJECT_IS_TOP_LEVEL AND NOT ZANBASE_PACKAGES)
    set(CPACK_GENERATOR ZIP)
    set(CPACK_PACKAGE_NAME zanbase)
    set(CPACK_PACKAGE_VENDOR "The zanbase authors")
    set(CPACK_PACKAGE_FILE_NAME zanbase-${PROJECT_VERSION}-windows-x86_64)
    set(CPACK_STRIP_FILES ON)
    include(CPack)
endif()
