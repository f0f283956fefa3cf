// The disk ledger beside the plain way: an ordered map from handle to name and one from name to record, under
// the standard library's re-entrant mutex.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <map>
#include <mutex>
#include <random>
#include <string>
#include <vector>

#include "ratios.h"
#include "zanbase/disk_io.h"

namespace {

class PlainLedger {
public:
    void Open(const std::string& name, void* handle, double seconds) {
        const std::lock_guard<std::recursive_mutex> lock(mutex_);
        names_[handle] = name;
        Usage& usage = files_[name];
        usage.open_time += seconds;
        ++usage.open_count;
    }

    void Read(void* handle, unsigned long long bytes, double seconds) {
        const std::lock_guard<std::recursive_mutex> lock(mutex_);
        const auto name = names_.find(handle);
        if (name == names_.end()) return;
        const auto file = files_.find(name->second);
        if (file == files_.end()) return;
        file->second.read_time += seconds;
        ++file->second.read_count;
        file->second.read_size += bytes;
    }

    void Reset() {
        names_.clear();
        files_.clear();
    }

private:
    struct Usage {
        double open_time = 0, close_time = 0, seek_time = 0, read_time = 0, write_time = 0;
        unsigned int open_count = 0, close_count = 0, seek_count = 0, read_count = 0, write_count = 0;
        unsigned long long read_size = 0, write_size = 0;
    };

    std::recursive_mutex mutex_;
    std::map<void*, std::string> names_;
    std::map<std::string, Usage> files_;
};

struct OurLedger {
    void Open(const std::string& name, void* handle, double seconds) { HDiskIOOpen(name, handle, seconds); }
    void Read(void* handle, unsigned long long bytes, double seconds) { HDiskIORead(handle, bytes, seconds); }
    void Reset() { HDiskIOReset(); }
};

PlainLedger plain_ledger;
OurLedger our_ledger;

// Reads of files in no order, each under a name and a handle of its own.
template <class Ledger>
void Reads(benchmark::State& state, Ledger& ledger) {
    const auto files = static_cast<std::size_t>(state.range(0));
    std::mt19937 random(1);
    std::vector<void*> handles;
    std::uintptr_t address = 0x5000000;
    ledger.Reset();
    for (std::size_t file = 0; file < files; ++file) {
        handles.push_back(reinterpret_cast<void*>(address += 512 + random() % 8 * 16));
        ledger.Open("/data/run/part" + std::to_string(file) + ".dat", handles.back(), 0.001);
    }
    std::vector<void*> turns(1U << 18);
    for (void*& turn : turns) turn = handles[random() % files];
    std::size_t step = 0;
    for (auto _ : state) ledger.Read(turns[step++ % turns.size()], 65536, 0.0001);
    ledger.Reset();
}

void LedgerRead(benchmark::State& state) { Reads(state, our_ledger); }
void PlainLedgerRead(benchmark::State& state) { Reads(state, plain_ledger); }
BENCHMARK(LedgerRead)->ArgName("files")->Arg(1)->Arg(1000)->Arg(100000);
BENCHMARK(PlainLedgerRead)->ArgName("files")->Arg(1)->Arg(1000)->Arg(100000);

const bool rows = AddRatio("LedgerRead/files:1", "PlainLedgerRead/files:1", 0.7) &&
                  AddRatio("LedgerRead/files:1000", "PlainLedgerRead/files:1000", 0.4) &&
                  AddRatio("LedgerRead/files:100000", "PlainLedgerRead/files:100000", 0.4);

}  // namespace
