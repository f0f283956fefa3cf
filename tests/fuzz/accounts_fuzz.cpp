// Any sequence of operations of the tracker, the ledger and the timers, beside models of a few lines.
#include <algorithm>
#include <array>
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
    // Of opens, closes, seeks, reads and writes the number; of reads and writes the bytes.
    using Record = std::array<long long, 7>;
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
            const Record found{row.moOpen.mnCount, row.moClose.mnCount, row.moSeek.mnCount,
                               row.moRead.mnCount, row.moWrite.mnCount, row.moRead.mnBytes,
                               row.moWrite.mnBytes};
            Require(found == state.records.at(row.moName));
            Require(row.moSeek.mdSeconds == static_cast<double>(row.moSeek.mnCount));
        }
        for (const auto& [handle, name] : state.names) Require(HDiskIOGetFilename(handle) == name);
    }

    void Open(const std::string& name, void* handle) {
        HDiskIOOpen(name, handle, 1);
        state.names[handle] = name;
        ++state.records[name][0];
    }

    void Map(const std::string& name, void* handle) {
        _HDiskIOMapFD(name, handle);
        state.names[handle] = name;
    }

    void Operate(void* handle, std::size_t operation, unsigned int bytes) {
        if (operation == 1) HDiskIOClose(handle, 1);
        if (operation == 2) HDiskIOSeek(handle, 1);
        if (operation == 3) HDiskIORead(handle, bytes, 1);
        if (operation == 4) HDiskIOWrite(handle, bytes, 1);
        const auto bound = state.names.find(handle);
        const auto record = state.records.find(bound == state.names.end() ? std::string() : bound->second);
        if (record == state.records.end()) return;
        ++record->second[operation];
        if (operation >= 3) record->second[operation + 2] += bytes;
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

// Of the process: timers stay. Which run, and what each has added up.
std::vector<bool> timer_runs;
std::vector<double> timer_seconds;

void Time(int operand) {
    GlobalTimer& timers = GlobalTimer::GetInstance();
    if (timer_runs.size() < 32) {
        Require(timers.RegisterNewTimer(std::to_string(timer_runs.size())) == timer_runs.size());
        timer_runs.push_back(false);
        timer_seconds.push_back(0);
    }
    const std::size_t timer = static_cast<std::size_t>(operand) % timer_runs.size();
    if (operand % 64 == 0) {
        timers.ResetAll();
        timer_runs.assign(timer_runs.size(), false);
        timer_seconds.assign(timer_seconds.size(), 0);
    }
    timers.Toggle(timer);
    timer_runs[timer] = !timer_runs[timer];
    const GlobalTimerSnapshot snapshot = GlobalTimerSnapshot::Take();
    Require(snapshot.maRows.size() == timer_runs.size());
    for (std::size_t id = 0; id < timer_runs.size(); ++id) {
        const bool has_stopped = id == timer && !timer_runs[id];
        Require(snapshot.maRows[id].moName == std::to_string(id));
        if (has_stopped) timer_seconds[id] = std::max(timer_seconds[id], snapshot.maRows[id].mdSeconds);
        Require(snapshot.maRows[id].mdSeconds == timer_seconds[id]);
    }
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
                ledger.Operate(place, static_cast<std::size_t>(1 + operand / 16 % 4), data[i + 1]);
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
