// The two reports over the tracker's tables. Each copies what it shows before its first write, because the write
// function of the stream may call the tracker on the same thread.
#include <cstdint>
#include <map>
#include <utility>
#include <vector>

#include "memory/memory_report_text.h"
#include "memory/report_lock.h"
#include "memory/report_text.h"
#include "zanbase/memory_tables.h"
#include "zanbase/tracker_pause.h"

namespace {

ReportWriter WriterTo(std::FILE* stream) {
    return [stream](const std::string& part) { WriteText(stream, part); };
}

}  // namespace

void HMemory::LeakReport(std::FILE* stream) {
    const HTrackerPause pause;
    const auto has_text = [] { return mpoMemoryMap != nullptr && !mpoMemoryMap->empty(); };
    const ReportLock lock(moMutex, stream, has_text);
    if (!lock) return;
    std::map<std::pair<std::uintptr_t, int>, LeakGroup> by_site;
    for (const auto& [address, block] : *mpoMemoryMap) {
        LeakGroup& group = by_site[{reinterpret_cast<std::uintptr_t>(block.mpcFile), block.mnLine}];
        group = {group.size + block.mnSize, group.blocks + 1, block.mpcFile, block.mnLine};
    }
    std::vector<LeakGroup> groups;
    groups.reserve(by_site.size());
    for (const auto& [site, group] : by_site) groups.push_back(group);
    WriteLeakReport(groups, WriterTo(stream));
}

void HMemory::UsageReport(std::FILE* stream) {
    const HTrackerPause pause;
    const auto has_text = [] { return mpoFileMap != nullptr && !mpoFileMap->empty(); };
    const ReportLock lock(moMutex, stream, has_text);
    if (!lock) return;
    std::vector<UsageRow> rows;
    rows.reserve(mpoFileMap->size());
    for (const auto& [site, usage] : *mpoFileMap) {
        rows.push_back({site.first, site.second, usage.mnAllocated, usage.mnFreed, usage.mnAllocCount,
                        usage.mnFreeCount});
    }
    WriteUsageReport(rows, mnPeekMemory, WriterTo(stream));
}
