// The condition variable beside the standard library's for any lock, both with a re-entrant mutex: two
// threads that pass the turn back and forth, and a signal without a waiter.
#include "zanbase/condition_variable.h"

#include <benchmark/benchmark.h>

#include <condition_variable>
#include <mutex>
#include <thread>

#include "placement.h"
#include "ratios.h"

namespace {

struct Ours {
    void Lock() { moMutex.Lock(); }
    void Unlock() { moMutex.Unlock(); }
    void Wait() { moChanged.Wait(moMutex); }
    void Signal() { moChanged.Signal(); }

private:
    HMutex moMutex;
    HCondVar moChanged;
};

struct Standard {
    void Lock() { moMutex.lock(); }
    void Unlock() { moMutex.unlock(); }
    void Wait() { moChanged.wait(moMutex); }
    void Signal() { moChanged.notify_one(); }

private:
    std::recursive_mutex moMutex;
    std::condition_variable_any moChanged;
};

enum Turn { kMain, kPeer, kEnd };

template <class Pair>
void ConditionPingPong(benchmark::State& state) {
    const OneProcessor one_processor;
    Pair pair;
    Turn turn = kMain;  // guarded by the pair's mutex
    const auto pass_to = [&](Turn next, Turn own) {
        turn = next;
        pair.Signal();
        while (turn != own && turn != kEnd) pair.Wait();
    };
    std::thread peer([&] {
        pair.Lock();
        while (turn == kMain) pair.Wait();
        while (turn != kEnd) pass_to(kMain, kPeer);
        pair.Unlock();
    });
    pair.Lock();
    for (auto _ : state) pass_to(kPeer, kMain);
    turn = kEnd;
    pair.Signal();
    pair.Unlock();
    peer.join();
}
BENCHMARK_TEMPLATE(ConditionPingPong, Ours)->UseRealTime();
BENCHMARK_TEMPLATE(ConditionPingPong, Standard)->UseRealTime();

template <class Pair>
void SignalWithoutWaiter(benchmark::State& state) {
    Pair pair;
    for (auto _ : state) pair.Signal();
}
BENCHMARK_TEMPLATE(SignalWithoutWaiter, Ours);
BENCHMARK_TEMPLATE(SignalWithoutWaiter, Standard);

const bool rows =
    AddRatio("ConditionPingPong<Ours>/real_time", "ConditionPingPong<Standard>/real_time", 1.0) &&
    AddRatio("SignalWithoutWaiter<Ours>", "SignalWithoutWaiter<Standard>", 0);

}  // namespace
