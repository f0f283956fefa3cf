/// @file
/// Short-lived text of numbers, formats and token lists, without allocation and without a buffer of one's
/// own.
#ifndef ZANBASE_NAME_RING_H
#define ZANBASE_NAME_RING_H

#include <cstdarg>

#include "zanbase/export.h"

// The text lies in one of 256 slots of the process, which are taken in turn:
//
//     std::printf("%s of %s\n", MkName(3), MkName(2.5, 1));    // 3 of 2.5
//
// A result stays intact through the next 255 calls of any of these functions by any thread; the 256th
// overwrites it. Nobody frees it, and the caller may change it in place within its length. Only the bytes
// from the pointer to the terminator mean anything. Don't keep a result, and don't hand it to code that may
// make names of its own without bound: for text that has to last there is `zanbase/string_makers.h`.
//
// Any thread may call any of these functions at any time; a lock is held only while a slot is taken, never
// while it is filled. None of them allocates, fails or returns null. A slot holds 4096 bytes: text that
// doesn't fit is cut to its first 4095 without notice.

/// The exact decimal text of `value`: digits, with `-` before them if it is negative, and nothing else. The
/// cheap way to put a number into a message: no format is read.
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
/// behind the point. A negative `decimals` asks for 14 significant digits, and never for fewer than the
/// digits of the whole part. A value that rounds to zero from below keeps its sign ("-0"); an infinity or a
/// NaN is as `printf` has it. Under a numeric locale whose decimal sign is not a point no zeros are removed.
ZANBASE_API char* MkName(double value, int decimals);

/// The text of a `printf` format and its arguments. `format` must not be null. An argument may be an earlier
/// result.
ZANBASE_API char* MkName(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

/// The same from an argument list, which the call uses up; the caller still owes its `va_end`.
ZANBASE_API char* MkNameV(const char* format, va_list arguments) ZANBASE_PRINTF_FORMAT(1, 0);

/// `MkName(format, …)` for callers that can't use an overloaded name: the one export with C linkage.
extern "C" ZANBASE_API char* MkNameC(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

/// The given strings joined by "|". The list ends with a null pointer, which may be `first` itself. Empty
/// strings at the head bring no separator; behind other text each brings one.
ZANBASE_API char* MkTokenName(const char* first, ...) ZANBASE_NULL_TERMINATED;

#endif
