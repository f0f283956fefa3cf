// The tracker beside a plain one: two maps of the standard library under its re-entrant mutex.
#include <benchmark/benchmark.h>

#include <cstddef>
#include <cstdint>
#include <functional>
#include <mutex>
#include <random>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "ratios.h"
#include "zanbase/memory.h"

namespace {

class PlainTracker {
public:
    void Alloc(void* ptr, std::size_t size, const char* file, int line) {
        const std::lock_guard<std::recursive_mutex> lock(mutex_);
        Usage& usage = sites_[{file, line}];
        ++usage.alloc_count;
        usage.allocated += size;
        blocks_.emplace(ptr, Block{size, file, line});
        total_ += size;
        if (total_ > peak_) peak_ = total_;
    }

    void Free(void* ptr) {
        const std::lock_guard<std::recursive_mutex> lock(mutex_);
        const auto block = blocks_.find(ptr);
        if (block == blocks_.end()) return;
        Usage& usage = sites_[{block->second.file, block->second.line}];
        ++usage.free_count;
        usage.freed += block->second.size;
        total_ -= block->second.size;
        blocks_.erase(block);
    }

    void Reset() {
        blocks_.clear();
        sites_.clear();
    }

private:
    using Site = std::pair<const char*, int>;
    struct Usage {
        std::size_t allocated = 0, freed = 0;
        unsigned int alloc_count = 0, free_count = 0;
    };
    struct Block {
        std::size_t size;
        const char* file;
        int line;
    };
    struct SiteHash {
        std::size_t operator()(const Site& site) const {
            const std::size_t seed = std::hash<const char*>()(site.first);
            return seed ^ (std::hash<int>()(site.second) + 0x9e3779b9 + (seed << 6) + (seed >> 2));
        }
    };

    std::recursive_mutex mutex_;
    std::unordered_map<Site, Usage, SiteHash> sites_;
    std::unordered_map<void*, Block> blocks_;
    std::size_t total_ = 0, peak_ = 0;
};

struct OurTracker {
    void Alloc(void* ptr, std::size_t size, const char* file, int line) {
        HMemory::Alloc(ptr, size, file, line);
    }
    void Free(void* ptr) { HMemory::Free(ptr); }
    void Reset() { HMemory::Reset(); }
};

PlainTracker plain_tracker;
OurTracker our_tracker;

enum Order { kNewest, kAny };  // which block is freed next

// `live` blocks of 128 call sites, at addresses as an allocator gives them; each step drops one and records
// one.
template <class Tracker>
void Steps(benchmark::State& state, Tracker& tracker) {
    static const char* const kFiles[] = {"/project/src/a.cpp", "/project/src/b.cpp", "/project/src/c.cpp",
                                         "/project/src/d.cpp"};
    std::mt19937 random(1);
    std::vector<void*> blocks(static_cast<std::size_t>(state.range(0)));
    std::uintptr_t address = 0x5000000;
    for (void*& block : blocks) block = reinterpret_cast<void*>(address += 32 + random() % 12 * 16);
    std::vector<void*> turns(1U << 20, blocks.back());
    if (state.range(1) == kAny) {
        for (void*& turn : turns) turn = blocks[random() % blocks.size()];
    }

    tracker.Reset();
    unsigned int site = 0;
    const auto alloc = [&](void* block) {
        tracker.Alloc(block, 64, kFiles[site % 4], static_cast<int>(site / 4));
        site = (site + 1) % 128;
    };
    for (void* block : blocks) alloc(block);
    std::size_t step = 0;
    for (auto _ : state) {
        void* const block = turns[step++ % turns.size()];
        tracker.Free(block);
        alloc(block);
    }
    tracker.Reset();
}

void TrackerPair(benchmark::State& state) { Steps(state, our_tracker); }
void PlainTrackerPair(benchmark::State& state) { Steps(state, plain_tracker); }

void Sizes(benchmark::internal::Benchmark* bench) {
    bench->ArgNames({"live", "order"});
    bench->ArgsProduct({{1000, 4000, 100000, 1000000}, {kNewest, kAny}});
}
BENCHMARK(TrackerPair)->Apply(Sizes);
BENCHMARK(PlainTrackerPair)->Apply(Sizes);

bool AddRows() {
    for (const std::string order : {"/order:0", "/order:1"}) {
        for (const std::string live : {"1000", "4000", "100000", "1000000"}) {
            const std::string name = "TrackerPair/live:" + live + order;
            const double goal = live == "1000000" ? 1.2 : live == "100000" ? 0 : 0.9;
            AddRatio(name, "Plain" + name, goal);
        }
        AddRatio("TrackerPair/live:1000000" + order, "TrackerPair/live:1000" + order, 4.0);
    }
    return true;
}
const bool rows = AddRows();

}  // namespace
