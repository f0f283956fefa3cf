// Handlers around fork().
//
// After its handlers, fork() waits for the C library's list of streams. fflush(nullptr) owns that list while
// it waits for a stream, and the owner of a stream may wait for one of our locks: so we must not own a lock
// and wait for the list. A thread with one of our locks may open a file, which waits for the list: so we must
// not own the list and wait for a lock. Hence the list is acquired first and the locks are only tried; fork()
// then acquires the list once more, which is re-entrant.
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

// A registration that fails for lack of memory leaves fork() as it is without it.
void HoldAroundFork(bool (*try_acquire)(), void (*acquire)(), void (*release)()) noexcept {
    gpfnTryAcquire = try_acquire;
    gpfnAcquire = acquire;
    gpfnRelease = release;
    pthread_atfork(BeforeFork, InParent, InChild);
}
