/// @file
/// Files whose every operation is measured and recorded in the disk ledger: over a `std::FILE*` and over a
/// descriptor.
///
///     std::error_code error;
///     HRecordedFile file = HRecordedFile::Open("run.dat", "rb", error);
///     char block[4096];
///     while (const std::size_t size = file.Read(block, sizeof block, error)) Use(block, size);
///     if (error) std::fprintf(stderr, "run.dat: %s\n", error.message().c_str());
///     HDiskIOReportFile(stdout, "run.dat");
///
/// What is recorded: each call that reached the system's or the C library's function and succeeded, with its
/// time. A failed call is not recorded. So the count of reads includes the last one, which moves 0 bytes. A flush
/// of an `HRecordedFile` is recorded as a write of 0 bytes.
///
/// Errors: an operation sets its `error` on failure and clears it on success. A failed `Open` gives an object
/// that is not open; operations on it fail with `bad_file_descriptor`. A function below that fails without a reason
/// in `errno` gives `io_error`. The forms without an `error` throw `std::system_error`; they are declared where
/// exceptions are enabled.
///
/// Short and interrupted calls: `Read` may give less than was asked for, as the function below does, and 0 at
/// the end of the file. `Write` writes all or fails; if the function below writes less, it is called again,
/// and each call is recorded. A call that a signal interrupts before it did anything is made again, a million times
/// at most; then it fails with `interrupted`.
///
/// **What is certain.** A successful `HRecordedDescriptor::Write` has passed all its bytes to the system, and a failed one
/// returns how many it has passed: the caller can write the rest later. A successful `HRecordedFile::Write` may have left
/// them in the C library's buffer; they are certain after a successful `Flush` or `Close`. If the C library fails to write
/// its buffer, because the disk is full or a signal interrupts it, it drops what the buffer held, also from earlier
/// calls. So the operation returns only bytes that are certain, and the error stays with the file: `Read`, `Write` and
/// `Flush` fail with it at once, and `Close` reports it, until `ClearError` has been called. `Seek` works, and shows how
/// far the file was written.
///
/// Between a read and a write of an `HRecordedFile`, in either order, a seek is required, as for every stream of C.
///
/// An object may be used by one thread at a time, different objects by different threads. Its handle in the
/// ledger is a block of its own that is released after the close was recorded, so no other file can have
/// the same handle in between. If the ledger has no memory for an open, the file is closed and `std::bad_alloc`
/// reaches the caller.
///
/// examples/adapters/recorded_file.cpp shows them. For `std::istream` and `std::ostream` see
/// zanbase/adapters/recorded_stream.h.
#ifndef ZANBASE_ADAPTERS_RECORDED_FILE_H
#define ZANBASE_ADAPTERS_RECORDED_FILE_H

#include <cerrno>
#include <chrono>
#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <system_error>
#include <type_traits>
#include <utility>
#if __cplusplus >= 202002L
#include <span>
#endif

#include "zanbase/adapters/file_calls.h"
#include "zanbase/disk_io.h"

/// @addtogroup adapters
/// @{

/// @cond
// Whether the files of a layer keep an error of their own, and whether it can write two blocks by one call.
template <class Calls, class = void>
inline constexpr bool kHKeepsError = false;
template <class Calls>
inline constexpr bool kHKeepsError<Calls, std::void_t<decltype(&Calls::HasError)>> = true;
template <class Calls, class = void>
inline constexpr bool kHWritesTwo = false;
template <class Calls>
inline constexpr bool kHWritesTwo<Calls, std::void_t<decltype(&Calls::WriteTwo)>> = true;
/// @endcond

/// Owns an open file, or nothing. Objects can be moved. Thread-safe for different objects.
template <class Calls>
class HRecorded {
public:
    using Native = typename Calls::Native;  ///< the open file of the layer below
    using Mode = typename Calls::Mode;      ///< how a file is opened

    /// An object that is not open.
    HRecorded() = default;
    /// Takes what the other object owns.
    HRecorded(HRecorded&&) noexcept = default;
    /// Takes what `other` owns and closes the file that this object owned.
    HRecorded& operator=(HRecorded&& other) noexcept {
        HRecorded taken(std::move(other));
        std::swap(moState, taken.moState);
        return *this;
    }
    /// Closes the file if it is open. An error is not reported: call `Close` where data must be safe.
    ~HRecorded() {
        std::error_code ignored;
        if (IsOpen()) Close(ignored);
    }

