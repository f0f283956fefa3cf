// The C runtime has no call that acquires a stream's lock, or writes, with a limit. So a thread of its own
// redirects the stream, and the caller waits for that thread with a limit.
#include "platform/windows/standard_stream.h"

#include <atomic>
#include <new>

#include "platform/stream.h"
#include "platform/windows/system.h"

namespace {

constexpr DWORD kLimitMs = 1000;
constexpr DWORD kCancelLimitMs = 100;

struct Redirection {
    std::FILE* stream;
    const std::FILE* target;  // null: the null device
    // Set by the thread before it moves the stream, or by the caller that gives up.
    std::atomic<bool> is_decided{false};
};

void Move(std::FILE* stream, const std::FILE* target) noexcept {
    if (target != nullptr) {
        *stream = *target;
    } else if (std::freopen("NUL", "r+", stream) == nullptr) {
        return;
    }
    std::setvbuf(stream, nullptr, _IONBF, 0);
}

DWORD WINAPI Redirect(void* argument) {
    const auto redirection = static_cast<Redirection*>(argument);
    const StreamLock lock(redirection->stream);
    if (redirection->is_decided) return 0;  // before fflush, which drops the input that is buffered
    std::fflush(redirection->stream);
    if (!redirection->is_decided.exchange(true)) Move(redirection->stream, redirection->target);
    return 0;
}

bool EndsWithin(HANDLE thread, DWORD limit_ms) noexcept {
    return WaitForSingleObject(thread, limit_ms) == WAIT_OBJECT_0;
}

// True if the thread has ended; false if it may wait for the stream for ever, and then it changes nothing.
bool AwaitOrGiveUp(HANDLE thread, Redirection* redirection) noexcept {
    if (EndsWithin(thread, kLimitMs)) return true;
    CancelSynchronousIo(thread);  // a write into a full pipe
    if (EndsWithin(thread, kCancelLimitMs)) return true;
    return redirection->is_decided.exchange(true) && EndsWithin(thread, INFINITE);
}

// Keeps this library loaded until the process ends: a thread that was given up returns into it.
void KeepLoaded() noexcept {
    HMODULE library = nullptr;
    GetModuleHandleExA(GET_MODULE_HANDLE_EX_FLAG_PIN | GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS,
                       reinterpret_cast<const char*>(&Redirect), &library);
}

}  // namespace

bool IsClosed(std::FILE* stream) noexcept { return stream->_flag == 0; }

// A redirection that was given up is never freed: its thread reads it when the stream becomes free.
void RedirectStream(std::FILE* stream, const std::FILE* target) noexcept {
    const auto redirection = new (std::nothrow) Redirection{stream, target};
    if (redirection == nullptr) return;
    const HANDLE thread = CreateThread(nullptr, 0, Redirect, redirection, 0, nullptr);
    if (thread == nullptr || AwaitOrGiveUp(thread, redirection)) {
        delete redirection;
    } else {
        KeepLoaded();
    }
    if (thread != nullptr) CloseHandle(thread);
}
