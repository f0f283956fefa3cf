// Where the threads of a benchmark run. The system's own choice varied a row eightfold from run to run.
#ifndef ZANBASE_BENCHMARKS_PLACEMENT_H
#define ZANBASE_BENCHMARKS_PLACEMENT_H

#include <sched.h>

// Keeps the calling thread, and the threads that it makes, on one processor for a scope.
class Placement {
public:
    Placement(const Placement&) = delete;
    Placement& operator=(const Placement&) = delete;
    ~Placement() { sched_setaffinity(0, sizeof moBefore, &moBefore); }

protected:
    Placement() { sched_getaffinity(0, sizeof moBefore, &moBefore); }

    static void Place(int processor) {
        cpu_set_t one;
        CPU_ZERO(&one);
        CPU_SET(processor, &one);
        sched_setaffinity(0, sizeof one, &one);
    }

    cpu_set_t moBefore;
};

// The processor that the thread is on: for rows in which one thread wakes another.
class OneProcessor : Placement {
public:
    OneProcessor() { Place(sched_getcpu()); }
};

// A processor for each thread of a row, by the thread's number; threads beyond the processors share them.
class OwnProcessor : Placement {
public:
    explicit OwnProcessor(int thread) {
        int left = thread % CPU_COUNT(&moBefore);
        int processor = 0;
        while (!CPU_ISSET(processor, &moBefore) || left-- != 0) ++processor;
        Place(processor);
    }
};

#endif
