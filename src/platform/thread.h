// Contract: threads that can be ended from outside, each known by a slot in its owner's object.
//
// A slot is null, or leads to the one thread that its owner owns. StartThread fills it before the first
// instruction of the body; at the body's end the thread empties it, if it still leads to that thread, and
// touches neither the slot nor its owner after that. Any thread may call these functions on one slot at any
// time, except that a slot is started by one thread at a time, and only while it is empty.
#ifndef ZANBASE_PLATFORM_THREAD_H
#define ZANBASE_PLATFORM_THREAD_H

#include <atomic>
#include <string>

struct HNativeThread;
using ThreadSlot = std::atomic<HNativeThread*>;

// Starts a thread at the process's own priority, level 3, that calls body(argument); nothing but what
// RethrowThreadExit throws may leave the body. 0, or the system's number for what went wrong, with the slot
// left empty.
int StartThread(ThreadSlot& slot, void (*body)(void*), void* argument) noexcept;

// The system's text for a number that StartThread gave, without a line end.
std::string SystemErrorText(int error);

// Waits until the thread in the slot has ended, with the destructors of its thread-local objects. Returns at
// once if the slot is empty or leads to the calling thread.
void JoinThread(ThreadSlot& slot) noexcept;

// Ends the thread in the slot where it stands, or, if it has not yet entered its body, before it does: no
// destructor, handler or exit routine of it runs, and what it holds stays held. Returns when no instruction
// of it can run any more, with the slot empty; does not return on the thread in the slot itself.
void KillThread(ThreadSlot& slot) noexcept;

// Empties the slot; the thread runs on and can't be reached any more. Who waits for it already still does.
void DetachThread(ThreadSlot& slot) noexcept;

// Sets the priority of the thread in the slot: a level from 0 (idle) to 6 (time-critical); 3 is the priority of
// the process itself. Does nothing if the slot is empty. A refusal of the system is not reported.
void SetNativePriority(ThreadSlot& slot, int level) noexcept;

// To be called first in every `catch (...)` that may stand around the code of a body: where the system ends a
// thread by an exception of its own, this passes it on, so that the thread can end.
void RethrowThreadExit();

// A number that no other living thread of the system has.
unsigned int CurrentThreadId() noexcept;

// Lets another ready thread run first.
void YieldThread() noexcept;

#endif
