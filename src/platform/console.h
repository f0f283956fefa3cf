// Contract: a text console for the process. The four functions are for one thread at a time.
#ifndef ZANBASE_PLATFORM_CONSOLE_H
#define ZANBASE_PLATFORM_CONSOLE_H

// Gives the process a console and waits until it can be used. False, with nothing changed, where none can be
// had. To be called at most once with success.
bool OpenConsole() noexcept;

// Connects the three standard streams, the input first and the error last, to the open console, unbuffered.
// What they hold for output is written to where they went before, or dropped if that fails; input read ahead
// is dropped; an error or end of input is forgotten. A closed stream stays closed, and one that can't be
// connected stays where it was, as usable as before; there is no other sign of it.
void ConnectStandardStreams() noexcept;

// Takes the console away; those standard streams that use it go to the null device, unbuffered. False if no
// console is open, or if it had to be left as it is.
bool CloseConsole() noexcept;

// Shows or hides the console's window, if it has one that this process may hide; else does nothing.
void ShowConsoleWindow(bool show) noexcept;

#endif
