// Signals between the library and the handlers of the program: whose fault it is, who was there first.
#include <gtest/gtest.h>

#include <atomic>
#include <csignal>
#include <thread>

#include <unistd.h>

#include "platform/guard.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "support/runner.h"

namespace {

void Fault(void*) { WriteToNull(); }
void Send(void*) { raise(SIGSEGV); }
void Nothing(void*) {}

using Handler = void (*)(int);

[[noreturn]] void Exit5(int) { _exit(5); }

// Signals meet a handler of the program that was there before the library's.
TEST(PosixGuard, LeavesToOthersWhatIsNotItsOwn) {
    struct Case {
        Handler before;
        void (*framed)(void*);
        void (*bare)(void*);
        int exit_code;
        int signal;
    };
    const Case cases[] = {
        {SIG_DFL, Fault, Nothing, 1, 0},        {SIG_DFL, Nothing, Fault, -1, SIGSEGV},
        {SIG_DFL, Send, Nothing, -1, SIGSEGV},  {SIG_DFL, Nothing, Send, -1, SIGSEGV},
        {SIG_IGN, Fault, Send, 1, 0},           {SIG_IGN, Send, Nothing, 0, 0},
        {SIG_IGN, Nothing, Fault, -1, SIGSEGV}, {Exit5, Fault, Nothing, 1, 0},
        {Exit5, Send, Nothing, 5, 0},           {Exit5, Nothing, Fault, 5, 0},
    };
    for (const Case& each : cases) {
        const ChildResult child = RunInChild([&] {
            std::signal(SIGSEGV, each.before);
            const bool faulted = RunGuarded(each.framed, nullptr);
            each.bare(nullptr);
            return faulted ? 1 : 0;
        });
        EXPECT_EQ(child.exit_code, each.exit_code) << &each - cases << child.err;
        EXPECT_EQ(child.signal, each.signal) << &each - cases;
    }
}

struct sigaction replaced;

// A handler that came later and hands on what it doesn't want.
TEST(PosixGuard, ServesUnderALaterHandler) {
    EXPECT_TRUE(RunGuarded(Fault, nullptr));
    struct sigaction later {};
    later.sa_sigaction = [](int signal, siginfo_t* info, void* context) {
        replaced.sa_sigaction(signal, info, context);
    };
    later.sa_flags = SA_SIGINFO;
    sigaction(SIGSEGV, &later, &replaced);
    for (int round = 0; round < 3; ++round) EXPECT_TRUE(RunGuarded(Fault, nullptr));
}

std::atomic<long> rounds{0};

TEST(PosixKill, TakesAnotherSignalWhenTheProgramTakesOurs) {
    for (int round = 0; round < 3; ++round) {
        Runner runner([] {
            while (rounds++ >= 0) std::this_thread::yield();
        });
        runner.Start(true);
        runner.Kill();
        EXPECT_FALSE(runner.IsRunning());
        std::signal(SIGRTMAX - 1 - round, SIG_IGN);
    }
}

}  // namespace
