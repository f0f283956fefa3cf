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

// Makes a push, a pop and a reset on the real account and on the state of the model.
template <class State>
struct Model {
    void (*const push)();
    void (*const pop)();
    void (*const reset)();
    State state = {};
    std::vector<State> saved = {};

    void Push() {
        push();
        saved.push_back(std::exchange(state, {}));
    }
    void Pop() {
        pop();
        if (saved.empty()) return;
        state = saved.back();
        saved.pop_back();
    }
    void Reset() {
        reset();
        state = {};
    }
    void Empty() {
        while (!saved.empty()) Pop();
        Reset();
    }
};

struct TrackerState {
    std::map<void*, long long> blocks;
    long long total = 0, peak = 0;
};

struct TrackerModel : Model<TrackerState> {
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
};

// Of opens, closes, seeks, reads and writes the number; of reads and writes the bytes.
using Record = std::array<long long, 7>;

struct LedgerState {
    std::map<std::string, Record> records;
    std::map<void*, std::string> names;
};

struct LedgerModel : Model<LedgerState> {
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

    void Operate(void* handle, std::size_t operation, std::size_t bytes) {
        if (operation == 1) HDiskIOClose(handle, 1);
        if (operation == 2) HDiskIOSeek(handle, 1);
        if (operation == 3) HDiskIORead(handle, bytes, 1);
        if (operation == 4) HDiskIOWrite(handle, bytes, 1);
        const auto bound = state.names.find(handle);
        const auto record = state.records.find(bound == state.names.end() ? std::string() : bound->second);
        if (record == state.records.end()) return;
        ++record->second[operation];
        if (operation >= 3) record->second[operation + 2] += static_cast<long long>(bytes);
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

TrackerModel tracker{{HMemory::Push, HMemory::Pop, HMemory::Reset}};
LedgerModel ledger{{HDiskIOPush, HDiskIOPop, HDiskIOReset}};

struct Operands {
    void* place;
    int number;  // one byte
    std::string name;
};

void (*const kOperations[])(const Operands&) = {
    [](const Operands& on) { tracker.Alloc(on.place, on.number / 16); },
    [](const Operands& on) { tracker.Alloc(on.place, on.number / 16); },
    [](const Operands& on) { tracker.Free(on.place); },
    [](const Operands&) { tracker.Push(); },
    [](const Operands&) { tracker.Pop(); },
    [](const Operands& on) { on.number < 16 ? tracker.Reset() : HMemory::UsageReset(); },
    [](const Operands& on) { ledger.Open(on.name, on.place); },
    [](const Operands& on) { ledger.Map(on.name, on.place); },
    [](const Operands& on) { ledger.Operate(on.place, 1 + on.name.size() % 4, on.name.size()); },
    [](const Operands&) { ledger.Push(); },
    [](const Operands& on) { on.number < 16 ? ledger.Reset() : ledger.Pop(); },
    [](const Operands& on) { Time(on.number); },
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, std::size_t size) {
    static char places[16];
    tracker.Alloc(places, 0);  // before the first one a push saves nothing
    for (std::size_t i = 0; i + 1 < size; i += 2) {
        const int number = data[i + 1];
        const std::string name(static_cast<std::size_t>(number / 16), 'n');
        kOperations[data[i] % std::size(kOperations)]({&places[number % 16], number, name});
        tracker.Check();
        ledger.Check();
    }
    tracker.Empty();
    ledger.Empty();
    return 0;
}
