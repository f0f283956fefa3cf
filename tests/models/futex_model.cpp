// The shipped algorithms of lock, semaphore and condition under every order of their steps and of one kill. Each test also seeds a fault and expects the explorer to find it.
#include "models/futex_system.h"

#include <gtest/gtest.h>

#include "platform/linux/futex_condition.h"
#include "platform/linux/futex_lock.h"
#include "platform/linux/futex_semaphore.h"

namespace {

constexpr int kSoon = 0;  // a deadline, which may pass at any time

using Scripts = std::array<std::string, kThreads>;
using IsAvailable = bool (*)(const State&);

// Threads that have acquired the lock under test and not begun to release it.
std::ptrdiff_t OwnersOf(const State& state) {
    return std::count_if(state.threads.begin(), state.threads.end(), [](const State::Thread& thread) {
        return thread.call % 2 == 1 && thread.log.empty();
    });
}

// What is wrong in some order of steps; empty if nothing is. At the end a living thread may still wait only if what it
// waits for is not available, or if a killed thread holds the lock at `lock`.
std::string Explore(std::size_t lock, IsAvailable is_available, Scripts scripts,
                    Fault seeded = Fault::kNone) {
    fault = seeded;
    explorer.scripts = std::move(scripts);
    explorer.check = [=](const State& state, bool at_the_end) -> const char* {
        if (lock == kWord && OwnersOf(state) > 1) return "two owners";
        if (!at_the_end || !is_available(state)) return nullptr;
        if (state.words[lock] != 0 && state.threads[state.words[lock] / 2 - 1].dead) return nullptr;
        for (std::size_t thread = 0; thread < kThreads; ++thread)
            if (!state.threads[thread].dead && !explorer.IsDone(state, thread)) return "asleep";
        return nullptr;
    };
    return explorer.Explore({});
}

unsigned long long Self() { return 2 * (explorer.self + 1); }

// A: acquire; R: release.
void CallLock(char call) {
    FutexLock<ModelSystem> lock;
    call == 'A' ? lock.Acquire(Self()) : lock.Release(Self());
}

TEST(FutexModel, LockHasOneOwnerAndLosesNoWakeUp) {
    explorer.kill = Kill;
    explorer.call = CallLock;
    const auto is_available = [](const State&) { return true; };
    EXPECT_EQ(Explore(kWord, is_available, {"AR", "AR", "AR"}), "");
    EXPECT_EQ(Explore(kWord, is_available, {"ARAR", "ARAR", ""}), "");
    EXPECT_EQ(Explore(kWord, is_available, {"AR", "AR", "AR"}, Fault::kForgetsWakeups), "asleep");
}

// A: acquire; a: acquire before a deadline; R: release.
void CallSemaphore(char call) {
    FutexSemaphore<ModelSystem> semaphore(0);
    if (call == 'R') return semaphore.Release();
    static_cast<void>(semaphore.Acquire(call == 'a' ? &kSoon : nullptr));
}

TEST(FutexModel, SemaphoreLosesNoUnitAndNoWakeUp) {
    explorer.kill = Kill;
    explorer.call = CallSemaphore;
    const auto has_units = [](const State& state) {
        return (state.words[kWord] & FutexSemaphore<ModelSystem>::kMost) != 0;
    };
    EXPECT_EQ(Explore(kLock, has_units, {"AR", "A", "RR"}), "");
    EXPECT_EQ(Explore(kLock, has_units, {"A", "a", "RR"}), "");
    EXPECT_EQ(Explore(kLock, has_units, {"AR", "A", "RR"}, Fault::kForgetsWakeups), "asleep");
}

struct SimpleLock {
    void Acquire() const {
        Change(kLock, [](Value old) {
            if (old != 0) Explorer::Block();
            return Value{Self()};
        });
    }
    void Release() const { Set(kLock, 0); }
};

// W: wait for an item and take it; +: add an item; s: signal; b: broadcast.
void CallCondition(char call) {
    FutexCondition<ModelSystem> condition;
    if (call == 's') return condition.Signal();
    if (call == 'b') return condition.Broadcast();
    const SimpleLock lock;
    lock.Acquire();
    while (call == 'W' && Get(kItems) == 0) condition.Wait(lock, nullptr);
    Add(kItems, call == 'W' ? -1 : 1);
    lock.Release();
}

// The third thread signals. It is not killed before it has changed the word: it would have signalled nothing.
bool KillOutsideStartOfSignal(State& state, std::size_t thread) {
    const std::vector<Value>& steps = state.threads[2].log;
    const bool has_changed_word = steps.size() > 2 && state.words[kWord] != steps[0];
    return (thread != 2 || has_changed_word) && Kill(state, thread);
}

TEST(FutexModel, ConditionLosesNoWakeUp) {
    explorer.kill = KillOutsideStartOfSignal;
    explorer.call = CallCondition;
    const auto has_items = [](const State& state) { return state.words[kItems] != 0; };
    EXPECT_EQ(Explore(kLock, has_items, {"W", "W", "+s+s"}), "");
    EXPECT_EQ(Explore(kLock, has_items, {"W", "W", "+s"}), "");
    EXPECT_EQ(Explore(kLock, has_items, {"W", "W", "++b"}), "");
    EXPECT_EQ(Explore(kLock, has_items, {"W", "W", "+s+s"}, Fault::kForgetsWakeups), "asleep");
    EXPECT_EQ(Explore(kLock, has_items, {"W", "W", "+s"}, Fault::kForgetsSignals), "asleep");
    EXPECT_EQ(Explore(kLock, has_items, {"W", "W", "++b"}, Fault::kForgetsWakeups), "asleep");
}

}  // namespace
