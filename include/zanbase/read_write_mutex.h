/// @file
/// Locks for many readers or one writer, in two kinds that differ in who goes first, and their scoped
/// holders.
#ifndef ZANBASE_READ_WRITE_MUTEX_H
#define ZANBASE_READ_WRITE_MUTEX_H

#include <atomic>
#include <cstddef>
#include <functional>
#include <map>
#include <new>
#include <utility>

#include "zanbase/export.h"
#include "zanbase/mutex.h"
#include "zanbase/semaphore.h"

/// @addtogroup locks
/// @{

/// A lock that many readers or one writer can hold: the interface of both kinds.
///
///     HWritePrefMutex mutex;
///     { HReaderLock lock(&mutex);  /* others may read too */ }
///     { HWriterLock lock(&mutex);  /* nobody else is inside */ }
///
/// A thread may nest read locks in read locks, which never wait, not even behind a waiting writer, and write
/// locks in write locks. Each lock is given back by the thread that took it, as often as it took it; threads
/// are told apart by `HThread::GetCurrentThreadId`. Any number of threads may use one lock. Who of several
/// waiting threads wakes first is open.
///
/// Nothing detects misuse. A thread that holds a read lock must not ask for the write lock, which would wait
/// for itself. A lock has to be free when it is destroyed. A thread that is ended by `HThread::Kill` holds
/// for ever what it holds, and what it was about to get may be lost to all.
///
/// Reading under such a lock pays where readers stay inside for long: taking it costs a few times what a
/// `HMutex` costs, so short sections are better off with that.
class ZANBASE_API HReadWriteMutex {
public:
    HReadWriteMutex() = default;
    /// A lock of its own; whatever the other one is, nothing of it is taken over.
    HReadWriteMutex(const HReadWriteMutex&) = default;
    virtual ~HReadWriteMutex();

    /// Waits until the thread may read, and counts one more read lock of it. Throws `std::bad_alloc` if there
    /// is no memory for a thread's first read lock; the lock can't be used after that.
    virtual void ReadLock() const = 0;
    /// Gives one read lock back.
    virtual void ReadUnlock() const = 0;
    /// Waits until the thread alone is inside, and counts one more write lock of it.
    virtual void WriteLock() const = 0;
    /// Gives one write lock back; at the last one others may enter.
    virtual void WriteUnlock() const = 0;

    /// Changes nothing: a lock can't be handed over.
    HReadWriteMutex& operator=(const HReadWriteMutex&) = default;

protected:
    /// @cond
    // Gives a map its entries, one at a time, and keeps the last one that it got back for the next, so that a
    // lock doesn't go to the heap each time its first reader comes. Guarded like the map; copies have nothing
    // to spare, and any of them can take back what another one gave.
    template <class T>
    class EntryAllocator {
    public:
        using value_type = T;
        EntryAllocator() noexcept = default;
        EntryAllocator(const EntryAllocator&) noexcept {}
        template <class Other>
        EntryAllocator(const EntryAllocator<Other>&) noexcept {}
        ~EntryAllocator() { ::operator delete(mpoSpare); }
        EntryAllocator& operator=(const EntryAllocator&) noexcept { return *this; }

        T* allocate(std::size_t count) {
            if (mpoSpare == nullptr) return static_cast<T*>(::operator new(count * sizeof(T)));
            return static_cast<T*>(std::exchange(mpoSpare, nullptr));
        }
        void deallocate(T* entry, std::size_t) noexcept { ::operator delete(std::exchange(mpoSpare, entry)); }
        friend bool operator==(const EntryAllocator&, const EntryAllocator&) noexcept { return true; }
        friend bool operator!=(const EntryAllocator&, const EntryAllocator&) noexcept { return false; }

    private:
        void* mpoSpare = nullptr;  // owned
    };

    // The read locks of each thread that has any, by the thread's identifier.
    using ReadCounts = std::map<unsigned long long, unsigned int, std::less<unsigned long long>,
                                EntryAllocator<std::pair<const unsigned long long, unsigned int>>>;
    /// @endcond
};

/// The kind that prefers readers: as long as one reader is inside, a new one gets in at once, past waiting
/// writers. Readers that overlap without a gap keep a writer out for ever; `HWritePrefMutex` doesn't let
/// them.
///
/// It allows a downgrade, from writing to reading with no writer in between: `WriteLock`, `ReadLock`,
/// `WriteUnlock`, and `ReadUnlock` in the end. From that `ReadLock` on other threads' readers get in as well,
/// so a thread takes it only when it has finished writing. The two may also be given back in the other order.
class ZANBASE_API HReadPrefMutex : public HReadWriteMutex {
public:
    /// A free lock; see `HMutex` and `HSemaphore` for exhausted memory.
    HReadPrefMutex();
    ~HReadPrefMutex() override;
    void ReadLock() const override;
    void ReadUnlock() const override;
    void WriteLock() const override;
    void WriteUnlock() const override;

private:
    friend struct HReadWriteSteps;

