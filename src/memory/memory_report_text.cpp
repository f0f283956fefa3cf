// The two memory reports.
#include "memory/memory_report_text.h"

#include <algorithm>
#include <map>

#include "zanbase/string_makers.h"

namespace {

constexpr char kLeakHeading[] =
    "Memory Leak Report:\n"
    " ______________________________________________________________________________ \n"
    "|          |        |        |                                                 |\n"
    "|   Size   | Blocks |  Line  | File                                            |\n"
    "|__________|________|________|_________________________________________________|\n"
    "|          |        |        |                                                 |\n";

// A cell of the table: `text` right-aligned, one blank, the rule.
std::string Cell(const std::string& text, unsigned int width) {
    return FitField(text + " ", width, true) + "|";
}

std::string LeakCells(std::size_t size, int blocks) {
    return "|" + Cell(SizeText(size), 10) + Cell(MkString("%d", blocks), 8);
}

// Drops leading directories until the path fits. A file name that is too long itself stays whole.
std::string LeakPath(const char* file, std::size_t width) {
    std::string path = ShortSourcePath(file);
    for (std::size_t slash; path.size() > width && (slash = path.find('/')) != std::string::npos;)
        path.erase(0, slash + 1);
    return path;
}

std::string LeakRow(const LeakGroup& group) {
    constexpr unsigned int kPathWidth = 47;
    return LeakCells(group.size, group.blocks) + Cell(MkString("%d", group.line), 8) + " " +
           FitField(LeakPath(group.file, kPathWidth), kPathWidth, false) + " |\n";
}

std::string LeakFooter(std::size_t size, int blocks) {
    return "|          |        |        |                                                 |\n" +
           LeakCells(size, blocks) + "        |                                                 |\n" +
           "|__________|________|________|_________________________________________________|\n\n";
}

struct UsageTotals {
    double allocated = 0;  // all in K
    double freed = 0;
    double below_threshold = 0;
};

double Kilobytes(std::size_t bytes) { return static_cast<double>(bytes) / 1024; }

// The threshold mixes units: 10% of the total in KiB is compared with bytes, so the cut is total/10240.
unsigned long long UsageThreshold(const UsageTotals& totals) {
    constexpr double kLargest = 18446744073709549568.0;  // the last double below 2^64
    return static_cast<unsigned long long>(std::min(totals.allocated * 0.1, kLargest));
}

std::string UsageFooter(const UsageTotals& totals, std::size_t peak) {
    return "Total Below Threshold: " + KiloSizeText(totals.below_threshold) + "\n\n" +
           "Total Allocated: " + FitField(KiloSizeText(totals.allocated), 8, true) + "\n" +
           "Total Freed:     " + FitField(KiloSizeText(totals.freed), 8, true) + "\n\n" +
           "Peek Allocated:  " + FitField(SizeText(peak), 8, true) + "\n\n";
}

// The counts form one column and the sizes another, each as wide as its longer text.
std::string UsageSection(const UsageRow& row) {
    const std::string alloc_count = MkString("%d", static_cast<int>(row.alloc_count));
    const std::string free_count = MkString("%d", static_cast<int>(row.free_count));
    const std::string allocated = SizeText(row.allocated);
    const std::string freed = SizeText(row.freed);
    const auto count_width = static_cast<unsigned int>(std::max(alloc_count.size(), free_count.size()));
    const auto size_width = static_cast<unsigned int>(std::max(allocated.size(), freed.size()));
    return "File: " + ShortSourcePath(row.file) + ", Line: " + MkString("%d", row.line) + "\n" +
           "Allocated (" + FitField(alloc_count, count_width, true) +
           "): " + FitField(allocated, size_width, true) + "\n" + "Freed     (" +
           FitField(free_count, count_width, true) + "): " + FitField(freed, size_width, true) + "\n\n";
}

}  // namespace

void WriteLeakReport(const std::vector<LeakGroup>& groups, const ReportWriter& write) {
    std::multimap<std::size_t, const LeakGroup*> by_size;
    for (const LeakGroup& group : groups) by_size.emplace(group.size, &group);
    write(kLeakHeading);
    std::size_t size = 0;
    int blocks = 0;
    for (const auto& [group_size, group] : by_size) {
        write(LeakRow(*group));
        size += group_size;
        blocks += group->blocks;
    }
    write(LeakFooter(size, blocks));
}

void WriteUsageReport(const std::vector<UsageRow>& rows, std::size_t peak, const ReportWriter& write) {
    std::multimap<std::size_t, const UsageRow*> by_size;
    UsageTotals totals;
    for (const UsageRow& row : rows) {
        by_size.emplace(row.allocated, &row);
        totals.allocated += Kilobytes(row.allocated);
        totals.freed += Kilobytes(row.freed);
    }
    write("Memory Usage Report By File:\n\n");
    const unsigned long long threshold = UsageThreshold(totals);
    for (const auto& [allocated, row] : by_size) {
        if (allocated < threshold) {
            totals.below_threshold += Kilobytes(allocated);
        } else {
            write(UsageSection(*row));
        }
    }
    write(UsageFooter(totals, peak));
}
