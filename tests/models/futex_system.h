// The system under the futex algorithms as the explorer sees it: one futex word, the kernel's sleepers, pending wake-ups
// and one kill. A thread may be killed at any of its steps.
//
// Memory order. Stores may be delayed, as a processor with a weak memory order does it. A store to the futex word or to
// the guarded word first waits in a place of its thread. It reaches the other threads at any later time, in any order.
// - An operation with release order, and a system call, first make the thread's store to the guarded word visible.
// - A read-modify-write changes the word itself, after the thread's own store to it.
// - Loads are made in program order.
#ifndef ZANBASE_TESTS_FUTEX_SYSTEM_H
#define ZANBASE_TESTS_FUTEX_SYSTEM_H

#include <algorithm>
#include <atomic>
#include <exception>
#include <utility>

#include "models/explorer.h"

// Places in State::words. Those from kAsleep to kDelayedGuarded exist once for each thread, the others once.
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

inline Fault fault = Fault::kNone;  // the mistake that the modelled system makes

// The value that a word changes to. Notes the thread that changes it from 0.
inline Value Take(Value old, Value desired) {
    if (old == 0 && desired != 0) explorer.now.words[kLastTaker] = explorer.self;
    return desired;
}

inline unsigned int As32Bits(Value value) { return static_cast<unsigned int>(value); }

// Makes the delayed store with number `store`: first each thread's to kWord, then each thread's to kGuarded. False if
// there is none.
inline bool Deliver(State& state, std::size_t store) {
    const Value delayed = std::exchange(state.words[kDelayedWord + store], 0);
    if (delayed != 0) state.words[store < kThreads ? kWord : kGuarded] = delayed - 1;
    return delayed != 0;
}

// Makes the running thread's delayed store to kWord, and the one to kGuarded if `order` releases it.
inline void DeliverBefore(State& state, std::memory_order order) {
    const bool releases = order != std::memory_order_relaxed && order != std::memory_order_acquire;
    if (releases && fault != Fault::kReleasesRelaxed) Deliver(state, kThreads + explorer.self);
    Deliver(state, explorer.self);
}

// Changes the futex word by a read-modify-write.
template <class Rule>
unsigned int ChangeWord(std::memory_order order, Rule rule) {
    return As32Bits(explorer.Step([&](State& state) {
        DeliverBefore(state, order);
        return std::exchange(state.words[kWord], rule(state.words[kWord]));
    }));
}

// Writes the guarded word under the lock. Fails if an earlier write is not visible.
inline void WriteGuarded() {
    explorer.Step([](State& state) {
        Deliver(state, kThreads + explorer.self);
        if (state.words[kGuarded] != state.words[kWrites]) Explorer::Fail("misses a store");
        return state.words[kDelayedGuarded + explorer.self] = ++state.words[kWrites] + 1;
    });
}

struct ModelWord {
    explicit ModelWord(unsigned int) {}  // the explorer's start state has the value
    unsigned int load(std::memory_order) const {
        return As32Bits(explorer.Step([](State& state) {
            const Value mine = state.words[kDelayedWord + explorer.self];
            return mine != 0 ? mine - 1 : state.words[kWord];
        }));
    }
    void store(unsigned int desired, std::memory_order order) {
        explorer.Step([&](State& state) {
            DeliverBefore(state, order);
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
struct ModelOwner {
    explicit ModelOwner(int) {}
    unsigned long long load(std::memory_order) const { return 0; }
    void store(unsigned long long, std::memory_order) const {}
};

template <std::size_t kPlace, Fault kForgets>
struct Pending {
    explicit Pending(const ModelWord&, unsigned int seen = 0) {
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
inline void EnterKernel(State& state) { DeliverBefore(state, std::memory_order_seq_cst); }

struct ModelSystem {
    using Word = ModelWord;
    using Owner = ModelOwner;
    using Deadline = const int*;
    using PendingWakeup = Pending<kPendingWakeup, Fault::kForgetsWakeups>;
    using PendingSignal = Pending<kPendingSignal, Fault::kForgetsSignals>;
    static constexpr int kEverySleeper = kThreads;

    static bool IsAlone() { return false; }

    // Two steps: fall asleep if the word is as expected; continue once woken or at the deadline.
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

// Kills a thread, once. Its pending wake-ups are forwarded as ForwardPendingWakeups does. The signal that ends it is a
// barrier: its stores are made before. False if a thread was killed already.
inline bool Kill(State& state, std::size_t thread) {
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

#endif
