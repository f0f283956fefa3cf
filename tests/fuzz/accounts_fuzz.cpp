// Any sequence of operations of the tracker, the ledger and the timers, beside models of a few lines.
#include <algorithm>
#include <cstdlib>
#include <map>
#include <string>
#include <vector>

#include "zanbase/snapshot.h"
#include "zanbase/zanbase.h"

namespace {

void Require(bool holds) {
    if (!holds) std::abort();
}

struct TrackerModel {
    struct State {
        std::map<void*, long long> blocks;
        long long total = 0, peak = 0;
    };
    State state;
    std::vector<State> saved;
    bool exists = false;

    void Check() const {
        const HMemorySnapshot snapshot = HMemorySnapshot::Take();
        Require(snapshot.mnTotal == state.total && snapshot.mnPeak == state.peak);
        long long blocks = 0, bytes = 0, expected_bytes = 0;
        for (const auto& row : snapshot.maRows) {
            blocks += row.mnLiveBlocks;
            bytes += row.mnLiveBytes;
        }
        for (const auto& block : state.blocks) expected_bytes += block.second;
        Require(blocks == static_cast<long long>(state.blocks.size()) && bytes == expected_bytes);
    }

    void Alloc(void* block, int size) {
        HMemory::Alloc(block, static_cast<std::size_t>(size), size % 2 == 0 ? "even" : "odd", size % 5);
        exists = true;
        state.blocks.emplace(block, size);
        state.total += size;
        state.peak = std::max(state.peak, state.total);
    }

    void Free(void* block) {
        HMemory::Free(block);
        const auto found = state.blocks.find(block);
        if (found == state.blocks.end()) return;
        state.total -= found->second;
        state.blocks.erase(found);
    }

    void Push() {
        HMemory::Push();
        if (exists) saved.push_back(std::exchange(state, {}));
    }

    void Pop() {
        HMemory::Pop();
        if (saved.empty()) return;
        state = saved.back();
        saved.pop_back();
    }

    void Reset() {
        HMemory::Reset();
        state = {};
    }
};

struct LedgerModel {
    struct Record {
        long long opens = 0, reads = 0, bytes = 0;
    };
    struct State {
        std::map<std::string, Record> records;
        std::map<void*, std::string> names;
    };
    State state;
    std::vector<State> saved;

    void Check() const {
        const HDiskIOSnapshot snapshot = HDiskIOSnapshot::Take();
        Require(snapshot.maRows.size() == state.records.size());
        for (const auto& row : snapshot.maRows) {
            const Record& record = state.records.at(row.moName);
            Require(row.moOpen.mnCount == record.opens && row.moRead.mnCount == record.reads);
            Require(row.moRead.mnBytes == record.bytes);
        }
    }

    void Open(const std::string& name, void* handle) {
        HDiskIOOpen(name, handle, 1);
        state.names[handle] = name;
        ++state.records[name].opens;
    }

    void Map(const std::string& name, void* handle) {
        _HDiskIOMapFD(name, handle);
        state.names[handle] = name;
    }

    void Read(void* handle, unsigned int bytes) {
        HDiskIORead(handle, bytes, 1);
        const auto record = state.records.find(state.names[handle]);
        if (record == state.records.end()) return;
        ++record->second.reads;
        record->second.bytes += bytes;
    }

    void Push() {
        HDiskIOPush();
        saved.push_back(std::exchange(state, {}));
    }

    void Pop() {
        HDiskIOPop();
        if (saved.empty()) return;
        state = saved.back();
        saved.pop_back();
    }

    void Reset() {
        HDiskIOReset();
        state = {};
    }
};

unsigned long long timer_count = 0;  // of the process: timers stay

void Time(int operand) {
    GlobalTimer& timers = GlobalTimer::GetInstance();
    if (timer_count < 32) {
        Require(timers.RegisterNewTimer(std::to_string(timer_count)) == timer_count);
        ++timer_count;
    }
    if (operand % 8 == 0) {
        timers.ResetAll();
        for (const auto& row : GlobalTimerSnapshot::Take().maRows) Require(row.mdSeconds == 0);
    }
    timers.Toggle(static_cast<unsigned long long>(operand) % timer_count);
    const GlobalTimerSnapshot snapshot = GlobalTimerSnapshot::Take();
    Require(snapshot.maRows.size() == timer_count &&
            snapshot.maRows.back().moName == std::to_string(timer_count - 1));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, std::size_t size) {
    static char places[16];
    static TrackerModel tracker;
    static LedgerModel ledger;
    for (std::size_t i = 0; i + 1 < size; i += 2) {
        const int operand = data[i + 1];
        void* const place = &places[operand % 16];
        const std::string name(static_cast<std::size_t>(operand / 16), 'n');
        switch (data[i] % 13) {
            case 0:
            case 1:
                tracker.Alloc(place, operand / 16);
                break;
            case 2:
                tracker.Free(place);
                break;
            case 3:
                tracker.Push();
                break;
            case 4:
                tracker.Pop();
                break;
            case 5:
                operand == 0 ? tracker.Reset() : HMemory::UsageReset();
                break;
            case 6:
                ledger.Open(name, place);
                break;
            case 7:
                ledger.Map(name, place);
                break;
            case 8:
                ledger.Read(place, static_cast<unsigned int>(operand));
                break;
            case 9:
                ledger.Push();
                break;
            case 10:
                ledger.Pop();
                break;
            case 11:
                if (operand == 0) ledger.Reset();
                break;
            case 12:
                Time(operand);
                break;
        }
        tracker.Check();
        ledger.Check();
    }
    while (!tracker.saved.empty()) tracker.Pop();
    while (!ledger.saved.empty()) ledger.Pop();
    tracker.Reset();
    ledger.Reset();
    return 0;
}
