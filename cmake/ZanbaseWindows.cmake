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
