// Field text beside the C library's formatter and scanners.
#include "zanbase/field_text.h"

#include <cstdio>
#include <cstdlib>

#include "text_pairs.h"

namespace {

template <class Value>
std::vector<std::string> Texts(const char* format, const std::vector<Value>& values) {
    std::vector<std::string> texts;
    for (const Value value : values) {
        char text[64];
        std::snprintf(text, sizeof text, format, value);
        texts.emplace_back(text);
    }
    return texts;
}

template <class Value>
char InBuffer(const char* format, Value value) {
    char text[64];
    std::snprintf(text, sizeof text, format, value);
    benchmark::DoNotOptimize(text);
    return text[0];
}

const char* OurDouble(double value) { return FormatDouble(value, nullptr); }
char PrintedDouble(double value) { return InBuffer("%24.11f", value); }
char PrintedWhole(double value) { return InBuffer("%.0f", value); }
char PrintedInt64(long long value) { return InBuffer("%lld", value); }

double OurReal(const std::string& text) { return ScanDouble(text.data(), 14); }
double ScannedReal(const std::string& text) {
    double value = 0;
    std::sscanf(text.data(), "%lE", &value);
    return value;
}

int OurInt(const std::string& text) { return ScanInt(text.data(), 11); }
int StdInt(const std::string& text) { return static_cast<int>(std::strtol(text.data(), nullptr, 10)); }

long long OurInt64(const std::string& text) { return ScanInt64(text.data(), 20); }
long long StdInt64(const std::string& text) { return std::strtoll(text.data(), nullptr, 10); }

const bool rows = [] {
    Ours("FormatDouble", Reals(2), OurDouble).Beside("snprintf %24.11f", PrintedDouble, 1.1);
    Ours("FormatDouble(whole)", Reals(0), OurDouble).Beside("snprintf %.0f", PrintedWhole, 1.1);
    Ours("PrintInt64", Integers<long long>(), PrintInt64).Beside("snprintf", PrintedInt64, 0.3);
    Ours("ScanDouble", Texts("%14.6E", Reals(3)), OurReal).Beside("sscanf", ScannedReal, 1.1);
    Ours("ScanInt", Texts("%11d", Integers<int>()), OurInt).Beside("strtol", StdInt, 1.0);
    Ours("ScanInt64", Texts("%20lld", Integers<long long>()), OurInt64).Beside("strtoll", StdInt64, 1.0);
    return true;
}();

}  // namespace
