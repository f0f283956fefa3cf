// Contract: a text console for the process. Not thread-safe: one thread at a time calls these functions.
#ifndef ZANBASE_PLATFORM_CONSOLE_H
#define ZANBASE_PLATFORM_CONSOLE_H

// Opens a console for the process and waits until it is usable. Returns false and changes nothing if none is
// available. Requires: none is open, and streams were never connected to one.
bool OpenConsole() noexcept;

// Connects the three standard streams, the input first and the error last, to the open console, unbuffered.
// Pending output is written to the old file, or dropped if that fails; buffered input is dropped; error and
// end-of-file indicators are cleared. A closed stream stays closed. A stream that can't be connected keeps
// its file and stays usable. Returns false if none of the open streams was connected. Must not wait without limit for
// another thread that uses a stream, nor for the reader of a pipe. Must work while the caller holds the lock of a stream
// or of the system's loader, so it must not wait for a thread that it starts.
bool ConnectStandardStreams() noexcept;

// Closes the console and connects the standard streams that use it to the null device, by the same rules.
// Returns false and changes nothing if no console is open or there is no null device.
bool CloseConsole() noexcept;

// Shows or hides the console's window if the process owns it; else does nothing.
void ShowConsoleWindow(bool show) noexcept;

#endif
