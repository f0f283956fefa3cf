// A re-entrant lock on one futex word.
//
// mnState is 0: free, 1: held, 2: held, and threads may sleep on it.
//
//   0 -> 1   Acquire, TryAcquire                  1 -> 2   a waiter is about to sleep
//   0 -> 2   Acquire by a waiter: others may still sleep
//   1 -> 0   Release                              2 -> 0   Release, which then wakes one sleeper
//
// A waiter does not spin. The owner that wakes a sleeper may acquire the lock again before the sleeper runs.
// Under contention one thread therefore runs many short critical sections in a row, and the lock's cache line
// stays with its processor. Spinning was measured and is slower: it moves the line and the lock at every
// release.
//
// Memory order. An acquisition is an acquire load of the 0 that a Release stored with release order: Release
// happens-before the next acquisition. mnState needs no further order: the kernel compares the word and queues
// the sleeper in one atomic step, so a waiter reads the 0 or is woken.
//   mnOwner is relaxed. A thread stores its own number after it has acquired the lock, and clears it before it
// releases it. So a thread that reads its own number owns the lock; all other values mean that it does not.
//   mnDepth is plain: the owner alone reads and writes it.
//   In a process with one thread relaxed loads and stores suffice; starting a second thread publishes them.
//
// An owner is identified by a number that is never given to a second thread (system_lock.h). The system reuses
// its thread identifiers, so the lock of a killed owner would seem to belong to a later thread.
//
// Release does not touch the lock after its store of 0: the next owner may destroy it. The wake-up passes the
// address alone to the kernel.
//
// A thread may be killed at any instruction. If it is killed between its change of mnState and its store of 0,
// the lock stays held. A waiter, and an owner that is about to wake one, notes a pending wake-up (futex.h).
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_LOCK_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_LOCK_H

#include <atomic>

template <class System>
class FutexLock {
public:
    using Thread = unsigned long long;  // never 0

    void Acquire(Thread self) {
        if (!TryAcquire(self)) AcquireContended(self);
    }

    bool TryAcquire(Thread self) {
        if (TryAcquireAgain(self)) return true;
        if (!TryAcquireFree()) return false;
        mnOwner.store(self, std::memory_order_relaxed);
        return true;
    }

    bool IsOwnedBy(Thread self) const { return mnOwner.load(std::memory_order_relaxed) == self; }

    // Gives back one level. Requires: the calling thread owns the lock.
    void Release() {
        if (mnDepth != 0) {
            --mnDepth;
            return;
        }
        mnOwner.store(0, std::memory_order_relaxed);
        unsigned int expected = 1;
        if (System::IsAlone()) {
            mnState.store(0, std::memory_order_relaxed);
        } else if (!mnState.compare_exchange_strong(expected, 0, std::memory_order_release,
                                                    std::memory_order_relaxed)) {
            ReleaseAndWake();
        }
    }

private:
    bool TryAcquireAgain(Thread self) {
        if (!IsOwnedBy(self)) return false;
        ++mnDepth;
        return true;
    }

    bool TryAcquireFree() {
        unsigned int expected = 0;
        if (System::IsAlone()) {
            if (mnState.load(std::memory_order_relaxed) != 0) return false;
            mnState.store(1, std::memory_order_relaxed);
            return true;
        }
        return mnState.compare_exchange_strong(expected, 1, std::memory_order_acquire,
                                               std::memory_order_relaxed);
    }

    __attribute__((noinline)) void AcquireContended(Thread self) {
        const typename System::PendingWakeup pending(mnState);
        while (mnState.exchange(2, std::memory_order_acquire) != 0) System::SleepWhile(mnState, 2, nullptr);
        mnOwner.store(self, std::memory_order_relaxed);
    }

    // The state is 2 and stays so: only the owner changes it from there.
    __attribute__((noinline)) void ReleaseAndWake() {
        const typename System::PendingWakeup pending(mnState);
        mnState.store(0, std::memory_order_release);
        System::WakeSleepers(mnState, 1);
    }

    typename System::Word mnState{0};
    unsigned int mnDepth = 0;           // levels held beyond the first
    typename System::Owner mnOwner{0};  // 0: no thread
};

#endif
