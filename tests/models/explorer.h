// Runs three threads of an algorithm under every order of their steps. Steps are sequentially consistent;
// memory_model.cpp runs the same algorithms under the memory model of C++.
//
// A thread makes the calls of its script, and each access to shared data is a step. To make the next step, the call
// runs again from its start. It gets the recorded results of its earlier steps, makes the new step, and is left by an
// exception before the step after that. So a state is plain data, and each state is explored once.
#ifndef ZANBASE_TESTS_EXPLORER_H
#define ZANBASE_TESTS_EXPLORER_H

#include <array>
#include <functional>
#include <string>
#include <unordered_set>
#include <utility>
#include <vector>

constexpr std::size_t kThreads = 3;
using Value = unsigned long long;

struct State {
    std::array<Value, 22> words{};  // the shared data, and what a model notes beside it
    struct Thread {
        std::size_t call = 0;    // its place in the script
        std::vector<Value> log;  // results of the steps of this call
        bool dead = false;
    };
    std::array<Thread, kThreads> threads;
};

class Explorer {
public:
    std::array<std::string, kThreads> scripts;  // a letter each call
    std::function<void(char)> call;
    std::function<const char*(const State&, bool at_the_end)> check;  // what is wrong, or null
    // Kills a thread; false if that is not possible in this state. May be unset.
    std::function<bool(State&, std::size_t thread)> kill;

    // What is wrong in some order of steps; empty if nothing is.
    std::string Explore(const State& start) {
        std::unordered_set<Value> seen;
        std::vector<State> due{start};
        const auto meet = [&](const State& state) {
            if (seen.insert(Digest(state)).second) due.push_back(state);
        };
        for (mFound = nullptr; mFound == nullptr && !due.empty();) {
            const State state = std::move(due.back());
            due.pop_back();
            bool at_the_end = true;
            for (std::size_t thread = 0; thread < kThreads; ++thread) {
                if (IsDone(state, thread) || state.threads[thread].dead) continue;
                mChoices = 1;
                for (mChoice = 0; mChoice < mChoices && Run(state, thread); ++mChoice) {
                    at_the_end = false;
                    meet(now);
                }
                State killed = state;
                if (kill && kill(killed, thread)) meet(killed);
            }
            if (mFound == nullptr) mFound = check(state, at_the_end);
        }
        return mFound != nullptr ? mFound : "";
    }

    bool IsDone(const State& state, std::size_t thread) const {
        return state.threads[thread].call == scripts[thread].size();
    }

    // For the running call. A step: `body` changes the state and gives the result.
    template <class Body>
    Value Step(Body body) {
        std::vector<Value>& log = now.threads[self].log;
        if (mPlayed == log.size()) {
            if (std::exchange(mStepped, true)) throw Pause{};
            log.push_back(body(now));
        }
        return log[mPlayed++];
    }
    // In a step: a number below `count`, each of which is tried.
    std::size_t Choose(std::size_t count) {
        mChoices = count;
        return mChoice;
    }
    // In a step: the thread can't make it now.
    [[noreturn]] static void Block() { throw Pause{}; }

    State now;
    std::size_t self = 0;

private:
    struct Pause {};

    // Makes the thread's next step from `state`. False if it can't.
    bool Run(const State& state, std::size_t thread) {
        now = state;
        self = thread;
        mPlayed = 0;
        mStepped = false;
        State::Thread& mine = now.threads[thread];
        try {
            call(scripts[thread][mine.call]);
            ++mine.call;
            mine.log.clear();
        } catch (const Pause&) {
            return mine.log.size() > state.threads[thread].log.size();
        }
        return true;
    }

    // A hash of the state. Of a million states, two have the same hash with a probability of about 10^-7.
    static Value Digest(const State& state) {
        Value digest = 0;
        const auto add = [&](Value value) {
            digest = (digest ^ value) * 0x9E3779B97F4A7C15U;
            digest ^= digest >> 29;
        };
        for (const Value word : state.words) add(word);
        for (const State::Thread& thread : state.threads) {
            add(thread.call * 2 + (thread.dead ? 1 : 0));
            add(thread.log.size());
            for (const Value value : thread.log) add(value);
        }
        return digest;
    }

    std::size_t mPlayed = 0, mChoice = 0, mChoices = 1;
    bool mStepped = false;
    const char* mFound = nullptr;
};

// The only explorer, and steps on one of its words.
inline Explorer explorer;

template <class Rule>
Value Change(std::size_t place, Rule rule) {  // the result is the old value
    return explorer.Step([&](State& state) {
        const Value old = state.words[place];
        state.words[place] = rule(old);
        return old;
    });
}
inline Value Get(std::size_t place) {
    return Change(place, [](Value value) { return value; });
}
inline Value Set(std::size_t place, Value value) {
    return Change(place, [=](Value) { return value; });
}
inline Value Add(std::size_t place, int amount) {
    return Change(place, [=](Value value) { return value + static_cast<Value>(amount); });
}

#endif
