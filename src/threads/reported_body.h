// Runs a caller's code; an exception or machine fault in it is printed and ends there.
#ifndef ZANBASE_THREADS_REPORTED_BODY_H
#define ZANBASE_THREADS_REPORTED_BODY_H

#include <exception>

#include "platform/guard.h"
#include "platform/thread.h"
#include "threads/print_line.h"

// Calls body(argument). If an exception or a machine fault ends it, prints one line on standard output that
// begins with `where`. Thread-safe.
inline void RunReported(const char* where, void (*body)(void*), void* argument) {
    const auto report_unknown = [=] { PrintLine("%s Unknown exception.\n", where); };
    try {
        if (RunGuarded(body, argument)) report_unknown();  // a machine fault
    } catch (const std::exception& exception) {
        PrintLine("%s Uncaught exception: %s\n", where, exception.what());
    } catch (...) {
        RethrowThreadExit();
        report_unknown();  // before the exception is destroyed
    }
}

#endif
