// The calling thread's own record: its number and its stack for signal handlers.
#include "platform/linux/thread_self.h"

#include <signal.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "platform/thread.h"

ZANBASE_FAST_THREAD_LOCAL ThreadSelf toSelf;

// Pairs with every store to a slot: OpenBlock fills it, EmptySlot and DetachThread empty it.
bool HasThread(const ThreadSlot& slot) noexcept { return slot.load(std::memory_order_acquire) != nullptr; }

unsigned int CurrentThreadId() noexcept {
    // The system call takes thirty times as long as the copy. The child of a fork drops the copy.
    if (__builtin_expect(toSelf.mnNumber == 0, 0))
        toSelf.mnNumber = static_cast<unsigned int>(syscall(SYS_gettid));
    return toSelf.mnNumber;
}

void InstallSignalStack(void* stack) noexcept {
    stack_t ours{};
    ours.ss_sp = stack;
    ours.ss_size = kSignalStackBytes;
    stack_t previous{};
    sigaltstack(&ours, &previous);
    toSelf.mbHasSignalStack = (previous.ss_flags & SS_DISABLE) != 0;
    if (!toSelf.mbHasSignalStack) sigaltstack(&previous, nullptr);
}

void RemoveSignalStack() noexcept {
    stack_t none{};
    none.ss_flags = SS_DISABLE;
    if (toSelf.mbHasSignalStack) sigaltstack(&none, nullptr);
    toSelf.mbHasSignalStack = false;
}
