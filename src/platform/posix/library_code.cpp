// A thread may hold a lock of the C library while it executes the library's code. It can stay there for long
// in a system call only; so of those places these are taken for safe:
//
//   in sched_yield                       nothing in the library calls that with a lock held, and a thread may
//                                        do nothing else
//   in a wait of ours                    it came through the library's bare system call
//   behind a system call cut short by    the library doesn't make such calls under its own locks, and must
//   the signal                           go on as if the wait were over
//   at the same system call, with the    it waits there: for input, for a mutex of the program. The library's
//   same stack, for the second time      own locks are held for less than the pause between two tries
//
// What remains: a thread that waits for output to a stream (to a full pipe, say) dies with the stream locked,
// and so does one that executes the program's code under a lock of the library, as a callback of
// dl_iterate_phdr.
#include "platform/posix/library_code.h"

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
#include "platform/posix/thread_block.h"

namespace {

struct CodeRange {
    std::uintptr_t begin;
    std::uintptr_t end;
};

CodeRange gaLibraryCode[3];  // C library, loader, and the allocator if it came from elsewhere; else empty

// A thread that is never found outside the library, as one that fills memory in a loop, is given up after
// this time, and with it what it holds.
constexpr unsigned int kPatienceMs = 10000;

// What stands at one system call for so long waits there.
constexpr unsigned int kWaitMs = 2;

bool Contains(const dl_phdr_info* module, std::uintptr_t address) noexcept {
    return std::any_of(module->dlpi_phdr, module->dlpi_phdr + module->dlpi_phnum, [=](const auto& segment) {
        const std::uintptr_t begin = module->dlpi_addr + segment.p_vaddr;
        return segment.p_type == PT_LOAD && address - begin < segment.p_memsz;
    });
}

// Notes the code of a module in which one of the marks lies. The program itself, the module without a name,
// is left out, also if it brings an allocator: its own code isn't library code.
int NoteLibraryCode(dl_phdr_info* module, std::size_t, void* next) {
    const std::uintptr_t marks[] = {reinterpret_cast<std::uintptr_t>(&gnu_get_libc_version),
                                    static_cast<std::uintptr_t>(getauxval(AT_BASE)),
                                    reinterpret_cast<std::uintptr_t>(dlsym(RTLD_DEFAULT, "malloc"))};
    if (module->dlpi_name[0] == '\0' ||
        !std::any_of(std::begin(marks), std::end(marks), [=](auto mark) { return Contains(module, mark); }))
        return 0;
    auto*& range = *static_cast<CodeRange**>(next);
    for (int i = 0; i < module->dlpi_phnum && range != std::end(gaLibraryCode); ++i) {
        const auto& segment = module->dlpi_phdr[i];
        if (segment.p_type != PT_LOAD || (segment.p_flags & PF_X) == 0) continue;
        range->begin = module->dlpi_addr + segment.p_vaddr;
        range->end = range->begin + segment.p_memsz;
        ++range;
    }
    return 0;
}

bool InLibraryCode(std::uintptr_t code) noexcept {
    return std::any_of(std::begin(gaLibraryCode), std::end(gaLibraryCode),
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

void FindLibraryCode() noexcept {
    CodeRange* next = gaLibraryCode;
    if (kKnowsPlaces) dl_iterate_phdr(NoteLibraryCode, &next);
}

bool MayHoldLibraryLock(NativeThread* block, const void* context) noexcept {
    const auto& interrupted = *static_cast<const ucontext_t*>(context);
    const ThreadPlace place = PlaceIn(interrupted);
    constexpr std::uintptr_t kYieldBytes = 16;
    const bool yields = place.mnCode - reinterpret_cast<std::uintptr_t>(&sched_yield) < kYieldBytes;
    const bool waits_for_us = toWakeDebts.mpoWord != nullptr || toWakeDebts.mpoCondition != nullptr;
    if (!InLibraryCode(place.mnCode) || yields || waits_for_us || IsCutShort(interrupted)) return false;
    const unsigned int now = ReadTicks();
    ThreadPlace& last = block->moLastPlace;
    if (!IsSystemCall(place.mnCode) || place.mnCode != last.mnCode || place.mnStack != last.mnStack) {
        last = place;
        block->mnLastPlaceSince = now;
    }
    return now - block->mnLastPlaceSince < kWaitMs && now - block->mnAskedAt < kPatienceMs;
}
