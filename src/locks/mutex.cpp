// HMutex passes every call to the platform's lock; HMutexLock releases before it acquires.
#include "zanbase/mutex.h"

#include <cstdlib>

#include "locks/lasting_mutex.h"
#include "platform/lock.h"
#include "zanbase/allocation.h"

HMutex::HMutex() : mpoCriticalSection(static_cast<HNativeLock*>(HMalloc(sizeof(HNativeLock)))) {
    InitLock(mpoCriticalSection);
}

HMutex::~HMutex() {
    if (this == gpoLastingMutex) return;
    DestroyLock(mpoCriticalSection);
    std::free(mpoCriticalSection);
}

void HMutex::Lock() const { AcquireLock(mpoCriticalSection); }

bool HMutex::TryLock() const { return TryAcquireLock(mpoCriticalSection); }

void HMutex::Unlock() const { ReleaseLock(mpoCriticalSection); }

HMutexLock::HMutexLock(const HMutex* mutex) : mpoMutex(mutex) {
    if (mpoMutex != nullptr) mpoMutex->Lock();
}

HMutexLock::HMutexLock(const HMutexLock& other) : HMutexLock(other.mpoMutex) {}

HMutexLock::~HMutexLock() { HMutexLock::Release(); }

HMutexLock& HMutexLock::operator=(const HMutexLock& other) {
    Reset(other.mpoMutex);  // the argument is read before anything is released, so self-assignment is safe
    return *this;
}

void HMutexLock::Release() { Reset(nullptr); }

void HMutexLock::Reset(const HMutex* mutex) {
    if (mpoMutex != nullptr) mpoMutex->Unlock();
    mpoMutex = mutex;
    if (mpoMutex != nullptr) mpoMutex->Lock();
}

const HMutex* HMutexLock::GetMutex() const { return mpoMutex; }
