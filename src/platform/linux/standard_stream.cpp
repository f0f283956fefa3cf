// Redirection in three steps: collect the pending output of the stream in memory, move the descriptor, then
// write what was collected to the old file. The C library's own flush could block there without limit.
#include "platform/linux/standard_stream.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <ctime>
#include <cwchar>

#include <fcntl.h>
#include <poll.h>
#include <stdio_ext.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/clock.h"
#include "platform/linux/descriptor.h"

namespace {

constexpr unsigned int kLockLimitMs = 100;
constexpr unsigned int kWriteLimitMs = 1000;
constexpr std::size_t kPieceBytes = 4096;  // PIPE_BUF: a pipe that polls as writable has room for it

// Blocks SIGPIPE on this thread and removes one that was raised meanwhile.
class SigPipeBlock {
public:
    SigPipeBlock() noexcept {
        sigemptyset(&moSigPipe);
        sigaddset(&moSigPipe, SIGPIPE);
        sigset_t pending;
        sigpending(&pending);
        mbWasPending = sigismember(&pending, SIGPIPE) == 1;
        pthread_sigmask(SIG_BLOCK, &moSigPipe, &moPrevious);
    }
    ~SigPipeBlock() {
        constexpr timespec kNoWait{};
        while (!mbWasPending && sigtimedwait(&moSigPipe, nullptr, &kNoWait) < 0 && errno == EINTR) {
        }
        pthread_sigmask(SIG_SETMASK, &moPrevious, nullptr);
    }
    SigPipeBlock(const SigPipeBlock&) = delete;
    SigPipeBlock& operator=(const SigPipeBlock&) = delete;

private:
    sigset_t moSigPipe;
    sigset_t moPrevious;
    bool mbWasPending;
};

bool LockWithinLimit(std::FILE* stream) noexcept {
    const unsigned int start = ReadTicks();
    while (ftrylockfile(stream) != 0) {
        if (ReadTicks() - start >= kLockLimitMs) return false;
        SleepFor(1);
    }
    return true;
}

bool IsRegularFile(int descriptor) noexcept {
    struct stat status {};
    return fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
}

// An upper limit of what a flush of the stream writes.
std::size_t PendingBytes(std::FILE* stream) noexcept {
    const std::size_t most_per_character = std::fwide(stream, 0) > 0 ? MB_CUR_MAX : 1;
    return __fpending(stream) * most_per_character;
}

// Opens the file of `descriptor` again for writes that never block: O_NONBLOCK on the descriptor itself would
// affect every process that shares it. Sockets can't be opened again; they get a plain copy of the descriptor.
int OpenForPieces(int descriptor) noexcept {
    char path[40];
    std::snprintf(path, sizeof path, "/proc/self/fd/%d", descriptor);
    const int opened = MoveAboveStreams(open(path, O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
    return opened >= 0 ? opened : fcntl(descriptor, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
}

// Copies the file `from` to `to` until all is written, `to` fails, or the limit is over.
void CopyWithinLimit(int from, int to) noexcept {
    const SigPipeBlock block;
    const unsigned int start = ReadTicks();
    char piece[kPieceBytes];
    off_t done = 0;
    for (;;) {
        const ssize_t bytes = pread(from, piece, sizeof piece, done);
        const unsigned int waited = ReadTicks() - start;
        if (bytes <= 0 || waited >= kWriteLimitMs) return;
        pollfd writable{to, POLLOUT, 0};
        if (poll(&writable, 1, static_cast<int>(kWriteLimitMs - waited)) < 1) continue;
        const ssize_t written = write(to, piece, static_cast<std::size_t>(bytes));
        if (written < 0 && errno != EAGAIN && errno != EINTR) return;
        if (written > 0) done += written;
    }
}

// True if a write of `bytes` does not have to wait, as long as no other process writes to the same file.
bool HasRoom(int descriptor, std::size_t bytes) noexcept {
    pollfd writable{descriptor, POLLOUT, 0};
    return bytes <= kPieceBytes && poll(&writable, 1, 0) == 1;
}

// Writes pending output where there is no descriptor to collect it: what the file accepts at once. `previous` is
// the result of OpenForPieces.
void FlushWithoutWaiting(std::FILE* stream, int previous) noexcept {
    const SigPipeBlock block;
    const bool never_blocks = previous >= 0 && (fcntl(previous, F_GETFL) & O_NONBLOCK) != 0;
    if (never_blocks ? dup2(previous, fileno(stream)) >= 0 : HasRoom(fileno(stream), PendingBytes(stream)))
        std::fflush(stream);
}

// setvbuf doesn't reach the buffer of a wide-oriented stream. freopen drops that buffer and the orientation.
// It closes the stream if it gets no descriptor, so one is tried first.
void DropWideBuffer(std::FILE* stream) noexcept {
    if (std::fwide(stream, 0) <= 0) return;
    if (Descriptor(OpenAboveStreams("/dev/null")).Get() < 0) return;
    [[maybe_unused]] std::FILE* const same = std::freopen("/dev/null", "r+", stream);
}

}  // namespace

void RedirectStream(std::FILE* stream, int target) noexcept {
    const int descriptor = fileno(stream);
    if (descriptor < 0) return;
    if (!LockWithinLimit(stream)) {
        dup2(target, descriptor);
        return;
    }
    // Regular files are flushed in place: they don't block, and a stream seeks in them.
    const bool may_block = __fpending(stream) != 0 && !IsRegularFile(descriptor);
    const Descriptor previous(may_block ? OpenForPieces(descriptor) : -1);
    const Descriptor collected(may_block ? MoveAboveStreams(memfd_create("pending output", MFD_CLOEXEC))
                                         : -1);
    if (may_block && collected.Get() < 0) {
        FlushWithoutWaiting(stream, previous.Get());
    } else if (!may_block || dup2(collected.Get(), descriptor) >= 0) {
        std::fflush(stream);
    }
    __fpurge(stream);  // input that can't be given back, and output that could not be collected
    DropWideBuffer(stream);
    dup2(target, descriptor);
    std::clearerr(stream);
    std::setvbuf(stream, nullptr, _IONBF, 0);
    funlockfile(stream);
    if (previous.Get() >= 0) CopyWithinLimit(collected.Get(), previous.Get());
}
