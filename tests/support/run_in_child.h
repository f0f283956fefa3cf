// Runs a piece of a test in a process of its own: for first-call states, exit reports, environment variables,
// standard streams, and code that ends its process.
#ifndef ZANBASE_TESTS_RUN_IN_CHILD_H
#define ZANBASE_TESTS_RUN_IN_CHILD_H

#include <functional>
#include <string>

#include "support/written_text.h"

struct ChildResult {
    int exit_code, signal;  // -1 and the signal, if one ended it; else the code and 0
    std::string out, err;   // what went to the standard streams
};

// Runs `body` in a child process and ends that with `exit`, so that exit handlers and static destructors run; the
// exit code is what `body` returns. Requires: this process has not started a thread. On a system without fork the
// child is a second run of the same test up to this call, of which it runs the body only.
ChildResult RunInChild(const std::function<int()>& body);

#endif
