// The lock of the recorder's tables. It is constant-initialised, never destroyed, can be reset in a forked
// child, and costs no atomic operation while the process has one thread.
#ifndef ZANBASE_RECORD_SPIN_LOCK_H
#define ZANBASE_RECORD_SPIN_LOCK_H

#include <atomic>

#include <sys/single_threaded.h>

namespace recorder {

class SpinLock {
public:
    void Acquire() {
        if (__libc_single_threaded != 0) {
            mbHeld.store(true, std::memory_order_relaxed);
        } else if (mbHeld.exchange(true, std::memory_order_acquire)) {
            AcquireSlowly();
        }
    }
    void Release() {
        mbHeld.store(false, std::memory_order_release);
    }  // pairs with the exchanges that acquire

private:
    void AcquireSlowly();

    std::atomic<bool> mbHeld{false};
};

class SpinLockScope {
public:
    explicit SpinLockScope(SpinLock& lock) : moLock(lock) { moLock.Acquire(); }
    ~SpinLockScope() { moLock.Release(); }
    SpinLockScope(const SpinLockScope&) = delete;
    SpinLockScope& operator=(const SpinLockScope&) = delete;

private:
    SpinLock& moLock;
};

// Adds to a counter that other threads add to; returns the new value.
template <class Number>
Number AddTo(std::atomic<Number>& counter, Number amount) {
    if (__libc_single_threaded == 0) return counter.fetch_add(amount, std::memory_order_relaxed) + amount;
    const Number sum = counter.load(std::memory_order_relaxed) + amount;
    counter.store(sum, std::memory_order_relaxed);
    return sum;
}

}  // namespace recorder

#endif
