// Lock, semaphore and condition as they are shipped, on words, sleepers and restartable stores of the
// explorer; once, at any step, a thread may be ended or the breaking of stores may fail.
#include <gtest/gtest.h>

#include <algorithm>
#include <exception>
#include <utility>

#include "models/explorer.h"
#include "platform/linux/futex_condition.h"
#include "platform/linux/futex_lock.h"
#include "platform/linux/futex_semaphore.h"

namespace {

// The word of what is tested; a lock beside a condition; whether the one mishap has been; how many own the
// lock; items to wait for; who changed a word last from 0. Then for each thread the word that it sleeps on, its
// debts (a word, a condition, what it saw there) and the word that it is about to store to, all plus 1.
constexpr std::size_t kWord = 0, kLock = 1, kMishap = 2, kOwners = 3, kItems = 4, kTaker = 5, kSleeps = 6,
                      kDebt = kSleeps + kThreads, kSignalDebt = kDebt + kThreads,
                      kSeen = kSignalDebt + kThreads, kStores = kSeen + kThreads;
enum class Fault { kNone, kUnbrokenStores, kForgottenDebts, kForgottenSignalDebts };

Fault fault = Fault::kNone;
constexpr int kSoon = 0;  // a deadline, which may pass at any time

// Notes who has last changed a word from 0.
Value Becomes(Value old, Value value) {
    if (old == 0 && value != 0) explorer.now.words[kTaker] = explorer.self;
    return value;
}

struct Word {
    explicit Word(unsigned int) {}  // the state starts with it
    unsigned int load(std::memory_order) const { return As(Get(kWord)); }
    unsigned int exchange(unsigned int desired, std::memory_order) {
        return As(Change(kWord, [=](Value old) { return Becomes(old, desired); }));
    }
    unsigned int fetch_add(unsigned int more, std::memory_order) {
        return As(Add(kWord, static_cast<int>(more)));
    }
    unsigned int fetch_or(unsigned int bits, std::memory_order) {
        return As(Change(kWord, [=](Value value) { return value | bits; }));
    }
    bool compare_exchange_strong(unsigned int& expected, unsigned int desired, std::memory_order,
                                 std::memory_order = {}) {
        const unsigned int wanted = expected;
        expected = As(Change(kWord, [=](Value old) { return old == wanted ? Becomes(old, desired) : old; }));
        return expected == wanted;
    }
    static unsigned int As(Value value) { return static_cast<unsigned int>(value); }
};

struct Owner {  // says something to its own thread only, and no thread here takes the lock twice
    explicit Owner(int) {}
    unsigned long long load(std::memory_order) const { return 0; }
    void store(unsigned long long, std::memory_order) const {}
};

template <std::size_t kPlace, Fault kForgotten>
struct Debt {
    explicit Debt(const Word&, unsigned int seen = 0) {
        explorer.Step([&](State& state) {
            state.words[kSeen + explorer.self] = seen;
            return state.words[kPlace + explorer.self] = fault == kForgotten ? 0 : kWord + 1;
        });
    }
    ~Debt() noexcept(false) {  // a step that ends the run leaves scopes too, which is none of the algorithm's
        if (std::uncaught_exceptions() == 0) Set(kPlace + explorer.self, 0);
    }
};

struct System {
    using Word = ::Word;
    using Owner = ::Owner;
    using Deadline = const int*;
    using PendingWakeup = Debt<kDebt, Fault::kForgottenDebts>;
    using PendingSignal = Debt<kSignalDebt, Fault::kForgottenSignalDebts>;
    static constexpr int kEverySleeper = kThreads;

    template <class Attempt>
    static bool Spin(Attempt) {
        return false;
    }

    static bool IsAlone() { return false; }
    static void StoreAlone(Word&, unsigned int) {}

    static bool SleepWhile(Word&, unsigned int expected, Deadline deadline) {
        const std::size_t sleeps = kSleeps + explorer.self;
        const Value slept = explorer.Step([&](State& state) {
            return state.words[sleeps] = state.words[kWord] == expected ? kWord + 1 : 0;
        });
        if (slept == 0) return true;
        return Change(sleeps, [&](Value asleep) {
                   if (asleep != 0 && deadline == nullptr) Explorer::Block();
                   return Value{0};
               }) == 0;
    }

    static int WakeSleepers(Word&, int most) {  // any sleeper may be the one
        return static_cast<int>(explorer.Step([&](State& state) {
            std::vector<std::size_t> sleepers;
            for (std::size_t place = kSleeps; place < kSleeps + kThreads; ++place)
                if (state.words[place] != 0) sleepers.push_back(place);
            if (most == 1 && !sleepers.empty()) sleepers = {sleepers[explorer.Choose(sleepers.size())]};
            for (const std::size_t place : sleepers) state.words[place] = 0;
            return sleepers.size();
        }));
    }

    static bool StoreIfStill(Word&, unsigned int expected, unsigned int desired) {
        if (explorer.Step([&](State& state) {
                return state.words[kStores + explorer.self] = state.words[kWord] == expected ? 1 : 0;
            }) == 0)
            return false;
        return explorer.Step([&](State& state) {
            if (state.words[kStores + explorer.self] != 0) state.words[kWord] = desired;
            return std::exchange(state.words[kStores + explorer.self], 0);
        }) != 0;
    }

