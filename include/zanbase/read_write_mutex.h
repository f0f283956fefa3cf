/// @file
/// Locks for many readers or one writer, in two kinds that differ in which of them they prefer, and their
/// scoped holders.
#ifndef ZANBASE_READ_WRITE_MUTEX_H
#define ZANBASE_READ_WRITE_MUTEX_H

#include <atomic>
#include <cstddef>
#include <map>

#include "zanbase/export.h"
#include "zanbase/mutex.h"
#include "zanbase/semaphore.h"

/// @addtogroup locks
/// @{

/// @cond
// The bytes of the members of `HReadPrefMutex` and `HWritePrefMutex`, as the library has them.
constexpr std::size_t kReadWriteMemberBytes = 120;
/// @endcond

/// A lock that many readers or one writer can hold: the interface of both kinds.
///
///     HWritePrefMutex mutex;
///     { HReaderLock lock(&mutex);  /* other threads may read too */ }
///     { HWriterLock lock(&mutex);  /* no other thread is inside */ }
///
/// A thread can nest read locks in read locks and write locks in write locks. A nested lock never waits, not
/// even behind a waiting writer. Each lock is released by the thread that acquired it, as often as it
/// acquired it.
///
/// Thread-safe: any number of threads may call any operation of one lock at the same time. A release of the
/// write lock happens-before the next acquisition of either lock; a release of a read lock happens-before the
/// next acquisition of the write lock. Which of several waiting threads wakes first is unspecified.
///
/// Misuse is not detected. A thread that holds a read lock and asks for the write lock deadlocks with itself.
/// Destroying a lock that is held or waited for has undefined behaviour, and so has destroying it while another
/// thread is still inside an unlock: that the lock could be acquired does not mean that the other thread has
/// returned. A thread killed by `HThread::Kill` holds for ever what it holds, and a unit handed to it at that
/// moment is lost: other threads may wait for ever. After `fork` the child's thread holds what the forking
/// thread held; locks of other threads stay held for ever there. If another thread waited for the write lock or
/// was inside an operation at the moment of the `fork`, the lock can't be used in the child either.
///
/// When not to use it: acquiring a read lock costs a few times what an `HMutex` costs. It pays where readers
/// stay inside for long.
class ZANBASE_API HReadWriteMutex {
public:
    HReadWriteMutex() = default;
    /// Makes a lock of its own; nothing is copied.
    HReadWriteMutex(const HReadWriteMutex&) = default;
    /// Requires: no thread holds the lock, waits for it or is inside an unlock. Not thread-safe.
    virtual ~HReadWriteMutex();

    /// Acquires one read lock; waits until the thread may read. Throws `std::bad_alloc` if there is no memory
    /// for a thread's first read lock; the lock can't be used after that. Thread-safe.
    virtual void ReadLock() const = 0;
    /// Releases one read lock. Requires: the calling thread holds one. Thread-safe.
    virtual void ReadUnlock() const = 0;
    /// Acquires one write lock; waits until no other thread is inside. Requires: the calling thread holds no
    /// read lock, or holds a write lock already. Thread-safe.
    virtual void WriteLock() const = 0;
    /// Releases one write lock; at the last one other threads may enter. Requires: the calling thread holds
    /// one. Thread-safe.
    virtual void WriteUnlock() const = 0;

    /// Changes nothing: a lock can't be transferred.
    HReadWriteMutex& operator=(const HReadWriteMutex&) = default;

protected:
    /// @cond
    // The number of read locks of each thread that has any, by the thread's number as an owner of locks.
    using ReadCounts = std::map<unsigned long long, unsigned int>;
    /// @endcond
};

/// The kind that prefers readers: while a reader is inside, a new reader enters at once, past waiting
/// writers. Readers that overlap without a gap keep a writer out for ever; `HWritePrefMutex` does not allow
/// that.
///
/// There is one exception: a reader that began to wait while a writer was inside can stay behind the next
/// waiting writer, although other readers have entered since. So a reader inside must not wait for another
/// reader to enter: the two can deadlock.
///
/// Downgrade from writing to reading without a writer in between: `WriteLock`, `ReadLock`, `WriteUnlock`, and
/// `ReadUnlock` at the end. After that `ReadLock` other readers can enter too, so call it only when writing has
/// finished. The two locks may also be released in the other order.
///
/// Thread-safe, as `HReadWriteMutex`.
class ZANBASE_API HReadPrefMutex : public HReadWriteMutex {
public:
    /// Makes a free lock; see `HMutex` and `HSemaphore` for exhausted memory.
    HReadPrefMutex();
    ~HReadPrefMutex() override;
    void ReadLock() const override;
    void ReadUnlock() const override;
    void WriteLock() const override;
    void WriteUnlock() const override;

private:
    friend struct HReadWriteSteps;

#ifdef ZANBASE_HOME_LAYOUT
    mutable unsigned int mnReaders = 0;  // read locks of all threads, nested too; guarded by moReaderMutex
    mutable unsigned int mnWriters = 0;  // depth of the write lock; guarded by moWriterMutex
    mutable ReadCounts moReaderThreads;  // guarded by moReaderMutex
    // The writer's number as an owner of locks; the start value: none. Set under moWriterMutex, cleared under
    // both.
    mutable std::atomic<unsigned long long> mnWriterThread{0xFFFFFFFFFFFFFFFF};
    HMutex moReaderMutex;
    HMutex moWriterMutex;
    HSemaphore moResource;  // the lock proper: the readers together hold its unit, or the writer does
    HSemaphore moGate;      // acquired by a reader to enter, and by a writer until it leaves
    mutable ReadCounts::node_type
        moSpareCount;  // saves the next first reader an allocation; guarded by moReaderMutex
#else
    // The library's members. In this mode their types have another layout, so only the library accesses them.
    alignas(8) unsigned char maMembers[kReadWriteMemberBytes];

public:
    HReadPrefMutex(const HReadPrefMutex&) = delete;
    HReadPrefMutex& operator=(const HReadPrefMutex&) = delete;
#endif
};

