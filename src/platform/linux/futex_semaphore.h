// A counting semaphore on one futex word.
//
// mnUnits is the number of free units; its highest bit says that threads may sleep.
//
//   n -> n + 1         Release                     bit + n -> n + 1   Release, which then wakes one sleeper
//   n -> n - 1         TryAcquire; the bit stays   0 -> bit           a waiter is about to sleep
//   n -> bit + n - 1   Acquire by a waiter: others may still sleep. It does the same if the bit is set.
//
// Release clears the bit and wakes one sleeper. That one sets the bit again, when it acquires a unit or before
// it sleeps again. So if sleepers exist and the bit is clear, a woken waiter is about to set it. More units may
// have been released meanwhile without a wake-up: a woken waiter that leaves units wakes the next sleeper.
//
// Memory order (held by MemoryModel.SemaphoreNeedsItsOrders). Every change is a compare-and-exchange with acq_rel. The release half publishes what the thread
// did before Release; the acquire half of a later change makes it visible. All changes are read-modify-writes,
// so each of them continues the release sequence of all earlier ones: every Release happens-before each later
// acquisition. Loads are relaxed: they only choose the value that the next change expects, and a failed change
// reads again.
//
// Release does not touch the semaphore after its change: the thread that acquires the unit may destroy it.
//
// A thread may be killed at any instruction. Before its change of mnUnits it has acquired and released
// nothing; a wake-up that it received or was about to send is forwarded (futex.h).
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_SEMAPHORE_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_SEMAPHORE_H

#include <atomic>

template <class System>
class FutexSemaphore {
public:
    static constexpr unsigned int kMost = 0x7fffffff;

    explicit FutexSemaphore(unsigned int count) : mnUnits(count) {}

    bool TryAcquire() {
        unsigned int seen = mnUnits.load(std::memory_order_relaxed);
        while ((seen & kMost) != 0)
            if (Change(seen, seen - 1)) return true;
        return false;
    }

    // False if there was no unit until the deadline. Does not spin: a unit may be long in coming.
    bool Acquire(typename System::Deadline deadline) { return TryAcquire() || AcquireContended(deadline); }

    // No effect at kMost free units.
    void Release() {
        unsigned int seen = mnUnits.load(std::memory_order_relaxed);
        while ((seen & kSleepers) == 0) {
            if (seen == kMost || Change(seen, seen + 1)) return;
        }
        ReleaseAndWake();
    }

private:
    static constexpr unsigned int kSleepers = ~kMost;

    __attribute__((noinline)) bool AcquireContended(typename System::Deadline deadline) {
        const typename System::ForwardWakeupIfKilled pending(mnUnits);
        unsigned int seen = mnUnits.load(std::memory_order_relaxed);
        for (;;) {
            if ((seen & kMost) != 0) {
                if (!Change(seen, (seen - 1) | kSleepers)) continue;
                if ((seen & kMost) > 1) System::WakeSleepers(mnUnits, 1);
                return true;
            }
            if (seen == 0 && !Change(seen, kSleepers)) continue;
            if (!System::SleepWhile(mnUnits, kSleepers, deadline)) return false;
            seen = mnUnits.load(std::memory_order_relaxed);
        }
    }

    __attribute__((noinline)) void ReleaseAndWake() {
        const typename System::ForwardWakeupIfKilled pending(mnUnits);
        unsigned int seen = mnUnits.load(std::memory_order_relaxed);
        do {
            if ((seen & kMost) == kMost) return;
        } while (!Change(seen, (seen & kMost) + 1));
        if ((seen & kSleepers) != 0) System::WakeSleepers(mnUnits, 1);
    }

    // On failure `seen` becomes the value that was there.
    bool Change(unsigned int& seen, unsigned int desired) {
        return mnUnits.compare_exchange_strong(seen, desired, std::memory_order_acq_rel,
                                               std::memory_order_relaxed);
    }

    typename System::Word mnUnits;
};

#endif
