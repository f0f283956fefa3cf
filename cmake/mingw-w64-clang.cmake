# As mingw-w64.cmake, with clang on the libraries of g++: its C++ library and OpenMP runtime. clang looks for a folder of
# g++ that is called by a version alone, so the folder is given here.

include(${CMAKE_CURRENT_LIST_DIR}/mingw-w64.cmake)
execute_process(COMMAND ${CMAKE_CXX_COMPILER} -print-libgcc-file-name
    OUTPUT_VARIABLE gcc_folder OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
cmake_path(GET gcc_folder PARENT_PATH gcc_folder)

set(CMAKE_CXX_COMPILER clang++-14)
set(CMAKE_CXX_COMPILER_TARGET x86_64-w64-mingw32)
set(headers ${gcc_folder}/include/c++)
set(CMAKE_CXX_FLAGS_INIT
    "-isystem ${headers} -isystem ${headers}/x86_64-w64-mingw32 -idirafter ${gcc_folder}/include -pthread")
foreach(kind IN ITEMS EXE SHARED)
    set(CMAKE_${kind}_LINKER_FLAGS_INIT "-L${gcc_folder} -B${gcc_folder}")
endforeach()
set(OpenMP_CXX_FLAGS -fopenmp=libgomp)
set(OpenMP_CXX_LIB_NAMES gomp)
set(OpenMP_gomp_LIBRARY ${gcc_folder}/libgomp.dll.a)
