// The mark of an exiting thread, which the C library sets in pthread_exit. Built without exceptions: then
// pthread_cleanup_push is the one of C, whose handler is called in this frame before any other is looked for.
#include "platform/linux/thread_exit.h"

#include <cstddef>

#include <execinfo.h>
#include <pthread.h>

namespace {

struct Call {
    void (*mpfnFunction)(void*);
    void* mpoArgument;
};

// The C library holds the lock of its list of threads from the first signal of such a change to the last
// answer. pthread_create acquires it to look for an unused stack. As no stack has this size, no thread is made.
void AwaitIdentityChange() noexcept {
    constexpr std::size_t kNoStackBytes = std::size_t{1} << 60U;
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    pthread_attr_setstacksize(&attributes, kNoStackBytes);
    pthread_t none{};
    pthread_create(
        &none, &attributes, [](void* nothing) { return nothing; }, nullptr);
}

// The handler that pthread_exit calls once it has marked the thread.
void CallLast(void* argument) {
    AwaitIdentityChange();
    const Call& last = *static_cast<Call*>(argument);
    last.mpfnFunction(last.mpoArgument);
}

}  // namespace

// backtrace() loads the unwinder, as pthread_exit does.
void PrepareThreadExit() noexcept {
    static const int kLoaded = [] {
        void* frame = nullptr;
        return backtrace(&frame, 1);
    }();
    static_cast<void>(kLoaded);
}

void CallAsExiting(void (*last)(void*), void* argument) noexcept {
    Call call{last, argument};
    pthread_cleanup_push(CallLast, &call);
    pthread_exit(nullptr);
    pthread_cleanup_pop(0);
}