    /// Opens `name` and records that. A null pointer and a name with a null character inside fail with
    /// `invalid_argument`.
    [[nodiscard]] static HRecorded Open(const std::string& name, Mode mode, std::error_code& error) {
        HRecorded file;
        if (name.find('\0') != std::string::npos) {
            error = std::make_error_code(std::errc::invalid_argument);
            return file;
        }
        auto state = std::make_unique<State>();
        const Clock::time_point start = Clock::now();
        const int reason = Repeat([&] {
            state->moNative = Calls::Open(name.c_str(), mode);
            return state->moNative != Calls::kClosed;
        });
        const double seconds = SecondsSince(start);
        error = state->moNative == Calls::kClosed ? CodeOf(reason) : std::error_code();
        if (error) return file;
        HDiskIOOpenFile(name.data(), name.size(), state.get(), seconds);
        file.moState = std::move(state);
        return file;
    }
    /// @copydoc Open
    [[nodiscard]] static HRecorded Open(std::string_view name, Mode mode, std::error_code& error) {
        return Open(std::string(name), mode, error);
    }
    /// @copydoc Open
    [[nodiscard]] static HRecorded Open(const char* name, Mode mode, std::error_code& error) {
        if (name != nullptr) return Open(std::string(name), mode, error);
        error = std::make_error_code(std::errc::invalid_argument);
        return {};
    }

    /// Takes over a file that is open already and records, under `name`, an open that took no time. An object that is not
    /// open results from `Calls::kClosed`. If the ledger has no memory, the file stays the caller's.
    [[nodiscard]] static HRecorded Adopt(Native native, std::string_view name) {
        HRecorded file;
        if (native == Calls::kClosed) return file;
        auto state = std::make_unique<State>();
        HDiskIOOpenFile(name.data(), name.size(), state.get(), 0);
        state->moNative = native;
        file.moState = std::move(state);
        return file;
    }

    /// Hands the open file to the caller and owns nothing afterwards; `Calls::kClosed` if none was open. Nothing is
    /// recorded or flushed.
    [[nodiscard]] Native Release() noexcept {
        if (!IsOpen()) return Calls::kClosed;
        const Native native = std::exchange(moState->moNative, Calls::kClosed);
        moState.reset();
        return native;
    }

    /// True if the object owns an open file.
    [[nodiscard]] bool IsOpen() const noexcept { return moState != nullptr; }

    /// The file below, for calls that are not to be recorded; `Calls::kClosed` if it is not open.
    [[nodiscard]] Native GetNative() const noexcept { return IsOpen() ? moState->moNative : Calls::kClosed; }

    /// Reads at most `size` bytes into `block` and gives their count; 0 at the end of the file or on failure.
    std::size_t Read(void* block, std::size_t size, std::error_code& error) {
        if (IsRefused(error)) return 0;
        const auto read = [&] { return Calls::Read(moState->moNative, block, size); };
        const auto record = [this](long long moved, double seconds) {
            HDiskIORead(moState.get(), static_cast<unsigned long long>(moved), seconds);
        };
        const long long moved = Measured(read, record, error);
        return moved > 0 ? static_cast<std::size_t>(moved) : 0;
    }

    /// Writes `size` bytes of `block` and gives the count of those that are certain to be written, `size` or less: then
    /// `error` is set.
    std::size_t Write(const void* block, std::size_t size, std::error_code& error) {
        return Write(block, size, nullptr, 0, error);
    }

    /// Writes the bytes of `text`, in the same way.
    std::size_t Write(std::string_view text, std::error_code& error) {
        return Write(text.data(), text.size(), error);
    }

    /// Writes two blocks one after the other, in the same way; by one call, where the system has that.
    std::size_t Write(const void* first, std::size_t first_size, const void* second, std::size_t second_size,
                      std::error_code& error) {
        if (IsRefused(error)) return 0;
        std::size_t done = 0;
        const auto write = [&] { return WriteFrom(done, first, first_size, second, second_size); };
        const auto record = [this](long long moved, double seconds) {
            HDiskIOWrite(moState.get(), static_cast<unsigned long long>(moved), seconds);
        };
        do {
            const long long moved = Measured(write, record, error);
            if (moved < 0) break;
            done += static_cast<std::size_t>(moved);
            if (HasError()) {
                error = moState->moKept;
            } else if (moved == 0 && done < first_size + second_size) {
                error = std::make_error_code(std::errc::io_error);  // a full device that reports nothing
            }
        } while (!error && done < first_size + second_size);
        return done;
    }

