// A re-entrant lock on one word, which names the owner.
//
// mnState is 0: free; n: held by thread n; n + 1: held by thread n, and threads may sleep on it. Numbers of
// threads are even.
//
//   0 -> n       Acquire, TryAcquire                        n -> n + 1   a waiter is about to sleep
//   0 -> n + 1   Acquire by a waiter: others may still sleep
//   n -> 0       Release                                    n + 1 -> 0   Release, which then wakes one sleeper
//
// A waiter does not spin. The owner that wakes a sleeper may acquire the lock again before the sleeper runs.
// Under contention one thread therefore runs many short critical sections in a row, and the lock's cache line
// stays with its processor. Spinning was measured and is slower: it moves the line and the lock at every
// release.
//
// The frequent path begins with its compare-and-exchange: it neither reads the word first nor stores the owner
// beside it. A locked instruction waits for both; either would cost 2 of the 14 ns of a pair.
//
// Memory order (held by MemoryModel.LockNeedsItsOrders). An acquisition is an acquire read of the 0 that a
// Release stored with release order: Release happens-before the next acquisition. mnState needs no further
// order: the kernel compares the word and queues the sleeper in one atomic step, so a waiter reads the 0 or is
// woken.
//   A thread stores its own number only when it acquires the lock, and removes it when it releases it. So a
// thread that reads its own number owns the lock.
//   mnDepth is plain: the owner alone reads and writes it.
//   In a process with one thread relaxed loads and stores suffice; starting a second thread publishes them.
//
// The kernel compares the lower half of the word only. If that has the bit of the sleepers, the Release of any
// owner will wake one.
//
// A thread's number is never given to a second thread (lock_owner.h). The system reuses its thread
// identifiers, so the lock of a killed owner would seem to belong to a later thread.
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
    using Thread = unsigned long long;  // even, never 0

    void Acquire(Thread self) {
        if (!TryAcquire(self)) AcquireContended(self);
    }

    bool TryAcquire(Thread self) {
        Thread seen = 0;
        if (System::IsAlone()) {
            seen = mnState.load(std::memory_order_relaxed);
            if (seen == 0) mnState.store(self, std::memory_order_relaxed);
        } else {
            mnState.compare_exchange_strong(seen, self, std::memory_order_acquire, std::memory_order_relaxed);
        }
        if (seen == 0) return true;
        if ((seen & ~kSleepers) != self) return false;
        ++mnDepth;
        return true;
    }

    bool IsOwnedBy(Thread self) const {
        return (mnState.load(std::memory_order_relaxed) & ~kSleepers) == self;
    }

    // Gives back one level. Requires: the calling thread owns the lock.
    void Release(Thread self) {
        if (mnDepth != 0) {
            --mnDepth;
            return;
        }
        Thread expected = self;
        if (System::IsAlone()) {
            mnState.store(0, std::memory_order_relaxed);
        } else if (!mnState.compare_exchange_strong(expected, 0, std::memory_order_release,
                                                    std::memory_order_relaxed)) {
            ReleaseAndWake();
        }
    }

private:
    static constexpr Thread kSleepers = 1;

    __attribute__((noinline)) void AcquireContended(Thread self) {
        const typename System::ForwardWakeupIfKilled pending(System::LowerHalf(mnState));
        Thread seen = 0;  // a woken waiter expects a free lock; a compare-and-exchange that fails corrects it
        for (;;) {
            const Thread desired = (seen == 0 ? self : seen) | kSleepers;
            if (seen != desired && !mnState.compare_exchange_strong(seen, desired, std::memory_order_acquire,
                                                                    std::memory_order_relaxed))
                continue;
            if (seen == 0) return;
            System::SleepWhile(System::LowerHalf(mnState), static_cast<unsigned int>(desired), nullptr);
            seen = 0;
        }
    }

    // The sleepers' bit is set and stays so: only the owner changes the word from there.
    __attribute__((noinline)) void ReleaseAndWake() {
        const typename System::ForwardWakeupIfKilled pending(System::LowerHalf(mnState));
        mnState.store(0, std::memory_order_release);
        System::WakeSleepers(System::LowerHalf(mnState), 1);
    }

    typename System::DoubleWord mnState{0};
    unsigned int mnDepth = 0;  // levels held beyond the first
};

#endif
