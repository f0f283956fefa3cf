// Texts that the printed reports share.
#include "memory/report_text.h"

#include "zanbase/string_makers.h"

namespace {

constexpr double kKilo = 1024.0;

}  // namespace

std::string SizeText(std::size_t bytes) {
    if (bytes > 1024) return KiloSizeText(static_cast<double>(bytes) / kKilo);
    return MkString("%d", static_cast<int>(bytes));
}

std::string KiloSizeText(double kilobytes) {
    if (kilobytes > kKilo * kKilo) return MkString("%.2fG", kilobytes / kKilo / kKilo);
    if (kilobytes > kKilo) return MkString("%.2fM", kilobytes / kKilo);
    return MkString("%.2fK", kilobytes);
}

std::string FitField(const std::string& text, unsigned int width, bool rightAlign) {
    if (width <= text.size()) return text;
    const std::string fill(width - text.size(), ' ');
    return rightAlign ? fill + text : text + fill;
}

std::string ShortSourcePath(const std::string& path) {
    const std::size_t source = path.find("/src/");
    return source == std::string::npos ? path : path.substr(source + 1);
}

void WriteText(std::FILE* stream, const std::string& text) {
    // Not fprintf, which on Windows writes an unbuffered stream byte by byte.
    std::fwrite(text.data(), 1, text.size(), stream);
}
