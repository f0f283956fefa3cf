// Where reports and messages of the preload library are written: by system calls of its own, so that nothing of it
// is recorded.
#include "report_output.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "disk_operation.h"
#include "report.h"

namespace recorder {
namespace {

int gError = STDERR_FILENO;  // a copy with a high number: programs close standard error before they exit
std::array<unsigned int, 2> gOwn{~0U, ~0U};

bool WriteAll(int file, const std::string& text) {
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
    const int result = settings.result_descriptor;
    if (!settings.follow && result >= 0) fcntl(result, F_SETFD, FD_CLOEXEC);
    gOwn = {error >= 0 ? static_cast<unsigned int>(error) : ~0U, static_cast<unsigned int>(result)};
    std::sort(gOwn.begin(), gOwn.end());
}

void Say(const std::string& text) { WriteAll(gError, "zanbase-record: " + text + "\n"); }

void Report(const Settings& settings, int process, bool is_last) {
    try {
        std::string broken;
        WriteReport(settings, process, ReportText(settings, is_last ? &broken : nullptr));
        if (is_last && settings.result_descriptor >= 0)
            WriteAll(settings.result_descriptor, std::string(kReportedLine) + "\n" + broken);
    } catch (...) {
        WriteAll(gError, "zanbase-record: memory ran out, so there is no report\n");
    }
}

}  // namespace recorder
