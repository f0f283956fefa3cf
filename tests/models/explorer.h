// Runs up to three threads of an algorithm under every order of their steps.
//
// A thread is a list of calls, and each access to something shared is a step. A step is made by running the
// call again from its start, with the results of its earlier steps played back, and leaving it by an
// exception after the new one. So a state is plain data, and a state met before isn't gone through again.
#ifndef ZANBASE_TESTS_EXPLORER_H
#define ZANBASE_TESTS_EXPLORER_H

#include <array>
#include <cstddef>
#include <functional>
#include <string>
#include <unordered_set>
#include <vector>

namespace model {

constexpr std::size_t kThreads = 3;
using Value = unsigned long long;

struct State {
    std::array<Value, 24> words{};  // all that is shared, and what a model notes beside it
    struct Thread {
        std::size_t call = 0;    // its place in the list
        std::vector<Value> log;  // results of the steps of this call
        bool dead = false;
    };
    std::array<Thread, kThreads> threads;
};

class Explorer {
public:
    using Call = std::function<void()>;
    using Check = std::function<const char*(const State&, bool at_the_end)>;  // what is wrong, or null
    using Move = std::function<bool(State&, std::size_t thread)>;  // not by the thread; false: can't

    std::array<std::vector<Call>, kThreads> calls;
    Check check;
    Move move;  // may be empty

    // What is wrong in some order of steps; empty if nothing is.
    std::string Explore(const State& start) {
        mFound.clear();
        mSeen.clear();
        Visit(start);
        return mFound;
    }

    std::size_t Self() const { return mSelf; }

    // One step of the running thread: `body` changes the state and gives the result. Where it has a choice it
    // asks Choose().
    template <class Body>
    Value Step(Body body) {
        std::vector<Value>& log = mState.threads[mSelf].log;
        if (mPlayed == log.size()) {
            if (mStepped) throw Pause{};
            mStepped = true;
            log.push_back(body(mState));
        }
        return log[mPlayed++];
    }
    State& Now() { return mState; }

    // A number below `count`; every one of them is tried.
    std::size_t Choose(std::size_t count) {
        mChoices = count;
        return mChoice;
    }

    // Ends the step as one that the thread can't make now.
    [[noreturn]] static void Block() { throw Blocked{}; }
    [[noreturn]] static void Fail(const char* what) { throw what; }

private:
    struct Pause {};
    struct Blocked {};

    void Visit(const State& state) {
        if (!mFound.empty() || !mSeen.insert(Digest(state)).second) return;
        if (const char* what = check(state, false)) mFound = what;
        bool moved = false;
        for (std::size_t thread = 0; thread < kThreads && mFound.empty(); ++thread) {
            std::size_t choices = 1;
            for (std::size_t choice = 0; choice < choices; ++choice) {
                if (!Run(state, thread, choice)) break;
                moved = true;
                choices = mChoices;
                Visit(State(mState));
            }
            State next = state;
            if (move && move(next, thread)) Visit(next);
        }
        if (moved || !mFound.empty()) return;
        if (const char* what = check(state, true)) mFound = what;
    }

    // Makes the thread's next step from `state`, into mState. False if there is none.
    bool Run(const State& state, std::size_t thread, std::size_t choice) {
        if (state.threads[thread].dead || state.threads[thread].call == calls[thread].size()) return false;
        mState = state;
        mSelf = thread;
        mPlayed = 0;
        mStepped = false;
        mChoice = choice;
        mChoices = 1;
        try {
            calls[thread][state.threads[thread].call]();
            ++mState.threads[thread].call;
            mState.threads[thread].log.clear();
        } catch (const Pause&) {
        } catch (const Blocked&) {
            return false;
        } catch (const char* what) {
            mFound = what;
        }
        return true;
    }

    // 64 bits stand for a state; two of a million states have the same with a chance of 1 to 10^7.
    static Value Digest(const State& state) {
        Value digest = 1469598103934665603U;
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

    State mState;
    std::size_t mSelf = 0, mPlayed = 0, mChoice = 0, mChoices = 1;
    bool mStepped = false;
    std::unordered_set<Value> mSeen;
    std::string mFound;
};

}  // namespace model

#endif
