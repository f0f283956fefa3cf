// The text rules applied to an area on the stack of each call.
#include "zanbase/string_makers.h"

#include "text/text_rules.h"

namespace {

template <class Integer>
std::string DecimalString(Integer value) {
    char area[kDecimalBytes];
    char* const end = area + sizeof area;
    return {WriteDecimal(value, end), end};
}

}  // namespace

std::string MkString(short value) { return DecimalString(value); }
std::string MkString(unsigned short value) { return DecimalString(value); }
std::string MkString(int value) { return DecimalString(value); }
std::string MkString(unsigned int value) { return DecimalString(value); }
std::string MkString(long value) { return DecimalString(value); }
std::string MkString(unsigned long value) { return DecimalString(value); }
std::string MkString(long long value) { return DecimalString(value); }
std::string MkString(unsigned long long value) { return DecimalString(value); }

std::string MkString(double value, int decimals) {
    char area[64];
    const std::size_t length = WriteFixedPoint(value, decimals, area, sizeof area);
    return {area, length};
}

// The areas are not initialised: clearing 4096 bytes would slow down short texts.

std::string MkString(const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    std::string text = MkStringV(format, arguments);
    va_end(arguments);
    return text;
}

std::string MkStringV(const char* format, va_list arguments) {
    char area[kTextBytes];
    WriteFormat(format, arguments, area, sizeof area);
    return area;
}

std::string MkTokenString(const char* first, ...) {
    char area[kTextBytes];
    va_list rest;
    va_start(rest, first);
    const std::size_t length = WriteTokens(first, rest, area, sizeof area);
    va_end(rest);
    return {area, length};
}
