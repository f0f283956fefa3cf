// Contract: threads that can be terminated from outside. A slot in the owner's object identifies each thread.
//
// A slot is null or points to the one thread that its owner owns. StartThread fills it before the first
// instruction of the body. When the body ends, the thread empties the slot if it still points to that thread,
// and accesses neither the slot nor its owner after that.
//
// All functions are thread-safe, except that only one thread at a time may start a slot.
#ifndef ZANBASE_PLATFORM_THREAD_H
#define ZANBASE_PLATFORM_THREAD_H

#include <atomic>
#include <string>

struct HNativeThread;
using ThreadSlot = std::atomic<HNativeThread*>;

// Starts a thread that calls body(argument), at level 3, the priority of the process. Returns 0, or the
// system's error number with the slot left empty.
// Requires: the slot is empty; only what RethrowThreadExit throws leaves the body.
int StartThread(ThreadSlot& slot, void (*body)(void*), void* argument) noexcept;

// The system's text for an error number of StartThread, as the system writes it: on Windows with a line end.
std::string SystemErrorText(int error);

// Whether a thread is in the slot. False also if the system has ended it, as Windows ends all threads but one when the
// process exits, before it destroys static objects of DLLs. False has acquire order after all that the thread did.
bool HasThread(const ThreadSlot& slot) noexcept;

// Waits until the thread in the slot has ended, including the destructors of its thread-local objects. Any
// number of threads may wait. Returns at once if the slot is empty or points to the calling thread.
void JoinThread(ThreadSlot& slot) noexcept;

// Terminates the thread in the slot asynchronously: no destructor, handler or exit routine of it runs, and
// what it holds stays held. A thread that has not entered its body does not enter it. Returns when no
// instruction of the thread can run any more, with the slot empty. Does not return on the thread in the slot
// itself.
void KillThread(ThreadSlot& slot) noexcept;

// Empties the slot. The thread continues, and no function can affect it any more; threads already in JoinThread
// keep waiting.
void DetachThread(ThreadSlot& slot) noexcept;

// Sets the priority of the thread in the slot: a level from 0 (idle) to 6 (time-critical); 3 is the priority
// of the process. Does nothing if the slot is empty. A refusal of the system is not reported.
void SetNativePriority(ThreadSlot& slot, int level) noexcept;

// Rethrows the exception by which the system ends a thread, if that is the current one; otherwise returns.
// Requires: called first in every `catch (...)` around the code of a body.
void RethrowThreadExit();

// The system's number of the calling thread, which no other living thread has.
unsigned int CurrentThreadId() noexcept;

// Offers the processor to other threads that are ready.
void YieldThread() noexcept;

#endif
