// The report: both accounts as snapshots, from there the library's own tables or its writers for other
// programs.
#include "report.h"

#include <algorithm>
#include <map>
#include <sstream>
#include <utility>
#include <vector>

#include "block_table.h"
#include "budgets.h"
#include "diskio/disk_io_report_text.h"
#include "files.h"
#include "memory/memory_report_text.h"
#include "sites.h"
#include "source_lines.h"
#include "zanbase/snapshot_text.h"

namespace recorder {
namespace {

void Add(HMemorySnapshot::Row& row, const SiteUsage& usage) {
    row.mnLiveBlocks += static_cast<long long>(usage.allocations - usage.frees);
    row.mnLiveBytes += static_cast<long long>(usage.allocated_bytes - usage.freed_bytes);
    row.mnAllocated += static_cast<long long>(usage.allocated_bytes);
    row.mnFreed += static_cast<long long>(usage.freed_bytes);
    row.mnAllocCount += static_cast<long long>(usage.allocations);
    row.mnFreeCount += static_cast<long long>(usage.frees);
}

// Many return addresses can stand for one line.
HMemorySnapshot TakeMemory() {
    std::map<std::pair<std::string, int>, HMemorySnapshot::Row> rows;
    const std::vector<SiteText> sites = DescribeSites();
    for (std::size_t site = 0; site < sites.size(); ++site) {
        const SiteUsage usage = UsageOfSite(static_cast<SiteId>(site));
        if (usage.allocations == 0) continue;
        HMemorySnapshot::Row& row = rows[{sites[site].file, sites[site].line}];
        row.moFile = sites[site].file;
        row.mnLine = sites[site].line;
        Add(row, usage);
    }
    HMemorySnapshot memory;
    for (auto& [key, row] : rows) memory.maRows.push_back(std::move(row));
    memory.mnTotal = static_cast<long long>(TotalBytes());
    memory.mnPeak = static_cast<long long>(PeakBytes());
    return memory;
}

void Add(HDiskIOSnapshot::Operation& operation, const OperationSum& sum) {
    operation.mnCount += static_cast<long long>(sum.count);
    operation.mdSeconds += static_cast<double>(sum.nanoseconds) / 1e9;
    operation.mnBytes += static_cast<long long>(sum.bytes);
}

HDiskIOSnapshot TakeDisk() {
    std::map<std::string, HDiskIOSnapshot::Row> rows;
    for (const NamedSums& file : ListFiles()) {
        const auto is_used = [](const OperationSum& sum) { return sum.count != 0; };
        if (std::none_of(file.sums.begin(), file.sums.end(), is_used)) continue;
        HDiskIOSnapshot::Row& row = rows[file.name];
        row.moName = file.name;
        Add(row.moOpen, file.sums[static_cast<std::size_t>(DiskOperation::kOpen)]);
        Add(row.moClose, file.sums[static_cast<std::size_t>(DiskOperation::kClose)]);
        Add(row.moSeek, file.sums[static_cast<std::size_t>(DiskOperation::kSeek)]);
        Add(row.moRead, file.sums[static_cast<std::size_t>(DiskOperation::kRead)]);
        Add(row.moWrite, file.sums[static_cast<std::size_t>(DiskOperation::kWrite)]);
    }
    HDiskIOSnapshot disk;
    for (auto& [name, row] : rows) disk.maRows.push_back(std::move(row));
    return disk;
}

std::string MemoryTables(const HMemorySnapshot& memory) {
    std::vector<LeakGroup> groups;
    std::vector<UsageRow> rows;
    for (const HMemorySnapshot::Row& row : memory.maRows) {
        const char* const file = row.moFile.c_str();
        if (row.mnLiveBlocks != 0)
            groups.push_back({static_cast<std::size_t>(row.mnLiveBytes), static_cast<int>(row.mnLiveBlocks),
                              file, row.mnLine});
        rows.push_back({file, row.mnLine, static_cast<std::size_t>(row.mnAllocated),
                        static_cast<std::size_t>(row.mnFreed), static_cast<unsigned int>(row.mnAllocCount),
                        static_cast<unsigned int>(row.mnFreeCount)});
    }
    std::string text;
    const auto add = [&text](const std::string& part) { text += part; };
    if (!groups.empty()) WriteLeakReport(groups, add);
    if (!rows.empty()) WriteUsageReport(rows, static_cast<std::size_t>(memory.mnPeak), add);
    return text;
}

std::string DiskTables(const HDiskIOSnapshot& disk) {
    if (disk.maRows.empty()) return {};
    DiskIOFileMap files;
    for (const HDiskIOSnapshot::Row& row : disk.maRows) {
        DiskIOUsage& usage = files[row.moName];
        const auto count = [](const HDiskIOSnapshot::Operation& operation) {
            return static_cast<unsigned int>(operation.mnCount);
        };
        usage.mdOpenTime = row.moOpen.mdSeconds;
        usage.mnOpenCount = count(row.moOpen);
        usage.mdCloseTime = row.moClose.mdSeconds;
        usage.mnCloseCount = count(row.moClose);
        usage.mdSeekTime = row.moSeek.mdSeconds;
        usage.mnSeekCount = count(row.moSeek);
        usage.mdReadTime = row.moRead.mdSeconds;
        usage.mnReadCount = count(row.moRead);
        usage.mnReadSize = static_cast<unsigned long long>(row.moRead.mnBytes);
        usage.mdWriteTime = row.moWrite.mdSeconds;
        usage.mnWriteCount = count(row.moWrite);
        usage.mnWriteSize = static_cast<unsigned long long>(row.moWrite.mnBytes);
    }
    std::string text = DiskIOSummaryText(files);
    text += kDiskIOUsageTitle;
    const std::vector<std::string> used = DiskIOUsedFiles(files);
    if (used.empty()) text += kDiskIONoUsage;
    for (const std::string& name : used) text += DiskIOFileText(name, files.at(name));
    return text;
}

std::string Notes() {
    std::string notes;
    if (LostBlocks() != 0)
        notes +=
            "zanbase-record: memory ran out; blocks that were not recorded: " + std::to_string(LostBlocks()) +
            "\n";
    if (!CanReadLines()) notes += "zanbase-record: built without libdw: sites are functions, not lines\n";
    return notes;
}

}  // namespace

std::string ReportText(const Settings& settings, std::string* broken) {
    const HMemorySnapshot memory = settings.memory ? TakeMemory() : HMemorySnapshot{};
    const HDiskIOSnapshot disk = settings.disk ? TakeDisk() : HDiskIOSnapshot{};
    if (broken != nullptr) *broken = BrokenBudgets(settings.budgets, memory, disk);
    std::ostringstream text;
    switch (settings.format) {
        case Format::kJson:
            HWriteJson(text, settings.memory ? &memory : nullptr, settings.disk ? &disk : nullptr, nullptr);
            break;
        case Format::kCsv:
            if (settings.memory) HWriteCsv(text, memory);
            if (settings.memory && settings.disk) text << '\n';
            if (settings.disk) HWriteCsv(text, disk);
            break;
        case Format::kFolded:
            HWriteFoldedStacks(text, memory, HMemoryFigure::kAllocated);
            break;
        case Format::kTables:
            if (settings.memory) text << MemoryTables(memory);
            if (settings.disk) text << DiskTables(disk);
            text << Notes();
            break;
    }
    return text.str();
}

}  // namespace recorder
