// Collects text for an output and passes it on in large pieces, with the encodings that the writers share. Allocates
// nothing.
#ifndef ZANBASE_SNAPSHOT_TEXT_SINK_H
#define ZANBASE_SNAPSHOT_TEXT_SINK_H

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>

#include "zanbase/account_data.h"

// The length of the well-formed UTF-8 character that `text` begins with, or 0 if there is none.
std::size_t Utf8CharacterLength(std::string_view text);

bool IsUtf8(std::string_view text);

inline std::string_view ViewOf(const HTextData& text) { return {text.mpcBytes, text.mnBytes}; }

class TextSink {
public:
    explicit TextSink(const HTextOutput& output) : moOutput(output) {}

    TextSink& Add(std::string_view text) {
        while (text.size() > maPiece.size() - mnUsed) {
            const std::size_t fits = maPiece.size() - mnUsed;
            Append(text.substr(0, fits));
            text.remove_prefix(fits);
            WritePiece();
        }
        Append(text);
        return *this;
    }

    TextSink& AddNumber(long long number);

    // The shortest text that reads back as the same number; `not_finite` for infinities and NaN.
    TextSink& AddNumber(double number, std::string_view not_finite);

    // A JSON string with its quotes.
    TextSink& AddJsonString(std::string_view text);

    // The two digits of each byte.
    TextSink& AddHex(std::string_view bytes);

    // The text, with U+FFFD in place of each byte that is not well-formed UTF-8, and each byte for which `escape`
    // returns a text in that form; for an empty one it stays.
    template <class Escape>
    TextSink& AddUtf8(std::string_view text, Escape escape);

    // Passes the rest on; true if the output has taken everything.
    bool Finish() {
        WritePiece();
        return !mbFailed;
    }

private:
    void Append(std::string_view text) {
        std::copy(text.begin(), text.end(), maPiece.begin() + static_cast<std::ptrdiff_t>(mnUsed));
        mnUsed += text.size();
    }

    // After a failure nothing more is passed on.
    void WritePiece() {
        if (mnUsed != 0 && !mbFailed)
            mbFailed = !moOutput.mpfnWrite(moOutput.mpContext, maPiece.data(), mnUsed);
        mnUsed = 0;
    }

    void AddJsonEscape(unsigned char byte);

    const HTextOutput& moOutput;
    std::array<char, 16384> maPiece;
    std::size_t mnUsed = 0;  // of maPiece
    bool mbFailed = false;
};

template <class Escape>
TextSink& TextSink::AddUtf8(std::string_view text, Escape escape) {
    while (!text.empty()) {
        const std::size_t length = Utf8CharacterLength(text);
        if (length == 0) {
            Add("\xEF\xBF\xBD");
            text.remove_prefix(1);
            continue;
        }
        const std::string_view escaped = length == 1 ? escape(text.front()) : std::string_view();
        Add(escaped.empty() ? text.substr(0, length) : escaped);
        text.remove_prefix(length);
    }
    return *this;
}

#endif
