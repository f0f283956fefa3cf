// Threads of the system, each with a block to which its slot points.
#include "platform/thread.h"

#include <new>

#include "platform/guard.h"
#include "platform/windows/thread_block.h"

namespace {

// Reserved for the filter of machine faults in an exhausted stack, and for the unwinding after it, which keeps several
// copies of all registers.
constexpr ULONG kFaultStackBytes = 64 * 1024;

constexpr int kPriorities[] = {THREAD_PRIORITY_IDLE,         THREAD_PRIORITY_LOWEST,
                               THREAD_PRIORITY_BELOW_NORMAL, THREAD_PRIORITY_NORMAL,
                               THREAD_PRIORITY_ABOVE_NORMAL, THREAD_PRIORITY_HIGHEST,
                               THREAD_PRIORITY_TIME_CRITICAL};

DWORD WINAPI Enter(void* argument) {
    const auto block = static_cast<HNativeThread*>(argument);
    ULONG bytes = kFaultStackBytes;
    SetThreadStackGuarantee(&bytes);
    // The first frame allocates the thread's exception state, under locks that a kill would leave held.
    static_cast<void>(RunGuarded([](void*) {}, nullptr));
    {
        const SpinLockHold hold(goBlockLock);  // waits until StartThread has filled the slot
        block->mnId = GetCurrentThreadId();
    }
    block->mpfnBody(block->mpoArgument);
    {
        const SpinLockHold hold(goBlockLock);
        EmptySlot(block);
    }
    RemoveUser(block);
    return 0;
}

// A thread that ended elsewhere, by ExitThread for example, has not emptied its slot.
void WaitForEnd(HNativeThread* block) noexcept {
    WaitForSingleObject(block->mpoHandle, INFINITE);
    bool has_left_body = false;
    {
        const SpinLockHold hold(goBlockLock);
        has_left_body = block->mpoSlot == nullptr;
        EmptySlot(block);
    }
    if (!has_left_body) RemoveUser(block);  // for the thread
    RemoveUser(block);
}

// Stops the thread, which then can't acquire goBlockLock any more. A system call that it is in may take longer to end.
// Requires: goBlockLock is held; the thread is in its body and is not the calling one.
void Terminate(HNativeThread* block) noexcept {
    CONTEXT context{};
    context.ContextFlags = CONTEXT_CONTROL;
    SuspendThread(block->mpoHandle);
    GetThreadContext(block->mpoHandle, &context);  // returns when the thread has stopped
    TerminateThread(block->mpoHandle, 0);
}

}  // namespace

int StartThread(ThreadSlot& slot, void (*body)(void*), void* argument) noexcept {
    const auto block = new (std::nothrow) HNativeThread{&slot, body, argument};
    if (block == nullptr) return ERROR_NOT_ENOUGH_MEMORY;
    const SpinLockHold hold(goBlockLock);
    block->mpoHandle = CreateThread(nullptr, 0, Enter, block, 0, nullptr);
    if (block->mpoHandle == nullptr) {
        const DWORD error = GetLastError();
        delete block;
        return static_cast<int>(error);
    }
    slot.store(block, std::memory_order_release);  // pairs with the load in HasThread
    return 0;
}

std::string SystemErrorText(int error) {
    constexpr DWORD kFlags =
        FORMAT_MESSAGE_ALLOCATE_BUFFER | FORMAT_MESSAGE_FROM_SYSTEM | FORMAT_MESSAGE_IGNORE_INSERTS;
    char* text = nullptr;  // ALLOCATE_BUFFER: the system stores a pointer in it
    FormatMessageA(kFlags, nullptr, static_cast<DWORD>(error), 0, reinterpret_cast<char*>(&text), 0, nullptr);
    std::string copy = text != nullptr ? text : "";
    LocalFree(text);
    return copy;
}

void JoinThread(ThreadSlot& slot) noexcept {
    HNativeThread* block = nullptr;
    {
        const SpinLockHold hold(goBlockLock);
        block = slot.load(std::memory_order_relaxed);
        if (block == nullptr || block->mnId == GetCurrentThreadId()) return;
        ++block->mnUsers;
    }
    WaitForEnd(block);
}

// A thread that is not in its body yet may hold the loader's lock. So it is not terminated: its body is removed, and it
// ends by itself.
void KillThread(ThreadSlot& slot) noexcept {
    HNativeThread* block = nullptr;
    DWORD id = 0;
    {
        const SpinLockHold hold(goBlockLock);
        block = slot.load(std::memory_order_relaxed);
        if (block == nullptr) return;
        id = block->mnId;
        if (id == 0) {
            block->mpfnBody = [](void*) {};
            ++block->mnUsers;
        } else {
            if (id != GetCurrentThreadId()) Terminate(block);
            EmptySlot(block);  // from here on this function is a user in place of the thread
        }
    }
    if (id != GetCurrentThreadId()) return WaitForEnd(block);
    RemoveUser(block);
    TerminateThread(GetCurrentThread(), 0);
}

void DetachThread(ThreadSlot& slot) noexcept {
    const SpinLockHold hold(goBlockLock);
    if (HNativeThread* const block = slot.load(std::memory_order_relaxed)) EmptySlot(block);
}

void SetNativePriority(ThreadSlot& slot, int level) noexcept {
    const SpinLockHold hold(goBlockLock);
    if (HNativeThread* const block = slot.load(std::memory_order_relaxed))
        SetThreadPriority(block->mpoHandle, kPriorities[level]);
}
