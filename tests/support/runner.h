// Thread objects: one whose Run calls any function, and one that counts its passes.
#ifndef ZANBASE_TESTS_RUNNER_H
#define ZANBASE_TESTS_RUNNER_H

#include <atomic>
#include <functional>
#include <utility>

#include "zanbase/hibernate_thread.h"

class Runner : public HThread {
public:
    Runner(std::function<void()> run) : moRun(std::move(run)) {}

    using HThread::_Run_;
    using HThread::DestroyThread;

    void RunToEnd() {
        Start(true);
        Wait();
    }

private:
    void Run() override { moRun(); }

    std::function<void()> moRun;
};

// Counts its passes.
struct Counter : HHibernateThread {
    std::atomic<int> passes{0};
    void Process() override { ++passes; }
};

#endif
