# The files of this back end, and how the library is built for it.
set(ZANBASE_PLATFORM_SOURCES
    clock.cpp
    condition.cpp
    console.cpp
    file.cpp
    fork.cpp
    guard.cpp
    lock.cpp
    messages.cpp
    process.cpp
    processors.cpp
    race_detector.cpp
    semaphore.cpp
    standard_stream.cpp
    stream.cpp
    thread.cpp
    thread_block.cpp
    thread_self.cpp
    wide_name.cpp)

find_package(Intl REQUIRED)
set_property(TARGET Intl::Intl PROPERTY IMPORTED_GLOBAL TRUE)  # for the tests too
set(ZANBASE_PLATFORM_LIBRARIES Intl::Intl
    ntdll         # reports whether the process is ending
    -l:libssp.a)  # the stack protector, in the file itself: its DLL would be one more to install

set(CMAKE_SHARED_LIBRARY_PREFIX "")  # zanbase.dll

# Without exceptions each operation of the lock ends in a jump to the system's, and needs no frame.
set_source_files_properties(platform/windows/lock.cpp PROPERTIES COMPILE_OPTIONS -fno-exceptions)
