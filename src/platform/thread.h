// Contract: threads.
#ifndef ZANBASE_PLATFORM_THREAD_H
#define ZANBASE_PLATFORM_THREAD_H

// A number that no other living thread of the system has.
unsigned int CurrentThreadNumber() noexcept;

// Lets another ready thread run first.
void GiveWay() noexcept;

#endif
