// The shipped algorithms under the memory model of C++; see relacy_system.h.
#include "models/relacy_system.h"

#include <map>

#include "locks/read_write_steps.h"
#include "platform/linux/futex_condition.h"
#include "platform/linux/futex_lock.h"
#include "platform/linux/futex_semaphore.h"
#include "timing/row_table.h"

namespace {

using Lock = FutexLock<RelacySystem>;
using Semaphore = FutexSemaphore<RelacySystem>;

unsigned long long Self() { return 2ULL * (rl::thread_index() + 1); }

// A level of a lock that the running thread acquires and releases.
struct Mutex {
    void Acquire() const { moLock.Acquire(Self()); }
    void Release() const { moLock.Release(Self()); }
    void Lock() const { Acquire(); }
    void Unlock() const { Release(); }
    mutable ::Lock moLock;
};

struct LockSuite : rl::test_suite<LockSuite, 3> {
    Mutex mutex;
    RelacyPlain guarded;

    void thread(unsigned int thread) {
        if (thread == 2 && !mutex.moLock.TryAcquire(Self())) return;
        if (thread != 2) mutex.Acquire();
        mutex.Acquire();  // nested
        ++guarded;
        mutex.Release();
        ++guarded;
        mutex.Release();
    }
};

TEST(MemoryModel, LockNeedsItsOrders) { ExpectNeedsItsOrders<LockSuite>(4); }

// Two units of two threads: the thread that has acquired both sees what both wrote.
struct SemaphoreSuite : rl::test_suite<SemaphoreSuite, 3> {
    Semaphore semaphore{0};
    RelacyPlain written[2];

    void thread(unsigned int thread) {
        if (thread < 2) {
            ++written[thread];
            semaphore.Release();
            return;
        }
        const int soon = 0;
        if (!semaphore.Acquire(&soon)) semaphore.Acquire(nullptr);
        semaphore.Acquire(nullptr);
        ++written[0];
        ++written[1];
    }
};

TEST(MemoryModel, SemaphoreNeedsItsOrders) { ExpectNeedsItsOrders<SemaphoreSuite>(1); }

// Two threads wait for an item each. The items are atomic, so no race on them is found before a lost wake-up.
struct ConditionSuite : rl::test_suite<ConditionSuite, 3> {
    FutexCondition<RelacySystem> condition;
    Mutex mutex;
    RelacyAtomic<unsigned int> items{0};

    void thread(unsigned int thread) {
        mutex.Acquire();
        if (thread == 2) {
            items.fetch_add(2, std::memory_order_relaxed);
            condition.Signal();
            mutex.Release();
            condition.Broadcast();
            return;
        }
        while (items.load(std::memory_order_relaxed) == 0) condition.Wait(mutex, nullptr);
        items.fetch_add(~0U, std::memory_order_relaxed);
        mutex.Release();
    }
};

TEST(MemoryModel, ConditionNeedsTheOrdersOfItsLock) { ExpectNeedsItsOrders<ConditionSuite>(4); }

struct Units {
    explicit Units(unsigned int count) : moSemaphore(count) {}
    void Lock() const { moSemaphore.Acquire(nullptr); }
    bool TryLock(double) const { return moSemaphore.TryAcquire(); }
    void Unlock() const { moSemaphore.Release(); }
    mutable Semaphore moSemaphore;
};

struct ReadWriteLock {
    RelacyPlain mnReaders, mnWriters;
    std::map<unsigned long long, unsigned int> moReaderThreads;
    decltype(moReaderThreads)::node_type moSpareCount;
    RelacyAtomic<unsigned long long> mnWriterThread{HReadWriteSteps::kNoThread};
    Mutex moReaderMutex, moWriterMutex;
    Units moResource{1}, moGate{1};
};

using Downgrade = HReadWriteSteps::Downgrade;

// A writer that downgrades if it can, a writer that then reads, a reader.
template <Downgrade kDowngrade>
struct ReadWriteSuite : rl::test_suite<ReadWriteSuite<kDowngrade>, 3> {
    static constexpr bool kCanDowngrade = kDowngrade == Downgrade::kAllowed;
    ReadWriteLock lock;
    RelacyPlain guarded;

    void ReadLock() {
        kCanDowngrade ? HReadWriteSteps::ReadLockAtOnce(lock, Self())
                      : HReadWriteSteps::ReadLockInTurn(lock, Self());
    }
    void ReadUnlock() {
        static_cast<void>(static_cast<unsigned int>(guarded));
        HReadWriteSteps::ReadUnlock<kDowngrade>(lock, Self());
    }
    void WriteUnlock() { HReadWriteSteps::WriteUnlock<kDowngrade>(lock, Self()); }

    void thread(unsigned int thread) {
        if (thread != 2) {
            HReadWriteSteps::WriteLock(lock, Self());
            HReadWriteSteps::WriteLock(lock, Self());  // nested
            ++guarded;
            WriteUnlock();
            if (kCanDowngrade && thread == 0) {
                ReadLock();
                WriteUnlock();
                return ReadUnlock();
            }
            WriteUnlock();
        }
        ReadLock();
        ReadLock();  // nested, past a writer that waits
        ReadUnlock();
        ReadUnlock();
    }
};

TEST(MemoryModel, ReadPreferringLockNeedsItsOrders) {
    ExpectNeedsItsOrders<ReadWriteSuite<Downgrade::kAllowed>>(5);
}
TEST(MemoryModel, WritePreferringLockNeedsItsOrders) {
    ExpectNeedsItsOrders<ReadWriteSuite<Downgrade::kBarred>>(5);
}

// Two threads make the same slots, and one finds them, while another thread adds a row in a new segment.
struct RowTableSuite : rl::test_suite<RowTableSuite, 3> {
    static constexpr std::size_t kRows = 16;  // of the first segment
    RowTable<RelacyPlain, RelacyAtomic> table{kRows};

    static void Read(const RelacyPlain* slot) {
        if (slot != nullptr) static_cast<void>(static_cast<unsigned int>(*slot));
    }

    void thread(unsigned int thread) {
        if (thread == 0) return table.AddRows(kRows + 1, 1);
        if (thread == 1) ++table.At(0, 0);
        if (thread == 2) {
            Read(table.Find(0, 1));
            Read(&table.At(0, 2));
        }
        Read(table.Find(table.RowCount() - 1, 0));
    }
};

TEST(MemoryModel, RowTableNeedsItsOrders) { ExpectNeedsItsOrders<RowTableSuite>(5); }

}  // namespace
