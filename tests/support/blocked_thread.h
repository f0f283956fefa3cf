// Whether a thread has gone to sleep, so that "it stays blocked" can be waited for and not guessed; and a thread that
// is held where it is.
#ifndef ZANBASE_TESTS_BLOCKED_THREAD_H
#define ZANBASE_TESTS_BLOCKED_THREAD_H

#include <atomic>
#include <thread>

#include "platform/thread.h"

// Returns when the thread with this number of the system sleeps in the kernel; for a thread that sleeps for
// no other reason than the one meant.
void AwaitSleepOf(unsigned long long thread);

// Runs `body` on another thread and returns once that thread sleeps in it.
template <class Body>
std::thread SleepIn(Body body) {
    std::atomic<unsigned int> id{0};
    std::thread thread([&id, body] {
        id = CurrentThreadId();
        body();
    });
    while (id == 0) YieldThread();
    AwaitSleepOf(id);
    return thread;
}

// Holds a thread, asleep or not, where it is until ReleaseThread. One at a time.
void HoldThread(unsigned long long thread);
void ReleaseThread(unsigned long long thread);

#endif
