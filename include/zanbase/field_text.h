/// @file
/// Fixed-width text fields: writing and reading numbers in them, and small routines that go with them.
#ifndef ZANBASE_FIELD_TEXT_H
#define ZANBASE_FIELD_TEXT_H

#include "zanbase/export.h"

// A field is a stretch of a record that has its place and width, and no terminator of its own. Printing a
// number touches as many characters as its text has; reading ends with the width, or with a terminator
// before:
//
//     char record[20];
//     TextFieldFill(record, "pump 7", 10);          // "pump 7    "
//     PrintDouble(record + 10, "%10.3E", 1500.0);   // " 1.500D+03"
//     double value = ScanDouble(record + 10, 10);   // 1500.0
//
// Nothing here allocates, fails or reports. No pointer may be null but `buffer` of `FormatDouble`. Real
// numbers have the decimal point of LC_NUMERIC, which `InitLocale` keeps at ".". Any thread may call any of
// these functions at any time, except where a function says that its result lies in a static area: calls of
// such a function must not overlap, and its text holds until the next call.

/// The general text of `value`, written to `buffer` (at least 25 bytes), which is returned. A null `buffer`
/// means a static area. A value strictly between -2^31 and 2^31 - 1 that is whole, or above a whole number by
/// less than 1e-11 and not within 0.5 of zero, gives that integer without blanks. Any other fills 24
/// characters from the right: "%24.15e" above 1e7 or below 1e-7 in magnitude, else "%24.11f".
ZANBASE_API const char* FormatDouble(double value, char* buffer) noexcept;

/// Prints `value` by `format`, a `printf` format for one `double`, changes every `E` and `e` of the text to
/// `D`, and copies the text to `field`: its length, at most the first 64 characters, no terminator. The
/// compiler does not check the format.
ZANBASE_API void PrintDouble(char* field, const char* format, double value) noexcept;

/// As `PrintDouble`, but no letter changes.
ZANBASE_API void PrintFloat(char* field, const char* format, double value) noexcept;

/// As `PrintFloat`, by a `printf` format for one `long`, such as "%8ld".
ZANBASE_API void PrintInt(char* field, const char* format, long value) noexcept;

/// The exact decimal text of `value`, in a static area. No format is read, so this is quick.
[[nodiscard]] ZANBASE_API const char* PrintInt64(long long value) noexcept;

/// The real number at the head of a field of `width` characters; `D` and `d` stand for `E`. A `width` below 1
/// means 40, one above 63 means 63. A field without a number gives 0. What counts as a number is the
/// runtime's `strtod` to say: leading blanks, a sign, "inf" and "0x1p3" among it.
[[nodiscard]] ZANBASE_API double ScanDouble(const char* field, int width) noexcept;

/// The decimal integer at the head of a field of `width` characters: blanks and tabs, at most one sign,
/// digits up to the first other character. A `width` below 1 means 40. A field without a number gives 0; a
/// number beyond the type wraps.
[[nodiscard]] ZANBASE_API int ScanInt(const char* field, int width) noexcept;

/// As `ScanInt`, in 64 bits.
[[nodiscard]] ZANBASE_API long long ScanInt64(const char* field, int width) noexcept;

/// Fills `field` with exactly `width` characters: `text` up to its terminator or its first `width`
/// characters, then blanks. Does nothing if `width` is 0 or less.
ZANBASE_API void TextFieldFill(char* field, const char* text, int width) noexcept;

/// Makes capitals of the letters `a` to `z` of a terminated text, in place. All other bytes stay, whatever
/// the locale.
ZANBASE_API void UCaseString(char* text) noexcept;

/// Makes small letters of `A` to `Z` in the same way.
ZANBASE_API void LCaseString(char* text) noexcept;

/// Rounds a `value` that isn't negative up to a multiple of a positive `multiple`: 10 and 4 give 12. For any
/// arguments it is `(value + multiple - 1) / multiple * multiple`, where the sum wraps at 32 bits and the
/// division cuts towards zero, so -5 and 4 give 0. `multiple` must not be 0.
[[nodiscard]] ZANBASE_API int NextMult(int value, int multiple) noexcept;

/// Stores `value` cut towards zero in `*whole` and returns `value` minus that. Unlike the runtime's `modf`,
/// an infinity leaves a NaN and a negative whole number leaves +0.0.
ZANBASE_API double ZAN_modf(double value, double* whole) noexcept;

#endif
