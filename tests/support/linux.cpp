// The helpers of environment.h, blocked_thread.h and run_in_child.h on Linux.
#include <semaphore.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <thread>

#include "support/blocked_thread.h"
#include "support/environment.h"
#include "support/run_in_child.h"

const bool kExhaustedStackIsAFault = true;
extern "C" __attribute__((weak)) void __tsan_init();  // defined under the thread sanitizer
const bool kKillRunsTlsDestructors = __tsan_init != nullptr;

namespace {
sem_t held, released;
}

std::FILE* OpenTemporaryFile() { return std::tmpfile(); }

void SetEnvironment(const char* name, const char* value) {
    if (value == nullptr) {
        unsetenv(name);
    } else {
        setenv(name, value, 1);
    }
}

// Reads what the kernel reports of its threads.
void AwaitSleepOf(unsigned long long thread) {
    for (std::string state; state != "S"; std::this_thread::yield()) {
        std::ifstream status("/proc/self/task/" + std::to_string(thread) + "/stat");
        std::string number, name;
        status >> number >> name >> state;
    }
}

void HoldThread(unsigned long long thread) {
    sem_init(&held, 0, 0);
    sem_init(&released, 0, 0);
    signal(SIGUSR1, [](int) {
        sem_post(&held);
        while (sem_wait(&released) != 0) continue;
    });
    tgkill(getpid(), static_cast<pid_t>(thread), SIGUSR1);
    while (sem_wait(&held) != 0) continue;
}

void ReleaseThread(unsigned long long) { sem_post(&released); }

ChildResult RunInChild(const std::function<int()>& body) {
    std::FILE* const files[] = {OpenTemporaryFile(), OpenTemporaryFile()};
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
