# Builds for 64-bit Windows with MinGW-w64 on another system, and runs what was built under Wine.
# ZANBASE_WINDOWS_ROOT is a folder with the libraries that the compiler's packages don't bring, built for Windows;
# scripts/windows.sh makes it.

set(CMAKE_SYSTEM_NAME Windows)
set(CMAKE_SYSTEM_PROCESSOR x86_64)

# The posix variant: its C++ runtime has std::thread.
set(CMAKE_C_COMPILER x86_64-w64-mingw32-gcc-posix)
set(CMAKE_CXX_COMPILER x86_64-w64-mingw32-g++-posix)
set(CMAKE_RC_COMPILER x86_64-w64-mingw32-windres)
find_program(CMAKE_CROSSCOMPILING_EMULATOR wine64 PATHS /usr/lib/wine NO_CMAKE_FIND_ROOT_PATH)

list(APPEND CMAKE_TRY_COMPILE_PLATFORM_VARIABLES ZANBASE_WINDOWS_ROOT)
set(CMAKE_FIND_ROOT_PATH /usr/x86_64-w64-mingw32 ${ZANBASE_WINDOWS_ROOT})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
