// The shards: open hash tables with linear probing, which keep no marks of what was removed.
//
// An entry has two words: the block's address and site packed into one, and the size. Zero is no entry.
// Between two sections under a shard's lock, every entry can be reached from its home slot without crossing
// an empty one.
#include "block_table.h"

#include <array>
#include <atomic>

#include "pool.h"
#include "spin_lock.h"

namespace recorder {
namespace {

constexpr unsigned int kShardBits = 6;
constexpr unsigned int kRegionBits = 26;    // 64 MB, the size of a thread's heap in the C library
constexpr unsigned int kAlignmentBits = 3;  // some allocators give small blocks at multiples of 8
constexpr unsigned int kFirstTableBits = 9;
constexpr std::uint64_t kGoldenRatio = 0x9e3779b97f4a7c15;
constexpr SiteId kSitesOfPage = 512;

struct Entry {
    std::uint64_t key_and_site;
    std::uint64_t size;
};

struct alignas(128) Shard {
    SpinLock lock;
    unsigned int bits = 0;  // of the number of slots; this and all below are guarded by lock
    std::size_t count = 0;
    Entry* entries = nullptr;
    std::array<SiteUsage*, kSites / kSitesOfPage> usage{};
};

// Constant-initialised: the program allocates before any constructor runs.
std::array<Shard, 1U << kShardBits> gShards{};
alignas(128) std::atomic<std::uint64_t> gTotal{0};
std::atomic<std::uint64_t> gPeak{0};  // beside the total, which every change touches anyway
alignas(128) std::atomic<std::uint64_t> gLost{0};

// User addresses have at most 48 bits, so 45 are left, and 19 for the site.
std::uint64_t KeyOf(const void* block) {
    return (reinterpret_cast<std::uint64_t>(block) >> kAlignmentBits) + 1;
}
std::uint64_t KeyOf(const Entry& entry) { return entry.key_and_site >> kSiteBits; }
SiteId SiteOf(const Entry& entry) { return static_cast<SiteId>(entry.key_and_site & (kSites - 1)); }

Shard& ShardOf(const void* block) {
    const std::uint64_t region = reinterpret_cast<std::uint64_t>(block) >> kRegionBits;
    return gShards[region * kGoldenRatio >> (64 - kShardBits)];
}

std::size_t HomeOf(const Shard& shard, std::uint64_t key) { return key * kGoldenRatio >> (64 - shard.bits); }
std::size_t MaskOf(const Shard& shard) { return (std::size_t{1} << shard.bits) - 1; }

// The slot of `key`, or the empty one where it belongs.
Entry& SlotOf(const Shard& shard, std::uint64_t key) {
    std::size_t slot = HomeOf(shard, key);
    while (shard.entries[slot].key_and_site != 0 && KeyOf(shard.entries[slot]) != key)
        slot = (slot + 1) & MaskOf(shard);
    return shard.entries[slot];
}

bool Grow(Shard& shard) {
    Entry* const old = shard.entries;
    const std::size_t old_slots = old == nullptr ? 0 : MaskOf(shard) + 1;
    const unsigned int bits = old == nullptr ? kFirstTableBits : shard.bits + 1;
    auto* const entries = static_cast<Entry*>(MapPages(sizeof(Entry) << bits));
    if (entries == nullptr) return false;
    shard.entries = entries;
    shard.bits = bits;
    for (std::size_t slot = 0; slot < old_slots; ++slot)
        if (old[slot].key_and_site != 0) SlotOf(shard, KeyOf(old[slot])) = old[slot];
    if (old != nullptr) UnmapPages(old, old_slots * sizeof(Entry));
    return true;
}

bool HasRoom(Shard& shard) {
    if (shard.entries != nullptr && shard.count < (MaskOf(shard) + 1) / 8 * 5) return true;
    return Grow(shard) || (shard.entries != nullptr && shard.count < MaskOf(shard));
}

// Null if memory ran out.
SiteUsage* UsageIn(Shard& shard, SiteId site) {
    SiteUsage*& page = shard.usage[site / kSitesOfPage];
    if (page == nullptr) page = static_cast<SiteUsage*>(TakeFromPool(kSitesOfPage * sizeof(SiteUsage)));
    return page == nullptr ? nullptr : &page[site % kSitesOfPage];
}

void AddToTotal(std::uint64_t size) {
    const std::uint64_t total = AddTo(gTotal, size);
    std::uint64_t peak = gPeak.load(std::memory_order_relaxed);
    while (total > peak && !gPeak.compare_exchange_weak(peak, total, std::memory_order_relaxed)) {
    }
}

void TakeFromTotal(std::uint64_t size) { AddTo(gTotal, std::uint64_t{0} - size); }

// Entries behind a removed one move up as far as their home slots allow.
void Remove(Shard& shard, Entry& entry) {
    const std::size_t mask = MaskOf(shard);
    auto hole = static_cast<std::size_t>(&entry - shard.entries);
    for (std::size_t slot = (hole + 1) & mask; shard.entries[slot].key_and_site != 0;
         slot = (slot + 1) & mask) {
        const std::size_t home = HomeOf(shard, KeyOf(shard.entries[slot]));
        if (((slot - home) & mask) < ((slot - hole) & mask)) continue;
        shard.entries[hole] = shard.entries[slot];
        hole = slot;
    }
    shard.entries[hole] = {};
    --shard.count;
}

void CountFree(Shard& shard, const Entry& entry) {
    SiteUsage* const usage = UsageIn(shard, SiteOf(entry));
    if (usage == nullptr) return;
    ++usage->frees;
    usage->freed_bytes += entry.size;
}

// The size of the unseen free, if there was one, goes to `replaced`.
bool Insert(Shard& shard, const void* block, std::size_t size, SiteId site, std::uint64_t& replaced) {
    const SpinLockScope lock(shard.lock);
    SiteUsage* const usage = UsageIn(shard, site);
    if (usage == nullptr || !HasRoom(shard)) return false;
    Entry& entry = SlotOf(shard, KeyOf(block));
    if (entry.key_and_site != 0) {
        CountFree(shard, entry);
        replaced = entry.size;
    } else {
        ++shard.count;
    }
    entry = {KeyOf(block) << kSiteBits | site, size};
    ++usage->allocations;
    usage->allocated_bytes += size;
    return true;
}

}  // namespace

void AddBlock(const void* block, std::size_t size, SiteId site) {
    std::uint64_t replaced = 0;
    if (!Insert(ShardOf(block), block, size, site, replaced)) {
        AddLostBlock();
        return;
    }
    if (replaced != 0) TakeFromTotal(replaced);
    AddToTotal(size);
}

DroppedBlock DropBlock(const void* block) {
    // The allocator's words before the block are needed next; they arrive while the table is read.
    __builtin_prefetch(static_cast<const char*>(block) - sizeof(std::size_t));
    Shard& shard = ShardOf(block);
    DroppedBlock dropped{};
    {
        const SpinLockScope lock(shard.lock);
        if (shard.entries == nullptr) return dropped;
        Entry& entry = SlotOf(shard, KeyOf(block));
        if (entry.key_and_site == 0) return dropped;
        dropped = {true, SiteOf(entry), entry.size};
        CountFree(shard, entry);
        Remove(shard, entry);
    }
    TakeFromTotal(dropped.size);
    return dropped;
}

void RestoreBlock(const void* block, const DroppedBlock& dropped) {
    AddBlock(block, dropped.size, dropped.site);
    Shard& shard = ShardOf(block);
    const SpinLockScope lock(shard.lock);
    SiteUsage* const usage = UsageIn(shard, dropped.site);
    if (usage == nullptr) return;
    --usage->allocations;
    --usage->frees;
    usage->allocated_bytes -= dropped.size;
    usage->freed_bytes -= dropped.size;
}

SiteUsage UsageOfSite(SiteId site) {
    SiteUsage sum{};
    for (Shard& shard : gShards) {
        const SpinLockScope lock(shard.lock);
        const SiteUsage* const page = shard.usage[site / kSitesOfPage];
        if (page == nullptr) continue;
        const SiteUsage& usage = page[site % kSitesOfPage];
        sum.allocated_bytes += usage.allocated_bytes;
        sum.freed_bytes += usage.freed_bytes;
        sum.allocations += usage.allocations;
        sum.frees += usage.frees;
    }
    return sum;
}

std::uint64_t TotalBytes() { return gTotal.load(std::memory_order_relaxed); }
std::uint64_t PeakBytes() { return gPeak.load(std::memory_order_relaxed); }
std::uint64_t LostBlocks() { return gLost.load(std::memory_order_relaxed); }

void AddLostBlock() { gLost.fetch_add(1, std::memory_order_relaxed); }

// The tables may be halfway through a change of another thread's, so nothing in them is read.
void ResetBlocksInChild() {
    for (Shard& shard : gShards) {
        if (shard.entries != nullptr) UnmapPages(shard.entries, sizeof(Entry) << shard.bits);
        shard.entries = nullptr;
        shard.count = 0;
        shard.usage.fill(nullptr);
        shard.lock.Release();
    }
    gTotal = 0;
    gPeak = 0;
    gLost = 0;
}

}  // namespace recorder
