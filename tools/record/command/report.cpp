// Reports: accounts of processes as snapshots, and from there texts.
#include "report.h"

#include <algorithm>
#include <array>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <map>
#include <sstream>
#include <utility>

#include <sys/wait.h>
#include <nlohmann/json.hpp>

#include "diskio/disk_io_report_text.h"
#include "memory/memory_report_text.h"
#include "zanbase/snapshot_text.h"

namespace recorder {
namespace {

using Json = nlohmann::ordered_json;

constexpr std::size_t kListed = 20;  // sites and stacks that a text lists

[[gnu::format(printf, 1, 2)]] std::string FormatText(const char* format, ...) {
    std::array<char, 512> text{};
    va_list values;
    va_start(values, format);
    std::vsnprintf(text.data(), text.size(), format, values);
    va_end(values);
    return text.data();
}

long long Signed(std::uint64_t number) { return static_cast<long long>(number); }

void Add(HMemorySnapshot::Row& row, const StackUsage& usage) {
    row.mnLiveBlocks += Signed(usage.allocations - usage.frees);
    row.mnLiveBytes += Signed(usage.allocated - usage.freed);
    row.mnAllocated += Signed(usage.allocated);
    row.mnFreed += Signed(usage.freed);
    row.mnAllocCount += Signed(usage.allocations);
    row.mnFreeCount += Signed(usage.frees);
}

std::string BaseName(const std::string& path) { return path.substr(path.rfind('/') + 1); }

std::string SiteText(const HMemorySnapshot::Row& row) {
    return row.mnLine != 0 ? row.moFile + ":" + std::to_string(row.mnLine) : row.moFile;
}

// Adds the frames of one address, those that were inlined there first, from the place `first` on.
void AddFrames(const AddressInfo& info, std::size_t first, std::vector<std::string>& frames) {
    for (std::size_t i = first; i < info.places.size(); ++i) {
        const SourcePlace& place = info.places[i];
        if (place.file.empty()) {
            frames.push_back(info.name);
        } else {
            const std::string line = BaseName(place.file) + ":" + std::to_string(place.line);
            frames.push_back(place.function.empty() ? line : place.function + " (" + line + ")");
        }
    }
}

std::vector<std::string> FramesOf(const RecordedProcess& process, NodeId node, const RunOptions& options,
                                  Symbolizer& symbolizer) {
    std::vector<NodeId> path;  // from the caller that is farthest away
    const NodeId credited = process.stacks.CreditedNode(node);
    for (NodeId at = node; at != 0; at = at == credited ? 0 : process.account.nodes[at].parent)
        path.push_back(at);
    std::reverse(path.begin(), path.end());
    path.resize(std::min<std::size_t>(path.size(), static_cast<std::size_t>(options.callers) + 1));
    std::vector<std::string> frames;
    for (const NodeId at : path) {
        const AddressInfo& info = symbolizer.InfoOf(process.account, process.account.nodes[at].address);
        AddFrames(info, at == credited ? info.credited : 0, frames);
    }
    return frames;
}

// Many stacks can stand for one line.
void TakeMemory(const RunOptions& options, Symbolizer& symbolizer, Report& report) {
    std::map<std::pair<std::string, int>, std::pair<HMemorySnapshot::Row, RowDetails>> rows;
    std::map<std::vector<std::string>, StackFigures> stacks;
    std::map<std::pair<std::string, int>, long long> kept;
    for (const RecordedProcess* const process : report.processes) {
        for (const StackUsage& usage : process->account.usage) {
            Site site = process->stacks.SiteOf(usage.node, process->account, symbolizer);
            auto& [row, details] = rows[{site.file, site.line}];
            row.mnLine = site.line;
            row.moFile = site.file;
            Add(row, usage);
            details.figures.Add(usage);
            details.site = std::move(site);
            const long long live = Signed(usage.allocated - usage.freed);
            if (live > 0 &&
                process->stacks.IsKept(usage.node, process->account, symbolizer, options.suppressed))
                kept[{row.moFile, row.mnLine}] += live;
            if (options.callers > 0) stacks[FramesOf(*process, usage.node, options, symbolizer)].Add(usage);
        }
        report.memory.mnTotal += Signed(process->account.total);
        report.memory.mnPeak += Signed(process->account.peak);
    }
    for (auto& [key, row] : rows) {
        report.memory.maRows.push_back(std::move(row.first));
        report.sites.push_back(std::move(row.second));
    }
    report.leaks = report.memory;
    for (HMemorySnapshot::Row& row : report.leaks.maRows) {
        const long long bytes = kept[{row.moFile, row.mnLine}];
        row.mnLiveBytes -= bytes;
        report.leaks.mnTotal -= bytes;
    }
    for (auto& [frames, figures] : stacks) report.stacks.push_back({frames, figures});
    std::stable_sort(report.stacks.begin(), report.stacks.end(), [](const auto& one, const auto& other) {
        return one.figures.allocated > other.figures.allocated;
    });
}

void Add(HDiskIOSnapshot::Operation& operation, const OperationSum& sum) {
    operation.mnCount += Signed(sum.count);
    operation.mdSeconds += static_cast<double>(sum.nanoseconds) / 1e9;
    operation.mnBytes += Signed(sum.bytes);
}

void TakeDisk(Report& report) {
    std::map<std::string, HDiskIOSnapshot::Row> rows;
    for (const RecordedProcess* const process : report.processes) {
        for (const FileSums& file : process->account.files) {
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
    }
    for (auto& [name, row] : rows) report.disk.maRows.push_back(std::move(row));
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

// The tables have hundredths of seconds; many operations take less together.
std::string DiskTimes(const HDiskIOSnapshot& disk) {
    std::array<double, kDiskOperations> seconds{};
    for (const HDiskIOSnapshot::Row& row : disk.maRows) {
        const std::array parts{&row.moOpen, &row.moClose, &row.moSeek, &row.moRead, &row.moWrite};
        for (std::size_t i = 0; i < parts.size(); ++i) seconds[i] += parts[i]->mdSeconds;
    }
    return FormatText("Seconds: opens %.6f, closes %.6f, seeks %.6f, reads %.6f, writes %.6f\n", seconds[0],
                      seconds[1], seconds[2], seconds[3], seconds[4]);
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
    return text + DiskTimes(disk);
}

double ShareOf(long long part, long long whole) {
    return whole > 0 ? 100.0 * static_cast<double>(part) / static_cast<double>(whole) : 0;
}

// The sites that had most at the peak, and how many of their blocks lived for a moment only.
std::string PeakTable(const Report& report) {
    std::vector<std::size_t> order;
    for (std::size_t i = 0; i < report.sites.size(); ++i)
        if (report.sites[i].figures.at_peak > 0 || report.sites[i].figures.temporary > 0) order.push_back(i);
    std::stable_sort(order.begin(), order.end(), [&](std::size_t one, std::size_t other) {
        const StackFigures& left = report.sites[one].figures;
        const StackFigures& right = report.sites[other].figures;
        return std::pair(left.at_peak, left.temporary) > std::pair(right.at_peak, right.temporary);
    });
    if (order.empty()) return {};
    std::string text =
        "\nLive at the peak, and blocks that were freed before the next allocation:\n"
        "         bytes   share     blocks   share  call site\n";
    for (std::size_t i = 0; i < std::min(kListed, order.size()); ++i) {
        const StackFigures& figures = report.sites[order[i]].figures;
        text += FormatText("  %12lld %6.1f%% %10lld %6.1f%%  ", figures.at_peak,
                           ShareOf(figures.at_peak, report.memory.mnPeak), figures.temporary,
                           ShareOf(figures.temporary, figures.calls)) +
                SiteText(report.memory.maRows[order[i]]) + "\n";
    }
    if (order.size() > kListed)
        text += "  and " + std::to_string(order.size() - kListed) + " more call sites\n";
    return text;
}

std::string StackTable(const Report& report) {
    if (report.stacks.empty()) return {};
    std::string text = "\nStacks, the call site first:\n";
    for (std::size_t i = 0; i < std::min(kListed, report.stacks.size()); ++i) {
        const auto& [frames, figures] = report.stacks[i];
        text += FormatText("  %lld bytes in %lld calls, live %lld, at the peak %lld\n", figures.allocated,
                           figures.calls, figures.live, figures.at_peak);
        for (const std::string& frame : frames) text += "    " + frame + "\n";
    }
    if (report.stacks.size() > kListed)
        text += "  and " + std::to_string(report.stacks.size() - kListed) + " more stacks\n";
    return text;
}

std::string TimeText(std::int64_t nanoseconds) {
    const std::time_t seconds = nanoseconds / 1000000000;
    std::tm local{};
    localtime_r(&seconds, &local);
    std::array<char, 40> text{};
    std::strftime(text.data(), text.size(), "%Y-%m-%d %H:%M:%S %z", &local);
    return text.data();
}

std::string EndText(const RecordedProcess& process) {
    const ProcessAccount& account = process.account;
    if (account.end == End::kReplaced) return "replaced by another program (exec)";
    if (process.waited && WIFSIGNALED(process.wait_status))
        return FormatText("ended by signal %d (%s)", WTERMSIG(process.wait_status),
                          strsignal(WTERMSIG(process.wait_status)));
    if (process.waited) return FormatText("ended with status %d", WEXITSTATUS(process.wait_status));
    if (account.end == End::kExited) return FormatText("ended with status %d", account.status & 0xff);
    return process.is_gone ? "ended by a signal or a system call of its own" : "still running";
}

double SecondsOf(const ProcessAccount& account) {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    const std::int64_t end =
        account.ended != 0 ? account.ended : std::int64_t{now.tv_sec} * 1000000000 + now.tv_nsec;
    return static_cast<double>(end - account.started) / 1e9;
}

std::string HeaderText(const Report& report) {
    if (report.processes.size() != 1)
        return "zanbase-record: the sum of " + std::to_string(report.processes.size()) + " processes\n\n";
    const RecordedProcess& process = *report.processes.front();
    std::string text = "zanbase-record:";
    for (const std::string& word : process.account.arguments) text += " " + word;
    return text +
           FormatText("\n  process %d, parent %d, started %s, %.3f s, ", process.account.process,
                      process.account.parent, TimeText(process.account.started).c_str(),
                      SecondsOf(process.account)) +
           EndText(process) + "\n\n";
}

std::string TablesText(const Report& report, const RunOptions& options) {
    std::string text = HeaderText(report);
    if (options.memory) text += MemoryTables(report.memory) + PeakTable(report) + StackTable(report);
    if (options.disk) text += DiskTables(report.disk);
    for (const std::string& note : report.notes) text += "zanbase-record: " + note + "\n";
    return text;
}

Json RunJson(const Report& report) {
    if (report.processes.size() != 1) return {{"processes", report.processes.size()}};
    const RecordedProcess& process = *report.processes.front();
    const ProcessAccount& account = process.account;
    return {{"arguments", account.arguments}, {"process", account.process},
            {"parent", account.parent},       {"started", TimeText(account.started)},
            {"seconds", SecondsOf(account)},  {"end", EndText(process)}};
}

Json FiguresJson(const StackFigures& figures) {
    return {{"live_bytes", figures.live},
            {"allocated", figures.allocated},
            {"alloc_count", figures.calls},
            {"at_peak", figures.at_peak},
            {"temporary", figures.temporary}};
}

Json ReportJson(const Report& report, const RunOptions& options) {
    std::ostringstream text;
    HWriteJson(text, options.memory ? &report.memory : nullptr, options.disk ? &report.disk : nullptr,
               nullptr);
    Json json = Json::parse(text.str());
    json["run"] = RunJson(report);
    json["notes"] = report.notes;
    if (!options.memory) return json;
    Json& rows = json["memory"]["rows"];
    for (std::size_t i = 0; i < rows.size(); ++i) {
        const auto& [site, figures] = report.sites[i];
        rows[i]["at_peak"] = figures.at_peak;
        rows[i]["temporary"] = figures.temporary;
        if (site.function.empty()) continue;
        rows[i]["function"] = site.function;
        rows[i]["function_line"] = site.function_line;
    }
    for (const ReportedStack& stack : report.stacks) {
        Json entry = FiguresJson(stack.figures);
        entry["frames"] = stack.frames;
        json["memory"]["stacks"].push_back(std::move(entry));
    }
    return json;
}

std::string JsonText(const Json& json) {
    return json.dump(1, ' ', false, Json::error_handler_t::replace) + "\n";
}

std::string CsvText(const Report& report, const RunOptions& options) {
    std::ostringstream text;
    if (options.memory) HWriteCsv(text, report.memory);
    if (options.memory && options.disk) text << '\n';
    if (options.disk) HWriteCsv(text, report.disk);
    return text.str();
}

std::string FoldedText(const Report& report) {
    std::string text;
    for (const auto& [frames, figures] : report.stacks) {
        std::string line;
        for (auto frame = frames.rbegin(); frame != frames.rend(); ++frame) {
            std::string name = *frame;
            std::replace(name.begin(), name.end(), ';', '_');
            line += (line.empty() ? "" : ";") + name;
        }
        if (figures.allocated > 0) text += line + " " + std::to_string(figures.allocated) + "\n";
    }
    return text;
}

std::vector<std::string> NotesOf(const Report& report, const Symbolizer& symbolizer,
                                 const RunOptions& options) {
    std::vector<std::string> notes;
    std::uint64_t blocks = 0;
    std::uint64_t files = 0;
    bool streams_unseen = false;
    for (const RecordedProcess* const process : report.processes) {
        blocks += process->account.lost_blocks;
        files += process->account.lost_files;
        streams_unseen = streams_unseen || process->account.streams_unseen;
    }
    if (blocks != 0)
        notes.push_back("memory ran out; blocks that were not recorded: " + std::to_string(blocks));
    if (files != 0) notes.push_back("memory ran out; opens that were not recorded: " + std::to_string(files));
    if (streams_unseen && options.disk)
        notes.emplace_back("this C library's streams can't be recorded; of those, opens are counted only");
    if (options.memory && report.leaks.mnTotal != report.memory.mnTotal)
        notes.push_back("live bytes that the runtimes keep or that are suppressed: " +
                        std::to_string(report.memory.mnTotal - report.leaks.mnTotal));
    if (options.memory && !symbolizer.ModulesWithoutLines().empty()) {
        std::string note = "no debug information for:";
        for (const std::string& name : symbolizer.ModulesWithoutLines()) note += " " + name;
        notes.push_back(std::move(note));
    }
    return notes;
}

}  // namespace

void StackFigures::Add(const StackUsage& usage) {
    live += Signed(usage.allocated - usage.freed);
    allocated += Signed(usage.allocated);
    calls += Signed(usage.allocations);
    at_peak += Signed(usage.at_peak);
    temporary += Signed(usage.temporary);
}

Report MakeReport(const std::vector<const RecordedProcess*>& processes, const RunOptions& options,
                  Symbolizer& symbolizer) {
    Report report;
    report.processes = processes;
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    report.memory.mdTime = static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) / 1e9;
    if (processes.size() == 1) report.memory.mnProcess = processes.front()->account.process;
    report.disk.mdTime = report.memory.mdTime;
    report.disk.mnProcess = report.memory.mnProcess;
    if (options.memory) TakeMemory(options, symbolizer, report);
    if (options.disk) TakeDisk(report);
    report.notes = NotesOf(report, symbolizer, options);
    return report;
}

std::string ReportText(const Report& report, const RunOptions& options) {
    switch (options.format) {
        case Format::kJson:
            return JsonText(ReportJson(report, options));
        case Format::kCsv:
            return CsvText(report, options);
        case Format::kFolded:
            return FoldedText(report);
        case Format::kTables:
            break;
    }
    return TablesText(report, options);
}

std::string ReportsText(const std::vector<Report>& reports, const RunOptions& options) {
    std::string text;
    if (options.format == Format::kTables)
        for (const Report& report : reports) text += (text.empty() ? "" : "\n") + TablesText(report, options);
    if (options.format != Format::kJson || reports.size() == 1)
        return text.empty() ? ReportText(reports.back(), options) : text;
    Json json = ReportJson(reports.back(), options);
    for (std::size_t i = 0; i + 1 < reports.size(); ++i)
        json["processes"].push_back(ReportJson(reports[i], options));
    return JsonText(json);
}

}  // namespace recorder
