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
/// time. A failed call is not recorded. So the count of reads includes the last one, which moves 0 bytes.
///
/// Errors: an operation sets its `error` on failure and clears it on success. A failed `Open` gives an object
/// that is not open; operations on it fail with `bad_file_descriptor`.
///
/// Short and interrupted calls: `Read` may give less than was asked for, as the function below does, and 0 at
/// the end of the file. `Write` writes all or fails; if the function below writes less, it is called again,
/// and each call is recorded. A call that a signal interrupts before it did anything is made again.
///
/// Between a read and a write of a `HRecordedFile`, in either order, a seek is required, as for every stream of C.
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
#include <system_error>
#include <utility>

#include "zanbase/adapters/file_calls.h"
#include "zanbase/disk_io.h"

/// @addtogroup adapters
/// @{

/// Owns an open file, or nothing. Objects can be moved. Thread-safe for different objects.
template <class Calls>
class HRecorded {
public:
    using Mode = typename Calls::Mode;  ///< how a file is opened

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

    /// Opens `name` and records that.
    [[nodiscard]] static HRecorded Open(const std::string& name, Mode mode, std::error_code& error) {
        HRecorded file;
        auto state = std::make_unique<State>();
        const Clock::time_point start = Clock::now();
        do {
            state->moNative = Calls::Open(name.c_str(), mode);
        } while (state->moNative == Calls::kClosed && errno == EINTR);
        const double seconds = SecondsSince(start);
        if (state->moNative == Calls::kClosed) {
            error.assign(errno, std::generic_category());
            return file;
        }
        error.clear();
        HDiskIOOpen(name, state.get(), seconds);
        file.moState = std::move(state);
        return file;
    }

    /// True if the object owns an open file.
    [[nodiscard]] bool IsOpen() const noexcept { return moState != nullptr; }

    /// The file below, for calls that are not to be recorded; `Calls::kClosed` if it is not open.
    [[nodiscard]] typename Calls::Native GetNative() const noexcept {
        return IsOpen() ? moState->moNative : Calls::kClosed;
    }

    /// Reads at most `size` bytes into `block` and gives their count; 0 at the end of the file or on failure.
    std::size_t Read(void* block, std::size_t size, std::error_code& error) {
        const auto read = [&] { return Calls::Read(moState->moNative, block, size); };
        const auto record = [this](long long moved, double seconds) {
            HDiskIORead(moState.get(), static_cast<unsigned long long>(moved), seconds);
        };
        const long long moved = Measured(read, record, error);
        return moved > 0 ? static_cast<std::size_t>(moved) : 0;
    }

    /// Writes `size` bytes of `block` and gives the count of those that were written before a failure.
    std::size_t Write(const void* block, std::size_t size, std::error_code& error) {
        const char* const bytes = static_cast<const char*>(block);
        std::size_t done = 0;
        const auto write = [&] { return Calls::Write(moState->moNative, bytes + done, size - done); };
        const auto record = [this](long long moved, double seconds) {
            HDiskIOWrite(moState.get(), static_cast<unsigned long long>(moved), seconds);
        };
        do {
            const long long moved = Measured(write, record, error);
            if (moved < 0) break;
            if (moved == 0 && done < size) {
                error = std::make_error_code(std::errc::io_error);  // a full device that reports nothing
                break;
            }
            done += static_cast<std::size_t>(moved);
        } while (done < size);
        return done;
    }

    /// Moves the position to `offset` from `origin` (`SEEK_SET`, `SEEK_CUR`, `SEEK_END`) and gives it; -1 on
    /// failure.
    long long Seek(long long offset, int origin, std::error_code& error) {
        const auto seek = [&] { return Calls::Seek(moState->moNative, offset, origin); };
        const auto record = [this](long long, double seconds) { HDiskIOSeek(moState.get(), seconds); };
        return Measured(seek, record, error);
    }

    /// Closes the file and records that. After a failure the file is closed too, and not all data may have
    /// been written.
    void Close(std::error_code& error) {
        const std::unique_ptr<State> closing = std::move(moState);
        if (closing == nullptr) {
            error = std::make_error_code(std::errc::bad_file_descriptor);
            return;
        }
        const Clock::time_point start = Clock::now();
        const int result = Calls::Close(std::exchange(closing->moNative, Calls::kClosed));
        const double seconds = SecondsSince(start);
        if (result != 0) {
            error.assign(errno, std::generic_category());
            return;
        }
        error.clear();
        HDiskIOClose(closing.get(), seconds);
    }

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

        typename Calls::Native moNative = Calls::kClosed;
    };

    static double SecondsSince(Clock::time_point start) {
        return std::chrono::duration<double>(Clock::now() - start).count();
    }

    // Makes `call` until no signal interrupts it, and hands a result that is not -1 to `record`.
    template <class Call, class Record>
    long long Measured(Call call, Record record, std::error_code& error) {
        if (!IsOpen()) {
            error = std::make_error_code(std::errc::bad_file_descriptor);
            return -1;
        }
        const Clock::time_point start = Clock::now();
        long long result = call();
        while (result < 0 && errno == EINTR) result = call();
        const double seconds = SecondsSince(start);
        if (result < 0) {
            error.assign(errno, std::generic_category());
        } else {
            error.clear();
            record(result, seconds);
        }
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
