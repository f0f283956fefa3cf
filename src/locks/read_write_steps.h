// The steps of the two read-write locks, as templates over the lock, so that a test can run the very same
// code under every order of steps. `Lock` has the members of HReadPrefMutex; what a type needs of them is
// what is called here.
//
//   State                       mnReaders  mnWriters  moResource  moGate
//   free                        0          0          free        free
//   read                        > 0        0          taken       free
//   read, a writer waiting      > 0        0          taken       held by the writer
//   write                       0          > 0        taken       held by the writer
//   write and read (readers     > 0        > 0        taken       held by the writer
//     preferred only)
//
// Order of taking: moGate, moReaderMutex, moResource for a reader; moGate, moResource for a writer, which in
// its last unlock takes moReaderMutex inside moWriterMutex. Nobody waits for moGate while holding
// moReaderMutex, so readers can always leave.
//
// Who gives back moResource: in the state "write and read" either side may leave first, and the unit has to
// go back exactly once, with the other. Both sides decide inside moReaderMutex: the writer clears
// mnWriterThread there before it looks at mnReaders, and a reader lowers mnReaders there before it looks at
// mnWriterThread. So the second of them sees the first gone, and only the second. mnWriters would not do: it
// is still above 0 when the writer has already left the unit to the readers.
#ifndef ZANBASE_LOCKS_READ_WRITE_STEPS_H
#define ZANBASE_LOCKS_READ_WRITE_STEPS_H

#include <atomic>

struct HReadWriteSteps {
    using Thread = unsigned long long;
    static constexpr Thread kNobody = 0xFFFFFFFFFFFFFFFF;  // no thread has this identifier

    // Whether readers can be inside beside the writer: its own downgrade, and those that it lets in.
    enum class Downgrade { kAllowed, kBarred };

    // Past waiting writers, as long as one reader is in.
    template <class Lock>
    static void ReadLockAtOnce(Lock& lock, Thread self) {
        lock.moReaderMutex.Lock();
        if (!TryNestedReadLock(lock, self)) {
            if (lock.mnReaders == 0 && WriterOf(lock) != self) {
                lock.moReaderMutex.Unlock();
                lock.moGate.Lock();
                lock.moReaderMutex.Lock();
                // A writer that has left its unit to readers may have let some in meanwhile.
                if (lock.mnReaders == 0) lock.moResource.Lock();
                lock.moGate.Unlock();
            }
            CountFirst(lock, self);
        }
        lock.moReaderMutex.Unlock();
    }

    // Behind waiting writers, unless the thread reads already.
    template <class Lock>
    static void ReadLockInTurn(Lock& lock, Thread self) {
        lock.moReaderMutex.Lock();
        const bool nests = TryNestedReadLock(lock, self);
        lock.moReaderMutex.Unlock();
        if (nests) return;
        lock.moGate.Lock();
        lock.moReaderMutex.Lock();
        if (lock.mnReaders == 0) lock.moResource.Lock();
        CountFirst(lock, self);
        lock.moReaderMutex.Unlock();
        lock.moGate.Unlock();
    }

    template <Downgrade kDowngrade, class Lock>
    static void ReadUnlock(Lock& lock, Thread self) {
        lock.moReaderMutex.Lock();
        const auto entry = lock.moReaderThreads.find(self);
        if (entry != lock.moReaderThreads.end() && --entry->second == 0) lock.moReaderThreads.erase(entry);
        if (--lock.mnReaders == 0 && (kDowngrade == Downgrade::kBarred || WriterOf(lock) == kNobody))
            lock.moResource.Unlock();
        lock.moReaderMutex.Unlock();
    }

    template <class Lock>
    static void WriteLock(Lock& lock, Thread self) {
        lock.moWriterMutex.Lock();
        const bool nests = lock.mnWriters != 0 && WriterOf(lock) == self;
        if (nests) ++lock.mnWriters;
        lock.moWriterMutex.Unlock();
        if (nests) return;
        lock.moGate.Lock();
        lock.moResource.Lock();
        lock.moWriterMutex.Lock();
        lock.mnWriterThread.store(self, std::memory_order_relaxed);
        ++lock.mnWriters;
        lock.moWriterMutex.Unlock();
    }

    template <Downgrade kDowngrade, class Lock>
    static void WriteUnlock(Lock& lock, Thread self) {
        lock.moWriterMutex.Lock();
        if (lock.mnWriters == 1 && WriterOf(lock) == self) {
            GiveUpWriting<kDowngrade>(lock);
            lock.moGate.Unlock();
        }
        --lock.mnWriters;
        lock.moWriterMutex.Unlock();
    }

private:
    template <class Lock>
    static Thread WriterOf(const Lock& lock) {
        return lock.mnWriterThread.load(std::memory_order_relaxed);
    }

    // True, and one more counted, if the thread reads already.
    template <class Lock>
    static bool TryNestedReadLock(Lock& lock, Thread self) {
        const auto entry = lock.moReaderThreads.find(self);
        if (entry == lock.moReaderThreads.end()) return false;
        ++lock.mnReaders;
        ++entry->second;
        return true;
    }

    template <class Lock>
    static void CountFirst(Lock& lock, Thread self) {
        ++lock.mnReaders;
        ++lock.moReaderThreads[self];
    }

    template <Downgrade kDowngrade, class Lock>
    static void GiveUpWriting(Lock& lock) {
        if (kDowngrade == Downgrade::kAllowed) lock.moReaderMutex.Lock();
        lock.mnWriterThread.store(kNobody, std::memory_order_relaxed);
        if (kDowngrade == Downgrade::kBarred || lock.mnReaders == 0) lock.moResource.Unlock();
        if (kDowngrade == Downgrade::kAllowed) lock.moReaderMutex.Unlock();
    }
};

#endif
