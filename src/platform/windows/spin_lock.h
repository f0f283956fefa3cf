// A lock without a queue of waiters: one of them can be killed and leaves no trace. The last thread of an ending process
// passes it, because its owner may have been ended with all others.
#ifndef ZANBASE_PLATFORM_WINDOWS_SPIN_LOCK_H
#define ZANBASE_PLATFORM_WINDOWS_SPIN_LOCK_H

#include <atomic>

#include "platform/windows/system.h"

class SpinLock {
public:
    // Pairs with Release.
    void Acquire() noexcept {
        while (mbHeld.exchange(true, std::memory_order_acquire) && !IsLastThread()) SwitchToThread();
    }
    void Release() noexcept { mbHeld.store(false, std::memory_order_release); }

private:
    std::atomic<bool> mbHeld{false};
};

class SpinLockHold {
public:
    explicit SpinLockHold(SpinLock& lock) noexcept : mpoLock(&lock) { mpoLock->Acquire(); }
    ~SpinLockHold() { mpoLock->Release(); }
    SpinLockHold(const SpinLockHold&) = delete;
    SpinLockHold& operator=(const SpinLockHold&) = delete;

private:
    SpinLock* mpoLock;
};

#endif
