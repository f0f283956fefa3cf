// The steps of the two read-write locks, as templates over the lock, so that tests/models can run the shipped
// code under the memory model of C++. `Lock` has those members of HReadPrefMutex that are used here.
//
//   State                       mnReaders  mnWriters  moResource  moGate
//   free                        0          0          free        free
//   read                        > 0        0          taken       free
//   read, a writer waiting      > 0        0          taken       held by the writer
//   write                       0          > 0        taken       held by the writer
//   write and read (readers     > 0        > 0        taken       held by the writer
//     preferred only)
//
// Lock order: a reader acquires moGate, moReaderMutex, moResource; a writer acquires moGate, moResource, and
// in its last unlock moReaderMutex inside moWriterMutex. No thread waits for moGate while it holds
// moReaderMutex; otherwise readers could deadlock in ReadUnlock. No thread waits for a semaphore while it holds
// moWriterMutex; otherwise writers could deadlock in WriteUnlock. A thread may test them there: if they are
// free, it need not release the mutex and acquire it again.
//
// Which side releases moResource: in the state "write and read" either side may leave first. The side that
// leaves last releases the unit. Both decide inside moReaderMutex: the writer clears mnWriterThread before it
// reads mnReaders, and a reader lowers mnReaders before it reads mnWriterThread. So only the side that decides
// second finds that the other has left. Reading mnWriters instead would be wrong: it is still above 0 after the
// writer has left the unit to the readers.
//
// mnWriterThread is relaxed: a thread acts on it only if it equals its own number, which it stored itself, or
// inside moReaderMutex, which orders it (held by MemoryModel.ReadPreferringLock… and WritePreferringLock…).
#ifndef ZANBASE_LOCKS_READ_WRITE_STEPS_H
#define ZANBASE_LOCKS_READ_WRITE_STEPS_H

#include <atomic>
#include <utility>

struct HReadWriteSteps {
    using Thread = unsigned long long;
    static constexpr Thread kNoThread = 0xFFFFFFFFFFFFFFFF;  // LockOwner never returns it

    // Whether readers can be inside beside the writer: the writer itself, and readers that follow it.
    enum class Downgrade { kAllowed, kBarred };

    // Passes waiting writers while a reader is inside.
    template <class Lock>
    static void ReadLockAtOnce(Lock& lock, Thread self) {
        lock.moReaderMutex.Lock();
        if (!TryNestedReadLock(lock, self)) {
            if (lock.mnReaders == 0 && WriterOf(lock) != self) {
                AcquireGate(lock);
                // Readers may have entered meanwhile: a writer that downgraded left its unit to them.
                if (lock.mnReaders == 0) lock.moResource.Lock();
                lock.moGate.Unlock();
            }
            CountFirst(lock, self);
        }
        lock.moReaderMutex.Unlock();
    }

    // Waits behind waiting writers, unless the thread reads already.
    template <class Lock>
    static void ReadLockInTurn(Lock& lock, Thread self) {
        lock.moReaderMutex.Lock();
        const bool nested = TryNestedReadLock(lock, self);
        if (!nested) {
            AcquireGate(lock);
            if (lock.mnReaders == 0) lock.moResource.Lock();
            CountFirst(lock, self);
        }
        lock.moReaderMutex.Unlock();
        if (!nested) lock.moGate.Unlock();
    }

    template <Downgrade kDowngrade, class Lock>
    static void ReadUnlock(Lock& lock, Thread self) {
        lock.moReaderMutex.Lock();
        const auto entry = lock.moReaderThreads.find(self);
        if (entry != lock.moReaderThreads.end() && --entry->second == 0)
            lock.moSpareCount = lock.moReaderThreads.extract(entry);
        if (--lock.mnReaders == 0 && (kDowngrade == Downgrade::kBarred || WriterOf(lock) == kNoThread))
            lock.moResource.Unlock();
        lock.moReaderMutex.Unlock();
    }

    template <class Lock>
    static void WriteLock(Lock& lock, Thread self) {
        lock.moWriterMutex.Lock();
        if (lock.mnWriters == 0 || WriterOf(lock) != self) {
            AcquireGateAndResource(lock);
            lock.mnWriterThread.store(self, std::memory_order_relaxed);
        }
        ++lock.mnWriters;
        lock.moWriterMutex.Unlock();
    }

    template <Downgrade kDowngrade, class Lock>
    static void WriteUnlock(Lock& lock, Thread self) {
        lock.moWriterMutex.Lock();
        if (lock.mnWriters == 1 && WriterOf(lock) == self) {
            ReleaseFromWriter<kDowngrade>(lock);
            lock.moGate.Unlock();
        }
        --lock.mnWriters;
        lock.moWriterMutex.Unlock();
    }

    template <class Lock>
    static bool IsWriter(const Lock& lock, Thread self) {
        return WriterOf(lock) == self;
    }

    template <class Lock>
    static bool IsReader(const Lock& lock, Thread self) {
        lock.moReaderMutex.Lock();
        const bool is_reader = lock.moReaderThreads.count(self) != 0;
        lock.moReaderMutex.Unlock();
        return is_reader;
    }

private:
    template <class Lock>
    static Thread WriterOf(const Lock& lock) {
        return lock.mnWriterThread.load(std::memory_order_relaxed);
    }

    // Requires: moReaderMutex is held. Releases it while the thread waits.
    template <class Lock>
    static void AcquireGate(Lock& lock) {
        if (lock.moGate.TryLock(0)) return;
        lock.moReaderMutex.Unlock();
        lock.moGate.Lock();
        lock.moReaderMutex.Lock();
    }

    // Requires: moWriterMutex is held. Releases it while the thread waits.
    template <class Lock>
    static void AcquireGateAndResource(Lock& lock) {
        const bool has_gate = lock.moGate.TryLock(0);
        if (has_gate && lock.moResource.TryLock(0)) return;
        lock.moWriterMutex.Unlock();
        if (!has_gate) lock.moGate.Lock();
        lock.moResource.Lock();
        lock.moWriterMutex.Lock();
    }

    // Counts one more read lock and returns true if the thread reads already. Requires: moReaderMutex is
    // held.
    template <class Lock>
    static bool TryNestedReadLock(Lock& lock, Thread self) {
        const auto entry = lock.moReaderThreads.find(self);
        if (entry == lock.moReaderThreads.end()) return false;
        ++lock.mnReaders;
        ++entry->second;
        return true;
    }

    // Requires: moReaderMutex is held.
    template <class Lock>
    static void CountFirst(Lock& lock, Thread self) {
        ++lock.mnReaders;
        if (lock.moSpareCount.empty()) {
            lock.moReaderThreads.emplace(self, 1U);
            return;
        }
        lock.moSpareCount.key() = self;
        lock.moSpareCount.mapped() = 1;
        lock.moReaderThreads.insert(std::move(lock.moSpareCount));
    }

    template <Downgrade kDowngrade, class Lock>
    static void ReleaseFromWriter(Lock& lock) {
        if (kDowngrade == Downgrade::kAllowed) lock.moReaderMutex.Lock();
        lock.mnWriterThread.store(kNoThread, std::memory_order_relaxed);
        if (kDowngrade == Downgrade::kBarred || lock.mnReaders == 0) lock.moResource.Unlock();
        if (kDowngrade == Downgrade::kAllowed) lock.moReaderMutex.Unlock();
    }
};

#endif
