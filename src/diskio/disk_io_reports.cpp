// The three reports over the disk ledger.
#include "diskio/disk_io_report_text.h"
#include "memory/report_text.h"
#include "platform/stream.h"
#include "zanbase/disk_io.h"

// Each report owns the lock of its stream and then the ledger's mutex until it is written.

bool HDiskIOReportFile(std::FILE* stream, const std::string& name) {
    const StreamLock stream_lock(stream);
    const HMutexLock lock(&goDiskIOMutex);
    if (gpoDiskIOFileMap == nullptr) return false;
    const auto file = gpoDiskIOFileMap->find(name);
    if (file == gpoDiskIOFileMap->end()) return false;
    WriteText(stream, DiskIOFileText(name, file->second));
    return true;
}

void HDiskIOSummaryReport(std::FILE* stream) {
    const StreamLock stream_lock(stream);
    const HMutexLock lock(&goDiskIOMutex);
    if (gpoDiskIOFileMap == nullptr || gpoDiskIOFileMap->empty()) return;
    WriteText(stream, DiskIOSummaryText(*gpoDiskIOFileMap));
}

void HDiskIOUsageReport(std::FILE* stream) {
    const StreamLock stream_lock(stream);
    const HMutexLock lock(&goDiskIOMutex);
    if (gpoDiskIOFileMap == nullptr || gpoDiskIOFileMap->empty()) return;
    WriteText(stream, DiskIOUsageText(*gpoDiskIOFileMap));
}
