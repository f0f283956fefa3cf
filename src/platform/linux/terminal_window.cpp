// Starting an xterm for a terminal that this process has open.
//
// The pseudo-terminal has two ends. We keep the terminal, xterm alone gets the other one. So whatever goes
// wrong on its side, closes that end and wakes us; and when we close the terminal, xterm sees the end and
// goes. Once it has a window, xterm types a line with the window's number into the terminal.
#include "platform/linux/terminal_window.h"

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <fcntl.h>
#include <poll.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <termios.h>
#include <unistd.h>

#include "platform/clock.h"
#include "platform/linux/descriptor.h"

namespace {

constexpr unsigned int kStartLimitMs = 30000;

// Where xterm finds its end.
constexpr int kXtermEnd = 3;

// Window operations for xterm to refuse: its usual list without restoring and iconifying.
char gaResources[] =
    "*disallowedWindowOps: 3,4,5,6,7,8,9,11,13,14,18,19,20,21,GetSelection,SetSelection,SetWinLines,SetXprop";

using TerminalPath = char[64];

// Opens the terminal of the pseudo-terminal whose other end is `end`, and tells its path.
int OpenTerminalOf(int end, TerminalPath& path) noexcept {
    const bool named = grantpt(end) == 0 && unlockpt(end) == 0 && ptsname_r(end, path, sizeof(path)) == 0;
    return named ? OpenAboveStreams(path) : -1;
}

// Copies this process; 0 in the copy. Nobody hears of it as of a fork: no handler hung onto forks runs, the
// end of the copy raises no SIGCHLD, and no wait of the program meets it, except one for just such copies.
pid_t CopyProcess() noexcept { return static_cast<pid_t>(syscall(SYS_clone, 0L, 0L, 0L, 0L, 0L)); }

// Ends a copy of this process at once. The raw call: some tools hang work onto _exit, the flushing of streams
// for one, and what waits in our streams is ours to write.
[[noreturn]] void LeaveCopy() noexcept {
    for (;;) syscall(SYS_exit_group, 0);
}

// Becomes xterm, with `end` and the null device as its only descriptors and a session of its own, so that no
// signal to our process group reaches it. Runs in a copy of a process that may have had other threads, with
// all signals blocked: calls nothing that takes a lock, and lets no handler of the program run.
[[noreturn]] void BecomeXterm(char* option, int end) noexcept {
    setsid();
    for (int number = 1; number <= SIGRTMAX; ++number) std::signal(number, SIG_DFL);
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
    if (end == kXtermEnd) {
        fcntl(end, F_SETFD, 0);
    } else {
        dup2(end, kXtermEnd);
    }
    close_range(STDIN_FILENO, STDERR_FILENO, 0);
    close_range(kXtermEnd + 1, ~0U, 0);
    const int null_device = open("/dev/null", O_RDWR);  // gets the lowest free number, the standard input's
    dup2(null_device, STDOUT_FILENO);
    dup2(null_device, STDERR_FILENO);
    char name[] = "xterm";
    char resource_option[] = "-xrm";
    char* const arguments[] = {name, option, resource_option, gaResources, nullptr};
    execvp(name, arguments);
    LeaveCopy();
}

// Starts xterm as a process that isn't our child, so that no wait of the program ever meets it.
void StartXterm(const char* terminal_name, int end) noexcept {
    char option[sizeof(TerminalPath) + 16];
    std::snprintf(option, sizeof(option), "-S%s/%d", terminal_name, kXtermEnd);
    sigset_t all;
    sigset_t before;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &before);
    const pid_t between = CopyProcess();
    if (between == 0) {
        if (CopyProcess() == 0) BecomeXterm(option, end);
        LeaveCopy();
    }
    if (between > 0) waitpid(between, nullptr, __WALL);
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
}

// Waits for the line that says that the window is there; false if the other end was closed before.
bool WaitForWindow(int terminal) noexcept {
    const unsigned int start = ReadTicks();
    pollfd news{terminal, POLLIN, 0};
    int ready = 0;
    do {
        const unsigned int waited = ReadTicks() - start;
        if (waited >= kStartLimitMs) return false;
        ready = poll(&news, 1, static_cast<int>(kStartLimitMs - waited));
    } while (ready < 0 && errno == EINTR);
    char line[64];
    return ready > 0 && read(terminal, line, sizeof(line)) > 0;
}

}  // namespace

int OpenTerminalWindow() noexcept {
    const char* const display = std::getenv("DISPLAY");
    if (display == nullptr || *display == '\0') return -1;
    TerminalPath path;
    Descriptor end(posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC));
    Descriptor terminal(OpenTerminalOf(end.Get(), path));
    if (terminal.Get() < 0) return -1;

    termios modes{};
    tcgetattr(terminal.Get(), &modes);
    termios silent = modes;
    silent.c_lflag &= ~static_cast<tcflag_t>(ECHO);  // or the window would show the line that xterm types
    tcsetattr(terminal.Get(), TCSANOW, &silent);
    StartXterm(std::strrchr(path, '/') + 1, end.Get());
    end.Close();
    if (!WaitForWindow(terminal.Get())) return -1;
    modes.c_iflag |= IUTF8;  // the erase key takes whole characters
    tcsetattr(terminal.Get(), TCSANOW, &modes);
    return terminal.Release();
}
