# The files of this back end.
set(ZANBASE_PLATFORM_SOURCES
    clock.cpp
    condition.cpp
    console.cpp
    futex.cpp
    guard.cpp
    thread_kill.cpp
    thread_kill_safety.cpp
    lock.cpp
    messages.cpp
    processors.cpp
    restartable.cpp
    semaphore.cpp
    standard_stream.cpp
    terminal_window.cpp
    thread.cpp
    thread_block.cpp)
