// Contract: a text console for the process. Not thread-safe: one thread at a time calls these functions.
#ifndef ZANBASE_PLATFORM_CONSOLE_H
#define ZANBASE_PLATFORM_CONSOLE_H

// Opens a console for the process and waits until it is usable. Returns false and changes nothing if none is
// available. Requires: no earlier call succeeded.
bool OpenConsole() noexcept;

// Connects the three standard streams, the input first and the error last, to the open console, unbuffered.
// Pending output is written to the old file, or dropped if that fails; buffered input is dropped; error and
// end-of-file indicators are cleared. A closed stream stays closed. A stream that can't be connected keeps
// its file and stays usable; nothing reports it. Must not wait without limit for another thread that uses a
// stream, nor for the reader of a pipe.
void ConnectStandardStreams() noexcept;

// Closes the console and connects the standard streams that use it to the null device, by the same rules.
// Returns false and changes nothing if no console is open or there is no null device.
bool CloseConsole() noexcept;

// Shows or hides the console's window if the process owns it; else does nothing.
void ShowConsoleWindow(bool show) noexcept;

#endif
