// Runs a piece of a test in a process of its own: for first-call states, exit reports, environment variables,
// standard streams, and code that ends its process.
#ifndef ZANBASE_TESTS_RUN_IN_CHILD_H
#define ZANBASE_TESTS_RUN_IN_CHILD_H

#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <functional>
#include <string>

struct ChildResult {
    int exit_code = -1;  // -1: ended by a signal
    int signal = 0;      // 0: ended by itself
    std::string out;     // what went to standard output
    std::string err;     // what went to standard error
};

// Runs `body` in a fork of this process and ends it with `exit`, so that exit handlers and static destructors
// run; the exit code is what `body` returns. To be called before this process has started a thread.
inline ChildResult RunInChild(const std::function<int()>& body) {
    std::FILE* const out = std::tmpfile();
    std::FILE* const err = std::tmpfile();
    std::fflush(nullptr);
    const pid_t child = fork();
    if (child == 0) {
        dup2(fileno(out), STDOUT_FILENO);
        dup2(fileno(err), STDERR_FILENO);
        std::exit(body());
    }
    int status = 0;
    waitpid(child, &status, 0);
    ChildResult result;
    if (WIFEXITED(status)) result.exit_code = WEXITSTATUS(status);
    if (WIFSIGNALED(status)) result.signal = WTERMSIG(status);
    const auto text_of = [](std::FILE* file) {
        std::string text;
        std::rewind(file);
        for (int c = std::fgetc(file); c != EOF; c = std::fgetc(file)) text += static_cast<char>(c);
        std::fclose(file);
        return text;
    };
    result.out = text_of(out);
    result.err = text_of(err);
    return result;
}

#endif
