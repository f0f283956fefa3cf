// The disk ledger as plain data.
#include "diskio/ledger.h"
#include "snapshot/taken_data.h"

namespace {

using TakenDiskIO = TakenData<HDiskIOData, HDiskIOFileData>;

HDiskIOFileData CopyOf(HTextData name, const DiskIOUsage& usage) {
    return {name,
            {usage.mnOpenCount, usage.mdOpenTime, 0},
            {usage.mnCloseCount, usage.mdCloseTime, 0},
            {usage.mnSeekCount, usage.mdSeekTime, 0},
            {usage.mnReadCount, usage.mdReadTime, static_cast<long long>(usage.mnReadSize)},
            {usage.mnWriteCount, usage.mdWriteTime, static_cast<long long>(usage.mnWriteSize)}};
}

}  // namespace

const HDiskIOData* HTakeDiskIOData() noexcept {
    return Take<TakenDiskIO>([](TakenDiskIO& taken) {
        const HMutexLock lock(mpoDiskIOMutex);
        if (mpoDiskIOFileMap == nullptr) return;
        taken.maRows.reserve(mpoDiskIOFileMap->size());
        for (const auto& [name, usage] : *mpoDiskIOFileMap)
            taken.maRows.push_back(CopyOf(taken.Keep(name), usage));
    });
}

void HReleaseData(const HDiskIOData* data) noexcept { Release<TakenDiskIO>(data); }
