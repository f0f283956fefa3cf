// Runs the code of a caller so that what goes wrong in it is printed and goes no further.
#ifndef ZANBASE_THREADS_REPORTED_BODY_H
#define ZANBASE_THREADS_REPORTED_BODY_H

#include <cstdio>
#include <exception>

#include "platform/guard.h"
#include "platform/thread.h"

// Calls body(argument). An exception or a machine fault that ends it becomes one line on standard output,
// which begins with `where`.
inline void RunReported(const char* where, void (*body)(void*), void* argument) {
    try {
        if (!RunGuarded(body, argument)) return;
        // A machine fault counts as an exception of no known type.
    } catch (const std::exception& exception) {
        std::printf("%s Uncaught exception: %s\n", where, exception.what());
        return;
    } catch (...) {
        RethrowThreadExit();
    }
    std::printf("%s Unknown exception.\n", where);
}

#endif
