// Contract: a text console for the process. The four functions are for one thread at a time.
#ifndef ZANBASE_PLATFORM_CONSOLE_H
#define ZANBASE_PLATFORM_CONSOLE_H

// Gives the process a console and waits until it can be used. False, with nothing changed, where none can be
// had. To be called at most once with success.
bool OpenConsole() noexcept;

// Connects the three standard streams, the input first and the error last, to the open console, unbuffered.
// Pending output is written to the old file, or dropped if that fails; buffered input is dropped; error and
// end-of-file indicators are cleared. A closed stream stays closed. A stream that can't be connected keeps its
// file and stays usable; nothing reports it. Must not wait without limit for another thread that uses a
// stream, nor for the reader of a pipe.
void ConnectStandardStreams() noexcept;

// Takes the console away; those standard streams that use it go to the null device, unbuffered. False if no
// console is open, or if it had to be left as it is.
bool CloseConsole() noexcept;

// Shows or hides the console's window, if it has one that this process may hide; else does nothing.
void ShowConsoleWindow(bool show) noexcept;

#endif
