// What the calling thread does with itself.
#include "platform/thread.h"
#include "platform/windows/system.h"

// This system ends a thread without an exception.
void RethrowThreadExit() {}

// The load pairs with every store to a slot: StartThread fills it, EmptySlot empties it.
bool HasThread(const ThreadSlot& slot) noexcept {
    return slot.load(std::memory_order_acquire) != nullptr && !IsLastThread();
}

unsigned int CurrentThreadId() noexcept { return GetCurrentThreadId(); }

void YieldThread() noexcept { SwitchToThread(); }
