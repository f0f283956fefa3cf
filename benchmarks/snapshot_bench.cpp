// Snapshots beside copies of the tables, and the texts of 100,000 rows beside a plain copy of as many bytes.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <ostream>
#include <streambuf>
#include <string>
#include <vector>

#include "ratios.h"
#include "zanbase/memory.h"
#include "zanbase/memory_tables.h"
#include "zanbase/snapshot_text.h"

namespace {

constexpr int kRows = 100000;

// Reads the tracker's tables as a derived class may.
class Tables : public HMemory {
public:
    static void Copy() {
        const HMutexLock lock(&moMutex);
        const FileMap sites(*mpoFileMap);
        const MemoryMap blocks(*mpoMemoryMap);
        benchmark::DoNotOptimize(sites.size() + blocks.size());
    }
};

// A live block for each of 100,000 call sites in 1000 files.
void FillTracker() {
    static const std::vector<std::string> files = [] {
        std::vector<std::string> names;
        for (int file = 0; file < 1000; ++file)
            names.push_back("/project/src/module/source_" + std::to_string(file) + ".cpp");
        return names;
    }();
    for (int row = 0; row < kRows; ++row) {
        void* const block = reinterpret_cast<void*>(std::uintptr_t{0x100000} +
                                                    std::uintptr_t{64} * static_cast<unsigned>(row));
        HMemory::Alloc(block, 48, files[static_cast<std::size_t>(row % 1000)].c_str(), row / 1000);
    }
}

void MemorySnapshot(benchmark::State& state) {
    FillTracker();
    for (auto _ : state) benchmark::DoNotOptimize(HMemorySnapshot::Take());
    HMemory::Reset();
}

void CopyOfTables(benchmark::State& state) {
    FillTracker();
    for (auto _ : state) Tables::Copy();
    HMemory::Reset();
}

BENCHMARK(MemorySnapshot);
BENCHMARK(CopyOfTables);

// Counts the bytes and drops them.
class CountingBuffer : public std::streambuf {
public:
    std::int64_t mnBytes = 0;

private:
    std::streamsize xsputn(const char*, std::streamsize size) override {
        mnBytes += size;
        return size;
    }
};

template <class Write>
void Text(benchmark::State& state, Write write) {
    FillTracker();
    const HMemorySnapshot memory = HMemorySnapshot::Take();
    HMemory::Reset();
    CountingBuffer buffer;
    std::ostream stream(&buffer);
    for (auto _ : state) write(stream, memory);
    state.SetBytesProcessed(buffer.mnBytes);
}

void JsonText(benchmark::State& state) {
    Text(state, [](std::ostream& stream, const HMemorySnapshot& memory) { HWriteJson(stream, memory); });
}
void CsvText(benchmark::State& state) {
    Text(state, [](std::ostream& stream, const HMemorySnapshot& memory) { HWriteCsv(stream, memory); });
}

BENCHMARK(JsonText);
BENCHMARK(CsvText);

const bool rows = AddRatio("MemorySnapshot", "CopyOfTables", 2.0);

}  // namespace
