// The three reports over the disk ledger.
#include "diskio/disk_io_report_text.h"
#include "memory/report_lock.h"
#include "memory/report_text.h"
#include "zanbase/disk_io.h"
#include "zanbase/tracker_pause.h"

namespace {

// Requires: mpoDiskIOMutex is owned.
bool HasFiles() { return mpoDiskIOFileMap != nullptr && !mpoDiskIOFileMap->empty(); }

}  // namespace

bool HDiskIOReportFile(std::FILE* stream, const std::string& name) {
    const HTrackerPause pause;
    DiskIOFileMap::const_iterator file;
    const auto has_text = [&] {
        return HasFiles() && (file = mpoDiskIOFileMap->find(name)) != mpoDiskIOFileMap->end();
    };
    const ReportLock lock(*mpoDiskIOMutex, stream, has_text);
    if (!lock) return false;
    WriteText(stream, DiskIOFileText(name, file->second));
    return true;
}

void HDiskIOSummaryReport(std::FILE* stream) {
    const HTrackerPause pause;
    const ReportLock lock(*mpoDiskIOMutex, stream, HasFiles);
    if (!lock) return;
    WriteText(stream, DiskIOSummaryText(*mpoDiskIOFileMap));
}

void HDiskIOUsageReport(std::FILE* stream) {
    const HTrackerPause pause;
    const ReportLock lock(*mpoDiskIOMutex, stream, HasFiles);
    if (!lock) return;
    // Copies of the names: the write function of the stream may reset the ledger.
    const std::vector<std::string> used = DiskIOUsedFiles(*mpoDiskIOFileMap);
    WriteText(stream, kDiskIOUsageTitle);
    if (used.empty()) WriteText(stream, kDiskIONoUsage);
    for (const std::string& name : used) HDiskIOReportFile(stream, name);
}
