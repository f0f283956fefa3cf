// The rules by which numbers, formats and token lists become text. Functions of their arguments alone, on an
// area that the caller owns; the name ring and the string makers differ only in whose area that is.
#ifndef ZANBASE_TEXT_TEXT_RULES_H
#define ZANBASE_TEXT_TEXT_RULES_H

#include <cstdarg>
#include <cstddef>
#include <cstring>
#include <type_traits>

#include "zanbase/export.h"

constexpr std::size_t kTextBytes = 4096;   // area of a format or token text, terminator included
constexpr std::size_t kDecimalBytes = 21;  // 20 characters for any 64-bit integer, and the terminator

// Every two-digit number from 00 to 99.
constexpr char kDigitPairs[] =
    "0001020304050607080910111213141516171819202122232425262728293031323334353637383940414243444546474849"
    "5051525354555657585960616263646566676869707172737475767778798081828384858687888990919293949596979899";

// Writes the digits of `magnitude` so that the last one stands just before `end`, and returns the first one.
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

// The same for an integer of any type and either sign: its exact decimal text, which has no terminator.
template <class Integer>
char* WriteDecimal(Integer value, char* end) noexcept {
    using Unsigned =
        std::conditional_t<sizeof(Integer) <= sizeof(unsigned int), unsigned int, unsigned long long>;
    const auto bits = static_cast<Unsigned>(value);
    if constexpr (std::is_signed_v<Integer>) {
        if (value < 0) {
            char* const first = WriteDigits(0 - bits, end);  // unsigned, so that every magnitude has a place
            first[-1] = '-';
            return first - 1;
        }
    }
    return WriteDigits(bits, end);
}

// Writes `value` with at most `decimals` places behind the point, trailing zeros removed, and a terminator;
// returns the length. A negative `decimals` asks for 14 significant digits. What doesn't fit is cut before
// the zeros are removed.
std::size_t WriteFixedPoint(double value, int decimals, char* area, std::size_t bytes) noexcept;

// Prints `format` with `arguments`, which are used up, cut to the area, and a terminator. Where the runtime
// gives up on a format (a wide character without a byte form), the text is what it had written by then.
void WriteFormat(const char* format, va_list arguments, char* area, std::size_t bytes) noexcept
    ZANBASE_PRINTF_FORMAT(1, 0);

// Joins `first` and the strings of `rest` up to the null pointer that ends them by "|", cut to the area, and
// writes a terminator; returns the length. The separator goes in only once something has been written.
std::size_t WriteTokens(const char* first, va_list rest, char* area, std::size_t bytes) noexcept;

#endif
