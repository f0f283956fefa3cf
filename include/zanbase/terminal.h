/// @file
/// What a program asks about its surroundings: terminal codes, the revision, a text console, screen measures.
///
/// Any thread may call `IMPTerminal`, `IMPAutomaticTerm` and `IsWin32s` at any time. The rest shares state
/// that no lock guards: the first call of `IMPGetMajorRev`, the console operations and `SetScreenSize` belong
/// to one thread at a time, as a rule the one that starts the program.
#ifndef ZANBASE_TERMINAL_H
#define ZANBASE_TERMINAL_H

#include "zanbase/export.h"

/// The code of the terminal called `name`, which is not null. A name counts by its beginning, letters of
/// either case alike, so `vt100-w` is a VT100:
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
/// Any other name, the empty one too, has code 0. What a code selects is the caller's affair.
ZANBASE_API int IMPTerminal(const char* name);

/// The code for a program that is not told which terminal it has: 9.
ZANBASE_API int IMPAutomaticTerm();

/// The revision of the library as digits without dots, the same pointer at every call. The text belongs to
/// the library and stays good until it is unloaded.
ZANBASE_API const char* IMPGetMajorRev();

/// Gives the process a text console, at most once in its life. Returns 1 if this call or an earlier one made
/// a console, even if `DestroyConsole` has removed it; returns 0 and changes nothing if none is available.
///
/// The call that makes the console connects standard input, output and error to it, unbuffered. Pending
/// output is written to the old file first; buffered input is dropped. A closed stream stays closed. Later
/// calls leave the streams alone.
///
/// The call waits for a bounded time. It drops pending output that the old file does not accept within a
/// second (a full pipe, or one without a reader, which raises no SIGPIPE). If another thread is using a stream
/// for longer than a tenth of a second, because it waits for input for example, the stream uses the console
/// from its next system call on, but stays buffered. A wide-oriented stream loses its orientation.
///
/// On Linux the console is the controlling terminal of the process. Without one it is a window of the program
/// `xterm` on the display that the environment variable `DISPLAY` names; the call waits for the window for
/// at most half a minute. The window's process is no child of the program and sends it no signal. When the
/// user closes the window, reading gives end-of-file and writing fails.
///
/// Not for programs that need single keys or the mouse: the console transfers lines of text.
/// Thread-safety: one thread at a time calls the three console operations. Other threads may use the streams.
ZANBASE_API int CreateConsole();

/// Removes the console that `CreateConsole` made: the standard streams that use it are connected to the null
/// device, unbuffered, by the same rules, and a window of the library's own closes. Returns 1 on success, 0 if
/// there is no such console, or no null device (then nothing changes). The console can't be made again.
/// Thread-safety: as `CreateConsole`.
ZANBASE_API int DestroyConsole();

/// Shows (`show` not 0) or hides (0) the window of the console. On Linux it iconifies and restores a window
/// of our own, whatever has become of the standard streams; without one it does nothing: the terminal that
/// the process was started from belongs to the user.
ZANBASE_API void ShowConsole(int show);

/// 0: whether the process runs on the 32-bit extension of a 16-bit system, which none does any more.
ZANBASE_API int IsWin32s();

/// Stores four measures of the screen for the life of the process, in whatever units the callers agree on.
/// 1 if they were stored, 0 if an earlier call had stored its own, which stay.
ZANBASE_API int SetScreenSize(double first, double second, double third, double fourth);

/// Hands out the measures that `SetScreenSize` stored, each to its own pointer; one that isn't wanted may be
/// null. 1 if it did; 0, with nothing written, if all four are null or nothing was stored. After the measures
/// were stored, any thread may call it.
ZANBASE_API int GetScreenSize(double* first, double* second, double* third, double* fourth);

#endif
