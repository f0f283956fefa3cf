// The console of the system, and its window.
#include "platform/console.h"

#include <array>
#include <cstdio>

#include <fcntl.h>
#include <io.h>

#include "platform/windows/standard_stream.h"
#include "platform/windows/system.h"

namespace {

struct StandardStream {
    std::FILE* stream;
    DWORD handle_number;
    const char* mode;
};

std::array<StandardStream, 3> StandardStreams() noexcept {
    return {
        {{stdin, STD_INPUT_HANDLE, "r"}, {stdout, STD_OUTPUT_HANDLE, "w"}, {stderr, STD_ERROR_HANDLE, "w"}}};
}

bool UsesConsole(std::FILE* stream) noexcept {
    const auto handle = reinterpret_cast<HANDLE>(_get_osfhandle(_fileno(stream)));
    DWORD mode = 0;
    return GetConsoleMode(handle, &mode) != 0;
}

std::FILE* OpenHandle(HANDLE handle, const char* mode) noexcept {
    const int descriptor = _open_osfhandle(reinterpret_cast<intptr_t>(handle), _O_TEXT);
    return descriptor < 0 ? nullptr : _fdopen(descriptor, mode);
}

// The streams are objects of the runtime at fixed addresses, so a stream of the console is copied over each.
void Connect(const StandardStream& standard) noexcept {
    if (IsClosed(standard.stream)) return;
    const std::FILE* const console = OpenHandle(GetStdHandle(standard.handle_number), standard.mode);
    if (console != nullptr) RedirectStream(standard.stream, console);
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

void ConnectStandardStreams() noexcept {
    for (const StandardStream& standard : StandardStreams()) Connect(standard);
}

bool CloseConsole() noexcept {
    std::array<bool, 3> uses_console{};
    const std::array<StandardStream, 3> streams = StandardStreams();
    for (std::size_t i = 0; i < streams.size(); ++i)
        uses_console[i] = !IsClosed(streams[i].stream) && UsesConsole(streams[i].stream);
    if (FreeConsole() == 0) return false;
    for (std::size_t i = 0; i < streams.size(); ++i) {
        if (uses_console[i]) RedirectStream(streams[i].stream, nullptr);
    }
    return true;
}

void ShowConsoleWindow(bool show) noexcept { ShowWindow(FindConsoleWindow(), show ? SW_SHOW : SW_HIDE); }
