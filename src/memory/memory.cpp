// The allocation tracker. Under moMutex, from one operation to the next:
//
// - The three tables exist all or none.
// - A recent site points to an entry of *mpoFileMap, or is null. The table keeps an entry where it is until
//   the table is emptied or replaced, and whoever does that forgets the recent sites.
// - A spare node belongs to no table, so no reader of the tables sees it.
#include "zanbase/memory.h"

#include <array>
#include <cstdint>
#include <memory>
#include <utility>

#include "zanbase/memory_tables.h"

HMemory::FileMap* HMemory::mpoFileMap = nullptr;
HMemory::MemoryMap* HMemory::mpoMemoryMap = nullptr;
std::list<HMemory::MemoryState>* HMemory::mpoMemoryStack = nullptr;
std::size_t HMemory::mnTotalMemory = 0;
std::size_t HMemory::mnPeekMemory = 0;

namespace {

// What makes the tracker fast beside its tables, which stay plain: a look-up in the usage table is saved
// where a site comes again soon, and a block that goes leaves its node to the next one. Together they take a
// third off the time spent in the tables. All of it is guarded by moMutex.
class Tracker : public HMemory {
public:
    // All tables or none, should memory run out.
    static void MakeTables() {
        auto file_map = std::make_unique<FileMap>();
        auto memory_map = std::make_unique<MemoryMap>();
        auto memory_stack = std::make_unique<std::list<MemoryState>>();
        mpoSpareNodes = new SpareNodes;
        mpoFileMap = file_map.release();
        mpoMemoryMap = memory_map.release();
        mpoMemoryStack = memory_stack.release();
        ForgetSites();
    }

    static MemoryUsage& UsageOf(const char* file, int line) {
        const auto address = reinterpret_cast<std::uintptr_t>(file);
        const std::uint64_t mixed =
            (address + std::uintptr_t{31} * static_cast<unsigned int>(line)) * kGoldenRatio;
        FileMap::value_type*& recent = maRecentSites[mixed >> (64 - kRecentSiteBits)];
        if (recent == nullptr || recent->first != CallSite(file, line))
            recent = &*mpoFileMap->try_emplace(CallSite(file, line)).first;
        return recent->second;
    }

    static void ForgetSites() { maRecentSites.fill(nullptr); }

    // Does nothing if there is a block at `ptr`.
    static void AddBlock(void* ptr, const MemoryBlock& block) {
        SpareNodes& spare = *mpoSpareNodes;
        if (spare.mnCount == 0) {
            mpoMemoryMap->emplace(ptr, block);
            return;
        }
        MemoryMap::node_type& node = spare.maNodes[spare.mnCount - 1];
        node.key() = ptr;
        node.mapped() = block;
        mpoMemoryMap->insert(mpoMemoryMap->cend(), std::move(node));
        if (node.empty()) --spare.mnCount;  // NOLINT(bugprone-use-after-move): a node not taken stays in it
    }

    static void DropBlock(MemoryMap::const_iterator block) {
        SpareNodes& spare = *mpoSpareNodes;
        if (spare.mnCount < spare.maNodes.size()) {
            spare.maNodes[spare.mnCount++] = mpoMemoryMap->extract(block);
        } else {
            mpoMemoryMap->erase(block);
        }
    }

private:
    static constexpr int kRecentSiteBits = 8;
    static constexpr std::uint64_t kGoldenRatio = 0x9e3779b97f4a7c15;  // 2^64 over it: spreads any input

    struct SpareNodes {
        std::array<MemoryMap::node_type, 64> maNodes;  // the first mnCount of them hold a node
        std::size_t mnCount = 0;
    };

    static inline SpareNodes* mpoSpareNodes = nullptr;  // made with the tables
    static inline std::array<FileMap::value_type*, 1U << kRecentSiteBits> maRecentSites{};
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
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr) return;
    mpoMemoryStack->push_back({*mpoFileMap, *mpoMemoryMap, mnTotalMemory, mnPeekMemory});
    Reset();
}

// The saved tables go right after, so they are handed over rather than copied; this needs no memory and so
// can't stop halfway.
void HMemory::Pop() {
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr || mpoMemoryStack->empty()) return;
    MemoryState& saved = mpoMemoryStack->back();
    Tracker::ForgetSites();
    *mpoFileMap = std::move(saved.moFileMap);
    *mpoMemoryMap = std::move(saved.moMemoryMap);
    mnTotalMemory = saved.mnSavedTotal;
    mnPeekMemory = saved.mnSavedPeek;
    mpoMemoryStack->pop_back();
}

void HMemory::Reset() {
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr) return;
    UsageReset();
    mpoMemoryMap->clear();
    mnTotalMemory = 0;
    mnPeekMemory = 0;
}

void HMemory::UsageReset() {
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr) return;
    Tracker::ForgetSites();
    mpoFileMap->clear();
}

HMemory& HMemory::operator=(const HMemory&) = default;
