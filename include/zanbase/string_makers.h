/// @file
/// Numbers, formats and token lists as a `std::string`, in one call.
///
/// The texts are those of the name ring (`zanbase/name_ring.h`), by value:
///
///     MkString(42)                        "42"
///     MkString(1.5, 3)                    "1.5"
///     MkString("%s: %d%%", "disk", 97)    "disk: 97%"
///     MkTokenString("a", "b", nullptr)    "a|b"
///
/// Thread-safety: every function is thread-safe; they share no state.
///
/// Memory and errors: a function works in an area on the stack (about 4 kB for the format and token forms)
/// and allocates nothing but the result, so it throws only what `std::string` throws. Text that doesn't fit
/// in the area is cut without notice.
///
/// Not for texts longer than the limits below: build a `std::string`. For a text that is used only until the
/// next calls, `MkName` is faster.
#ifndef ZANBASE_STRING_MAKERS_H
#define ZANBASE_STRING_MAKERS_H

#include <cstdarg>
#include <string>

#include "zanbase/export.h"

/// @addtogroup text
/// @{

/// Returns the exact decimal text of `value`: digits, with a leading `-` if it is negative. Thread-safe.
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

/// Returns `value` in fixed-point form with at most `decimals` decimal places, rounded as `printf` rounds.
/// Trailing zeros after the decimal point are removed. If `decimals` is negative, the text has 14 significant
/// digits, or all digits of the whole part if those are more. Thread-safe.
///
/// The text is cut to its first 63 characters before the zeros are removed. A negative value that rounds to
/// zero keeps its sign ("-0"). An infinity or a NaN is printed as `printf` prints it. If the decimal sign of
/// the numeric locale is not a point, no zeros are removed.
[[nodiscard]] ZANBASE_API std::string MkString(double value, int decimals);

/// Returns the text of a `printf` format and its arguments, up to the first zero byte and at most 4095
/// characters. Thread-safe. Requires: `format` is not null and matches the arguments.
[[nodiscard]] ZANBASE_API std::string MkString(const char* format, ...) ZANBASE_PRINTF_FORMAT(1, 2);

/// As `MkString(const char*, ...)`, from an argument list. The call consumes the list; the caller still calls
/// `va_end` on it. Thread-safe.
[[nodiscard]] ZANBASE_API std::string MkStringV(const char* format, va_list arguments)
    ZANBASE_PRINTF_FORMAT(1, 0);

/// Joins strings with "|" up to the null pointer that ends the list. Thread-safe.
///
/// Empty strings before the first non-empty one add nothing. Every later string, empty or not, is preceded by
/// a separator: "a", "", "b" gives "a||b". The result is cut to its first 4095 characters. A null `first` is
/// the empty list; the compiler still asks for the null pointer at the end.
[[nodiscard]] ZANBASE_API std::string MkTokenString(const char* first, ...) ZANBASE_NULL_TERMINATED;

/// @}

#endif
