// A thread may hold a lock of the C library while it executes the library's code, or code that the kernel
// lends to it. It can stay there for long in a system call only; of those places these are taken for safe:
//
// - In sched_yield: the library doesn't call that under a lock, and a thread may do nothing else.
// - In a wait of ours: it came through the library's bare system call.
// - Behind a system call that the signal has cut short: the library makes no such call under its own locks,
//   and the thread must not go on as if the wait were over.
// - At the same system call with the same stack for a while: it waits for input, or for a mutex of the
//   program. The library's own locks are free again sooner, unless the machine is very busy.
//
// What remains: a thread that waits for room in a stream (a full pipe, say) dies with the stream locked, and
// so does one that executes the program's code under a lock of the library, as a callback of dl_iterate_phdr.
#include "platform/linux/thread_kill_safety.h"

#include <algorithm>
#include <cerrno>
#include <iterator>

#include <dlfcn.h>
#include <gnu/libc-version.h>
#include <link.h>
#include <sched.h>
#include <sys/auxv.h>
#include <ucontext.h>

#include "platform/clock.h"
#include "platform/linux/thread_block.h"

namespace {

struct CodeRange {
    std::uintptr_t begin;
    std::uintptr_t end;
};

struct LibraryCode {
    CodeRange ranges[4];  // those not found stay empty
    std::size_t count;
};

LibraryCode goLibraryCode{};  // complete before the first thread is made

// A thread that is never found outside the library, as one that fills memory in a loop, is given up after
// this time, and with it what it holds.
constexpr unsigned int kPatienceMs = 10000;

// What stands at one system call for so long waits there.
constexpr unsigned int kWaitMs = 10;

bool Contains(const dl_phdr_info* module, std::uintptr_t address) noexcept {
    return std::any_of(module->dlpi_phdr, module->dlpi_phdr + module->dlpi_phnum, [=](const auto& segment) {
        const std::uintptr_t begin = module->dlpi_addr + segment.p_vaddr;
        return segment.p_type == PT_LOAD && address - begin < segment.p_memsz;
    });
}

struct Search {
    std::uintptr_t marks[4];  // addresses within the modules wanted
    LibraryCode found;
};

// Notes the code of a module in which a mark lies. The program itself, the module without a name, is left
// out, also if it brings an allocator: its own code isn't library code.
int NoteLibraryCode(dl_phdr_info* module, std::size_t, void* argument) {
    auto& [marks, found] = *static_cast<Search*>(argument);
    const auto lies_here = [=](std::uintptr_t mark) { return Contains(module, mark); };
    if (module->dlpi_name[0] == '\0' || std::none_of(std::begin(marks), std::end(marks), lies_here)) return 0;
    for (int i = 0; i < module->dlpi_phnum; ++i) {
        const auto& segment = module->dlpi_phdr[i];
        if (segment.p_type != PT_LOAD || (segment.p_flags & PF_X) == 0) continue;
        if (found.count == std::size(found.ranges)) break;
        const std::uintptr_t begin = module->dlpi_addr + segment.p_vaddr;
        found.ranges[found.count++] = {begin, begin + segment.p_memsz};
    }
    return 0;
}

bool InLibraryCode(std::uintptr_t code) noexcept {
    return std::any_of(std::begin(goLibraryCode.ranges), std::end(goLibraryCode.ranges),
                       [=](const CodeRange& range) { return range.begin <= code && code < range.end; });
}

// Where the context of a signal handler says that the thread stands, and whether a system call has just been
// cut short there. Elsewhere nothing is known, and a thread dies where it is.
#if defined(__x86_64__) && \
    !defined(ZANBASE_THREAD_SANITIZER)  // which may show a place that was left long ago

constexpr bool kKnowsPlaces = true;

ThreadPlace PlaceIn(const ucontext_t& context) noexcept {
    const auto& registers = context.uc_mcontext.gregs;
    return {static_cast<std::uintptr_t>(registers[REG_RIP]), static_cast<std::uintptr_t>(registers[REG_RSP])};
}

// May also be asked for the two bytes before and behind a range of code.
bool IsSystemCall(std::uintptr_t code) noexcept {
    const auto* const bytes = reinterpret_cast<const unsigned char*>(code);
    return bytes[0] == 0x0f && bytes[1] == 0x05;
}

bool IsCutShort(const ucontext_t& context) noexcept {
    return context.uc_mcontext.gregs[REG_RAX] == -EINTR && IsSystemCall(PlaceIn(context).mnCode - 2);
}

#else

constexpr bool kKnowsPlaces = false;
ThreadPlace PlaceIn(const ucontext_t&) noexcept { return {}; }
bool IsSystemCall(std::uintptr_t) noexcept { return false; }
bool IsCutShort(const ucontext_t&) noexcept { return false; }

#endif

}  // namespace

// The search takes locks of the loader, so it isn't made under the block lock: whoever holds those may want
// that.
void FindLibraryCode() noexcept {
    Search search{
        {reinterpret_cast<std::uintptr_t>(&gnu_get_libc_version),
         getauxval(AT_BASE),          // the loader
         getauxval(AT_SYSINFO_EHDR),  // what the kernel lends to the library
         reinterpret_cast<std::uintptr_t>(dlsym(RTLD_DEFAULT, "malloc"))},  // may come from elsewhere
        {}};
    if (kKnowsPlaces) dl_iterate_phdr(NoteLibraryCode, &search);
    const BlockLock lock;
    if (goLibraryCode.count == 0) goLibraryCode = search.found;
}

bool MayHoldLibraryLock(HNativeThread* block, const void* context) noexcept {
    const auto& interrupted = *static_cast<const ucontext_t*>(context);
    const ThreadPlace place = PlaceIn(interrupted);
    constexpr std::uintptr_t kYieldBytes = 16;
    const bool yields = place.mnCode - reinterpret_cast<std::uintptr_t>(&sched_yield) < kYieldBytes;
    const bool waits_for_us = toPendingWakeups.mpoWord != nullptr || toPendingWakeups.mpoCondition != nullptr;
    if (!InLibraryCode(place.mnCode) || yields || waits_for_us || IsCutShort(interrupted)) return false;
    const unsigned int now = ReadTicks();
    ThreadPlace& last = block->moLastPlace;
    if (!IsSystemCall(place.mnCode) || place.mnCode != last.mnCode || place.mnStack != last.mnStack) {
        last = place;
        block->mnLastPlaceSince = now;
    }
    return now - block->mnLastPlaceSince < kWaitMs && now - block->mnAskedAt < kPatienceMs;
}
