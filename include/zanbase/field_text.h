/// @file
/// Fixed-width text fields: printing and scanning numbers, and small routines for such records.
///
/// A field is part of a record: it has a position and a width, and no terminator. A print routine writes as
/// many characters as its text has. A scan routine stops at the width, or at a terminator before it:
///
///     char record[20];
///     TextFieldFill(record, "pump 7", 10);          // "pump 7    "
///     PrintDouble(record + 10, "%10.3E", 1500.0);   // " 1.500D+03"
///     double value = ScanDouble(record + 10, 10);   // 1500.0
///
/// Thread-safety: every function is thread-safe, except that `PrintInt64`, and `FormatDouble` with a null
/// buffer, return a static area. Calls that use the same area must not overlap, and the text is valid until
/// the next one.
///
/// Memory and errors: nothing here allocates, fails or reports. Only the `buffer` of `FormatDouble` may be
/// null. Real numbers have the decimal sign of the locale category `LC_NUMERIC`, which `InitLocale` keeps at
/// ".".
#ifndef ZANBASE_FIELD_TEXT_H
#define ZANBASE_FIELD_TEXT_H

#include "zanbase/export.h"

/// @addtogroup text
/// @{

/// Writes the general text of `value` to `buffer` and returns it. A null `buffer` means a static area.
/// Thread-safe with a buffer; with null, one call at a time. Requires: `buffer` is null or has 25 bytes.
///
/// If `value` lies strictly between -2^31 and 2^31 - 1 and is whole, or exceeds a whole number by less than
/// 1e-11 and has a magnitude above 0.5, the text is that integer without blanks. Any other value is
/// right-aligned in 24 characters: by "%24.15e" if its magnitude is above 1e7 or below 1e-7, else by
/// "%24.11f". A longer text is cut; that happens only in a locale whose decimal sign has several bytes.
ZANBASE_API const char* FormatDouble(double value, char* buffer) noexcept;

/// Prints `value` by `format`, a `printf` format for one `double`, changes every `E` and `e` of the text to
/// `D`, and copies the text to `field`: at most 64 characters, no terminator. The compiler doesn't check the
/// format. Thread-safe. Requires: `field` has room for the text.
ZANBASE_API void PrintDouble(char* field, const char* format, double value) noexcept;

/// As `PrintDouble`, but leaves all letters as they are. Thread-safe.
ZANBASE_API void PrintFloat(char* field, const char* format, double value) noexcept;

/// As `PrintFloat`, by a `printf` format for one `long`, such as "%8ld". Thread-safe.
ZANBASE_API void PrintInt(char* field, const char* format, long value) noexcept;

/// Returns the exact decimal text of `value` in a static area. Parses no format. Not thread-safe: one call at
/// a time.
[[nodiscard]] ZANBASE_API const char* PrintInt64(long long value) noexcept;

/// Returns the real number at the start of a field of `width` characters; `D` and `d` count as `E`. A `width`
/// below 1 means 40, one above 63 means 63. A field without a number gives 0. The runtime's `strtod` decides
/// what is a number: leading blanks, a sign, "inf" and "0x1p3" are. Thread-safe.
[[nodiscard]] ZANBASE_API double ScanDouble(const char* field, int width) noexcept;

/// Returns the decimal integer at the start of a field of `width` characters: blanks and tabs, at most one
/// sign, digits up to the first other character. A `width` below 1 means 40. A field without a number gives
/// 0. A number outside the range of the type wraps. Thread-safe.
[[nodiscard]] ZANBASE_API int ScanInt(const char* field, int width) noexcept;

/// As `ScanInt`, in 64 bits. Thread-safe.
[[nodiscard]] ZANBASE_API long long ScanInt64(const char* field, int width) noexcept;

/// Fills `field` with exactly `width` characters: `text` up to its terminator or its first `width`
/// characters, then blanks. Does nothing if `width` is 0 or negative. Thread-safe.
ZANBASE_API void TextFieldFill(char* field, const char* text, int width) noexcept;

/// Changes the letters `a` to `z` of a terminated text to upper case, in place. Leaves all other bytes alone,
/// in every locale. Thread-safe for different texts.
ZANBASE_API void UCaseString(char* text) noexcept;

/// Changes the letters `A` to `Z` to lower case in the same way. Thread-safe for different texts.
ZANBASE_API void LCaseString(char* text) noexcept;

/// Rounds a non-negative `value` up to a multiple of a positive `multiple`: 10 and 4 give 12. For any
/// arguments the result is `(value + multiple - 1) / multiple * multiple`, where the sum wraps at 32 bits and
/// the division truncates towards zero, so -5 and 4 give 0. Thread-safe. Requires: `multiple` is not 0.
[[nodiscard]] ZANBASE_API int NextMult(int value, int multiple) noexcept;

/// Stores `value` truncated towards zero in `*whole` and returns `value` minus that. Unlike the runtime's
/// `modf` it returns NaN for an infinity and +0.0 for a negative whole number. Thread-safe.
ZANBASE_API double ZAN_modf(double value, double* whole) noexcept;

/// @}

#endif
