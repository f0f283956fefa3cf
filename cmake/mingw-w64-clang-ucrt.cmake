# As mingw-w64-clang.cmake, for the UCRT. The C++ library of Debian's g++ is built for msvcrt: as a DLL it would use that
# one beside the UCRT, so it is linked statically. A tool chain that is made for the UCRT needs nothing of this.

include(${CMAKE_CURRENT_LIST_DIR}/mingw-w64-clang.cmake)
string(APPEND CMAKE_CXX_FLAGS_INIT " -D_UCRT")
set(CMAKE_CXX_STANDARD_LIBRARIES "-Wl,--start-group -l:libstdc++.a -lmingw32 -lgcc -lgcc_eh -lmoldname -lmingwex -lucrt \
-Wl,--end-group -l:libpthread.dll.a -lkernel32 -luser32 -ladvapi32")
