// Prints a line of the thread classes on standard output.
#ifndef ZANBASE_THREADS_PRINT_LINE_H
#define ZANBASE_THREADS_PRINT_LINE_H

#include <cstdarg>
#include <cstdio>

#include "zanbase/export.h"

// Prints `format` in one call of the runtime's writing functions if it fits the area, else by vprintf: on Windows
// that writes an unbuffered stream byte by byte, and lines of other threads get in between. Allocates nothing,
// because it reports exceptions. Thread-safe.
inline void PrintLine(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

inline void PrintLine(const char* format, ...) {
    char line[1024];
    va_list arguments;
    va_start(arguments, format);
    va_list again;
    va_copy(again, arguments);
    const int length = std::vsnprintf(line, sizeof line, format, arguments);
    if (length >= 0 && static_cast<unsigned int>(length) < sizeof line) {
        std::fputs(line, stdout);
    } else {
        std::vprintf(format, again);
    }
    va_end(again);
    va_end(arguments);
}

#endif
