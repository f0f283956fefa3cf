// The helpers of environment.h, blocked_thread.h and run_in_child.h on Windows.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <io.h>
#include <process.h>

#include <csignal>
#include <cstdlib>
#include <thread>

#include "platform/windows/system.h"
#include "support/blocked_thread.h"
#include "support/environment.h"
#include "support/run_in_child.h"

namespace {

// In the environment of a child: the number of the call whose body it runs.
constexpr char kChildVariable[] = "ZANBASE_TEST_CHILD";

std::string CurrentTest() {
    const testing::TestInfo& test = *testing::UnitTest::GetInstance()->current_test_info();
    return std::string(test.test_suite_name()) + "." + test.name();
}

// The number of this call of RunInChild in the running test, from 1.
int CountCall() {
    static std::string counted;
    static int calls = 0;
    if (counted != CurrentTest()) calls = 0;
    counted = CurrentTest();
    return ++calls;
}

// What the child wrote before it came to its body is not of interest.
int RunAsChild(const std::function<int()>& body) {
    std::fflush(nullptr);
    for (const int descriptor : {1, 2}) {
        _lseek(descriptor, 0, SEEK_SET);
        _chsize(descriptor, 0);
        _setmode(descriptor, _O_BINARY);
    }
    return body();
}

// Runs this program with its standard output and error in `files`, and returns its exit code.
int RunThisTestAgain(std::FILE* const (&files)[2]) {
    const std::string program = testing::internal::GetArgvs()[0], filter = "--gtest_filter=" + CurrentTest();
    std::fflush(nullptr);
    const int kept[] = {_dup(1), _dup(2)};
    for (int i = 0; i < 2; ++i) _dup2(_fileno(files[i]), i + 1);
    const intptr_t code = _spawnl(_P_WAIT, program.c_str(), program.c_str(), filter.c_str(), nullptr);
    const DWORD error = code == -1 ? GetLastError() : ERROR_SUCCESS;
    for (int i = 0; i < 2; ++i) {
        _dup2(kept[i], i + 1);
        _close(kept[i]);
    }
    EXPECT_EQ(error, ERROR_SUCCESS) << "the system can't start the child";
    return static_cast<int>(code);
}

struct Thread {
    explicit Thread(unsigned long long id)
        : handle(OpenThread(THREAD_SUSPEND_RESUME | THREAD_GET_CONTEXT, FALSE, static_cast<DWORD>(id))) {}
    ~Thread() { CloseHandle(handle); }
    Thread(const Thread&) = delete;
    Thread& operator=(const Thread&) = delete;

    const HANDLE handle;
};

// Whether the thread is inside one of the system's waits: at the instruction behind the call of the kernel.
bool IsInWait(HANDLE thread) {
    static const char* const kWaits[] = {"NtWaitForSingleObject", "NtWaitForMultipleObjects",
                                         "NtWaitForAlertByThreadId", "NtWaitForKeyedEvent",
                                         "NtDelayExecution"};
    constexpr DWORD64 kStubBytes = 32;
    CONTEXT context{};
    context.ContextFlags = CONTEXT_CONTROL;
    SuspendThread(thread);
    GetThreadContext(thread, &context);
    ResumeThread(thread);
    for (const char* const name : kWaits) {
        const auto stub = reinterpret_cast<DWORD64>(GetProcAddress(GetModuleHandleA("ntdll"), name));
        if (context.Rip - stub < kStubBytes) return true;
    }
    return false;
}

}  // namespace

const bool kExhaustedStackIsAFault = false;  // Wine leaves too little stack to unwind and ends the thread
const bool kKillRunsTlsDestructors = false;

// Two processes that call the runtime's tmpfile() under Wine at once can get the same file, or none.
std::FILE* OpenTemporaryFile() {
    char folder[MAX_PATH], name[MAX_PATH];
    GetTempPathA(sizeof folder, folder);
    GetTempFileNameA(folder, "zan", 0, name);
    return std::fopen(name, "w+bD");
}

void SetEnvironment(const char* name, const char* value) { _putenv_s(name, value != nullptr ? value : ""); }

void AwaitSleepOf(unsigned long long thread) {
    const Thread one(thread);
    while (!IsInWait(one.handle)) std::this_thread::yield();
}

void HoldThread(unsigned long long thread) { SuspendThread(Thread(thread).handle); }

void ReleaseThread(unsigned long long thread) { ResumeThread(Thread(thread).handle); }

ChildResult RunInChild(const std::function<int()>& body) {
    constexpr int kAbortCode = 3;
    const std::string call = std::to_string(CountCall());
    if (const char* const wanted = std::getenv(kChildVariable)) {
        if (call == wanted) std::exit(RunAsChild(body));
        return {};
    }
    std::FILE* const files[] = {OpenTemporaryFile(), OpenTemporaryFile()};
    SetEnvironment(kChildVariable, call.c_str());
    const int code = RunThisTestAgain(files);
    SetEnvironment(kChildVariable, nullptr);
    const bool aborted = code == kAbortCode;
    return {aborted ? -1 : code, aborted ? SIGABRT : 0, TakeText(files[0]), TakeText(files[1])};
}
