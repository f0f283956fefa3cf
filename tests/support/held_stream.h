// A report that has to wait for its stream.
#ifndef ZANBASE_TESTS_HELD_STREAM_H
#define ZANBASE_TESTS_HELD_STREAM_H

#include <atomic>
#include <cstdio>
#include <thread>

#include "platform/stream.h"
#include "support/blocked_thread.h"
#include "support/written_text.h"
#include "zanbase/thread.h"

// Owns a stream, calls `record` once `report` waits for it on another thread, and returns the report's text.
// A report that holds a mutex of `record` while it waits is a deadlock.
template <class Report>
std::string WrittenAfter(void (*record)(), Report report) {
    std::FILE* const stream = OpenTemporaryFile();
    std::atomic<unsigned long long> id{0};
    LockStream(stream);
    std::thread reporter([&] {
        id = HThread::GetCurrentThreadId();
        report(stream);
    });
    while (id == 0) std::this_thread::yield();
    AwaitSleepOf(id);
    record();
    UnlockStream(stream);
    reporter.join();
    return TakeText(stream);
}

#endif
