// The console of a Linux process: its controlling terminal, or else a terminal window of its own.
#include "platform/console.h"

#include <array>
#include <cstdio>

#include <sys/stat.h>
#include <unistd.h>

#include "platform/linux/cancellation.h"
#include "platform/linux/descriptor.h"
#include "platform/linux/standard_stream.h"
#include "platform/linux/terminal_window.h"

namespace {

int gnConsole = -1;        // descriptor of the open console, -1 if none; the streams may be moved elsewhere
bool gbOwnWindow = false;  // whether the console is a window of the library's own

std::array<std::FILE*, 3> StandardStreams() noexcept { return {stdin, stdout, stderr}; }

bool UsesConsole(int descriptor) noexcept {
    struct stat console {};
    struct stat used {};
    return fstat(gnConsole, &console) == 0 && fstat(descriptor, &used) == 0 &&
           console.st_dev == used.st_dev && console.st_ino == used.st_ino;
}

}  // namespace

bool OpenConsole() noexcept {
    const NoCancellation no_cancellation;
    gnConsole = OpenAboveStreams("/dev/tty");
    gbOwnWindow = gnConsole < 0;
    if (gbOwnWindow) gnConsole = OpenTerminalWindow();
    return gnConsole >= 0;
}

bool ConnectStandardStreams() noexcept {
    const NoCancellation no_cancellation;
    for (std::FILE* const stream : StandardStreams()) RedirectStream(stream, gnConsole);
    return true;
}

bool CloseConsole() noexcept {
    const NoCancellation no_cancellation;
    if (gnConsole < 0) return false;
    const int null_device = OpenAboveStreams("/dev/null");
    if (null_device < 0) return false;
    for (std::FILE* const stream : StandardStreams()) {
        if (UsesConsole(fileno(stream))) RedirectStream(stream, null_device);
    }
    close(null_device);
    close(gnConsole);  // the library's own window closes when no descriptor uses it
    gnConsole = -1;
    return true;
}

void ShowConsoleWindow(bool show) noexcept {
    const NoCancellation no_cancellation;
    constexpr char kRestore[] = "\033[1t";
    constexpr char kIconify[] = "\033[2t";
    if (!gbOwnWindow || gnConsole < 0) return;
    // Fails only if the user has closed the window; then there is none to show or hide.
    if (write(gnConsole, show ? kRestore : kIconify, sizeof(kRestore) - 1) < 0) return;
}
