// A re-entrant lock on one futex word.
//
// mnState is 0 free, 1 held, 2 held and somebody may sleep:
//
//   0 -> 1   taken at once              1 -> 2   a waiter is about to sleep
//   0 -> 2   taken by a waiter, who can't know whether others sleep
//   1 -> 0   given back                 2 -> 0   given back, one sleeper woken
//
// mnOwner and mnDepth are written by the owner alone. Another thread that reads mnOwner can only see that the
// owner isn't itself. An owner is known by a number that is never given to a second thread, so a lock whose
// owner was ended is not taken for its own by a thread that the system gave the same identifier.
//
// A thread may be ended at any instruction. Between mnState and mnOwner: the lock stays held, as promised.
// Around a wake-up: see futex.h. A waiter that is ended holds nobody up.
#include "platform/lock.h"

#include <new>

#include "platform/posix/futex.h"

namespace {

struct Lock {
    FutexWord mnState{0};
    unsigned int mnDepth = 0;                    // levels held beyond the first
    std::atomic<unsigned long long> mnOwner{0};  // 0: nobody
};
static_assert(sizeof(Lock) <= sizeof(NativeLock::storage) && alignof(Lock) <= alignof(NativeLock));

Lock& Of(NativeLock* lock) noexcept { return *std::launder(reinterpret_cast<Lock*>(lock->storage)); }

constexpr int kSpins = 64;  // about the length of a short critical section

std::atomic<unsigned long long> gnLastThread{0};
ZANBASE_FAST_THREAD_LOCAL unsigned long long tnThread = 0;  // 0: no number yet

unsigned long long Self() noexcept {
    if (__builtin_expect(tnThread == 0, 0))
        tnThread = gnLastThread.fetch_add(1, std::memory_order_relaxed) + 1;
    return tnThread;
}

bool TakeFree(Lock& lock) noexcept {
    unsigned int expected = 0;
    return lock.mnState.compare_exchange_strong(expected, 1, std::memory_order_acquire,
                                                std::memory_order_relaxed);
}

__attribute__((noinline)) void TakeSlowly(Lock& lock) noexcept {
    for (int spin = 0; spin < kSpins; ++spin) {
        if (lock.mnState.load(std::memory_order_relaxed) == 0 && TakeFree(lock)) return;
        __builtin_ia32_pause();
    }
    const WakeDebt debt(lock.mnState);
    while (lock.mnState.exchange(2, std::memory_order_acquire) != 0) SleepWhile(lock.mnState, 2, nullptr);
}

void Own(Lock& lock, unsigned long long self) noexcept {
    lock.mnOwner.store(self, std::memory_order_relaxed);
    lock.mnDepth = 0;
}

}  // namespace

void OpenLock(NativeLock* lock) noexcept { new (lock->storage) Lock; }

void CloseLock(NativeLock*) noexcept {}

void TakeLock(NativeLock* native) noexcept {
    Lock& lock = Of(native);
    const unsigned long long self = Self();
    if (lock.mnOwner.load(std::memory_order_relaxed) == self) {
        ++lock.mnDepth;
        return;
    }
    if (!TakeFree(lock)) TakeSlowly(lock);
    Own(lock, self);
}

bool TryTakeLock(NativeLock* native) noexcept {
    Lock& lock = Of(native);
    const unsigned long long self = Self();
    if (lock.mnOwner.load(std::memory_order_relaxed) == self) {
        ++lock.mnDepth;
        return true;
    }
    if (!TakeFree(lock)) return false;
    Own(lock, self);
    return true;
}

void GiveLock(NativeLock* native) noexcept {
    Lock& lock = Of(native);
    if (lock.mnDepth != 0) {
        --lock.mnDepth;
        return;
    }
    lock.mnOwner.store(0, std::memory_order_relaxed);
    const WakeDebt debt(lock.mnState);
    if (lock.mnState.exchange(0, std::memory_order_release) == 2) WakeSleepers(lock.mnState, 1);
}
