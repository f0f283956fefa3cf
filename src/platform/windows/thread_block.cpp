// The lifetime of a thread's block.
#include "platform/windows/thread_block.h"

void EmptySlot(HNativeThread* block) noexcept {
    // Release, for the load in HasThread: a thread that finds the slot empty sees what the ended thread wrote.
    if (block->mpoSlot != nullptr) block->mpoSlot->store(nullptr, std::memory_order_release);
    block->mpoSlot = nullptr;
}

void RemoveUser(HNativeThread* block) noexcept {
    {
        const SpinLockHold hold(goBlockLock);
        if (--block->mnUsers != 0) return;
    }
    CloseHandle(block->mpoHandle);
    delete block;
}
