// Names and strings with their limits, the turns of the ring, and the routines of fields.
#include "text/name_ring.h"

#include <gtest/gtest.h>
#include <sys/mman.h>

#include <climits>
#include <cmath>

#include "zanbase/field_text.h"
#include "zanbase/name_ring.h"
#include "zanbase/string_makers.h"

template <class... Texts>
void ExpectPairs(const Texts&... texts) {
    const std::string all[] = {texts...};
    for (std::size_t i = 0; i < sizeof...(texts); i += 2) EXPECT_EQ(all[i], all[i + 1]) << "pair " << i / 2;
}

// First in the file, and under ctest in a process of its own: nobody has taken a slot yet.
TEST(NameRing, StartsAtSlotZeroAndKeepsANameFor255Takes) {
    for (int take = 0; take <= 512; ++take) ASSERT_EQ(MkName("kept"), goNameRing.maSlots[take % 256]);
    for (int take = 1; take < 256; ++take)
        ASSERT_EQ(MkName(take) + MkString(take).size(), goNameRing.maSlots[take] + 4095);
    EXPECT_STREQ(goNameRing.maSlots[0], "kept");
}

TEST(NameRing, GivesThreadsDistinctSlots) {
    for (int round = 0; round < 50; ++round) {
        const char* names[256];
#pragma omp parallel for num_threads(4)
        for (int name = 0; name < 256; ++name) names[name] = MkName("%d", name);
        for (int name = 0; name < 256; ++name) ASSERT_EQ(names[name], MkString(name));
    }
}

template <class... Integers>
void ExpectExact(unsigned long long bits) {
    (ExpectPairs(MkString(static_cast<Integers>(bits)), std::to_string(static_cast<Integers>(bits))), ...);
    (ExpectPairs(MkName(static_cast<Integers>(bits)), std::to_string(static_cast<Integers>(bits))), ...);
}

TEST(Makers, WriteTheExactTextAroundEveryPowerOfTwoAndOfTen) {
    for (unsigned long long two = 1, ten = 1, round = 0; round < 64; ++round, two *= 2, ten *= 10)
        for (const auto bits : {two - 1, two, 0 - two, ten - 1, ten, 0 - ten})
            ExpectExact<short, unsigned short, int, unsigned, long, unsigned long, long long,
                        unsigned long long>(bits);
}

TEST(Makers, TrimFixedPointPrintFormatsAndJoinTokensUpToTheirLimits) {
    const std::string full(4095, 'x'), more = full + "y";
    ExpectPairs(
        MkString(2.0, 3), "2", MkString(100.0, 0), "100", MkString(-0.001, 2), "-0", MkString(0.0, -1), "0",
        MkString(0.001, -7), "0.001", MkString(-1.0 / 3, INT_MIN), "-0.33333333333333",
        MkString(123456789012345.6, -1), "123456789012346", MkString(1e-70, -1), "0", MkString(1e70, 3),
        "100000000000000007253143638152923512615837440964652195551821015", MkName(1e70, 2),
        "10000000000000000725314363815292351261583744096465219555182101554790400", MkName(5e-324, INT_MAX),
        MkString("%.1074f", 5e-324), MkString("%s: %d%%, %.2f", "disk", 97, 0.125), "disk: 97%, 0.12",
        MkString("%s", full.c_str()), full, MkString("%s", more.c_str()), full, MkNameC("%s", more.c_str()),
        full, MkTokenName(more.c_str(), nullptr), full, MkTokenName("a", "bc", nullptr), "a|bc",
        MkTokenString(static_cast<const char*>(nullptr), "a", nullptr), "",
        MkTokenString("a", "", "b", nullptr), "a||b", MkTokenString("", "a", "", nullptr), "a|",
        MkTokenString(full.c_str(), "b", nullptr), full, MkTokenString(&full[1], "b", nullptr),
        full.substr(1) + "|");
}

