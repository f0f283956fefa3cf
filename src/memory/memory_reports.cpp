// The two reports over the tracker's tables: the texts of their pieces, then the order of the pieces.
//
// Each report owns the lock of its stream and then the tracker's mutex until it is written.
#include <algorithm>
#include <cstdint>
#include <map>
#include <string>
#include <utility>

#include "memory/report_text.h"
#include "platform/stream.h"
#include "zanbase/memory_tables.h"
#include "zanbase/string_makers.h"

namespace {

constexpr char kLeakHeading[] =
    "Memory Leak Report:\n"
    " ______________________________________________________________________________ \n"
    "|          |        |        |                                                 |\n"
    "|   Size   | Blocks |  Line  | File                                            |\n"
    "|__________|________|________|_________________________________________________|\n"
    "|          |        |        |                                                 |\n";

// The live blocks of one call site.
struct LeakGroup {
    std::size_t size = 0;
    int blocks = 0;
    const char* file = nullptr;
    int line = 0;
};

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
template <class Usage>
std::string UsageSection(const char* file, int line, const Usage& usage) {
    const std::string alloc_count = MkString("%d", static_cast<int>(usage.mnAllocCount));
    const std::string free_count = MkString("%d", static_cast<int>(usage.mnFreeCount));
    const std::string allocated = SizeText(usage.mnAllocated);
    const std::string freed = SizeText(usage.mnFreed);
    const auto count_width = static_cast<unsigned int>(std::max(alloc_count.size(), free_count.size()));
    const auto size_width = static_cast<unsigned int>(std::max(allocated.size(), freed.size()));
    return "File: " + ShortSourcePath(file) + ", Line: " + MkString("%d", line) + "\n" + "Allocated (" +
           FitField(alloc_count, count_width, true) + "): " + FitField(allocated, size_width, true) + "\n" +
           "Freed     (" + FitField(free_count, count_width, true) +
           "): " + FitField(freed, size_width, true) + "\n\n";
}

}  // namespace

void HMemory::LeakReport(std::FILE* stream) {
    const StreamLock stream_lock(stream);
    const HMutexLock lock(&moMutex);
    if (mpoMemoryMap == nullptr || mpoMemoryMap->empty()) return;

    std::map<std::pair<std::uintptr_t, int>, LeakGroup> groups;
    for (const auto& [address, block] : *mpoMemoryMap) {
        LeakGroup& group = groups[{reinterpret_cast<std::uintptr_t>(block.mpcFile), block.mnLine}];
        group = {group.size + block.mnSize, group.blocks + 1, block.mpcFile, block.mnLine};
    }
    std::multimap<std::size_t, const LeakGroup*> by_size;
    for (const auto& [site, group] : groups) by_size.emplace(group.size, &group);

    WriteText(stream, kLeakHeading);
    std::size_t size = 0;
    int blocks = 0;
    for (const auto& [group_size, group] : by_size) {
        WriteText(stream, LeakRow(*group));
        size += group_size;
        blocks += group->blocks;
    }
    WriteText(stream, LeakFooter(size, blocks));
}

void HMemory::UsageReport(std::FILE* stream) {
    const StreamLock stream_lock(stream);
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr || mpoFileMap->empty()) return;

    std::multimap<std::size_t, const FileMap::value_type*> by_size;
    UsageTotals totals;
    for (const auto& entry : *mpoFileMap) {
        by_size.emplace(entry.second.mnAllocated, &entry);
        totals.allocated += Kilobytes(entry.second.mnAllocated);
        totals.freed += Kilobytes(entry.second.mnFreed);
    }
    const unsigned long long threshold = UsageThreshold(totals);

    WriteText(stream, "Memory Usage Report By File:\n\n");
    for (const auto& [allocated, entry] : by_size) {
        if (allocated < threshold) {
            totals.below_threshold += Kilobytes(allocated);
        } else {
            WriteText(stream, UsageSection(entry->first.first, entry->first.second, entry->second));
        }
    }
    WriteText(stream, UsageFooter(totals, mnPeekMemory));
}
