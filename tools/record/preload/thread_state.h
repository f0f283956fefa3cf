// What the hooks keep for each thread: the guard against recording the recorder, and the code that asked for
// memory.
#ifndef ZANBASE_RECORD_THREAD_STATE_H
#define ZANBASE_RECORD_THREAD_STATE_H

#include <cerrno>
#include <cstdint>

namespace recorder {

// A frame of the program: where it continues, and its registers at that place.
struct Frame {
    std::uintptr_t pc;  // a return address
    std::uintptr_t sp;  // the stack pointer after the return
    std::uintptr_t fp;  // the frame pointer
};

struct ThreadState {
    bool inside;       // the recorder itself is at work: what it does is not recorded
    bool opening;      // inside a call that opens a file and will count that
    bool has_request;  // `request` is the caller of an operator new that has not reached an allocator yet
    bool in_vfork;     // in a child of vfork, whose descriptors are its own but whose memory is its parent's
    Frame request;
    const void* newest;  // the block that was allocated last
};

// Initial-exec: no access may call the loader, which allocates.
extern __thread ThreadState gThread __attribute__((tls_model("initial-exec")));

// Marks the thread as inside the recorder, and keeps `errno`. A signal handler that runs meanwhile is not
// recorded, since it could need a lock that this thread holds.
class RecursionGuard {
public:
    RecursionGuard() : mbWasInside(gThread.inside), mnErrno(errno) { gThread.inside = true; }
    ~RecursionGuard() {
        gThread.inside = mbWasInside;
        errno = mnErrno;
    }
    RecursionGuard(const RecursionGuard&) = delete;
    RecursionGuard& operator=(const RecursionGuard&) = delete;

private:
    const bool mbWasInside;
    const int mnErrno;
};

// The caller of the function that this is inlined into, which must have been compiled with a frame pointer.
[[gnu::always_inline]] inline Frame CallerOfHook() {
    const auto* const frame = static_cast<const std::uintptr_t*>(__builtin_frame_address(0));
    return {reinterpret_cast<std::uintptr_t>(__builtin_return_address(0)),
            reinterpret_cast<std::uintptr_t>(__builtin_dwarf_cfa()), frame[0]};
}

}  // namespace recorder

#endif
