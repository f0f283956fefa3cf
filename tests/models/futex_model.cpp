// The shipped algorithms of lock, semaphore and condition on words and sleepers of the explorer. One thread may be
// killed, at any of its steps.
//
// Stores may be delayed, as a processor with a weak memory order does: a store to the futex word or to what the lock
// guards first waits in a place of its thread, and reaches the others at any later time, in any order. An operation
// with release order, and entering the kernel, makes the thread's stores to what is guarded first. A read-modify-write
// works on the word itself, after the thread's own store to it. Loads are made in order.
#include <gtest/gtest.h>

#include <algorithm>
#include <exception>
#include <utility>

#include "models/explorer.h"
#include "platform/linux/futex_condition.h"
#include "platform/linux/futex_lock.h"
#include "platform/linux/futex_semaphore.h"

namespace {

// Places in State::words. The first six stand once, the others once for each thread.
constexpr std::size_t kWord = 0;                            // the futex word under test
constexpr std::size_t kLock = 1;                            // the simple lock beside a condition
constexpr std::size_t kHasKilled = 2;                       // 1 after the one kill
constexpr std::size_t kOwners = 3;                          // threads that own the lock under test
constexpr std::size_t kItems = 4;                           // what the waiters on a condition wait for
constexpr std::size_t kLastTaker = 5;                       // the thread that last changed a lock from 0
constexpr std::size_t kAsleep = 6;                          // 1: the thread sleeps on kWord
constexpr std::size_t kPendingWakeup = kAsleep + kThreads;  // 1: noted on a lock or semaphore
constexpr std::size_t kPendingSignal = kPendingWakeup + kThreads;  // 1: noted on a condition
constexpr std::size_t kSeen = kPendingSignal + kThreads;  // the condition's word at the start of the wait
constexpr std::size_t kDelayedWord = kSeen + kThreads;    // a store to kWord that is delayed, plus 1; 0: none
constexpr std::size_t kDelayedGuarded = kDelayedWord + kThreads;  // the same for kGuarded
constexpr std::size_t kGuarded = kDelayedGuarded + kThreads;      // what the threads write under the lock
constexpr std::size_t kWrites = kGuarded + 1;                     // how often they wrote it

enum class Fault { kNone, kForgetsWakeups, kForgetsSignals, kReleasesRelaxed };

Fault fault = Fault::kNone;
constexpr int kSoon = 0;  // a deadline, which may pass at any time

// The value a word changes to; notes the thread that changes it from 0.
Value Take(Value old, Value desired) {
    if (old == 0 && desired != 0) explorer.now.words[kLastTaker] = explorer.self;
    return desired;
}

unsigned int As32Bits(Value value) { return static_cast<unsigned int>(value); }

// Makes a delayed store: those of the threads to kWord come first, then those to kGuarded.
bool Deliver(State& state, std::size_t store) {
    const Value delayed = std::exchange(state.words[kDelayedWord + store], 0);
    if (delayed != 0) state.words[store < kThreads ? kWord : kGuarded] = delayed - 1;
    return delayed != 0;
}

// Makes the running thread's delayed stores as far as `order` wants it.
void DeliverBefore(State& state, std::memory_order order, bool changes_word) {
    const bool releases = order != std::memory_order_relaxed && order != std::memory_order_acquire;
    if (releases && fault != Fault::kReleasesRelaxed) Deliver(state, kThreads + explorer.self);
    if (changes_word) Deliver(state, explorer.self);
}

// Changes the futex word by a read-modify-write.
template <class Rule>
unsigned int ChangeWord(std::memory_order order, Rule rule) {
    return As32Bits(explorer.Step([&](State& state) {
        DeliverBefore(state, order, true);
        return std::exchange(state.words[kWord], rule(state.words[kWord]));
    }));
}

// Writes under the lock: what was written before has to be there, and the store may be delayed.
void WriteGuarded() {
    explorer.Step([](State& state) {
        Deliver(state, kThreads + explorer.self);
        if (state.words[kGuarded] != state.words[kWrites]) Explorer::Fail("misses a store");
        return state.words[kDelayedGuarded + explorer.self] = ++state.words[kWrites] + 1;
    });
}

struct Word {
    explicit Word(unsigned int) {}  // the explorer's start state has the value
    unsigned int load(std::memory_order) const {
        return As32Bits(explorer.Step([](State& state) {
            const Value mine = state.words[kDelayedWord + explorer.self];
            return mine != 0 ? mine - 1 : state.words[kWord];
        }));
    }
    void store(unsigned int desired, std::memory_order order) {
        explorer.Step([&](State& state) {
            DeliverBefore(state, order, true);
            return state.words[kDelayedWord + explorer.self] = desired + 1;
        });
    }
    unsigned int exchange(unsigned int desired, std::memory_order order) {
        return ChangeWord(order, [=](Value old) { return Take(old, desired); });
    }
    unsigned int fetch_add(unsigned int more, std::memory_order order) {
        return ChangeWord(order, [=](Value old) { return old + more; });
    }
    unsigned int fetch_or(unsigned int bits, std::memory_order order) {
        return ChangeWord(order, [=](Value old) { return old | bits; });
    }
    bool compare_exchange_strong(unsigned int& expected, unsigned int desired, std::memory_order order,
                                 std::memory_order = {}) {
        const unsigned int wanted = expected;
        expected = ChangeWord(order, [=](Value old) { return old == wanted ? Take(old, desired) : old; });
        return expected == wanted;
    }
};

// A thread reads its own number only if it owns the lock, and no thread here acquires twice: so it reads 0.
struct Owner {
    explicit Owner(int) {}
    unsigned long long load(std::memory_order) const { return 0; }
    void store(unsigned long long, std::memory_order) const {}
};

template <std::size_t kPlace, Fault kForgets>
struct Pending {
    explicit Pending(const Word&, unsigned int seen = 0) {
        explorer.Step([&](State& state) {
            state.words[kSeen + explorer.self] = seen;
            return state.words[kPlace + explorer.self] = fault == kForgets ? 0 : 1;
        });
    }
    ~Pending() noexcept(false) {
        const bool is_explorers_exception = std::uncaught_exceptions() != 0;
        if (!is_explorers_exception) Set(kPlace + explorer.self, 0);
    }
};

// A barrier: the kernel's futex calls order the word against their queue of sleepers.
void EnterKernel(State& state) { DeliverBefore(state, std::memory_order_seq_cst, true); }

struct System {
    using Word = ::Word;
    using Owner = ::Owner;
    using Deadline = const int*;
    using PendingWakeup = Pending<kPendingWakeup, Fault::kForgetsWakeups>;
    using PendingSignal = Pending<kPendingSignal, Fault::kForgetsSignals>;
    static constexpr int kEverySleeper = kThreads;

