// Where reports and messages of the preload library are written: by system calls of its own, so that nothing
// of it is recorded.
#include "report_output.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <ctime>
#include <string_view>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "disk_operation.h"
#include "pool.h"
#include "report.h"

namespace recorder {
namespace {

int gError = STDERR_FILENO;  // a copy with a high number: programs close standard error before they exit
int gResult = -1;            // the result's descriptor
std::array<unsigned int, 2> gOwn{~0U, ~0U};

constexpr std::size_t kReserveBytes = std::size_t{1} << 23;
void* gReserve = nullptr;

void ListOwn() {
    gOwn = {gError != STDERR_FILENO ? static_cast<unsigned int>(gError) : ~0U,
            static_cast<unsigned int>(gResult)};
    std::sort(gOwn.begin(), gOwn.end());
}

// A pipe without a reader and a limit on files raise signals in the thread that writes, which would end a
// program that has ended well. Those that the program itself holds back stay pending. Keeps `errno`.
class WriteSignalsHeld {
public:
    WriteSignalsHeld() {
        sigemptyset(&moHeld);
        sigaddset(&moHeld, SIGPIPE);
        sigaddset(&moHeld, SIGXFSZ);
        pthread_sigmask(SIG_BLOCK, &moHeld, &moBefore);
        sigset_t pending{};
        sigpending(&pending);
        for (const int signal : {SIGPIPE, SIGXFSZ})
            if (sigismember(&pending, signal) == 1) sigdelset(&moHeld, signal);
    }
    ~WriteSignalsHeld() {
        const int error = errno;
        const timespec now{};
        while (sigtimedwait(&moHeld, nullptr, &now) > 0) {
        }
        pthread_sigmask(SIG_SETMASK, &moBefore, nullptr);
        errno = error;
    }
    WriteSignalsHeld(const WriteSignalsHeld&) = delete;
    WriteSignalsHeld& operator=(const WriteSignalsHeld&) = delete;

private:
    sigset_t moHeld{};
    sigset_t moBefore{};
};

bool WriteAll(int file, std::string_view text) {
    const WriteSignalsHeld scope;
    std::size_t written = 0;
    while (written < text.size()) {
        const long step = syscall(SYS_write, file, text.data() + written, text.size() - written);
        if (step < 0 && errno == EINTR) continue;
        if (step <= 0) return false;
        written += static_cast<std::size_t>(step);
    }
    return true;
}

// The largest number that is free, within what any process may use.
int MoveHigh(int descriptor) {
    rlimit limit{};
    constexpr rlim_t kBelow = 1024;
    const rlim_t end = getrlimit(RLIMIT_NOFILE, &limit) == 0 ? std::min(limit.rlim_cur, kBelow) : kBelow;
    return fcntl(descriptor, F_DUPFD_CLOEXEC, static_cast<int>(end > 16 ? end - 16 : 3));
}

// A program that follows another by exec may have a file of its own at that number.
bool IsResultFile(int descriptor) {
    const std::string link = "/proc/self/fd/" + std::to_string(descriptor);
    std::array<char, 64> name{};
    syscall(SYS_readlinkat, AT_FDCWD, link.c_str(), name.data(), name.size() - 1);
    return std::string_view(name.data()).find(std::string("/memfd:") + kResultName) == 0;
}

std::string OutputPath(const Settings& settings, int process) {
    std::string path = settings.output;
    const std::string number = std::to_string(process);
    for (std::size_t at = path.find("%p"); at != std::string::npos; at = path.find("%p", at + number.size()))
        path.replace(at, 2, number);
    return path;
}

// A file holds the newest report only.
void WriteReport(const Settings& settings, int process, const std::string& text) {
    if (settings.output.empty()) {
        WriteAll(gError, text);
        return;
    }
    const std::string path = OutputPath(settings, process);
    const auto file = static_cast<int>(
        syscall(SYS_openat, AT_FDCWD, path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666));
    const bool written = file >= 0 && WriteAll(file, text);
    const int error = errno;
    if (file >= 0) syscall(SYS_close, file);
    if (!written) Say("cannot write " + path + ": " + std::strerror(error));
}

}  // namespace

const std::array<unsigned int, 2>& OwnDescriptors() { return gOwn; }

void TakeDescriptors(const Settings& settings) {
    const int error = MoveHigh(STDERR_FILENO);
    if (error >= 0) gError = error;
    if (IsResultFile(settings.result_descriptor)) gResult = settings.result_descriptor;
    if (!settings.follow && gResult >= 0) fcntl(gResult, F_SETFD, FD_CLOEXEC);
    ListOwn();
}

void VacateDescriptor(int number) {
    const InsideScope scope;
    for (int* const own : {&gError, &gResult}) {
        if (*own != number) continue;
        *own = fcntl(number, F_DUPFD_CLOEXEC, number + 1);
        if (*own < 0) *own = fcntl(number, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
    }
    ListOwn();
}

void ReserveMemory() { gReserve = MapPages(kReserveBytes); }

void Say(const std::string& text) { WriteAll(gError, "zanbase-record: " + text + "\n"); }

void Report(const Settings& settings, int process, bool is_last) {
    if (is_last && gReserve != nullptr) UnmapPages(gReserve, kReserveBytes);
    try {
        std::string broken;
        WriteReport(settings, process, ReportText(settings, is_last ? &broken : nullptr));
        if (is_last) WriteAll(gResult, std::string(kReportedLine) + broken);
    } catch (...) {
        WriteAll(gError, "zanbase-record: memory ran out, so there is no report\n");
        if (is_last) WriteAll(gResult, kReportedLine);
    }
}

}  // namespace recorder