    /// Moves the position to `offset` from `origin` (`SEEK_SET`, `SEEK_CUR`, `SEEK_END`) and gives it; -1 on
    /// failure.
    long long Seek(long long offset, int origin, std::error_code& error) {
        if (IsClosed(error)) return -1;
        const auto seek = [&] { return Calls::Seek(moState->moNative, offset, origin); };
        const auto record = [this](long long, double seconds) { HDiskIOSeek(moState.get(), seconds); };
        return Measured(seek, record, error);
    }

    /// Passes what the layer below has in a buffer to the system. Where it has no buffer there is nothing to do.
    void Flush(std::error_code& error) {
        if (IsRefused(error)) return;
        if constexpr (kHKeepsError<Calls>) {
            const auto flush = [&] { return Calls::Flush(moState->moNative) == 0 ? 0LL : -1LL; };
            const auto record = [this](long long, double seconds) {
                HDiskIOWrite(moState.get(), 0, seconds);
            };
            static_cast<void>(Measured(flush, record, error));
        }
    }

    /// Forgets the error that the file has kept, so that it can be used again. What the failed operation lost is for the
    /// caller to write again: `Seek` shows up to where the file was written. Does nothing for files that keep no error.
    void ClearError() noexcept {
        if constexpr (kHKeepsError<Calls>) {
            if (!IsOpen()) return;
            moState->moKept.clear();
            Calls::ClearError(moState->moNative);
        }
    }

    /// Closes the file and records that. After a failure the file is closed too, and not all data may have
    /// been written. Also fails if the file has kept an error.
    void Close(std::error_code& error) {
        if (IsClosed(error)) return;
        const std::unique_ptr<State> closing = std::move(moState);
        if constexpr (kHKeepsError<Calls>) {
            if (Calls::HasError(closing->moNative)) error = closing->KeptError();
        }
        const Clock::time_point start = Clock::now();
        errno = 0;
        const int result = Calls::Close(std::exchange(closing->moNative, Calls::kClosed));
        const double seconds = SecondsSince(start);
        if (result == 0) {
            HDiskIOClose(closing.get(), seconds);
        } else if (!error) {
            error = CodeOf(errno);
        }
    }

#if __cplusplus >= 202002L
    /// Reads into `block`, whole or less.
    std::size_t Read(std::span<std::byte> block, std::error_code& error) {
        return Read(block.data(), block.size(), error);
    }
    /// Writes the bytes of `block`.
    std::size_t Write(std::span<const std::byte> block, std::error_code& error) {
        return Write(block.data(), block.size(), error);
    }
#endif

#ifdef __cpp_exceptions
    /// Opens as the form with an `error`. Throws `std::system_error`, as all forms without one.
    template <class Name>
    [[nodiscard]] static HRecorded Open(const Name& name, Mode mode) {
        std::error_code error;
        HRecorded file = Open(name, mode, error);
        ThrowIf(error, "open");
        return file;
    }
    /// Reads; 0 only at the end of the file.
    std::size_t Read(void* block, std::size_t size) {
        std::error_code error;
        const std::size_t moved = Read(block, size, error);
        ThrowIf(error, "read");
        return moved;
    }
    /// Writes all.
    void Write(const void* block, std::size_t size) {
        std::error_code error;
        static_cast<void>(Write(block, size, error));
        ThrowIf(error, "write");
    }
    /// Writes all of `text`.
    void Write(std::string_view text) { Write(text.data(), text.size()); }
    /// Moves the position and gives it.
    long long Seek(long long offset, int origin) {
        std::error_code error;
        const long long position = Seek(offset, origin, error);
        ThrowIf(error, "seek");
        return position;
    }
    /// Passes what is in a buffer to the system.
    void Flush() {
        std::error_code error;
        Flush(error);
        ThrowIf(error, "flush");
    }
    /// Closes; the file is closed also if it throws.
    void Close() {
        std::error_code error;
        Close(error);
        ThrowIf(error, "close");
    }
#if __cplusplus >= 202002L
    /// Reads into `block`, whole or less.
    std::size_t Read(std::span<std::byte> block) { return Read(block.data(), block.size()); }
    /// Writes all of `block`.
    void Write(std::span<const std::byte> block) { Write(block.data(), block.size()); }
#endif
#endif

private:
    using Clock = std::chrono::steady_clock;

