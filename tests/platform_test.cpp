// The platform contracts in the words of their headers. Names no system and includes nothing of the layers above, so
// every back end runs this file; docs/porting.md lists which test holds which sentence.
#include <fcntl.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <clocale>
#include <string>
#include <thread>

#include "platform/clock.h"
#include "platform/condition.h"
#include "platform/file.h"
#include "platform/guard.h"
#include "platform/lock.h"
#include "platform/messages.h"
#include "platform/processors.h"
#include "platform/semaphore.h"
#include "platform/stream.h"
#include "platform/thread.h"
#include "support/blocked_thread.h"
#include "support/faults.h"
#include "support/written_text.h"

// A killed thread leaves the list of its TLS destructors.
extern "C" const char* __lsan_default_suppressions() { return "leak:__cxa_thread_atexit_impl"; }

namespace {

bool IsFreeForOthers(HNativeLock& lock) {
    bool is_free = false;
    std::thread([&] {
        is_free = TryAcquireLock(&lock);
        if (is_free) ReleaseLock(&lock);
    }).join();
    return is_free;
}

TEST(PlatformLock, IsReentrantForItsOwnerAndExcludesOthers) {
    HNativeLock lock;
    InitLock(&lock);
    AcquireLock(&lock);
    EXPECT_TRUE(TryAcquireLock(&lock));
    ReleaseLock(&lock);
    EXPECT_FALSE(IsFreeForOthers(lock));
    std::thread waiter = SleepIn([&lock] {
        AcquireLock(&lock);
        ReleaseLock(&lock);
    });
    ReleaseLock(&lock);
    waiter.join();
    EXPECT_TRUE(IsFreeForOthers(lock));
    DestroyLock(&lock);
}

TEST(PlatformLock, NumbersItsOwners) {
    const unsigned long long mine = LockOwner();
    unsigned long long other = mine;
    std::thread([&] { other = LockOwner(); }).join();
    EXPECT_NE(other, mine);
    EXPECT_EQ(LockOwner(), mine);
    EXPECT_LT(mine, ~0ULL);
}

// Two threads that sleep on a condition until each is allowed to go on.
struct Sleepers {
    Sleepers() {
        InitLock(&lock);
        InitCondition(&condition);
        for (std::thread& thread : threads) {
            thread = SleepIn([this] {
                AcquireLock(&lock);
                while (allowed == 0) WaitOnCondition(&condition, &lock, kForever);
                --allowed;
                ReleaseLock(&lock);
            });
        }
    }
    void Allow(int count) {
        AcquireLock(&lock);
        allowed += count;
        ReleaseLock(&lock);
    }
    ~Sleepers() {
        for (std::thread& thread : threads) thread.join();
        DestroyLock(&lock);
    }
    HNativeLock lock;
    HNativeCondition condition;
    int allowed = 0;  // guarded by lock
    std::thread threads[2];
};

TEST(PlatformCondition, WakesOneSleeperForEachSignalAndAllForABroadcast) {
    {
        Sleepers one_by_one;
        one_by_one.Allow(2);
        SignalCondition(&one_by_one.condition);
        SignalCondition(&one_by_one.condition);
    }
    {
        Sleepers together;
        together.Allow(2);
        BroadcastCondition(&together.condition);
    }
}

TEST(PlatformCondition, OwnsItsLockAgainAfterATimeout) {
    HNativeLock lock;
    HNativeCondition condition;
    InitLock(&lock);
    InitCondition(&condition);
    AcquireLock(&lock);
    for (const unsigned int limit_ms : {0U, 10U}) {
        const unsigned int start = ReadTicks();
        while (WaitOnCondition(&condition, &lock, limit_ms)) {  // spurious
        }
        EXPECT_GE(ReadTicks() - start, limit_ms);
        EXPECT_FALSE(IsFreeForOthers(lock));
    }
    ReleaseLock(&lock);
    DestroyLock(&lock);
}

TEST(PlatformSemaphore, CountsUnitsUpToItsMost) {
    HNativeSemaphore* const full = NewSemaphore(kMaxUnits + 1U);
    ReleaseUnit(full);
    EXPECT_TRUE(AcquireUnit(full, 0));
    DeleteSemaphore(full);

    HNativeSemaphore* const empty = NewSemaphore(0);
    EXPECT_FALSE(AcquireUnit(empty, 0));
    const unsigned int start = ReadTicks();
    EXPECT_FALSE(AcquireUnit(empty, 10));
    EXPECT_GE(ReadTicks() - start, 10U);
    std::thread waiter = SleepIn([empty] { EXPECT_TRUE(AcquireUnit(empty, kForever)); });
    ReleaseUnit(empty);
    waiter.join();
    EXPECT_FALSE(AcquireUnit(empty, 0));
    DeleteSemaphore(empty);
}

// A thread of StartThread, whose body passes its slot's content on and then waits for a unit. One at a time.
struct Started {
    // Not through the object's own storage, which the runtime of MinGW may free before it runs the destructor.
    struct TlsObject {
        ~TlsObject() { gpoLatest->is_destroyed = true; }
    };

    static void Body(void* argument) {
        auto& self = *static_cast<Started*>(argument);
        gpoLatest = &self;
        thread_local const TlsObject object;
        static_cast<void>(&object);
        self.slot_in_body = self.slot.load();
        AcquireUnit(self.permission, kForever);
        self.has_returned = true;
    }

