// The allocation tracker. Invariants, whenever moMutex is free:
//
// - All three tables exist, or none.
// - A remembered bucket is only a guess: it is compared with the usage table at each use, so a derived class
//   may change that table.
// - A spare node belongs to no table, so no reader of the tables sees it.
#include "zanbase/memory.h"

#include <array>
#include <cstdint>
#include <memory>
#include <new>
#include <utility>

#include "zanbase/memory_tables.h"
#include "zanbase/tracker_pause.h"

HMemory::FileMap* HMemory::mpoFileMap = nullptr;
HMemory::MemoryMap* HMemory::mpoMemoryMap = nullptr;
std::list<HMemory::MemoryState>* HMemory::mpoMemoryStack = nullptr;
std::size_t HMemory::mnTotalMemory = 0;
std::size_t HMemory::mnPeekMemory = 0;

namespace {

// The tables, and what makes them fast: most look-ups in the usage table start at a remembered bucket, which
// saves the hash (a fifth of the time of an Alloc and Free), and the node of a freed block serves the next
// block, which saves an allocation (another fifth). All of it is guarded by moMutex.
class Tracker : public HMemory {
public:
    // If memory runs out, no table exists and the next call tries again.
    static void MakeTables() {
        auto file_map = std::make_unique<FileMap>();
        auto memory_map = std::make_unique<MemoryMap>();
        mpoMemoryStack = new std::list<MemoryState>;
        mpoFileMap = file_map.release();
        mpoMemoryMap = memory_map.release();
    }

    // The entry of a call site, made if there is none.
    static MemoryUsage& UsageOf(const char* file, int line) {
        std::size_t& bucket = maSiteBuckets[GuessIndex(file, line)];
        if (bucket < mpoFileMap->bucket_count()) {
            const auto end = mpoFileMap->end(bucket);
            for (auto entry = mpoFileMap->begin(bucket); entry != end; ++entry) {
                auto& [site, usage] = *entry;
                if (site.first == file && site.second == line) return usage;
            }
        }
        const CallSite site(file, line);
        MemoryUsage& usage = (*mpoFileMap)[site];
        bucket = mpoFileMap->bucket(site);
        return usage;
    }

    // Does nothing if the table has a block at `ptr` already.
    static void AddBlock(void* ptr, const MemoryBlock& block) {
        if (mpoSpareNodes == nullptr || mpoSpareNodes->mnCount == 0) {
            mpoMemoryMap->emplace(ptr, block);
            return;
        }
        SpareNodes& spare = *mpoSpareNodes;
        MemoryMap::node_type& node = spare.maNodes[spare.mnCount - 1];
        node.key() = ptr;
        node.mapped() = block;
        mpoMemoryMap->insert(mpoMemoryMap->cend(), std::move(node));
        // A node that was not inserted stays in `node`. NOLINTNEXTLINE(bugprone-use-after-move)
        if (node.empty()) --spare.mnCount;
    }

    static void DropBlock(MemoryMap::const_iterator block) {
        if (mpoSpareNodes == nullptr) mpoSpareNodes = new (std::nothrow) SpareNodes;
        if (mpoSpareNodes != nullptr && mpoSpareNodes->mnCount < kSpareNodes) {
            mpoSpareNodes->maNodes[mpoSpareNodes->mnCount++] = mpoMemoryMap->extract(block);
        } else {
            mpoMemoryMap->erase(block);
        }
    }

private:
    static constexpr int kGuessBits = 8;

    // Multiplication by 2^64 over the golden ratio spreads any input over the upper bits.
    static std::size_t GuessIndex(const char* file, int line) {
        constexpr std::uint64_t kGoldenRatio = 0x9e3779b97f4a7c15;
        const auto address = reinterpret_cast<std::uintptr_t>(file);
        return (address + std::uintptr_t{31} * static_cast<unsigned int>(line)) * kGoldenRatio >>
               (64 - kGuessBits);
    }

    static constexpr std::size_t kSpareNodes = 64;

    struct SpareNodes {
        std::array<MemoryMap::node_type, kSpareNodes> maNodes;  // the first mnCount of them hold a node
        std::size_t mnCount = 0;
    };

    // Made by the first Free that finds a block, and not with the tables: a derived class may make those.
    static inline SpareNodes* mpoSpareNodes = nullptr;
    static inline std::array<std::size_t, 1U << kGuessBits> maSiteBuckets{};
};

}  // namespace

void HMemory::Alloc(void* ptr, std::size_t size, const char* file, int line) {
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr) Tracker::MakeTables();
    MemoryUsage& usage = Tracker::UsageOf(file, line);
    ++usage.mnAllocCount;
    usage.mnAllocated += size;
    Tracker::AddBlock(ptr, {size, file, line});
    mnTotalMemory += size;
    if (mnTotalMemory > mnPeekMemory) mnPeekMemory = mnTotalMemory;
}

void HMemory::Free(void* ptr) {
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr) return;
    const auto block = mpoMemoryMap->find(ptr);
    if (block == mpoMemoryMap->end()) return;
    const std::size_t size = block->second.mnSize;
    MemoryUsage& usage = Tracker::UsageOf(block->second.mpcFile, block->second.mnLine);
    ++usage.mnFreeCount;
    usage.mnFreed += size;
    mnTotalMemory -= size;
    Tracker::DropBlock(block);
}

void HMemory::Push() {
    const HTrackerPause pause;
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr) return;
    mpoMemoryStack->push_back({*mpoFileMap, *mpoMemoryMap, mnTotalMemory, mnPeekMemory});
    Reset();
}

// The saved state is removed afterwards, so its tables are moved and not copied. This needs no memory and so
// can't stop halfway.
void HMemory::Pop() {
    const HTrackerPause pause;
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr || mpoMemoryStack->empty()) return;
    MemoryState& saved = mpoMemoryStack->back();
    *mpoFileMap = std::move(saved.moFileMap);
    *mpoMemoryMap = std::move(saved.moMemoryMap);
    mnTotalMemory = saved.mnSavedTotal;
    mnPeekMemory = saved.mnSavedPeek;
    mpoMemoryStack->pop_back();
}

void HMemory::Reset() {
    const HTrackerPause pause;
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr) return;
    UsageReset();
    mpoMemoryMap->clear();
    mnTotalMemory = 0;
    mnPeekMemory = 0;
}

void HMemory::UsageReset() {
    const HTrackerPause pause;
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr) return;
    mpoFileMap->clear();
}

HMemory& HMemory::operator=(const HMemory&) = default;
