// Whether a thread may hold a lock of a runtime library at the moment it is to be killed. The runtime libraries
// are the C library, the C++ library, the loader and the allocator.
//
// The CMake option ZANBASE_KILL_SAFETY=OFF leaves this check out. Then a thread is killed at once wherever it
// is, no processor-specific code is built and the first StartThread does not search the loaded libraries; but
// a thread killed inside malloc or printf leaves their locks held, and other threads deadlock; and one killed
// while it answers a change of identity (thread_exit.h) never ends.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_KILL_SAFETY_H
#define ZANBASE_PLATFORM_LINUX_THREAD_KILL_SAFETY_H

struct HNativeThread;

#ifdef ZANBASE_KILL_SAFETY

// Finds the code of the runtime libraries at the first call. Thread-safe.
// Requires: the calling thread does not hold the block mutex, because the loader's locks are acquired.
void FindRuntimeCode() noexcept;

// True if another thread holds the lock of stdout or stderr; it may be the thread that is to be killed.
bool StandardOutputIsHeld() noexcept;

// True if the thread of `block` may hold a lock of a runtime library and should be asked again a little later.
// True for a limited time only. Async-signal-safe.
// Requires: called on that thread by a signal handler, with the handler's third argument.
bool MayHoldRuntimeLock(HNativeThread* block, const void* context) noexcept;

#else

inline void FindRuntimeCode() noexcept {}
inline bool StandardOutputIsHeld() noexcept { return false; }
inline bool MayHoldRuntimeLock(HNativeThread*, const void*) noexcept { return false; }

#endif

#endif