    Started() { EXPECT_EQ(StartThread(slot, Body, this), 0); }
    ~Started() { DeleteSemaphore(permission); }
    void AwaitBody() const {
        while (slot_in_body == nullptr) std::this_thread::yield();
    }

    HNativeSemaphore* const permission = NewSemaphore(0);
    ThreadSlot slot{nullptr};
    std::atomic<HNativeThread*> slot_in_body{nullptr};
    std::atomic<bool> has_returned{false}, is_destroyed{false};
    static inline Started* gpoLatest = nullptr;
};

TEST(PlatformThread, FillsItsSlotBeforeItsBodyAndIsJoinedWithItsTlsDestructors) {
    Started thread;
    ReleaseUnit(thread.permission);
    JoinThread(thread.slot);
    EXPECT_NE(thread.slot_in_body, nullptr);
    EXPECT_TRUE(thread.is_destroyed);
    EXPECT_EQ(thread.slot, nullptr);
}

TEST(PlatformThread, IsGoneWhenItsKillReturns) {
    Started thread;
    thread.AwaitBody();
    KillThread(thread.slot);
    EXPECT_EQ(thread.slot, nullptr);
    ReleaseUnit(thread.permission);
    EXPECT_TRUE(AcquireUnit(thread.permission, 0));
    EXPECT_FALSE(thread.has_returned);
    EXPECT_EQ(thread.is_destroyed, kKillRunsTlsDestructors);
}

TEST(PlatformThread, ContinuesDetachedAndLeavesItsSlotAlone) {
    Started thread;
    thread.AwaitBody();
    DetachThread(thread.slot);
    EXPECT_EQ(thread.slot, nullptr);
    ReleaseUnit(thread.permission);
    while (!thread.is_destroyed) std::this_thread::yield();
    EXPECT_EQ(thread.slot, nullptr);
}

TEST(PlatformThread, DoesNothingForAnEmptySlot) {
    ThreadSlot slot{nullptr};
    JoinThread(slot);
    KillThread(slot);
    DetachThread(slot);
    SetNativePriority(slot, 6);
    EXPECT_EQ(slot, nullptr);
}

TEST(PlatformGuard, IdentifiesFaultsAmongOtherWaysOut) {
    const auto fault = [](void*) { WriteToNull(); };
    const auto nested = [](void*) { EXPECT_TRUE(RunGuarded([](void*) { DivideByZero(); }, nullptr)); };
    for (int round = 0; round < 3; ++round) {
        EXPECT_TRUE(RunGuarded(fault, nullptr));
        EXPECT_FALSE(RunGuarded(nested, nullptr));
        EXPECT_THROW(RunGuarded([](void*) { throw 7; }, nullptr), int);
    }
}

TEST(PlatformStream, HasALockThatIsReentrantAndExcludesOthers) {
    std::FILE* const stream = OpenTemporaryFile();
    LockStream(stream);
    LockStream(stream);
    std::thread other = SleepIn([stream] {
        const StreamLock lock(stream);
        std::fputs("second", stream);
    });
    UnlockStream(stream);
    std::fputs("first ", stream);
    UnlockStream(stream);
    other.join();
    EXPECT_EQ(TakeText(stream), "first second");
}

TEST(PlatformClock, ReadsTheWallTimeInMilliseconds) {
    using std::chrono::system_clock;
    const auto before = std::chrono::floor<std::chrono::milliseconds>(system_clock::now().time_since_epoch());
    const WallClock wall = ReadWallClock();
    const std::chrono::milliseconds read(wall.seconds * 1000 + wall.milliseconds);
    EXPECT_LT(wall.milliseconds, 1000);
    EXPECT_GE(read, before);
    EXPECT_LE(read, system_clock::now().time_since_epoch());
}

TEST(PlatformClock, NeverEndsAPauseEarly) {
    const auto start = std::chrono::steady_clock::now();
    SleepFor(20);
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(20));
}

TEST(PlatformFile, KeepsPositionsBeyond4GiB) {
    constexpr long long kFar = 5LL << 30;
    const std::string name = testing::TempDir() + "platform_file";
    const int file = OpenDescriptor(name.c_str(), O_RDWR | O_CREAT, 0666, false);
    EXPECT_EQ(WriteDescriptorTwo(file, "ab", 2, "c", 1), 3);
    EXPECT_EQ(SeekDescriptor(file, kFar, SEEK_SET), kFar);
    EXPECT_EQ(SeekDescriptor(file, 0, SEEK_CUR), kFar);
    EXPECT_EQ(CloseDescriptor(file), 0);
    std::FILE* const stream = OpenStream(name.c_str(), "rb");
    EXPECT_EQ(SeekStream(stream, kFar, SEEK_CUR), kFar);
    std::fclose(stream);
    std::remove(name.c_str());
}

TEST(PlatformProcessors, AreNoFewerThanTheirCores) {
    EXPECT_GE(CountProcessorCores(), 0);
    EXPECT_GE(CountLogicalProcessors(), CountProcessorCores());
}

TEST(PlatformMessages, KeepNumbersAndReturnWhatHasNoTranslation) {
    SetMessageLocale("");
    EXPECT_STREQ(std::setlocale(LC_NUMERIC, nullptr), "C");
    BindMessages("no-such-domain", nullptr);
    EXPECT_STREQ(Translate("message"), "message");
}

}  // namespace
