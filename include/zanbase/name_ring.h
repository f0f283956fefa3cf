/// @file
/// Text of numbers, formats and token lists for use on the spot, in slots that the library owns and takes
/// again.
#ifndef ZANBASE_NAME_RING_H
#define ZANBASE_NAME_RING_H

#include <cstdarg>

#include "zanbase/export.h"

/// @addtogroup text
/// @{

// The text lies in one of 256 slots of the process, which are taken in turn:
//
//     std::printf("%s of %s\n", MkName(3), MkName(2.5, 1));    // 3 of 2.5
//
// A result is safe for 255 further calls of these functions, whatever thread makes them; the call after those
// writes over it. It isn't to be freed, and may be changed as long as it gets no longer; around it, before
// the pointer and behind the terminator, lie remains of earlier texts. Don't keep a result, and don't hand it
// to code that may make names of its own without bound: for text that has to last there is
// `zanbase/string_makers.h`.
//
// Any thread may call any of these functions at any time; the lock that they share covers the choice of a
// slot alone, so nobody waits for another's text. None of them allocates, fails or returns null. A slot holds
// 4096 bytes: a longer text is cut to its first 4095 without notice.

/// The exact decimal text of `value`: digits, with `-` before them if it is negative, and nothing else. It is
/// quicker than a format.
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
ZANBASE_API char* MkName(double value, int decimals);

/// The text of a `printf` format and its arguments. `format` must not be null. An argument may be an earlier
/// result.
ZANBASE_API char* MkName(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

/// The same from an argument list, which the call uses up; the caller still owes its `va_end`.
ZANBASE_API char* MkNameV(const char* format, va_list arguments) ZANBASE_PRINTF_FORMAT(1, 0);

/// `MkName(format, …)` with C linkage, for C code and for look-up by name.
extern "C" ZANBASE_API char* MkNameC(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

/// Joins strings with "|" up to the null pointer that ends the list. A null `first` is the empty list (the
/// compiler still asks for the null at the end). No separator goes before the first string that isn't empty;
/// every string behind that one has its own, empty or not ("a||b").
ZANBASE_API char* MkTokenName(const char* first, ...) ZANBASE_NULL_TERMINATED;

/// @}

#endif
