// What is recorded right now, and the accounts' entrances for the hooks.
#ifndef ZANBASE_RECORD_RECORDING_H
#define ZANBASE_RECORD_RECORDING_H

#include <atomic>
#include <cstddef>

#include "block_table.h"
#include "thread_state.h"

namespace recorder {

// Bits of gState. Events before the library's constructor are recorded; whether they are wanted is known
// then.
constexpr unsigned int kMemory = 1;
constexpr unsigned int kDisk = 2;
constexpr unsigned int kAttention = 4;  // the next event first does what a signal or a fork has asked for
extern std::atomic<unsigned int> gState;

// Does what was asked for, and returns the state after that. Errors are kept to itself, as is `errno`.
unsigned int Attend();

// True if this thread's call of kind `kind` is to be recorded.
inline bool Wants(unsigned int kind) {
    unsigned int state = gState.load(std::memory_order_relaxed);
    if (gThread.inside) return false;
    if ((state & kAttention) != 0) state = Attend();
    return (state & kind) != 0;
}

// True in a child of vfork, whose descriptors are its own but whose memory is its parent's; also in a child
// that is not recorded.
bool IsVforkChild();

// True for an address in this library's code. What that code allocates is not recorded, also where no guard
// is set yet, and its containers don't call the program's operators.
bool IsOwnCode(std::uintptr_t pc);

// Records a block that `caller` got; null is no block. Requires: Wants(kMemory).
void RecordBlock(const void* block, std::size_t size, const Frame& caller);

}  // namespace recorder

#endif
