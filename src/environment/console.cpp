// The console's state; the platform layer makes the console itself.
#include "platform/console.h"

#include "zanbase/terminal.h"

namespace {

int mnConsoleCreated = 0;  // 1 once a console was made; never cleared

}  // namespace

int CreateConsole() {
    if (mnConsoleCreated != 0) return 1;
    if (!OpenConsole()) return 0;
    if (!ConnectStandardStreams()) {
        CloseConsole();
        return 0;
    }
    mnConsoleCreated = 1;
    return 1;
}

int DestroyConsole() { return CloseConsole() ? 1 : 0; }

void ShowConsole(int show) { ShowConsoleWindow(show != 0); }
