// Printing and scanning numbers in text fields.
#include "zanbase/field_text.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <type_traits>

#include "text/text_rules.h"

namespace {

constexpr int kDefaultWidth = 40;         // width of a field if the caller gives none
constexpr std::size_t kLongestText = 64;  // limit of PrintDouble, PrintFloat and PrintInt

char gacDoubleText[80];
char gacInt64Text[22];

// A pointer has no format attribute: only the caller of the library knows the format. Volatile as in text_rules.cpp.
int (*const volatile kPrint)(char*, std::size_t, const char*, ...) = std::snprintf;

// Prints to `area` and returns the length of the text, 0 if the runtime fails.
template <class Value>
std::size_t Print(char (&area)[kLongestText + 1], const char* format, Value value) noexcept {
    const int length = kPrint(area, sizeof area, format, value);
    return std::min(static_cast<std::size_t>(std::max(length, 0)), kLongestText);
}

// Counts the remaining characters: with a large width, a pointer to the end of the field would overflow.
template <class Integer>
Integer ScanInteger(const char* field, int width) noexcept {
    int left = width < 1 ? kDefaultWidth : width;
    while (left > 0 && (*field == ' ' || *field == '\t')) ++field, --left;
    const bool is_negative = left > 0 && *field == '-';
    if (left > 0 && (is_negative || *field == '+')) ++field, --left;
    std::make_unsigned_t<Integer> magnitude = 0;  // unsigned arithmetic wraps
    for (; left > 0; ++field, --left) {
        const unsigned int digit = static_cast<unsigned char>(*field) - static_cast<unsigned int>('0');
        if (digit > 9) break;
        magnitude = magnitude * 10 + digit;
    }
    return static_cast<Integer>(is_negative ? 0 - magnitude : magnitude);
}

// Adds `distance` to each letter from `first` to `last`.
void ShiftLetters(char* text, char first, char last, int distance) noexcept {
    for (; *text != '\0'; ++text) {
        if (first <= *text && *text <= last) *text = static_cast<char>(*text + distance);
    }
}

}  // namespace

const char* FormatDouble(double value, char* buffer) noexcept {
    constexpr std::size_t kBufferBytes = 25;  // what a caller's buffer holds at least
    char* const area = buffer != nullptr ? buffer : gacDoubleText;
    const std::size_t bytes = buffer != nullptr ? kBufferBytes : sizeof gacDoubleText;
    const double magnitude = std::fabs(value);
    if (-2147483648.0 < value && value < 2147483647.0) {
        const double below = std::floor(value);
        if (value == below || (magnitude > 0.5 && value - below < 1e-11)) {
            char digits[kDecimalBytes];
            char* const end = digits + sizeof digits;
            *std::copy(WriteDecimal(static_cast<int>(below), end), end, area) = '\0';
            return area;
        }
    }
    const char* const format = magnitude > 1e7 || magnitude < 1e-7 ? "%24.15e" : "%24.11f";
    if (kPrint(area, bytes, format, value) < 0) *area = '\0';
    return area;
}

void PrintDouble(char* field, const char* format, double value) noexcept {
    char area[kLongestText + 1];
    const std::size_t length = Print(area, format, value);
    std::replace_copy_if(
        area, area + length, field, [](char c) { return c == 'E' || c == 'e'; }, 'D');
}

void PrintFloat(char* field, const char* format, double value) noexcept {
    char area[kLongestText + 1];
    std::memcpy(field, area, Print(area, format, value));
}

void PrintInt(char* field, const char* format, long value) noexcept {
    char area[kLongestText + 1];
    std::memcpy(field, area, Print(area, format, value));
}

const char* PrintInt64(long long value) noexcept {
    char* const terminator = gacInt64Text + sizeof gacInt64Text - 1;
    std::fill(gacInt64Text, terminator, ' ');
    *terminator = '\0';
    return WriteDecimal(value, terminator);
}

// One strtod gives the result of sscanf with "%lE" and, where that finds no number, of atof. They differ in two
// things: strtod stores the payload of a "nan(…)"; and it reads an incomplete "infinity", such as "infi", as
// infinity, where those of the Windows runtime give 0.
double ScanDouble(const char* field, int width) noexcept {
    constexpr int kLongestField = 63;
    char copy[kLongestField + 1];
    const int most = width < 1 ? kDefaultWidth : std::min(width, kLongestField);
    int length = 0;
    for (; length < most && field[length] != '\0'; ++length) {
        const char c = field[length];
        copy[length] = c == 'D' ? 'E' : c == 'd' ? 'e' : c;
    }
    copy[length] = '\0';
    char* end = nullptr;
    const double value = std::strtod(copy, &end);
    return end != copy ? value : 0;  // some runtimes make a negative zero of a lone sign
}

int ScanInt(const char* field, int width) noexcept { return ScanInteger<int>(field, width); }

long long ScanInt64(const char* field, int width) noexcept { return ScanInteger<long long>(field, width); }

void TextFieldFill(char* field, const char* text, int width) noexcept {
    if (width <= 0) return;
    const auto size = static_cast<std::size_t>(width);
    const void* const terminator = std::memchr(text, '\0', size);  // reads at most `size` bytes
    const std::size_t length =
        terminator != nullptr ? static_cast<std::size_t>(static_cast<const char*>(terminator) - text) : size;
    std::memmove(field, text, length);
    std::memset(field + length, ' ', size - length);
}

void UCaseString(char* text) noexcept { ShiftLetters(text, 'a', 'z', 'A' - 'a'); }

void LCaseString(char* text) noexcept { ShiftLetters(text, 'A', 'Z', 'a' - 'A'); }

int NextMult(int value, int multiple) noexcept {
    // The sum wraps in unsigned arithmetic. INT_MIN / -1 overflows, so -1 is a case of its own: dividing and
    // multiplying by -1 gives the sum again. All other quotients and products are in range.
    const auto sum =
        static_cast<int>(static_cast<unsigned int>(value) + static_cast<unsigned int>(multiple) - 1u);
    return multiple == -1 ? sum : sum / multiple * multiple;
}

double ZAN_modf(double value, double* whole) noexcept {
    *whole = std::trunc(value);
    return value - *whole;
}
