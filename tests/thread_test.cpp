// Start, end, restart, kill and faults of threads, and whose a fault is.
#include "zanbase/thread.h"

#include <gtest/gtest.h>
#include <pthread.h>
#include <signal.h>
#include <sys/resource.h>

#include <algorithm>
#include <stdexcept>
#include <thread>
#include <vector>

#include "platform/guard.h"
#include "support/blocked_thread.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "support/runner.h"
#include "zanbase/mutex.h"
#include "zanbase/semaphore.h"

// A killed thread's list of exit routines is lost; the header says so.
extern "C" const char* __lsan_default_suppressions() { return "leak:__cxa_thread_atexit_impl"; }
extern "C" __attribute__((weak)) void __tsan_init();  // there under the thread sanitizer

TEST(HThread, RunsOnceAStartWhateverTheArgument) {
    const unsigned long long number = HThread::GetCurrentThreadId();
    int runs = 0;
    const HSemaphore leave(0);
    Runner runner([&] {
        leave.Lock();
        runner.Wait();  // on itself it returns
        runs += HThread::GetCurrentThreadId() != number ? 1 : 0;
    });
    const auto is_idle = [&] {
        runner.Wait();
        runner.Kill();
        return !runner.IsRunning() && !Runner(runner).IsRunning();
    };
    for (const bool argument : {true, false}) {
        EXPECT_TRUE(is_idle() && runner.Start(argument) && !runner.Start(argument) &&
                    !runner.Start(!argument));
        const auto in_fork = [&] { _exit(is_idle() && HThread::GetCurrentThreadId() != number ? 0 : 1); };
        EXPECT_EQ(RunInChild([&] { return in_fork(), 1; }).exit_code, 0);
        leave.Unlock();
        runner.Wait();
    }
    EXPECT_EQ(runs, 2);
}

TEST(HThread, TellsWhyItCouldNotStart) {
    const ChildResult child = RunInChild([] {
        Runner runner([] {});
        std::printf("HThread::Start(%p) Error: Resource temporarily unavailable\n",
                    static_cast<void*>(&runner));
        pthread_attr_t attributes;
        pthread_getattr_default_np(&attributes);
        pthread_attr_setstacksize(&attributes, 1UL << 60U);
        pthread_setattr_default_np(&attributes);
        return runner.Start(true) || runner.IsRunning() ? 1 : 0;
    });
    EXPECT_EQ(child.out, child.out.substr(child.out.size() / 2) + child.out.substr(child.out.size() / 2));
    EXPECT_EQ(child.exit_code, 0);
}

TEST(HThread, EndsWithTheLineDueAndCanBeStartedAgain) {
    static Runner* current = nullptr;
    struct End {
        void (*run)();
        std::string line;
        int signal = 0;
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
        {[] { std::abort(); }, "", SIGABRT},
    };
    for (const End& end : ends) {
        const ChildResult child = RunInChild([&] {
            Runner runner(end.run);
            current = &runner;
            for (int round = 0; round < 3; ++round) runner.RunToEnd();
            Runner([] {}).RunToEnd();  // joins what killed itself
            return runner.IsRunning() ? 1 : 0;
        });
        EXPECT_EQ(child.signal, end.signal) << &end - ends;
        EXPECT_EQ(child.exit_code, end.signal == 0 ? 0 : -1) << &end - ends << child.err;
        EXPECT_EQ(child.out, end.line + end.line + end.line) << &end - ends;
    }
}

// Counts when it is destroyed, a good while after it has begun.
struct Trace {
    std::atomic<int>& count;
    ~Trace() {
        for (int i = 0; i < 100; ++i) std::this_thread::yield();
        ++count;
    }
};

TEST(HThread, IsWaitedForWithItsExitRoutinesAndRunsNoneWhenKilled) {
    static std::atomic<int> gone{0};
    pthread_key_t key{};
    pthread_key_create(&key, [](void*) { ++gone; });
    const HMutex mutex;
    const HSemaphore entered(0), leave(0);
    Runner runner([&] {
        EXPECT_EQ(pthread_getspecific(key), nullptr);  // though a killed thread had the same stack
        const Trace frame{gone};
        thread_local const Trace local{gone};
        pthread_setspecific(key, &local);
        const HMutexLock lock(&mutex);
        entered.Unlock();
        leave.Lock();
    });
    for (const bool kills : {false, true}) {
        gone = 0;
        runner.Start(true);
        entered.Lock();
        // The thread sanitizer has to see a thread end in good order.
        const int due = !kills ? 3 : __tsan_init != nullptr ? 2 : 0;
        std::vector<std::thread> waiters;
        for (int i = 0; i < 3; ++i) {
            std::atomic<unsigned long long> number{0};
            waiters.emplace_back([&] {
                number = HThread::GetCurrentThreadId();
                runner.Wait();
                EXPECT_EQ(gone, due);
            });
            while (number == 0) std::this_thread::yield();
            AwaitSleepOf(number);
        }
        kills ? runner.Kill() : leave.Unlock();
        for (std::thread& waiter : waiters) waiter.join();
        EXPECT_FALSE(runner.IsRunning());
        EXPECT_EQ(mutex.TryLock(), !kills);
        if (!kills) mutex.Unlock();
    }
}

