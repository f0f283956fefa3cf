// The lifetime of a thread's block.
#include "platform/windows/thread_block.h"

void EmptySlot(HNativeThread* block) noexcept {
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
