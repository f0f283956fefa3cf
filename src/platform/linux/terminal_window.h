// A window with a terminal in it, for a process that was started from none.
#ifndef ZANBASE_PLATFORM_LINUX_TERMINAL_WINDOW_H
#define ZANBASE_PLATFORM_LINUX_TERMINAL_WINDOW_H

// Starts an xterm on a new pseudo-terminal and waits until its window is there. Returns the descriptor of the
// terminal, as OpenAboveStreams does; the xterm ends by itself when the last descriptor of it is closed. -1
// if DISPLAY is unset or no window comes up within half a minute.
int OpenTerminalWindow() noexcept;

#endif
