// A thread may hold a lock of a runtime library while it executes that library's code, or code that the kernel
// provides (the vDSO). It can stay there for long only in a system call. These places count as safe:
//
// - sched_yield: the C library does not call it under a lock. A thread may spend all its time there.
// - A wait of this back end: it uses the C library's syscall function, without a lock of that library.
// - The instruction after a system call that the signal has made fail with EINTR. The runtime libraries make no
//   such call under their own locks. The thread is killed there, so the program does not see the error.
// - The same system call with the same stack for kBlockedMs: the thread waits for input, or for a mutex of
//   the program. The libraries' own locks are released sooner, unless the machine is very busy. While a thread
//   holds the lock of stdout or stderr, the limit is kOutputMs: it may be writing to a full pipe that is read
//   later.
//
// Not prevented: a thread that waits longer for room in a pipe, or for input of a stream, is killed with the
// stream locked. A thread that executes the program's code under a lock of a library, such as a callback of
// dl_iterate_phdr, is killed with that lock held.
#include "platform/linux/thread_kill_safety.h"

#include <algorithm>
#include <cstdio>
#include <iterator>
#include <locale>

#include <dlfcn.h>
#include <gnu/libc-version.h>
#include <link.h>
#include <sched.h>
#include <sys/auxv.h>
#include <unistd.h>

#include "platform/clock.h"
#include "platform/linux/kill_deferral.h"
#include "platform/linux/thread_place.h"

namespace {

struct CodeRange {
    std::uintptr_t begin;
    std::uintptr_t end;
};

constexpr std::size_t kLibraries = 5;

struct RuntimeCode {
    CodeRange libraries[kLibraries];  // those not found stay empty
    std::size_t count;
    CodeRange yield;         // the function sched_yield
    CodeRange system_calls;  // the function syscall
};

RuntimeCode goRuntimeCode{};          // written once, before the first thread is made
std::atomic<bool> gbSearched{false};  // written under the block mutex; its release publishes goRuntimeCode

// Limits in milliseconds.
constexpr unsigned int kGiveUpMs = 10000;  // since the request, for a thread never found outside the library
constexpr unsigned int kOutputMs = 1000;   // since the request, see above
constexpr unsigned int kBlockedMs = 10;    // at one system call

bool Contains(const dl_phdr_info* module, std::uintptr_t address) noexcept {
    return std::any_of(module->dlpi_phdr, module->dlpi_phdr + module->dlpi_phnum, [=](const auto& segment) {
        const std::uintptr_t begin = module->dlpi_addr + segment.p_vaddr;
        return segment.p_type == PT_LOAD && address - begin < segment.p_memsz;
    });
}

struct Search {
    std::uintptr_t marks[kLibraries];  // addresses within the libraries wanted
    RuntimeCode found;
};

// Records the code of a module that contains a mark. The program itself, the module without a name, is left
// out even if it contains an allocator, because its other code is not library code.
int RecordLibraryCode(dl_phdr_info* module, std::size_t, void* argument) {
    auto& [marks, found] = *static_cast<Search*>(argument);
    const auto is_here = [=](std::uintptr_t mark) { return Contains(module, mark); };
    if (module->dlpi_name[0] == '\0' || std::none_of(std::begin(marks), std::end(marks), is_here)) return 0;
    for (int i = 0; i < module->dlpi_phnum; ++i) {
        const auto& segment = module->dlpi_phdr[i];
        if (segment.p_type != PT_LOAD || (segment.p_flags & PF_X) == 0) continue;
        if (found.count == std::size(found.libraries)) break;
        const std::uintptr_t begin = module->dlpi_addr + segment.p_vaddr;
        found.libraries[found.count++] = {begin, begin + segment.p_memsz};
    }
    return 0;
}

// The code of a function by its entry in the symbol table; empty if it has none.
CodeRange CodeOf(std::uintptr_t function) noexcept {
    Dl_info info{};
    void* entry = nullptr;
    // NOLINTNEXTLINE(performance-no-int-to-ptr): the address of a function
    const auto* const address = reinterpret_cast<const void*>(function);
    if (dladdr1(address, &info, &entry, RTLD_DL_SYMENT) == 0 || entry == nullptr) return {};
    return {function, function + static_cast<const ElfW(Sym)*>(entry)->st_size};
}

bool IsIn(const CodeRange& range, std::uintptr_t code) noexcept {
    return range.begin <= code && code < range.end;
}

bool IsRuntimeCode(std::uintptr_t code) noexcept {
    const auto& libraries = goRuntimeCode.libraries;
    return std::any_of(std::begin(libraries), std::end(libraries),
                       [=](const CodeRange& library) { return IsIn(library, code); });
}

// The place counts as well: a handler of the C library may have interrupted the wait.
bool IsWaitOfOurs(std::uintptr_t code) noexcept {
    return IsIn(goRuntimeCode.system_calls, code) &&
           (toPendingWakeups.mpoWord != nullptr || toPendingWakeups.mpoCondition != nullptr);
}

// True if the thread has been at this place for longer than it would hold a lock of a library, see above.
bool IsBlocked(HNativeThread* block, const ThreadPlace& place, unsigned int now) noexcept {
    ThreadPlace& last = block->moLastPlace;
    if (place.mnCode != last.mnCode || place.mnStack != last.mnStack) {
        last = place;
        block->mnLastPlaceSince = now;
    }
    return now - block->mnLastPlaceSince >= kBlockedMs;
}

bool IsHeld(std::FILE* stream) noexcept {
    if (ftrylockfile(stream) != 0) return true;
    funlockfile(stream);
    return false;
}

}  // namespace

