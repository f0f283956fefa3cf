// Redirection in three steps: collect the pending output of the stream in memory, move the descriptor, then
// write what was collected to the old file. The C library's own flush could block there without limit.
#include "platform/linux/standard_stream.h"

#include <cerrno>
#include <csignal>
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

// Opens the file of `descriptor` again for writes that never block: O_NONBLOCK on the descriptor itself would
// affect every process that shares it. Sockets can't be opened again; they get a plain copy of the descriptor.
int OpenForPieces(int descriptor) noexcept {
    char path[40];
    std::snprintf(path, sizeof path, "/proc/self/fd/%d", descriptor);
    const int opened = open(path, O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
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
    const Descriptor collected(may_block ? memfd_create("pending output", MFD_CLOEXEC) : -1);
    if (!may_block || dup2(collected.Get(), descriptor) >= 0) std::fflush(stream);
    __fpurge(stream);  // input that can't be given back, and output that could not be collected
    DropWideBuffer(stream);
    dup2(target, descriptor);
    std::clearerr(stream);
    std::setvbuf(stream, nullptr, _IONBF, 0);
    funlockfile(stream);
    if (may_block) CopyWithinLimit(collected.Get(), previous.Get());
}
