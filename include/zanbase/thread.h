/// @file
/// The thread object that callers derive from, and the library's notion of which thread is which.
#ifndef ZANBASE_THREAD_H
#define ZANBASE_THREAD_H

#include "zanbase/export.h"

/// A thread: a subclass says in `Run` what it does.
class ZANBASE_API HThread {
public:
    /// The calling thread's number in the system. It never has more than 32 bits, is the same on every call
    /// from one thread, and differs between threads that live at the same time; the system may give the
    /// number of a thread that has ended to a new one. Cheap; the child of a fork gets a number of its own.
    [[nodiscard]] static unsigned long long GetCurrentThreadId();
};

#endif
