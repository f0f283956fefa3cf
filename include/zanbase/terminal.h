/// @file
/// Services of the process's environment: terminal codes, the revision, a text console, screen measures.
///
/// Thread-safety: `IMPTerminal`, `IMPAutomaticTerm` and `IsWin32s` are thread-safe. The other functions share
/// state without a lock: the first call of `IMPGetMajorRev`, the console operations and `SetScreenSize`
/// belong to one thread at a time, usually the main thread during start-up.
#ifndef ZANBASE_TERMINAL_H
#define ZANBASE_TERMINAL_H

#include "zanbase/export.h"

/// @addtogroup environment
/// @{

/// Returns the code of the terminal `name`. The beginning of the name decides, and ASCII letters match in
/// either case, so `vt100-w` is a VT100:
///
/// | begins with | code |
/// |---|---|
/// | HARD | 0 |
/// | VT52 | 1 |
/// | VT100, V100 | 2 |
/// | TEKT | 3 |
/// | ANSI | 4 |
/// | VT200 | 5 |
/// | CDC721 | 6 |
/// | MASSCOMP | 7 |
/// | HP2621B | 8 |
/// | IBM, DEFAULT, AUTO | 9 |
///
/// Any other name, including the empty one, has code 0. The caller decides what a code selects. Thread-safe.
/// Requires: `name` is not null.
ZANBASE_API int IMPTerminal(const char* name);

/// Returns 9, the code for an unknown terminal. Thread-safe.
ZANBASE_API int IMPAutomaticTerm();

/// Returns the revision of the library as digits without dots, the same pointer at every call. The text
/// belongs to the library and is valid until the process ends. Thread-safe after the first call.
ZANBASE_API const char* IMPGetMajorRev();

/// Gives the process a text console, at most once in its life. Returns 1 if this call or an earlier one made
/// a console, even if `DestroyConsole` has removed it; returns 0 and changes nothing if none is available.
///
/// The call that makes the console connects standard input, output and error to it, unbuffered. Pending
/// output is written to the old file first; buffered input is dropped. A closed stream stays closed. Later
/// calls leave the streams alone.
///
/// The call waits for a bounded time. It drops pending output that the old file does not accept within a
/// second (a full pipe, or one without a reader, which raises no SIGPIPE), or at once if the process has no free
/// descriptor. On Linux, if another thread is using a
/// stream for longer than a tenth of a second, because it waits for input for example, the stream uses the
/// console from its next system call on, but stays buffered. A wide-oriented stream loses its orientation.
///
/// On Linux the console is the controlling terminal of the process. Without one it is a window of the program
/// `xterm` on the display that the environment variable `DISPLAY` names; the call waits for the window for
/// at most half a minute. The window's process is not a child of the program and sends it no signal. When the
/// user closes the window, reading gives end-of-file and writing fails.
///
/// On Windows the console is one of the system's, with a window. It can't be made where the process has one already,
/// as a program started from a command prompt has. A stream that another thread uses for longer than a tenth of a second
/// keeps its file on Windows, as does, with the runtime msvcrt, a standard stream that the caller has locked. If this
/// leaves no stream to connect, the console is removed again and the result is 0; a later call may succeed. The printf
/// functions of MinGW write an unbuffered stream byte by byte: letters of several bytes stay whole if they are
/// formatted first and written by `fputs` or `fwrite`, as the reports of this library are.
///
/// Not for programs that need single keys or the mouse: the console transfers lines of text.
/// Thread-safety: one thread at a time calls the three console operations. Other threads may use the streams.
ZANBASE_API int CreateConsole();

/// Removes the console that `CreateConsole` made: the standard streams that use it are connected to the null
/// device, unbuffered, by the same rules, and a window of the library's own closes. Returns 1 on success, 0
/// if there is no such console, or no null device (then nothing changes). The console can't be made again. On
/// Windows it removes the console of the process even if that was there before, as in a program started from a
/// command prompt, and 0 means that there was none.
/// Thread-safety: as `CreateConsole`.
ZANBASE_API int DestroyConsole();

/// Shows the console's window if `show` is not 0, and hides it otherwise. On Linux it restores or iconifies a
/// window of the library's own, wherever the standard streams lead; it does nothing to the terminal that the
/// process was started from. On Windows it finds the window of the process's console by a temporary title, which
/// stays for 40 milliseconds. Thread-safety: as `CreateConsole`.
ZANBASE_API void ShowConsole(int show);

/// Returns 0: no supported system is the 32-bit extension of a 16-bit one. Thread-safe.
ZANBASE_API int IsWin32s();

/// Stores four measures of the screen for the life of the process, in units that the callers agree on.
/// Returns 1 if it stored them, 0 if an earlier call had; the earlier measures stay. Not thread-safe.
ZANBASE_API int SetScreenSize(double first, double second, double third, double fourth);

/// Writes the measures that `SetScreenSize` stored through those pointers that are not null, and returns 1.
/// Returns 0 and writes nothing if all four are null or no measures are stored. Thread-safe after
/// `SetScreenSize`.
ZANBASE_API int GetScreenSize(double* first, double* second, double* third, double* fourth);

/// @}

#endif