    // Its address is the handle in the ledger.
    struct State {
        State() = default;
        // Closes what `Close` has not closed: the file of an open that the ledger has no memory for.
        ~State() {
            if (moNative != Calls::kClosed) Calls::Close(moNative);
        }
        State(const State&) = delete;
        State& operator=(const State&) = delete;

        // The program may also have set the error of the file below, by a call of its own.
        const std::error_code& KeptError() {
            if (!moKept) moKept = std::make_error_code(std::errc::io_error);
            return moKept;
        }

        Native moNative = Calls::kClosed;
        std::error_code moKept;  // why the layer's file has its error set
    };

    static double SecondsSince(Clock::time_point start) {
        return std::chrono::duration<double>(Clock::now() - start).count();
    }

    static std::error_code CodeOf(int reason) {
        return reason != 0 ? std::error_code(reason, std::generic_category())
                           : std::make_error_code(std::errc::io_error);
    }

    // Repeats `attempt`, which returns true when it is done, while a signal interrupts it, and returns the reason of a
    // failure. An EINTR that an earlier call left in errno does not count. A layer that reports EINTR for ever is believed
    // for a fraction of a second only, if nothing interrupts it.
    template <class Attempt>
    static int Repeat(Attempt attempt) {
        constexpr int kMost = 1'000'000;
        const int before = errno;
        int repeats = 0;
        do {
            errno = 0;
        } while (!attempt() && errno == EINTR && ++repeats < kMost);
        const int reason = errno;
        if (reason == 0) errno = before;
        return reason;
    }

#ifdef __cpp_exceptions
    static void ThrowIf(const std::error_code& error, const char* what) {
        if (error) throw std::system_error(error, what);
    }
#endif

    bool IsClosed(std::error_code& error) const {
        error = IsOpen() ? std::error_code() : std::make_error_code(std::errc::bad_file_descriptor);
        return !IsOpen();
    }

    bool HasError() const {
        if constexpr (kHKeepsError<Calls>) return Calls::HasError(moState->moNative);
        return false;
    }

    bool IsRefused(std::error_code& error) const {
        if (IsClosed(error)) return true;
        if (HasError()) error = moState->KeptError();
        return static_cast<bool>(error);
    }

    // Writes what follows the first `done` bytes of the two blocks.
    long long WriteFrom(std::size_t done, const void* first, std::size_t first_size, const void* second,
                        std::size_t second_size) const {
        const bool is_second = second_size != 0 && done >= first_size;
        const char* const from = static_cast<const char*>(is_second ? second : first);
        if (is_second)
            return Calls::Write(moState->moNative, from + (done - first_size),
                                first_size + second_size - done);
        if constexpr (kHWritesTwo<Calls>) {
            if (second_size != 0)
                return Calls::WriteTwo(moState->moNative, from + done, first_size - done, second,
                                       second_size);
        }
        return Calls::Write(moState->moNative, from + done, first_size - done);
    }

    // Makes `call` until no signal interrupts it, and hands a result that is not -1 to `record`. If the file below has its
    // error set afterwards, nothing is repeated: bytes may be lost. Requires: a file is open.
    template <class Call, class Record>
    long long Measured(Call call, Record record, std::error_code& error) {
        long long result = 0;
        const Clock::time_point start = Clock::now();
        const int reason = Repeat([&] {
            result = call();
            return result >= 0 || HasError();
        });
        const double seconds = SecondsSince(start);
        if (HasError() && !moState->moKept) moState->moKept = CodeOf(reason);
        error = result < 0 ? CodeOf(reason) : std::error_code();
        if (result >= 0) record(result, seconds);
        return result;
    }

    std::unique_ptr<State> moState;  // null if there is no open file
};

/// Owns a `std::FILE*`. The C library's buffer is below: a recorded read or write may only have moved bytes
/// from or to it.
using HRecordedFile = HRecorded<HStdioCalls>;

/// Owns a descriptor.
using HRecordedDescriptor = HRecorded<HDescriptorCalls>;

/// @}

#endif
