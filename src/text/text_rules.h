// The rules that turn numbers, formats and token lists into text. Pure functions that write to the caller's
// area: a slot for the name ring, the stack for the string makers.
#ifndef ZANBASE_TEXT_TEXT_RULES_H
#define ZANBASE_TEXT_TEXT_RULES_H

#include <cstdarg>
#include <cstddef>
#include <cstring>
#include <type_traits>

#include "zanbase/export.h"

constexpr std::size_t kTextBytes = 4096;   // area of a format or token text, with its terminator
constexpr std::size_t kDecimalBytes = 21;  // any 64-bit integer, with its terminator

// Every two-digit number from 00 to 99.
constexpr char kDigitPairs[] =
    "0001020304050607080910111213141516171819202122232425262728293031323334353637383940414243444546474849"
    "5051525354555657585960616263646566676869707172737475767778798081828384858687888990919293949596979899";

// Writes the digits of `magnitude` backwards from `end` and returns a pointer to the first one.
template <class Unsigned>
char* WriteDigits(Unsigned magnitude, char* end) noexcept {
    static_assert(std::is_unsigned_v<Unsigned>);
    while (magnitude >= 100) {
        end -= 2;
        std::memcpy(end, kDigitPairs + 2 * (magnitude % 100), 2);
        magnitude /= 100;
    }
    if (magnitude >= 10) {
        end -= 2;
        std::memcpy(end, kDigitPairs + 2 * magnitude, 2);
    } else {
        *--end = static_cast<char>('0' + magnitude);
    }
    return end;
}

// Writes the exact decimal text of an integer of any type in the same way, without a terminator.
template <class Integer>
char* WriteDecimal(Integer value, char* end) noexcept {
    using Unsigned =
        std::conditional_t<sizeof(Integer) <= sizeof(unsigned int), unsigned int, unsigned long long>;
    const auto bits = static_cast<Unsigned>(value);
    if constexpr (std::is_signed_v<Integer>) {
        if (value < 0) {
            char* const first = WriteDigits(0 - bits, end);  // unsigned: holds any magnitude
            first[-1] = '-';
            return first - 1;
        }
    }
    return WriteDigits(bits, end);
}

// Writes `value` with at most `decimals` decimal places and a terminator, and returns the length. A negative
// `decimals` means 14 significant digits. The text is cut to the area first; then trailing zeros are removed.
// The text is empty if the runtime fails.
std::size_t WriteFixedPoint(double value, int decimals, char* area, std::size_t bytes) noexcept;

// Prints `format` with `arguments`, which it consumes, cut to the area, with a terminator. If the runtime
// fails (at a wide character without a multibyte form), the text is what it wrote before.
void WriteFormat(const char* format, va_list arguments, char* area, std::size_t bytes) noexcept
    ZANBASE_PRINTF_FORMAT(1, 0);

// Joins `first` and the strings of `rest`, up to a null pointer, with "|"; cuts the result to the area,
// writes a terminator and returns the length. No separator is written before the first non-empty string.
std::size_t WriteTokens(const char* first, va_list rest, char* area, std::size_t bytes) noexcept;

#endif
