# Refuses what the library is not made for, each with one line, before anything is compiled.

include(CheckCXXSourceCompiles)

if(NOT CMAKE_SIZEOF_VOID_P EQUAL 8)
    message(FATAL_ERROR "zanbase needs a 64-bit system: this compiler's pointers have ${CMAKE_SIZEOF_VOID_P} bytes.")
elseif(CMAKE_SYSTEM_NAME STREQUAL Windows)
    if(NOT MINGW)
        message(FATAL_ERROR "zanbase for Windows is built with MinGW-w64, not with ${CMAKE_CXX_COMPILER_ID}.")
    endif()
elseif(CMAKE_SYSTEM_NAME STREQUAL Linux)
    check_cxx_source_compiles(
        "#include <features.h>\n#if !__GLIBC_PREREQ(2, 34)\n#error\n#endif\nint main() {}" ZANBASE_HAS_GLIBC)
    if(NOT ZANBASE_HAS_GLIBC)
        message(FATAL_ERROR "zanbase for Linux needs the GNU C library, version 2.34 or later.")
    endif()
else()
    message(FATAL_ERROR "zanbase has no back end for ${CMAKE_SYSTEM_NAME}; docs/porting.md describes how to add one.")
endif()

if(DEFINED BUILD_SHARED_LIBS AND NOT BUILD_SHARED_LIBS)
    message(FATAL_ERROR "zanbase is a shared library only (BUILD_SHARED_LIBS is OFF): its accounts, and the handlers "
        "that it installs in threads, must exist once in a process, which copies in several modules would break.")
endif()
