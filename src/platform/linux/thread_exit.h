// The exit of a killed thread beside calls that change the identity of the process.
//
// setuid() and its kin signal every thread of the process and wait for all answers; meanwhile no thread can be
// made or joined. A thread that exits by the raw system call after it was signalled and before it has answered
// would block the process for ever. The C library itself first marks an exiting thread, and passes over the
// threads that are marked.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_EXIT_H
#define ZANBASE_PLATFORM_LINUX_THREAD_EXIT_H

// Loads what CallAsExiting needs, because the thread that calls that may have been stopped inside the loader or
// malloc. Thread-safe.
void PrepareThreadExit() noexcept;

// Marks the calling thread as exiting, waits until a change of identity in progress has its answer, and calls
// last(argument), which must not return. No cleanup handler or destructor runs.
// Requires: the signals of the C library are not blocked.
[[noreturn]] void CallAsExiting(void (*last)(void*), void* argument) noexcept;

#endif