    static bool BreakStores() {
        return explorer.Step([](State& state) {
            if (state.words[kMishap] == 0 && explorer.Choose(2) != 0) {
                state.words[kMishap] = 1;
                return Value{0};
            }
            if (fault != Fault::kUnbrokenStores) std::fill_n(&state.words[kStores], kThreads, 0);
            return Value{1};
        }) != 0;
    }

    static void SleepShortly(Word& word, unsigned int expected) { SleepWhile(word, expected, &kSoon); }
};

// Ends a thread, which passes on what it owes as ForwardPendingWakeups does.
bool Kill(State& state, std::size_t thread) {
    if (state.words[kMishap] != 0) return false;
    state.words[kMishap] = state.threads[thread].dead = true;
    Value* const sleeps = &state.words[kSleeps];
    sleeps[thread] = 0;
    if (state.words[kDebt + thread] != 0) {
        std::fill_n(&state.words[kStores], kThreads, 0);
        std::fill_n(sleeps, kThreads, 0);
    }
    Value* const first = std::find(sleeps, sleeps + kThreads, kWord + 1);
    const bool signalled =
        state.words[kSignalDebt + thread] != 0 && state.words[kWord] != state.words[kSeen + thread];
    if (signalled && first != sleeps + kThreads) *first = 0;
    return true;
}

// No order of steps goes wrong, but one does with each of the faults. In the end a thread may wait only
// where `is_free` says that there is nothing to be had, or for a lock at `lock` that a thread held when it
// was ended.
void Explore(std::size_t lock, bool (*is_free)(const State&), std::array<std::string, kThreads> scripts,
             std::initializer_list<Fault> seeded) {
    explorer.scripts = std::move(scripts);
    explorer.check = [=](const State& state, bool at_the_end) -> const char* {
        if (state.words[kOwners] > 1) return "two owners";
        if (!at_the_end || !is_free(state)) return nullptr;
        if (state.words[lock] != 0 && state.threads[state.words[kTaker]].dead) return nullptr;
        for (std::size_t thread = 0; thread < kThreads; ++thread)
            if (!state.threads[thread].dead && !explorer.IsDone(state, thread)) return "asleep";
        return nullptr;
    };
    fault = Fault::kNone;
    EXPECT_EQ(explorer.Explore({}), "");
    for (const Fault each : seeded) {
        fault = each;
        EXPECT_EQ(explorer.Explore({}), "asleep");
    }
}

TEST(FutexModel, LockIsWhole) {
    explorer.kill = Kill;
    explorer.call = [](char call) {
        FutexLock<System> lock;
        if (call == 'R') {
            Add(kOwners, -1);
            return lock.Give();
        }
        lock.Take(1);
        ++explorer.now.words[kOwners];
    };
    const auto always = [](const State&) { return true; };
    Explore(kWord, always, {"TRTR", "TR", "TR"}, {Fault::kUnbrokenStores, Fault::kForgottenDebts});
}

TEST(FutexModel, SemaphoreIsWhole) {
    explorer.kill = Kill;
    explorer.call = [](char call) {
        FutexSemaphore<System> semaphore(0);
        if (call == 'G') return semaphore.Give();
        semaphore.Take(call == 't' ? &kSoon : nullptr);
    };
    const auto has_units = [](const State& state) {
        return (state.words[kWord] & FutexSemaphore<System>::kMost) != 0;
    };
    Explore(kLock, has_units, {"TG", "T", "GG"}, {Fault::kForgottenDebts});
    Explore(kLock, has_units, {"T", "t", "GG"}, {});
}

struct SimpleLock {
    void Take() const {
        Change(kLock, [](Value old) {
            if (old != 0) Explorer::Block();
            return Becomes(old, 1);
        });
    }
    void Give() const { Set(kLock, 0); }
};

TEST(FutexModel, ConditionIsWhole) {
    // Wait for one and take it, add one, wake one, wake all.
    explorer.call = [](char call) {
        FutexCondition<System> condition;
        if (call == 'o') return condition.Signal();
        if (call == 'a') return condition.Broadcast();
        const SimpleLock lock;
        lock.Take();
        while (call == 'W' && Get(kItems) == 0) condition.Sleep(lock, nullptr);
        Add(kItems, call == 'W' ? -1 : 1);
        lock.Give();
    };
    // The third thread wakes the others. Before it has changed the word that it read first it owes nothing.
    explorer.kill = [](State& state, std::size_t thread) {
        const std::vector<Value>& log = state.threads[2].log;
        const bool wakes = log.size() > 2 && state.words[kWord] != log[0];
        return (thread != 2 || wakes) && Kill(state, thread);
    };
    const auto has_items = [](const State& state) { return state.words[kItems] != 0; };
    Explore(kLock, has_items, {"W", "W", "+o+o"}, {Fault::kForgottenDebts});
    Explore(kLock, has_items, {"W", "W", "+o"}, {Fault::kForgottenSignalDebts});
    Explore(kLock, has_items, {"W", "W", "++a"}, {Fault::kForgottenDebts});
}

}  // namespace