void FindRuntimeCode() noexcept {
    // Without places, threads are killed wherever they are. Under the thread sanitizer too: it delivers signals
    // late, with a place that the thread may have left long ago.
    // The load pairs with the store at the end, so that goRuntimeCode is complete.
    if (!kKnowsPlaces || IsThreadSanitizerOn() || gbSearched.load(std::memory_order_acquire)) return;
    Search search{
        {reinterpret_cast<std::uintptr_t>(&gnu_get_libc_version),
         reinterpret_cast<std::uintptr_t>(&std::locale::classic),           // the C++ library
         getauxval(AT_BASE),                                                // the loader
         getauxval(AT_SYSINFO_EHDR),                                        // the vDSO
         reinterpret_cast<std::uintptr_t>(dlsym(RTLD_DEFAULT, "malloc"))},  // may be another library's
        {}};
    dl_iterate_phdr(RecordLibraryCode, &search);
    search.found.yield = CodeOf(reinterpret_cast<std::uintptr_t>(&sched_yield));
    search.found.system_calls = CodeOf(reinterpret_cast<std::uintptr_t>(&syscall));
    const BlockLock lock;
    if (!gbSearched.load(std::memory_order_relaxed)) goRuntimeCode = search.found;
    gbSearched.store(true, std::memory_order_release);  // pairs with the load above
}

bool StandardOutputIsHeld() noexcept {
    const DeferKill defer_kill;
    return IsHeld(stdout) || IsHeld(stderr);
}

bool MayHoldRuntimeLock(HNativeThread* block, const void* context) noexcept {
    const auto& interrupted = *static_cast<const ucontext_t*>(context);
    const ThreadPlace place = PlaceIn(interrupted);
    if (!IsRuntimeCode(place.mnCode) || IsIn(goRuntimeCode.yield, place.mnCode) ||
        IsWaitOfOurs(place.mnCode) || IsInterruptedCall(interrupted))
        return false;
    const unsigned int now = ReadTicks();
    const unsigned int requested_for = now - block->mnKillRequestedAt;
    const bool is_call = IsSystemCall(place.mnCode);
    const bool output_is_held = block->mbOutputIsHeld.load(std::memory_order_relaxed);
    if (requested_for >= kGiveUpMs) return false;
    if (is_call && !output_is_held) return !IsBlocked(block, place, now);
    block->moLastPlace = {};
    return !is_call || requested_for < kOutputMs;
}
