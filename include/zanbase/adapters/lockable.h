/// @file
/// The library's locks for the holders of the C++ standard library, annotated for clang's analysis.
///
/// Operations have the names and the case that the standard asks for, so std::unique_lock, std::scoped_lock,
/// std::shared_lock and std::condition_variable_any take these locks. clang's `-Wthread-safety` sees no lock in the
/// holders of a standard library without annotations (GNU's has none); it follows `HLockGuard` and `HSharedLockGuard`
/// below, which can also be released early and wait on a condition:
///
///     HLockable mutex;
///     std::condition_variable_any filled;
///     std::deque<int> jobs ZANBASE_GUARDED_BY(mutex);
///
///     int Take() {
///         HLockGuard guard(mutex);
///         while (jobs.empty()) filled.wait(guard);
///         const int job = jobs.front();
///         jobs.pop_front();
///         return job;
///     }
///     void Put(int job) {
///         HLockGuard guard(mutex);
///         jobs.push_back(job);
///         guard.unlock();
///         filled.notify_one();
///     }
///
/// A wait with a predicate needs the lock named at it: `[]() ZANBASE_REQUIRES(mutex) { return !jobs.empty(); }`.
/// `HCondVar` waits too, without an allocation: `condition.Wait(mutex.GetMutex())`.
///
/// The program examples/adapters/lockable.cpp shows all of them. What a lock promises about fairness,
/// re-entrance and killed threads is documented at `HMutex` and `HReadWriteMutex`. Locks can't be copied or moved.
#ifndef ZANBASE_ADAPTERS_LOCKABLE_H
#define ZANBASE_ADAPTERS_LOCKABLE_H

#include <mutex>

#include "zanbase/export.h"
#include "zanbase/mutex.h"
#include "zanbase/read_write_mutex.h"
#include "zanbase/thread_annotations.h"

/// @addtogroup adapters
/// @{

/// Whether the calling thread holds a lock: what the assertions below ask. Thread-safe.
struct HLockOwner {
    /// True if the calling thread owns `mutex`.
    [[nodiscard]] ZANBASE_API static bool Owns(const HMutex& mutex);
    /// True if the calling thread holds the write lock.
    [[nodiscard]] ZANBASE_API static bool Writes(const HReadPrefMutex& mutex);
    /// @copydoc Writes
    [[nodiscard]] ZANBASE_API static bool Writes(const HWritePrefMutex& mutex);
    /// True if the calling thread holds a read lock.
    [[nodiscard]] ZANBASE_API static bool Reads(const HReadPrefMutex& mutex);
    /// @copydoc Reads
    [[nodiscard]] ZANBASE_API static bool Reads(const HWritePrefMutex& mutex);
    /// Ends the process with a message unless `is_held`.
    ZANBASE_API static void Require(bool is_held);
};

/// An `HMutex` as a lockable of the standard. It is re-entrant for its owner; a wait on a condition variable
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

    /// Ends the process with a message if the calling thread does not own the lock. clang's analysis takes the lock for
    /// held from here on: for functions that only callers with the lock can reach.
    void AssertHeld() const ZANBASE_ASSERT_CAPABILITY(this) {
        HLockOwner::Require(HLockOwner::Owns(moMutex));
    }
    /// The lock itself, so that an annotation can name the lock as one that is not held: `ZANBASE_REQUIRES(!mutex)`.
    const HLockable& operator!() const { return *this; }

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

    /// Ends the process with a message if the calling thread does not hold the lock exclusively, as
    /// `HLockable::AssertHeld`.
    void AssertHeld() const ZANBASE_ASSERT_CAPABILITY(this) {
        HLockOwner::Require(HLockOwner::Writes(moMutex));
    }
    /// The same, where shared is enough.
    void AssertSharedHeld() const ZANBASE_ASSERT_SHARED_CAPABILITY(this) {
        HLockOwner::Require(HLockOwner::Writes(moMutex) || HLockOwner::Reads(moMutex));
    }
    /// The lock itself, for annotations as those of `HLockable`.
    const HBasicSharedLockable& operator!() const { return *this; }

    /// The lock below, for `HReaderLock` and `HWriterLock`.
    [[nodiscard]] const HReadWriteMutex& GetMutex() const { return moMutex; }

