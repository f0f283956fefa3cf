// The two read-write locks on the steps of read_write_steps.h, and their scoped holders.
#include "zanbase/read_write_mutex.h"

#include "locks/read_write_steps.h"
#include "platform/lock.h"

namespace {

using Downgrade = HReadWriteSteps::Downgrade;

// Not HThread::GetCurrentThreadId: that changes in the child of a fork, and the system reuses it.
unsigned long long Self() { return LockOwner(); }

}  // namespace

HReadWriteMutex::~HReadWriteMutex() = default;

// Callers in other modes of the standard library reserve this many bytes.
static_assert(sizeof(HReadPrefMutex) == sizeof(HReadWriteMutex) + kReadWriteMemberBytes);
static_assert(sizeof(HWritePrefMutex) == sizeof(HReadPrefMutex));

HReadPrefMutex::HReadPrefMutex() = default;
HReadPrefMutex::~HReadPrefMutex() = default;
void HReadPrefMutex::ReadLock() const { HReadWriteSteps::ReadLockAtOnce(*this, Self()); }
void HReadPrefMutex::ReadUnlock() const { HReadWriteSteps::ReadUnlock<Downgrade::kAllowed>(*this, Self()); }
void HReadPrefMutex::WriteLock() const { HReadWriteSteps::WriteLock(*this, Self()); }
void HReadPrefMutex::WriteUnlock() const { HReadWriteSteps::WriteUnlock<Downgrade::kAllowed>(*this, Self()); }

HWritePrefMutex::HWritePrefMutex() = default;
HWritePrefMutex::~HWritePrefMutex() = default;
void HWritePrefMutex::ReadLock() const { HReadWriteSteps::ReadLockInTurn(*this, Self()); }
void HWritePrefMutex::ReadUnlock() const { HReadWriteSteps::ReadUnlock<Downgrade::kBarred>(*this, Self()); }
void HWritePrefMutex::WriteLock() const { HReadWriteSteps::WriteLock(*this, Self()); }
void HWritePrefMutex::WriteUnlock() const { HReadWriteSteps::WriteUnlock<Downgrade::kBarred>(*this, Self()); }

HReaderLock::HReaderLock(const HReadWriteMutex* mutex) : mpoMutex(mutex) {
    if (mpoMutex != nullptr) mpoMutex->ReadLock();
}

HReaderLock::HReaderLock(const HReaderLock& other) : HReaderLock(other.mpoMutex) {}

HReaderLock::~HReaderLock() { HReaderLock::Release(); }

HReaderLock& HReaderLock::operator=(const HReaderLock& other) {
    Reset(other.mpoMutex);  // the argument is read before anything is released, so self-assignment is safe
    return *this;
}

void HReaderLock::Release() { Reset(nullptr); }

void HReaderLock::Reset(const HReadWriteMutex* mutex) {
    if (mpoMutex != nullptr) mpoMutex->ReadUnlock();
    mpoMutex = mutex;
    if (mpoMutex != nullptr) mpoMutex->ReadLock();
}

HWriterLock::HWriterLock(const HReadWriteMutex* mutex) : mpoMutex(mutex) {
    if (mpoMutex != nullptr) mpoMutex->WriteLock();
}

HWriterLock::HWriterLock(const HWriterLock& other) : HWriterLock(other.mpoMutex) {}

HWriterLock::~HWriterLock() { HWriterLock::Release(); }

HWriterLock& HWriterLock::operator=(const HWriterLock& other) {
    Reset(other.mpoMutex);
    return *this;
}

void HWriterLock::Release() { Reset(nullptr); }

void HWriterLock::Reset(const HReadWriteMutex* mutex) {
    if (mpoMutex != nullptr) mpoMutex->WriteUnlock();
    mpoMutex = mutex;
    if (mpoMutex != nullptr) mpoMutex->WriteLock();
}
