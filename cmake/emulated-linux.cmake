# Builds for Linux on another processor, and runs what was built under qemu's user emulation. ZANBASE_PROCESSOR is its
# name as the cross compiler's has it (aarch64, riscv64, powerpc64le, s390x); ZANBASE_EMULATED_ROOT a folder with the
# libraries that the compiler's packages don't bring, which scripts/emulated.sh makes.

set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR ${ZANBASE_PROCESSOR})
set(triplet ${ZANBASE_PROCESSOR}-linux-gnu)
set(CMAKE_C_COMPILER ${triplet}-gcc)
set(CMAKE_CXX_COMPILER ${triplet}-g++)
string(REPLACE powerpc ppc emulator qemu-${ZANBASE_PROCESSOR})
set(CMAKE_CROSSCOMPILING_EMULATOR ${emulator} -L /usr/${triplet})

list(APPEND CMAKE_TRY_COMPILE_PLATFORM_VARIABLES ZANBASE_PROCESSOR ZANBASE_EMULATED_ROOT)
set(CMAKE_FIND_ROOT_PATH /usr/${triplet} ${ZANBASE_EMULATED_ROOT})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
