/// @file
/// Numbers, formats and token lists as a `std::string`, in one call.
#ifndef ZANBASE_STRING_MAKERS_H
#define ZANBASE_STRING_MAKERS_H

#include <cstdarg>
#include <string>

#include "zanbase/export.h"

// The texts are those of the name ring (`zanbase/name_ring.h`), by value:
//
//     MkString(42)                        "42"
//     MkString(1.5, 3)                    "1.5"
//     MkString("%s: %d%%", "disk", 97)    "disk: 97%"
//     MkTokenString("a", "b", nullptr)    "a|b"
//
// Any thread may call any of these functions at any time; they share nothing. They work in an area on the
// stack (about 4 kB for the format and token forms) and allocate nothing but the result, so they throw only
// what `std::string` throws. Text that doesn't fit in the area is cut without notice: where a text may be
// longer than the limits below, or a result need not outlive the next calls, take something else (a
// `std::string` of your own; `MkName`).

/// The exact decimal text of `value`: digits, with `-` before them if it is negative, and nothing else.
[[nodiscard]] ZANBASE_API std::string MkString(short value);
/// @copydoc MkString(short)
[[nodiscard]] ZANBASE_API std::string MkString(unsigned short value);
/// @copydoc MkString(short)
[[nodiscard]] ZANBASE_API std::string MkString(int value);
/// @copydoc MkString(short)
[[nodiscard]] ZANBASE_API std::string MkString(unsigned int value);
/// @copydoc MkString(short)
[[nodiscard]] ZANBASE_API std::string MkString(long value);
/// @copydoc MkString(short)
[[nodiscard]] ZANBASE_API std::string MkString(unsigned long value);
/// @copydoc MkString(short)
[[nodiscard]] ZANBASE_API std::string MkString(long long value);
/// @copydoc MkString(short)
[[nodiscard]] ZANBASE_API std::string MkString(unsigned long long value);

/// `value` in fixed-point form with at most `decimals` places, as `printf` rounds it, without trailing zeros
/// behind the point. With `decimals` below 0 it has 14 significant digits, or all of the whole part if those
/// are more. The text is cut to its first 63 characters before the zeros go. A value that rounds to zero from
/// below keeps its sign ("-0"); an infinity or a NaN is as `printf` has it. Under a numeric locale whose
/// decimal sign is not a point no zeros are removed.
[[nodiscard]] ZANBASE_API std::string MkString(double value, int decimals);

/// The text of a `printf` format and its arguments: at most the first 4095 characters of it, and nothing from
/// a zero byte on. `format` must not be null.
[[nodiscard]] ZANBASE_API std::string MkString(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

/// The same from an argument list, which the call uses up; the caller still owes its `va_end`.
[[nodiscard]] ZANBASE_API std::string MkStringV(const char* format, va_list arguments)
    ZANBASE_PRINTF_FORMAT(1, 0);

/// Joins strings with "|" up to the null pointer that ends the list. A null `first` is the empty list (the
/// compiler still asks for the null at the end). No separator goes before the first string that isn't empty;
/// every string behind that one has its own, empty or not ("a||b"). The whole is cut to its first 4095
/// characters.
[[nodiscard]] ZANBASE_API std::string MkTokenString(const char* first, ...) ZANBASE_NULL_TERMINATED;

#endif
