// The registers of an interrupted thread, for each processor.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_PLACE_H
#define ZANBASE_PLATFORM_LINUX_THREAD_PLACE_H

#include <cerrno>
#include <cstdint>
#include <cstring>

#include <ucontext.h>

#include "platform/linux/thread_block.h"

#if defined(__x86_64__)

constexpr bool kKnowsPlaces = true;
constexpr unsigned char kSystemCallCode[] = {0x0f, 0x05};  // syscall

inline ThreadPlace PlaceIn(const ucontext_t& context) noexcept {
    const auto& registers = context.uc_mcontext.gregs;
    return {static_cast<std::uintptr_t>(registers[REG_RIP]), static_cast<std::uintptr_t>(registers[REG_RSP])};
}

inline long long ResultIn(const ucontext_t& context) noexcept { return context.uc_mcontext.gregs[REG_RAX]; }

// Sets rounding and traps of floating-point operations as the interrupted code had them; the system gives a
// signal handler the defaults.
inline void RestoreFloatControl(const ucontext_t& context) noexcept {
    const auto* const state = context.uc_mcontext.fpregs;
    if (state == nullptr) return;
    __asm__ volatile("fldcw %0\n\tldmxcsr %1" : : "m"(state->cwd), "m"(state->mxcsr));
}

#elif defined(__aarch64__)

constexpr bool kKnowsPlaces = true;
constexpr unsigned char kSystemCallCode[] = {0x01, 0x00, 0x00, 0xd4};  // svc #0

inline ThreadPlace PlaceIn(const ucontext_t& context) noexcept {
    return {context.uc_mcontext.pc, context.uc_mcontext.sp};
}

inline long long ResultIn(const ucontext_t& context) noexcept {
    return static_cast<long long>(context.uc_mcontext.regs[0]);
}

inline void RestoreFloatControl(const ucontext_t&) noexcept {}  // a handler runs with those of the thread

#else  // places are not looked at

constexpr bool kKnowsPlaces = false;
constexpr unsigned char kSystemCallCode[] = {0};
inline ThreadPlace PlaceIn(const ucontext_t&) noexcept { return {}; }
inline long long ResultIn(const ucontext_t&) noexcept { return 0; }
inline void RestoreFloatControl(const ucontext_t&) noexcept {}

#endif

// True if the instruction at `code` is a system call. A thread that a signal interrupts in a system call is
// at this instruction if the kernel restarts the call, and behind it if the call fails with EINTR.
inline bool IsSystemCall(std::uintptr_t code) noexcept {
    // NOLINTNEXTLINE(performance-no-int-to-ptr): a register holds the address
    return std::memcmp(reinterpret_cast<const void*>(code), kSystemCallCode, sizeof kSystemCallCode) == 0;
}

// True if the signal has made a system call fail.
inline bool IsInterruptedCall(const ucontext_t& context) noexcept {
    return ResultIn(context) == -EINTR && IsSystemCall(PlaceIn(context).mnCode - sizeof kSystemCallCode);
}

#endif