private:
    Kind moMutex;
};

/// The shared lockable that prefers writers.
using HSharedLockable = HBasicSharedLockable<HWritePrefMutex>;
/// The shared lockable that prefers readers.
using HReadPrefSharedLockable = HBasicSharedLockable<HReadPrefMutex>;

/// Holds a lock exclusively for a scope, with annotations. It can be released before the end of the scope and acquired
/// again, so it is a lockable for `std::condition_variable_any`. Not thread-safe: one object belongs to one thread.
template <class Lock>
class ZANBASE_SCOPED_CAPABILITY HLockGuard {
public:
    /// Acquires `lock`, which must outlive the guard.
    [[nodiscard]] explicit HLockGuard(Lock& lock) ZANBASE_ACQUIRE(lock) : moLock(lock) { lock.lock(); }
    /// Holds a lock that the calling thread has acquired already, by `try_lock` for example.
    [[nodiscard]] HLockGuard(Lock& lock, std::adopt_lock_t) ZANBASE_REQUIRES(lock) : moLock(lock) {}
    /// Releases the lock, unless `unlock` did.
    ~HLockGuard() ZANBASE_RELEASE() {
        if (mbHolds) moLock.unlock();
    }
    HLockGuard(const HLockGuard&) = delete;
    HLockGuard& operator=(const HLockGuard&) = delete;

    // The analysis knows the two below by their annotations and not what a guard's member refers to.

    /// Releases the lock before the end of the scope. Requires: the guard holds it.
    void unlock() ZANBASE_RELEASE() ZANBASE_NO_THREAD_SAFETY_ANALYSIS {
        mbHolds = false;
        moLock.unlock();
    }
    /// Acquires the lock again. Requires: the guard does not hold it.
    void lock() ZANBASE_ACQUIRE() ZANBASE_NO_THREAD_SAFETY_ANALYSIS {
        moLock.lock();
        mbHolds = true;
    }

private:
    Lock& moLock;
    bool mbHolds = true;
};

/// Holds a lock shared for a scope, with annotations; otherwise as `HLockGuard`. Not thread-safe: one object belongs to
/// one thread.
template <class Lock>
class ZANBASE_SCOPED_CAPABILITY HSharedLockGuard {
public:
    /// Acquires `lock` shared; it must outlive the guard.
    [[nodiscard]] explicit HSharedLockGuard(Lock& lock) ZANBASE_ACQUIRE_SHARED(lock) : moLock(lock) {
        lock.lock_shared();
    }
    /// Releases the lock, unless `unlock` did.
    ~HSharedLockGuard() ZANBASE_RELEASE_GENERIC() {
        if (mbHolds) moLock.unlock_shared();
    }
    HSharedLockGuard(const HSharedLockGuard&) = delete;
    HSharedLockGuard& operator=(const HSharedLockGuard&) = delete;

    /// Releases the lock before the end of the scope. Requires: the guard holds it.
    void unlock() ZANBASE_RELEASE_GENERIC() ZANBASE_NO_THREAD_SAFETY_ANALYSIS {  // as in HLockGuard
        mbHolds = false;
        moLock.unlock_shared();
    }
    /// Acquires the lock shared again. Requires: the guard does not hold it.
    void lock() ZANBASE_ACQUIRE_SHARED() ZANBASE_NO_THREAD_SAFETY_ANALYSIS {
        moLock.lock_shared();
        mbHolds = true;
    }

private:
    Lock& moLock;
    bool mbHolds = true;
};

/// @}

#endif
