// Keeps pthread_cancel out of functions that are noexcept: a cancellation unwinds the thread, which would end
// the process there.
#ifndef ZANBASE_PLATFORM_LINUX_CANCELLATION_H
#define ZANBASE_PLATFORM_LINUX_CANCELLATION_H

#include <pthread.h>

// Disables cancellation of the calling thread for a scope. A request made meanwhile stays pending.
class NoCancellation {
public:
    NoCancellation() noexcept { pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &mnStateBefore); }
    ~NoCancellation() { pthread_setcancelstate(mnStateBefore, nullptr); }
    NoCancellation(const NoCancellation&) = delete;
    NoCancellation& operator=(const NoCancellation&) = delete;

private:
    int mnStateBefore = PTHREAD_CANCEL_ENABLE;
};

#endif