    mutable unsigned int mnReaders = 0;  // read locks of all threads, nested too; guarded by moReaderMutex
    mutable unsigned int mnWriters = 0;  // depth of the write lock; guarded by moWriterMutex
    mutable ReadCounts moReaderThreads;  // guarded by moReaderMutex
    // The writer, or its start value for nobody: set under moWriterMutex, cleared under both.
    mutable std::atomic<unsigned long long> mnWriterThread{0xFFFFFFFFFFFFFFFF};
    HMutex moReaderMutex;
    HMutex moWriterMutex;
    HSemaphore moResource;  // the lock proper: its unit belongs to the readers together, or to the writer
    HSemaphore moGate;      // passed by readers, kept by the writer
};

/// The kind that prefers writers: from the moment a writer waits, no thread that isn't reading yet gets in,
/// those inside leave, and the writer follows. Writers without a gap keep readers out for ever.
///
/// A thread that holds the write lock must not ask for a read lock, which would wait for itself;
/// `HReadPrefMutex` allows that.
class ZANBASE_API HWritePrefMutex : public HReadWriteMutex {
public:
    /// A free lock; see `HMutex` and `HSemaphore` for exhausted memory.
    HWritePrefMutex();
    ~HWritePrefMutex() override;
    void ReadLock() const override;
    void ReadUnlock() const override;
    void WriteLock() const override;
    void WriteUnlock() const override;

private:
    friend struct HReadWriteSteps;

    mutable unsigned int mnReaders = 0;  // as in HReadPrefMutex, all of them
    mutable unsigned int mnWriters = 0;
    mutable ReadCounts moReaderThreads;
    mutable std::atomic<unsigned long long> mnWriterThread{
        0xFFFFFFFFFFFFFFFF};  // but under moWriterMutex only
    HMutex moReaderMutex;
    HMutex moWriterMutex;
    HSemaphore moGate;
    HSemaphore moResource;
};

/// Holds one read lock of a `HReadWriteMutex` for a scope, or nothing.
///
/// An object belongs to the thread that made it and is released there. It can't be made with `new`. A copy
/// on the same thread is a nested read lock and never waits. Where a lock has to be tried, or waited for
/// within a limit, there is no such form.
class ZANBASE_API HReaderLock {
public:
    /// Takes a read lock of `mutex`, which must outlive the hold; with null holds nothing.
    HReaderLock(const HReadWriteMutex* mutex);

    /// Takes one more read lock of the mutex that `other` holds one of, if any; each gives its own back.
    HReaderLock(const HReaderLock& other);

    /// As `Release`.
    virtual ~HReaderLock();

    /// Releases what this object holds, then takes a read lock of the mutex that `other` held one of at the
    /// start of the call. So an object assigned to itself lets go for a moment, and a writer can get in.
    HReaderLock& operator=(const HReaderLock& other);

    /// Gives the read lock back, if one is held; a second call does nothing.
    void Release();

    /// Releases what is held, then takes a read lock of `mutex` if it is not null.
    void Reset(const HReadWriteMutex* mutex);

private:
    static void* operator new(std::size_t) noexcept { return nullptr; }

    const HReadWriteMutex* mpoMutex;  // not owned; non-null exactly while this object owes it one ReadUnlock
};

/// Holds one write lock of a `HReadWriteMutex` for a scope, or nothing; all else is as for `HReaderLock`. A
/// copy on the same thread is a nested write lock. A holder of a read lock is no base to write from: release
/// it first.
class ZANBASE_API HWriterLock {
public:
    /// Takes a write lock of `mutex`, which must outlive the hold; with null holds nothing.
    HWriterLock(const HReadWriteMutex* mutex);

    /// Takes one more write lock of the mutex that `other` holds one of, if any; each gives its own back.
    HWriterLock(const HWriterLock& other);

    /// As `Release`.
    virtual ~HWriterLock();

    /// Releases what this object holds, then takes a write lock of the mutex that `other` held one of at the
    /// start of the call. So an object assigned to itself lets go for a moment, and others can get in.
    HWriterLock& operator=(const HWriterLock& other);

    /// Gives the write lock back, if one is held; a second call does nothing.
    void Release();

    /// Releases what is held, then takes a write lock of `mutex` if it is not null.
    void Reset(const HReadWriteMutex* mutex);

private:
    static void* operator new(std::size_t) noexcept { return nullptr; }

    const HReadWriteMutex* mpoMutex;  // not owned; non-null exactly while this object owes it one WriteUnlock
};

/// @}

#endif
