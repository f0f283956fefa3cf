// Recording and queries of the disk ledger. Its invariants are in ledger.h.
#include "zanbase/disk_io.h"

#include <memory>
#include <utility>

#include "diskio/ledger.h"

DiskIOFileMap* mpoDiskIOFileMap = nullptr;
DiskIOHandleMap* mpoDiskIOHandleMap = nullptr;
std::list<DiskIOState>* mpoDiskIOStack = nullptr;

namespace {

// If memory runs out, no table exists and the next call tries again.
void MakeTables() {
    auto file_map = std::make_unique<DiskIOFileMap>();
    auto handle_map = std::make_unique<DiskIOHandleMap>();
    mpoDiskIOStack = new std::list<DiskIOState>;
    mpoDiskIOFileMap = file_map.release();
    mpoDiskIOHandleMap = handle_map.release();
}

// Holds the ledger's mutex for a scope, in which the tables exist.
class LedgerLock {
public:
    LedgerLock() : moLock(mpoDiskIOMutex) {
        if (mpoDiskIOFileMap == nullptr) MakeTables();
    }

private:
    const HMutexLock moLock;
};

// The next three require that mpoDiskIOMutex is held and the tables exist.

DiskIOUsage* FindUsage(const std::string& name) {
    const auto file = mpoDiskIOFileMap->find(name);
    return file != mpoDiskIOFileMap->end() ? &file->second : nullptr;
}

// The record that an operation on `handle` is credited to, or null.
DiskIOUsage* UsageOf(void* handle) {
    const auto entry = mpoDiskIOHandleMap->find(handle);
    if (entry == mpoDiskIOHandleMap->end()) return FindUsage({});
    DiskIOBinding& binding = entry->second;
    if (binding.mpoUsage == nullptr) binding.mpoUsage = FindUsage(binding.moName);
    return binding.mpoUsage;
}

// The name is copied before the call, so that a lack of memory leaves the handle as it was.
DiskIOBinding& Bind(void* handle, std::string name) {
    DiskIOBinding& binding = (*mpoDiskIOHandleMap)[handle];
    binding.moName = std::move(name);
    binding.mpoUsage = nullptr;
    return binding;
}

template <class Value>
void StoreIfWanted(Value* where, Value value) {
    if (where != nullptr) *where = value;
}

}  // namespace

void HDiskIOOpen(const std::string& name, void* handle, double seconds) {
    const LedgerLock lock;
    DiskIOBinding& binding = Bind(handle, name);
    DiskIOUsage& usage = (*mpoDiskIOFileMap)[name];
    binding.mpoUsage = &usage;
    usage.mdOpenTime += seconds;
    ++usage.mnOpenCount;
}

void HDiskIOClose(void* handle, double seconds) {
    const LedgerLock lock;
    if (DiskIOUsage* const usage = UsageOf(handle)) {
        usage->mdCloseTime += seconds;
        ++usage->mnCloseCount;
    }
}

void HDiskIOSeek(void* handle, double seconds) {
    const LedgerLock lock;
    if (DiskIOUsage* const usage = UsageOf(handle)) {
        usage->mdSeekTime += seconds;
        ++usage->mnSeekCount;
    }
}

void HDiskIORead(void* handle, unsigned long long bytes, double seconds) {
    const LedgerLock lock;
    if (DiskIOUsage* const usage = UsageOf(handle)) {
        usage->mdReadTime += seconds;
        ++usage->mnReadCount;
        usage->mnReadSize += bytes;
    }
}

void HDiskIOWrite(void* handle, unsigned long long bytes, double seconds) {
    const LedgerLock lock;
    if (DiskIOUsage* const usage = UsageOf(handle)) {
        usage->mdWriteTime += seconds;
        ++usage->mnWriteCount;
        usage->mnWriteSize += bytes;
    }
}

void _HDiskIOMapFD(const std::string& name, void* handle) {
    const LedgerLock lock;
    Bind(handle, name);
}

std::string HDiskIOGetFilename(void* handle) {
    const LedgerLock lock;
    const auto entry = mpoDiskIOHandleMap->find(handle);
    return entry != mpoDiskIOHandleMap->end() ? entry->second.moName : std::string();
}

// NOLINTNEXTLINE(performance-unnecessary-value-param): by value in the published form
bool HDiskIOAccessFileData(std::string name, double* readTime, unsigned int* readCount,
                           unsigned long long* readSize, double* writeTime, unsigned int* writeCount,
                           unsigned long long* writeSize) {
    const HMutexLock lock(mpoDiskIOMutex);
    if (mpoDiskIOFileMap == nullptr) return false;
    const DiskIOUsage* const usage = FindUsage(name);
    if (usage == nullptr) return false;
    StoreIfWanted(readTime, usage->mdReadTime);
    StoreIfWanted(readCount, usage->mnReadCount);
    StoreIfWanted(readSize, usage->mnReadSize);
    StoreIfWanted(writeTime, usage->mdWriteTime);
    StoreIfWanted(writeCount, usage->mnWriteCount);
    StoreIfWanted(writeSize, usage->mnWriteSize);
    return true;
}

void HDiskIOPush() {
    {
        const LedgerLock lock;
        mpoDiskIOStack->push_back({*mpoDiskIOFileMap, *mpoDiskIOHandleMap});
    }
    HDiskIOReset();
}

// The saved state is removed afterwards, so its tables are moved and not copied. This needs no memory.
void HDiskIOPop() {
    const LedgerLock lock;
    if (mpoDiskIOStack->empty()) return;
    DiskIOState& saved = mpoDiskIOStack->back();
    *mpoDiskIOFileMap = std::move(saved.moFileMap);
    *mpoDiskIOHandleMap = std::move(saved.moHandleMap);
    mpoDiskIOStack->pop_back();
}

void HDiskIOReset() {
    const LedgerLock lock;
    mpoDiskIOFileMap->clear();
    mpoDiskIOHandleMap->clear();
}
