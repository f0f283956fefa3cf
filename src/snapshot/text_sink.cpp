// Numbers and strings as the text formats need them.
#include "snapshot/text_sink.h"

#include <charconv>
#include <cmath>

namespace {

constexpr char kHexDigits[] = "0123456789abcdef";
constexpr std::string_view kReplacement = "\xEF\xBF\xBD";  // U+FFFD

unsigned char ByteAt(std::string_view text, std::size_t index) {
    return static_cast<unsigned char>(text[index]);
}

// What a lead byte says: the length of its character and the range of the byte after it, which rules out long
// forms, surrogates and what is above U+10FFFF. Length 0 marks a byte that is not a lead byte.
struct LeadByte {
    std::size_t length;
    unsigned char low, high;
};

LeadByte LeadByteOf(unsigned char byte) {
    if (byte < 0x80) return {1, 0, 0};
    if (byte < 0xC2 || byte > 0xF4) return {0, 0, 0};
    if (byte < 0xE0) return {2, 0x80, 0xBF};
    if (byte < 0xF0) {
        const unsigned char low = byte == 0xE0 ? 0xA0 : 0x80;
        const unsigned char high = byte == 0xED ? 0x9F : 0xBF;
        return {3, low, high};
    }
    const unsigned char low = byte == 0xF0 ? 0x90 : 0x80;
    const unsigned char high = byte == 0xF4 ? 0x8F : 0xBF;
    return {4, low, high};
}

// True for the bytes that a JSON string holds as they are.
constexpr std::array<bool, 256> PlainBytes() {
    std::array<bool, 256> plain{};
    for (std::size_t byte = 0x20; byte < 0x80; ++byte) plain[byte] = byte != '"' && byte != '\\';
    return plain;
}

constexpr std::array<bool, 256> kPlain = PlainBytes();

}  // namespace

std::size_t Utf8CharacterLength(std::string_view text) {
    if (text.empty()) return 0;
    const LeadByte lead = LeadByteOf(ByteAt(text, 0));
    if (lead.length <= 1) return lead.length;
    if (text.size() < lead.length) return 0;
    if (ByteAt(text, 1) < lead.low || ByteAt(text, 1) > lead.high) return 0;
    for (std::size_t index = 2; index < lead.length; ++index)
        if ((ByteAt(text, index) & 0xC0) != 0x80) return 0;
    return lead.length;
}

bool IsUtf8(std::string_view text) {
    while (!text.empty()) {
        const std::size_t length = Utf8CharacterLength(text);
        if (length == 0) return false;
        text.remove_prefix(length);
    }
    return true;
}

std::size_t HUtf8CharacterLength(const char* bytes, std::size_t count) noexcept {
    return Utf8CharacterLength({bytes, count});
}

TextSink& TextSink::AddNumber(long long number) {
    std::array<char, 24> digits;
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number).ptr;
    return Add({digits.data(), static_cast<std::size_t>(end - digits.data())});
}

TextSink& TextSink::AddNumber(double number, std::string_view not_finite) {
    if (!std::isfinite(number)) return Add(not_finite);
    std::array<char, 32> digits;
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number).ptr;
    return Add({digits.data(), static_cast<std::size_t>(end - digits.data())});
}

TextSink& TextSink::AddJsonString(std::string_view text) {
    Add("\"");
    while (!text.empty()) {
        std::size_t plain = 0;
        while (plain < text.size() && kPlain[ByteAt(text, plain)]) ++plain;
        Add(text.substr(0, plain));
        text.remove_prefix(plain);
        if (text.empty()) break;
        const std::size_t length = Utf8CharacterLength(text);
        if (length > 1) {
            Add(text.substr(0, length));
        } else {
            AddJsonEscape(ByteAt(text, 0));
        }
        text.remove_prefix(length > 1 ? length : 1);
    }
    return Add("\"");
}

void TextSink::AddJsonEscape(unsigned char byte) {
    if (byte >= 0x80) {
        Add(kReplacement);
    } else if (byte == '"' || byte == '\\') {
        const char escape[] = {'\\', static_cast<char>(byte)};
        Add({escape, sizeof escape});
    } else {
        const char escape[] = {'\\', 'u', '0', '0', kHexDigits[byte >> 4], kHexDigits[byte & 15]};
        Add({escape, sizeof escape});
    }
}

TextSink& TextSink::AddHex(std::string_view bytes) {
    for (std::size_t index = 0; index < bytes.size(); ++index) {
        const unsigned char byte = ByteAt(bytes, index);
        const char digits[] = {kHexDigits[byte >> 4], kHexDigits[byte & 15]};
        Add({digits, sizeof digits});
    }
    return *this;
}