TEST(HThread, RunsOnWithoutItsObjectOnceLetGo) {
    const HSemaphore left(0), leave[2] = {0, 0};
    std::atomic<int> runs{0};
    Runner runner([&] {
        leave[runs++].Lock();
        left.Unlock();
    });
    for (int threads = 1; threads <= 2; ++threads) {
        runner.DestroyThread();
        EXPECT_TRUE(!runner.IsRunning() && runner.Start(true));
        while (runs < threads) std::this_thread::yield();
    }
    leave[0].Unlock();
    left.Lock();
    EXPECT_TRUE(runner.IsRunning());  // the second thread: the end of the first has left it alone
    leave[1].Unlock();
    runner.Wait();
}

TEST(HThread, TakesItsPriorityWheneverItIsSet) {
    const bool may_raise = setpriority(PRIO_PROCESS, 0, -20) == 0 && setpriority(PRIO_PROCESS, 0, 0) == 0;
    const int nices[] = {19, 10, 5, 0, -5, -10, -20, 0, 0};
    std::atomic<id_t> number{0};
    const HSemaphore leave(0);
    Runner runner([&] {
        number = static_cast<id_t>(HThread::GetCurrentThreadId());
        leave.Lock();
    });
    for (unsigned int step = 0; step < 18; ++step) {
        const auto priority = static_cast<HThreadPriority>(step / 2);
        runner.SetPriority(step % 2 == 0 ? priority : HThreadPriorityNormal);
        number = 0;
        runner.Start(true);
        runner.SetPriority(priority);
        const int due = may_raise ? nices[priority] : std::max(nices[priority], 0);
        while (number == 0 || getpriority(PRIO_PROCESS, number) != due) std::this_thread::yield();
        setpriority(PRIO_PROCESS, number, 19);
        runner.SetPriority(priority);  // the one it has: nothing happens
        EXPECT_EQ(getpriority(PRIO_PROCESS, number), 19);
        leave.Unlock();
        runner.Wait();
    }
}

void Fault(void*) { WriteToNull(); }
void Send(void*) { raise(SIGSEGV); }
[[noreturn]] void Exit5(int) { _exit(5); }

// A fault without a frame, and a signal that was merely sent, frame or not.
TEST(PosixGuard, LeavesToOthersWhatIsNotItsOwn) {
    struct Case {
        void (*handler)(int);  // the program's, there before the library's
        bool is_sent;
        int exit_code;
        int signal;
    };
    const Case cases[] = {{SIG_DFL, false, -1, SIGSEGV}, {SIG_DFL, true, -1, SIGSEGV},
                          {SIG_IGN, false, -1, SIGSEGV}, {SIG_IGN, true, 0, 0},
                          {Exit5, false, 5, 0},          {Exit5, true, 5, 0}};
    for (const Case& each : cases) {
        const ChildResult child = RunInChild([&] {
            signal(SIGSEGV, each.handler);
            if (!RunGuarded(Fault, nullptr)) return 1;
            each.is_sent ? void(RunGuarded(Send, nullptr)) : Fault(nullptr);
            return 0;
        });
        EXPECT_EQ(child.exit_code, each.exit_code) << &each - cases;
        EXPECT_EQ(child.signal, each.signal) << &each - cases;
    }
}

TEST(PosixGuard, ServesUnderALaterHandlerThatHandsOn) {
    static struct sigaction ours, later;
    EXPECT_TRUE(RunGuarded(Fault, nullptr));
    later.sa_sigaction = [](int number, siginfo_t* info, void* at) { ours.sa_sigaction(number, info, at); };
    later.sa_flags = SA_SIGINFO;
    sigaction(SIGSEGV, &later, &ours);
    for (int round = 0; round < 2; ++round) EXPECT_TRUE(RunGuarded(Fault, nullptr));
}