// A field that ends where a page begins that can't be touched: a step beyond ends the test.
char* AtPageEnd(const std::string& bytes) {
    void* const pages = mmap(nullptr, 131072, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    mprotect(pages, 65536, PROT_READ | PROT_WRITE);  // a multiple of what any system has
    char* const start = static_cast<char*>(pages) + 65536 - bytes.size();
    return bytes.copy(start, bytes.size()), start;
}

TEST(FormatDouble, ChoosesAmongThreeForms) {
    const double least = INT_MIN, past_least = std::nextafter(least, 0), small = std::nextafter(1e-7, 0);
    const std::string space(25, '#');
    for (const double value : {-0.0, -3.0, 1e7, INT_MAX - 1.0, least + 1, 3.000000000001, -0.999999999999})
        EXPECT_EQ(FormatDouble(value, AtPageEnd(space)), MkString("%.0f", value + 0.0));  // -0.0 + 0.0 is 0.0
    for (const double value : {INT_MAX + 0.0, INT_MAX - 0.5, least, past_least, small, 1e-12, -10000000.5})
        EXPECT_EQ(FormatDouble(value, AtPageEnd(space)), MkString("%24.15e", value));
    for (const double value : {2.999999999999, 3.00000000002, 0.25, 0.5, 1e-7, -9999999.5, std::nan("")})
        EXPECT_EQ(FormatDouble(value, AtPageEnd(space)), MkString("%24.11f", value));
}

// What the readers make of `text`, cut or ended by a terminator: a real number and a 64-bit integer.
std::string Scanned(const std::string& text, int width) {
    const auto most = static_cast<std::size_t>(width < 1 ? 40 : width);
    const char* const field = AtPageEnd(text.size() < most ? text + '\0' : text.substr(0, most));
    EXPECT_EQ(ScanInt(field, width), static_cast<int>(ScanInt64(field, width))) << text;
    return MkString("%.20g %lld", ScanDouble(field, width), ScanInt64(field, width));
}

TEST(Scanners, ReadTheHeadOfAField) {
    const std::string blanks(39, ' '), zeros(62, '0');
    ExpectPairs(Scanned("1.5D+02", 7), "150 1", Scanned("1.5d+02", 7), "150 1", Scanned("  -12abc", 8),
                "-12 -12", Scanned("123456", 3), "123 123", Scanned("   ", 3), "0 0", Scanned("-", 1), "0 0",
                Scanned("--5", 3), "0 0", Scanned("\t +9", 4), "9 9", Scanned("\n5", 2), "5 0",
                Scanned("4/5", 3), "4 4", Scanned("7:", 2), "7 7", Scanned("42", INT_MAX), "42 42",
                Scanned(blanks + "12", 0), "1 1", Scanned(zeros + "12", 64), "1 12",
                Scanned("18446744073709551621", 20), "18446744073709551616 5",
                Scanned("-9223372036854775808", 20), "-9223372036854775808 -9223372036854775808");
}

TEST(FieldText, PrintsFillsChangesRoundsAndSplits) {
    std::string field(80, '#'), upper = "@AZ[`az{09 \x7f\xc0\xe4\xff", lower = upper;
    PrintInt(&field[0], "%065ld", 7L);
    PrintDouble(&field[0], "Else%10.3e", 1500.0);
    PrintFloat(&field[15], "%10.3E", 1500.0);
    char* const filled = AtPageEnd("########");
    TextFieldFill(filled, AtPageEnd("abc"), 3);
    TextFieldFill(filled + 4, "de", 4);
    UCaseString(upper.data());
    LCaseString(lower.data());
    const auto next = [](int value, int multiple) { return MkString(NextMult(value, multiple)); };
    ExpectPairs(FormatDouble(0.25, nullptr), "           0.25000000000", field,
                "DlsD 1.500D+030 1.500E+03" + std::string(39, '0') + std::string(16, '#'),
                std::string(filled, 8), "abc#de  ", upper, "@AZ[`AZ{09 \x7f\xc0\xe4\xff", lower,
                "@az[`az{09 \x7f\xc0\xe4\xff", next(10, 4), "12", next(12, 4), "12", next(-5, 4), "0",
                next(-9, 4), "-4", next(5, -4), "0", next(INT_MAX, 2), "-2147483648", next(INT_MIN + 2, -1),
                "-2147483648");
    EXPECT_STREQ(PrintInt64(LLONG_MIN), "-9223372036854775808");
    EXPECT_EQ(PrintInt64(0) - 20, std::string(20, ' ') + "0");  // nothing is left of the longer text
    double whole = 0;
    EXPECT_TRUE(ZAN_modf(2.75, &whole) == 0.75 && ZAN_modf(-2.75, &whole) == -0.75 && whole == -2) << whole;
    EXPECT_FALSE(std::signbit(ZAN_modf(-3, &whole)));
}
