// What is particular to the Linux back end: signals, cancellation, and the kernel's files on processors.
#include <gtest/gtest.h>
#include <pthread.h>
#include <signal.h>
#include <sys/time.h>

#include <cfenv>
#include <exception>
#include <thread>

#include "platform/clock.h"
#include "platform/guard.h"
#include "platform/linux/thread_wait.h"
#include "platform/processors.h"
#include "support/blocked_thread.h"
#include "support/faults.h"
#include "support/run_in_child.h"

// Exceptions of a body that a fault abandons leak; hibernate_thread.h documents it.
extern "C" const char* __lsan_default_suppressions() { return "leak:__cxa_allocate_exception"; }

int described = 0;  // processors that have a file: those from number 4 on, two for each core

extern "C" std::FILE* __wrap_fopen(const char* path, const char*) {
    int number = 0;
    std::sscanf(path, "/sys/devices/system/cpu/cpu%d/topology", &number);
    if (number < 4 || number >= 4 + described) return nullptr;
    static std::string processors_of_core;  // outlives the stream
    const int first = number - number % 2;
    processors_of_core = std::to_string(first) + ",9999";
    return fmemopen(processors_of_core.data(), processors_of_core.size(), "r");
}

TEST(LinuxProcessors, AreCountedAtTheFirstOfTheirCore) {
    described = CountLogicalProcessors();
    EXPECT_EQ(CountProcessorCores(), (described + 1) / 2);
    --described;  // a processor that is described nowhere
    EXPECT_EQ(CountProcessorCores(), 0);
}

TEST(LinuxClock, SleepsOnAfterASignal) {
    signal(SIGALRM, [](int) {});
    const itimerval soon{{0, 0}, {0, 1000}};
    setitimer(ITIMER_REAL, &soon, nullptr);
    const unsigned int start = ReadTicks();
    SleepFor(5);
    EXPECT_GE(ReadTicks() - start, 5U);
}

ThreadSlot slot{nullptr};

void BlockAllSignals() {
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, nullptr);
}

void WaitForEver(void*) {
    static FutexWord word{0};
    SleepWhile(word, 0, nullptr);
}

TEST(LinuxThread, DoesNotEnterItsBodyOnceKilled) {
    {
        const BlockLock lock;  // the first step waits for it
        StartThread(
            slot, [](void*) { ADD_FAILURE(); }, nullptr);
        slot.load()->mbKillRequested = true;  // as KillThread does
    }
    KillThread(slot);
    JoinKilledThreads();  // in case it ended before the call above, with no waiter
}

TEST(LinuxThread, LeavesABlockedSignalToItsReader) {
    sigset_t read;
    sigemptyset(&read);
    for (const int signal : {SIGURG, SIGRTMAX - 1, SIGRTMAX - 2}) sigaddset(&read, signal);
    pthread_sigmask(SIG_BLOCK, &read, nullptr);
    StartThread(slot, WaitForEver, nullptr);
    const timespec limit{30, 0};
    for (const int signal : {SIGURG, SIGRTMAX - 1, SIGRTMAX - 2}) {
        if (kill(getpid(), signal) == 0) {  // emulators have no signal SIGRTMAX - 1
            EXPECT_EQ(sigtimedwait(&read, nullptr, &limit), signal);
        }
    }
    KillThread(slot);
}

TEST(LinuxThread, IsKilledAndSurvivesFaultsThoughItsMakerBlocksAllSignals) {
    BlockAllSignals();
    StartThread(
        slot, [](void*) { EXPECT_TRUE(RunGuarded([](void*) { WriteToNull(); }, nullptr)); }, nullptr);
    JoinThread(slot);
    StartThread(slot, WaitForEver, nullptr);
    KillThread(slot);
}

TEST(LinuxThread, IsNotCancelledInANoexceptFunction) {
    StartThread(slot, WaitForEver, nullptr);
    std::thread([] {
        pthread_cancel(pthread_self());
        SleepFor(1);
        KillThread(slot);
        EXPECT_EQ(slot.load(), nullptr);
        pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, nullptr);  // still pending
    }).join();
}

void Fault(void*) { WriteToNull(); }
void Send(void*) { raise(SIGSEGV); }
[[noreturn]] void Exit5(int) { _exit(5); }

// A fault without a frame, and a signal that was merely sent, frame or not.
TEST(LinuxGuard, LeavesToOthersWhatIsNotItsOwn) {
    struct Case {
        void (*handler)(int);  // the program's, installed before the library's
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
            if (each.is_sent) RunGuarded(Send, nullptr);
            if (!each.is_sent) Fault(nullptr);
            return 0;
        });
        EXPECT_EQ(child.exit_code, each.exit_code) << &each - cases;
        EXPECT_EQ(child.signal, each.signal) << &each - cases;
    }
}

TEST(LinuxGuard, ReceivesFromALaterHandlerThatHandsOn) {
    static struct sigaction ours, later;
    EXPECT_TRUE(RunGuarded(Fault, nullptr));
    later.sa_sigaction = [](int number, siginfo_t* info, void* at) { ours.sa_sigaction(number, info, at); };
    later.sa_flags = SA_SIGINFO;
    sigaction(SIGSEGV, &later, &ours);
    for (int round = 0; round < 2; ++round) EXPECT_TRUE(RunGuarded(Fault, nullptr));
}

TEST(LinuxGuard, KeepsTheRoundingAndForgetsTheExceptionsOfTheBody) {
    struct Faulting {
        ~Faulting() { WriteToNull(); }
    };
    const auto in_handler = [](void*) {
        std::fesetround(FE_UPWARD);
        try {
            throw 7;
        } catch (int) {
            WriteToNull();
        }
    };
    const auto in_destructor = [](void*) {
        const Faulting faulting;
        throw 7;
    };
    for (void (*const body)(void*) : {+in_handler, +in_destructor}) {
        EXPECT_TRUE(RunGuarded(body, nullptr));
        EXPECT_EQ(std::fegetround(), FE_UPWARD);
        EXPECT_EQ(std::current_exception(), nullptr);
        EXPECT_EQ(std::uncaught_exceptions(), 0);
    }
}

TEST(LinuxGuard, ForwardsTheWakeUpsOfAnAbandonedBody) {
    static FutexWord word{0};
    std::thread sleeper = SleepIn([] { SleepWhile(word, 0, nullptr); });
    const auto body = [](void*) {
        const ForwardWakeupIfKilled pending(word);
        word = 1;
        WriteToNull();
    };
    EXPECT_TRUE(RunGuarded(body, nullptr));
    sleeper.join();
}
