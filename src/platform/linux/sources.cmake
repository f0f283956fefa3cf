# The files of this back end, and what an ELF shared library needs of the compiler and the linker.
set(ZANBASE_PLATFORM_SOURCES
    clock.cpp
    condition.cpp
    console.cpp
    file.cpp
    fork.cpp
    futex.cpp
    guard.cpp
    lock.cpp
    lock_owner.cpp
    messages.cpp
    process.cpp
    processors.cpp
    race_detector.cpp
    semaphore.cpp
    standard_stream.cpp
    stream.cpp
    terminal_window.cpp
    thread.cpp
    thread_block.cpp
    thread_exit.cpp
    thread_kill.cpp
    thread_kill_signal.cpp
    thread_self.cpp
    thread_wait.cpp)

# Delays a kill while the thread may hold a lock of the C or C++ library, so that none of these locks stays held. OFF:
# kills take effect at once, and 200 lines that depend on the processor and the C library are not built; but a process in
# which a thread was killed inside malloc or printf deadlocks.
option(ZANBASE_KILL_SAFETY "Delay a kill while the thread may hold a lock of the C or C++ library" ON)
if(ZANBASE_KILL_SAFETY)
    list(APPEND ZANBASE_PLATFORM_SOURCES thread_kill_safety.cpp)
    add_compile_definitions(ZANBASE_KILL_SAFETY)
endif()

# For the pthread_cleanup_push of C; see there.
set_source_files_properties(platform/linux/thread_exit.cpp PROPERTIES COMPILE_OPTIONS -fno-exceptions)

# The library calls its own functions directly: no caller may replace one, and a call through the PLT costs more.
set(ZANBASE_PLATFORM_COMPILE_OPTIONS -fno-semantic-interposition -fno-plt)

set(ZANBASE_PLATFORM_LINK_DEPENDS ${CMAKE_CURRENT_LIST_DIR}/hidden.map)
set(ZANBASE_PLATFORM_LINK_OPTIONS
    -Wl,-z,nodelete           # signal handlers and TLS destructors must stay mapped after a dlclose
    -Wl,-z,now                # no symbol is resolved later, inside a signal handler or with a lock held
    -Wl,-Bsymbolic-functions  # calls between exported functions stay inside the library, too
    -Wl,--version-script=${ZANBASE_PLATFORM_LINK_DEPENDS})  # hides templates of other libraries; see there
