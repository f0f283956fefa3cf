// Fuzzes the scanners and TextFieldFill with any field and width. Each field is a block of its own, so that the
// address sanitizer reports an access outside it.
#include "zanbase/field_text.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, std::size_t size) {
    if (size == 0) return 0;
    const int width = data[0] - 8;
    const std::size_t most = width < 1 ? 40 : static_cast<std::size_t>(width);
    std::vector<char> field(std::min(size, most));  // with a terminator where there is room
    std::copy_n(data + 1, std::min(size - 1, most), field.begin());
    std::vector<char> filled(static_cast<std::size_t>(std::max(width, 0)));
    TextFieldFill(filled.data(), field.data(), width);
    if (ScanInt(field.data(), width) != static_cast<int>(ScanInt64(field.data(), width))) std::abort();
    std::string text(field.data(), std::min<std::size_t>(field.size(), 63));
    for (char& c : text) c = c == 'D' ? 'E' : c == 'd' ? 'e' : c;
    double expected = 0, real = ScanDouble(field.data(), width);
    if (std::sscanf(text.c_str(), "%lE", &expected) == 0) expected = std::atof(text.c_str());
    const bool both_are_nan = std::isnan(real) && std::isnan(expected);
    if (real != expected && !both_are_nan) std::abort();
    return 0;
}
