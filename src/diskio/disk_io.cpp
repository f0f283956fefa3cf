// Recording and queries of the disk ledger; ledger.h tells its invariants.
#include "zanbase/disk_io.h"

#include <memory>
#include <utility>

#include "diskio/ledger.h"

std::atomic<const HMutex*> mpoDiskIOMutex{nullptr};
DiskIOFileMap* mpoDiskIOFileMap = nullptr;
DiskIOHandleMap* mpoDiskIOHandleMap = nullptr;
std::list<DiskIOState>* mpoDiskIOStack = nullptr;

namespace {

// The entry of the handle that was used last: most often the next operation is on the same file. Guarded by
// the ledger's mutex, and forgotten whenever the entries leave.
DiskIOHandleMap::value_type* gpoLastEntry = nullptr;

// The initialisation of a local static lets one thread in and makes others wait. If memory runs out it leaves
// nothing behind, and the next call tries again.
const HMutex* MakeLedger() {
    static const HMutex* const ledger_mutex = [] {
        auto mutex = std::make_unique<HMutex>();
        auto file_map = std::make_unique<DiskIOFileMap>();
        auto handle_map = std::make_unique<DiskIOHandleMap>();
        auto stack = std::make_unique<std::list<DiskIOState>>();
        mpoDiskIOFileMap = file_map.release();
        mpoDiskIOHandleMap = handle_map.release();
        mpoDiskIOStack = stack.release();
        mpoDiskIOMutex.store(mutex.get(), std::memory_order_release);
        return mutex.release();
    }();
    return ledger_mutex;
}

// The mutex of the ledger, which is made if it is not there.
const HMutex* LedgerMutex() {
    const HMutex* const mutex = LedgerMutexIfMade();
    return mutex != nullptr ? mutex : MakeLedger();
}

// The next three are called with the mutex held.

DiskIOUsage* FindUsage(const std::string& name) {
    const auto file = mpoDiskIOFileMap->find(name);
    return file != mpoDiskIOFileMap->end() ? &file->second : nullptr;
}

// The record that an operation on `handle` is credited to, or null.
DiskIOUsage* UsageOf(void* handle) {
    if (gpoLastEntry == nullptr || gpoLastEntry->first != handle) {
        const auto entry = mpoDiskIOHandleMap->find(handle);
        if (entry == mpoDiskIOHandleMap->end()) return FindUsage({});
        gpoLastEntry = &*entry;
    }
    DiskIOBinding& binding = gpoLastEntry->second;
    if (binding.mpoUsage == nullptr) binding.mpoUsage = FindUsage(binding.moName);
    return binding.mpoUsage;
}

// Copies the name first, so that a lack of memory leaves the handle as it was.
DiskIOBinding& Bind(void* handle, std::string name) {
    DiskIOBinding& binding = (*mpoDiskIOHandleMap)[handle];
    binding.moName = std::move(name);
    binding.mpoUsage = nullptr;
    return binding;
}

template <class Value>
void Tell(Value* where, Value value) {
    if (where != nullptr) *where = value;
}

}  // namespace

void HDiskIOOpen(const std::string& name, void* handle, double seconds) {
    const HMutexLock lock(LedgerMutex());
    DiskIOBinding& binding = Bind(handle, name);
    DiskIOUsage& usage = (*mpoDiskIOFileMap)[name];
    binding.mpoUsage = &usage;
    usage.mdOpenTime += seconds;
    ++usage.mnOpenCount;
}

void HDiskIOClose(void* handle, double seconds) {
    const HMutexLock lock(LedgerMutex());
    if (DiskIOUsage* const usage = UsageOf(handle)) {
        usage->mdCloseTime += seconds;
        ++usage->mnCloseCount;
    }
}

void HDiskIOSeek(void* handle, double seconds) {
    const HMutexLock lock(LedgerMutex());
    if (DiskIOUsage* const usage = UsageOf(handle)) {
        usage->mdSeekTime += seconds;
        ++usage->mnSeekCount;
    }
}

void HDiskIORead(void* handle, unsigned long long bytes, double seconds) {
    const HMutexLock lock(LedgerMutex());
    if (DiskIOUsage* const usage = UsageOf(handle)) {
        usage->mdReadTime += seconds;
        ++usage->mnReadCount;
        usage->mnReadSize += bytes;
    }
}

void HDiskIOWrite(void* handle, unsigned long long bytes, double seconds) {
    const HMutexLock lock(LedgerMutex());
    if (DiskIOUsage* const usage = UsageOf(handle)) {
        usage->mdWriteTime += seconds;
        ++usage->mnWriteCount;
        usage->mnWriteSize += bytes;
    }
}

void _HDiskIOMapFD(const std::string& name, void* handle) {
    const HMutexLock lock(LedgerMutex());
    Bind(handle, name);
}

std::string HDiskIOGetFilename(void* handle) {
    const HMutexLock lock(LedgerMutex());
    const auto entry = mpoDiskIOHandleMap->find(handle);
    return entry != mpoDiskIOHandleMap->end() ? entry->second.moName : std::string();
}

// NOLINTNEXTLINE(performance-unnecessary-value-param): by value in the published form
bool HDiskIOAccessFileData(std::string name, double* readTime, unsigned int* readCount,
                           unsigned long long* readSize, double* writeTime, unsigned int* writeCount,
                           unsigned long long* writeSize) {
    const HMutexLock lock(LedgerMutexIfMade());
    if (lock.GetMutex() == nullptr) return false;
    const DiskIOUsage* const usage = FindUsage(name);
    if (usage == nullptr) return false;
    Tell(readTime, usage->mdReadTime);
    Tell(readCount, usage->mnReadCount);
    Tell(readSize, usage->mnReadSize);
    Tell(writeTime, usage->mdWriteTime);
    Tell(writeCount, usage->mnWriteCount);
    Tell(writeSize, usage->mnWriteSize);
    return true;
}

void HDiskIOPush() {
    {
        const HMutexLock lock(LedgerMutex());
        mpoDiskIOStack->push_back({*mpoDiskIOFileMap, *mpoDiskIOHandleMap});
    }
    HDiskIOReset();
}

// The saved tables go right after, so they are handed over rather than copied; this needs no memory.
void HDiskIOPop() {
    const HMutexLock lock(LedgerMutex());
    if (mpoDiskIOStack->empty()) return;
    DiskIOState& saved = mpoDiskIOStack->back();
    gpoLastEntry = nullptr;
    *mpoDiskIOFileMap = std::move(saved.moFileMap);
    *mpoDiskIOHandleMap = std::move(saved.moHandleMap);
    mpoDiskIOStack->pop_back();
}

void HDiskIOReset() {
    const HMutexLock lock(LedgerMutex());
    gpoLastEntry = nullptr;
    mpoDiskIOFileMap->clear();
    mpoDiskIOHandleMap->clear();
}
