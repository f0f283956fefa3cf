// Collects text for a stream and writes it in large pieces, with the encodings that the writers share.
#ifndef ZANBASE_SNAPSHOT_TEXT_SINK_H
#define ZANBASE_SNAPSHOT_TEXT_SINK_H

#include <cstddef>
#include <ostream>
#include <string>
#include <string_view>

// The length of the well-formed UTF-8 character that `text` begins with, or 0 if there is none.
std::size_t Utf8CharacterLength(std::string_view text);

bool IsUtf8(std::string_view text);

class TextSink {
public:
    explicit TextSink(std::ostream& stream) : moStream(stream) { moBuffer.reserve(2 * kPieceBytes); }

    TextSink& Add(std::string_view text) {
        moBuffer += text;
        if (moBuffer.size() >= kPieceBytes) WritePiece();
        return *this;
    }

    TextSink& AddNumber(long long number);

    // The shortest text that reads back as the same number; `not_finite` for infinities and NaN.
    TextSink& AddNumber(double number, std::string_view not_finite);

    // A JSON string with its quotes.
    TextSink& AddJsonString(std::string_view text);

    // The two digits of each byte.
    TextSink& AddHex(std::string_view bytes);

    // Writes the rest and flushes the stream; true if the stream has taken everything.
    bool Finish() {
        WritePiece();
        return moStream.flush().good();
    }

private:
    static constexpr std::size_t kPieceBytes = std::size_t{64} * 1024;

    void WritePiece();
    void AddJsonEscape(unsigned char byte);

    std::ostream& moStream;
    std::string moBuffer;
};

#endif
