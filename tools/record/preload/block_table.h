// The memory account: live blocks by address, usage by stack. It is split into shards by address, each with a
// lock of its own, so that threads with heaps of their own rarely contend; the total and its peak are counters
// of the whole account.
#ifndef ZANBASE_RECORD_BLOCK_TABLE_H
#define ZANBASE_RECORD_BLOCK_TABLE_H

#include <cstddef>

#include "common/account.h"

namespace recorder {

struct DroppedBlock {
    bool found;
    NodeId node;
    std::size_t size;
};

// Records a block that the stack `node` allocated. A block that is still recorded at that address was freed
// unseen and is counted as freed.
void AddBlock(Account& account, const void* block, std::size_t size, NodeId node);

// Drops the block at `block`, if one is recorded there, and counts it as freed; `temporary` if this thread
// has not allocated since.
DroppedBlock DropBlock(Account& account, const void* block, bool temporary);

// Takes the drop back: the block is still there.
void RestoreBlock(Account& account, const void* block, const DroppedBlock& dropped);

// Forgets all blocks in a forked child. `nodes` is how many stacks the parent had.
void ResetBlocks(std::uint64_t nodes);

}  // namespace recorder

#endif
