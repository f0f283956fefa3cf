/// @file
/// A stream buffer over a recorded file, so that what `std::istream` and `std::ostream` do is in the ledger.
///
/// examples/adapters/recorded_file.cpp writes and reads a file through it.
#ifndef ZANBASE_ADAPTERS_RECORDED_STREAM_H
#define ZANBASE_ADAPTERS_RECORDED_STREAM_H

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <ios>
#include <limits>
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
/// Positions are bytes of the file; there is one position for reading and writing, which nothing else may move in the
/// file below. Bytes that were read ahead are used again when the position moves among them, so they may be older than
/// the file; `tellg` and `tellp` write nothing.
///
/// **Failures.** If the file can't be read or written, the stream's `badbit` is set and `GetError` has the reason, until
/// `ClearError`. Where exceptions are disabled, a failed read shows as the end of the file, and `GetError` has the
/// reason. Bytes that could not be written stay in the buffer: after `clear` of the stream the next write or flush tries
/// them again, and they are lost only if `Close` fails. The destructor writes what is left and ignores errors: call
/// `Close` where data must be safe.
///
/// **Refusals.** Where the file has no position (a pipe), `tellg`, `seekg` and a step back beyond the last 16 bytes are
/// refused, as a move before the start of any file. `GetRefusal` has the reason of the last one. Nothing is lost, and
/// `Close` does not fail for it.
///
/// Not thread-safe: one thread at a time uses an object.
class HRecordedStreambuf : public std::streambuf {
public:
    /// Takes over `file`; if that is not open, nothing can be read or written.
    explicit HRecordedStreambuf(HRecordedDescriptor file)
        : moFile(std::move(file)), maBuffer(new char[kKeptBytes + kBufferBytes]) {}
    /// Writes what is left and closes the file.
    ~HRecordedStreambuf() override { static_cast<void>(Close()); }
    HRecordedStreambuf(const HRecordedStreambuf&) = delete;
    HRecordedStreambuf& operator=(const HRecordedStreambuf&) = delete;

    /// True if a file is open.
    [[nodiscard]] bool IsOpen() const noexcept { return moFile.IsOpen(); }

    /// The first failure to read, write or close since the buffer was made, or since `ClearError`.
    [[nodiscard]] const std::error_code& GetError() const noexcept { return moError; }

    /// Why the last operation that was refused was; none if none was.
    [[nodiscard]] const std::error_code& GetRefusal() const noexcept { return moRefusal; }

    /// Forgets the failure and the refusal.
    void ClearError() noexcept {
        moError.clear();
        moRefusal.clear();
    }

    /// Writes what is left and closes the file; false if that or any call before it failed, see `GetError`.
    [[nodiscard]] bool Close() {
        WriteBuffer();
        setp(nullptr, nullptr);
        setg(nullptr, nullptr, nullptr);
        std::error_code error;
        moFile.Close(error);
        Keep(error);
        return !moError;
    }

protected:
    /// @cond
    int_type underflow() override {
        if (gptr() != egptr()) return traits_type::to_int_type(*gptr());  // after a step back
        if (!BeginReading()) return traits_type::eof();
        KeepLast(gptr(), mbIsAltered ? 0 : gptr() - eback());
        char* const start = gptr();
        const std::size_t size =
            ReadFile(start, std::exchange(mnFillBytes, std::min(2 * mnFillBytes, kBufferBytes)));
        setg(maBuffer.get(), start, start + size);
        return size != 0 ? traits_type::to_int_type(*start) : traits_type::eof();
    }

    // What is larger than the buffer would read is read past the buffer.
    std::streamsize xsgetn(char* to, std::streamsize count) override {
        std::streamsize done = 0;
        while (done < count) {
            if (gptr() == egptr() && count - done >= static_cast<std::streamsize>(mnFillBytes)) {
                const auto size =
                    static_cast<std::streamsize>(ReadPast(to + done, static_cast<std::size_t>(count - done)));
                if (size == 0) break;
                done += size;
            } else {
                if (traits_type::eq_int_type(underflow(), traits_type::eof())) break;
                const std::streamsize size = std::min<std::streamsize>(egptr() - gptr(), count - done);
                std::memcpy(to + done, gptr(), static_cast<std::size_t>(size));
                gbump(static_cast<int>(size));
                done += size;
            }
        }
        return done;
    }

