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
    constexpr int kIsLocked = 0x8000;
    if (IsInTransfer(_fileno(stream))) return false;
    if (HasOwnLock(stream)) return TryLockStream(stream);
    if ((In(stream)->fields._flag & kIsLocked) != 0) return false;
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

void WriteIntoPipe(int descriptor, const char* from, const char* end) noexcept {
    const unsigned int start = ReadTicks();
    while (from < end && ReadTicks() - start < kOutputLimitMs) {
        const int written = _write(descriptor, from, static_cast<unsigned int>(end - from));
        if (written > 0) {
            from += written;
        } else if (written < 0 && errno == EPIPE) {
            return;
        } else {
            SleepFor(kPauseMs);
        }
    }
}

// Writes what the stream has pending, or drops it.
void WritePending(std::FILE* stream) noexcept {
    constexpr int kReads = 1;
    constexpr int kWrites = 2;
    StreamFields& fields = In(stream)->fields;
    const int descriptor = _fileno(stream);
    const auto file = reinterpret_cast<HANDLE>(_get_osfhandle(descriptor));
    if (GetFileType(file) != FILE_TYPE_PIPE) {
        std::fflush(stream);
    } else if ((fields._flag & (kReads | kWrites)) == kWrites && fields._base != nullptr) {
        const NoWait no_wait(file);
        if (no_wait.IsSet()) WriteIntoPipe(descriptor, fields._base, fields._ptr);
        fields._ptr = fields._base;
        fields._cnt = 0;
    }
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

bool IsClosed(std::FILE* stream) noexcept { return In(stream)->fields._flag == 0; }

bool RedirectStream(std::FILE* stream, int target) noexcept {
    if (!OwnWithinLimit(stream)) return false;
    const bool is_moved = Move(stream, target);
    UnlockStream(stream);
    return is_moved;
}
