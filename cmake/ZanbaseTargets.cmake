# What every target of this project is compiled with.

add_library(zanbase_options INTERFACE)
target_compile_features(zanbase_options INTERFACE cxx_std_17)
target_compile_options(zanbase_options INTERFACE
    -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wold-style-cast -Wnon-virtual-dtor
    -Woverloaded-virtual -Wcast-qual -Wcast-align -Wundef -Wformat=2 -Wnull-dereference -Wimplicit-fallthrough)
option(ZANBASE_WERROR "Treat warnings as errors" OFF)
if(ZANBASE_WERROR)
    target_compile_options(zanbase_options INTERFACE -Werror)
endif()
