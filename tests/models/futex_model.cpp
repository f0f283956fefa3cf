// Lock, semaphore and condition as they are shipped, on words, sleepers and restartable stores of the
// explorer; one thread may be ended at any step.
#include <gtest/gtest.h>

#include <algorithm>
#include <exception>

#include "models/explorer.h"
#include "platform/posix/futex_condition.h"
#include "platform/posix/futex_lock.h"
#include "platform/posix/futex_semaphore.h"

namespace {

using model::Explorer;
using model::kThreads;
using model::State;
using model::Value;

// The words of what is tested come first. Then: a lock for the condition, the last thread that changed a word
// from 0, whether a thread was ended, and a count. Then for each thread: the place that it sleeps on, its
// debts (a word, a condition, what it saw there) and the word that it is about to store to, all plus 1.
enum Place : std::size_t {
    kLock = 2,
    kTaker,
    kEnded,
    kCount,
    kItems,
    kSleeps,
    kDebt = kSleeps + kThreads,
    kSignalDebt = kDebt + kThreads,
    kSeen = kSignalDebt + kThreads,
    kStores = kSeen + kThreads
};
enum class Fault { kNone, kUnbrokenStores, kForgottenDebts, kForgottenSignalDebts };

Explorer* running = nullptr;
Fault fault = Fault::kNone;
std::size_t next_place = 0;

template <class Rule>
Value Change(std::size_t place, Rule rule) {
    return running->Step([&](State& state) {
        const Value old = state.words[place];
        state.words[place] = rule(old);
        if (old == 0 && state.words[place] != 0 && place <= kLock) state.words[kTaker] = running->Self();
        return old;
    });
}
Value Get(std::size_t place) {
    return Change(place, [](Value value) { return value; });
}
void Add(std::size_t place, int amount) {
    Change(place, [=](Value value) { return value + static_cast<Value>(amount); });
}

template <class Number>
struct WordOf {
    explicit WordOf(Number) {}
    Number load(std::memory_order) const { return As(Get(place)); }
    void store(Number desired, std::memory_order) { exchange(desired, {}); }
    Number exchange(Number desired, std::memory_order) {
        return As(Change(place, [=](Value) { return desired; }));
    }
    Number fetch_or(Number bits, std::memory_order) {
        return As(Change(place, [=](Value value) { return value | bits; }));
    }
    Number fetch_add(Number more, std::memory_order) {
        return As(Change(place, [=](Value value) { return value + more; }));
    }
    bool compare_exchange_strong(Number& expected, Number desired, std::memory_order,
                                 std::memory_order = {}) {
        const Value wanted = expected;
        expected = As(Change(place, [=](Value value) { return value == wanted ? desired : value; }));
        return expected == wanted;
    }
    static Number As(Value value) { return static_cast<Number>(value); }

    std::size_t place = next_place++;
};

// Notes a debt for a scope; a step that ends the run leaves scopes too, which is none of the algorithm's.
template <std::size_t kPlace, Fault kForgotten>
struct Debt {
    template <class Word>
    explicit Debt(const Word& word, unsigned int seen = 0) {
        running->Step([&](State& state) {
            state.words[kSeen + running->Self()] = seen;
            return state.words[kPlace + running->Self()] = fault == kForgotten ? 0 : word.place + 1;
        });
    }
    ~Debt() noexcept(false) {
        if (std::uncaught_exceptions() != 0) return;
        running->Step([](State& state) { return state.words[kPlace + running->Self()] = 0; });
    }
};

struct System {
    using Word = WordOf<unsigned int>;
    struct Owner {  // says something to its own thread only, and no thread here takes the lock twice
        explicit Owner(int) {}
        unsigned long long load(std::memory_order) const { return 0; }
        void store(unsigned long long, std::memory_order) const {}
    };
    using Deadline = const int*;
    using WakeDebt = Debt<kDebt, Fault::kForgottenDebts>;
    using SignalDebt = Debt<kSignalDebt, Fault::kForgottenSignalDebts>;
    static constexpr int kEverySleeper = kThreads;