/// The kind that prefers writers: while a writer waits, only threads that are reading already can acquire
/// another read lock. The writer enters when the readers have left. Writers that overlap without a gap keep
/// readers out for ever.
///
/// A thread that holds the write lock and asks for a read lock deadlocks with itself; `HReadPrefMutex` allows
/// it. Thread-safe, as `HReadWriteMutex`.
class ZANBASE_API HWritePrefMutex : public HReadWriteMutex {
public:
    /// Makes a free lock; see `HMutex` and `HSemaphore` for exhausted memory.
    HWritePrefMutex();
    ~HWritePrefMutex() override;
    void ReadLock() const override;
    void ReadUnlock() const override;
    void WriteLock() const override;
    void WriteUnlock() const override;

private:
    friend struct HReadWriteSteps;

#ifdef ZANBASE_HOME_LAYOUT
    // As in HReadPrefMutex, but mnWriterThread is set and cleared under moWriterMutex.
    mutable unsigned int mnReaders = 0;
    mutable unsigned int mnWriters = 0;
    mutable ReadCounts moReaderThreads;
    mutable std::atomic<unsigned long long> mnWriterThread{0xFFFFFFFFFFFFFFFF};
    HMutex moReaderMutex;
    HMutex moWriterMutex;
    HSemaphore moGate;  // first here, and second above: both layouts are part of the binary interface
    HSemaphore moResource;
    mutable ReadCounts::node_type moSpareCount;
#else
    // The library's members. In this mode their types have another layout, so only the library accesses them.
    alignas(8) unsigned char maMembers[kReadWriteMemberBytes];

public:
    HWritePrefMutex(const HWritePrefMutex&) = delete;
    HWritePrefMutex& operator=(const HWritePrefMutex&) = delete;
#endif
};

/// Holds one read lock of an `HReadWriteMutex` for a scope, or nothing.
///
/// Not thread-safe: an object belongs to the thread that made it, and must be released on that thread. It
/// can't be made with `new`. A copy on the same thread is a nested read lock and never waits. There is no
/// form with a test or a timeout.
class ZANBASE_API HReaderLock {
public:
    /// Acquires a read lock of `mutex`; with null holds nothing. Requires: `mutex` outlives the hold.
    HReaderLock(const HReadWriteMutex* mutex);

    /// Acquires one more read lock of the mutex that `other` holds one of, if any. Each releases its own.
    HReaderLock(const HReaderLock& other);

    /// Does what `Release` does.
    virtual ~HReaderLock();

    /// Releases what this object holds, then acquires a read lock of the mutex that `other` held one of at
    /// the start of the call. An object assigned to itself releases for a moment, and a writer can enter.
    HReaderLock& operator=(const HReaderLock& other);

    /// Releases the read lock; does nothing if the object holds none.
    void Release();

    /// Releases what this object holds, then acquires a read lock of `mutex` if it is not null.
    void Reset(const HReadWriteMutex* mutex);

private:
    static void* operator new(std::size_t) noexcept { return nullptr; }
    static void* operator new[](std::size_t) noexcept { return nullptr; }

    const HReadWriteMutex* mpoMutex;  // not owned; null while nothing is held
};

/// Holds one write lock of an `HReadWriteMutex` for a scope, or nothing. Not thread-safe, as `HReaderLock`. A
/// copy on the same thread is a nested write lock. Requires: the thread holds no read lock of the mutex.
class ZANBASE_API HWriterLock {
public:
    /// Acquires a write lock of `mutex`; with null holds nothing. Requires: `mutex` outlives the hold.
    HWriterLock(const HReadWriteMutex* mutex);

    /// Acquires one more write lock of the mutex that `other` holds one of, if any. Each releases its own.
    HWriterLock(const HWriterLock& other);

    /// Does what `Release` does.
    virtual ~HWriterLock();

    /// Releases what this object holds, then acquires a write lock of the mutex that `other` held one of at
    /// the start of the call. An object assigned to itself releases for a moment, and other threads can
    /// enter.
    HWriterLock& operator=(const HWriterLock& other);

    /// Releases the write lock; does nothing if the object holds none.
    void Release();

    /// Releases what this object holds, then acquires a write lock of `mutex` if it is not null.
    void Reset(const HReadWriteMutex* mutex);

private:
    static void* operator new(std::size_t) noexcept { return nullptr; }
    static void* operator new[](std::size_t) noexcept { return nullptr; }

    const HReadWriteMutex* mpoMutex;  // not owned; null while nothing is held
};

/// @}

#endif
