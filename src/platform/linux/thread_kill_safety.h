// Whether a thread that a signal interrupted is in the middle of something that the C library must finish.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_KILL_SAFETY_H
#define ZANBASE_PLATFORM_LINUX_THREAD_KILL_SAFETY_H

struct HNativeThread;

// Finds where the code of the C library, the loader and the allocator lies; to be called before the first
// thread is made, not under the block lock.
void FindLibraryCode() noexcept;

// Called by a signal handler on the thread of `block` with the handler's third argument: true if the thread
// may hold a lock of the library and should be asked again a little later. Never true for ever.
bool MayHoldLibraryLock(HNativeThread* block, const void* context) noexcept;

#endif
