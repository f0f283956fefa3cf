// Every routine by a table. Fields lie before a page that can't be touched: a routine that passes the end of
// its field ends the test.
#include "zanbase/field_text.h"

#include <sys/mman.h>

#include <climits>
#include <cmath>
#include <cstring>

#include "support/text_pairs.h"
#include "zanbase/string_makers.h"

namespace {

char* AtPageEnd(const std::string& bytes) {
    constexpr std::size_t kPage = 65536;  // a multiple of what any system has
    void* const pages = mmap(nullptr, 2 * kPage, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    char* const end = static_cast<char*>(pages) + kPage;
    mprotect(end, kPage, PROT_NONE);
    return static_cast<char*>(std::memcpy(end - bytes.size(), bytes.data(), bytes.size()));
}

std::string Formatted(double value) {
    char* const buffer = AtPageEnd(std::string(25, '#'));
    EXPECT_EQ(FormatDouble(value, buffer), buffer);
    EXPECT_STREQ(FormatDouble(value, nullptr), buffer);
    return buffer;
}

TEST(FormatDouble, ChoosesAmongThreeForms) {
    for (const double value :
         {0.0, -0.0, -3.0, 1e7, 2147483646.0, -2147483647.0, 3.000000000001, -0.999999999999}) {
        EXPECT_EQ(Formatted(value), MkString("%.0f", value + 0.0));  // -0.0 + 0.0 has no sign
    }
    for (const double value : {2147483647.0, 2147483646.5, -2147483648.0, std::nextafter(-2147483648.0, 0.0),
                               1e-12, -1e-8, std::nextafter(1e-7, 0.0), -10000000.5, -1e300, HUGE_VAL}) {
        EXPECT_EQ(Formatted(value), MkString("%24.15e", value));
    }
    for (const double value : {2.999999999999, 3.00000000002, 0.25, 0.5, 1e-7, -9999999.5, std::nan("")}) {
        EXPECT_EQ(Formatted(value), MkString("%24.11f", value));
    }
}

TEST(Printers, WriteTheirTextAndNothingBehindIt) {
    const auto printed = [](auto print, const char* format, auto value) {
        std::string field(70, '#');
        print(field.data(), format, value);
        return field.substr(0, field.find_last_not_of('#') + 1);
    };
    ExpectPairs(printed(PrintDouble, "Else%10.3E", 1500.0), "DlsD 1.500D+03",
                printed(PrintDouble, "%.1e", 1.5), "1.5D+00", printed(PrintFloat, "%10.3E", 1500.0),
                " 1.500E+03", printed(PrintInt, "%5ld", LONG_MIN), std::to_string(LONG_MIN),
                printed(PrintInt, "%065ld", 7l), std::string(64, '0'));
    const char* const least = PrintInt64(LLONG_MIN);
    EXPECT_STREQ(least, "-9223372036854775808");
    EXPECT_STREQ(PrintInt64(0), "0");
    EXPECT_EQ(std::string(least - 1), std::string(20, ' ') + "0");  // nothing is left of the longer text
}

// What the readers make of `text` in a field that may be read for `width` characters and is cut there, or
// ends with a terminator: the real number, and the 64-bit integer, whose low half is the 32-bit one.
std::string Scanned(const std::string& text, int width) {
    const auto most = static_cast<std::size_t>(width < 1 ? 40 : width);
    const char* const field = AtPageEnd(text.size() < most ? text + '\0' : text.substr(0, most));
    const long long integer = ScanInt64(field, width);
    EXPECT_EQ(ScanInt(field, width), static_cast<int>(integer)) << text;
    return MkString("%.20g %lld", ScanDouble(field, width), integer);
}

TEST(Scanners, ReadTheHeadOfAField) {
    const std::string blanks(39, ' ');
    const std::string zeros(62, '0');
    ExpectPairs(Scanned("1.5D+02", 7), "150 1", Scanned("1.5d+02", 7), "150 1", Scanned("  -12abc", 8),
                "-12 -12", Scanned("123456", 3), "123 123", Scanned("1.5E+", 5), "1.5 1", Scanned("   ", 3),
                "0 0", Scanned("", 9), "0 0", Scanned("+", 1), "0 0", Scanned("-", 2), "0 0",
                Scanned("--5", 3), "0 0", Scanned("\t +9", 4), "9 9", Scanned("\n5", 2), "5 0",
                Scanned("4/5", 3), "4 4", Scanned("7:", 2), "7 7", Scanned("42", INT_MAX), "42 42",
                Scanned(blanks + "12", INT_MIN), "1 1", Scanned(blanks + "12", 0), "1 1",
                Scanned(zeros + "12", 64), "1 12", Scanned("18446744073709551621", 20),
                "18446744073709551616 5", Scanned("-9223372036854775808", 20),
                "-9223372036854775808 -9223372036854775808");
}

TEST(TextFieldFill, WritesExactlyTheWidth) {
    const auto filled = [](std::string field, const std::string& text, int width) {
        char* const start = AtPageEnd(field);
        TextFieldFill(start, AtPageEnd(text), width);
        return field.assign(start, field.size());
    };
    ExpectPairs(filled("#####", {"abc", 4}, 5), "abc  ", filled("###", "abcdef", 3), "abc",
                filled("#", "a", 0), "#", filled("#", "a", -1), "#");
}

TEST(CaseChangers, TouchAsciiLettersOnly) {
    std::string upper = "@AZ[`az{09 \x7f\xc0\xe4\xff";
    std::string lower = upper;
    UCaseString(upper.data());
    LCaseString(lower.data());
    ExpectPairs(upper, "@AZ[`AZ{09 \x7f\xc0\xe4\xff", lower, "@az[`az{09 \x7f\xc0\xe4\xff");
}

TEST(NextMult, WrapsInsteadOfOverflowing) {
    const auto next = [](int value, int multiple) { return MkString(NextMult(value, multiple)); };
    ExpectPairs(next(10, 4), "12", next(12, 4), "12", next(0, 4), "0", next(-5, 4), "0", next(-9, 4), "-4",
                next(5, -4), "0", next(1, INT_MAX), "2147483647", next(INT_MAX, 2), "-2147483648",
                next(INT_MIN, -1), "2147483646", next(INT_MIN + 2, -1), "-2147483648");
}

TEST(ZanModf, SubtractsTheWholePart) {
    double whole = 0;
    for (const double sign : {1.0, -1.0}) {
        EXPECT_EQ(ZAN_modf(sign * 2.75, &whole), sign * 0.75);
        EXPECT_EQ(whole, sign * 2);
        EXPECT_FALSE(std::signbit(ZAN_modf(sign * 3, &whole)));
        EXPECT_TRUE(std::isnan(ZAN_modf(sign * HUGE_VAL, &whole)));
    }
}

}  // namespace
