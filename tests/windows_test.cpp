// What the back end for Windows promises beyond the contracts: priorities, handles, the system's texts and its console.
#include <gtest/gtest.h>
#include <io.h>
#include <xmmintrin.h>

#include <cstdint>
#include <thread>

#include "platform/guard.h"
#include "platform/stream.h"
#include "platform/thread.h"
#include "platform/windows/standard_stream.h"
#include "platform/windows/system.h"
#include "support/faults.h"
#include "support/run_in_child.h"
#include "support/runner.h"
#include "zanbase/semaphore.h"
#include "zanbase/terminal.h"

namespace {

TEST(WindowsThread, TakesItsPriorityWheneverItIsSet) {
    const int priorities[] = {-15, -2, -1, 0, 1, 2, 15, 0};
    const HSemaphore started(0), leave(0);
    unsigned long long id = 0;
    Runner runner([&] {
        id = HThread::GetCurrentThreadId();
        started.Unlock();
        leave.Lock();
    });
    for (unsigned int step = 0; step < 16; ++step) {
        const auto priority = static_cast<HThreadPriority>(step / 2);
        runner.SetPriority(step % 2 == 0 ? priority : HThreadPriorityNormal);
        runner.Start(true);
        started.Lock();
        runner.SetPriority(priority);
        const HANDLE handle = OpenThread(THREAD_QUERY_INFORMATION, FALSE, static_cast<DWORD>(id));
        EXPECT_EQ(GetThreadPriority(handle), priorities[priority]) << step;
        CloseHandle(handle);
        leave.Unlock();
        runner.Wait();
    }
}

TEST(WindowsThread, ReportsErrorsAsTheSystemDoes) {
    const std::string text = SystemErrorText(ERROR_ACCESS_DENIED);
    EXPECT_GT(text.size(), 2U);
    EXPECT_EQ(text.substr(text.size() - 2), "\r\n");
    EXPECT_EQ(SystemErrorText(-1), "");
}

TEST(WindowsGuard, EndsFloatingPointFaultsAndKeepsTheirSettings) {
    constexpr unsigned int kDivZero = _MM_MASK_DIV_ZERO, kFlags = _MM_EXCEPT_MASK;
    const unsigned int before = _mm_getcsr();
    EXPECT_TRUE(RunGuarded(
        [](void*) {
            _mm_setcsr((_mm_getcsr() & ~kDivZero) | _MM_ROUND_UP);
            volatile double zero = 0.0;
            zero = 1.0 / zero;
        },
        nullptr));
    EXPECT_EQ(_mm_getcsr(), (before & ~kDivZero & ~kFlags) | _MM_ROUND_UP);
    _mm_setcsr(before);
}

TEST(WindowsGuard, DropsTheExceptionsOfAFaultyBody) {
    const auto in_handler = [](void*) {
        try {
            throw 7;
        } catch (int) {
            WriteToNull();
        }
    };
    EXPECT_TRUE(RunGuarded(in_handler, nullptr));
    EXPECT_EQ(std::current_exception(), nullptr);
}

// Wine leaves no room to unwind in a stack that is exhausted. So the fault is raised where there is some.
TEST(WindowsGuard, EndsAStackOverflow) {
    const auto overflow = [](void*) { RaiseException(EXCEPTION_STACK_OVERFLOW, 0, 0, nullptr); };
    for (int round = 0; round < 2; ++round) EXPECT_TRUE(RunGuarded(overflow, nullptr));
}

TEST(WindowsThread, IsIdleAfterItsEndElsewhere) {
    Runner runner([] { ExitThread(0); });
    for (int round = 0; round < 2; ++round) {
        EXPECT_TRUE(runner.Start(true));
        runner.Wait();
        EXPECT_FALSE(runner.IsRunning());
    }
}

// The number of a new handle; the system takes those again that were closed.
std::uintptr_t NextHandle() {
    const HANDLE handle = CreateEventA(nullptr, FALSE, FALSE, nullptr);
    CloseHandle(handle);
    return reinterpret_cast<std::uintptr_t>(handle);
}

TEST(WindowsThread, LeavesNoHandleBehind) {
    Runner quick([] {}), endless([] {
        for (;;) std::this_thread::yield();
    });
    std::uintptr_t before = 0;
    for (int round = 0; round < 60; ++round) {
        if (round == 10) before = NextHandle();
        quick.RunToEnd();
        endless.Start(true);
        endless.Kill();
    }
    EXPECT_LE(NextHandle(), before);
}

std::string FirstTextOnConsole(DWORD length) {
    std::string text(length, ' ');
    DWORD read = 0;
    ReadConsoleOutputCharacterA(GetStdHandle(STD_OUTPUT_HANDLE), text.data(), length, {0, 0}, &read);
    return text;
}

// The log is the error stream as it was before.
int UseConsole() {
    std::FILE* const log = _fdopen(_dup(2), "wb");
    FreeConsole();
    std::fclose(stdin);
    std::printf("earlier");
    int locked = 0;
    {
        const StreamLock out(stdout), err(stderr);
        locked = CreateConsole();
    }
    const int created = CreateConsole();
    if (GetConsoleWindow() == nullptr) return 0;
    std::printf("text");
    std::fprintf(log, "locked %d, created %d, has %s, input %d, visible", locked, created,
                 FirstTextOnConsole(4).c_str(), std::getchar());
    for (const int shown : {0, 1}) {
        ShowConsole(shown);
        std::fprintf(log, " %d", IsWindowVisible(GetConsoleWindow()));
    }
    std::fprintf(log, ", destroyed %d", DestroyConsole());
    std::fprintf(log, ", late %d", std::printf("late"));
    std::fclose(log);
    return 0;
}

TEST(WindowsConsole, IsAWindowWithAllStreamsButAClosedOne) {
    const ChildResult child = RunInChild(UseConsole);
    if (child.err.empty()) GTEST_SKIP() << "there is no display for a window";
    EXPECT_EQ(child.err, "locked 0, created 1, has text, input -1, visible 0 1, destroyed 1, late 4");
    EXPECT_EQ(child.out, "earlier");
}

// A pipe is full, and another thread uses a second stream: the console takes the first one only.
TEST(WindowsConsole, WaitsForNoReaderAndNoFullPipe) {
    HANDLE reader = nullptr, writer = nullptr;
    CreatePipe(&reader, &writer, nullptr, 1);
    DWORD written = 0;
    WriteFile(writer, ".", 1, &written, nullptr);
    std::FILE* const full = _fdopen(_open_osfhandle(reinterpret_cast<std::intptr_t>(writer), 0), "w");
    std::fputs("lost", full);
    std::FILE* const used = OpenTemporaryFile();
    std::FILE* const targets[] = {OpenTemporaryFile(), OpenTemporaryFile()};
    const HSemaphore locked(0), leave(0);
    std::thread user([&] {
        const StreamLock lock(used);
        locked.Unlock();
        leave.Lock();
    });
    locked.Lock();
    EXPECT_TRUE(RedirectStream(full, _fileno(targets[0])));
    EXPECT_FALSE(RedirectStream(used, _fileno(targets[1])));
    std::fputs("moved", full);
    leave.Unlock();
    user.join();
    std::fputs("stays", used);
    EXPECT_EQ(TakeText(targets[0]), "moved");
    EXPECT_EQ(TakeText(targets[1]), "");
}

}  // namespace
