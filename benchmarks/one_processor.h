// Keeps the calling thread, and the threads that it makes, on one processor.
#ifndef ZANBASE_BENCHMARKS_ONE_PROCESSOR_H
#define ZANBASE_BENCHMARKS_ONE_PROCESSOR_H

#include <sched.h>

// For rows in which one thread wakes another. On two processors such a row measures where the system happens to
// put the threads: it varied eightfold from run to run.
class OneProcessor {
public:
    OneProcessor() {
        sched_getaffinity(0, sizeof mBefore, &mBefore);
        cpu_set_t one;
        CPU_ZERO(&one);
        CPU_SET(sched_getcpu(), &one);
        sched_setaffinity(0, sizeof one, &one);
    }
    ~OneProcessor() { sched_setaffinity(0, sizeof mBefore, &mBefore); }
    OneProcessor(const OneProcessor&) = delete;
    OneProcessor& operator=(const OneProcessor&) = delete;

private:
    cpu_set_t mBefore;
};

#endif
