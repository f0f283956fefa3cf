# What the DLL has beyond the objects of the library: its entry point, which no other program may get, and its version.

enable_language(RC)
configure_file(platform/windows/version.rc.in version.rc @ONLY)
target_sources(zanbase PRIVATE platform/windows/library.cpp ${CMAKE_CURRENT_BINARY_DIR}/version.rc)
target_include_directories(zanbase PRIVATE ${CMAKE_CURRENT_SOURCE_DIR})