    int_type overflow(int_type byte) override {
        if (!BeginWriting() || (pptr() == epptr() && !WriteBuffer())) return traits_type::eof();
        if (!traits_type::eq_int_type(byte, traits_type::eof())) sputc(traits_type::to_char_type(byte));
        return traits_type::not_eof(byte);
    }

    std::streamsize xsputn(const char* from, std::streamsize count) override {
        if (count <= 0 || !BeginWriting()) return 0;
        if (count > epptr() - pptr())
            return static_cast<std::streamsize>(WriteOut(from, static_cast<std::size_t>(count)));
        std::memcpy(pptr(), from, static_cast<std::size_t>(count));
        pbump(static_cast<int>(count));
        return count;
    }

    // At the start of the area, reads again from one byte before.
    int_type pbackfail(int_type byte) override {
        if (gptr() != eback()) {
            gbump(-1);
        } else if (seekoff(-1, std::ios_base::cur, std::ios_base::in) == pos_type(off_type(-1)) ||
                   traits_type::eq_int_type(underflow(), traits_type::eof())) {
            return traits_type::eof();
        }
        if (!traits_type::eq_int_type(byte, traits_type::eof()) &&
            *gptr() != traits_type::to_char_type(byte)) {
            *gptr() = traits_type::to_char_type(byte);
            mbIsAltered = true;
        }
        return traits_type::not_eof(byte);
    }

    int sync() override { return WriteBuffer() ? 0 : -1; }

    pos_type seekoff(off_type offset, std::ios_base::seekdir direction, std::ios_base::openmode) override {
        if (direction == std::ios_base::beg) return pos_type(SeekTo(offset));
        if (direction == std::ios_base::end) return pos_type(MoveFile(offset, SEEK_END));
        const std::streamsize unread = egptr() - gptr();
        if (offset == 0) return pos_type(Tell());
        if (IsInArea(offset)) {
            const long long here = Tell();
            if (here >= 0) gbump(static_cast<int>(offset));
            return pos_type(here < 0 ? -1 : here + offset);
        }
        if (offset < std::numeric_limits<off_type>::min() + unread)
            return pos_type(Refuse(std::errc::invalid_argument));
        return pos_type(MoveFile(offset - unread, SEEK_CUR));
    }

    pos_type seekpos(pos_type position, std::ios_base::openmode) override {
        return pos_type(SeekTo(off_type(position)));
    }
    /// @endcond

private:
    static constexpr std::size_t kBufferBytes = std::size_t{64} * 1024;
    static constexpr std::size_t kFirstBytes = 8192;  // read after a move, when little may be wanted there
    static constexpr std::size_t kKeptBytes = 16;     // before the read area, for steps back
    static constexpr long long kUnknown = -1;

    // At most one of the two areas is there: with a write area, nothing is read ahead.

    // The position in the stream; -1 if the file has none.
    long long Tell() {
        if (mnPosition == kUnknown) mnPosition = SeekFile(0, SEEK_CUR);
        return mnPosition == kUnknown ? -1 : mnPosition - (egptr() - gptr()) + (pptr() - pbase());
    }

    // True if the read area has the byte that is `offset` from here, or ends there.
    bool IsInArea(off_type offset) const {
        return gptr() != nullptr && !mbIsAltered && offset >= eback() - gptr() && offset <= egptr() - gptr();
    }

    long long SeekTo(off_type target) {
        const bool is_known = mnPosition != kUnknown && target >= 0 && gptr() != nullptr;
        const off_type offset = is_known ? target - (mnPosition - (egptr() - gptr())) : 0;
        if (!is_known || !IsInArea(offset)) return MoveFile(target, SEEK_SET);
        gbump(static_cast<int>(offset));
        return target;
    }

    // Writes the buffer and moves the file below; -1 if that fails. What was read ahead is kept then.
    long long MoveFile(off_type offset, int origin) {
        if (!WriteBuffer()) return -1;
        const long long position = SeekFile(offset, origin);
        if (position < 0) return -1;
        setg(nullptr, nullptr, nullptr);
        setp(nullptr, nullptr);
        mbIsAltered = false;
        mnFillBytes = kFirstBytes;
        return mnPosition = position;
    }

