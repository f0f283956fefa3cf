// Feeds the readers and TextFieldFill with any field and width, under the sanitizers: a field is a heap block
// that ends where the reading has to. What was read is held against the runtime's own readers.
#include "zanbase/field_text.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

void Require(bool holds) {
    if (!holds) std::abort();
}

double ReadDouble(std::string text) {
    std::replace(text.begin(), text.end(), 'D', 'E');
    std::replace(text.begin(), text.end(), 'd', 'e');
    double value = 0;
    return std::sscanf(text.c_str(), "%lE", &value) != 0 ? value : std::atof(text.c_str());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    const int width = data[0] - 8;
    const std::size_t most = width < 1 ? 40 : static_cast<std::size_t>(width);
    std::string bytes(data + 1, data + std::min(size, most + 1));
    const std::string text = bytes.substr(0, bytes.find('\0'));
    if (bytes.size() < most) bytes += '\0';
    const std::vector<char> field(bytes.begin(), bytes.end());

    const double real = ScanDouble(field.data(), width);
    const double expected_real = ReadDouble(text.substr(0, 63));
    Require(real == expected_real || (std::isnan(real) && std::isnan(expected_real)));

    const long long integer = ScanInt64(field.data(), width);
    Require(ScanInt(field.data(), width) == static_cast<int>(integer));
    const std::string number = text.substr(std::min(text.find_first_not_of(" \t"), text.size()));
    errno = 0;
    const long long expected = std::isspace(static_cast<unsigned char>(number[0])) != 0
                                   ? 0
                                   : std::strtoll(number.c_str(), nullptr, 10);
    Require(integer == expected || errno == ERANGE);  // ours wraps

    std::vector<char> filled(static_cast<std::size_t>(std::max(width, 0)));
    TextFieldFill(filled.data(), field.data(), width);
    std::string padded = text;
    padded.resize(filled.size(), ' ');
    Require(std::equal(filled.begin(), filled.end(), padded.begin()));
    return 0;
}
