// The accounts as OpenMetrics text, which monitoring systems scrape.
#include <string_view>

#include "snapshot/text_sink.h"
#include "zanbase/account_data.h"

namespace {

// The value of a label: backslash, quote and line end are escaped; other control bytes are allowed.
void AddLabel(TextSink& sink, std::string_view separator, std::string_view key, const HTextData& text) {
    sink.Add(separator).Add(key).Add("=\"");
    sink.AddUtf8(ViewOf(text), [](char byte) -> std::string_view {
        if (byte == '\\') return "\\\\";
        if (byte == '"') return "\\\"";
        return byte == '\n' ? "\\n" : "";
    });
    sink.Add("\"");
}

// A family of metrics. The name has the unit at its end, as the format requires.
struct Family {
    std::string_view name, type, unit, help;
};

void AddHead(TextSink& sink, const Family& family) {
    sink.Add("# TYPE ").Add(family.name).Add(" ").Add(family.type).Add("\n");
    if (!family.unit.empty()) sink.Add("# UNIT ").Add(family.name).Add(" ").Add(family.unit).Add("\n");
    sink.Add("# HELP ").Add(family.name).Add(" ").Add(family.help).Add("\n");
}

// The name of a sample: that of a counter has a suffix.
TextSink& AddName(TextSink& sink, const Family& family) {
    return sink.Add(family.name).Add(family.type == "counter" ? "_total" : "");
}

template <class Number>
void AddValue(TextSink& sink, Number value) {
    sink.Add(" ").AddNumber(value).Add("\n");
}

void AddValue(TextSink& sink, double value) { sink.Add(" ").AddNumber(value, "NaN").Add("\n"); }

void AddSingle(TextSink& sink, const Family& family, long long value) {
    AddHead(sink, family);
    AddValue(AddName(sink, family), value);
}

// Rows of one key must not appear twice, so those that follow each other are added up.
bool IsSameSite(const HMemorySiteData& one, const HMemorySiteData& other) {
    return one.mnLine == other.mnLine && ViewOf(one.moFile) == ViewOf(other.moFile);
}

void AddSites(TextSink& sink, const HMemoryData& memory, const Family& family,
              long long HMemorySiteData::*figure) {
    AddHead(sink, family);
    for (std::size_t index = 0; index < memory.mnRows;) {
        const HMemorySiteData& row = memory.mpoRows[index];
        unsigned long long sum = 0;
        for (; index < memory.mnRows && IsSameSite(row, memory.mpoRows[index]); ++index)
            sum += static_cast<unsigned long long>(memory.mpoRows[index].*figure);
        AddLabel(AddName(sink, family), "{", "file", row.moFile);
        sink.Add(",line=\"").AddNumber(static_cast<long long>(row.mnLine)).Add("\"}");
        AddValue(sink, static_cast<long long>(sum));
    }
}

void AddMemory(TextSink& sink, const HMemoryData& memory) {
    using Site = HMemorySiteData;
    AddSingle(sink, {"zanbase_memory_live_bytes", "gauge", "bytes", "Recorded and not yet freed."},
              memory.mnTotal);
    AddSingle(sink, {"zanbase_memory_peak_bytes", "gauge", "bytes", "The highest live total."},
              memory.mnPeak);
    AddSites(sink, memory, {"zanbase_memory_site_live_bytes", "gauge", "bytes", "Live bytes of a call site."},
             &Site::mnLiveBytes);
    AddSites(sink, memory, {"zanbase_memory_site_live_blocks", "gauge", "", "Live blocks of a call site."},
             &Site::mnLiveBlocks);
    AddSites(sink, memory,
             {"zanbase_memory_site_allocated_bytes", "counter", "bytes", "Allocated by a call site."},
             &Site::mnAllocated);
    AddSites(sink, memory, {"zanbase_memory_site_allocations", "counter", "", "Allocations of a call site."},
             &Site::mnAllocCount);
}

struct NamedOperation {
    std::string_view name;
    HDiskIOOperation HDiskIOFileData::*operation;
    bool moves_bytes;
};

constexpr NamedOperation kOperations[] = {{"open", &HDiskIOFileData::moOpen, false},
                                          {"close", &HDiskIOFileData::moClose, false},
                                          {"seek", &HDiskIOFileData::moSeek, false},
                                          {"read", &HDiskIOFileData::moRead, true},
                                          {"write", &HDiskIOFileData::moWrite, true}};

template <class Figure>
void AddFiles(TextSink& sink, const HDiskIOData& disk_io, const Family& family,
              Figure HDiskIOOperation::*figure, bool all_operations) {
    AddHead(sink, family);
    for (std::size_t index = 0; index < disk_io.mnRows; ++index) {
        for (const auto& [name, operation, moves_bytes] : kOperations) {
            if (!all_operations && !moves_bytes) continue;
            const HDiskIOFileData& row = disk_io.mpoRows[index];
            AddLabel(AddName(sink, family), "{", "name", row.moName);
            sink.Add(",operation=\"").Add(name).Add("\"}");
            AddValue(sink, row.*operation.*figure);
        }
    }
}

void AddDiskIO(TextSink& sink, const HDiskIOData& disk_io) {
    AddFiles(sink, disk_io, {"zanbase_disk_io_operations", "counter", "", "Operations on a file."},
             &HDiskIOOperation::mnCount, true);
    AddFiles(sink, disk_io,
             {"zanbase_disk_io_operation_seconds", "counter", "seconds", "Time of operations on a file."},
             &HDiskIOOperation::mdSeconds, true);
    AddFiles(sink, disk_io, {"zanbase_disk_io_moved_bytes", "counter", "bytes", "Bytes read or written."},
             &HDiskIOOperation::mnBytes, false);
}

// Timers may have equal names; the number keeps them apart.
void AddTimers(TextSink& sink, const HTimerData& timers, const Family& family,
               double HTimerRowData::*figure) {
    AddHead(sink, family);
    for (std::size_t index = 0; index < timers.mnRows; ++index) {
        const HTimerRowData& row = timers.mpoRows[index];
        AddLabel(AddName(sink, family), "{", "name", row.moName);
        sink.Add(",timer=\"").AddNumber(static_cast<long long>(index)).Add("\"}");
        AddValue(sink, row.*figure);
    }
}

}  // namespace

bool HWriteOpenMetricsData(const HTextOutput& output, const HMemoryData* memory, const HDiskIOData* diskIO,
                           const HTimerData* timers) {
    TextSink sink(output);
    if (memory != nullptr) AddMemory(sink, *memory);
    if (diskIO != nullptr) AddDiskIO(sink, *diskIO);
    if (timers != nullptr) {
        AddTimers(sink, *timers,
                  {"zanbase_timer_seconds", "counter", "seconds", "Finished intervals of a timer."},
                  &HTimerRowData::mdSeconds);
        AddTimers(sink, *timers,
                  {"zanbase_timer_open_seconds", "gauge", "seconds", "Open intervals of a timer."},
                  &HTimerRowData::mdOpenSeconds);
    }
    return sink.Add("# EOF\n").Finish();
}