    long long SeekFile(off_type offset, int origin) {
        std::error_code error;
        const long long position = moFile.Seek(offset, origin, error);
        if (error) moRefusal = error;
        return error ? -1 : position;
    }

    long long Refuse(std::errc reason) {
        moRefusal = std::make_error_code(reason);
        return -1;
    }

    // Writes the buffer and gives up the write area.
    bool BeginReading() {
        if (!WriteBuffer()) return FailRead();
        setp(nullptr, nullptr);
        return true;
    }

    // Gives up the read area, with the file at the position that the reader has reached. Keeps it if the file has no
    // position.
    bool BeginWriting() {
        if (pbase() != nullptr) return true;
        if (!moFile.IsOpen()) return Keep(std::make_error_code(std::errc::bad_file_descriptor));
        if (const long long unread = egptr() - gptr(); unread != 0) {
            const long long position = SeekFile(-unread, SEEK_CUR);
            if (position < 0) return false;
            mnPosition = position;
        }
        setg(nullptr, nullptr, nullptr);
        mbIsAltered = false;
        ResetWriteArea(0);
        return true;
    }

    // Makes a read area of the last of the `size` bytes before `end`, with nothing to read in it.
    void KeepLast(const char* end, std::streamsize size) {
        const std::size_t kept = std::min(static_cast<std::size_t>(size), kKeptBytes);
        if (kept != 0) std::memmove(maBuffer.get(), end - kept, kept);
        setg(maBuffer.get(), maBuffer.get() + kept, maBuffer.get() + kept);
        mbIsAltered = false;
    }

    std::size_t ReadFile(char* to, std::size_t size) {
        std::error_code error;
        const std::size_t moved = moFile.Read(to, size, error);
        if (mnPosition != kUnknown) mnPosition += static_cast<long long>(moved);
        if (!Keep(error)) FailRead();
        return moved;
    }

    // Reads to the caller's block. Requires: nothing is left in the read area.
    std::size_t ReadPast(char* to, std::size_t size) {
        if (!BeginReading()) return 0;
        const std::size_t moved = ReadFile(to, size);
        if (moved != 0) KeepLast(to + moved, static_cast<std::streamsize>(moved));
        return moved;
    }

    // A stream sets its badbit for an exception, and takes anything else for the end of the file.
    bool FailRead() const {
#ifdef __cpp_exceptions
        throw std::ios_base::failure("HRecordedStreambuf", moError);
#else
        return false;
#endif
    }

    bool WriteBuffer() {
        if (pptr() != pbase()) WriteOut(nullptr, 0);
        return pptr() == pbase();
    }

    // Writes the buffer, and after it `from`. Gives how many bytes of `from` were written; what is left of the buffer
    // after a failure stays.
    std::size_t WriteOut(const char* from, std::size_t size) {
        const auto pending = static_cast<std::size_t>(pptr() - pbase());
        std::error_code error;
        const std::size_t written = moFile.Write(pbase(), pending, from, size, error);
        Keep(error);
        mnPosition = kUnknown;  // another place than before, in a file opened to append
        const std::size_t left = written < pending ? pending - written : 0;
        std::memmove(maBuffer.get(), maBuffer.get() + (pending - left), left);
        ResetWriteArea(left);
        return written - (pending - left);
    }

    // Starts the write area with `pending` bytes in it.
    void ResetWriteArea(std::size_t pending) {
        setp(maBuffer.get(), maBuffer.get() + kBufferBytes);
        pbump(static_cast<int>(pending));
    }

    // True if `error` is none; otherwise it is kept if it is the first.
    bool Keep(const std::error_code& error) {
        if (error && !moError) moError = error;
        return !error;
    }

    HRecordedDescriptor moFile;
    std::unique_ptr<char[]> maBuffer;
    long long mnPosition = kUnknown;         // of the file below
    std::size_t mnFillBytes = kBufferBytes;  // what the next read into the buffer asks for
    bool mbIsAltered = false;                // a byte was put back that is not the file's
    std::error_code moError;
    std::error_code moRefusal;
};

/// @}

#endif
