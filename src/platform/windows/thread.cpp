// Threads of the system, each with a block that its slot leads to.
//
// A block belongs to its users together: its thread until that has left the body or was killed, and each thread that
// waits for it. The last one frees it. A waiter that is killed never gives up its share, so its block stays.
#include "platform/thread.h"

#include <new>

#include "platform/windows/spin_lock.h"

// All but the handle is guarded by goBlocks.
struct HNativeThread {
    ThreadSlot* mpoSlot;  // null once the thread has no owner
    void (*mpfnBody)(void*);
    void* mpoArgument;
    HANDLE mpoHandle = nullptr;
    DWORD mnId = 0;  // 0 until the thread is about to enter its body
    int mnUsers = 1;
};

namespace {

constexpr ULONG kFaultStackBytes = 16 * 1024;  // what a used-up stack leaves to the filter of machine faults

constexpr int kPriorities[] = {THREAD_PRIORITY_IDLE,         THREAD_PRIORITY_LOWEST,
                               THREAD_PRIORITY_BELOW_NORMAL, THREAD_PRIORITY_NORMAL,
                               THREAD_PRIORITY_ABOVE_NORMAL, THREAD_PRIORITY_HIGHEST,
                               THREAD_PRIORITY_TIME_CRITICAL};

// A thread is killed under this lock, and so none is killed that holds it.
SpinLock goBlocks;

// Requires: goBlocks is held.
void EmptySlot(HNativeThread* block) noexcept {
    if (block->mpoSlot != nullptr) block->mpoSlot->store(nullptr, std::memory_order_release);
    block->mpoSlot = nullptr;
}

// Requires: goBlocks is not held.
void GiveUpShare(HNativeThread* block) noexcept {
    {
        const SpinLockHold hold(goBlocks);
        if (--block->mnUsers != 0) return;
    }
    CloseHandle(block->mpoHandle);
    delete block;
}

DWORD WINAPI Enter(void* argument) {
    const auto block = static_cast<HNativeThread*>(argument);
    ULONG bytes = kFaultStackBytes;
    SetThreadStackGuarantee(&bytes);
    {
        const SpinLockHold hold(goBlocks);  // waits until StartThread has filled the slot
        block->mnId = GetCurrentThreadId();
    }
    block->mpfnBody(block->mpoArgument);
    {
        const SpinLockHold hold(goBlocks);
        EmptySlot(block);
    }
    GiveUpShare(block);
    return 0;
}

void WaitForEnd(HNativeThread* block) noexcept {
    WaitForSingleObject(block->mpoHandle, INFINITE);
    GiveUpShare(block);
}

// Requires: goBlocks is held; the thread is in its body and is not the calling one.
void Terminate(HNativeThread* block) noexcept {
    TerminateThread(block->mpoHandle, 0);
    WaitForSingleObject(block->mpoHandle, INFINITE);
    EmptySlot(block);
}

}  // namespace

int StartThread(ThreadSlot& slot, void (*body)(void*), void* argument) noexcept {
    const auto block = new (std::nothrow) HNativeThread{&slot, body, argument};
    if (block == nullptr) return ERROR_NOT_ENOUGH_MEMORY;
    const SpinLockHold hold(goBlocks);
    block->mpoHandle = CreateThread(nullptr, 0, Enter, block, 0, nullptr);
    if (block->mpoHandle == nullptr) {
        const DWORD error = GetLastError();
        delete block;
        return static_cast<int>(error);
    }
    slot.store(block, std::memory_order_release);
    return 0;
}

std::string SystemErrorText(int error) {
    constexpr DWORD kFlags =
        FORMAT_MESSAGE_ALLOCATE_BUFFER | FORMAT_MESSAGE_FROM_SYSTEM | FORMAT_MESSAGE_IGNORE_INSERTS;
    char* text = nullptr;  // the system writes a pointer where it asks for a text
    FormatMessageA(kFlags, nullptr, static_cast<DWORD>(error), 0, reinterpret_cast<char*>(&text), 0, nullptr);
    std::string copy = text != nullptr ? text : "";
    LocalFree(text);
    return copy;
}

void JoinThread(ThreadSlot& slot) noexcept {
    HNativeThread* block = nullptr;
    {
        const SpinLockHold hold(goBlocks);
        block = slot.load(std::memory_order_relaxed);
        if (block == nullptr || block->mnId == GetCurrentThreadId()) return;
        ++block->mnUsers;
    }
    WaitForEnd(block);
}

// A thread that is not in its body yet may hold the loader's lock. So its body is taken away, and it ends by itself.
void KillThread(ThreadSlot& slot) noexcept {
    HNativeThread* block = nullptr;
    DWORD id = 0;
    {
        const SpinLockHold hold(goBlocks);
        block = slot.load(std::memory_order_relaxed);
        if (block == nullptr) return;
        id = block->mnId;
        if (id == 0) {
            block->mpfnBody = [](void*) {};
            ++block->mnUsers;
        } else if (id == GetCurrentThreadId()) {
            EmptySlot(block);
        } else {
            Terminate(block);
        }
    }
    if (id == 0) return WaitForEnd(block);
    GiveUpShare(block);  // for the thread
    if (id == GetCurrentThreadId()) TerminateThread(GetCurrentThread(), 0);
}

void DetachThread(ThreadSlot& slot) noexcept {
    const SpinLockHold hold(goBlocks);
    if (HNativeThread* const block = slot.load(std::memory_order_relaxed)) EmptySlot(block);
}

void SetNativePriority(ThreadSlot& slot, int level) noexcept {
    const SpinLockHold hold(goBlocks);
    if (HNativeThread* const block = slot.load(std::memory_order_relaxed))
        SetThreadPriority(block->mpoHandle, kPriorities[level]);
}

// The system ends a thread without an exception.
void RethrowThreadExit() {}

unsigned int CurrentThreadId() noexcept { return GetCurrentThreadId(); }

void YieldThread() noexcept { SwitchToThread(); }
