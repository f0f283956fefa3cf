// The tables of the disk ledger. Invariants, whenever its mutex is free:
//
// - A binding's record is that of its name, or null if that was not looked for or not there. So a record
//   found by the name of a binding is entered there, and never looked up by that binding again.
// - Records and bindings leave together, and never singly: no binding outlives its record.
// - A saved state shares nothing with the live tables.
#ifndef ZANBASE_DISKIO_LEDGER_H
#define ZANBASE_DISKIO_LEDGER_H

#include <atomic>
#include <functional>
#include <list>
#include <map>
#include <string>

#include <boost/unordered_map.hpp>

#include "zanbase/mutex.h"

// What was done with one file; times in seconds, sizes in bytes.
struct DiskIOUsage {
    double mdOpenTime = 0;
    unsigned int mnOpenCount = 0;
    double mdCloseTime = 0;
    unsigned int mnCloseCount = 0;
    double mdSeekTime = 0;
    unsigned int mnSeekCount = 0;
    double mdReadTime = 0;
    unsigned int mnReadCount = 0;
    unsigned long long mnReadSize = 0;
    double mdWriteTime = 0;
    unsigned int mnWriteCount = 0;
    unsigned long long mnWriteSize = 0;
};

// What a handle stands for. A copy belongs to other tables, so it starts without the record.
struct DiskIOBinding {
    DiskIOBinding() = default;
    DiskIOBinding(const DiskIOBinding& other) : moName(other.moName) {}
    DiskIOBinding& operator=(const DiskIOBinding&) = delete;
    ~DiskIOBinding() = default;

    std::string moName;
    DiskIOUsage* mpoUsage = nullptr;  // not owned: an element of the file table
};

// Names compare byte by byte as unsigned bytes, and a name comes before its continuations. Elements stay
// where they are as long as they live.
using DiskIOFileMap = std::map<std::string, DiskIOUsage>;

// Nothing walks over the handles, so they need no order.
using DiskIOHandleMap = boost::unordered::unordered_map<void*, DiskIOBinding>;

struct DiskIOState {
    DiskIOFileMap moFileMap;
    DiskIOHandleMap moHandleMap;
};

// The four are made together at the first recording and never destroyed. The mutex is published last: who
// sees it sees the tables too.
extern std::atomic<const HMutex*> mpoDiskIOMutex;
extern DiskIOFileMap* mpoDiskIOFileMap;  // guarded by *mpoDiskIOMutex, as are the next two
extern DiskIOHandleMap* mpoDiskIOHandleMap;
extern std::list<DiskIOState>* mpoDiskIOStack;  // newest at the back

// The mutex, or null as long as there is no ledger.
inline const HMutex* LedgerMutexIfMade() { return mpoDiskIOMutex.load(std::memory_order_acquire); }

#endif
