// A plain store that acts as a compare-and-store for the one thread that may make it. Half of what an
// uncontended lock costs is the locked instruction that gives it back; this is what takes its place.
//
// The test and the store form a restartable sequence: if the kernel interrupts the thread between the two, to
// run another thread or a signal handler, or because another thread calls BreakStores(), the sequence goes to
// its way out and the store is not made. So once a thread has changed the word and has called BreakStores(),
// every StoreIfStill() on it has either been made, and can be seen, or will see the change.
//
// It needs a C library that registers its threads for such sequences and a kernel that has the barrier for
// them. Elsewhere, and under the thread sanitizer, which can't see into the sequence, StoreIfStill() always
// fails and its callers go their ordinary way.
#ifndef ZANBASE_PLATFORM_LINUX_RESTARTABLE_H
#define ZANBASE_PLATFORM_LINUX_RESTARTABLE_H

#include "platform/linux/build.h"
#include "platform/linux/futex.h"

#if defined(__x86_64__) && defined(__LP64__) && !defined(ZANBASE_THREAD_SANITIZER) && __has_include(<sys/rseq.h>)

#define ZANBASE_RESTARTABLE_STORES

#include <cstddef>

#include <sys/rseq.h>

// Where a thread's registered area lies, from its thread pointer; 0: no restartable stores. Decided before
// the first use and never changed after that.
extern std::atomic<std::ptrdiff_t> gnRestartableArea;

// Decides whether there are restartable stores; to be called before a word is used with the other two.
void AllowRestartableStores() noexcept;

// If it gives true, no thread is between the test and the store of a StoreIfStill() that it began before. The
// process is registered for the barrier, and a child of fork with it, so it fails only where a filter for
// system calls came later; then such a store may still be made, within moments.
[[nodiscard]] bool BreakStores() noexcept;

// Stores `desired`, with release order, if `word` is `expected`. May fail for no reason.
inline bool StoreIfStill(FutexWord& word, unsigned int expected, unsigned int desired) noexcept {
    static_assert(RSEQ_SIG == 0x53053053 && offsetof(struct rseq, rseq_cs) == 8, "the literals below");
    const std::ptrdiff_t area = gnRestartableArea.load(std::memory_order_relaxed);
    if (__builtin_expect(area == 0, 0)) return false;
    // Both sections belong to the group of this code, and go with it where the linker drops a copy of it.
    // clang-format off
    asm goto(
        ".pushsection __rseq_cs, \"aw?\"\n"     // what the kernel reads about the sequence
        ".balign 32\n"
        "1: .long 0, 0\n"                       // version and flags
        "   .quad 2f, 3f - 2f, 4f\n"            // first instruction, length, way out
        ".popsection\n"
        "   leaq 1b(%%rip), %%rax\n"
        "   movq %%rax, %%fs:8(%[area])\n"      // from here on the kernel knows of it
        "2: cmpl %[expected], %[word]\n"
        "   jne %l[failed]\n"
        "   movl %[desired], %[word]\n"
        "3:\n"
        ".pushsection __rseq_failure, \"ax?\"\n"
        "   .byte 0x0f, 0xb9, 0x3d\n"           // an instruction that nobody runs, around the signature that
        "   .long 0x53053053\n"                 // the kernel wants to find before a way out
        "4: jmp %l[failed]\n"
        ".popsection\n"
        :
        : [area] "r"(area), [word] "m"(word), [expected] "ir"(expected), [desired] "ir"(desired)
        : "rax", "cc", "memory"
        : failed);
    // clang-format on
    return true;
failed:
    return false;
}

#else

inline void AllowRestartableStores() noexcept {}
inline bool BreakStores() noexcept { return true; }
inline bool StoreIfStill(FutexWord&, unsigned int, unsigned int) noexcept { return false; }

#endif

#endif
