// Runs a piece of a test in a process of its own: for first-call states, exit reports, environment variables,
// standard streams, and code that ends its process.
#ifndef ZANBASE_TESTS_RUN_IN_CHILD_H
#define ZANBASE_TESTS_RUN_IN_CHILD_H

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <functional>

#include "support/written_text.h"

struct ChildResult {
    int exit_code, signal;  // -1 and the signal, if one ended it; else the code and 0
    std::string out, err;   // what went to the standard streams
};

// Runs `body` in a fork of this process and ends it with `exit`, so that exit handlers and static destructors
// run; the exit code is what `body` returns. To be called before this process has started a thread.
inline ChildResult RunInChild(const std::function<int()>& body) {
    std::FILE* const files[] = {std::tmpfile(), std::tmpfile()};
    std::fflush(nullptr);
    const pid_t child = fork();
    if (child == 0) {
        for (int i = 0; i < 2; ++i) dup2(fileno(files[i]), STDOUT_FILENO + i);
        std::exit(body());
    }
    int status = 0;
    waitpid(child, &status, 0);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, WIFSIGNALED(status) ? WTERMSIG(status) : 0,
            TakeText(files[0]), TakeText(files[1])};
}

#endif
