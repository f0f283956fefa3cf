// Whether this process is recorded right now, where its account is, and the account's entrances for the
// hooks.
#ifndef ZANBASE_RECORD_RECORDING_H
#define ZANBASE_RECORD_RECORDING_H

#include <cstddef>

#include "block_table.h"
#include "thread_state.h"

namespace recorder {

// What a forked child has to find out anew. The kernel clears the page in the child, whichever system call
// made it.
struct alignas(kPageBytes) ForkPage {
    std::atomic<std::uint32_t> state;  // bits of common/account.h, and kDecided; 0 before the first call
    std::atomic<bool> deciding;
};
constexpr std::uint32_t kDecided = 8;
extern ForkPage gForkPage;

// Of this process, once its state has kMemory or kDisk.
extern Account* gAccount;
extern Control* gControl;  // null if no command has started this process

// The program has limited its system calls: from now on the recorder makes only those that allocators and
// streams make.
extern std::atomic<bool> gIsConfined;

// The program has forbidden the processor's counter: from now on the recorder reads no clock.
extern std::atomic<bool> gHasNoClock;

// Decides whether this process is recorded and makes its account; returns the state. 0 if it is too early to
// decide.
std::uint32_t Decide();

// True if this thread's call of kind `kind` is to be recorded.
inline bool Wants(std::uint32_t kind) {
    if (gThread.inside) return false;
    std::uint32_t state = gForkPage.state.load(std::memory_order_relaxed);
    if (state == 0) state = Decide();
    return (state & kind) != 0;
}

// Records a block that `caller` got; null is not a block. Requires: Wants(kMemory).
void RecordBlock(const void* block, std::size_t size, const Frame& caller);

// Records that `block` is about to be freed. Requires: Wants(kMemory).
inline DroppedBlock ForgetBlock(const void* block) {
    // A signal handler that allocates meanwhile must not find the table halfway through a change.
    gThread.inside = true;
    const DroppedBlock dropped = DropBlock(*gAccount, block, block == gThread.newest);
    gThread.inside = false;
    return dropped;
}

// The descriptor of the file that processes which are followed inherit, or -1. A program that closes all it
// finds must not close it.
extern int gOwnDescriptor;

// Moves it: the program is about to put another file there.
void VacateDescriptor();

// The value of kFileVariable for a process that this one starts; `text` has room for it.
constexpr std::size_t kFileValueBytes = 64;
void WriteFileValue(char* text);

// Nanoseconds since 1970.
std::int64_t TimeOfDay();

}  // namespace recorder

#endif
