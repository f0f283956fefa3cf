// Handlers around fork().
//
// After its handlers, fork() acquires the lock of the C library's list of streams. Two orders would deadlock:
// - Our locks first, then a wait for the list: fflush(nullptr) owns the list while it waits for a stream, whose
//   owner may wait for one of our locks.
// - The list first, then a wait for our locks: a thread that owns one of them may open a file, which waits for
//   the list.
// So the list is acquired first and our locks are only tried. fork() then acquires the list once more; its lock
// is re-entrant.
#include "platform/fork.h"

#include <pthread.h>

// Exported by glibc and declared in no header. Weak: a C library without them must still load this one. A fork
// then acquires the locks alone.
extern "C" {
[[gnu::weak]] void _IO_list_lock();
[[gnu::weak]] void _IO_list_unlock();
[[gnu::weak]] void _IO_list_resetlock();
}

namespace {

bool (*gpfnTryAcquire)();
void (*gpfnAcquire)();
void (*gpfnRelease)();

bool HasStreamList() {
    return _IO_list_lock != nullptr && _IO_list_unlock != nullptr && _IO_list_resetlock != nullptr;
}

void BeforeFork() {
    for (;;) {
        if (HasStreamList()) _IO_list_lock();
        if (gpfnTryAcquire()) return;
        if (HasStreamList()) _IO_list_unlock();
        gpfnAcquire();  // only waits until the locks are free
        gpfnRelease();
    }
}

void InParent() {
    gpfnRelease();
    if (HasStreamList()) _IO_list_unlock();
}

// fork() resets the list in the child of a process with threads, so there it is not owned any more.
void InChild() {
    gpfnRelease();
    if (HasStreamList()) _IO_list_resetlock();
}

}  // namespace

// If the registration fails for lack of memory, fork() acquires no locks.
void HoldAroundFork(bool (*try_acquire)(), void (*acquire)(), void (*release)()) noexcept {
    gpfnTryAcquire = try_acquire;
    gpfnAcquire = acquire;
    gpfnRelease = release;
    pthread_atfork(BeforeFork, InParent, InChild);
}
