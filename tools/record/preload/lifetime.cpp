// The recorder's life in the program: settings at the start, what a fork or a signal asks for, and the report
// at the end, whichever way the program takes there.
#include <csignal>
#include <cstdio>
#include <cstdlib>

#include <dlfcn.h>
#include <pthread.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "common/settings.h"
#include "disk_operation.h"
#include "modules.h"
#include "next_function.h"
#include "pool.h"
#include "recording.h"
#include "report_output.h"
#include "sites.h"
#include "stdio_tables.h"

// The C library's lock of the list of streams, which fork takes after the prepare handlers have run.
extern "C" {
void _IO_list_lock() __attribute__((weak));
void _IO_list_unlock() __attribute__((weak));
void _IO_list_resetlock() __attribute__((weak));
int __cxa_atexit(void (*function)(void*), void* argument, void* library);

// Set by the linker: the first byte of this library and the end of its code.
extern const char __ehdr_start __attribute__((visibility("hidden")));
extern const char etext __attribute__((visibility("hidden")));
}

namespace recorder {

__thread ThreadState gThread __attribute__((tls_model("initial-exec"))) = {};
std::atomic<unsigned int> gState{kMemory | kDisk};

namespace {

NextFunction<int(void*)> gDlclose{"dlclose"};
NextFunction<void(int)> gExitNow{"_exit"};

Settings* gSettings = nullptr;  // made at the start, never destroyed
int gProcess = 0;
std::atomic<bool> gReportWanted{false};
std::atomic<bool> gIsFreshChild{false};
std::atomic<bool> gFinished{false};

// The program has ended, but for what the C library itself still does. Called by _exit, so also in
// signal handlers.
void Finish() {
    if (!MayReport() || gProcess == 0 || IsVforkChild() || gFinished.exchange(true)) return;
    if (gIsFreshChild) Attend();
    const InsideScope scope;
    gState = 0;
    Report(*gSettings, gProcess, true);
}

// Runs after all destructors, since it was registered before any of the program's. Streams are flushed after
// that, so it is done here once more, to be counted.
void FinishAtExit(void* /*argument*/) {
    if (gProcess != 0 && syscall(SYS_getpid) == gProcess) std::fflush(nullptr);
    Finish();
}

void PrepareFork() {
    if (__libc_single_threaded == 0 && _IO_list_lock != nullptr) _IO_list_lock();
    LockSites();
}

void EndForkInParent() {
    UnlockSites();
    if (__libc_single_threaded == 0 && _IO_list_unlock != nullptr) _IO_list_unlock();
}

// Most children start another program at once, so a followed one is emptied of its parent's account only when
// it has something to record. A child of a process with threads has one, but the C library's flag doesn't
// tell.
void EndForkInChild() {
    UnlockSites();
    if (__libc_single_threaded == 0 && _IO_list_resetlock != nullptr) _IO_list_resetlock();
    if (!gSettings->follow) {
        gState = 0;
        return;
    }
    gProcess = static_cast<int>(syscall(SYS_getpid));
    gIsFreshChild = true;
    gState |= kAttention;
}

void AskForReport(int /*signal*/) {
    gReportWanted = true;
    gState |= kAttention;
}

// Programs that are not to be recorded find the environment that they would have had.
void RestoreEnvironment() {
    unsetenv(kSettingsVariable);
    if (gSettings->other_preloads.empty()) {
        unsetenv("LD_PRELOAD");
    } else {
        setenv("LD_PRELOAD", gSettings->other_preloads.c_str(), 1);
    }
}

void StartRecording() {
    __cxa_atexit(&FinishAtExit, nullptr, nullptr);
    at_quick_exit(&Finish);
    pthread_atfork(&PrepareFork, &EndForkInParent, &EndForkInChild);
    TakeDescriptors(*gSettings);
    for (const std::string& name : gSettings->skipped_functions) SkipFunction(name);
    if (gSettings->signal != 0) {
        struct sigaction action {};
        action.sa_handler = &AskForReport;
        action.sa_flags = SA_RESTART;
        sigaction(gSettings->signal, &action, nullptr);
    }
    if (gSettings->disk) {
        MarkInheritedDescriptors();
        if (!HookStreams())
            Say("this C library's streams can't be recorded; of those, opens are counted only");
    }
    if (gSettings->memory) {
        ReserveMemory();
        StartReadingModules();
    }
}

__attribute__((constructor)) void Start() {
    const InsideScope scope;
    const char* const text = std::getenv(kSettingsVariable);
    if (text == nullptr) {
        gState = 0;
        return;
    }
    gSettings = new Settings(ReadSettings(text));
    const auto process = static_cast<int>(syscall(SYS_getpid));
    if (!gSettings->follow) RestoreEnvironment();
    if (!gSettings->follow && process != gSettings->process) {
        gState = 0;
        return;
    }
    gProcess = process;
    StartRecording();
    gState = (gSettings->memory ? kMemory : 0U) | (gSettings->disk ? kDisk : 0U);
}

}  // namespace

unsigned int Attend() {
    const bool may_report = MayReport();
    const InsideScope scope;
    gState &= ~kAttention;
    if (gIsFreshChild.exchange(false)) {
        ResetPoolLock();
        ResetBlocksInChild();
        ResetFilesInChild();
    }
    if (!may_report) {
        if (gReportWanted) gState |= kAttention;  // a later call makes the report
    } else if (gReportWanted.exchange(false) && !gFinished) {
        Report(*gSettings, gProcess, false);
    }
    return gState;
}

bool IsVforkChild() { return gProcess != 0 && syscall(SYS_getpid) != gProcess; }

bool IsOwnCode(std::uintptr_t pc) {
    return pc >= reinterpret_cast<std::uintptr_t>(&__ehdr_start) &&
           pc < reinterpret_cast<std::uintptr_t>(&etext);
}

void RecordBlock(const void* block, std::size_t size, const Frame& caller) {
    const InsideScope scope;
    const Frame origin = gThread.has_request ? gThread.request : caller;
    gThread.has_request = false;
    if (IsOwnCode(origin.pc)) return;
    try {
        AddBlock(block, size, SiteOfCaller(origin));
    } catch (...) {
        AddLostBlock();
    }
}

}  // namespace recorder

using namespace recorder;  // NOLINT(google-build-using-namespace): the hooks themselves have no namespace

extern "C" {

int dlclose(void* library) noexcept {
    const int result = gDlclose(library);
    if (Wants(kMemory)) {
        const InsideScope scope;
        try {
            RetireUnmappedSites();
        } catch (...) {  // memory ran out: addresses of the library stay credited to it
        }
    }
    return result;
}

void _exit(int status) {
    Finish();
    gExitNow(status);
    __builtin_unreachable();
}

void _Exit(int status) noexcept {
    Finish();
    gExitNow(status);
    __builtin_unreachable();
}

}  // extern "C"
