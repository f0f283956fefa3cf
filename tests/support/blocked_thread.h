// Whether a thread has gone to sleep, so that "it stays blocked" can be waited for and not guessed; and a thread that
// is held where it is.
#ifndef ZANBASE_TESTS_BLOCKED_THREAD_H
#define ZANBASE_TESTS_BLOCKED_THREAD_H

// Returns when the thread with this number of the system sleeps in the kernel; for a thread that sleeps for
// no other reason than the one meant.
void AwaitSleepOf(unsigned long long thread);

// Holds a thread, asleep or not, where it is until ReleaseThread. One at a time.
void HoldThread(unsigned long long thread);
void ReleaseThread(unsigned long long thread);

#endif
