/// @file
/// A stream buffer over a recorded file, so that what `std::istream` and `std::ostream` do is in the ledger.
///
/// examples/adapters/recorded_file.cpp writes and reads a file through it.
#ifndef ZANBASE_ADAPTERS_RECORDED_STREAM_H
#define ZANBASE_ADAPTERS_RECORDED_STREAM_H

#include <cstddef>
#include <ios>
#include <memory>
#include <streambuf>
#include <system_error>
#include <utility>

#include "zanbase/adapters/recorded_file.h"

/// @addtogroup adapters
/// @{

/// Reads and writes an `HRecordedDescriptor` through a buffer of its own; the ledger counts the calls below.
///
///     std::error_code error;
///     HRecordedStreambuf buffer(HRecordedDescriptor::Open("notes.txt", {}, error));
///     std::istream in(&buffer);
///     for (std::string line; std::getline(in, line);) Use(line);
///     if (buffer.GetError()) std::fprintf(stderr, "%s\n", buffer.GetError().message().c_str());
///
/// Positions are bytes of the file; there is one position for reading and writing. Where the file has none (a
/// pipe), `tellg`, `seekg` and `sync` fail and lose nothing that was read. A failure below shows as the end of
/// the file or as the stream's `badbit`, and its reason in `GetError`. The bytes of a failed write are lost. The
/// destructor writes what is left and ignores errors: call `Close` where data must be safe.
///
/// Not thread-safe: one thread at a time uses an object.
class HRecordedStreambuf : public std::streambuf {
public:
    /// Takes over `file`; if that is not open, nothing can be read or written.
    explicit HRecordedStreambuf(HRecordedDescriptor file)
        : moFile(std::move(file)), maBuffer(new char[kBufferBytes]) {}
    /// Writes what is left and closes the file.
    ~HRecordedStreambuf() override {
        try {
            Close();
        } catch (...) {
        }
    }
    HRecordedStreambuf(const HRecordedStreambuf&) = delete;
    HRecordedStreambuf& operator=(const HRecordedStreambuf&) = delete;

    /// True if a file is open.
    [[nodiscard]] bool IsOpen() const noexcept { return moFile.IsOpen(); }

    /// The first failure since the buffer was made.
    [[nodiscard]] const std::error_code& GetError() const noexcept { return moError; }

    /// Writes what is left and closes the file; false if that or any call before it failed, see `GetError`.
    bool Close() {
        WriteBuffer();
        setg(nullptr, nullptr, nullptr);
        std::error_code error;
        moFile.Close(error);
        Keep(error);
        return !moError;
    }

protected:
    /// @cond
    int_type underflow() override {
        if (!WriteBuffer()) return traits_type::eof();
        std::error_code error;
        const std::size_t size = moFile.Read(maBuffer.get(), kBufferBytes, error);
        setg(maBuffer.get(), maBuffer.get(), maBuffer.get() + size);
        return Keep(error) && size != 0 ? traits_type::to_int_type(*gptr()) : traits_type::eof();
    }

    int_type overflow(int_type byte) override {
        if (!DropReadAhead() || !WriteBuffer()) return traits_type::eof();
        setp(maBuffer.get(), maBuffer.get() + kBufferBytes);
        if (!traits_type::eq_int_type(byte, traits_type::eof())) sputc(traits_type::to_char_type(byte));
        return traits_type::not_eof(byte);
    }

    // At the start of the area, reads again from one byte before.
    int_type pbackfail(int_type byte) override {
        if (gptr() != eback()) {
            gbump(-1);
        } else if (seekoff(-1, std::ios_base::cur, std::ios_base::in) == pos_type(off_type(-1)) ||
                   traits_type::eq_int_type(underflow(), traits_type::eof())) {
            return traits_type::eof();
        }
        if (!traits_type::eq_int_type(byte, traits_type::eof())) *gptr() = traits_type::to_char_type(byte);
        return traits_type::not_eof(byte);
    }

    int sync() override { return DropReadAhead() && WriteBuffer() ? 0 : -1; }

    // A question for the position keeps what was read ahead.
    pos_type seekoff(off_type offset, std::ios_base::seekdir direction, std::ios_base::openmode) override {
        const bool is_tell = offset == 0 && direction == std::ios_base::cur;
        if (is_tell ? !WriteBuffer() : sync() != 0) return pos_type(off_type(-1));
        const int origin = direction == std::ios_base::beg   ? SEEK_SET
                           : direction == std::ios_base::cur ? SEEK_CUR
                                                             : SEEK_END;
        std::error_code error;
        const long long position = moFile.Seek(offset, origin, error);
        return pos_type(Keep(error) ? position - (egptr() - gptr()) : -1);
    }

    pos_type seekpos(pos_type position, std::ios_base::openmode which) override {
        return seekoff(off_type(position), std::ios_base::beg, which);
    }
    /// @endcond

private:
    static constexpr std::size_t kBufferBytes = std::size_t{64} * 1024;

    // At most one of the two areas is in use: with bytes to write, nothing is read ahead.

    bool WriteBuffer() {
        const auto size = static_cast<std::size_t>(pptr() - pbase());
        setp(nullptr, nullptr);
        if (size == 0) return true;
        std::error_code error;
        moFile.Write(maBuffer.get(), size, error);
        return Keep(error);
    }

    // Sets the file back to the position that the reader has reached. Keeps the bytes if it has no position.
    bool DropReadAhead() {
        if (const long long unread = egptr() - gptr(); unread != 0) {
            std::error_code error;
            moFile.Seek(-unread, SEEK_CUR, error);
            if (!Keep(error)) return false;
        }
        setg(nullptr, nullptr, nullptr);
        return true;
    }

    // True if `error` is none; otherwise it is kept if it is the first.
    bool Keep(const std::error_code& error) {
        if (error && !moError) moError = error;
        return !error;
    }

    HRecordedDescriptor moFile;
    std::unique_ptr<char[]> maBuffer;
    std::error_code moError;
};

/// @}

#endif
