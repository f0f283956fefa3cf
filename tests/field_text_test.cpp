// Numbers in fixed-width fields, and the small routines that go with them.
#include "zanbase/field_text.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <string>
#include <vector>

#include "zanbase/string_makers.h"

// A block of its own with exactly these characters: the address sanitizer sees a step beyond them.
std::vector<char> Block(const std::string& characters) { return {characters.begin(), characters.end()}; }

TEST(FormatDouble, ChoosesAmongThreeForms) {
    const double least = INT_MIN, past_least = std::nextafter(least, 0), small = std::nextafter(1e-7, 0);
    const std::string space(25, '#');
    for (const double value : {0.0, -3.0, 1e7, INT_MAX - 1.0, least + 1, 3.000000000001, -0.999999999999})
        EXPECT_EQ(FormatDouble(value, Block(space).data()), MkString("%.0f", value));
    for (const double value : {INT_MAX + 0.0, INT_MAX - 0.5, least, past_least, small, 1e-12, -10000000.5})
        EXPECT_EQ(FormatDouble(value, Block(space).data()), MkString("%24.15e", value));
    for (const double value : {2.999999999999, 3.00000000002, 0.25, 0.5, 1e-7, -9999999.5, std::nan("")})
        EXPECT_EQ(FormatDouble(value, Block(space).data()), MkString("%24.11f", value));
    EXPECT_STREQ(FormatDouble(-0.0, nullptr), "0");
}

void ExpectScans(const std::string& text, int width, double real, long long integer) {
    const auto most = static_cast<std::size_t>(width < 1 ? 40 : width);
    const auto field = Block(text.size() < most ? text + '\0' : text.substr(0, most));
    EXPECT_EQ(ScanDouble(field.data(), width), real) << text;
    EXPECT_EQ(ScanInt64(field.data(), width), integer) << text;
    EXPECT_EQ(ScanInt(field.data(), width), static_cast<int>(integer)) << text;
}

TEST(Scanners, ReadTheHeadOfAField) {
    ExpectScans("1.5D+02", 7, 150, 1);
    ExpectScans("  -12abc", 8, -12, -12);
    ExpectScans("123456", 3, 123, 123);
    ExpectScans("-", 1, 0, 0);
    ExpectScans("--5", 3, 0, 0);
    ExpectScans("\t +9", 4, 9, 9);
    ExpectScans("42", INT_MAX, 42, 42);
    ExpectScans(std::string(39, ' ') + "12", 0, 1, 1);
    ExpectScans(std::string(62, '0') + "12", 64, 1, 12);
    ExpectScans("18446744073709551621", 20, 18446744073709551616.0, 5);
    ExpectScans("-9223372036854775808", 20, -9223372036854775808.0, LLONG_MIN);
}

TEST(FieldText, PrintsIntoAFieldAtMost64CharactersAndNoTerminator) {
    std::string field(70, '#');
    PrintDouble(&field[0], "Else%10.3e", 1500.0);
    PrintFloat(&field[15], "%10.3E", 1500.0);
    EXPECT_EQ(field, "DlsD 1.500D+03# 1.500E+03" + std::string(45, '#'));
    PrintInt(&field[0], "%065ld", 7L);
    EXPECT_EQ(field, std::string(64, '0') + std::string(6, '#'));
}

TEST(FieldText, LeavesNothingOfALongerInteger) {
    EXPECT_STREQ(PrintInt64(LLONG_MIN), "-9223372036854775808");
    EXPECT_STREQ(PrintInt64(0), "0");
}

TEST(FieldText, FillsAFieldWithTextAndBlanks) {
    std::vector<char> field = Block("########");
    TextFieldFill(&field[0], Block("abc").data(), 3);
    TextFieldFill(&field[4], "de", 4);
    EXPECT_EQ(std::string(field.begin(), field.end()), "abc#de  ");
}

TEST(FieldText, ChangesTheCaseOfAsciiLettersOnly) {
    std::string upper = "@AZ[`az{09\xc0\xe4", lower = upper;
    UCaseString(upper.data());
    LCaseString(lower.data());
    EXPECT_EQ(upper, "@AZ[`AZ{09\xc0\xe4");
    EXPECT_EQ(lower, "@az[`az{09\xc0\xe4");
}

TEST(FieldText, RoundsUpAndSplitsAsTheirDivisionAndTruncationDo) {
    EXPECT_EQ(NextMult(10, 4), 12);
    EXPECT_EQ(NextMult(-5, 4), 0);
    EXPECT_EQ(NextMult(INT_MAX, 2), INT_MIN);
    EXPECT_EQ(NextMult(INT_MIN + 2, -1), INT_MIN);
    double whole = 0;
    EXPECT_EQ(ZAN_modf(-2.75, &whole), -0.75);
    EXPECT_EQ(whole, -2);
    EXPECT_FALSE(std::signbit(ZAN_modf(-3, &whole)));
}
