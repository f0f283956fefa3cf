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

/// Gives the process a text console, once in its life. 1 if it has one from this call or an earlier one, also
/// if `DestroyConsole` took that away since; 0 if none can be had, and then nothing has changed.
///
/// After the call that made the console, the standard input, output and error use it, unbuffered, wherever
/// they went before. What they hold for output is written there first, or lost if that fails, and input read
/// ahead but not used is dropped. A stream that the program has closed stays closed. Later calls leave the
/// streams alone.
///
/// On Linux the console is the terminal that the process was started from, if it has one; else a window of
/// the program `xterm` on the display that the environment variable `DISPLAY` names, for which it waits half
/// a minute at most. No signal and no child process shows the program that a window was started. When the
/// user closes it, reading gives the end of input and writing fails.
/// Not for a program that needs keys one by one or the mouse: it gives lines of text, no more.
ZANBASE_API int CreateConsole();

/// Takes away the console that `CreateConsole` made: those of the three standard streams that still use it
/// go to the null device from now on, unbuffered, and a window of our own closes. 1 if that was done, 0 if
/// there was no such console (or no null device, and then it stays). It can't be made again.
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
