// Start, end, restart, kill and faults of threads, and what a thread leaves behind.
#include "zanbase/thread.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <iterator>
#include <stdexcept>
#include <thread>
#include <vector>

#include <pthread.h>
#include <sys/resource.h>

#include "support/blocked_thread.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "support/runner.h"
#include "zanbase/mutex.h"
#include "zanbase/semaphore.h"

extern "C" {
// The list of exit routines of a thread that was killed is lost; the header says so.
const char* __lsan_default_suppressions() { return "leak:__cxa_thread_atexit_impl"; }
__attribute__((weak)) void __tsan_acquire(void*);  // there under the thread sanitizer
bool pthread_create_fails = false;
int __real_pthread_create(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*);
int __wrap_pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*run)(void*),
                          void* argument) {
    return pthread_create_fails ? EAGAIN : __real_pthread_create(thread, attributes, run, argument);
}
}

namespace {

void AwaitIdle(const HThread& thread) {
    while (thread.IsRunning()) std::this_thread::yield();
}

TEST(HThread, IsIdleUntilStarted) {
    Runner runner([] {});
    runner.Stop();
    runner.Wait();
    runner.Kill();
    runner.DestroyThread();
    EXPECT_FALSE(runner.IsRunning());
}

TEST(HThread, RunsOnceAStartWhateverTheArgument) {
    int runs = 0;
    HSemaphore entered(0), leave(0);
    Runner runner([&] {
        ++runs;
        entered.Unlock();
        leave.Lock();
        runner.Wait();  // on itself it returns
    });
    for (const bool argument : {true, false, true}) {
        runs = 0;
        EXPECT_TRUE(runner.Start(argument));
        EXPECT_FALSE(runner.Start(argument));
        entered.Lock();
        EXPECT_FALSE(Runner(runner).IsRunning());
        EXPECT_TRUE((runner = static_cast<const HThread&>(Runner(nullptr))).IsRunning());
        EXPECT_FALSE(runner.Start(!argument));
        leave.Unlock();
        runner.Wait();
        EXPECT_FALSE(runner.IsRunning());
        EXPECT_EQ(runs, 1);
    }
}

TEST(HThread, TellsWhyItCouldNotStart) {
    const ChildResult child = RunInChild([] {
        Runner runner([] { std::printf("ran"); });
        std::printf("HThread::Start(%p) Error: Resource temporarily unavailable\n|",
                    static_cast<void*>(&runner));
        pthread_create_fails = true;
        const bool started = runner.Start(true) || runner.IsRunning();
        pthread_create_fails = false;
        runner.Start(true);
        runner.Wait();
        return started ? 1 : 0;
    });
    const std::string line = child.out.substr(0, child.out.find('|'));
    EXPECT_EQ(child.out, line + "|" + line + "ran");
    EXPECT_EQ(child.exit_code, 0);
}

Runner* current = nullptr;

TEST(HThread, EndsWithTheLineDueAndCanBeStartedAgain) {
    struct End {
        void (*run)();
        std::string line;
    };
    const std::string unknown = "HThread::_Run_() Unknown exception.\n";
    const End ends[] = {
        {[] {}, ""},
        {[] { throw std::runtime_error("bad luck"); }, "HThread::_Run_() Uncaught exception: bad luck\n"},
        {[] { throw 7; }, unknown},
        {WriteToNull, unknown},
        {DivideByZero, unknown},
        {RunIllegalInstruction, unknown},
        {UseUpStack, unknown},
        {[] { pthread_exit(nullptr); }, ""},
        {[] { current->Kill(); }, ""},
    };
    for (const End& end : ends) {
        const ChildResult child = RunInChild([&] {
            Runner runner(end.run);
            current = &runner;
            for (int round = 0; round < 3; ++round) {
                runner.Start(true);
                runner.Wait();
                if (runner.IsRunning()) return 1;
            }
            Runner last([] {});  // its start joins what killed itself
            last.Start(true);
            last.Wait();
            return 0;
        });
        EXPECT_EQ(child.exit_code, 0) << &end - ends << child.err;
        EXPECT_EQ(child.out, end.line + end.line + end.line) << &end - ends;
    }
}

TEST(HThread, LetsAbortEndTheProcess) {
    const auto body = [] {
        Runner runner([] { std::abort(); });
        runner.Start(true);
        runner.Wait();
        return 0;
    };
    EXPECT_EQ(RunInChild(body).signal, SIGABRT);
}

// Sets a flag when it is destroyed, a good while after it has begun.
struct Trace {
    std::atomic<bool>& gone;
    ~Trace() {
        for (int i = 0; i < 100; ++i) std::this_thread::yield();
        gone = true;
    }
};

TEST(HThread, IsWaitedForWithItsThreadLocals) {
    static std::atomic<bool> gone{false};
    HSemaphore leave(0);
    Runner runner([&] {
        thread_local const Trace trace{gone};
        leave.Lock();
        static_cast<void>(&trace);
    });
    runner.Start(true);
    std::atomic<int> in_time{0};
    std::vector<std::thread> waiters;
    for (int i = 0; i < 3; ++i) {
        std::atomic<unsigned long long> number{0};
        waiters.emplace_back([&] {
            number = HThread::GetCurrentThreadId();
            runner.Wait();
            if (gone) ++in_time;
        });
        while (number == 0) std::this_thread::yield();
        AwaitSleepOf(number);
    }
    leave.Unlock();
    for (std::thread& waiter : waiters) waiter.join();
    EXPECT_EQ(in_time, 3);
}

TEST(HThread, RunsNothingOfAKilledThread) {
    static std::atomic<bool> frame_gone{false}, local_gone{false}, key_gone{false};
    pthread_key_t key{};
    pthread_key_create(&key, [](void*) { key_gone = true; });
    const HMutex mutex;
    HSemaphore entered(0), never(0);
    Runner runner([&] {
        const Trace trace{frame_gone};
        thread_local const Trace local{local_gone};
        pthread_setspecific(key, &local_gone);
        const HMutexLock lock(&mutex);
        entered.Unlock();
        never.Lock();
        static_cast<void>(&local);
    });
    runner.Start(true);
    entered.Lock();
    runner.Kill();
    EXPECT_FALSE(runner.IsRunning());
    EXPECT_FALSE(mutex.TryLock());
    // A new thread on the same stack sees nothing of it.
    void* seen = nullptr;
    Runner next([&] { seen = pthread_getspecific(key); });
    next.Start(true);
    next.Wait();
    EXPECT_EQ(seen, nullptr);
    EXPECT_FALSE(frame_gone);
    // The thread sanitizer has to see a thread end in good order.
    EXPECT_TRUE(__tsan_acquire != nullptr || !(local_gone || key_gone));
}

TEST(HThread, RunsOnWithoutItsObjectOnceLetGo) {
    HSemaphore entered(0), first_leave(0), second_leave(0), left(0);
    std::atomic<int> runs{0};
    Runner runner([&] {
        HSemaphore& leave = ++runs == 1 ? first_leave : second_leave;
        entered.Unlock();
        leave.Lock();
        left.Unlock();
    });
    runner.Start(true);
    entered.Lock();
    runner.DestroyThread();
    EXPECT_FALSE(runner.IsRunning());
    runner.Start(true);  // a second thread, which the end of the first leaves alone
    entered.Lock();
    first_leave.Unlock();
    left.Lock();
    EXPECT_TRUE(runner.IsRunning());
    second_leave.Unlock();
    runner.Wait();
    left.Lock();
}

long CountThreads() { return std::distance(std::filesystem::directory_iterator("/proc/self/task"), {}); }

TEST(HThread, LeavesNoThreadBehind) {
    Runner runner([] {});
    runner.Start(true);  // a sanitizer starts a thread of its own at the first one
    runner.Wait();
    const long before = CountThreads();
    for (int round = 0; round < 10000; ++round) {
        runner.Start(true);
        if (round % 3 == 0) runner.Wait();
        if (round % 3 == 1) runner.Kill();
        AwaitIdle(runner);
    }
    while (CountThreads() > before) std::this_thread::yield();
}

// The nice value of a thread stands for its priority.
int NiceOf(unsigned long long number) { return getpriority(PRIO_PROCESS, static_cast<id_t>(number)); }

TEST(HThread, TakesItsPriorityWheneverItIsSet) {
    const bool may_raise = setpriority(PRIO_PROCESS, 0, -20) == 0 && setpriority(PRIO_PROCESS, 0, 0) == 0;
    const int nices[] = {19, 10, 5, 0, -5, -10, -20, 0, 0};
    std::atomic<unsigned long long> number{0};
    HSemaphore leave(0);
    Runner runner([&] {
        number = HThread::GetCurrentThreadId();
        leave.Lock();
    });
    const auto has_nice = [&](int nice) {
        while (number == 0 || NiceOf(number) != nice) std::this_thread::yield();
    };
    for (unsigned int value = std::size(nices); value-- > 0;) {
        if (nices[value] < 0 && !may_raise) continue;
        const auto priority = static_cast<HThreadPriority>(value);
        runner.SetPriority(priority);
        number = 0;
        runner.Start(true);
        has_nice(nices[value]);
        setpriority(PRIO_PROCESS, static_cast<id_t>(number), 11);
        runner.SetPriority(priority);  // the one it has: nothing happens
        EXPECT_EQ(NiceOf(number), 11);
        runner.SetPriority(HThreadPriorityIdle);
        EXPECT_EQ(NiceOf(number), priority == HThreadPriorityIdle ? 11 : 19);
        leave.Unlock();
        runner.Wait();
    }
}

TEST(HThread, IsGoneInTheChildOfAFork) {
    HSemaphore leave(0);
    Runner runner([&] { leave.Lock(); });
    runner.Start(true);
    const ChildResult child = RunInChild([&] {
        runner.Wait();
        runner.Kill();
        _exit(runner.IsRunning() || HThread::GetCurrentThreadId() != static_cast<unsigned>(getpid()) ? 1 : 0);
        return 1;
    });
    EXPECT_EQ(child.exit_code, 0);
    EXPECT_TRUE(runner.IsRunning());
    leave.Unlock();
    runner.Wait();
}

TEST(HThread, HasANumberOfItsOwn) {
    const unsigned long long mine = HThread::GetCurrentThreadId();
    unsigned long long other = 0;
    std::thread([&] { other = HThread::GetCurrentThreadId(); }).join();
    EXPECT_EQ(HThread::GetCurrentThreadId(), mine);
    EXPECT_NE(other, mine);
    EXPECT_LT(mine | other, 1ULL << 32U);
}

}  // namespace
