// The shards: open hash tables with linear probing, which keep no marks of what was removed. The tables of
// blocks are private to the process; what the command reads are the usage rows and the totals in the account.
//
// An entry has two words: the block's address, and its size with the number of the stack. Between two
// sections under a shard's lock, every entry can be reached from its home slot without crossing an empty one.
#include "block_table.h"

#include "shared_memory.h"
#include "spin_lock.h"

namespace recorder {
namespace {

constexpr unsigned int kShardBits = 6;
constexpr unsigned int kRegionBits = 26;  // 64 MB, the size of a thread's heap in the C library
constexpr unsigned int kFirstTableBits = 9;
constexpr std::uint64_t kGoldenRatio = 0x9e3779b97f4a7c15;
constexpr std::uint64_t kLargestBlock = (std::uint64_t{1} << (64 - kNodeBits)) - 1;
static_assert(kShards == std::size_t{1} << kShardBits);

struct Entry {
    std::uint64_t block;  // 0: the entry is empty
    std::uint64_t size_and_node;
};

struct alignas(128) Shard {
    SpinLock lock;
    unsigned int bits = 0;  // of the number of slots; this and all below are guarded by lock
    std::size_t count = 0;
    Entry* entries = nullptr;
    TableRows<decltype(Account::usage)::value_type> usage;
};

// Constant-initialised: the program allocates before any constructor runs.
std::array<Shard, kShards> gShards{};

NodeId NodeOf(const Entry& entry) { return entry.size_and_node & ((1U << kNodeBits) - 1); }
std::uint64_t SizeOf(const Entry& entry) { return entry.size_and_node >> kNodeBits; }
std::uint64_t KeyOf(const void* block) { return reinterpret_cast<std::uint64_t>(block); }

std::size_t IndexOf(const void* block) {
    return (KeyOf(block) >> kRegionBits) * kGoldenRatio >> (64 - kShardBits);
}
std::size_t HomeOf(const Shard& shard, std::uint64_t block) {
    return (block >> 3) * kGoldenRatio >> (64 - shard.bits);  // some allocators give blocks at multiples of 8
}
std::size_t MaskOf(const Shard& shard) { return (std::size_t{1} << shard.bits) - 1; }

// The slot of `block`, or the empty one where it belongs.
Entry& SlotOf(const Shard& shard, std::uint64_t block) {
    std::size_t slot = HomeOf(shard, block);
    while (shard.entries[slot].block != 0 && shard.entries[slot].block != block)
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
        if (old[slot].block != 0) SlotOf(shard, old[slot].block) = old[slot];
    if (old != nullptr) UnmapPages(old, old_slots * sizeof(Entry));
    return true;
}

bool HasRoom(Shard& shard) {
    if (shard.entries != nullptr && shard.count < (MaskOf(shard) + 1) / 8 * 5) return true;
    return Grow(shard) || (shard.entries != nullptr && shard.count < MaskOf(shard));
}

// Entries behind a removed one move up as far as their home slots allow.
void Remove(Shard& shard, Entry& entry) {
    const std::size_t mask = MaskOf(shard);
    auto hole = static_cast<std::size_t>(&entry - shard.entries);
    for (std::size_t slot = (hole + 1) & mask; shard.entries[slot].block != 0; slot = (slot + 1) & mask) {
        const std::size_t home = HomeOf(shard, shard.entries[slot].block);
        if (((slot - home) & mask) < ((slot - hole) & mask)) continue;
        shard.entries[hole] = shard.entries[slot];
        hole = slot;
    }
    shard.entries[hole] = {};
    --shard.count;
}

// For the one writer of a counter; the command may read it meanwhile.
void Increase(Counter& counter, std::uint64_t amount) {
    counter.store(counter.load(std::memory_order_relaxed) + amount, std::memory_order_relaxed);
}

// Before live bytes change for the first time since the peak, they are those at the peak.
void KeepForPeak(const Account& account, UsageCounters& usage) {
    const std::uint64_t stamp = account.stamp.load(std::memory_order_relaxed);
    if (usage.stamp.load(std::memory_order_relaxed) == stamp) return;
    usage.at_peak.store(
        usage.allocated.load(std::memory_order_relaxed) - usage.freed.load(std::memory_order_relaxed),
        std::memory_order_relaxed);
    usage.stamp.store(stamp, std::memory_order_release);  // pairs with the command's load
}

void CountFree(Account& account, Shard& shard, const Entry& entry, bool temporary) {
    UsageCounters* const usage = shard.usage.Find(NodeOf(entry));
    if (usage == nullptr) return;
    KeepForPeak(account, *usage);
    Increase(usage->frees, 1);
    Increase(usage->freed, SizeOf(entry));
    if (temporary) Increase(usage->temporary, 1);
}

void AddToTotal(Account& account, std::uint64_t size) {
    const std::uint64_t total = AddTo(account.total, size);
    std::uint64_t peak = account.peak.load(std::memory_order_relaxed);
    if (total <= peak) return;
    while (total > peak && !account.peak.compare_exchange_weak(peak, total, std::memory_order_relaxed)) {
    }
    AddTo(account.stamp, std::uint64_t{1});
}

void TakeFromTotal(Account& account, std::uint64_t size) { AddTo(account.total, std::uint64_t{0} - size); }

// The entry for `block`, with room behind it, or null if memory ran out. What was recorded there counts as
// freed, and its size goes to `replaced`.
Entry* Place(Account& account, Shard& shard, const void* block, std::uint64_t& replaced) {
    if (!HasRoom(shard)) return nullptr;
    Entry& entry = SlotOf(shard, KeyOf(block));
    if (entry.block != 0) {
        CountFree(account, shard, entry, false);
        replaced = SizeOf(entry);
    } else {
        ++shard.count;
    }
    return &entry;
}

bool Insert(Account& account, const void* block, std::size_t size, NodeId node, std::uint64_t& replaced) {
    const std::size_t index = IndexOf(block);
    Shard& shard = gShards[index];
    const SpinLockScope lock(shard.lock);
    UsageCounters* usage = shard.usage.Find(node);
    if (usage == nullptr) usage = shard.usage.Make(account.usage[index], node);
    Entry* const entry = usage == nullptr ? nullptr : Place(account, shard, block, replaced);
    if (entry == nullptr) return false;
    *entry = {KeyOf(block), std::uint64_t{size} << kNodeBits | node};
    KeepForPeak(account, *usage);
    Increase(usage->allocated, size);
    Increase(usage->allocations, 1);
    return true;
}

}  // namespace

void AddBlock(Account& account, const void* block, std::size_t size, NodeId node) {
    std::uint64_t replaced = 0;
    if (size > kLargestBlock || !Insert(account, block, size, node, replaced)) {
        AddTo(account.lost_blocks, std::uint64_t{1});
        return;
    }
    if (replaced != 0) TakeFromTotal(account, replaced);
    AddToTotal(account, size);
}

DroppedBlock DropBlock(Account& account, const void* block, bool temporary) {
    // The allocator's words before the block are needed next; they arrive while the table is read.
    __builtin_prefetch(static_cast<const char*>(block) - sizeof(std::size_t));
    Shard& shard = gShards[IndexOf(block)];
    DroppedBlock dropped{};
    {
        const SpinLockScope lock(shard.lock);
        if (shard.entries == nullptr) return dropped;
        Entry& entry = SlotOf(shard, KeyOf(block));
        if (entry.block == 0) return dropped;
        dropped = {true, NodeOf(entry), SizeOf(entry)};
        CountFree(account, shard, entry, temporary);
        Remove(shard, entry);
    }
    TakeFromTotal(account, dropped.size);
    return dropped;
}

void RestoreBlock(Account& account, const void* block, const DroppedBlock& dropped) {
    std::uint64_t replaced = 0;
    Shard& shard = gShards[IndexOf(block)];
    {
        const SpinLockScope lock(shard.lock);
        Entry* const entry = Place(account, shard, block, replaced);
        UsageCounters* const usage = shard.usage.Find(dropped.node);
        if (entry == nullptr || usage == nullptr) return;
        *entry = {KeyOf(block), std::uint64_t{dropped.size} << kNodeBits | dropped.node};
        Increase(usage->frees, ~std::uint64_t{0});
        Increase(usage->freed, std::uint64_t{0} - dropped.size);
    }
    AddTo(account.total, dropped.size);
}

// The tables were not copied to the child, and locks of them may be held by threads that it does not have.
void ResetBlocks(std::uint64_t nodes) {
    for (Shard& shard : gShards) {
        shard.entries = nullptr;
        shard.count = 0;
        shard.usage.Reset(nodes);
        shard.lock.Release();
    }
}

}  // namespace recorder
