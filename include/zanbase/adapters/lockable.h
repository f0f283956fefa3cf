/// @file
/// The library's locks for the holders of the C++ standard library, annotated for clang's analysis.
///
/// Operations have the names and the case that the standard asks for, so std::unique_lock, std::scoped_lock,
/// std::shared_lock and std::condition_variable_any take these locks:
///
///     HLockable mutex;
///     std::condition_variable_any filled;
///     std::unique_lock<HLockable> lock(mutex);
///     filled.wait(lock, [] { return !jobs.empty(); });
///
/// clang's `-Wthread-safety` checks fields that are marked with `ZANBASE_GUARDED_BY`. It sees no lock in the
/// holders of a standard library without annotations (GNU's has none); `HLockGuard` and `HSharedLockGuard`
/// below are annotated:
///
///     int count ZANBASE_GUARDED_BY(mutex) = 0;
///     void Add() {
///         const HLockGuard guard(mutex);
///         ++count;
///     }
///
/// The program examples/adapters/lockable.cpp shows all of them. What a lock promises about fairness,
/// re-entrance and killed threads is told at `HMutex` and `HReadWriteMutex`. Locks can't be copied or moved.
#ifndef ZANBASE_ADAPTERS_LOCKABLE_H
#define ZANBASE_ADAPTERS_LOCKABLE_H

#include "zanbase/mutex.h"
#include "zanbase/read_write_mutex.h"
#include "zanbase/thread_annotations.h"

/// @addtogroup adapters
/// @{

/// A `HMutex` as a lockable of the standard. It is re-entrant for its owner; a wait on a condition variable
/// releases one level only, so the waiting thread must own it exactly once. Thread-safe.
class ZANBASE_CAPABILITY("mutex") HLockable {
public:
    HLockable() = default;
    HLockable(const HLockable&) = delete;
    HLockable& operator=(const HLockable&) = delete;

    /// As `HMutex::Lock`.
    void lock() ZANBASE_ACQUIRE() { moMutex.Lock(); }
    /// As `HMutex::TryLock`.
    [[nodiscard]] bool try_lock() ZANBASE_TRY_ACQUIRE(true) { return moMutex.TryLock(); }
    /// As `HMutex::Unlock`.
    void unlock() ZANBASE_RELEASE() { moMutex.Unlock(); }

    /// The mutex below, for `HMutexLock` and `HCondVar`.
    [[nodiscard]] const HMutex& GetMutex() const { return moMutex; }

private:
    HMutex moMutex;
};

/// A read-write lock as a shared lockable of the standard. `Kind` is `HWritePrefMutex` or `HReadPrefMutex`.
/// There is no `try_lock` and no `try_lock_shared`, because the locks have no such step: so `std::scoped_lock`
/// takes it alone and not together with others. Thread-safe.
template <class Kind>
class ZANBASE_CAPABILITY("shared_mutex") HBasicSharedLockable {
public:
    HBasicSharedLockable() = default;
    HBasicSharedLockable(const HBasicSharedLockable&) = delete;
    HBasicSharedLockable& operator=(const HBasicSharedLockable&) = delete;

    /// As `HReadWriteMutex::WriteLock`.
    void lock() ZANBASE_ACQUIRE() { moMutex.WriteLock(); }
    /// As `HReadWriteMutex::WriteUnlock`.
    void unlock() ZANBASE_RELEASE() { moMutex.WriteUnlock(); }
    /// As `HReadWriteMutex::ReadLock`.
    void lock_shared() ZANBASE_ACQUIRE_SHARED() { moMutex.ReadLock(); }
    /// As `HReadWriteMutex::ReadUnlock`.
    void unlock_shared() ZANBASE_RELEASE_SHARED() { moMutex.ReadUnlock(); }

    /// The lock below, for `HReaderLock` and `HWriterLock`.
    [[nodiscard]] const HReadWriteMutex& GetMutex() const { return moMutex; }

private:
    Kind moMutex;
};

/// The shared lockable that prefers writers.
using HSharedLockable = HBasicSharedLockable<HWritePrefMutex>;
/// The shared lockable that prefers readers.
using HReadPrefSharedLockable = HBasicSharedLockable<HReadPrefMutex>;

/// Holds a lock exclusively for a scope, as `std::lock_guard` does, with annotations. Not thread-safe: one object
/// belongs to one thread.
template <class Lock>
class ZANBASE_SCOPED_CAPABILITY HLockGuard {
public:
    /// Acquires `lock`, which must outlive the guard.
    explicit HLockGuard(Lock& lock) ZANBASE_ACQUIRE(lock) : moLock(lock) { lock.lock(); }
    /// Releases the lock.
    ~HLockGuard() ZANBASE_RELEASE() { moLock.unlock(); }
    HLockGuard(const HLockGuard&) = delete;
    HLockGuard& operator=(const HLockGuard&) = delete;

private:
    Lock& moLock;
};

/// Holds a lock shared for a scope, with annotations. Not thread-safe: one object belongs to one thread.
template <class Lock>
class ZANBASE_SCOPED_CAPABILITY HSharedLockGuard {
public:
    /// Acquires `lock` shared; it must outlive the guard.
    explicit HSharedLockGuard(Lock& lock) ZANBASE_ACQUIRE_SHARED(lock) : moLock(lock) { lock.lock_shared(); }
    /// Releases the lock.
    ~HSharedLockGuard() ZANBASE_RELEASE_GENERIC() { moLock.unlock_shared(); }
    HSharedLockGuard(const HSharedLockGuard&) = delete;
    HSharedLockGuard& operator=(const HSharedLockGuard&) = delete;

private:
    Lock& moLock;
};

/// @}

#endif
