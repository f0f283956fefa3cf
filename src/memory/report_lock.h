// What a report owns while it writes: the mutex of its tables and the lock of its stream.
//
// Neither order of the two is safe. Mutex first deadlocks with a thread that owns the stream and records. Stream
// first deadlocks with a thread that owns the mutex and prints, opens a file or reports: a class derived from the
// tracker, or the write function of another report's stream. So a report that owns one of them only tries for
// the other; if that fails, it releases the first and waits for the second.
#ifndef ZANBASE_MEMORY_REPORT_LOCK_H
#define ZANBASE_MEMORY_REPORT_LOCK_H

#include <cstdio>

#include "platform/stream.h"
#include "zanbase/mutex.h"

class ReportLock {
public:
    // Calls `has_text` with the mutex owned. If it returns true, this object owns both; otherwise neither, and
    // the stream was not looked at. `has_text` is called again after each time the mutex was released, so what
    // it reads from the tables is up to date. Requires: `has_text` throws nothing.
    template <class HasText>
    ReportLock(const HMutex& mutex, std::FILE* stream, HasText has_text) : moMutex(mutex), mpoStream(stream) {
        for (;;) {
            mutex.Lock();
            if (!has_text()) break;
            if ((mbOwned = TryLockStream(stream))) return;
            mutex.Unlock();
            LockStream(stream);
            const bool acquired = mutex.TryLock();
            if (acquired && (mbOwned = has_text())) return;
            UnlockStream(stream);
            if (acquired) break;
        }
        mutex.Unlock();
    }

    ~ReportLock() {
        if (!mbOwned) return;
        UnlockStream(mpoStream);
        moMutex.Unlock();
    }

    ReportLock(const ReportLock&) = delete;
    ReportLock& operator=(const ReportLock&) = delete;

    // Whether this object owns both.
    explicit operator bool() const { return mbOwned; }

private:
    const HMutex& moMutex;
    std::FILE* const mpoStream;
    bool mbOwned = false;
};

#endif
