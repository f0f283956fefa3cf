// The platform contracts in the words of their headers; those of threads and machine faults are in
// platform_thread_test.cpp. Both name no system and include nothing of the layers above, so every back end runs them;
// docs/porting.md lists which test holds which sentence.
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
#include "platform/lock.h"
#include "platform/messages.h"
#include "platform/processors.h"
#include "platform/semaphore.h"
#include "platform/stream.h"
#include "support/blocked_thread.h"
#include "support/written_text.h"

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
        while (WaitOnCondition(&condition, &lock, limit_ms)) {  // spurious
        }
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