    static bool IsAlone() { return false; }

    // Two steps: fall asleep if the word is as expected; go on once woken or at the deadline.
    static bool SleepWhile(Word&, unsigned int expected, Deadline deadline) {
        const std::size_t asleep = kAsleep + explorer.self;
        const Value slept = explorer.Step([&](State& state) {
            EnterKernel(state);
            return state.words[asleep] = state.words[kWord] == expected ? 1 : 0;
        });
        if (slept == 0) return true;
        const Value still_asleep = Change(asleep, [&](Value value) {
            if (value != 0 && deadline == nullptr) Explorer::Block();
            return Value{0};
        });
        return still_asleep == 0;
    }

    // Any sleeper may be the one that is woken.
    static int WakeSleepers(Word&, int most) {
        return static_cast<int>(explorer.Step([&](State& state) {
            EnterKernel(state);
            std::vector<std::size_t> sleepers;
            for (std::size_t place = kAsleep; place < kAsleep + kThreads; ++place)
                if (state.words[place] != 0) sleepers.push_back(place);
            if (most == 1 && !sleepers.empty()) sleepers = {sleepers[explorer.Choose(sleepers.size())]};
            for (const std::size_t place : sleepers) state.words[place] = 0;
            return sleepers.size();
        }));
    }
};

// Kills a thread, which forwards its pending wake-ups as ForwardPendingWakeups does. The signal that ends it is a
// barrier: its stores are made before.
bool Kill(State& state, std::size_t thread) {
    if (state.words[kHasKilled] != 0) return false;
    state.words[kHasKilled] = 1;
    for (const std::size_t store : {thread, kThreads + thread}) Deliver(state, store);
    state.threads[thread].dead = true;
    Value* const asleep = &state.words[kAsleep];
    asleep[thread] = 0;
    if (state.words[kPendingWakeup + thread] != 0) std::fill_n(asleep, kThreads, 0);
    const bool was_signalled =
        state.words[kPendingSignal + thread] != 0 && state.words[kWord] != state.words[kSeen + thread];
    Value* const sleeper = std::find(asleep, asleep + kThreads, 1);
    if (was_signalled && sleeper != asleep + kThreads) *sleeper = 0;
    return true;
}

using Scripts = std::array<std::string, kThreads>;
using IsAvailable = bool (*)(const State&);

// What is wrong in some order of steps. At the end a living thread may still wait only if what it waits for
// is not available, or if a killed thread holds the lock at `lock`.
std::string Explore(std::size_t lock, IsAvailable is_available, Scripts scripts,
                    Fault seeded = Fault::kNone) {
    fault = seeded;
    explorer.scripts = std::move(scripts);
    explorer.check = [=](const State& state, bool at_the_end) -> const char* {
        if (state.words[kOwners] > 1) return "two owners";
        if (!at_the_end || !is_available(state)) return nullptr;
        if (state.words[lock] != 0 && state.threads[state.words[kLastTaker]].dead) return nullptr;
        for (std::size_t thread = 0; thread < kThreads; ++thread)
            if (!state.threads[thread].dead && !explorer.IsDone(state, thread)) return "asleep";
        return nullptr;
    };
    return explorer.Explore({});
}

// A: acquire; R: release.
void CallLock(char call) {
    FutexLock<System> lock;
    if (call == 'A') {
        lock.Acquire(1);
        ++explorer.now.words[kOwners];
    } else {
        WriteGuarded();
        Add(kOwners, -1);
        lock.Release();
    }
}

TEST(FutexModel, LockHasOneOwnerAndLosesNoWakeUp) {
    explorer.kill = Kill;
    explorer.deliver = Deliver;
    explorer.call = CallLock;
    const auto is_available = [](const State&) { return true; };
    const Scripts scripts{"ARAR", "AR", "AR"};
    EXPECT_EQ(Explore(kWord, is_available, scripts), "");
    EXPECT_EQ(Explore(kWord, is_available, scripts, Fault::kForgetsWakeups), "asleep");
    EXPECT_EQ(Explore(kWord, is_available, scripts, Fault::kReleasesRelaxed), "misses a store");
}

// Writes what the thread that acquires the unit has to see.
void WriteBeforeRelease() {
    explorer.Step([](State& state) { return state.words[kDelayedGuarded + explorer.self] = 2; });
}

// At the end of a call: no step of its own.
void ReadAfterAcquire() {
    const bool has_written = explorer.now.words[kDelayedGuarded + explorer.self] != 0;
    if (explorer.now.words[kGuarded] == 0 && !has_written) Explorer::Fail("misses a store");
}

// A: acquire; a: acquire before a deadline; R: release.
void CallSemaphore(char call) {
    FutexSemaphore<System> semaphore(0);
    if (call == 'R') {
        WriteBeforeRelease();
        semaphore.Release();
    } else if (semaphore.Acquire(call == 'a' ? &kSoon : nullptr)) {
        ReadAfterAcquire();
    }
}

TEST(FutexModel, SemaphoreLosesNoUnitAndNoWakeUp) {
    explorer.kill = Kill;
    explorer.deliver = Deliver;
    explorer.call = CallSemaphore;
    const auto has_units = [](const State& state) {
        return (state.words[kWord] & FutexSemaphore<System>::kMost) != 0;
    };
    EXPECT_EQ(Explore(kLock, has_units, {"AR", "A", "RR"}), "");
    EXPECT_EQ(Explore(kLock, has_units, {"A", "a", "RR"}), "");
    EXPECT_EQ(Explore(kLock, has_units, {"AR", "A", "RR"}, Fault::kForgetsWakeups), "asleep");
    EXPECT_EQ(Explore(kLock, has_units, {"AR", "A", "RR"}, Fault::kReleasesRelaxed), "misses a store");
}

struct SimpleLock {
    void Acquire() const {
        Change(kLock, [](Value old) {
            if (old != 0) Explorer::Block();
            return Take(old, 1);
        });
    }
    void Release() const { Set(kLock, 0); }
};

// W: wait for an item and take it; +: add an item; s: signal; b: broadcast.
void CallCondition(char call) {
    FutexCondition<System> condition;
    if (call == 's') return condition.Signal();
    if (call == 'b') return condition.Broadcast();
    const SimpleLock lock;
    lock.Acquire();
    while (call == 'W' && Get(kItems) == 0) condition.Wait(lock, nullptr);
    Add(kItems, call == 'W' ? -1 : 1);
    lock.Release();
}

// The third thread signals. Killed before it has changed the word that it read first, it has signalled
// nothing.
bool KillOutsideStartOfSignal(State& state, std::size_t thread) {
    const std::vector<Value>& steps = state.threads[2].log;
    const bool has_changed_word = steps.size() > 2 && state.words[kWord] != steps[0];
    return (thread != 2 || has_changed_word) && Kill(state, thread);
}

TEST(FutexModel, ConditionLosesNoWakeUp) {
    explorer.kill = KillOutsideStartOfSignal;
    explorer.deliver = Deliver;
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
