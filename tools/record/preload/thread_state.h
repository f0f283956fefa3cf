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
    bool inside;       // the recorder itself is at work: what it allocates, reads and writes is not recorded
    bool opening;      // inside a call that opens a file and will count that
    bool has_request;  // `request` is the caller of an operator new that has not reached an allocator yet
    Frame request;
    bool allocating;  // inside the real allocator
};

// Initial-exec: no access may call the loader, which allocates.
extern __thread ThreadState gThread __attribute__((tls_model("initial-exec")));

// Marks the thread as inside the recorder, and keeps `errno`.
class InsideScope {
public:
    InsideScope() : mbWasInside(gThread.inside), mnErrno(errno) { gThread.inside = true; }
    ~InsideScope() {
        gThread.inside = mbWasInside;
        errno = mnErrno;
    }
    InsideScope(const InsideScope&) = delete;
    InsideScope& operator=(const InsideScope&) = delete;

private:
    const bool mbWasInside;
    const int mnErrno;
};

// Marks the thread as inside the real allocator.
class AllocatorScope {
public:
    AllocatorScope() : mbWasAllocating(gThread.allocating) { gThread.allocating = true; }
    ~AllocatorScope() { gThread.allocating = mbWasAllocating; }
    AllocatorScope(const AllocatorScope&) = delete;
    AllocatorScope& operator=(const AllocatorScope&) = delete;

private:
    const bool mbWasAllocating;
};

// False in a signal handler that interrupted the recorder or the allocator: either may hold locks that a
// report needs.
inline bool MayReport() { return !gThread.inside && !gThread.allocating; }

// The caller of the function that this is inlined into, which must have been compiled with a frame pointer.
[[gnu::always_inline]] inline Frame CallerOfHook() {
    const auto* const frame = static_cast<const std::uintptr_t*>(__builtin_frame_address(0));
    return {reinterpret_cast<std::uintptr_t>(__builtin_return_address(0)),
            reinterpret_cast<std::uintptr_t>(__builtin_dwarf_cfa()), frame[0]};
}

}  // namespace recorder

#endif
