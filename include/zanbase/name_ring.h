/// @file
/// Text of numbers, formats and token lists for immediate use, in reused slots that the library owns.
///
///     std::printf("%s of %s\n", MkName(3), MkName(2.5, 1));    // 3 of 2.5
///
/// **Lifetime.** The text is in one of 256 slots of the process, which are used in turn. A result is valid
/// for 255 further calls of these functions by any threads; the next call overwrites it. Don't free a result.
/// It may be changed but not lengthened. The bytes before the pointer and behind the terminator belong to
/// earlier texts. Don't keep a result, and don't pass it to code that may make names without bound:
/// `zanbase/string_makers.h` makes texts that last.
///
/// **Errors.** No function allocates, fails or returns null. A slot has 4096 bytes: a longer text is cut to
/// 4095.
///
/// **Threads.** All functions are thread-safe, until the process has ended. Their mutex is held only while a
/// slot is chosen. A fork waits until no other thread chooses one, so the child can make names, unless a thread
/// was killed there (`HThread::Kill`).
#ifndef ZANBASE_NAME_RING_H
#define ZANBASE_NAME_RING_H

#include <cstdarg>

#include "zanbase/export.h"

/// @addtogroup text
/// @{

/// The exact decimal text of `value`: digits, with `-` before them if it is negative, and nothing else.
/// Faster than a format. Thread-safe.
ZANBASE_API char* MkName(short value);
/// @copydoc MkName(short)
ZANBASE_API char* MkName(unsigned short value);
/// @copydoc MkName(short)
ZANBASE_API char* MkName(int value);
/// @copydoc MkName(short)
ZANBASE_API char* MkName(unsigned int value);
/// @copydoc MkName(short)
ZANBASE_API char* MkName(long value);
/// @copydoc MkName(short)
ZANBASE_API char* MkName(unsigned long value);
/// @copydoc MkName(short)
ZANBASE_API char* MkName(long long value);
/// @copydoc MkName(short)
ZANBASE_API char* MkName(unsigned long long value);

/// `value` in fixed-point form with at most `decimals` places, as `printf` rounds it, without trailing zeros
/// behind the point. With `decimals` below 0 it has 14 significant digits, or all of the whole part if those
/// are more. A value that rounds to zero from below keeps its sign ("-0"); an infinity or a NaN is as
/// `printf` has it. Under a numeric locale whose decimal sign is not a point no zeros are removed.
/// Thread-safe.
ZANBASE_API char* MkName(double value, int decimals);

/// The text of a `printf` format and its arguments. An argument may be an earlier result. Thread-safe.
/// Requires: `format` is not null.
ZANBASE_API char* MkName(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

/// The same from an argument list, which the call uses up; the caller calls `va_end`. Thread-safe.
ZANBASE_API char* MkNameV(const char* format, va_list arguments) ZANBASE_PRINTF_FORMAT(1, 0);

/// `MkName(format, …)` with C linkage, for C code and for look-up by name. Thread-safe.
extern "C" ZANBASE_API char* MkNameC(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

/// Joins strings with "|" up to the null pointer that ends the list. A null `first` is the empty list (the
/// compiler still requires the null at the end). No separator precedes the first string that is not empty;
/// every string after that one has its own, empty or not ("a||b"). Thread-safe.
ZANBASE_API char* MkTokenName(const char* first, ...) ZANBASE_NULL_TERMINATED;

/// @}

#endif
