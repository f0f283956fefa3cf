// Feeds the readers and TextFieldFill with any field and width, under the sanitizers: a field is a heap block
// that ends where the reading has to. Real numbers are held against the runtime's own readers.
#include "zanbase/field_text.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    const int width = data[0] - 8;
    const std::size_t most = width < 1 ? 40 : static_cast<std::size_t>(width);
    std::string text(data + 1, data + std::min(size, most + 1));
    if (text.size() < most) text += '\0';
    const std::vector<char> field(text.begin(), text.end());
    std::vector<char> filled(static_cast<std::size_t>(std::max(width, 0)));
    TextFieldFill(filled.data(), field.data(), width);

    text.resize(std::min(text.size(), std::size_t{63}));
    std::replace(text.begin(), text.end(), 'D', 'E');
    std::replace(text.begin(), text.end(), 'd', 'e');
    double expected = 0;
    if (std::sscanf(text.c_str(), "%lE", &expected) == 0) expected = std::atof(text.c_str());
    const double real = ScanDouble(field.data(), width);
    if (real != expected && !(std::isnan(real) && std::isnan(expected))) std::abort();
    const auto low_half = static_cast<int>(ScanInt64(field.data(), width));
    if (ScanInt(field.data(), width) != low_half) std::abort();
    return 0;
}
