// The memory account: live blocks by address and usage by call site. It is split into shards by address, each
// with a lock of its own, so that threads with heaps of their own seldom meet; the total and its peak are
// shared counters.
#ifndef ZANBASE_RECORD_BLOCK_TABLE_H
#define ZANBASE_RECORD_BLOCK_TABLE_H

#include <cstddef>
#include <cstdint>

namespace recorder {

using SiteId = std::uint32_t;
constexpr unsigned int kSiteBits = 19;
constexpr SiteId kSites = SiteId{1} << kSiteBits;

// What a call site did.
struct SiteUsage {
    std::uint64_t allocated_bytes;
    std::uint64_t freed_bytes;
    std::uint64_t allocations;
    std::uint64_t frees;
};

struct DroppedBlock {
    bool found;
    SiteId site;
    std::size_t size;
};

// Records a block. A block that is still recorded at that address was freed unseen and is counted as freed.
void AddBlock(const void* block, std::size_t size, SiteId site);

// Drops the block at `block`, if one is recorded there, and counts it as freed.
DroppedBlock DropBlock(const void* block);

// Takes the drop back: the block is still there.
void RestoreBlock(const void* block, const DroppedBlock& dropped);

// The usage of a site, added up over the shards. May run beside recording.
SiteUsage UsageOfSite(SiteId site);

std::uint64_t TotalBytes();
std::uint64_t PeakBytes();

// Blocks that could not be recorded because memory ran out.
std::uint64_t LostBlocks();

// Counts a block that could not be recorded.
void AddLostBlock();

// Empties the account in a forked child, whatever state the locks were in.
void ResetBlocksInChild();

}  // namespace recorder

#endif
