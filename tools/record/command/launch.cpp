// Starting a program with the preload library in it.
#include "launch.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <stdexcept>
#include <vector>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

namespace recorder {
namespace {

// The library has its place relative to the command, in the build folder and installed.
std::string FindLibrary() {
    std::array<char, 4096> path{};
    if (readlink("/proc/self/exe", path.data(), path.size() - 1) > 0) {
        const std::string command = path.data();
        const std::string folder = command.substr(0, command.rfind('/') + 1);
        for (const char* place : {ZANBASE_PRELOAD_INSTALLED, ZANBASE_PRELOAD_BUILT})
            if (access((folder + place).c_str(), R_OK) == 0) return folder + place;
    }
    throw std::runtime_error("the preload library is missing");
}

template <std::size_t kSize>
void Fill(std::array<char, kSize>& place, const std::string& text) {
    if (text.size() >= kSize) throw std::runtime_error("LD_PRELOAD is too long to add the recorder to it");
    std::memcpy(place.data(), text.c_str(), text.size() + 1);
}

// A number that programs don't use, within what any process may use. It stays open in the program until the
// library has the file, and for as long as processes are followed.
int InheritedCopy(int file) {
    rlimit limit{};
    constexpr rlim_t kBelow = 1024;
    const rlim_t end = getrlimit(RLIMIT_NOFILE, &limit) == 0 ? std::min(limit.rlim_cur, kBelow) : kBelow;
    const int high = fcntl(file, F_DUPFD, static_cast<int>(end > 16 ? end - 16 : 3));
    return high >= 0 ? high : dup(file);
}

[[noreturn]] void Execute(const std::string& path, const RunOptions& options, AccountFile& file) {
    struct stat status {};
    const int inherited = InheritedCopy(file.descriptor());
    if (inherited < 0 || fstat(inherited, &status) != 0) {
        Say(std::string("no descriptor is left: ") + std::strerror(errno));
        _exit(kCannotRecord);
    }
    file.control().process = getpid();
    setenv(kPreloadVariable, file.control().library.data(), 1);
    const std::string value = std::to_string(inherited) + "," + std::to_string(status.st_ino) + "," +
                              std::to_string(file.control().command) + "," +
                              std::to_string(file.descriptor());
    setenv(kFileVariable, value.c_str(), 1);
    std::vector<char*> arguments;
    for (const std::string& argument : options.program)
        arguments.push_back(const_cast<char*>(argument.c_str()));
    arguments.push_back(nullptr);
    execv(path.c_str(), arguments.data());
    Say("cannot run " + path + ": " + std::strerror(errno));
    _exit(kCannotRun);
}

}  // namespace

void Say(const std::string& text) { std::fprintf(stderr, "zanbase-record: %s\n", text.c_str()); }

PreloadLibrary::PreloadLibrary() : moPath(FindLibrary()) {
    if (moPath.find_first_of(" \t\n:") == std::string::npos) return;
    std::string folder = "/tmp/zanbase-record-XXXXXX";
    if (mkdtemp(folder.data()) == nullptr || symlink(moPath.c_str(), (folder + "/preload.so").c_str()) != 0)
        throw std::runtime_error(std::string("cannot make a link to the preload library: ") +
                                 std::strerror(errno));
    moFolder = folder;
    moPath = folder + "/preload.so";
}

PreloadLibrary::~PreloadLibrary() {
    if (moFolder.empty()) return;
    unlink(moPath.c_str());
    rmdir(moFolder.c_str());
}

HeldSignals::HeldSignals(int report_signal) {
    sigemptyset(&moWaited);
    for (const int signal : {SIGCHLD, SIGTERM, SIGHUP, SIGINT, SIGQUIT, report_signal})
        sigaddset(&moWaited, signal);
    sigprocmask(SIG_BLOCK, &moWaited, &moBefore);
    struct sigaction action {};
    action.sa_handler = SIG_DFL;  // one that ignores the signal would also take the program's status away
    sigaction(SIGCHLD, &action, &moChildBefore);
    action.sa_handler =
        SIG_IGN;  // a report into a pipe without a reader, or beyond a limit, fails like any other
    sigaction(SIGPIPE, &action, &moPipeBefore);
    sigaction(SIGXFSZ, &action, &moSizeBefore);
}

void HeldSignals::Release() const {
    sigaction(SIGCHLD, &moChildBefore, nullptr);
    sigaction(SIGPIPE, &moPipeBefore, nullptr);
    sigaction(SIGXFSZ, &moSizeBefore, nullptr);
    sigprocmask(SIG_SETMASK, &moBefore, nullptr);
}

pid_t StartProgram(const std::string& path, const RunOptions& options, const PreloadLibrary& library,
                   const HeldSignals& signals, AccountFile& file) {
    Control& control = file.control();
    control.wanted =
        (options.memory ? kMemory : 0U) | (options.disk ? kDisk : 0U) | (options.follow ? kFollow : 0U);
    control.callers = static_cast<std::uint32_t>(options.callers);
    control.command = getpid();
    control.file = file.descriptor();
    const char* const others = std::getenv(kPreloadVariable);
    const std::string rest = others != nullptr ? others : "";
    Fill(control.other_preloads, rest);
    Fill(control.library, rest.empty() ? library.path() : library.path() + ":" + rest);
    // Followed processes whose parents have ended become children of the command, which waits for them.
    if (options.follow) prctl(PR_SET_CHILD_SUBREAPER, 1);
    const pid_t program = fork();
    if (program < 0) throw std::runtime_error(std::string("cannot start a process: ") + std::strerror(errno));
    if (program != 0) return program;
    signals.Release();
    Execute(path, options, file);
}

}  // namespace recorder
