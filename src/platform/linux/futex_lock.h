// A re-entrant lock on one futex word.
//
// mnState is 0 free, 1 held, 2 held and somebody may sleep:
//
//   0 -> 1   taken at once              1 -> 2   a waiter is about to sleep
//   0 -> 2   taken by a waiter, who can't know whether others sleep
//   1 -> 0   given back                 2 -> 0   given back, one sleeper woken
//
// 1 -> 0 is a plain store where the system has restartable ones. A waiter breaks such stores after it has
// written 2, so no owner that saw the 1 can overwrite the 2 any more. Where it can't break them, nobody might
// wake it, so it looks again after a short sleep.
//
// As long as the process has one thread, plain loads and stores do: nobody can wait, and whoever starts a second
// thread makes all that came before visible to it.
//
// mnOwner and mnDepth are written by the owner alone. Another thread that reads mnOwner can only see that the
// owner isn't itself. An owner is known by a number that is never given to a second thread, so a lock whose
// owner was ended is not taken for its own by a thread that the system gave the same identifier.
//
// After the state has become 0 the lock is not touched again: whoever takes it next may destroy it.
//
// A thread may be ended at any instruction. From its change of mnState to its store of 0 it holds the lock,
// which then stays held, as promised. A waiter, or a thread that was about to wake one, passes the wake-up on
// (see futex.h), so it holds nobody up.
#ifndef ZANBASE_PLATFORM_LINUX_FUTEX_LOCK_H
#define ZANBASE_PLATFORM_LINUX_FUTEX_LOCK_H

#include <atomic>

template <class System>
class FutexLock {
public:
    using Thread = unsigned long long;  // never 0

    void Take(Thread self) {
        if (TakeAgain(self)) return;
        if (!TakeFree()) TakeSlowly();
        mnOwner.store(self, std::memory_order_relaxed);
    }

    // The same after a sleep on a condition. The thread that has woken this one mostly holds the lock still;
    // on the same processor it can't go on as long as this one spins.
    void TakeAfterSleep(Thread self) {
        if (TakeAgain(self)) return;
        if (!TakeFree()) AwaitFree();
        mnOwner.store(self, std::memory_order_relaxed);
    }

    bool TryTake(Thread self) {
        if (TakeAgain(self)) return true;
        if (!TakeFree()) return false;
        mnOwner.store(self, std::memory_order_relaxed);
        return true;
    }

    void Give() {
        if (mnDepth != 0) {
            --mnDepth;
            return;
        }
        mnOwner.store(0, std::memory_order_relaxed);
        if (System::IsAlone()) {
            System::StoreAlone(mnState, 0);
        } else if (!System::StoreIfStill(mnState, 1, 0)) {
            GiveSlowly();
        }
    }

private:
    bool TakeAgain(Thread self) {
        if (mnOwner.load(std::memory_order_relaxed) != self) return false;
        ++mnDepth;
        return true;
    }

    bool TakeFree() {
        unsigned int expected = 0;
        if (System::IsAlone()) {
            if (mnState.load(std::memory_order_relaxed) != 0) return false;
            System::StoreAlone(mnState, 1);
            return true;
        }
        return mnState.compare_exchange_strong(expected, 1, std::memory_order_acquire,
                                               std::memory_order_relaxed);
    }

    __attribute__((noinline)) void TakeSlowly() {
        const auto attempt = [this] { return mnState.load(std::memory_order_relaxed) == 0 && TakeFree(); };
        if (!System::Spin(attempt)) AwaitFree();
    }

    void AwaitFree() {
        const typename System::PendingWakeup debt(mnState);
        while (mnState.exchange(2, std::memory_order_acquire) != 0) {
            if (System::BreakStores()) {
                System::SleepWhile(mnState, 2, nullptr);
            } else {
                System::SleepShortly(mnState, 2);
            }
        }
    }

    __attribute__((noinline)) void GiveSlowly() {
        const typename System::PendingWakeup debt(mnState);
        if (mnState.exchange(0, std::memory_order_release) == 2) System::WakeSleepers(mnState, 1);
    }

    typename System::Word mnState{0};
    unsigned int mnDepth = 0;           // levels held beyond the first
    typename System::Owner mnOwner{0};  // 0: nobody
};

#endif
