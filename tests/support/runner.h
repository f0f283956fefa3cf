// A thread object whose Run calls any function.
#ifndef ZANBASE_TESTS_RUNNER_H
#define ZANBASE_TESTS_RUNNER_H

#include <functional>
#include <utility>

#include "zanbase/thread.h"

class Runner : public HThread {
public:
    Runner(std::function<void()> run) : moRun(std::move(run)) {}

    using HThread::DestroyThread;

    void RunToEnd() {
        Start(true);
        Wait();
    }

private:
    void Run() override { moRun(); }

    std::function<void()> moRun;
};

#endif
