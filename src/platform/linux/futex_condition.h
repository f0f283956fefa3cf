// A condition on one futex word.
//
// mnSequence is a count of the wake-ups, with its lowest bit set if somebody may sleep:
//
//   even -> odd (+1)   a waiter announces itself     odd -> odd (+2)    one sleeper woken
//                                                    odd -> even (+1)   all sleepers woken
//
// A waiter notes the word while it still holds its lock, and sleeps only as long as the word is the same, so
// a wake-up after that is not lost. While the word is even a wake-up costs a look and no more.
//
// A thread may be ended at any instruction. A waiter that was woken and ended passes the wake-up on (see
// futex.h); a waiter that was ended asleep leaves the bit set, which the next wake-up clears when it finds
// nobody. So the condition stays whole.
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_CONDITION_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_CONDITION_H

#include <atomic>

template <class System>
class FutexCondition {
public:
    // False if the deadline has passed. `lock` has Give() and Take(). A woken waiter no longer touches the
    // condition.
    template <class Lock>
    bool Sleep(const Lock& lock, typename System::Deadline deadline) {
        const unsigned int seen = mnSequence.fetch_or(1, std::memory_order_relaxed) | 1;
        lock.Give();
        const typename System::PendingSignal debt(mnSequence, seen);
        const bool woken = System::SleepWhile(mnSequence, seen, deadline);
        lock.Take();
        return woken;
    }

    void Signal() {
        if ((mnSequence.load(std::memory_order_relaxed) & 1) == 0) return;
        const typename System::PendingWakeup debt(mnSequence);
        mnSequence.fetch_add(2, std::memory_order_relaxed);
        if (System::WakeSleepers(mnSequence, 1) == 0) WakeEverybody();
    }

    void Broadcast() {
        if ((mnSequence.load(std::memory_order_relaxed) & 1) == 0) return;
        const typename System::PendingWakeup debt(mnSequence);
        WakeEverybody();
    }

private:
    // Clears the bit before it wakes, so that nobody sleeps on a word without it.
    void WakeEverybody() {
        unsigned int seen = mnSequence.load(std::memory_order_relaxed);
        while ((seen & 1) != 0) {
            if (mnSequence.compare_exchange_strong(seen, seen + 1, std::memory_order_relaxed)) {
                System::WakeSleepers(mnSequence, System::kEverySleeper);
                return;
            }
        }
    }

    typename System::Word mnSequence{0};
};

#endif
