// Contract: locks that are held while the process is copied.
#ifndef ZANBASE_PLATFORM_FORK_H
#define ZANBASE_PLATFORM_FORK_H

// From now on each fork() owns all locks of the caller on its thread while it copies the process, so that no
// other thread is inside what they guard; it releases them in the parent and in the child.
//
// `acquire` waits for all of them, `try_acquire` acquires all or none without waiting, `release` undoes
// either. Stdio streams may be opened and written under these locks, and threads that own a stream may wait
// for them: the back end never waits for one of them while it holds a lock of the C library, nor the other
// way round.
//
// Does nothing on a system that can't copy a process. Requires: called once, while the library is loaded.
void HoldAroundFork(bool (*try_acquire)(), void (*acquire)(), void (*release)()) noexcept;

#endif
