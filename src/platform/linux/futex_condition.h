// A condition on one futex word.
//
// mnSequence counts wake-ups in steps of 2; bit 0 says that threads may sleep.
//
//   even -> odd (+1)   Wait: a waiter announces itself    odd -> odd (+2)    Signal wakes one sleeper
//                                                         odd -> even (+1)   Broadcast wakes all sleepers
//
// A waiter notes the word while it holds its lock, and sleeps only as long as the word is unchanged. So no
// wake-up between its release of the lock and its sleep is lost. While the word is even, Signal and Broadcast
// return after one load.
//
// Memory order (held by MemoryModel.ConditionNeedsTheOrdersOfItsLock). All accesses are relaxed: the lock orders
// the data that the caller waits for. Two pairs of accesses have to be ordered, and other means do it:
//   A waiter's fetch_or happens before its release of the lock. A thread that has acquired the lock since
// therefore reads the bit, or a value that followed it, when it signals. A thread that signals without the
// lock after releasing it is covered as well: its acquisition happened after the waiter's release.
//   The change of the word and the sleep: the kernel compares the word and queues the sleeper in one step
// against a wake-up, so the sleeper reads the change or is woken.
//
// A thread may be killed at any instruction. A killed waiter that was woken forwards the wake-up (futex.h).
// One that was killed asleep leaves the bit set; the next Signal finds no sleeper and clears it.
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_CONDITION_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_CONDITION_H

#include <atomic>

template <class System>
class FutexCondition {
public:
    // Sleeps once; false if the deadline has passed. `lock` has Acquire() and Release(); the caller holds it.
    // A woken waiter does not touch the condition any more.
    template <class Lock>
    bool Wait(const Lock& lock, typename System::Deadline deadline) {
        const unsigned int seen = mnSequence.fetch_or(kSleepers, std::memory_order_relaxed) | kSleepers;
        lock.Release();
        const typename System::ForwardSignalIfKilled pending(mnSequence, seen);
        const bool woken = System::SleepWhile(mnSequence, seen, deadline);
        lock.Acquire();
        return woken;
    }

    void Signal() {
        if ((mnSequence.load(std::memory_order_relaxed) & kSleepers) == 0) return;
        const typename System::ForwardWakeupIfKilled pending(mnSequence);
        mnSequence.fetch_add(2, std::memory_order_relaxed);
        if (System::WakeSleepers(mnSequence, 1) == 0) WakeAll();
    }

    void Broadcast() {
        if ((mnSequence.load(std::memory_order_relaxed) & kSleepers) == 0) return;
        const typename System::ForwardWakeupIfKilled pending(mnSequence);
        WakeAll();
    }

private:
    static constexpr unsigned int kSleepers = 1;

    // Clears the bit before it wakes, so that no thread sleeps on a word without it.
    void WakeAll() {
        unsigned int seen = mnSequence.load(std::memory_order_relaxed);
        while ((seen & kSleepers) != 0) {
            if (mnSequence.compare_exchange_strong(seen, seen + 1, std::memory_order_relaxed)) {
                System::WakeSleepers(mnSequence, System::kEverySleeper);
                return;
            }
        }
    }

    typename System::Word mnSequence{0};
};

#endif
