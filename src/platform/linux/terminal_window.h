// A window with a terminal in it, for a process that was started from none.
#ifndef ZANBASE_PLATFORM_LINUX_TERMINAL_WINDOW_H
#define ZANBASE_PLATFORM_LINUX_TERMINAL_WINDOW_H

// Starts an xterm on a new pseudo-terminal and waits for its window. Returns a descriptor of the terminal, as
// OpenAboveStreams does; xterm exits when the last descriptor of the terminal is closed. Returns -1 if
// DISPLAY is not set or no window appears within half a minute.
int OpenTerminalWindow() noexcept;

#endif
