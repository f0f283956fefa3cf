// The helpers of environment.h, blocked_thread.h and run_in_child.h on Linux.
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <thread>

#include "support/blocked_thread.h"
#include "support/environment.h"
#include "support/run_in_child.h"

const bool kConditionOutlivesKills = true;

void SetEnvironment(const char* name, const char* value) {
    if (value == nullptr) {
        unsetenv(name);
    } else {
        setenv(name, value, 1);
    }
}

// Reads what the kernel tells of its threads.
void AwaitSleepOf(unsigned long long thread) {
    for (std::string state; state != "S"; std::this_thread::yield()) {
        std::ifstream status("/proc/self/task/" + std::to_string(thread) + "/stat");
        std::string number, name;
        status >> number >> name >> state;
    }
}

ChildResult RunInChild(const std::function<int()>& body) {
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
