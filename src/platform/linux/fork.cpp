// Handlers around fork().
//
// After its handlers, fork() acquires the lock of the C library's list of streams. Waiting for it while owning one
// of our locks would deadlock: fflush(nullptr) owns the list while it waits for a stream, whose owner may wait for
// our lock. Waiting for one of our locks while owning the list, or another of ours, would deadlock too: its owner
// may open a file, or allocate through an operator new that records. So the list is acquired first, with nothing
// owned, and our locks are only tried; if one of them is busy, all are released before the next attempt. fork()
// then acquires the list once more; its lock is re-entrant.
//
// The mutex of the thread blocks is one of ours: its owner may be about to allocate, and the owner of a table may be
// about to start a thread.
#include "platform/fork.h"

#include <atomic>

#include <pthread.h>

#include "platform/clock.h"
#include "platform/linux/build.h"
#include "platform/linux/thread_block.h"
#include "platform/thread.h"

// Exported by glibc and declared in no header. Weak: a C library without them must still load this one. A fork
// then acquires the locks alone.
extern "C" {
[[gnu::weak]] void _IO_list_lock();
[[gnu::weak]] void _IO_list_unlock();
[[gnu::weak]] void _IO_list_resetlock();
}

namespace {

constexpr unsigned int kLimitMs = 5000;     // for a lock that is busy at every attempt
constexpr unsigned int kShortLimitMs = 10;  // for one that an earlier fork has given up

ForkLocks goLocks;
std::atomic<unsigned int> gnGivenUp{0};  // bit n: lock n was given up, and not found free since

// Bit n: this thread's fork owns lock n.
ZANBASE_FAST_THREAD_LOCAL unsigned int tnOwned = 0;

bool HasStreamList() {
    return _IO_list_lock != nullptr && _IO_list_unlock != nullptr && _IO_list_resetlock != nullptr;
}

void ReleaseTables() {
    for (unsigned int number = 0; number < goLocks.count; ++number) {
        if ((tnOwned >> number & 1) != 0) goLocks.release(number);
    }
    tnOwned = 0;
}

// How long each lock has been busy at every attempt of one fork.
class BusyLocks {
public:
    void NoteFree(unsigned int number) {
        mbBusy[number] = false;
        gnGivenUp.fetch_and(~(1U << number), std::memory_order_relaxed);
    }

    // True if the lock is to be given up.
    bool NoteBusy(unsigned int number) {
        const unsigned int now = ReadTicks();
        if (!mbBusy[number]) mnSince[number] = now;
        mbBusy[number] = true;
        const bool is_given_up = (gnGivenUp.load(std::memory_order_relaxed) >> number & 1) != 0;
        if (now - mnSince[number] < (is_given_up ? kShortLimitMs : kLimitMs)) return false;
        gnGivenUp.fetch_or(1U << number, std::memory_order_relaxed);
        return true;
    }

private:
    bool mbBusy[ForkLocks::kMost] = {};
    unsigned int mnSince[ForkLocks::kMost] = {};  // ticks
};

// Acquires the block mutex, which no thread holds for long, and all locks but those that are given up; or none.
bool TryAcquireAll(BusyLocks& busy) ZANBASE_TRY_ACQUIRE(true, goBlockMutex) {
    if (!goBlockMutex.TryAcquire()) return false;
    for (unsigned int number = 0; number < goLocks.count; ++number) {
        if (goLocks.try_acquire(number)) {
            tnOwned |= 1U << number;
            busy.NoteFree(number);
        } else if (!busy.NoteBusy(number)) {
            ReleaseTables();
            goBlockMutex.Release();
            return false;
        }
    }
    return true;
}

void BeforeFork() ZANBASE_ACQUIRE(goBlockMutex) {
    constexpr int kAttemptsAtOnce = 100;  // a table is busy for microseconds, unless a report is written
    BusyLocks busy;
    for (int attempt = 0;; ++attempt) {
        if (HasStreamList()) _IO_list_lock();
        if (TryAcquireAll(busy)) return;
        if (HasStreamList()) _IO_list_unlock();
        if (attempt < kAttemptsAtOnce) {
            YieldThread();
        } else {
            SleepFor(1);
        }
    }
}

// The block mutex last: a kill that was deferred takes effect with its release.
void InParent() ZANBASE_RELEASE(goBlockMutex) {
    ReleaseTables();
    if (HasStreamList()) _IO_list_unlock();
    goBlockMutex.Release();
}

// fork() resets the list in the child of a process with threads, so there it is not owned any more.
void InChild() ZANBASE_RELEASE(goBlockMutex) {
    ReleaseTables();
    if (HasStreamList()) _IO_list_resetlock();
    ReleaseBlocksInChild();
}

}  // namespace

// If the registration fails for lack of memory, fork() acquires no locks.
void HoldAroundFork(const ForkLocks& locks) noexcept {
    goLocks = locks;
    pthread_atfork(BeforeFork, InParent, InChild);
}
