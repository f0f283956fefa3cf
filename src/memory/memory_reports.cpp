// The two reports over the tracker's tables: what the texts need, read from the tables.
//
// Each report owns the lock of its stream and then the tracker's mutex until it is written.
#include <cstdint>
#include <map>
#include <utility>
#include <vector>

#include "memory/memory_report_text.h"
#include "memory/report_text.h"
#include "platform/stream.h"
#include "zanbase/memory_tables.h"

void HMemory::LeakReport(std::FILE* stream) {
    const StreamLock stream_lock(stream);
    const HMutexLock lock(&moMutex);
    if (mpoMemoryMap == nullptr || mpoMemoryMap->empty()) return;
    std::map<std::pair<std::uintptr_t, int>, LeakGroup> by_site;
    for (const auto& [address, block] : *mpoMemoryMap) {
        LeakGroup& group = by_site[{reinterpret_cast<std::uintptr_t>(block.mpcFile), block.mnLine}];
        group = {group.size + block.mnSize, group.blocks + 1, block.mpcFile, block.mnLine};
    }
    std::vector<LeakGroup> groups;
    groups.reserve(by_site.size());
    for (const auto& [site, group] : by_site) groups.push_back(group);
    WriteText(stream, LeakReportText(groups));
}

void HMemory::UsageReport(std::FILE* stream) {
    const StreamLock stream_lock(stream);
    const HMutexLock lock(&moMutex);
    if (mpoFileMap == nullptr || mpoFileMap->empty()) return;
    std::vector<UsageRow> rows;
    rows.reserve(mpoFileMap->size());
    for (const auto& [site, usage] : *mpoFileMap) {
        rows.push_back({site.first, site.second, usage.mnAllocated, usage.mnFreed, usage.mnAllocCount,
                        usage.mnFreeCount});
    }
    WriteText(stream, UsageReportText(rows, mnPeekMemory));
}
