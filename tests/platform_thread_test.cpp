// The platform contracts of threads and of machine faults in the words of their headers, for every back end.
#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "platform/guard.h"
#include "platform/semaphore.h"
#include "platform/thread.h"
#include "support/environment.h"
#include "support/faults.h"

// A killed thread leaves the list of its TLS destructors.
extern "C" const char* __lsan_default_suppressions() { return "leak:__cxa_thread_atexit_impl"; }

namespace {

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

}  // namespace
