# The files of this back end, and how the library is built for it.
set(ZANBASE_PLATFORM_SOURCES
    clock.cpp
    condition.cpp
    console.cpp
    fork.cpp
    guard.cpp
    lock.cpp
    messages.cpp
    processors.cpp
    semaphore.cpp
    stream.cpp
    thread.cpp)

find_package(Intl REQUIRED)
set_property(TARGET Intl::Intl PROPERTY IMPORTED_GLOBAL TRUE)  # for the tests too
set(ZANBASE_PLATFORM_LIBRARIES Intl::Intl)
