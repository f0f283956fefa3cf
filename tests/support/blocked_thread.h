// Whether a thread has gone to sleep, so that "it stays blocked" can be waited for and not guessed. Reads what
// the kernel tells of its threads.
#ifndef ZANBASE_TESTS_BLOCKED_THREAD_H
#define ZANBASE_TESTS_BLOCKED_THREAD_H

#include <fstream>
#include <string>
#include <thread>

// Returns when the thread with this number of the system sleeps in the kernel; for a thread that sleeps for
// no other reason than the one meant.
inline void AwaitSleepOf(unsigned long long thread) {
    for (std::string state; state != "S"; std::this_thread::yield()) {
        std::ifstream status("/proc/self/task/" + std::to_string(thread) + "/stat");
        std::string number, name;
        status >> number >> name >> state;
    }
}

#endif
