// Any formats, token lists and messages for the makers of text, beside the plain way to make the same.
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "environment/message_catalogue.h"
#include "zanbase/zanbase.h"

namespace {

constexpr std::size_t kMost = 4095;  // characters of a text

void Require(bool holds) {
    if (!holds) std::abort();
}

// A format for an integer, a real number and a string, each at least once, in any order and number.
std::string FormatOf(const std::string& bytes) {
    static const char* const conversions[] = {"%1$d", "%1$-8d", "%2$.3f", "%2$g", "%3$s", "%3$300s", "%%"};
    std::string format = "%1$d%2$g%3$s";
    for (const char byte : bytes) {
        const auto choice = static_cast<unsigned char>(byte);
        format += choice >= 0xF0 || byte == '%' ? conversions[choice % 7] : std::string(1, byte);
    }
    return format;
}

#pragma GCC diagnostic ignored "-Wformat-nonliteral"  // what is tested
void CheckFormat(const std::string& format, int number, const char* text) {
    std::vector<char> expected(kMost + 1);
    if (std::snprintf(expected.data(), expected.size(), format.c_str(), number, number / 3.0, text) < 0)
        return;
    Require(MkName(format.c_str(), number, number / 3.0, text) == std::string(expected.data()));
    Require(MkString(format.c_str(), number, number / 3.0, text) == expected.data());
}

void CheckTokens(const std::vector<std::string>& tokens) {
    std::string expected;
    for (const std::string& token : tokens) expected += (expected.empty() ? "" : "|") + token;
    expected.resize(std::min(expected.size(), kMost));
    const char* const list[] = {tokens[0].c_str(), tokens[1].c_str(), tokens[2].c_str()};
    Require(MkTokenName(list[0], list[1], list[2], nullptr) == expected);
    Require(MkTokenString(list[0], list[1], list[2], nullptr) == expected);
}

// Without the doubled signs and the copy the message is there again.
void CheckTestText(const std::string& message) {
    const std::string text = IntlTestText(message);
    Require(text.compare(0, message.size() + 1, message + "#") == 0);
    std::string codes = text.substr(message.size() + 1), plain;
    for (std::size_t i = 0, from = 0; i < codes.size(); ++i) {
        const char next = from + 1 < message.size() ? message[from + 1] : ' ';
        plain += codes[i];
        if (message[from++] == '%' && next != '%' && std::isspace(static_cast<unsigned char>(next)) == 0)
            Require(codes[++i] == '%');
    }
    Require(plain == message);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, std::size_t size) {
    const std::string bytes(reinterpret_cast<const char*>(data), size);
    std::vector<std::string> parts(1);  // separated by null bytes
    for (const char byte : bytes) {
        if (byte != 0) {
            parts.back() += byte;
        } else {
            parts.emplace_back();
        }
    }
    parts.resize(3);
    CheckFormat(FormatOf(parts[0]), static_cast<int>(size) - 9, parts[1].c_str());
    CheckTokens(parts);
    CheckTestText(parts[0]);
    return 0;
}
