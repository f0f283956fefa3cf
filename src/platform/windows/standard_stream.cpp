// Redirection on the calling thread. The stream's lock and a full pipe are tried until their time is over, because the
// runtime's own calls would wait for them without limit.
#include "platform/windows/standard_stream.h"

#include <cerrno>

#include <io.h>

#include "platform/clock.h"
#include "platform/stream.h"
#include "platform/windows/runtime_stream.h"

namespace {

constexpr unsigned int kLockLimitMs = 100;
constexpr unsigned int kOutputLimitMs = 1000;
constexpr unsigned int kPauseMs = 5;

// msvcrt has no way to try a lock in its table, but it marks the streams that are locked. A thread that locks one between
// the look and the call is waited for.
bool TryOwn(std::FILE* stream) noexcept {
    if (IsInTransfer(_fileno(stream))) return false;
    if (HasOwnLock(stream)) return TryLockStream(stream);
    if (IsMarkedLocked(stream)) return false;
    LockStream(stream);
    return true;
}

bool OwnWithinLimit(std::FILE* stream) noexcept {
    const unsigned int start = ReadTicks();
    while (!TryOwn(stream)) {
        if (ReadTicks() - start >= kLockLimitMs) return false;
        SleepFor(kPauseMs);
    }
    return true;
}

// A pipe that accepts what it has room for and returns at once, for a scope. So do all other handles of this end.
class NoWait {
public:
    explicit NoWait(HANDLE pipe) noexcept : mpoPipe(pipe) {
        GetNamedPipeHandleStateA(pipe, &mnMode, nullptr, nullptr, nullptr, nullptr, 0);
        DWORD no_wait = mnMode | PIPE_NOWAIT;
        mbIsSet = SetNamedPipeHandleState(pipe, &no_wait, nullptr, nullptr) != 0;
    }
    ~NoWait() {
        if (mbIsSet) SetNamedPipeHandleState(mpoPipe, &mnMode, nullptr, nullptr);
    }
    NoWait(const NoWait&) = delete;
    NoWait& operator=(const NoWait&) = delete;

    bool IsSet() const noexcept { return mbIsSet; }

private:
    HANDLE mpoPipe;
    DWORD mnMode = PIPE_WAIT;  // stays if the handle doesn't show its mode
    bool mbIsSet = false;
};

#ifdef _UCRT

// The runtime drops what the pipe does not accept at once.
void WriteIntoPipe(std::FILE* stream, unsigned int) noexcept { std::fflush(stream); }

#else

void WriteIntoPipe(std::FILE* stream, unsigned int limit_ms) noexcept {
    constexpr int kReads = 1;
    constexpr int kWrites = 2;
    std::FILE& fields = In(stream)->fields;
    if ((fields._flag & (kReads | kWrites)) != kWrites || fields._base == nullptr) return;
    const unsigned int start = ReadTicks();
    for (const char* from = fields._base; from < fields._ptr && ReadTicks() - start < limit_ms;) {
        const int written = _write(fields._file, from, static_cast<unsigned int>(fields._ptr - from));
        if (written > 0) {
            from += written;
        } else if (written < 0 && errno == EPIPE) {
            break;
        } else {
            SleepFor(kPauseMs);
        }
    }
    fields._ptr = fields._base;
    fields._cnt = 0;
}

#endif

// Writes what the stream has pending, or drops it.
void WritePending(std::FILE* stream) noexcept {
    const auto file = reinterpret_cast<HANDLE>(_get_osfhandle(_fileno(stream)));
    if (GetFileType(file) != FILE_TYPE_PIPE) {
        std::fflush(stream);
        return;
    }
    const NoWait no_wait(file);
    WriteIntoPipe(stream, no_wait.IsSet() ? kOutputLimitMs : 0);
}

// The null device first, for a stream of a program without a console, which has no descriptor.
bool Move(std::FILE* stream, int target) noexcept {
    if (_fileno(stream) < 0) {
        if (std::freopen("NUL", "r+", stream) == nullptr) return false;
    } else {
        WritePending(stream);
    }
    if (_dup2(target, _fileno(stream)) != 0) return false;
    std::setvbuf(stream, nullptr, _IONBF, 0);
    std::clearerr(stream);
    return true;
}

}  // namespace

bool IsClosed(std::FILE* stream) noexcept {
#ifdef _UCRT
    const int descriptor = _fileno(stream);
    return descriptor == -1 || (descriptor >= 0 && _get_osfhandle(descriptor) == -1);
#else
    return In(stream)->fields._flag == 0;
#endif
}

bool RedirectStream(std::FILE* stream, int target) noexcept {
    if (!OwnWithinLimit(stream)) return false;
    const bool is_moved = Move(stream, target);
    UnlockStream(stream);
    return is_moved;
}
