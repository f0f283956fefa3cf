// A counting semaphore on one futex word.
//
// mnUnits is the count of free units, with its highest bit set if somebody may sleep:
//
//   n -> n - 1            taken            n -> n + 1             given back
//   0 -> bit              a waiter is about to sleep
//   bit + n -> n + 1      given back, one sleeper woken
//   n -> bit + n - 1      taken by a waiter, who can't know whether others sleep
//
// Whoever was woken either takes a unit or sets the bit again before it sleeps, so the bit is missing only
// while somebody is on the way who will set it. As several units may have come meanwhile, a woken thread that
// leaves units behind wakes the next.
//
// After a unit was given the semaphore is not touched again: whoever takes the unit may destroy it.
//
// A thread may be ended at any instruction. Before its change of mnUnits it has no unit and has given none;
// the wake-up that it may have swallowed, or not yet sent, is passed on (see futex.h).
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_SEMAPHORE_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_SEMAPHORE_H

#include <atomic>

template <class System>
class FutexSemaphore {
public:
    static constexpr unsigned int kMost = 0x7fffffff;

    explicit FutexSemaphore(unsigned int count) : mnUnits(count) {}

    bool TryTake() {
        unsigned int seen = mnUnits.load(std::memory_order_relaxed);
        while ((seen & kMost) != 0)
            if (Change(seen, seen - 1)) return true;
        return false;
    }

    // False if there was no unit until the deadline. Doesn't spin first: a unit may be long in coming, and a
    // giver on the same processor would come later for it.
    bool Take(typename System::Deadline deadline) {
        if (TryTake()) return true;
        const typename System::PendingWakeup debt(mnUnits);
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

    void Give() {
        const typename System::PendingWakeup debt(mnUnits);
        unsigned int seen = mnUnits.load(std::memory_order_relaxed);
        do {
            if ((seen & kMost) == kMost) return;
        } while (!Change(seen, (seen & kMost) + 1));
        if ((seen & kSleepers) != 0) System::WakeSleepers(mnUnits, 1);
    }

private:
    static constexpr unsigned int kSleepers = ~kMost;

    // Takes need the acquire half, gifts the release half.
    bool Change(unsigned int& seen, unsigned int desired) {
        return mnUnits.compare_exchange_strong(seen, desired, std::memory_order_acq_rel,
                                               std::memory_order_relaxed);
    }

    typename System::Word mnUnits;
};

#endif
