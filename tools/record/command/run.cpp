// Running a program with the recorder in it.
#include "run.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <sstream>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include "checks.h"

namespace recorder {
namespace {

constexpr int kBudgetBroke = 3;
constexpr int kCannotRecord = 125;
constexpr int kCannotRun = 126;
constexpr int kNotFound = 127;

void Say(const std::string& text) { std::fprintf(stderr, "zanbase-record: %s\n", text.c_str()); }

// The preload library has its place relative to the command, in the build folder and installed.
std::string PreloadLibrary() {
    std::array<char, 4096> path{};
    if (readlink("/proc/self/exe", path.data(), path.size() - 1) <= 0) return {};
    const std::string command = path.data();
    const std::string folder = command.substr(0, command.rfind('/') + 1);
    for (const char* place : {ZANBASE_PRELOAD_INSTALLED, ZANBASE_PRELOAD_BUILT}) {
        const std::string library = folder + place;
        if (access(library.c_str(), R_OK) == 0) return library;
    }
    return {};
}

// The library writes there that it reported, and which budgets broke. The number is one that programs leave
// alone; it stays open in the program and its children.
int MakeResultFile() {
    constexpr int kFirst = 900;
    const int low = memfd_create(kResultName, MFD_CLOEXEC);
    const int high = fcntl(low, F_DUPFD, kFirst);
    close(low);
    return high;
}

std::string ReadResult(int file) {
    std::string text;
    std::array<char, 4096> part{};
    for (ssize_t got = 0; (got = pread(file, part.data(), part.size(), static_cast<off_t>(text.size()))) > 0;)
        text.append(part.data(), static_cast<std::size_t>(got));
    return text;
}

[[noreturn]] void Execute(const std::string& path, RunOptions& options, const std::string& library) {
    const char* const others = std::getenv("LD_PRELOAD");
    std::string& rest = options.settings.other_preloads;
    rest = others != nullptr ? others : "";
    options.settings.process = getpid();
    setenv("LD_PRELOAD", (rest.empty() ? library : library + ":" + rest).c_str(), 1);
    setenv(kSettingsVariable, SettingsText(options.settings).c_str(), 1);
    std::vector<char*> arguments;
    for (std::string& argument : options.program) arguments.push_back(argument.data());
    arguments.push_back(nullptr);
    execv(path.c_str(), arguments.data());
    Say("cannot run " + path + ": " + std::strerror(errno));
    _exit(kCannotRun);
}

int Conclude(const std::string& path, int status, const std::string& result) {
    const bool reported = !result.empty();
    if (WIFSIGNALED(status)) {
        const int signal = WTERMSIG(status);
        if (!reported) {
            Say(path + " was ended by signal " + std::to_string(signal) + " (" + strsignal(signal) +
                "): its accounts may be halfway through a change, so there is no report");
        }
        return 128 + signal;
    }
    const int exit_status = WEXITSTATUS(status);
    if (!reported && exit_status != kCannotRun) {
        Say(path +
            " left no report: another program took its place, or it ended by a system call of its own "
            "or in a signal handler that interrupted an allocator");
    }
    bool broke = false;
    std::istringstream lines(result);
    for (std::string line; std::getline(lines, line);) {
        if (line + "\n" == kReportedLine) continue;
        Say(line);
        broke = true;
    }
    return broke && exit_status == 0 ? kBudgetBroke : exit_status;
}

// True if nothing of the program can be recorded, which is said.
bool IsRefused(const std::string& path, Settings& settings) {
    const Recordable recordable = CheckProgram(path);
    if (!recordable.refusal.empty()) Say(recordable.refusal);
    if (!recordable.memory_missing.empty() && settings.memory) {
        Say(recordable.memory_missing + ", so memory is not recorded");
        settings.memory = false;
    }
    return !recordable.refusal.empty() || (!settings.memory && !settings.disk);
}

}  // namespace

int RunRecorded(RunOptions options) {
    const std::string path = FindProgram(options.program.front());
    if (path.empty()) {
        Say("no such program: " + options.program.front());
        return kNotFound;
    }
    if (IsRefused(path, options.settings)) return kCannotRecord;
    const std::string library = PreloadLibrary();
    const int result = MakeResultFile();
    if (library.empty() || result < 0) {
        Say(library.empty() ? "the preload library is missing" : "cannot make a file in memory");
        return kCannotRecord;
    }
    options.settings.result_descriptor = result;
    const pid_t program = fork();
    if (program < 0) {
        Say(std::string("cannot start a process: ") + std::strerror(errno));
        return kCannotRun;
    }
    if (program == 0) Execute(path, options, library);
    // The terminal sends these to the program as well; the command stays to tell what became of it.
    std::signal(SIGINT, SIG_IGN);
    std::signal(SIGQUIT, SIG_IGN);
    int status = 0;
    while (waitpid(program, &status, 0) < 0 && errno == EINTR) {
    }
    return Conclude(path, status, ReadResult(result));
}

}  // namespace recorder