    template <class Attempt>
    static bool Spin(Attempt) {
        return false;
    }

    static bool SleepWhile(Word& word, unsigned int expected, Deadline deadline) {
        const std::size_t sleeps = kSleeps + running->Self();
        const Value slept = running->Step([&](State& state) {
            if (state.words[word.place] == expected) state.words[sleeps] = word.place + 1;
            return state.words[sleeps];
        });
        if (slept == 0) return true;
        return running->Step([&](State& state) -> Value {
            if (state.words[sleeps] == 0) return true;
            if (deadline == nullptr) Explorer::Block();
            return state.words[sleeps] = 0;
        }) != 0;
    }

    // Any sleeper may be the one that is woken.
    static int WakeSleepers(Word& word, int most) {
        return static_cast<int>(running->Step([&](State& state) {
            std::vector<std::size_t> sleepers;
            for (std::size_t sleeps = kSleeps; sleeps < kSleeps + kThreads; ++sleeps)
                if (state.words[sleeps] == word.place + 1) sleepers.push_back(sleeps);
            if (most == 1 && !sleepers.empty()) sleepers = {sleepers[running->Choose(sleepers.size())]};
            for (const std::size_t sleeps : sleepers) state.words[sleeps] = 0;
            return sleepers.size();
        }));
    }

    static bool StoreIfStill(Word& word, unsigned int expected, unsigned int desired) {
        const std::size_t stores = kStores + running->Self();
        const Value same = running->Step(
            [&](State& state) { return state.words[stores] = state.words[word.place] == expected; });
        if (same == 0) return false;
        return running->Step([&](State& state) {
            if (state.words[stores] == 0) return Value{0};
            state.words[word.place] = desired;
            state.words[stores] = 0;
            return Value{1};
        }) != 0;
    }

    static void BreakStores() {
        running->Step([&](State& state) {
            for (std::size_t thread = 0; thread < kThreads; ++thread)
                if (fault != Fault::kUnbrokenStores) state.words[kStores + thread] = 0;
            return Value{0};
        });
    }
};

void WakeFirst(State& state, Value place, std::size_t most) {
    for (std::size_t sleeps = kSleeps; sleeps < kSleeps + kThreads && most > 0; ++sleeps) {
        if (state.words[sleeps] != place) continue;
        state.words[sleeps] = 0;
        --most;
    }
}

// Ends a thread, which passes on what it owes.
bool End(State& state, std::size_t thread) {
    if (state.words[kEnded] != 0) return false;
    state.words[kEnded] = state.threads[thread].dead = true;
    state.words[kSleeps + thread] = 0;
    const Value debt = state.words[kDebt + thread];
    if (debt != 0) {
        std::fill_n(&state.words[kStores], kThreads, 0);
        WakeFirst(state, debt, kThreads);
    }
    const Value condition = state.words[kSignalDebt + thread];
    if (condition != 0 && state.words[condition - 1] != state.words[kSeen + thread])
        WakeFirst(state, condition, 1);
    return true;
}

// A call; what it is a call of is made anew each time, at the first places.
template <class Body>
Explorer::Call Call(Body body) {
    return [=] {
        next_place = 0;
        body();
    };
}

// The lock of the condition's callers: a step each.
struct SimpleLock {
    void Take() const {
        Change(kLock, [](Value value) {
            if (value != 0) Explorer::Block();
            return Value{1};
        });
    }
    void Give() const {
        Change(kLock, [](Value) { return Value{0}; });
    }
};

class FutexModel : public testing::Test {
protected:
    FutexModel() {
        running = &mExplorer;
        fault = Fault::kNone;
        mExplorer.move = End;
    }

