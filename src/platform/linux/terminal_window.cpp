// Starts an xterm for a terminal that this process has open.
//
// A pseudo-terminal has two ends. This process keeps the terminal, xterm alone has the other end. If xterm
// fails or exits, its end closes and a read of the terminal returns. If this process closes the terminal,
// xterm gets end-of-file and exits. Once it has a window, xterm writes a line with the window's number to the
// terminal.
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

// The descriptor of xterm's end in the process of xterm.
constexpr int kXtermEnd = 3;

// Window operations that xterm refuses: its default list without restoring and iconifying.
char gaResources[] =
    "*disallowedWindowOps: 3,4,5,6,7,8,9,11,13,14,18,19,20,21,GetSelection,SetSelection,SetWinLines,SetXprop";

using TerminalPath = char[64];

// Opens the terminal of the pseudo-terminal whose other end is `end`, and writes its path to `path`.
int OpenTerminalOf(int end, TerminalPath& path) noexcept {
    const bool named = grantpt(end) == 0 && unlockpt(end) == 0 && ptsname_r(end, path, sizeof(path)) == 0;
    return named ? OpenAboveStreams(path) : -1;
}

// fork() by the raw clone system call without an exit signal: no pthread_atfork handlers, no SIGCHLD; waitpid
// sees the child only with __WALL or __WCLONE. Returns 0 in the child.
pid_t CopyProcess() noexcept { return static_cast<pid_t>(syscall(SYS_clone, 0L, 0L, 0L, 0L, 0L)); }

// Exits a child by the raw system call: tools that intercept _exit could flush the streams, whose pending
// output belongs to the parent.
[[noreturn]] void LeaveCopy() noexcept {
    for (;;) syscall(SYS_exit_group, 0);
}

// Executes xterm in a new session, so that signals to the program's process group don't reach it. Its only
// descriptors are `end` and the null device. Runs in a child of a process with threads: calls only functions
// that are async-signal-safe. Requires: all signals are blocked, so that no handler of the program runs.
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
    const int null_device = open("/dev/null", O_RDWR);  // gets descriptor 0, the lowest free one
    dup2(null_device, STDOUT_FILENO);
    dup2(null_device, STDERR_FILENO);
    char name[] = "xterm";
    char resource_option[] = "-xrm";
    char* const arguments[] = {name, option, resource_option, gaResources, nullptr};
    execvp(name, arguments);
    LeaveCopy();
}

// Starts xterm as a grandchild, whose parent exits at once: no wait call of the program can return it.
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

// Waits for the line that xterm writes once it has a window. Returns false if its end is closed before, or at
// the timeout.
bool WaitForWindow(int terminal) noexcept {
    const unsigned int start = ReadTicks();
    pollfd readable{terminal, POLLIN, 0};
    int ready = 0;
    do {
        const unsigned int waited = ReadTicks() - start;
        if (waited >= kStartLimitMs) return false;
        ready = poll(&readable, 1, static_cast<int>(kStartLimitMs - waited));
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
    silent.c_lflag &= ~static_cast<tcflag_t>(ECHO);  // keeps the line that xterm writes out of the window
    tcsetattr(terminal.Get(), TCSANOW, &silent);
    StartXterm(std::strrchr(path, '/') + 1, end.Get());
    end.Close();
    if (!WaitForWindow(terminal.Get())) return -1;
    modes.c_iflag |= IUTF8;  // the erase key removes whole UTF-8 characters
    tcsetattr(terminal.Get(), TCSANOW, &modes);
    return terminal.Release();
}
