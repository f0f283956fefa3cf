// The console of the system, and its window.
#include "platform/console.h"

#include <array>
#include <cstdio>

#include <fcntl.h>
#include <io.h>

#include "platform/windows/standard_stream.h"
#include "platform/windows/system.h"

namespace {

std::array<std::FILE*, 3> StandardStreams() noexcept { return {stdin, stdout, stderr}; }

bool UsesConsole(std::FILE* stream) noexcept {
    const auto handle = reinterpret_cast<HANDLE>(_get_osfhandle(_fileno(stream)));
    DWORD mode = 0;
    return GetConsoleMode(handle, &mode) != 0;
}

bool ConnectTo(const char* device, std::FILE* stream) noexcept {
    const int target = _open(device, _O_RDWR | _O_TEXT);
    if (target < 0) return false;
    const bool is_connected = RedirectStream(stream, target);
    _close(target);
    return is_connected;
}

// A temporary title, which no other window has, identifies the window while it is searched for.
HWND FindConsoleWindow() noexcept {
    constexpr DWORD kTitleBytes = 1024;
    constexpr DWORD kMillisecondsUntilSet = 40;
    char saved[kTitleBytes] = "";
    char title[kTitleBytes];
    GetConsoleTitleA(saved, kTitleBytes);
    wsprintfA(title, "%d/%d", GetTickCount(), GetCurrentProcessId());
    SetConsoleTitleA(title);
    Sleep(kMillisecondsUntilSet);
    const HWND window = FindWindowA(nullptr, title);
    SetConsoleTitleA(saved);
    return window;
}

}  // namespace

bool OpenConsole() noexcept { return AllocConsole() != 0; }

bool ConnectStandardStreams() noexcept {
    int open = 0;
    int connected = 0;
    for (std::FILE* const stream : StandardStreams()) {
        if (IsClosed(stream)) continue;
        ++open;
        if (ConnectTo(stream == stdin ? "CONIN$" : "CONOUT$", stream)) ++connected;
    }
    return connected != 0 || open == 0;
}

bool CloseConsole() noexcept {
    std::array<bool, 3> uses_console{};
    const std::array<std::FILE*, 3> streams = StandardStreams();
    for (std::size_t i = 0; i < streams.size(); ++i)
        uses_console[i] = !IsClosed(streams[i]) && UsesConsole(streams[i]);
    if (FreeConsole() == 0) return false;
    for (std::size_t i = 0; i < streams.size(); ++i) {
        if (uses_console[i]) ConnectTo("NUL", streams[i]);
    }
    return true;
}

void ShowConsoleWindow(bool show) noexcept { ShowWindow(FindConsoleWindow(), show ? SW_SHOW : SW_HIDE); }
