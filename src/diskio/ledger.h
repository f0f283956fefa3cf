// The tables of the disk ledger. Invariants, whenever its mutex is free:
//
// - All three tables exist, or none.
// - The record of a binding is the one of its name, or null if the name has none or was not looked up yet.
// - All records and all bindings are removed together. Neither is removed singly, so no binding points to
//   a removed record.
// - A saved state shares nothing with the live tables.
#ifndef ZANBASE_DISKIO_LEDGER_H
#define ZANBASE_DISKIO_LEDGER_H

#include <functional>
#include <list>
#include <map>
#include <string>

#include <boost/unordered_map.hpp>

#include "zanbase/mutex.h"

// What was done with one file: times in seconds, sizes in bytes.
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

// What a handle is bound to. A copy is for other tables, so it starts without the record.
struct DiskIOBinding {
    DiskIOBinding() = default;
    DiskIOBinding(const DiskIOBinding& other) : moName(other.moName) {}
    DiskIOBinding& operator=(const DiskIOBinding&) = delete;
    ~DiskIOBinding() = default;

    std::string moName;
    DiskIOUsage* mpoUsage = nullptr;  // not owned: an element of the file table
};

// Ordered by unsigned bytes; a name precedes names that it begins. The address of an element never changes.
using DiskIOFileMap = std::map<std::string, DiskIOUsage>;

// Hashed: no code iterates over the handles, so their order is not needed.
using DiskIOHandleMap = boost::unordered::unordered_map<void*, DiskIOBinding>;

struct DiskIOState {
    DiskIOFileMap moFileMap;
    DiskIOHandleMap moHandleMap;
};

extern const HMutex* const mpoDiskIOMutex;  // built in load_time.cpp, never destroyed

// Null until the first recording, then never destroyed. Guarded by mpoDiskIOMutex.
extern DiskIOFileMap* mpoDiskIOFileMap;
extern DiskIOHandleMap* mpoDiskIOHandleMap;
extern std::list<DiskIOState>* mpoDiskIOStack;  // newest at the back

#endif
