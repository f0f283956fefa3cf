// What the back end keeps for each thread.
#ifndef ZANBASE_PLATFORM_LINUX_THREAD_SELF_H
#define ZANBASE_PLATFORM_LINUX_THREAD_SELF_H

#include <csetjmp>
#include <cstddef>

#include "platform/linux/build.h"

// siglongjmp without the check that _FORTIFY_SOURCE adds: the thread sanitizer does not intercept the checked
// one, so its record of the stack would keep the frames that the jump leaves.
extern "C" [[noreturn]] void JumpTo(sigjmp_buf place, int value) __asm__("siglongjmp");

struct FaultFrame;
struct HNativeThread;

// One per thread, all zero at its start. Accessed only by the thread itself and by its signal handlers.
struct ThreadSelf {
    HNativeThread* mpoBlock;    // null on a thread that StartThread did not make, and once its body has ended
    HNativeThread* mpoAwaited;  // the block that counts this thread as a waiter, or null
    FaultFrame* mpoFrame;       // the innermost frame of RunGuarded, or null
    sigjmp_buf* mpoKilledExit;  // see RunUntilKilled
    volatile unsigned int mnKillDeferrals;  // see DeferKill
    void (*volatile mpfnDeferredKill)();    // terminates the thread once no scope defers kills; null: no kill
    bool mbHasSignalStack;                  // InstallSignalStack installed one
    unsigned int mnNumber;                  // the system's number of the thread; 0: not asked for yet
};

extern ZANBASE_FAST_THREAD_LOCAL ThreadSelf toSelf;

// Enough for a crash handler of the program that runs after the stack is used up.
constexpr std::size_t kSignalStackBytes = 32768;

// Makes signal handlers of the calling thread run on `stack`, of kSignalStackBytes, so that they can run after
// its own stack is used up. Keeps an alternate stack that is set already, such as a sanitizer's.
void InstallSignalStack(void* stack) noexcept;

// Undoes InstallSignalStack.
void RemoveSignalStack() noexcept;

#endif
