// Fixed-point, format and token text.
#include "text/text_rules.h"

#include <algorithm>
#include <cmath>
#include <cstdio>

namespace {

constexpr int kSignificantDigits = 14;  // if the number of decimal places is automatic
constexpr char kSeparator = '|';

// The unchecked form: the one that _FORTIFY_SOURCE puts in its place ends the process at a %n in a format that is
// in writable memory. A compiler replaces no call through a volatile pointer.
int (*const volatile kPrint)(char*, std::size_t, const char*, va_list) = std::vsnprintf;

int AutomaticDecimals(double value) noexcept {
    if (value == 0 || !std::isfinite(value)) return 0;
    const int exponent = static_cast<int>(std::floor(std::log10(std::fabs(value))));  // -324 to 308
    return std::max(kSignificantDigits - 1 - exponent, 0);
}

}  // namespace

// An infinity or a NaN is printed by the runtime: "inf", "-inf", "nan".
std::size_t WriteFixedPoint(double value, int decimals, char* area, std::size_t bytes) noexcept {
    // A double has at most 1074 decimal places; all further ones are zeros. Those that don't fit in the area are
    // not asked for: the runtime would allocate memory for them.
    const int most = std::max(1074, static_cast<int>(bytes));
    const int count = decimals < 0 ? AutomaticDecimals(value) : std::min(decimals, most);
    const int printed = std::snprintf(area, bytes, "%.*f", count, value);
    const auto length = static_cast<std::size_t>(std::max(printed, 0));  // negative if the runtime fails
    char* end = area + std::min(length, bytes - 1);
    if (std::memchr(area, '.', static_cast<std::size_t>(end - area)) != nullptr) {
        while (end[-1] == '0') --end;
        if (end[-1] == '.') --end;
    }
    *end = '\0';
    return static_cast<std::size_t>(end - area);
}

void WriteFormat(const char* format, va_list arguments, char* area, std::size_t bytes) noexcept {
    *area = '\0';  // the text if the runtime fails without writing
    kPrint(area, bytes, format, arguments);
}

std::size_t WriteTokens(const char* first, va_list rest, char* area, std::size_t bytes) noexcept {
    const std::size_t most = bytes - 1;
    std::size_t length = 0;
    for (const char* token = first; token != nullptr && length < most; token = va_arg(rest, const char*)) {
        if (length != 0) area[length++] = kSeparator;
        while (*token != '\0' && length < most) area[length++] = *token++;
    }
    area[length] = '\0';
    return length;
}