    // In the end nobody may wait, unless `lock` is held by a thread that was ended or `in_vain` says that
    // there is nothing to be had.
    void CheckEnd(std::size_t lock, bool (*in_vain)(const State&)) {
        mExplorer.check = [=](const State& state, bool at_the_end) -> const char* {
            if (state.words[kCount] > 1) return "two owners";
            if (!at_the_end || !in_vain(state)) return nullptr;
            if (state.words[lock] != 0 && state.threads[state.words[kTaker]].dead) return nullptr;
            for (std::size_t thread = 0; thread < kThreads; ++thread)
                if (!state.threads[thread].dead &&
                    state.threads[thread].call != mExplorer.calls[thread].size())
                    return "asleep";
            return nullptr;
        };
    }

    // No order of steps goes wrong, but for each of the faults one does.
    void ExpectWhole(const State& start, std::initializer_list<Fault> seeded) {
        EXPECT_EQ(mExplorer.Explore(start), "");
        for (const Fault each : seeded) {
            fault = each;
            EXPECT_EQ(mExplorer.Explore(start), "asleep");
        }
        fault = Fault::kNone;
    }

    Explorer mExplorer;
};

TEST_F(FutexModel, LockIsWhole) {
    const auto take = Call([] {
        FutexLock<System> lock;
        lock.Take(1);
        ++running->Now().words[kCount];
    });
    const auto give = Call([] {
        FutexLock<System> lock;
        Add(kCount, -1);
        lock.Give();
    });
    mExplorer.calls = {{{take, give, take, give}, {take, give}, {take, give}}};
    CheckEnd(0, [](const State&) { return true; });
    ExpectWhole({}, {Fault::kUnbrokenStores, Fault::kForgottenDebts});
}

TEST_F(FutexModel, SemaphoreIsWhole) {
    const auto take = Call([] { FutexSemaphore<System>(0).Take(nullptr); });
    const auto try_take = Call([] {
        const int deadline = 0;
        FutexSemaphore<System>(0).Take(&deadline);
    });
    const auto give = Call([] { FutexSemaphore<System>(0).Give(); });
    CheckEnd(kLock, [](const State& state) { return (state.words[0] & FutexSemaphore<System>::kMost) != 0; });
    mExplorer.calls = {{{take, give}, {take}, {give, give}}};
    ExpectWhole({}, {Fault::kForgottenDebts});
    mExplorer.calls = {{{take}, {try_take}, {give, give}}};
    ExpectWhole({}, {});
}

TEST_F(FutexModel, ConditionIsWhole) {
    const auto wait = Call([] {
        FutexCondition<System> condition;
        const SimpleLock lock;
        lock.Take();
        while (Get(kItems) == 0) condition.Sleep(lock, nullptr);
        Add(kItems, -1);
        lock.Give();
    });
    const auto add = Call([] {
        const SimpleLock lock;
        lock.Take();
        Add(kItems, 1);
        lock.Give();
    });
    const auto wake_one = Call([] { FutexCondition<System>().WakeOne(); });
    const auto wake_all = Call([] { FutexCondition<System>().WakeAll(); });
    // The third thread wakes the others. Before it has changed the word that it read first it owes nothing.
    mExplorer.move = [](State& state, std::size_t thread) {
        const std::vector<Value>& log = state.threads[2].log;
        const bool wakes = log.size() > 2 && state.words[0] != log[0];
        return (thread != 2 || wakes) && End(state, thread);
    };
    CheckEnd(kLock, [](const State& state) { return state.words[kItems] != 0; });
    mExplorer.calls = {{{wait}, {wait}, {add, wake_one, add, wake_one}}};
    ExpectWhole({}, {Fault::kForgottenDebts});
    mExplorer.calls = {{{wait}, {wait}, {add, wake_one}}};
    ExpectWhole({}, {Fault::kForgottenSignalDebts});
    mExplorer.calls = {{{wait}, {wait}, {add, add, wake_all}}};
    ExpectWhole({}, {Fault::kForgottenDebts});
}

}  // namespace
