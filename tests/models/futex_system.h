// The system under the futex algorithms as the explorer sees it: one word, the kernel's sleepers, pending wake-ups and
// one kill. A thread may be killed at any of its steps.
#ifndef ZANBASE_TESTS_FUTEX_SYSTEM_H
#define ZANBASE_TESTS_FUTEX_SYSTEM_H

#include <algorithm>
#include <atomic>
#include <exception>
#include <utility>

#include "models/explorer.h"

// Places in State::words. Those from kAsleep on exist once for each thread, the others once.
constexpr std::size_t kWord = 0;       // the word under test
constexpr std::size_t kLock = 1;       // the simple lock beside a condition; the owner as in FutexLock
constexpr std::size_t kHasKilled = 2;  // 1 after the one kill
constexpr std::size_t kItems = 3;      // what the waiters on a condition wait for
constexpr std::size_t kAsleep = 4;     // 1: the thread sleeps on kWord
constexpr std::size_t kPendingWakeup = kAsleep + kThreads;         // 1: noted on a lock or semaphore
constexpr std::size_t kPendingSignal = kPendingWakeup + kThreads;  // 1: noted on a condition
constexpr std::size_t kSeen = kPendingSignal + kThreads;  // the condition's word at the start of the wait

enum class Fault { kNone, kForgetsWakeups, kForgetsSignals };

inline Fault fault = Fault::kNone;  // the mistake that the modelled system makes

// The memory orders are of no effect here.
template <class Number>
struct ModelWord {
    explicit ModelWord(Number) {}  // the explorer's start state has the value
    Number load(std::memory_order) const { return static_cast<Number>(Get(kWord)); }
    void store(Number desired, std::memory_order) { Set(kWord, desired); }
    Number fetch_add(Number more, std::memory_order) {
        return ChangeWord([=](Value old) { return old + more; });
    }
    Number fetch_or(Number bits, std::memory_order) {
        return ChangeWord([=](Value old) { return old | bits; });
    }
    bool compare_exchange_strong(Number& expected, Number desired, std::memory_order,
                                 std::memory_order = {}) {
        const Number wanted = expected;
        expected = ChangeWord([=](Value old) { return old == wanted ? desired : old; });
        return expected == wanted;
    }

private:
    template <class Rule>
    static Number ChangeWord(Rule rule) {
        return static_cast<Number>(Change(kWord, [=](Value old) { return static_cast<Number>(rule(old)); }));
    }
};

template <std::size_t kPlace, Fault kForgets>
struct Pending {
    template <class Word>
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

struct ModelSystem {
    using Word = ModelWord<unsigned int>;
    using DoubleWord = ModelWord<unsigned long long>;
    using Deadline = const int*;
    using ForwardWakeupIfKilled = Pending<kPendingWakeup, Fault::kForgetsWakeups>;
    using ForwardSignalIfKilled = Pending<kPendingSignal, Fault::kForgetsSignals>;
    static constexpr int kEverySleeper = kThreads;

    static bool IsAlone() { return false; }
    static DoubleWord& LowerHalf(DoubleWord& word) { return word; }

    // Two steps: fall asleep if the word is as expected; continue once woken or at the deadline.
    template <class AnyWord>
    static bool SleepWhile(AnyWord&, unsigned int expected, Deadline deadline) {
        const std::size_t asleep = kAsleep + explorer.self;
        const Value slept = explorer.Step(
            [&](State& state) { return state.words[asleep] = state.words[kWord] == expected ? 1 : 0; });
        if (slept == 0) return true;
        const Value still_asleep = Change(asleep, [&](Value value) {
            if (value != 0 && deadline == nullptr) Explorer::Block();
            return Value{0};
        });
        return still_asleep == 0;
    }

    // Any sleeper may be the one that is woken.
    template <class AnyWord>
    static int WakeSleepers(AnyWord&, int most) {
        return static_cast<int>(explorer.Step([&](State& state) {
            std::vector<std::size_t> sleepers;
            for (std::size_t place = kAsleep; place < kAsleep + kThreads; ++place)
                if (state.words[place] != 0) sleepers.push_back(place);
            if (most == 1 && !sleepers.empty()) sleepers = {sleepers[explorer.Choose(sleepers.size())]};
            for (const std::size_t place : sleepers) state.words[place] = 0;
            return sleepers.size();
        }));
    }
};

// Kills a thread, once. Its pending wake-ups are forwarded as ForwardPendingWakeups does. False if a thread was killed
// already.
inline bool Kill(State& state, std::size_t thread) {
    if (state.words[kHasKilled] != 0) return false;
    state.words[kHasKilled] = 1;
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

#endif
