// What the calling thread does with itself.
#include "platform/thread.h"
#include "platform/windows/system.h"

// This system ends a thread without an exception.
void RethrowThreadExit() {}

unsigned int CurrentThreadId() noexcept { return GetCurrentThreadId(); }

void YieldThread() noexcept { SwitchToThread(); }
